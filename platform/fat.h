// FAT12/FAT16 volumes in image files (floppy images above all): format a
// 1.44 MB floppy, open a volume, walk and add to its root directory, and
// read, write and truncate its files. Long names (VFAT) are read and written
// where a name does not fit the 8.3 form exactly.
//
// Every call returns 0 (FAT_OK) or one of the error numbers below. The volume
// is held in memory and written back to the image when a file, the root
// directory or the volume is closed. Handles are used by one thread at a
// time.
#pragma once

#include "tvx_base.h"

#include <cstddef>
#include <cstdint>

struct FATDevice;
struct FATVolume;
struct FATDirectory;
struct FATDirIter;
struct FATFile;

enum : unsigned long {
  FAT_OK = 0,
  FAT_ERR_IO = 1,           // the image cannot be opened, read or written
  FAT_ERR_CORRUPT = 2,      // not a FAT volume, or damaged structures
  FAT_ERR_UNSUPPORTED = 3,  // FAT32, an image over 64 MiB, a size that cannot be formatted
  FAT_ERR_NOT_FOUND = 4,
  FAT_ERR_EXISTS = 5,
  FAT_ERR_NO_SPACE = 6,     // no free cluster or root directory entry
  FAT_ERR_BAD_NAME = 7,
  FAT_ERR_ARGS = 8,
  FAT_ERR_END = 9,          // no more directory entries
};

// FATDevFileIO_Open makes a device over the image file at `path` (nothing is
// opened yet). FAT_FormatVolume and FAT_OpenVolume take the device over,
// whether they succeed or not; a device never given to them is released with
// FATDev_Close.
FATDevice *FATDevFileIO_Open(const char *path);
void FATDev_Close(FATDevice *dev);

// FAT_FormatVolume creates (or replaces) the image as an empty FAT12 volume
// of `size` bytes: 1,474,560 (1.44 MB), 737,280 or 2,949,120. `flags` is
// unused.
unsigned long FAT_FormatVolume(FATDevice *dev, uint64_t size, unsigned flags,
                               FATVolume **out_volume);
// FAT_OpenVolume opens an existing image.
unsigned long FAT_OpenVolume(FATDevice *dev, FATVolume **out_volume);
// FAT_SkipVolumeBoot marks the boot sector as not to be rewritten. The boot
// sector is never rewritten here, so it only checks the volume.
unsigned long FAT_SkipVolumeBoot(FATVolume *volume);
// FAT_CloseVolume writes back and releases the volume (and its device);
// null is harmless. Directories and files of the volume must be closed first.
unsigned long FAT_CloseVolume(FATVolume *volume);

unsigned long FAT_OpenRootDirectory(FATVolume *volume, FATDirectory **out_dir);
unsigned long FAT_CloseDirectory(FATDirectory *dir);
// FAT_GetDirIter starts a walk of the directory's entries (volume label,
// deleted and long-name slots are not entries). The iterator belongs to the
// directory: it lives until the next FAT_GetDirIter or FAT_CloseDirectory.
// FAT_DirIterNext moves to the next entry: FAT_OK, or FAT_ERR_END.
unsigned long FAT_GetDirIter(FATDirectory *dir, FATDirIter **out_iter);
unsigned long FAT_DirIterNext(FATDirIter *iter);
// FAT_DirIterGetName stores the current entry's name (the long name when it
// has one, UTF-8) as an allocated text.
unsigned long FAT_DirIterGetName(const FATDirIter *iter, char **out_name);
Bool FAT_DirIterIsDir(const FATDirIter *iter);

// FAT_OpenFile opens a file of the directory; names compare without regard
// to ASCII case, against long and short names. FAT_CreateFile adds an empty
// file (FAT_ERR_EXISTS when the name is taken).
unsigned long FAT_OpenFile(FATDirectory *dir, const char *name, FATFile **out_file);
unsigned long FAT_CreateFile(FATDirectory *dir, const char *name, FATFile **out_file);
// FAT_ReadFile reads up to `count` bytes at `offset`; *out_count is 0 at the
// end of the file.
unsigned long FAT_ReadFile(FATFile *file, uint64_t offset, void *buf, size_t count,
                           size_t *out_count);
// FAT_WriteFile writes at `offset`, growing the file (a gap reads as zeros).
unsigned long FAT_WriteFile(FATFile *file, uint64_t offset, const void *buf, size_t count,
                            size_t *out_written);
// FAT_SetFileSize cuts or extends (with zeros) the file.
unsigned long FAT_SetFileSize(FATFile *file, uint64_t size);
uint64_t FAT_GetFileSize(const FATFile *file);
unsigned long FAT_CloseFile(FATFile *file);
