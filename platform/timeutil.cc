// The host zone comes from the environment and the system's zone link; ICU
// (with CLDR's Windows zone mapping) names the Windows zone; the index
// numbers of the pre-Vista zone list are tabled below, since nothing on a
// Linux host carries them.
#include "platform/timeutil.h"

#include <unicode/ucal.h>

#include <cstdlib>
#include <cstring>
#include <fstream>
#include <string>

#include <climits>
#include <unistd.h>

#include "platform/dynlib.h"

namespace {

struct WindowsZoneIndex {
  const char *name;
  int index;
};

// Windows names as CLDR spells them today. Zones added after the numbered
// list was frozen have no number and are absent. Where the old list named a
// zone by its region and CLDR has since moved that name to other rules (old
// "Samoa" at UTC-11, "Mid-Atlantic" at UTC-2), the number is kept for the
// fixed-offset zone that has the old rules. UTC itself has no number; the
// Greenwich zone has its offset and no daylight saving.
constexpr WindowsZoneIndex kZoneIndexes[] = {
    {"Dateline Standard Time", 0},
    {"UTC-11", 1},
    {"Hawaiian Standard Time", 2},
    {"Alaskan Standard Time", 3},
    {"Pacific Standard Time", 4},
    {"Mountain Standard Time", 10},
    {"Mountain Standard Time (Mexico)", 13},
    {"US Mountain Standard Time", 15},
    {"Central Standard Time", 20},
    {"Canada Central Standard Time", 25},
    {"Central Standard Time (Mexico)", 30},
    {"Central America Standard Time", 33},
    {"Eastern Standard Time", 35},
    {"US Eastern Standard Time", 40},
    {"SA Pacific Standard Time", 45},
    {"Atlantic Standard Time", 50},
    {"SA Western Standard Time", 55},
    {"Pacific SA Standard Time", 56},
    {"Newfoundland Standard Time", 60},
    {"E. South America Standard Time", 65},
    {"SA Eastern Standard Time", 70},
    {"Greenland Standard Time", 73},
    {"UTC-02", 75},
    {"Azores Standard Time", 80},
    {"Cape Verde Standard Time", 83},
    {"GMT Standard Time", 85},
    {"Greenwich Standard Time", 90},
    {"UTC", 90},
    {"Central Europe Standard Time", 95},
    {"Central European Standard Time", 100},
    {"Romance Standard Time", 105},
    {"W. Europe Standard Time", 110},
    {"W. Central Africa Standard Time", 113},
    {"E. Europe Standard Time", 115},
    {"Egypt Standard Time", 120},
    {"FLE Standard Time", 125},
    {"GTB Standard Time", 130},
    {"Israel Standard Time", 135},
    {"South Africa Standard Time", 140},
    {"Russian Standard Time", 145},
    {"Arab Standard Time", 150},
    {"E. Africa Standard Time", 155},
    {"Arabic Standard Time", 158},
    {"Iran Standard Time", 160},
    {"Arabian Standard Time", 165},
    {"Caucasus Standard Time", 170},
    {"Afghanistan Standard Time", 175},
    {"Ekaterinburg Standard Time", 180},
    {"West Asia Standard Time", 185},
    {"India Standard Time", 190},
    {"Nepal Standard Time", 193},
    {"Central Asia Standard Time", 195},
    {"Sri Lanka Standard Time", 200},
    {"N. Central Asia Standard Time", 201},
    {"Myanmar Standard Time", 203},
    {"SE Asia Standard Time", 205},
    {"North Asia Standard Time", 207},
    {"China Standard Time", 210},
    {"Singapore Standard Time", 215},
    {"Taipei Standard Time", 220},
    {"W. Australia Standard Time", 225},
    {"North Asia East Standard Time", 227},
    {"Korea Standard Time", 230},
    {"Tokyo Standard Time", 235},
    {"Yakutsk Standard Time", 240},
    {"AUS Central Standard Time", 245},
    {"Cen. Australia Standard Time", 250},
    {"AUS Eastern Standard Time", 255},
    {"E. Australia Standard Time", 260},
    {"Tasmania Standard Time", 265},
    {"Vladivostok Standard Time", 270},
    {"West Pacific Standard Time", 275},
    {"Central Pacific Standard Time", 280},
    {"Fiji Standard Time", 285},
    {"New Zealand Standard Time", 290},
    {"Tonga Standard Time", 300},
};

// ZoneFromPath takes the zone id out of a path into a zoneinfo tree
// ("/usr/share/zoneinfo/Europe/Berlin", "../usr/share/zoneinfo/posix/UTC").
std::string ZoneFromPath(const std::string &path) {
  static constexpr char kMarker[] = "zoneinfo/";
  size_t at = path.rfind(kMarker);
  if (at == std::string::npos) return std::string();
  std::string id = path.substr(at + sizeof kMarker - 1);
  // The posix/ and right/ subtrees hold the same zones with other leap-second
  // handling; the id is the part below them.
  for (const char *sub : {"posix/", "right/"}) {
    if (id.rfind(sub, 0) == 0) id.erase(0, std::strlen(sub));
  }
  return id;
}

std::string HostZoneId() {
  const char *tz = std::getenv("TZ");
  if (tz != nullptr && *tz != '\0') {
    std::string id = tz[0] == ':' ? tz + 1 : tz;
    if (!id.empty() && id[0] == '/') id = ZoneFromPath(id);
    if (!id.empty()) return id;
  }
  char link[PATH_MAX];
  ssize_t n = readlink("/etc/localtime", link, sizeof link - 1);
  if (n > 0) {
    link[n] = '\0';
    std::string id = ZoneFromPath(link);
    if (!id.empty()) return id;
  }
  std::ifstream in("/etc/timezone");
  std::string line;
  if (in && std::getline(in, line)) {
    size_t end = line.find_last_not_of(" \t\r");
    if (end != std::string::npos) return line.substr(0, end + 1);
  }
  return std::string();
}

// ICU's entry points carry its major version in their names
// (ucal_getDefaultTimeZone_72); its headers' renaming macros spell them.
#define TVX_NAME_OF(x) #x
#define TVX_ICU_NAME(x) TVX_NAME_OF(x)

struct IcuApi {
  decltype(&ucal_getDefaultTimeZone) getDefaultTimeZone;
  decltype(&ucal_getWindowsTimeZoneID) getWindowsTimeZoneID;
};

// LoadIcu opens ICU on first use (see dynlib.h): only answer files need a
// zone name, and linking ICU would slow every process's start-up. Null when
// it cannot be loaded.
const IcuApi *LoadIcu() {
  return tvx::LoadOnce<IcuApi>([](IcuApi *api) {
    tvx::DynLib lib("libicui18n.so." TVX_ICU_NAME(U_ICU_VERSION_MAJOR_NUM));
    return lib.Resolve(TVX_ICU_NAME(ucal_getDefaultTimeZone), &api->getDefaultTimeZone) &&
           lib.Resolve(TVX_ICU_NAME(ucal_getWindowsTimeZoneID), &api->getWindowsTimeZoneID);
  });
}

// Zone identifiers, in both ICU's and the tz database's spelling, are ASCII;
// anything else is no zone either knows.
bool AsciiFromUChars(const UChar *in, int32_t len, char *out) {
  for (int32_t i = 0; i < len; ++i) {
    if (in[i] == 0 || in[i] > 0x7E) return false;
    out[i] = static_cast<char>(in[i]);
  }
  out[len] = '\0';
  return true;
}

// IcuDefaultZoneId asks ICU, which has its own ways of finding the host zone.
std::string IcuDefaultZoneId() {
  const IcuApi *icu = LoadIcu();
  if (icu == nullptr) return std::string();
  UChar buf[128];
  UErrorCode status = U_ZERO_ERROR;
  int32_t len = icu->getDefaultTimeZone(buf, 128, &status);
  char out[128];
  if (U_FAILURE(status) || len <= 0 || len >= 128 || !AsciiFromUChars(buf, len, out)) {
    return std::string();
  }
  return std::string(out);
}

}  // namespace

