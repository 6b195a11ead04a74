/*
 * tvx_toolsiso_image.h -- choosing the guest-tools ISO image of a guest and
 * reading an image with every block checked against its signed hash data,
 * from the local tools directory or from an HTTP server.
 *
 * 1. Conventions: tvx_base.h. Messages go to the log sink (tvx_log.h) and
 *    begin with "ToolsISO: ".
 * 2. Layout of a tools directory: TOOLSDIR/isoimages/NAME.iso, its hash data
 *    NAME.iso.sha, a detached signature of the hash data NAME.iso.sig (unless
 *    the signature is embedded in the hash data), and the image map
 *    TOOLSDIR/isoimages/isoimages_manifest.txt with its detached signature
 *    isoimages_manifest.txt.sig. The hash-data format and its parser,
 *    ToolsIsoHashInfo and ToolsISO_FreeHashInfo are in tvx_toolsiso.h.
 * 3. An image on a server: the hash data and signature URLs are the image URL
 *    with ".sha" or ".sig" inserted after its first ".iso" (a query after it
 *    is kept: ".../linux.iso?v=2" -> ".../linux.iso.sha?v=2").
 * 4. Process-wide state: the tools directory (fixed by the first successful
 *    ToolsISO_GetImagePath), the cached image name and the refresh counter.
 *    Every function here may be called from any thread.
 * 5. Verified handles (ToolsIsoLocalFile, ToolsIsoRemoteFile) serve one
 *    thread at a time. Reads start on a hash block boundary and cover whole
 *    blocks, except the read that ends at the image's end.
 *
 * Decisions on the points the format leaves open
 *  a. The image map is a dictionary in the project's text format: one
 *     `guestOS = "image.iso"` line per guest ("#" starts a comment). Names
 *     compare without regard to case, as guest identifiers do everywhere.
 *  b. The ".iso" ending of an image name is matched case-sensitively: the
 *     name is a file name on the host, and "LINUX.ISO" is another file.
 *  c. Every out parameter is cleared at entry (NULL, 0), the hash info of the
 *     two hash-info functions included, so no failure leaves a stale pointer.
 *  d. A server that cannot be reached, times out or answers with an error
 *     fails ToolsISO_GetHttpHashInfo whatever `requireHash` says: only a
 *     definite "not found" (404/410) for the hash data counts as "the image
 *     has no hash data", which `requireHash` FALSE tolerates. Otherwise an
 *     attacker who can drop connections could turn verification off.
 *  e. A detached signature is refused when it is not smaller than the signed
 *     part of the hash data OR 64 KiB, whichever is larger. A PEM signature
 *     with its certificate chain weighs 2 to 6 KB whatever it signs, so the
 *     bare rule would refuse every small image; the bound exists to stop an
 *     endless download, which 64 KiB does.
 *  f. The cached image name is never freed while the process runs: a name
 *     that a refresh replaces is kept on a retired list (freed at exit),
 *     because another thread may be copying it at that very moment.
 *  g. The ISO open mode handed out is the name format to read the image
 *     with: ISO9660_FORMAT_JOLIET (2) for Windows guests,
 *     ISO9660_FORMAT_ROCKRIDGE (4) otherwise (tvx_iso9660.h).
 *  h. Iso9660_OpenWithReader hands its callbacks whole aligned 4096-byte
 *     pieces (2048 at the end of an image of an odd number of sectors), so
 *     hash data with any block size dividing 4096 (512, 1024, 2048, 4096)
 *     serves the ISO reader; other block sizes work for direct reads only.
 */
#ifndef TVX_TOOLSISO_IMAGE_H
#define TVX_TOOLSISO_IMAGE_H

#include "tvx_base.h"

TVX_BEGIN_DECLS

typedef struct ToolsIsoHashInfo ToolsIsoHashInfo;
typedef struct ToolsIsoLocalFile ToolsIsoLocalFile;
typedef struct ToolsIsoRemoteFile ToolsIsoRemoteFile;

