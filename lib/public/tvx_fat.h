/*
 * tvx_fat.h -- FAT12/FAT16 volumes in image files, floppy images above all:
 * format a floppy, open a volume, walk and add to its root directory, and
 * read, write and resize its files. Conventions: tvx_base.h.
 *
 * Result codes: every call that returns unsigned long gives 0 (FAT_OK) or
 * one of the FATResult numbers below.
 *
 * Names. Entries have an 8.3 short name and, where the name does not fit
 * that form exactly (mixed case, long, other characters), a long (VFAT) name
 * of up to 255 UTF-16 units; names go in and out as UTF-8. Lookups compare
 * without regard to ASCII letter case, against long and short names.
 *
 * Volume in memory. An open volume (at most 64 MiB: floppies and small
 * disks) is read whole and written back to its image file, through the
 * descriptor opened with it, when a file, the root directory or the volume
 * is closed; nothing is written before. Handles belong to their volume and
 * are used from one thread at a time. Only the root directory is reachable:
 * subdirectories are listed, never entered.
 *
 * Decisions
 *  1. A new image is formatted crash-safe: it is written whole to a
 *     temporary file beside the target and renamed over it, so a failed
 *     format leaves no image (and an existing file at that name untouched).
 *     A symbolic link at the name is replaced, never written through.
 *  2. A write that finds the volume full writes what fits (whole free
 *     clusters), reports that count through out_written and returns
 *     FAT_ERR_NO_SPACE; the file keeps the bytes written. FAT_SetFileSize is
 *     all or nothing.
 *  3. Damaged structures are refused with FAT_ERR_CORRUPT where they are met:
 *     a cluster chain that loops, leaves the data area or is shorter than the
 *     file's size.
 */
#ifndef TVX_FAT_H
#define TVX_FAT_H

#include "tvx_base.h"

TVX_BEGIN_DECLS

typedef struct FATDevice FATDevice;
typedef struct FATVolume FATVolume;
typedef struct FATDirectory FATDirectory;
typedef struct FATDirIter FATDirIter;
typedef struct FATFile FATFile;

typedef enum FATResult {
  FAT_OK = 0,
  FAT_ERR_IO = 1,          /* the image cannot be opened, read or written */
  FAT_ERR_CORRUPT = 2,     /* not a FAT volume, or damaged structures */
  FAT_ERR_UNSUPPORTED = 3, /* FAT32, an image over 64 MiB, a size that cannot be formatted */
  FAT_ERR_NOT_FOUND = 4,
  FAT_ERR_EXISTS = 5,
  FAT_ERR_NO_SPACE = 6,    /* no free cluster or root directory entry */
  FAT_ERR_BAD_NAME = 7,
  FAT_ERR_ARGS = 8,
  FAT_ERR_END = 9,         /* no more directory entries */
} FATResult;

/* The size of a 3.5" high-density floppy image. */
#define FAT_FLOPPY_SIZE 1474560u

/* FATDevFileIO_Open makes a device over the image file at `path` (nothing is
 * opened yet; NULL for a NULL path). FAT_FormatVolume and FAT_OpenVolume take
 * the device over, whether they succeed or not; a device never given to them
 * is released with FATDev_Close (NULL harmless). */
TVX_EXPORT FATDevice *FATDevFileIO_Open(const char *path);
TVX_EXPORT void FATDev_Close(FATDevice *dev);

/* FAT_FormatVolume creates (or replaces) the image as an empty FAT12 volume
 * of `size` bytes: 1,474,560, 737,280 or 2,949,120 (FAT_ERR_UNSUPPORTED for
 * others). `flags` is unused (0). */
TVX_EXPORT unsigned long FAT_FormatVolume(FATDevice *dev, uint64_t size, unsigned flags,
                                          FATVolume **out_volume);
/* FAT_OpenVolume opens an existing image for reading and writing; it never
 * creates one (FAT_ERR_IO when the file is missing). */
