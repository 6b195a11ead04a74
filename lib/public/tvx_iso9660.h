/*
 * tvx_iso9660.h -- read-only ISO 9660 image reader (ECMA-119 with Joliet and
 * Rock Ridge names).
 *
 * Result codes (int): 0 success; 5 end of directory or file; any other value
 * is a failure (see Iso9660Result). Conventions: tvx_base.h.
 *
 * Names. An entry's name is, in this order of preference among the formats
 * the image holds and the open mode allows: its Rock Ridge name, its Joliet
 * name (as UTF-8), or its ISO 9660 name without the ";1" version and without
 * the dot of a name that has no extension ("KERNEL." is listed as "KERNEL").
 * Bytes of a name that are not UTF-8 come back as U+FFFD. Directory paths use "/"
 * between components; "" and "/" name the root. Path components are matched
 * exactly first and then without regard to ASCII letter case.
 *
 * Open modes / formats (a bit mask): ISO9660_FORMAT_PLAIN (1), ISO9660_FORMAT_JOLIET
 * (2), ISO9660_FORMAT_ROCKRIDGE (4). The mode given to an open call is the set
 * of name formats the caller accepts; the reader uses the most preferred one
 * present on the image (Rock Ridge, then Joliet, then plain) and falls back to
 * plain names when none of the accepted ones is present. 0 accepts all.
 * Bits other than these three make an open call fail with
 * ISO9660_ERR_ARGUMENT.
 *
 * Limits. The reader refuses (ISO9660_ERR_CORRUPT) directories larger than
 * 16 MiB, directory paths through a directory loop, extents beyond the end of
 * the image or overlapping one another within a file, and records whose
 * lengths or both-endian copies disagree. Walks of a whole tree
 * (Iso9660_ListTree, Iso9660_Extract) also refuse a directory reached twice
 * (a loop or a directory shared by two parents), more entries than the image
 * has room for and trees nested deeper than 128 levels.
 *
 * Handles. Directory and file handles belong to the image that opened them;
 * passing one to another image fails with ISO9660_ERR_ARGUMENT. Calls on one
 * image are not synchronised: use an image from one thread at a time.
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
  char name[256];      /* UTF-8, NUL-terminated; a longer name is cut at a
                          character boundary (open such an entry through this
                          record, not by its name) */
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
/* Iso9660_Open opens the image at `path` with open mode `mode`: 0, or
 * ISO9660_ERR_IO (cannot open the file), ISO9660_ERR_FORMAT (no ISO 9660
 * volume), ISO9660_ERR_CORRUPT. *out_image is NULL on failure. */
TVX_EXPORT int Iso9660_Open(const char *path, uint32_t mode, Iso9660Image **out_image);
/* Iso9660_OpenWithReader opens an image read through the caller's callbacks
 * (readCB required, closeCB optional). On success the image owns `handle`:
 * Iso9660_Close calls closeCB once. On failure closeCB is not called and the
 * handle stays the caller's to close. */
TVX_EXPORT int Iso9660_OpenWithReader(Iso9660ReadCB readCB, Iso9660CloseCB closeCB,
                                      void *handle, uint32_t mode,
                                      Iso9660Image **out_image);
/* Iso9660_Close releases the image and every directory and file handle still
 * open on it. */
TVX_EXPORT int Iso9660_Close(Iso9660Image *image);
/* Iso9660_GetVolumeId returns the primary volume identifier without trailing
 * blanks (allocated), or NULL. */
TVX_EXPORT char *Iso9660_GetVolumeId(Iso9660Image *image);

/* Iso9660_OpenDir opens the directory at `path` (NULL, "" or "/": the root);
 * ISO9660_ERR_NOT_FOUND, ISO9660_ERR_NOT_DIR or ISO9660_ERR_CORRUPT
 * otherwise. The listing is read whole when the directory opens. */
TVX_EXPORT int Iso9660_OpenDir(Iso9660Image *image, const char *path, Iso9660Dir **out_dir);
/* Iso9660_ReadDir fills `entry` with the next entry ("." and ".." are never
 * returned): 0, or 5 at the end. */