/* Results of ToolsISO_LocalFileOpen and ToolsISO_RemoteFileOpen. */
#define TOOLSISO_OPEN_OK 0          /* handle ready */
#define TOOLSISO_OPEN_IO_ERROR 1    /* image could not be opened or sized */
#define TOOLSISO_OPEN_HASH_ERROR 2  /* hash data or its signature failed */

/* ToolsISO_GetImagePath chooses the tools image of guest `guestOS` (an
 * identifier such as "windows9-64"): from the image map when it exists
 * (verified against its signature; with `requireSignature` FALSE a missing
 * signature file is tolerated, a bad one never), else from the built-in
 * family table. `hint` (optional) names the image explicitly; it must be a
 * valid name that the map (or, without a map, the table) lists. Without a
 * hint the answer is cached until ToolsISO_UpdateRefreshCount is called.
 * On TRUE *out_imagePath is TOOLSDIR/isoimages/NAME (allocated), and the
 * optional *out_imageBaseName (NAME without its extension, allocated) and
 * *out_isoOpenMode are filled. `toolsDir` is only looked at until one call
 * has succeeded; later calls use that first directory. */
TVX_EXPORT Bool ToolsISO_GetImagePath(const char *toolsDir, const char *guestOS, const char *hint,
                                      Bool requireSignature, char **out_imagePath,
                                      char **out_imageBaseName, uint32_t *out_isoOpenMode);
/* ToolsISO_GetImagePathEx is ToolsISO_GetImagePath checking the map's
 * signature against the maker certificates in `certFile` (optional; NULL:
 * the installed ones), as ToolsISO_VerifySignature's certName does. For
 * publishers checking their own signing keys; a host passes NULL. */
TVX_EXPORT Bool ToolsISO_GetImagePathEx(const char *toolsDir, const char *guestOS,
                                        const char *hint, Bool requireSignature,
                                        const char *certFile, char **out_imagePath,
                                        char **out_imageBaseName, uint32_t *out_isoOpenMode);
/* ToolsISO_GetImageBaseName returns the family image name of a numeric guest
 * id ("windows.iso", "linux.iso", ...), a constant, or NULL when the guest
 * has no tools image. */
TVX_EXPORT const char *ToolsISO_GetImageBaseName(uint32_t guestOSId);
/* ToolsISO_ValidateName: TRUE for 5 to 255 characters ending in ".iso" with
 * only ASCII letters, digits, "-", "." and "_" before it. */
TVX_EXPORT Bool ToolsISO_ValidateName(const char *name);
/* The refresh counter starts at 1; ToolsISO_UpdateRefreshCount makes the next
 * ToolsISO_GetImagePath without hint read the map again. */
TVX_EXPORT uint32_t ToolsISO_GetRefreshCount(void);
TVX_EXPORT void ToolsISO_UpdateRefreshCount(void);
/* ToolsISO_GetRealPath returns the canonical path (allocated), or a copy of
 * `path` when it cannot be resolved (logged). */
TVX_EXPORT char *ToolsISO_GetRealPath(const char *path);
/* ToolsISO_ReadFile reads a whole file of at most 256 MiB into a new buffer
 * one byte longer than the file, NUL-terminated. On FALSE nothing is handed
 * out. */
TVX_EXPORT Bool ToolsISO_ReadFile(const char *path, char **out_buffer, size_t *out_size);

/* ToolsISO_GetLocalFileHashInfo loads and verifies IMAGE.sha (canonical
 * path) with its embedded signature or IMAGE.sig. TRUE with *out_info NULL:
 * there is no hash data and `requireHash` is FALSE. A hash file that exists
 * but fails a check, or whose signature is missing or bad, gives FALSE. The
 * caller frees *out_info with ToolsISO_FreeHashInfo. */
TVX_EXPORT Bool ToolsISO_GetLocalFileHashInfo(const char *imagePath, uint64_t imageSize,
                                              Bool requireHash, ToolsIsoHashInfo **out_info);
