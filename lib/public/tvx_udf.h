/*
 * tvx_udf.h -- read-only UDF image reader (ECMA-167 / OSTA UDF 1.02 to 2.60).
 *
 * Conventions: tvx_base.h. Names are UTF-8 (OSTA CS0, 8- and 16-bit). Paths
 * use "/" between components; "" and "/" name the root, and empty components
 * are ignored. Every handle is independent: files may be read interleaved,
 * from one thread at a time per volume. Directory and file handles must be
 * closed before their volume.
 *
 * Damaged or hostile images fail cleanly: the call returns NULL, FALSE or
 * all ones and one "UDF: ..." line goes to the log sink. An image that holds
 * no UDF volume at all fails without logging, since callers probe media.
 * Entries whose names cannot be one path component (empty, ".", "..", or
 * holding "/" or NUL) are never listed or opened by name; UDF_ListTree shows
 * them with an empty name and UDF_Extract refuses a tree that holds one.
 */
#ifndef TVX_UDF_H
#define TVX_UDF_H

#include "tvx_base.h"

TVX_BEGIN_DECLS

typedef struct UDFVolume UDFVolume;
typedef struct UDFDir UDFDir;
typedef struct UDFFile UDFFile;

typedef Bool (*UDFReadCB)(void *handle, void *buffer, size_t length, uint64_t offset);
typedef Bool (*UDFCloseCB)(void *handle);

/* UDF_Open opens the UDF volume of the image at `path`; NULL when the image
 * holds none (a pure ISO 9660 image) or cannot be read. */
TVX_EXPORT UDFVolume *UDF_Open(const char *path);
/* UDF_OpenWithReader: the same over caller callbacks; the volume owns
 * `handle` (closeCB, optional, runs once: in UDF_Close or when opening
 * fails). readCB must fill all `length` bytes at `offset` or return FALSE.
 * Callbacks cannot tell the image size, so only the anchor at sector 256 is
 * looked for and volumes of sequentially written media (virtual partitions,
 * whose table is found from the end of the image) do not open this way. */
TVX_EXPORT UDFVolume *UDF_OpenWithReader(UDFReadCB readCB, UDFCloseCB closeCB, void *handle);
TVX_EXPORT void UDF_Close(UDFVolume *volume);
/* UDF_GetVolumeId returns the logical volume identifier (allocated) or NULL. */
TVX_EXPORT char *UDF_GetVolumeId(UDFVolume *volume);

/* UDF_OpenDir opens `path` relative to `parent` (optional: NULL means the
 * root). Names match exactly, as in UDF_OpenFile. NULL when it does not name
 * a directory, or the directory is its own ancestor or nests deeper than 256
 * levels. */
TVX_EXPORT UDFDir *UDF_OpenDir(UDFVolume *volume, UDFDir *parent, const char *path);
/* UDF_ReadDir returns the next entry's name (owned by the directory, valid
 * until the next call) or NULL at the end or on a read failure. `flags` is
 * reserved: pass 0. The parent entry is never returned. */
TVX_EXPORT const char *UDF_ReadDir(UDFDir *dir, int flags);
/* Facts about the entry UDF_ReadDir returned last: whether it is recorded
 * as a directory, and its size in bytes (all ones when there is no such
 * entry or its file entry cannot be read). */
TVX_EXPORT Bool UDF_DirEntryIsDir(UDFDir *dir);
TVX_EXPORT uint64_t UDF_DirEntrySize(UDFDir *dir);
TVX_EXPORT void UDF_RewindDir(UDFDir *dir);
TVX_EXPORT Bool UDF_CloseDir(UDFDir *dir);

/* UDF_OpenFile opens the file `name` (a path relative to `dir`; `dir`
 * optional, NULL means the root). Names match exactly: byte for byte in
 * UTF-8, letter case included. NULL when absent, or not a file of data (a
 * directory, a symbolic link, a device). */
TVX_EXPORT UDFFile *UDF_OpenFile(UDFVolume *volume, UDFDir *dir, const char *name);
/* UDF_GetFileSize: size in bytes, all ones on failure. */
TVX_EXPORT uint64_t UDF_GetFileSize(UDFVolume *volume, UDFFile *file);
/* UDF_PReadFile reads exactly `length` bytes at `offset`; TRUE when all were
 * read, FALSE when the range passes the end of the file or a block cannot be
 * read. Unrecorded (sparse) parts read as zeros. */
TVX_EXPORT Bool UDF_PReadFile(UDFFile *file, void *buffer, uint64_t offset, size_t length);
TVX_EXPORT void UDF_CloseFile(UDFFile *file);

/* Results of UDF_ListTree and UDF_Extract: the numbers of Iso9660Result, so
 * that one table of messages serves both readers. */
typedef enum UDFTreeResult {
  UDF_TREE_OK = 0,
  UDF_TREE_ERR_ARGUMENT = 1,
  UDF_TREE_ERR_IO = 2,        /* the image or a host file could not be read or written */
  UDF_TREE_ERR_NOT_FOUND = 3,
  UDF_TREE_ERR_CORRUPT = 4,   /* a structure of the image is invalid */
  UDF_TREE_ERR_UNSAFE = 7,    /* an entry name would leave the extraction target */
  UDF_TREE_ERR_NOT_DIR = 8,
  UDF_TREE_ERR_IS_DIR = 9,
} UDFTreeResult;

/* UDFTreeCB receives one entry of UDF_ListTree: its path relative to the
 * listed directory, whether it is a directory, and its size. TRUE goes on;
 * FALSE stops the walk (UDF_TREE_ERR_IO). */
typedef Bool (*UDFTreeCB)(void *ctx, const char *relPath, Bool isDirectory, uint64_t size);
/* UDF_ListTree hands every entry of the directory at `path` (NULL, "" or
 * "/": the root) to `callback`, and with `recursive` every entry below it,
 * depth first. A directory reached twice (a loop, or children shared between
 * directories), more entries than the image has room for or nesting deeper
 * than 128 levels fail with UDF_TREE_ERR_CORRUPT after the entries reached so
 * far. */
TVX_EXPORT int UDF_ListTree(UDFVolume *volume, const char *path, Bool recursive,
                            UDFTreeCB callback, void *ctx);
/* UDF_Extract copies into the host directory `destDir` (created with its
 * parents) the file at `pathInImage` under its own name, or the contents of
 * the directory at `pathInImage` with all subdirectories, under the same
 * rules as Iso9660_Extract: the whole tree is checked first and nothing is
 * written when an entry name would leave `destDir` (UDF_TREE_ERR_UNSAFE), when
 * the tree loops or shares a directory, holds a name twice in one directory
 * or its files' data add up past the image's size (UDF_TREE_ERR_CORRUPT).
 * Links and devices are skipped; unrecorded parts of files become holes of
 * sparse output files. An existing file where a file goes is replaced, never
 * written through. */
TVX_EXPORT int UDF_Extract(UDFVolume *volume, const char *pathInImage, const char *destDir);

TVX_END_DECLS

#endif /* TVX_UDF_H */
