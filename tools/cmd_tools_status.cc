// tvxguest tools status / save-info: how a virtual machine's guest tools
// stand against the host's tools image, and keeping what the guest reported
// in the machine's extended config file.
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "arg_parser.h"
#include "command_group.h"
#include "json.h"
#include "tools_common.h"
#include "tvx_dictionary.h"
#include "tvx_toolsversion.h"

namespace tvxcli {
namespace {

constexpr const char *kStatusCmd = "tools status";
constexpr const char *kSaveCmd = "tools save-info";

constexpr const char *kStatusUsage =
    "Usage: tvxguest tools status [--guest-manifest FILE] [--tools-version N] [--cert FILE]\n"
    "           [--mode M] [--json] VMCONFIG\n\n"
    "Computes the guest-tools status of the virtual machine whose configuration is\n"
    "VMCONFIG: the guest's manifest (FILE, else the one saved in the machine's\n"
    "extended config file) against \"manifest.txt\" in the verified tools image that\n"
    "serves the guest (below the configuration's \"libdir\") and the signed AVR\n"
    "manifest beside that image; then the legacy tools number against the guest's\n"
    "limits. With -v or --json every component's rating is shown.\n\n"
    "Options:\n"
    "  --guest-manifest FILE  the guest's tools manifest\n"
    "  --tools-version N      legacy tools number (major<<10 | minor<<5 | patch);\n"
    "                         default: read it from the machine's virtual disks\n"
    "  --mode M               -1, 0, 1, or 2 (also: hypervisor guests are not\n"
    "                         applicable); default 0\n"
    "  --cert FILE            trust the maker certificates in FILE for the image\n"
    "                         and the AVR manifest (default: the installed ones)\n"
    "  --json                 print one JSON object\n"
    "  -h, --help             show this help\n\n"
    "Exit status: 0 (the status is printed), 66 VMCONFIG cannot be read, 64 usage\n"
    "error.\n";

constexpr const char *kSaveUsage =
    "Usage: tvxguest tools save-info VMCONFIG [--agent-xml FILE] [--manifest FILE]\n"
    "           [--install-error N] [--counter N]\n\n"
    "Merges what the guest reported into the machine's existing extended config file\n"
    "(\"extendedConfigFile\" of VMCONFIG), rewriting it safely. A FILE that holds\n"
    "just the word \"null\" leaves that part as it is; \"no tools\" forgets it.\n\n"
    "Options:\n"
    "  --agent-xml FILE     the guest update agent's XML report\n"
    "  --manifest FILE      the guest's tools manifest\n"
    "  --install-error N    the last installation's error code (saved with --counter)\n"
    "  --counter N          the update counter; 0 (default) saves no install info\n"
    "  -h, --help           show this help\n\n"
    "Exit status: 0 saved (or nothing to save), 1 not saved (the file is unchanged;\n"
    "reasons on standard error), 66 a FILE cannot be read, 64 usage error.\n";

bool ParseInt(const std::string &text, long long lo, long long hi, long long *out) {
  if (text.empty()) return false;
  errno = 0;
  char *end = nullptr;
  long long v = std::strtoll(text.c_str(), &end, 0);
  if (errno != 0 || *end != '\0' || v < lo || v > hi) return false;
  *out = v;
  return true;
}

// IntOption takes an option's value as a number within lo..hi.
ArgParser::Take IntOption(long long lo, long long hi, long long *out, const char *error) {
  return [=](const std::string &v) { return ParseInt(v, lo, hi, out) ? std::string() : error; };
}

bool ReadWhole(const std::string &path, std::string *out) {
  std::ifstream in(path, std::ios::binary);
  if (!in) return false;
  std::ostringstream s;
  s << in.rdbuf();
  *out = s.str();
  // The words are whole texts to the library; a file's line end is not part of them.
  if (*out == "null\n" || *out == "no tools\n") out->pop_back();
  return true;
}

std::string ComponentJson(const ToolsVersionComponent &c) {
  return JsonObject()
      .Str("name", c.name)
      .Str("rating", ToolsVersion_ComponentStatusText(c.rating))
      .Bool("installed", c.installed != 0)
      .Str("guest", c.guestVersion)
      .Str("host", c.hostVersion)
      .Str("avrMin", c.avrMin)
      .Str("avrMax", c.avrMax)
      .Str("avrIllegal", c.avrIllegal)
      .Text();
}

std::string ReportJson(const ToolsVersionReport &r) {
  JsonObject o;
  o.Num("status", r.status)
      .Str("statusName", ToolsVersion_StatusName(r.status))
      .Bool("evaluated", r.evaluated != 0)
      .Num("manifestStatus", r.manifestStatus)
      .Bool("savedStatus", r.savedStatus != 0)
      .StrOrNull("reason", r.reason)
      .Num("toolsVersion", r.toolsVersion)
      .Num("minVersion", r.minVersion)
      .Num("maxVersion", r.maxVersion);
  if (!r.evaluated) return o.Text();
  std::string components = "[";
  std::array<std::vector<std::string>, 10> buckets;
  for (size_t i = 0; i < r.numComponents; i++) {
    if (i > 0) components += ",";
    components += ComponentJson(r.components[i]);
    if (r.components[i].rating < buckets.size()) {
      buckets[r.components[i].rating].push_back(r.components[i].name);
    }
  }
  JsonObject b;
  for (uint32_t i = 0; i < buckets.size(); i++) {
    if (!buckets[i].empty()) b.StrArray(ToolsVersion_ComponentStatusText(i), buckets[i]);
  }
  return o.Raw("monolithic", ComponentJson(r.monolithic))
      .Raw("components", components + "]")
      .Raw("buckets", b.Text())
      .Text();
}

void PrintComponents(const ToolsVersionReport &r) {
  std::printf("  %-24s %-24s %-14s %s %-14s %-14s %-14s %s\n", "component", "rating", "guest", "I",
              "host", "AVR min", "AVR max", "AVR illegal");
  auto row = [](const ToolsVersionComponent &c) {
    std::printf("  %-24s %-24s %-14s %c %-14s %-14s %-14s %s\n", c.name,
                ToolsVersion_ComponentStatusText(c.rating), c.guestVersion, c.installed ? 'Y' : 'N',
                c.hostVersion, c.avrMin, c.avrMax, c.avrIllegal);
  };
  row(r.monolithic);
  for (size_t i = 0; i < r.numComponents; i++) row(r.components[i]);
}

int Status(const std::vector<std::string> &args) {
  std::string guestManifest, config, cert;
  long long toolsVersion = TOOLS_VERSION_FROM_DISKS, mode = 0;
  bool json = false;
  int parsed = ArgParser(kStatusCmd, [] { std::fputs(kStatusUsage, stdout); })
                   .Value("--guest-manifest", &guestManifest)
                   .Value("--tools-version",
                          IntOption(0, 0xFFFFFFFFLL, &toolsVersion,
                                    "--tools-version needs a number from 0 to 4294967295"))
                   .Value("--mode", IntOption(INT32_MIN, INT32_MAX, &mode, "--mode needs a number"))
                   .Value("--cert", &cert)
                   .Flag("--json", &json)
                   .Positional(ArgParser::Single(&config, "VMCONFIG"))
                   .Parse(args);
  if (parsed >= 0) return parsed;
  if (config.empty()) return UsageError(kStatusCmd, "VMCONFIG is missing");

  Dictionary *dict = Dictionary_Create();
  if (!Dictionary_LoadEx(dict, config.c_str(), nullptr)) {
    Dictionary_Free(dict);
    std::fprintf(stderr, "tvxguest %s: cannot read the configuration '%s'\n", kStatusCmd,
                 config.c_str());
    return 66;
  }
  ToolsVersionReport *report = nullptr;
  {
    LogLines log;
    ToolsVersion_GetStatusReport(config.c_str(), dict,
                                 guestManifest.empty() ? nullptr : guestManifest.c_str(), nullptr,
                                 static_cast<uint32_t>(toolsVersion), static_cast<int32_t>(mode),
                                 cert.empty() ? nullptr : cert.c_str(), &report);
  }
  Dictionary_Free(dict);
  if (report == nullptr) return 70;
  if (json) {
    std::printf("%s\n", ReportJson(*report).c_str());
  } else {
    std::printf("status: %s (%u)\n", ToolsVersion_StatusName(report->status), report->status);
    if (report->savedStatus) std::printf("from:   the status saved in the extended config file\n");
    if (report->reason != nullptr) std::printf("why:    %s\n", report->reason);
    if (report->minVersion != 0) {
      std::printf("legacy: %u (limits %u to %u)\n", report->toolsVersion, report->minVersion,
                  report->maxVersion);
    }
    if (Verbose() && report->evaluated) PrintComponents(*report);
  }
  ToolsVersion_FreeReport(report);
  return 0;
}

int SaveInfo(const std::vector<std::string> &args) {
  std::string config, agentPath, manifestPath;
  long long installError = 0, counter = 0;
  int parsed = ArgParser(kSaveCmd, [] { std::fputs(kSaveUsage, stdout); })
                   .Value("--agent-xml", &agentPath)
                   .Value("--manifest", &manifestPath)
                   .Value("--install-error", IntOption(INT32_MIN, INT32_MAX, &installError,
                                                       "--install-error needs a 32-bit number"))
                   .Value("--counter", IntOption(INT32_MIN, INT32_MAX, &counter,
                                                 "--counter needs a 32-bit number"))
                   .Positional(ArgParser::Single(&config, "VMCONFIG"))
                   .Parse(args);
  if (parsed >= 0) return parsed;
  if (config.empty()) return UsageError(kSaveCmd, "VMCONFIG is missing");
  std::string agent, manifest;
  for (auto [path, text] : {std::pair{&agentPath, &agent}, std::pair{&manifestPath, &manifest}}) {
    if (!path->empty() && !ReadWhole(*path, text)) {
      std::fprintf(stderr, "tvxguest %s: cannot read '%s'\n", kSaveCmd, path->c_str());
      return 66;
    }
  }
  LogLines log;
  if (!ToolsVersion_SaveXmlInfo(config.c_str(), agent.c_str(), manifest.c_str(),
                                static_cast<int32_t>(installError),
                                static_cast<int32_t>(counter))) {
    std::fprintf(stderr, "tvxguest %s: not saved\n", kSaveCmd);
    log.Print(stderr);
    return 1;
  }
  std::printf("saved\n");
  return 0;
}

const SubcommandRegistration kStatus(kToolsGroup,
                                     {"status", "how a machine's guest tools stand, and why",
                                      Status});
const SubcommandRegistration kSave(kToolsGroup,
                                   {"save-info", "keep the guest's tools reports beside its config",
                                    SaveInfo});

}  // namespace
}  // namespace tvxcli
