// Read access to the disk database of virtual disks: the "ddb.*" entries of
// a disk's text descriptor, either embedded in a monolithic sparse extent or
// standing in its own descriptor file.
#pragma once

#include <cstdint>

struct DiskLibHandle;

enum DiskLibError {
  DISKLIB_OK = 0,
  DISKLIB_ERR_OPEN = 1,       // the file cannot be opened or read
  DISKLIB_ERR_FORMAT = 2,     // neither a sparse extent with a descriptor nor a descriptor
  DISKLIB_ERR_NOT_FOUND = 3,  // no such disk database entry
};

// DiskLib_Open opens the disk at `path` and reads its descriptor. The disk is
// only ever read, whatever `flags` ask; `reserved` is unused. *out_handle is
// null on failure.
DiskLibError DiskLib_Open(const char *path, unsigned flags, unsigned reserved,
                          DiskLibHandle **out_handle);
// DiskLib_DBGet stores an allocated copy of the disk database entry `key`
// ("toolsVersion" or "ddb.toolsVersion"; case ignored) in *out_value.
DiskLibError DiskLib_DBGet(const DiskLibHandle *handle, const char *key, char **out_value);
// DiskLib_Close releases the handle; null is harmless.
void DiskLib_Close(DiskLibHandle *handle);
