// Choosing the tools image of a guest: the signed image map beside the
// images wins; without a map the built-in family table decides. The answer
// without a hint is cached process-wide until the refresh counter moves.
//
// The process-wide state is published without locks: the tools directory
// and the cached name by compare-and-swap (a loser frees its own copy), the
// counters as atomics. A replaced cached name is retired, not freed, since a
// concurrent reader may still be copying it.
#include <atomic>
#include <cstdlib>
#include <cstring>
#include <string>

#include "lib/toolsImage/toolsiso_image_internal.h"
#include "platform/ascii.h"
#include "platform/dictionary.h"
#include "platform/file.h"
#include "platform/guestos.h"
#include "platform/hashtable.h"
#include "platform/log.h"
#include "platform/msglist.h"
#include "platform/str.h"
#include "platform/unique.h"
#include "platform/util.h"

namespace tvx::toolsiso {
namespace {

constexpr const char *kMapName = "isoimages_manifest.txt";

struct IdRange {
  GuestOSID first, last;
};

struct TableRow {
  const char *image;  // null: the family has no tools image
  const char *base;
  IdRange ranges[4];  // unused ranges are {0, 0}
};

// Searched in order: a guest belongs to the first row that holds its id, so
// 20486 is row 0's and 20595 row 2's although later rows list them too.
constexpr TableRow kTable[] = {
    {"winPre2k.iso", "windows.iso", {{20483, 20486}}},
    {"windows.iso", "windows.iso", {{20486, 20513}}},
    {nullptr, nullptr, {{20595, 20602}}},
    {"linux.iso", "linux.iso", {{20517, 20535}, {20539, 20550}, {20595, 20595}, {20603, 20632}}},
    {"solaris.iso", "solaris.iso", {{20566, 20571}}},
    {"freebsd.iso", "freebsd.iso", {{20551, 20565}}},
    {"netware.iso", "netware.iso", {{20592, 20594}}},
    {"darwin.iso", "darwin.iso", {{20572, 20589}}},
};

const TableRow *FindRow(GuestOSID id) {
  for (const TableRow &row : kTable) {
    for (const IdRange &r : row.ranges) {
      if (r.first != 0 && id >= r.first && id <= r.last) return &row;
    }
  }
  return nullptr;
}

struct Retired {
  char *name;
  Retired *next;
};

std::atomic<char *> g_toolsDir{nullptr};
std::atomic<char *> g_cachedName{nullptr};
std::atomic<uint32_t> g_lastCount{0};
std::atomic<uint32_t> g_refreshCount{1};
std::atomic<Retired *> g_retired{nullptr};

void Retire(char *name) {
  auto *r = new Retired{name, g_retired.load(std::memory_order_relaxed)};
  while (!g_retired.compare_exchange_weak(r->next, r, std::memory_order_release,
                                          std::memory_order_relaxed)) {
  }
}

void FreeState() {
  free(g_toolsDir.exchange(nullptr));
  free(g_cachedName.exchange(nullptr));
  for (Retired *r = g_retired.exchange(nullptr); r != nullptr;) {
    Retired *next = r->next;
    free(r->name);
    delete r;
    r = next;
  }
}

// Frees what the process-wide state holds when the library unloads.
struct StateCleanup {
  ~StateCleanup() { FreeState(); }
} g_cleanup;

// StoredToolsDir returns the tools directory of the process, storing
// `toolsDir` when none is stored yet; null (logged) when it is not a
// directory.
const char *StoredToolsDir(const char *toolsDir) {
  if (const char *dir = g_toolsDir.load(std::memory_order_acquire)) return dir;
  CharPtr copy(UtilSafeStrdup0(toolsDir));
  if (!File_IsDirectory(copy.get())) {
    Log("ToolsISO: Tools Dir path '%s' is not a directory.\n", copy.get());
    return nullptr;
  }
  for (size_t n = strlen(copy.get()); n > 1 && copy.get()[n - 1] == '/'; n--) copy.get()[n - 1] = '\0';
  char *expected = nullptr;
  if (g_toolsDir.compare_exchange_strong(expected, copy.get(), std::memory_order_acq_rel)) {
    return copy.release();
  }
  return expected;
}

struct MapFile {
  CharPtr path;  // canonical
  CharPtr bytes;
  size_t size = 0;
  bool read = false;
};

MapFile ReadMap(const char *mapPath) {
  MapFile m;
  m.path.reset(ToolsISO_GetRealPath(mapPath));
  char *buf = nullptr;
  m.read = ToolsISO_ReadFile(m.path.get(), &buf, &m.size);
  m.bytes.reset(buf);
  return m;
}

// NameFromMap looks the guest up in a loaded map; null (logged) when it is
// missing or not a valid image name.
char *NameFromMap(const Dictionary *map, const char *mapPath, const char *guestOS) {
  CharPtr name(Dict_GetString(map, nullptr, "%s", guestOS));
  if (!name) {
    Log("ToolsISO: Guest '%s' not found in Tools image map file '%s'\n", guestOS, mapPath);
    return nullptr;
  }
  if (!ToolsISO_ValidateName(name.get())) {
    Log("ToolsISO: Error Tools image map file '%s' contains invalid Tools image name: '%s'\n",
        mapPath, name.get());
    return nullptr;
  }
  return name.release();
}

char *NameWithoutHint(const char *mapPath, const char *guestOS, Bool requireSignature,
                      const char *certFile) {
  uint32_t lastCount = g_lastCount.load(std::memory_order_relaxed);
  uint32_t refreshCount = g_refreshCount.load(std::memory_order_acquire);
  char *cached = g_cachedName.load(std::memory_order_acquire);
  if (cached != nullptr) {
    if (refreshCount != 1 && lastCount != 0 && lastCount >= refreshCount) {
      Log("ToolsISO: Using cached imageName '%s' for '%s' (refreshCount=%u, lastCount=%u).\n",
          cached, guestOS, refreshCount, lastCount);
      return UtilSafeStrdup0(cached);
    }
    Log("ToolsISO: Refreshing imageName for '%s' (refreshCount=%u, lastCount=%u).\n", guestOS,
        refreshCount, lastCount);
  }

  CharPtr name;
  MapFile map = ReadMap(mapPath);
  if (map.read) {
    UniquePtr<Dictionary> dict(
        LoadImageMap(map.path.get(), map.bytes.get(), map.size, requireSignature, certFile));
    if (dict) name.reset(NameFromMap(dict.get(), map.path.get(), guestOS));
  } else if (const TableRow *row = FindRow(GuestOS_GetOSIDByName(guestOS))) {
    if (row->image != nullptr) name.reset(UtilSafeStrdup0(row->image));
  }

  char *fresh = name ? UtilSafeStrdup0(name.get()) : nullptr;
  if (g_cachedName.compare_exchange_strong(cached, fresh, std::memory_order_acq_rel)) {
    Log("ToolsISO: Updated cached value for imageName to '%s'.\n", fresh != nullptr ? fresh : "(null)");
    if (cached != nullptr) Retire(cached);
    g_lastCount.store(refreshCount, std::memory_order_relaxed);
  } else {
    free(fresh);
  }
  return name.release();
}

void LogBadHint(const char *hint) {
  Log("ToolsISO: Error invalid hint '%s' for Tools image.\n", hint);
}

Bool CollectValue(const char *, const char *value, void *ctx) {
  HashTable_Insert(static_cast<HashTable *>(ctx), value, nullptr);
  return TRUE;
}

bool HintAccepted(const char *mapPath, const char *hint, Bool requireSignature,
                  const char *certFile) {
  MapFile map = ReadMap(mapPath);
  if (map.read) {
    UniquePtr<Dictionary> dict(
        LoadImageMap(map.path.get(), map.bytes.get(), map.size, requireSignature, certFile));
    if (dict) {
      UniquePtr<HashTable> names(HashTable_Alloc(64, HASH_STRING_KEY | HASH_FLAG_COPYKEY, nullptr));
      Dictionary_Iterate(dict.get(), CollectValue, names.get());
      if (HashTable_Lookup(names.get(), hint, nullptr)) return true;
    }
  } else {
    for (const TableRow &row : kTable) {
      if (row.image != nullptr && strcmp(row.image, hint) == 0) return true;
    }
  }
  Log("ToolsISO: Error unexpected Tools image name: '%s'\n", hint);
  LogBadHint(hint);
  return false;
}

Bool GetImagePath(const char *toolsDirArg, const char *guestOS, const char *hint,
                  Bool requireSignature, const char *certFile, char **out_imagePath,
                  char **out_imageBaseName, uint32_t *out_isoOpenMode) {
  const char *toolsDir = StoredToolsDir(toolsDirArg);
  if (toolsDir == nullptr) return FALSE;
  CharPtr mapPath(Str_SafeAsprintf(nullptr, "%s/isoimages/%s", toolsDir, kMapName));

  CharPtr name;
  if (hint == nullptr) {
    name.reset(NameWithoutHint(mapPath.get(), guestOS, requireSignature, certFile));
  } else {
    if (!ToolsISO_ValidateName(hint)) {
      Log("ToolsISO: Error invalid Tools image name: '%s'\n", hint);
      LogBadHint(hint);
      return FALSE;
    }
    if (!HintAccepted(mapPath.get(), hint, requireSignature, certFile)) return FALSE;
    name.reset(UtilSafeStrdup0(hint));
  }
  if (!name) return FALSE;

  Log("ToolsISO: Selected Tools ISO '%s' for '%s' guest.\n", name.get(), guestOS);
  *out_imagePath = Str_SafeAsprintf(nullptr, "%s/isoimages/%s", toolsDir, name.get());
  if (out_imageBaseName != nullptr) {
    if (char *dot = strrchr(name.get(), '.')) *dot = '\0';
    *out_imageBaseName = name.release();
  }
  if (out_isoOpenMode != nullptr) {
    *out_isoOpenMode = GuestOS_IsWin(GuestOS_GetOSIDByName(guestOS)) ? 2 : 4;
  }
  return TRUE;
}

}  // namespace

Dictionary *LoadImageMap(const char *mapPath, const char *bytes, size_t size,
                         Bool requireSignature, const char *certFile) {
  CharPtr sigPath(Str_SafeAsprintf(nullptr, "%s.sig", mapPath));
  char *sigBuf = nullptr;
  size_t sigSize = 0;
  if (!ToolsISO_ReadFile(sigPath.get(), &sigBuf, &sigSize)) {
    if (requireSignature) {
      Log("ToolsISO: Unable to read signature file '%s'.\n", sigPath.get());
      return nullptr;
    }
    Log("ToolsISO: Unable to read signature file '%s', ignoring.\n", sigPath.get());
  } else {
    CharPtr sig(sigBuf);
    if (!ToolsISO_VerifySignature(certFile, sig.get(), sigSize, bytes, size)) {
      Log("ToolsISO: Error signature check failed for Tools image map '%s'.\n", mapPath);
      return nullptr;
    }
  }
  UniquePtr<Dictionary> dict(Dictionary_Create());
  MsgList *messages = nullptr;
  if (!Dictionary_LoadFromBufferEx(dict.get(), bytes, size, &messages)) {
    UniquePtr<MsgList> owned(messages);
    CharPtr text(MsgList_ToEnglishString(messages));
    Log("ToolsISO: Error loading dictionary from Tools image map '%s': %s.\n", mapPath,
        text ? text.get() : "");
    return nullptr;
  }
  MsgList_Free(messages);
  return dict.release();
}

void ResetSelectionState() {
  FreeState();
  g_lastCount = 0;
  g_refreshCount = 1;
}

}  // namespace tvx::toolsiso

