/*
 * tvx_udf.h -- read-only UDF image reader (ECMA-167 / OSTA UDF 1.02 to 2.60).
 *
 * Conventions: tvx_base.h. Names are UTF-8 (OSTA CS0, 8- and 16-bit). Paths
 * use "/" between components; "" and "/" name the root. Every handle is
 * independent: files may be read interleaved, from one thread at a time per
 * volume.
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
 * `handle` (closeCB runs once, in UDF_Close or when opening fails). */
TVX_EXPORT UDFVolume *UDF_OpenWithReader(UDFReadCB readCB, UDFCloseCB closeCB, void *handle);
TVX_EXPORT void UDF_Close(UDFVolume *volume);
/* UDF_GetVolumeId returns the logical volume identifier (allocated) or NULL. */
TVX_EXPORT char *UDF_GetVolumeId(UDFVolume *volume);

/* UDF_OpenDir opens `path` relative to `parent` (optional: NULL means the
 * root). NULL when it does not name a directory. */
TVX_EXPORT UDFDir *UDF_OpenDir(UDFVolume *volume, UDFDir *parent, const char *path);
/* UDF_ReadDir returns the next entry's name (owned by the directory, valid
 * until the next call) or NULL at the end or on a read failure. `flags` is
 * reserved: pass 0. The parent entry is never returned. */
TVX_EXPORT const char *UDF_ReadDir(UDFDir *dir, int flags);
/* Facts about the entry UDF_ReadDir returned last. */
TVX_EXPORT Bool UDF_DirEntryIsDir(UDFDir *dir);
TVX_EXPORT uint64_t UDF_DirEntrySize(UDFDir *dir);
TVX_EXPORT void UDF_RewindDir(UDFDir *dir);
TVX_EXPORT Bool UDF_CloseDir(UDFDir *dir);

/* UDF_OpenFile opens the file `name` (a path relative to `dir`; `dir`
 * optional, NULL means the root). Names match exactly. NULL when absent or
 * a directory. */
TVX_EXPORT UDFFile *UDF_OpenFile(UDFVolume *volume, UDFDir *dir, const char *name);
/* UDF_GetFileSize: size in bytes, all ones on failure. */
TVX_EXPORT uint64_t UDF_GetFileSize(UDFVolume *volume, UDFFile *file);
/* UDF_PReadFile reads exactly `length` bytes at `offset`; TRUE when all were
 * read. */
TVX_EXPORT Bool UDF_PReadFile(UDFFile *file, void *buffer, uint64_t offset, size_t length);
TVX_EXPORT void UDF_CloseFile(UDFFile *file);

TVX_END_DECLS

#endif /* TVX_UDF_H */
