/*
 * tvx_iso9660.h -- read-only ISO 9660 image reader (ECMA-119 with Joliet and
 * Rock Ridge names).
 *
 * Result codes (int): 0 success; 5 end of directory or file; any other value
 * is a failure (see Iso9660Result). Conventions: tvx_base.h.
 *
 * Names. An entry's name is, in this order of preference among the formats
 * the image holds and the open mode allows: its Rock Ridge name, its Joliet
 * name (as UTF-8), or its ISO 9660 name without the ";1" version (a level-1
 * name without extension keeps its dot: "KERNEL."). Directory paths use "/"
 * between components; "" and "/" name the root. Path components are matched
 * exactly first and then without regard to ASCII letter case.
 *
 * Open modes / formats (a bit mask): ISO9660_FORMAT_PLAIN (1), ISO9660_FORMAT_JOLIET
 * (2), ISO9660_FORMAT_ROCKRIDGE (4). The mode given to an open call is the set
 * of name formats the caller accepts; the reader uses the most preferred one
 * present on the image (Rock Ridge, then Joliet, then plain) and falls back to
 * plain names when none of the accepted ones is present. 0 accepts all.
 */
#ifndef TVX_ISO9660_H
#define TVX_ISO9660_H

#include "tvx_base.h"

TVX_BEGIN_DECLS

typedef struct Iso9660Image Iso9660Image;
typedef struct Iso9660Dir Iso9660Dir;
typedef struct Iso9660File Iso9660File;

typedef enum Iso9660Result {
  ISO9660_OK = 0,
  ISO9660_ERR_ARGUMENT = 1,  /* a null or malformed argument */
  ISO9660_ERR_IO = 2,        /* the image or a host file could not be read or written */
  ISO9660_ERR_NOT_FOUND = 3, /* no such path in the image */
  ISO9660_ERR_CORRUPT = 4,   /* a structure of the image is invalid */
  ISO9660_END = 5,           /* end of directory or of file */
  ISO9660_ERR_FORMAT = 6,    /* not an ISO 9660 image */
  ISO9660_ERR_UNSAFE = 7,    /* an entry name would leave the extraction target */
  ISO9660_ERR_NOT_DIR = 8,   /* a path names a file where a directory is needed */
  ISO9660_ERR_IS_DIR = 9,    /* a path names a directory where a file is needed */
} Iso9660Result;

#define ISO9660_FORMAT_PLAIN 1u
#define ISO9660_FORMAT_JOLIET 2u
#define ISO9660_FORMAT_ROCKRIDGE 4u

/* Iso9660DirEntry, the record Iso9660_ReadDir fills. `name` comes first. */
typedef struct Iso9660DirEntry {
  char name[256];      /* UTF-8, NUL-terminated */
  uint32_t size;       /* file size; all ones when it does not fit 32 bits */
  Bool isDirectory;
  uint64_t size64;     /* file size, exact */
  uint64_t priv[4];    /* the reader's; Iso9660_OpenFile needs them intact */
} Iso9660DirEntry;

/* Iso9660ReadCB reads exactly `length` bytes at `offset` of the caller's image
 * into `buffer`; TRUE only when all of them were read. Iso9660CloseCB releases
 * the caller's handle; TRUE on success. */
typedef Bool (*Iso9660ReadCB)(void *handle, void *buffer, size_t length, uint64_t offset);
typedef Bool (*Iso9660CloseCB)(void *handle);

/* Iso9660_ListFormats stores in *inout_formats the name formats present on
 * the image at `path` (bit mask). Returns 0, or a failure code. */
TVX_EXPORT int Iso9660_ListFormats(const char *path, uint32_t *inout_formats);
/* Iso9660_Open opens the image at `path` with open mode `mode`. */
TVX_EXPORT int Iso9660_Open(const char *path, uint32_t mode, Iso9660Image **out_image);
/* Iso9660_OpenWithReader opens an image read through the caller's callbacks.
 * The image takes ownership of `handle`: closeCB is called exactly once, by
 * Iso9660_Close, or before a failing Iso9660_OpenWithReader returns. */
TVX_EXPORT int Iso9660_OpenWithReader(Iso9660ReadCB readCB, Iso9660CloseCB closeCB,
                                      void *handle, uint32_t mode,
                                      Iso9660Image **out_image);
/* Iso9660_Close releases the image and everything opened on it. */
TVX_EXPORT int Iso9660_Close(Iso9660Image *image);
/* Iso9660_GetVolumeId returns the primary volume identifier without trailing
 * blanks (allocated), or NULL. */
TVX_EXPORT char *Iso9660_GetVolumeId(Iso9660Image *image);

TVX_EXPORT int Iso9660_OpenDir(Iso9660Image *image, const char *path, Iso9660Dir **out_dir);
/* Iso9660_ReadDir fills `entry` with the next entry ("." and ".." are never
 * returned): 0, or 5 at the end. */
TVX_EXPORT int Iso9660_ReadDir(Iso9660Image *image, Iso9660Dir *dir, Iso9660DirEntry *entry);
TVX_EXPORT int Iso9660_RewindDir(Iso9660Image *image, Iso9660Dir *dir);
TVX_EXPORT int Iso9660_CloseDir(Iso9660Image *image, Iso9660Dir *dir);

/* Iso9660_OpenFile opens the file an entry of Iso9660_ReadDir names (a
 * directory entry fails with ISO9660_ERR_IS_DIR). */
TVX_EXPORT int Iso9660_OpenFile(Iso9660Image *image, const Iso9660DirEntry *entry,
                                Iso9660File **out_file);
/* Iso9660_ReadFile reads the next bytes of the file: *inout_length is the room
 * in `buffer` on entry and the count read on return. 0 when bytes were read,
 * 5 at the end of the file (nothing read), else a failure. */
TVX_EXPORT int Iso9660_ReadFile(Iso9660Image *image, Iso9660File *file, void *buffer,
                                size_t *inout_length);
TVX_EXPORT int Iso9660_CloseFile(Iso9660Image *image, Iso9660File *file);

/* Iso9660_Extract copies the file or the whole directory tree at
 * `pathInImage` into the host directory `destDir` (created when missing) under
 * its own name; "" or "/" extracts the root's contents. Entry names that would
 * leave `destDir` ("..", "/" inside a name) fail with ISO9660_ERR_UNSAFE. */
TVX_EXPORT int Iso9660_Extract(Iso9660Image *image, const char *pathInImage,
                               const char *destDir);
/* Iso9660_ExtractFileEx copies the file at `pathInImage` to the host path
 * `targetPath` (created or replaced). */
TVX_EXPORT int Iso9660_ExtractFileEx(Iso9660Image *image, const char *pathInImage,
                                     const char *targetPath);

TVX_END_DECLS

#endif /* TVX_ISO9660_H */
