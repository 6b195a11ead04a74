// tvxguest unattended linux: recognise a Linux install image and write its
// answer file. The file is made in a staging directory beside --out and
// moved into place only when the whole call succeeded, so a failing call
// leaves nothing in --out.
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <string>
#include <system_error>
#include <vector>

#include "arg_parser.h"
#include "command.h"
#include "command_group.h"
#include "json.h"
#include "staged_output.h"
#include "tvx_autoinstall.h"
#include "tvx_autoinstall_linux.h"
#include "tvx_guess.h"
#include "unattended_common.h"
#include "unattended_linux_media.h"

namespace tvxcli {
namespace {

namespace fs = std::filesystem;

constexpr char kName[] = "unattended linux";

void PrintHelp() {
  std::printf(
      "Usage: tvxguest unattended linux [OPTIONS] --out DIR IMAGE\n\n"
      "Recognise the Linux install image IMAGE and write its answer file into DIR\n"
      "(created when missing): ks.cfg (Red Hat family), custom/preseed.cfg (Ubuntu),\n"
      "autoinst.xml (SUSE) or auto_i~1.cfg (Mandriva). Passwords are written in their\n"
      "SHA-256 crypt form (Mandriva's installer takes them only in clear). The file is\n"
      "readable by its owner only; on failure nothing is left in DIR.\n\n"
      "Options:\n"
      "  --user NAME              login name of the user account (required)\n"
      "  --full-name TEXT         the user's full name (required)\n"
      "  --password TEXT          the user's password\n"
      "  --password-file FILE     read it from the first line of FILE instead\n"
      "  --root-password TEXT     root's password (default: the user's password)\n"
      "  --root-password-file FILE  read it from the first line of FILE instead\n"
      "  --install-key KEY        installation number for the Red Hat installer\n"
      "  --power-off              power the guest off after the install (default: reboot)\n"
      "  --nvme                   the guest's disk is NVMe (Ubuntu)\n"
      "  --out DIR                output directory (required)\n"
      "  --media DIR              then make the guest's medium in DIR: autoinst.flp and/or\n"
      "                           autoinst.iso (the install medium's boot tree)\n"
      "%s"
      "  --json                   print one JSON object instead of text\n"
      "  -h, --help               show this help\n\n"
      "Exit status: 0 written, 1 not recognised or not written, 2 IMAGE cannot be\n"
      "opened, 64 usage error.\n",
      kLinuxMediaHelp);
}

struct Options {
  std::string user, fullName, password, rootPassword, key, out, image;
  bool haveRoot = false, haveKey = false, powerOff = false, nvme = false, json = false;
  LinuxMediaOptions media;
};

// Parse fills `o`; returns -1 to go on, else the exit status.
int Parse(const std::vector<std::string> &args, Options *o) {
  struct Valued {
    const char *flag;
    std::string *value;
    bool given = false;
  };
  std::string passwordFile, rootFile;
  Valued valued[] = {
      {"--user", &o->user},
      {"--full-name", &o->fullName},
      {"--password", &o->password},
      {"--password-file", &passwordFile},
      {"--root-password", &o->rootPassword},
      {"--root-password-file", &rootFile},
      {"--install-key", &o->key},
      {"--out", &o->out},
  };
  enum { kUser, kFullName, kPassword, kPasswordFile, kRoot, kRootFile, kKey, kOut };
  const std::pair<const char *, bool *> flags[] = {
      {"--json", &o->json}, {"--power-off", &o->powerOff}, {"--nvme", &o->nvme}};
  ArgParser parser(kName, PrintHelp);
  for (Valued &v : valued) parser.Value(v.flag, v.value, &v.given);
  for (const auto &[flag, value] : flags) parser.Flag(flag, value);
  AddLinuxMediaOptions(&parser, &o->media);
  std::vector<std::string> positional;
  if (int rc = parser.Parse(args, &positional); rc >= 0) return rc;
  if (positional.size() != 1) return UsageError(kName, "expected exactly one IMAGE");
  o->image = positional[0];
  for (int required : {kUser, kFullName, kOut}) {
    if (!valued[required].given) {
      return UsageError(kName, std::string(valued[required].flag) + " is required");
    }
  }
  // Each password comes from the command line or from a file, not both.
  const struct {
    int text, file;
    std::string *value;
    const char *file_path;
  } secrets[] = {{kPassword, kPasswordFile, &o->password, passwordFile.c_str()},
                 {kRoot, kRootFile, &o->rootPassword, rootFile.c_str()}};
  for (const auto &s : secrets) {
    if (valued[s.text].given && valued[s.file].given) {
      return UsageError(kName, std::string("give ") + valued[s.text].flag + " or " +
                                   valued[s.file].flag + ", not both");
    }
    if (valued[s.file].given && !ReadFirstLine(s.file_path, s.value)) {
      std::fprintf(stderr, "tvxguest %s: cannot read %s\n", kName, s.file_path);
      return 1;
    }
  }
  if (!valued[kPassword].given && !valued[kPasswordFile].given) {
    return UsageError(kName, "--password or --password-file is required");
  }
  o->haveRoot = valued[kRoot].given || valued[kRootFile].given;
  o->haveKey = valued[kKey].given;
  return -1;
}

// FilesBelow lists the files among the committed entries and in the
// committed directories (Ubuntu's "custom").
std::vector<std::string> FilesBelow(const std::vector<std::string> &entries) {
  std::vector<std::string> files;
  std::error_code ec;
  for (const std::string &e : entries) {
    if (!fs::is_directory(fs::symlink_status(e, ec))) {
      files.push_back(e);
      continue;
    }
    for (auto it = fs::recursive_directory_iterator(e, ec);
         !ec && it != fs::recursive_directory_iterator(); it.increment(ec)) {
      if (it->is_regular_file(ec)) files.push_back(it->path().string());
    }
  }
  return files;
}

int Run(const std::vector<std::string> &args) {
  Options o;
  int rc = Parse(args, &o);
  if (rc >= 0) return rc;

  GuessResult guess;
  bool supported;
  if (int status = RecogniseForAnswers(kName, o.image, o.json, &guess, &supported); status >= 0) {
    return status;
  }

  // The library's reasons are collected so that a failure can show them
  // without -v.
  std::vector<std::string> log, files;
  StagedOutput stage(o.out);
  std::string error;
  bool ok = stage.Open(&error);
  if (!ok) log.push_back("cannot make a staging directory for " + o.out + ": " + error);
  if (ok) {
    LogLines capture;
    ok = AutoInstall_PrepareAnswerFileEx_Linux(
        guess.guestOS, guess.version, stage.dir().c_str(), o.user.c_str(), o.fullName.c_str(),
        o.password.c_str(), (o.haveRoot ? o.rootPassword : o.password).c_str(),
        o.haveKey ? o.key.c_str() : nullptr, o.powerOff, 0, o.nvme);
    log = capture.lines;
    if (!ok && log.empty()) {
      log.push_back(std::string("no Linux answer file is made for ") + guess.guestOS);
    }
  }
  // The media are made from the staged answer file, which moves into --out
  // last: a medium that cannot be made leaves nothing new in either folder.
  std::vector<std::string> media;
  ok = ok && ContinueWithMedia(o.image, guess, stage.dir(), o.media, o.json, &media, &log);
  if (ok && !stage.Commit(&error)) {
    ok = false;
    log.push_back("cannot move the answer file into " + o.out + ": " + error);
    for (const std::string &m : media) log.push_back("written all the same: " + m);
  }
  if (ok) {
    files = FilesBelow(stage.committed());
    files.insert(files.end(), media.begin(), media.end());
  }

  return ReportAnswers({kName, &o.image, &guess, static_cast<bool>(ok), static_cast<bool>(supported),
                        nullptr, &files, &log, "the answer file was not written"},
                       o.json);
}

const SubcommandRegistration kRegistration(
    kUnattendedGroup, {"linux", "write the Linux answer file for an install image", Run});

}  // namespace
}  // namespace tvxcli