TVX_EXPORT int Iso9660_ReadDir(Iso9660Image *image, Iso9660Dir *dir, Iso9660DirEntry *entry);
TVX_EXPORT int Iso9660_RewindDir(Iso9660Image *image, Iso9660Dir *dir);
TVX_EXPORT int Iso9660_CloseDir(Iso9660Image *image, Iso9660Dir *dir);

/* Iso9660_OpenFile opens the file an entry of Iso9660_ReadDir names (a
 * directory entry fails with ISO9660_ERR_IS_DIR). The record must come from
 * Iso9660_ReadDir on the same image, unchanged (ISO9660_ERR_ARGUMENT
 * otherwise), or be a zero-filled record holding only a name: that name is
 * then resolved as a path from the root, like Iso9660_OpenDir paths. A file
 * handle stays valid after its directory handle is closed. */
TVX_EXPORT int Iso9660_OpenFile(Iso9660Image *image, const Iso9660DirEntry *entry,
                                Iso9660File **out_file);
/* Iso9660_ReadFile reads the next bytes of the file: *inout_length is the room
 * in `buffer` on entry and the count read on return (at most the room; fewer
 * only at the end of the file). 0 when bytes were read, 5 at the end of the
 * file (nothing read), else a failure (count 0): ISO9660_ERR_IO when the
 * image cannot be read, ISO9660_ERR_ARGUMENT for a room of 0 before the end. */
TVX_EXPORT int Iso9660_ReadFile(Iso9660Image *image, Iso9660File *file, void *buffer,
                                size_t *inout_length);
TVX_EXPORT int Iso9660_CloseFile(Iso9660Image *image, Iso9660File *file);

/* Iso9660_Extract copies into the host directory `destDir` (created with its
 * parents when missing) the file at `pathInImage` under its own name in the
 * image, or, when `pathInImage` names a directory, that directory's contents
 * with all subdirectories ("", "/" or NULL: the root's contents). The whole
 * tree is checked before anything is written, and nothing is written when it
 * fails: an entry name that would leave `destDir` ("", ".", "..", "/" inside
 * a name) fails with ISO9660_ERR_UNSAFE; a directory loop or shared
 * directory, a name twice in one directory, a bad extent or file data adding
 * up to more than the image holds fail with ISO9660_ERR_CORRUPT. Symbolic
 * links recorded in the image are skipped. An existing file (or link) where
 * a file goes is replaced, never written through; an existing symbolic link
 * where a directory goes fails with ISO9660_ERR_UNSAFE. A failure while
 * writing leaves what was written so far. */
TVX_EXPORT int Iso9660_Extract(Iso9660Image *image, const char *pathInImage,
                               const char *destDir);
/* Iso9660_ExtractFileEx copies the file at `pathInImage` to the host path
 * `targetPath` (created or replaced; removed again when the copy fails). */
TVX_EXPORT int Iso9660_ExtractFileEx(Iso9660Image *image, const char *pathInImage,
                                     const char *targetPath);

/* Iso9660TreeCB receives one entry of Iso9660_ListTree: its path relative to
 * the listed directory, whether it is a directory, and its size. Return TRUE
 * to go on; FALSE stops the walk (which then returns ISO9660_ERR_IO). */
typedef Bool (*Iso9660TreeCB)(void *ctx, const char *relPath, Bool isDirectory, uint64_t size);
/* Iso9660_ListTree hands every entry of the directory at `path` (NULL, ""
 * or "/": the root) to `callback`, and with `recursive` every entry below it,
 * depth first. Returns 0, or a failure code; a tree that breaks the limits
 * above fails with ISO9660_ERR_CORRUPT after the entries reached so far. */
TVX_EXPORT int Iso9660_ListTree(Iso9660Image *image, const char *path, Bool recursive,
                                Iso9660TreeCB callback, void *ctx);

TVX_END_DECLS

#endif /* TVX_ISO9660_H */
