#include "platform/snapshot.h"

#include <cstdlib>
#include <cstring>
#include <regex>
#include <string>
#include <strings.h>
#include <vector>

#include "platform/file.h"
#include "platform/util.h"

namespace {

struct Collect {
  std::vector<std::string> devices;
};

bool IsDiskDevice(const Dictionary *config, const std::string &device, const std::string &bus) {
  if (!Dict_GetBool(config, FALSE, "%s.present", device.c_str())) return false;
  if (!Dict_GetBool(config, TRUE, "%s.present", bus.c_str())) return false;
  char *type = Dict_GetString(config, "", "%s.deviceType", device.c_str());
  bool removable = strcasestr(type, "cdrom") != nullptr || strcasestr(type, "floppy") != nullptr;
  std::free(type);
  if (removable) return false;
  char *file = Dict_GetString(config, "", "%s.fileName", device.c_str());
  size_t n = std::strlen(file);
  bool vmdk = n > 5 && strcasecmp(file + n - 5, ".vmdk") == 0;
  std::free(file);
  return vmdk;
}

void Push(SnapshotStringList ***tail, const std::string &text) {
  auto *node = static_cast<SnapshotStringList *>(UtilSafeCalloc0(1, sizeof(SnapshotStringList)));
  node->text = UtilSafeStrdup0(text.c_str());
  **tail = node;
  *tail = &node->next;
}

}  // namespace

SnapshotError Snapshot_GetCurrentDisksCfgDict(const char *configPath, const Dictionary *config,
                                              SnapshotStringList **out_devices,
                                              SnapshotStringList **out_disks, unsigned flags) {
  if (out_devices != nullptr) *out_devices = nullptr;
  if (out_disks != nullptr) *out_disks = nullptr;
  if (configPath == nullptr || config == nullptr) return SNAPSHOT_ERR_ARGS;

  Collect found;
  Dictionary_Iterate(
      config,
      [](const char *name, const char *, void *ctx) -> Bool {
        static const std::regex kFileName("((ide|scsi|sata|nvme)[0-9]+):[0-9]+\\.filename",
                                          std::regex::icase);
        std::cmatch m;
        if (std::regex_match(name, m, kFileName)) {
          auto *c = static_cast<Collect *>(ctx);
          std::string device(name, static_cast<size_t>(m.length(0)) - std::strlen(".fileName"));
          bool seen = false;
          for (const auto &d : c->devices) seen = seen || strcasecmp(d.c_str(), device.c_str()) == 0;
          if (!seen) c->devices.push_back(device);
        }
        return TRUE;
      },
      &found);

  char *dir = nullptr;
  File_GetPathName(configPath, &dir, nullptr);
  SnapshotStringList **devTail = out_devices, **diskTail = out_disks;
  SnapshotStringList *devScratch = nullptr, *diskScratch = nullptr;
  if (devTail == nullptr) devTail = &devScratch;
  if (diskTail == nullptr) diskTail = &diskScratch;
  for (const auto &device : found.devices) {
    std::string bus = device.substr(0, device.find(':'));
    if (!IsDiskDevice(config, device, bus)) continue;
    char *file = Dict_GetString(config, "", "%s.fileName", device.c_str());
    std::string path = file;
    std::free(file);
    if (path[0] != '/' && dir[0] != '\0') {
      char *joined = File_PathJoin(dir, path.c_str());
      path = joined;
      std::free(joined);
    }
    Push(&devTail, device);
    Push(&diskTail, path);
  }
  std::free(dir);
  Snapshot_FreeStringList(devScratch);
  Snapshot_FreeStringList(diskScratch);
  return SNAPSHOT_OK;
}

void Snapshot_FreeStringList(SnapshotStringList *list) {
  while (list != nullptr) {
    SnapshotStringList *next = list->next;
    std::free(list->text);
    std::free(list);
    list = next;
  }
}