int TimeUtil_WindowsZoneIndex(const char *windowsName) {
  if (windowsName == nullptr) return -1;
  for (const WindowsZoneIndex &row : kZoneIndexes) {
    if (std::strcmp(row.name, windowsName) == 0) return row.index;
  }
  return -1;
}

int TimeUtil_WindowsZoneForId(const char *zoneId, char **out_name) {
  if (out_name != nullptr) *out_name = nullptr;
  if (zoneId == nullptr || *zoneId == '\0') return -1;
  const IcuApi *icu = LoadIcu();
  if (icu == nullptr) return -1;
  UChar id[128];
  int32_t idLen = 0;
  for (; zoneId[idLen] != '\0'; ++idLen) {
    auto c = static_cast<unsigned char>(zoneId[idLen]);
    if (idLen == 127 || c > 0x7E) return -1;
    id[idLen] = c;
  }

  UChar win[128];
  UErrorCode status = U_ZERO_ERROR;
  int32_t winLen = icu->getWindowsTimeZoneID(id, idLen, win, 128, &status);
  // CLDR's Windows names are plain ASCII.
  char name[128];
  if (U_FAILURE(status) || winLen <= 0 || winLen >= 128 || !AsciiFromUChars(win, winLen, name)) {
    return -1;
  }
  if (out_name != nullptr) {
    *out_name = strdup(name);
    if (*out_name == nullptr) return -1;
  }
  return TimeUtil_WindowsZoneIndex(name);
}

int TimeUtil_GetLocalWindowsTimeZoneIndexAndName(char **out_name) {
  if (out_name != nullptr) *out_name = nullptr;
  std::string id = HostZoneId();
  char *name = nullptr;
  int index = TimeUtil_WindowsZoneForId(id.c_str(), &name);
  if (name == nullptr) {
    index = TimeUtil_WindowsZoneForId(IcuDefaultZoneId().c_str(), &name);
  }
  if (out_name != nullptr) {
    *out_name = name;
  } else {
    std::free(name);
  }
  return index;
}