using namespace tvx::toolsiso;

extern "C" {

Bool ToolsISO_GetImagePath(const char *toolsDir, const char *guestOS, const char *hint,
                           Bool requireSignature, char **out_imagePath, char **out_imageBaseName,
                           uint32_t *out_isoOpenMode) {
  return ToolsISO_GetImagePathEx(toolsDir, guestOS, hint, requireSignature, nullptr, out_imagePath,
                                 out_imageBaseName, out_isoOpenMode);
}

Bool ToolsISO_GetImagePathEx(const char *toolsDir, const char *guestOS, const char *hint,
                             Bool requireSignature, const char *certFile, char **out_imagePath,
                             char **out_imageBaseName, uint32_t *out_isoOpenMode) {
  if (out_imagePath != nullptr) *out_imagePath = nullptr;
  if (out_imageBaseName != nullptr) *out_imageBaseName = nullptr;
  if (out_isoOpenMode != nullptr) *out_isoOpenMode = 0;
  if (toolsDir == nullptr || guestOS == nullptr || out_imagePath == nullptr) return FALSE;
  try {
    return GetImagePath(toolsDir, guestOS, hint, requireSignature, certFile, out_imagePath,
                        out_imageBaseName, out_isoOpenMode);
  } catch (...) {
    return FALSE;
  }
}

const char *ToolsISO_GetImageBaseName(uint32_t guestOSId) {
  const TableRow *row = FindRow(guestOSId);
  return row != nullptr ? row->base : nullptr;
}

Bool ToolsISO_ValidateName(const char *name) {
  if (name == nullptr) return FALSE;
  size_t n = strlen(name);
  if (n < 5 || n > 255 || strcmp(name + n - 4, ".iso") != 0) return FALSE;
  for (size_t i = 0; i + 4 < n; i++) {
    char c = name[i];
    if (!tvx::ascii::IsAlnum(c) && c != '-' && c != '.' && c != '_') return FALSE;
  }
  return TRUE;
}

uint32_t ToolsISO_GetRefreshCount(void) { return g_refreshCount.load(std::memory_order_acquire); }

void ToolsISO_UpdateRefreshCount(void) { g_refreshCount.fetch_add(1, std::memory_order_acq_rel); }

}  // extern "C"
