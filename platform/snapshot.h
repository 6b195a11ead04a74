// The virtual disks that a VM configuration currently uses.
#pragma once

#include "platform/dictionary.h"

// A singly linked list of allocated texts.
struct SnapshotStringList {
  char *text;
  SnapshotStringList *next;
};

enum SnapshotError {
  SNAPSHOT_OK = 0,
  SNAPSHOT_ERR_ARGS = 1,  // no configuration path or dictionary
};

// Snapshot_GetCurrentDisksCfgDict walks the configuration's disk devices
// (<bus><n>:<m> for ide, scsi, sata and nvme) that are present (".present"
// true, controller not switched off) and are disks rather than CD-ROM or
// floppy devices, with a ".fileName" ending in ".vmdk". It stores, in
// configuration order, their device names ("scsi0:0") in *out_devices and
// their disk paths (relative names taken from the directory of `configPath`)
// in *out_disks; both lists may be empty (null). `flags` is unused. Free the
// lists with Snapshot_FreeStringList.
SnapshotError Snapshot_GetCurrentDisksCfgDict(const char *configPath, const Dictionary *config,
                                              SnapshotStringList **out_devices,
                                              SnapshotStringList **out_disks, unsigned flags);
// Snapshot_FreeStringList releases a list; null is harmless.
void Snapshot_FreeStringList(SnapshotStringList *list);