/* ToolsISO_GetHttpHashInfo does the same for an image URL. `connection` is
 * an open platform HTTP connection, or NULL to use one of its own for the
 * call (the caller's stays open). See decision d. */
TVX_EXPORT Bool ToolsISO_GetHttpHashInfo(void *connection, const char *imageUrl,
                                         uint64_t imageSize, Bool requireHash,
                                         ToolsIsoHashInfo **out_info);

/* ToolsISO_LocalFileOpen opens a local image for verified reading:
 * TOOLSISO_OPEN_OK with *out_handle set, TOOLSISO_OPEN_IO_ERROR or
 * TOOLSISO_OPEN_HASH_ERROR (the caller reports a failed signature check).
 * With `requireHash` FALSE an image without hash data opens unchecked. */
TVX_EXPORT int ToolsISO_LocalFileOpen(const char *imagePath, Bool requireHash,
                                      ToolsIsoLocalFile **out_handle);
/* ToolsISO_LocalFileOpenEx: the same, trusting `certFile` (optional) as
 * ToolsISO_GetImagePathEx does. */
TVX_EXPORT int ToolsISO_LocalFileOpenEx(const char *imagePath, Bool requireHash,
                                        const char *certFile, ToolsIsoLocalFile **out_handle);
/* ToolsISO_LocalFileReadCB reads up to `length` bytes at `offset`, fewer only
 * at the image's end; *out_bytesRead (optional) gets the count. Without
 * out_bytesRead a short read is a failure. Every block read is checked
 * against the hash data: FALSE on a mismatch or a misaligned read. */
TVX_EXPORT Bool ToolsISO_LocalFileReadCB(void *handle, void *buffer, size_t length,
                                         uint64_t offset, size_t *out_bytesRead);
/* ToolsISO_LocalFileIsoReadCB reads exactly `length` bytes (the
 * Iso9660ReadCB of tvx_iso9660.h). */
TVX_EXPORT Bool ToolsISO_LocalFileIsoReadCB(void *handle, void *buffer, size_t length,
                                            uint64_t offset);
/* ToolsISO_LocalFileCloseCB closes the image and frees the handle (the
 * Iso9660CloseCB); TRUE when the file closed cleanly. */
TVX_EXPORT Bool ToolsISO_LocalFileCloseCB(void *handle);

/* The same verified reading for an image URL (http:// or https://), with
 * the hash data and signature at the companion URLs (point 3). The handle
 * keeps one connection open until it is closed. */
TVX_EXPORT int ToolsISO_RemoteFileOpen(const char *imageUrl, Bool requireHash,
                                       ToolsIsoRemoteFile **out_handle);
TVX_EXPORT int ToolsISO_RemoteFileOpenEx(const char *imageUrl, Bool requireHash,
                                         const char *certFile, ToolsIsoRemoteFile **out_handle);
TVX_EXPORT Bool ToolsISO_RemoteFileReadCB(void *handle, void *buffer, size_t length,
                                          uint64_t offset, size_t *out_bytesRead);
TVX_EXPORT Bool ToolsISO_RemoteFileIsoReadCB(void *handle, void *buffer, size_t length,
                                             uint64_t offset);
TVX_EXPORT Bool ToolsISO_RemoteFileCloseCB(void *handle);

/* ToolsIsoImageInfo describes an open verified handle. */
typedef struct ToolsIsoImageInfo {
  uint64_t imageSize;
  Bool hashed;             /* FALSE: opened without hash data, reads unchecked */
  Bool embeddedSignature;  /* the signature sits inside the hash data */
  uint32_t blockSize;      /* bytes per hash block (0 when not hashed) */
  uint64_t hashCount;      /* blocks covered by the hash data */
} ToolsIsoImageInfo;

/* ToolsISO_GetImageInfo fills `out_info` for a handle of either kind. */
TVX_EXPORT Bool ToolsISO_GetImageInfo(const void *handle, ToolsIsoImageInfo *out_info);

TVX_END_DECLS

#endif /* TVX_TOOLSISO_IMAGE_H */
