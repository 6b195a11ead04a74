// ToolsVersion_GetStatus: where the guest manifest comes from, and how the
// single legacy tools number (from the caller or the virtual disks) refines
// or overrides what the manifests say.
#include <cstring>

#include "lib/toolsversion/toolsversion_internal.h"
#include "platform/disklib.h"
#include "platform/guestos.h"
#include "platform/msg.h"
#include "platform/msglist.h"
#include "platform/snapshot.h"
#include "platform/str.h"

namespace tvx::toolsversion {

namespace {

// The newest legacy number every guest family accepts as current.
constexpr uint32_t kDefaultToolsVersion = 12384;  // 12.3.0

struct SnapshotListsDeleter {
  void operator()(SnapshotStringList *l) const noexcept { Snapshot_FreeStringList(l); }
};
using StringListPtr = std::unique_ptr<SnapshotStringList, SnapshotListsDeleter>;

GuestOSID MapGuestOS(const char *guestOS) {
  GuestOSID id = GuestOS_GetOSIDByName(guestOS);
  Log_Level(6, "ToolsVersion: guestOS=%s mapped to guestId=%x\n", guestOS, id);
  return id;
}

uint32_t MinVersionFor(GuestOSID id) {
  if (GuestOS_IsWin9x(id) || GuestOS_IsWinNT4(id)) return 7392;               // 7.7.0
  if (GuestOS_IsWin(id) || GuestOS_IsLinux(id)) return 8384;                  // 8.6.0
  if (GuestOS_IsSolaris(id)) return 9216;                                     // 9.0.0
  if (GuestOS_IsDarwin(id) && !GuestOS_IsDarwin15OrHigher(id)) return 10252;  // 10.0.12
  if (GuestOS_IsNetware(id)) return 8224;                                     // 8.1.0
  return kDefaultToolsVersion;
}

uint32_t MaxVersionFor(GuestOSID id) {
  if (GuestOS_IsWin9x(id) || GuestOS_IsWinNT4(id)) return 7392;
  if ((GuestOS_IsWin2kOrHigher(id) && !GuestOS_IsWinVistaOrHigher(id)) ||
      GuestOS_IsLinuxPreGlibc25(id)) {
    return 10252;
  }
  if (GuestOS_IsNetware(id)) return 8224;
  return kDefaultToolsVersion;
}

// NewestDiskToolsVersion: the largest "toolsVersion" in the disk databases
// of `disks`; disks that cannot be read are skipped.
uint32_t NewestDiskToolsVersion(const SnapshotStringList *disks) {
  uint32_t newest = 0;
  for (const SnapshotStringList *d = disks; d != nullptr; d = d->next) {
    DiskLibHandle *handle = nullptr;
    if (DiskLib_Open(d->text, 7, 0, &handle) != DISKLIB_OK) continue;
    char *raw = nullptr;
    if (DiskLib_DBGet(handle, "toolsVersion", &raw) == DISKLIB_OK) {
      CharPtr value(raw);
      uint32_t v = 0;
      if (StrUtil_StrToUint(&v, value.get()) && v > newest) newest = v;
    }
    DiskLib_Close(handle);
  }
  return newest;
}

// GuestFromSources loads the guest manifest the caller gave, or the one the
// extended config file keeps, and evaluates it. `status` becomes the result
// (or a saved status); the guest dictionary, when there is one, is returned.
DictPtr GuestFromSources(const char *configPath, Dictionary *config, const char *guestManifestPath,
                         const char *guestManifestText, uint32_t *status, Report *report) {
  if (guestManifestPath != nullptr) {
    UniquePtr<MsgList> messages;
    DictPtr guest = LoadDictionary(guestManifestPath, nullptr, 0, &messages);
    if (guest == nullptr) {
      TV_LOG("Error loading dictionary for guest manifest.");
      MsgList_Log(messages.get());
      return nullptr;
    }
    *status = GetHostManifests(config, guestManifestPath, guest.get(), report);
    return guest;
  }
  if (guestManifestText != nullptr) {
    if (guestManifestText[0] == '\0') return nullptr;
    DictPtr guest(Dictionary_Create());
    if (!Dictionary_LoadFromBuffer(guest.get(), guestManifestText,
                                   std::strlen(guestManifestText))) {
      CharPtr messages(Msg_GetMessagesAndReset());
      TV_LOG("Error loading dictionary from guest manifest buffer: %s.\n", messages.get());
      return nullptr;
    }
    *status = GetHostManifests(config, nullptr, guest.get(), report);
    return guest;
  }
  SavedGuestInfo saved = ReadSavedGuestInfo(configPath, config);
  if (saved.status != TOOLS_STATUS_UNKNOWN) {
    *status = saved.status;
    if (report != nullptr) report->savedStatus = true;
    return nullptr;
  }
  if (saved.manifest == nullptr) return nullptr;
  *status = GetHostManifests(config, nullptr, saved.manifest.get(), report);
  return std::move(saved.manifest);
}

}  // namespace

uint32_t GetStatus(const char *configPath, Dictionary *config, const char *guestManifestPath,
                   const char *guestManifestText, uint32_t toolsVersion, int32_t mode,
                   Report *report) {
  Report scratch;
  if (report == nullptr) report = &scratch;
  report->toolsVersion = toolsVersion;
  if (mode < -1 || mode > 2) return TOOLS_STATUS_NOT_APPLICABLE;
  if (mode == 2) {
    CharPtr guestOS(Dict_GetString(config, nullptr, "guestOS"));
    if (guestOS == nullptr) {
      TV_LOG("Failed to find guestOS value from tvxx config file '%s'.\n",
             configPath != nullptr ? configPath : "");
    } else if (GuestOS_IsOrka(MapGuestOS(guestOS.get()))) {
      return TOOLS_STATUS_NOT_APPLICABLE;
    }
  }

  uint32_t s = TOOLS_STATUS_UNKNOWN;
  DictPtr guest =
      GuestFromSources(configPath, config, guestManifestPath, guestManifestText, &s, report);
  int32_t hwVersion = 1;
  if (guest != nullptr && s == TOOLS_STATUS_UNKNOWN) {
    Dictionary_Get(guest.get(), "virtualHW.version", DICT_INT32, &hwVersion);
  }

  if (toolsVersion == TOOLS_VERSION_FROM_DISKS) {
    SnapshotStringList *rawDevices = nullptr, *rawDisks = nullptr;
    SnapshotError err =
        Snapshot_GetCurrentDisksCfgDict(configPath, config, &rawDevices, &rawDisks, 0);
    StringListPtr devices(rawDevices), disks(rawDisks);
    if (err != SNAPSHOT_OK) {
      if (s != TOOLS_STATUS_UNKNOWN) return s;
      return hwVersion > 20 ? TOOLS_STATUS_UNKNOWN : TOOLS_STATUS_TOO_OLD;
    }
    if (disks == nullptr) {
      // No disk to carry tools; a known status stands, as the unknown
      // number is not below any minimum.
      if (s == TOOLS_STATUS_UNKNOWN) return TOOLS_STATUS_NOT_INSTALLED;
    } else {
      toolsVersion = NewestDiskToolsVersion(disks.get());
      report->toolsVersion = toolsVersion;
    }
  }

  if (s == TOOLS_STATUS_UNKNOWN) {
    if (toolsVersion == TOOLS_VERSION_NONE) return TOOLS_STATUS_NOT_INSTALLED;
    if (toolsVersion == TOOLS_VERSION_NOT_APPLICABLE) return TOOLS_STATUS_NOT_APPLICABLE;
    char text[21];
    Str_Snprintf(text, sizeof text, "%u.%u.%u", toolsVersion >> 10, (toolsVersion >> 5) & 31,
                 toolsVersion & 31);
    DictPtr legacy(Dictionary_Create());
    Dict_SetString(legacy.get(), text, "monolithic.version");
    s = GetHostManifests(config, nullptr, legacy.get(), report);
  }
  report->manifestStatus = s;
  if (s == TOOLS_STATUS_NOT_INSTALLED || s == TOOLS_STATUS_NOT_APPLICABLE) return s;

  uint32_t minVersion = kDefaultToolsVersion, maxVersion = kDefaultToolsVersion;
  CharPtr guestOS(Dict_GetString(config, nullptr, "guestOS"));
  if (guestOS == nullptr) {
    TV_LOG("Failed to find guestOS value from VM.\n");
  } else {
    GuestOSID id = MapGuestOS(guestOS.get());
    minVersion = MinVersionFor(id);
    maxVersion = MaxVersionFor(id);
    TV_LOG("Using ToolsMinVersion = %u\n", minVersion);
    TV_LOG("Using ToolsMaxVersion = %u\n", maxVersion);
  }
  report->minVersion = minVersion;
  report->maxVersion = maxVersion;
  if (toolsVersion < minVersion) return TOOLS_STATUS_TOO_OLD;
  if (s == TOOLS_STATUS_UNKNOWN) {
    return toolsVersion >= maxVersion ? TOOLS_STATUS_CURRENT : TOOLS_STATUS_SUPPORTED_OLD;
  }
  return s;
}

}  // namespace tvx::toolsversion