TVX_EXPORT unsigned long FAT_OpenVolume(FATDevice *dev, FATVolume **out_volume);
/* FAT_SkipVolumeBoot leaves the boot sector as it is. The boot sector is
 * never rewritten here, so this only checks the handle. */
TVX_EXPORT unsigned long FAT_SkipVolumeBoot(FATVolume *volume);
/* FAT_CloseVolume writes back and releases the volume (and its device); NULL
 * is harmless. Close its directories and files first. */
TVX_EXPORT unsigned long FAT_CloseVolume(FATVolume *volume);
/* FAT_GetFreeBytes stores the room left for file contents. */
TVX_EXPORT unsigned long FAT_GetFreeBytes(FATVolume *volume, uint64_t *out_bytes);

TVX_EXPORT unsigned long FAT_OpenRootDirectory(FATVolume *volume, FATDirectory **out_dir);
/* FAT_CloseDirectory writes back pending changes; NULL is harmless. */
TVX_EXPORT unsigned long FAT_CloseDirectory(FATDirectory *dir);

/* FAT_GetDirIter starts a walk of the directory's entries (the volume label,
 * deleted slots, long-name slots, "." and ".." are not entries). The iterator
 * belongs to the directory: it lives until the next FAT_GetDirIter or
 * FAT_CloseDirectory. FAT_DirIterNext moves to the next entry (the first on
 * its first call): FAT_OK, or FAT_ERR_END. */
TVX_EXPORT unsigned long FAT_GetDirIter(FATDirectory *dir, FATDirIter **out_iter);
TVX_EXPORT unsigned long FAT_DirIterNext(FATDirIter *iter);
/* FAT_DirIterGetName stores the current entry's name (its long name when it
 * has one) as an allocated UTF-8 text. */
TVX_EXPORT unsigned long FAT_DirIterGetName(const FATDirIter *iter, char **out_name);
TVX_EXPORT Bool FAT_DirIterIsDir(const FATDirIter *iter);
/* FAT_DirIterGetSize stores the current entry's size in bytes (0 for a
 * directory). */
TVX_EXPORT unsigned long FAT_DirIterGetSize(const FATDirIter *iter, uint64_t *out_size);

/* FAT_OpenFile opens a file of the directory (FAT_ERR_NOT_FOUND also for a
 * directory). FAT_CreateFile adds an empty file (FAT_ERR_EXISTS when the name
 * is taken, FAT_ERR_BAD_NAME for a name FAT cannot hold). FAT_DeleteFile
 * removes a file and frees its clusters; it must not be open. */
TVX_EXPORT unsigned long FAT_OpenFile(FATDirectory *dir, const char *name, FATFile **out_file);
TVX_EXPORT unsigned long FAT_CreateFile(FATDirectory *dir, const char *name,
                                        FATFile **out_file);
TVX_EXPORT unsigned long FAT_DeleteFile(FATDirectory *dir, const char *name);
/* FAT_ReadFile reads up to `count` bytes at `offset`; *out_count is 0 at the
 * end of the file. */
TVX_EXPORT unsigned long FAT_ReadFile(FATFile *file, uint64_t offset, void *buf, size_t count,
                                      size_t *out_count);
/* FAT_WriteFile writes at `offset`, growing the file (a gap reads as zeros);
 * *out_written is the count written (see decision 2). */
TVX_EXPORT unsigned long FAT_WriteFile(FATFile *file, uint64_t offset, const void *buf,
                                       size_t count, size_t *out_written);
/* FAT_SetFileSize cuts or extends (with zeros) the file. */
TVX_EXPORT unsigned long FAT_SetFileSize(FATFile *file, uint64_t size);
TVX_EXPORT uint64_t FAT_GetFileSize(const FATFile *file);
/* FAT_CloseFile writes back pending changes; NULL is harmless. */
TVX_EXPORT unsigned long FAT_CloseFile(FATFile *file);

TVX_END_DECLS

#endif /* TVX_FAT_H */
