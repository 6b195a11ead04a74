// Internals of the tools-image selection and verified reading, shared by the
// files of lib/toolsImage and reachable from tests.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "lib/toolsImage/toolsiso_internal.h"
#include "tvx_toolsiso.h"
#include "tvx_toolsiso_image.h"

struct Dictionary;
struct HttpConnection;

namespace tvx::toolsiso {

// `certFile` below names the maker certificates to trust for signatures
// (null: the installed ones), as ToolsISO_VerifySignature takes it.

// LoadImageMap checks the map's detached signature ("<mapPath>.sig") and
// loads its bytes as a dictionary; null (logged) on any failure.
Dictionary *LoadImageMap(const char *mapPath, const char *bytes, size_t size,
                         Bool requireSignature, const char *certFile);

// The hash-info sources behind ToolsISO_GetLocalFileHashInfo and
// ToolsISO_GetHttpHashInfo (*out_info is null on entry).
Bool LocalHashInfo(const char *imagePath, uint64_t imageSize, Bool requireHash,
                   const char *certFile, ToolsIsoHashInfo **out_info);
Bool HttpHashInfo(HttpConnection *conn, const char *imageUrl, uint64_t imageSize,
                  Bool requireHash, const char *certFile, ToolsIsoHashInfo **out_info);

// MakeCompanionUrl inserts "." and `suffix` after the first ".iso" of `url`;
// "" (logged) when the URL has no ".iso".
std::string MakeCompanionUrl(const std::string &url, const char *suffix);

// MaxDetachedSignature is the largest detached signature accepted for hash
// data whose signed part is `signedSize` bytes (see the public header).
uint64_t MaxDetachedSignature(uint64_t signedSize);

// ResetSelectionState forgets the stored tools directory and cached name and
// sets the refresh count back to 1, as at process start (tests only).
void ResetSelectionState();

}  // namespace tvx::toolsiso
