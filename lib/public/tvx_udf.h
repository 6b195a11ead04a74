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
 * holding "/" or NUL) are never listed or opened.
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

TVX_END_DECLS

#endif /* TVX_UDF_H */
