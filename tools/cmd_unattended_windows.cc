// tvxguest unattended windows: recognise a Windows install image and write
// its answer files. It joins the `unattended` command group, and is left out
// of a tool built without that group.
#include <algorithm>
#include <cstdio>
#include <cstring>
#include <cstdlib>
#include <fstream>
#include <string>
#include <utility>
#include <vector>

#include "arg_parser.h"
#include "command.h"
#include "json.h"
#include "tvx_autoinstall.h"
#include "tvx_autoinstall_windows.h"
#include "tvx_guess.h"
#include "tvx_log.h"
#include "command_group.h"
#include "floppy_cli.h"
#include "log_lines.h"
#include "staged_output.h"
#include "unattended_common.h"

namespace tvxcli {
namespace {

constexpr char kName[] = "unattended windows";

void PrintHelp() {
  std::printf(
      "Usage: tvxguest unattended windows [OPTIONS] --out DIR IMAGE\n\n"
      "Recognise the Windows install image IMAGE and write its answer files into DIR\n"
      "(created when missing): winnt.sif, autoun~0.xml and, with --storepwd, storePwd.ini.\n"
      "The answers are checked first (no control characters, quotes or semicolons,\n"
      "within the guest's limits); the files are prepared beside DIR and moved into it\n"
      "only when all of them are complete. They are readable by their owner only.\n\n"
      "Options:\n"
      "  --sif FILE            template of winnt.sif (required)\n"
      "  --xml FILE            template of the unattend XML (required)\n"
      "  --storepwd FILE       template of storePwd.ini\n"
      "  --image-name NAME     Windows image to install, e.g. \"Windows 10 Pro\" (required)\n"
      "  --full-name NAME      owner and local account name (required)\n"
      "  --password TEXT       account password (default: none)\n"
      "  --password-file FILE  read the password from the first line of FILE\n"
      "  --product-key KEY     product key (default: none)\n"
      "  --language LANG       installation language (default: en-US, or English\n"
      "                        before Vista)\n"
      "  --no-autologon        stop automatic logon after the first logon\n"
      "  --keep-partitions     keep the template's disk layout\n"
      "  --out DIR             output directory (required)\n"
      "  --json                print one JSON object instead of text\n"
      "  -h, --help            show this help\n\n"
      "Exit status: 0 written, 1 not recognised or not written, 2 IMAGE cannot be\n"
      "opened, 64 usage error. Templates ship in share/tvxguest/windows.\n");
  std::fputs(WindowsFloppyOptions::Help(), stdout);
}

struct Options {
  std::string sif, xml, storePwd, imageName, fullName, password, productKey, language, out, image;
  bool haveStorePwd = false, havePassword = false, haveKey = false, haveLanguage = false;
  bool autoLogon = true, keepPartitions = false, json = false;
  WindowsFloppyOptions floppy;
};

// Parse fills `o`; returns -1 to go on, else the exit status.
int Parse(const std::vector<std::string> &args, Options *o) {
  std::string passwordFile;
  bool havePasswordFile = false, noAutoLogon = false;
  ArgParser parser(kName, PrintHelp);
  parser.Value("--sif", &o->sif)
      .Value("--xml", &o->xml)
      .Value("--storepwd", &o->storePwd, &o->haveStorePwd)
      .Value("--image-name", &o->imageName)
      .Value("--full-name", &o->fullName)
      .Value("--password", &o->password, &o->havePassword)
      .Value("--password-file", &passwordFile, &havePasswordFile)
      .Value("--product-key", &o->productKey, &o->haveKey)
      .Value("--language", &o->language, &o->haveLanguage)
      .Value("--out", &o->out)
      .Flag("--json", &o->json)
      .Flag("--no-autologon", &noAutoLogon)
      .Flag("--keep-partitions", &o->keepPartitions);
  o->floppy.AddTo(&parser);
  std::vector<std::string> positional;
  if (int rc = parser.Parse(args, &positional); rc >= 0) return rc;
  o->autoLogon = !noAutoLogon;
  if (positional.size() != 1) return UsageError(kName, "expected exactly one IMAGE");
  o->image = positional[0];
  const std::pair<const std::string *, const char *> required[] = {
      {&o->sif, "--sif"},
      {&o->xml, "--xml"},
      {&o->imageName, "--image-name"},
      {&o->fullName, "--full-name"},
      {&o->out, "--out"},
  };
  for (const auto &[value, flag] : required) {
    if (value->empty()) return UsageError(kName, std::string(flag) + " is required");
  }
  if (int r = o->floppy.Check(kName); r >= 0) return r;
  if (havePasswordFile) {
    if (o->havePassword) return UsageError(kName, "give --password or --password-file, not both");
    if (!ReadFirstLine(passwordFile, &o->password)) {
      std::fprintf(stderr, "tvxguest %s: cannot read %s\n", kName, passwordFile.c_str());
      return 1;
    }
    o->havePassword = true;
  }
  return -1;
}

// Editions of a Vista-or-newer medium come as "name?name?...".
std::vector<std::string> SplitEditions(const char *list) {
  std::vector<std::string> out;
  std::string cur;
  for (const char *p = list; *p != '\0'; ++p) {
    if (*p == '?') {
      if (!cur.empty()) out.push_back(cur);
      cur.clear();
    } else {
      cur += *p;
    }
  }
  if (!cur.empty()) out.push_back(cur);
  return out;
}

// FileOrder lists the answer files in the order the help names them.
int FileOrder(const std::string &path) {
  const char *names[] = {"winnt.sif", "autoun~0.xml", "storePwd.ini"};
  for (int i = 0; i < 3; ++i) {
    if (path.size() >= std::strlen(names[i]) &&
        path.compare(path.size() - std::strlen(names[i]), std::string::npos, names[i]) == 0) {
      return i;
    }
  }
  return 3;
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
  std::vector<std::string> editions = SplitEditions(guess.editions);
  bool offered = editions.empty();
  for (const std::string &e : editions) offered = offered || e == o.imageName;
  if (!offered && !o.json) {
    std::fprintf(stderr, "tvxguest %s: note: the medium does not list \"%s\"; it offers:\n",
                 kName, o.imageName.c_str());
    for (const std::string &e : editions) std::fprintf(stderr, "  %s\n", e.c_str());
  }

  // Every answer is checked before anything is written: a line end or a
  // quote in a text bound for winnt.sif would add keys to it.
  const struct {
    const char *label;
    const std::string *text;
    bool given;
    AnswerKind kind;
  } answers[] = {
      {"--full-name", &o.fullName, true, AnswerKind::kName},
      {"--password", &o.password, o.havePassword, AnswerKind::kPassword},
      {"--product-key", &o.productKey, o.haveKey, AnswerKind::kOther},
  };
  for (const auto &a : answers) {
    if (!a.given) continue;
    std::string why = CheckAnswer(guess, a.label, *a.text, a.kind, true);
    if (!why.empty()) {
      std::fprintf(stderr, "tvxguest %s: %s\n", kName, why.c_str());
      return 1;
    }
  }

  // The files are prepared beside --out and moved in only when all of them
  // are complete, so a failure leaves nothing new in --out.
  StagedOutput stage(o.out);
  std::string stageError;
  if (!stage.Open(&stageError)) {
    std::fprintf(stderr, "tvxguest %s: cannot prepare %s: %s\n", kName, o.out.c_str(),
                 stageError.c_str());
    return 1;
  }

  // The library's reasons are collected so that a failure can show them
  // without -v.
  LogLines capture;
  std::vector<std::string> &log = capture.lines;
  Bool ok = AutoInstall_PrepareAnswerFileEx(
      o.sif.c_str(), o.xml.c_str(), o.haveStorePwd ? o.storePwd.c_str() : nullptr,
      o.haveKey ? o.productKey.c_str() : nullptr, o.fullName.c_str(),
      o.havePassword ? o.password.c_str() : nullptr, guess.guestOS,
      static_cast<GuessVersion>(guess.version), stage.dir().c_str(),
      o.haveLanguage ? o.language.c_str() : nullptr, o.imageName.c_str(), o.autoLogon,
      o.keepPartitions);
  if (ok && o.floppy.wanted) ok = o.floppy.Make(stage.dir());
  if (ok && !stage.Commit(&stageError)) {
    log.push_back("cannot move the answer files into " + o.out + ": " + stageError);
    ok = FALSE;
  }
  std::vector<std::string> files = ok ? stage.committed() : std::vector<std::string>{};
  std::sort(files.begin(), files.end(), [](const std::string &a, const std::string &b) {
    return FileOrder(a) < FileOrder(b);
  });
  return ReportAnswers({kName, &o.image, &guess, static_cast<bool>(ok), static_cast<bool>(supported),
                        &offered, &files, &log, "the answer files were not written"},
                       o.json);
}

const SubcommandRegistration kRegistration(
    kUnattendedGroup, {"windows", "write the Windows answer files for an install image", Run});

}  // namespace
}  // namespace tvxcli
