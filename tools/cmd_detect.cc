// tvxguest detect: which guest OS an install image holds, for one image or
// a shelf of them in one process.
#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include "arg_parser.h"
#include "command.h"
#include "json.h"
#include "tvx_guess.h"

namespace tvxcli {
namespace {

constexpr char kUsage[] =
    "Usage: tvxguest detect [--json] IMAGE\n"
    "       tvxguest detect [--json] [-r DIR]... [IMAGE]...\n\n"
    "Recognises the guest operating system on UDF or ISO 9660 install images.\n\n"
    "With one IMAGE: its details (human), or one JSON object (--json).\n"
    "With several IMAGEs or -r: one line per image, in the order given, each\n"
    "directory's images sorted by path; an image that fails is reported and\n"
    "the rest are still done.\n\n"
    "Options:\n"
    "  --json      print JSON: one object with the keys result, guestOS,\n"
    "              guestOSOverride, version, versionName, noIsolinuxConfig,\n"
    "              versionText, language, languageShort, languages, editions,\n"
    "              displayName, displayText; for several images JSON Lines,\n"
    "              one such object per image with its \"path\" added\n"
    "  -r DIR      every image below DIR: regular files named *.iso, *.img or\n"
    "              *.udf (any letter case); symbolic links are not followed\n"
    "  -h, --help  show this help\n\n"
    "Exit status: 0 every image recognised, 1 some not recognised, 2 some\n"
    "could not be opened (or a DIR could not be read), 64 usage error.\n";

std::string DisplayText(const GuessResult &r) {
  const char *key = Guess_GetOsKey(&r);
  if (key == nullptr) return "";
  char *text = Guess_GetVersionString(key, &r);
  std::string out = text != nullptr ? text : key;
  std::free(text);
  return out;
}

const char *VersionName(uint32_t version) {
  return version <= GUESS_VERSION_DUMMY_LAST ? Guess_GetSubString(static_cast<GuessVersion>(version))
                                             : "";
}

// PrintJson prints the result as one line; with a path (batch mode) the
// path comes first.
void PrintJson(int rc, const GuessResult &r, const std::string *path) {
  JsonObject o;
  if (path != nullptr) o.Str("path", *path);
  o.Num("result", rc)
      .StrOrNull("guestOS", r.guestOS)
      .StrOrNull("guestOSOverride", r.guestOSOverride)
      .Num("version", r.version)
      .Str("versionName", VersionName(r.version))
      .Bool("noIsolinuxConfig", r.noIsolinuxConfig != 0)
      .Str("versionText", r.versionText)
      .Str("language", r.language)
      .Str("languageShort", r.languageShort)
      .Str("languages", r.languages)
      .Str("editions", r.editions)
      .Str("displayName", r.displayName)
      .Str("displayText", DisplayText(r));
  std::printf("%s\n", o.Text().c_str());
}

// Lists joined by "?" read better one item after another.
std::string Items(const char *list) {
  std::string out;
  for (const char *p = list; *p != '\0';) {
    const char *q = std::strchr(p, '?');
    size_t n = q != nullptr ? static_cast<size_t>(q - p) : std::strlen(p);
    if (!out.empty()) out += ", ";
    out.append(p, n);
    p += n + (q != nullptr ? 1 : 0);
  }
  return out;
}

void PrintHuman(const std::string &image, int rc, const GuessResult &r) {
  if (rc != 0) {
    std::printf("%s: not recognised\n", image.c_str());
    return;
  }
  std::printf("%s: %s\n", image.c_str(), DisplayText(r).c_str());
  auto line = [](const char *label, const std::string &value) {
    if (!value.empty()) std::printf("  %-17s %s\n", label, value.c_str());
  };
  line("guest OS:", r.guestOS);
  line("guest OS (64-bit):", r.guestOSOverride != nullptr ? r.guestOSOverride : "");
  if (r.version != GUESS_VERSION_UNKNOWN) {
    line("version class:", std::to_string(r.version) + " " + VersionName(r.version));
  }
  line("version:", r.versionText);
  line("language:", r.language);
  line("languages:", Items(r.languages));
  line("editions:", Items(r.editions));
  if (r.noIsolinuxConfig) line("boot config:", "no isolinux configuration");
}

void ReportUnopenable(const std::string &image) {
  FILE *f = std::fopen(image.c_str(), "rb");
  if (f == nullptr) {
    std::fprintf(stderr, "tvxguest detect: cannot open '%s': %s\n", image.c_str(),
                 std::strerror(errno));
    return;
  }
  std::fclose(f);
  std::fprintf(stderr, "tvxguest detect: '%s' is neither a UDF nor an ISO 9660 image\n",
               image.c_str());
}

bool LooksLikeImage(const std::filesystem::path &p) {
  std::string ext = p.extension().string();
  for (char &c : ext) c = static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c);
  return ext == ".iso" || ext == ".img" || ext == ".udf";
}

// Collect appends the images below `dir`, sorted so that the output does not
// depend on the order the file system lists them in. False (reported) when
// the walk cannot be done or finished.
bool Collect(const std::string &dir, std::vector<std::string> *out) {
  namespace fs = std::filesystem;
  std::error_code ec;
  std::vector<std::string> found;
  fs::recursive_directory_iterator it(dir, fs::directory_options::none, ec), end;
  for (; !ec && it != end; it.increment(ec)) {
    if (it->is_regular_file(ec) && !it->is_symlink(ec) && LooksLikeImage(it->path())) {
      found.push_back(it->path().string());
    }
  }
  std::sort(found.begin(), found.end());
  out->insert(out->end(), found.begin(), found.end());
  if (ec) {
    std::fprintf(stderr, "tvxguest detect: cannot read '%s': %s\n", dir.c_str(),
                 ec.message().c_str());
    return false;
  }
  return true;
}

// DetectOne recognises one image of a batch and prints its line.
int DetectOne(const std::string &image, bool json) {
  GuessResult result;
  int rc = Guess_Guest(image.c_str(), nullptr, &result);
  if (rc == 2) ReportUnopenable(image);
  if (json) {
    PrintJson(rc, result, &image);
  } else if (rc == 0) {
    std::printf("%s: %s\n", image.c_str(), DisplayText(result).c_str());
  } else {
    std::printf("%s: %s\n", image.c_str(), rc == 1 ? "not recognised" : "cannot be opened");
  }
  return rc;
}

int Run(const std::vector<std::string> &args) {
  bool json = false;
  // In the order given; a directory is one entry until it is walked.
  std::vector<std::pair<bool, std::string>> targets;
  auto add = [&targets](bool isDir) {
    return [&targets, isDir](const std::string &name) {
      targets.emplace_back(isDir, name);
      return std::string();
    };
  };
  int parsed = ArgParser("detect", [] { std::fputs(kUsage, stdout); })
                   .Flag("--json", &json)
                   .Value("-r", add(true))
                   .Positional(add(false))
                   .Parse(args);
  if (parsed >= 0) return parsed;
  if (targets.empty()) return UsageError("detect", "IMAGE is missing");

  if (targets.size() == 1 && !targets[0].first) {
    const std::string &image = targets[0].second;
    GuessResult result;
    int rc = Guess_Guest(image.c_str(), nullptr, &result);
    if (rc == 2) ReportUnopenable(image);
    if (json) {
      PrintJson(rc, result, nullptr);
    } else if (rc != 2) {
      PrintHuman(image, rc, result);
    }
    return rc;
  }

  int worst = 0;
  std::vector<std::string> images;
  for (const auto &[isDir, name] : targets) {
    if (!isDir) {
      images.push_back(name);
    } else if (!Collect(name, &images)) {
      worst = 2;
    }
  }
  for (const std::string &image : images) {
    worst = std::max(worst, DetectOne(image, json));
    // One line per image as it is done: a reader of a pipe sees progress.
    std::fflush(stdout);
  }
  return worst;
}

const CommandRegistration kRegistration({"detect", "recognise the guest OS on an install image",
                                         Run});

}  // namespace
}  // namespace tvxcli
