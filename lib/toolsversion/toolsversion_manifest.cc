// Version values and the component table that the guest, host and AVR
// manifests fill. All three are dictionaries walked entry by entry; only the
// host and AVR walks report bad entries, since a guest's manifest is the
// guest's business and its faults must not flood the host's log.
#include <cstring>

#include "lib/toolsversion/toolsversion_internal.h"
#include "platform/ascii.h"
#include "platform/msglist.h"
#include "platform/str.h"
#include "tvx_toolsiso.h"
#include "tvx_toolsiso_image.h"

namespace tvx::toolsversion {

const char *ParseVersion(const char *text, ToolsVersionNumber *out) {
  std::memset(out->numbers, 0, sizeof out->numbers);
  const char *p = text;
  uint32_t count = 0;
  for (;;) {
    unsigned int n = 0;
    if (!StrUtil_DecimalStrToUint(&n, &p)) return nullptr;
    if (count < 4) out->numbers[count++] = n;
    if (*p != '.') break;
    p++;
  }
  if (*p == '#') {
    p++;
    unsigned int precision = 0;
    if (!StrUtil_DecimalStrToUint(&precision, &p)) return nullptr;
    out->precision = precision < 4 ? precision : 4;
  } else {
    out->precision = 3;
  }
  return p;
}

std::string FormatVersion(const ToolsVersionNumber &v, bool inIllegalList) {
  if (!IsSet(v) && !inIllegalList) return "";
  const uint32_t *n = v.numbers;
  char *s = v.precision == 3
                ? Str_Asprintf(nullptr, "%u.%u.%u.%u", n[0], n[1], n[2], n[3])
                : Str_Asprintf(nullptr, "%u.%u.%u.%u#%u", n[0], n[1], n[2], n[3], v.precision);
  std::string out = s != nullptr ? s : "";
  std::free(s);
  return out;
}

int CompareToLimit(const ToolsVersionNumber &guest, const ToolsVersionNumber &limit) {
  uint32_t count = limit.precision < 4 ? limit.precision : 4;
  for (uint32_t i = 0; i < count; i++) {
    if (guest.numbers[i] != limit.numbers[i]) return guest.numbers[i] < limit.numbers[i] ? -1 : 1;
  }
  return 0;
}

namespace {

void FreeComponent(void *data) { delete static_cast<ComponentInfo *>(data); }

ComponentInfo *LookupOrCreate(HashTable *table, const std::string &component) {
  void *data = nullptr;
  if (HashTable_Lookup(table, component.c_str(), &data)) return static_cast<ComponentInfo *>(data);
  auto *info = new ComponentInfo;
  HashTable_Insert(table, component.c_str(), info);
  return info;
}

enum class Suffix { kNone, kVersion, kVersionMax, kVersionIllegal, kInstalled, kLog, kOther };

Suffix ClassifySuffix(const char *dot) {
  if (dot == nullptr) return Suffix::kNone;
  static const struct {
    const char *text;
    Suffix suffix;
  } kSuffixes[] = {{".version", Suffix::kVersion},
                   {".version_max", Suffix::kVersionMax},
                   {".version_illegal", Suffix::kVersionIllegal},
                   {".installed", Suffix::kInstalled},
                   {".log", Suffix::kLog}};
  for (const auto &s : kSuffixes) {
    if (ascii::Equal(dot, s.text)) return s.suffix;
  }
  return Suffix::kOther;
}

bool OnlyBlanksLeft(const char *p) {
  while (*p != '\0' && ascii::IsSpace(*p)) p++;
  return *p == '\0';
}

const char *SkipBlanks(const char *p) {
  while (*p != '\0' && ascii::IsSpace(*p)) p++;
  return p;
}

}  // namespace

DictPtr LoadDictionary(const char *path, const char *buf, size_t size,
                       UniquePtr<MsgList> *out_messages) {
  DictPtr dict(Dictionary_Create());
  MsgList *raw = nullptr;
  Bool loaded = path != nullptr ? Dictionary_LoadEx(dict.get(), path, &raw)
                                : Dictionary_LoadFromBufferEx(dict.get(), buf, size, &raw);
  out_messages->reset(raw);
  if (!loaded) dict.reset();
  return dict;
}

TablePtr NewComponentTable() {
  return TablePtr(HashTable_Alloc(128, HASH_ISTRING_KEY | HASH_FLAG_COPYKEY, FreeComponent));
}

ComponentInfo *LookupComponent(HashTable *table, const char *name) {
  void *data = nullptr;
  return HashTable_Lookup(table, name, &data) ? static_cast<ComponentInfo *>(data) : nullptr;
}

void HandleEntry(HashTable *table, ToolsManifestKind kind, LogSwitches *switches, const char *name,
                 const char *value) {
  auto reject = [&](const char *message) {
    if (switches != nullptr) TV_LOG("%s: %s = %s\n", message, name, value);
  };
  const char *dot = std::strrchr(name, '.');
  Suffix suffix = ClassifySuffix(dot);
  switch (suffix) {
    case Suffix::kNone:
      return reject("No '.' in the name");
    case Suffix::kOther:
      return reject("Unknown entry");
    case Suffix::kLog:
      if (switches == nullptr) return;  // the guest has no say in the host's log
      if (ascii::Equal(name, "components.log")) {
        switches->components = Dictionary_StringToBool(value, FALSE);
      } else if (ascii::Equal(name, "result.log")) {
        switches->results = Dictionary_StringToBool(value, FALSE);
      } else {
        reject("Unknown debug entry");
      }
      return;
    case Suffix::kVersionMax:
      if (kind != MANIFEST_AVR) return reject("Maximum version in non-AVR file");
      break;
    case Suffix::kVersionIllegal:
      if (kind != MANIFEST_AVR) return reject("Illegal version in non-AVR file");
      break;
    case Suffix::kInstalled:
      if (kind != MANIFEST_GUEST) return reject("Installed flag in non-guest file");
      break;
    case Suffix::kVersion:
      break;
  }

  ComponentInfo *info = LookupOrCreate(table, std::string(name, dot));
  if (suffix == Suffix::kInstalled) {
    info->installed = Dictionary_StringToBool(value, FALSE);
    return;
  }
  if (suffix == Suffix::kVersionIllegal) {
    for (const char *p = value;;) {
      ToolsVersionNumber v{};
      const char *end = ParseVersion(p, &v);
      if (end == nullptr) return reject("Cannot parse illegal version");
      info->avrIllegal.push_back(v);
      end = SkipBlanks(end);
      if (*end == '\0') return;
      if (*end != ',') return reject("Cannot parse illegal version");
      p = SkipBlanks(end + 1);
    }
  }
  ToolsVersionNumber *field = suffix == Suffix::kVersionMax ? &info->avrMax
                              : kind == MANIFEST_HOST       ? &info->versionOnHost
                              : kind == MANIFEST_GUEST      ? &info->versionInGuest
                                                            : &info->avrMin;
  if (IsSet(*field)) return reject("Multiple identical entries");
  const char *end = ParseVersion(value, field);
  if (end == nullptr || !OnlyBlanksLeft(end)) reject("Cannot parse version");
}

namespace {

struct Walk {
  HashTable *table;
  ToolsManifestKind kind;
  LogSwitches *switches;
};

Bool WalkEntry(const char *name, const char *value, void *ctx) {
  auto *walk = static_cast<Walk *>(ctx);
  HandleEntry(walk->table, walk->kind, walk->switches, name, value);
  return TRUE;
}

void WalkManifest(const Dictionary *dict, HashTable *table, ToolsManifestKind kind,
                  LogSwitches *switches) {
  Walk walk{table, kind, switches};
  Dictionary_Iterate(dict, WalkEntry, &walk);
}

// LoadAvr loads the AVR manifest once its detached signature holds; null
// (logged) otherwise.
DictPtr LoadAvr(const char *avrPath, const char *certFile) {
  char *raw = nullptr;
  size_t size = 0;
  if (!ToolsISO_ReadFile(avrPath, &raw, &size)) {
    TV_LOG("Error loading the AVR manifest '%s'.\n", avrPath);
    return nullptr;
  }
  CharPtr data(raw);
  CharPtr sigPath(Str_Asprintf(nullptr, "%s.sig", avrPath));
  char *rawSig = nullptr;
  size_t sigSize = 0;
  if (!ToolsISO_ReadFile(sigPath.get(), &rawSig, &sigSize)) {
    TV_LOG("Unable to read signature file '%s'.\n", sigPath.get());
    return nullptr;
  }
  CharPtr sig(rawSig);
  if (!ToolsISO_VerifySignature(certFile, sig.get(), sigSize, data.get(), size)) {
    TV_LOG("Error signature check failed for AVR manifest '%s'.\n", avrPath);
    return nullptr;
  }
  UniquePtr<MsgList> messages;
  DictPtr dict = LoadDictionary(nullptr, data.get(), size, &messages);
  if (dict == nullptr) {
    CharPtr text(MsgList_ToEnglishString(messages.get()));
    TV_LOG("Error loading dictionary from AVR manifest '%s': %s.\n", avrPath, text.get());
  }
  return dict;
}

int CopyHostAsMinimum(const void *, void *data, void *) {
  auto *info = static_cast<ComponentInfo *>(data);
  info->avrMin = info->versionOnHost;
  return 0;
}

}  // namespace

TablePtr FillTable(const Dictionary *host, const Dictionary *avr, const Dictionary *guest,
                   LogSwitches *switches) {
  TablePtr table = NewComponentTable();
  WalkManifest(host, table.get(), MANIFEST_HOST, switches);
  if (avr != nullptr) {
    WalkManifest(avr, table.get(), MANIFEST_AVR, switches);
  } else {
    // Before the guest is read, so only the host's components get a minimum.
    HashTable_ForEach(table.get(), CopyHostAsMinimum, nullptr);
  }
  if (guest != nullptr) WalkManifest(guest, table.get(), MANIFEST_GUEST, nullptr);
  return table;
}

TablePtr LoadManifests(const char *hostPath, const char *avrPath, const Dictionary *guest,
                       LogSwitches *switches, const char *certFile) {
  UniquePtr<MsgList> messages;
  DictPtr host = LoadDictionary(hostPath, nullptr, 0, &messages);
  if (host == nullptr) {
    CharPtr text(MsgList_ToEnglishString(messages.get()));
    TV_LOG("Error loading dictionary from host manifest: '%s': %s.\n", hostPath, text.get());
    return nullptr;
  }
  DictPtr avr;
  if (avrPath != nullptr) {
    avr = LoadAvr(avrPath, certFile);
    if (avr == nullptr) TV_LOG("AVR file corrupted, ignoring AVR values\n");
  }
  return FillTable(host.get(), avr.get(), guest, switches);
}

}  // namespace tvx::toolsversion
