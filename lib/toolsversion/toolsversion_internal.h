// Guest-tools status: the pieces behind ToolsVersion_GetStatus and
// ToolsVersion_SaveXmlInfo, shared between their files and the tests.
//
// Flow of one status call: the guest manifest (file, text, or the extended
// config file) becomes a guest dictionary; the host manifest is extracted
// from the verified tools image and, with the signed AVR manifest beside the
// image, loaded into a component table together with the guest dictionary;
// every component is rated; the ratings fall into buckets which decide the
// status; the legacy tools number then checks it against the guest's limits.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/dictionary.h"
#include "platform/hashtable.h"
#include "platform/log.h"
#include "platform/msglist.h"
#include "platform/unique.h"
#include "tvx_toolsversion.h"

// Every line of this subsystem carries its area, whatever the format says.
#define TV_LOG(fmt, ...) Log("ToolsVersion: " fmt, ##__VA_ARGS__)

namespace tvx::toolsversion {

using DictPtr = UniquePtr<Dictionary>;
using TablePtr = UniquePtr<HashTable>;

// --- Versions -------------------------------------------------------------

inline bool IsSet(const ToolsVersionNumber &v) { return v.precision != 0; }
// ParseVersion reads a version text at `text` into *out (numbers cleared
// first; what was read stays even when the text turns out not to be a
// version). Returns the position after the version, or null when the text
// is not one.
const char *ParseVersion(const char *text, ToolsVersionNumber *out);
// FormatVersion: "" when not set (unless `inIllegalList`), "a.b.c.d" for
// precision 3, else "a.b.c.d#p".
std::string FormatVersion(const ToolsVersionNumber &v, bool inIllegalList = false);
// CompareToLimit compares `guest` with `limit` over the limit's precision:
// <0 below, 0 equal, >0 above.
int CompareToLimit(const ToolsVersionNumber &guest, const ToolsVersionNumber &limit);

// --- Component table --------------------------------------------------------

// LoadDictionary loads the file at `path`, or else the `size` bytes at `buf`;
// null on failure, with the loader's reasons in *out_messages.
DictPtr LoadDictionary(const char *path, const char *buf, size_t size,
                       UniquePtr<MsgList> *out_messages);

struct ComponentInfo {
  ToolsVersionNumber versionInGuest{};
  bool installed = false;
  ToolsVersionNumber versionOnHost{};
  ToolsVersionNumber avrMin{};
  ToolsVersionNumber avrMax{};
  std::vector<ToolsVersionNumber> avrIllegal;
  ToolsComponentStatus status = TOOLS_COMPONENT_BLACKLISTED;
};

enum ToolsManifestKind { MANIFEST_HOST = 0, MANIFEST_GUEST = 1, MANIFEST_AVR = 2 };

struct LogSwitches {
  bool components = false;  // "components.log": the table
  bool results = false;     // "result.log": the rating lists
};

// NewComponentTable: component name -> ComponentInfo, names without regard
// to case, walked in insertion order; the table owns its records.
TablePtr NewComponentTable();
ComponentInfo *LookupComponent(HashTable *table, const char *name);
// HandleEntry applies one manifest entry. `switches` is given for the host
// and AVR manifests only; faults are logged only then.
void HandleEntry(HashTable *table, ToolsManifestKind kind, LogSwitches *switches, const char *name,
                 const char *value);
// FillTable walks the loaded manifests into a new table: host, then AVR
// (or, without one, the host versions as minimums), then the guest.
TablePtr FillTable(const Dictionary *host, const Dictionary *avr, const Dictionary *guest,
                   LogSwitches *switches);
// LoadManifests fills a new table from the host manifest file, the AVR
// manifest (optional path; checked against its ".sig") and the guest
// dictionary (optional). Null when the host manifest cannot be loaded.
TablePtr LoadManifests(const char *hostPath, const char *avrPath, const Dictionary *guest,
                       LogSwitches *switches, const char *certFile = nullptr);

// --- Status ----------------------------------------------------------------

struct ComponentRow {
  std::string name;
  uint32_t rating = 0;
  bool installed = false;
  std::string guest, host, min, max, illegal;
};

// What one status call found, for ToolsVersion_GetStatusReport.
struct Report {
  // In: the maker certificates to trust for the image and the AVR manifest
  // (null: the installed ones).
  const char *certFile = nullptr;
  bool evaluated = false;
  uint32_t manifestStatus = TOOLS_STATUS_UNKNOWN;
  bool savedStatus = false;
  ComponentRow monolithic;
  std::vector<ComponentRow> components;
  std::string reason;
  uint32_t toolsVersion = 0, minVersion = 0, maxVersion = 0;
};

const char *ComponentStatusText(uint32_t rating);
ToolsComponentStatus RateComponent(const ComponentInfo &c);
// EvaluateTable rates the components of a filled table and combines the
// ratings: a status of {1..6, 9}. `report` is optional.
uint32_t EvaluateTable(HashTable *table, const LogSwitches &switches, Report *report);
// EvaluateManifests rates the components of the three manifests and
// combines the ratings: a status of {1..6, 9}. `report` is optional.
uint32_t EvaluateManifests(const char *hostPath, const char *avrPath, const Dictionary *guest,
                           Report *report);
// GetHostManifests fetches the host and AVR manifests for the guest that
// `config` describes and evaluates them against `guest`; UNKNOWN when they
// cannot be fetched.
uint32_t GetHostManifests(const Dictionary *config, const char *guestManifestPath,
                          const Dictionary *guest, Report *report);
uint32_t GetStatus(const char *configPath, Dictionary *config, const char *guestManifestPath,
                   const char *guestManifestText, uint32_t toolsVersion, int32_t mode,
                   Report *report);

// --- Extended config file ---------------------------------------------------

// ExtendedConfigPath: where the machine's extended config file is, or ""
// when the configuration names none (logged).
std::string ExtendedConfigPath(const char *configPath, const Dictionary *config);
// ReadExtendedConfig reads the whole file; false (logged) on failure.
bool ReadExtendedConfig(const std::string &path, std::string *out);
struct SavedGuestInfo {
  uint32_t status = TOOLS_STATUS_UNKNOWN;  // a saved status other than 0 and 9
  DictPtr manifest;                        // else the saved manifest, if any
};
// ReadSavedGuestInfo reads what the extended config file keeps about the
// guest; failures are logged and leave both fields empty.
SavedGuestInfo ReadSavedGuestInfo(const char *configPath, const Dictionary *config);
bool SaveXmlInfo(const char *configPath, const char *updateAgentXml, const char *manifestText,
                 int32_t installError, int32_t updateCounter);

}  // namespace tvx::toolsversion
