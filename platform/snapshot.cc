#include "platform/snapshot.h"

#include <cstdlib>
#include <cstring>
#include <regex>
#include <string>
#include <vector>

#include "platform/ascii.h"
#include "platform/file.h"
#include "platform/unique.h"
#include "platform/util.h"

namespace {

struct Collect {
  std::vector<std::string> devices;
};

bool IsDiskDevice(const Dictionary *config, const std::string &device, const std::string &bus) {
  if (!Dict_GetBool(config, FALSE, "%s.present", device.c_str())) return false;
  if (!Dict_GetBool(config, TRUE, "%s.present", bus.c_str())) return false;
  tvx::CharPtr typeText(Dict_GetString(config, "", "%s.deviceType", device.c_str()));
  std::string type = tvx::ascii::Lower(typeText.get());
  if (type.find("cdrom") != std::string::npos || type.find("floppy") != std::string::npos) {
    return false;
  }
  tvx::CharPtr file(Dict_GetString(config, "", "%s.fileName", device.c_str()));
  std::string_view name(file.get());
  return name.size() > 5 && tvx::ascii::EndsWith(name, ".vmdk");
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
          for (const auto &d : c->devices) seen = seen || tvx::ascii::Equal(d, device);
          if (!seen) c->devices.push_back(device);
        }
        return TRUE;
      },
      &found);

  char *dirText = nullptr;
  File_GetPathName(configPath, &dirText, nullptr);
  tvx::CharPtr dir(dirText);
  SnapshotStringList **devTail = out_devices, **diskTail = out_disks;
  SnapshotStringList *devScratch = nullptr, *diskScratch = nullptr;
  if (devTail == nullptr) devTail = &devScratch;
  if (diskTail == nullptr) diskTail = &diskScratch;
  for (const auto &device : found.devices) {
    std::string bus = device.substr(0, device.find(':'));
    if (!IsDiskDevice(config, device, bus)) continue;
    std::string path = tvx::CharPtr(Dict_GetString(config, "", "%s.fileName", device.c_str())).get();
    if (path[0] != '/' && dir.get()[0] != '\0') {
      path = tvx::CharPtr(File_PathJoin(dir.get(), path.c_str())).get();
    }
    Push(&devTail, device);
    Push(&diskTail, path);
  }
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
