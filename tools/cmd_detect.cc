// tvxguest detect: which guest OS an install image holds.
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "command.h"
#include "json.h"
#include "tvx_guess.h"

namespace tvxcli {
namespace {

constexpr char kUsage[] =
    "Usage: tvxguest detect [--json] IMAGE\n\n"
    "Recognises the guest operating system on a UDF or ISO 9660 install image.\n\n"
    "Options:\n"
    "  --json      print one JSON object (result, guestOS, guestOSOverride, version,\n"
    "              versionName, noIsolinuxConfig, versionText, language,\n"
    "              languageShort, languages, editions, displayName, displayText)\n"
    "  -h, --help  show this help\n\n"
    "Exit status: 0 recognised, 1 not recognised, 2 the image cannot be opened,\n"
    "64 usage error.\n";

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

void PrintJson(int rc, const GuessResult &r) {
  JsonObject o;
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

int Run(const std::vector<std::string> &args) {
  bool json = false;
  std::string image;
  bool options = true;
  for (const std::string &a : args) {
    if (options && IsHelp(a)) {
      std::fputs(kUsage, stdout);
      return 0;
    }
    if (options && a == "--json") {
      json = true;
    } else if (options && a == "--") {
      options = false;
    } else if (options && a.size() > 1 && a[0] == '-') {
      return UsageError("detect", "unknown option '" + a + "'");
    } else if (image.empty()) {
      image = a;
    } else {
      return UsageError("detect", "only one IMAGE may be given");
    }
  }
  if (image.empty()) return UsageError("detect", "IMAGE is missing");

  GuessResult result;
  int rc = Guess_Guest(image.c_str(), nullptr, &result);
  if (rc == 2) ReportUnopenable(image);
  if (json) {
    PrintJson(rc, result);
  } else if (rc != 2) {
    PrintHuman(image, rc, result);
  }
  return rc;
}

const CommandRegistration kRegistration({"detect", "recognise the guest OS on an install image",
                                         Run});

}  // namespace
}  // namespace tvxcli
