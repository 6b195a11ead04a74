// Verified reading of a tools image: every byte a read hands out has been
// checked against the image's signed hash table. The handles plug into
// Iso9660_OpenWithReader, so every file extracted from the image is checked
// too. A local image is read with pread, an image on a server with ranged
// GETs over one kept-alive connection; the checks are the same.
#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string>

#include "lib/toolsImage/toolsiso_image_internal.h"
#include "platform/fileio.h"
#include "platform/http.h"
#include "platform/log.h"
#include "platform/unique.h"
#include "platform/util.h"

// One record serves both kinds of handle: `conn` is set for an image on a
// server, `fd` for a local one. Plain members only, so that a
// ToolsIsoRemoteFile pointer is also a pointer to its base.
struct ToolsIsoLocalFile {
  FileIODescriptor fd;
  uint64_t size;
  ToolsIsoHashInfo *info;  // null: reads are not checked
  HttpConnection *conn;
  char *url;
};
struct ToolsIsoRemoteFile : ToolsIsoLocalFile {};

namespace {

ToolsIsoLocalFile *NewHandle() {
  auto *h = static_cast<ToolsIsoLocalFile *>(UtilSafeCalloc0(1, sizeof(ToolsIsoLocalFile)));
  FileIO_Invalidate(&h->fd);
  return h;
}

// CloseHandle releases everything the handle holds; false when the file or
// connection did not close cleanly.
bool CloseHandle(ToolsIsoLocalFile *h) {
  bool ok = FileIO_Close(&h->fd) == FILEIO_SUCCESS;
  if (h->conn != nullptr) ok = Http_Close(h->conn) == HTTP_OK && ok;
  ToolsISO_FreeHashInfo(h->info);
  free(h->url);
  free(h);
  return ok;
}

bool ReadRaw(ToolsIsoLocalFile *h, void *buffer, size_t n, uint64_t offset) {
  if (h->conn != nullptr) {
    return Http_Read(h->conn, h->url, offset, buffer, n, nullptr, nullptr) == HTTP_OK;
  }
  return FileIO_Pread(&h->fd, buffer, n, offset) == FILEIO_SUCCESS;
}

Bool Read(ToolsIsoLocalFile *h, void *buffer, size_t length, uint64_t offset,
          size_t *out_bytesRead) {
  if (out_bytesRead != nullptr) *out_bytesRead = 0;
  uint64_t available = offset < h->size ? h->size - offset : 0;
  size_t n = static_cast<size_t>(std::min<uint64_t>(length, available));
  if (n == 0) return out_bytesRead != nullptr || length == 0;
  if (out_bytesRead == nullptr && n < length) return FALSE;
  if (!ReadRaw(h, buffer, n, offset)) return FALSE;
  if (h->info != nullptr &&
      !ToolsISO_VerifyHashes(h->info, offset, static_cast<const uint8_t *>(buffer), n, FALSE)) {
    Log("ToolsISO: Invalid data at offset %lx (bytes %zu)\n", static_cast<unsigned long>(offset), n);
    // Bytes that failed their check never reach the caller.
    memset(buffer, 0, n);
    return FALSE;
  }
  if (out_bytesRead != nullptr) *out_bytesRead = n;
  return TRUE;
}

int OpenLocal(const char *imagePath, Bool requireHash, const char *certFile,
              ToolsIsoLocalFile **out_handle) {
  ToolsIsoLocalFile *h = NewHandle();
  tvx::CharPtr real(ToolsISO_GetRealPath(imagePath));
  FileIOResult rc = FileIO_Open(&h->fd, real.get(), FILEIO_OPEN_ACCESS_READ | FILEIO_OPEN_LARGEFILE,
                                FILEIO_OPEN);
  if (rc != FILEIO_SUCCESS) {
    Log("ToolsISO: Failed to open Tools ISO %s (FileIOResult=%d).\n", real.get(), rc);
    CloseHandle(h);
    return TOOLSISO_OPEN_IO_ERROR;
  }
  h->size = FileIO_GetSize(&h->fd);
  if (h->size == UINT64_MAX) {
    Log("ToolsISO: Failed to get the size of Tools ISO %s.\n", real.get());
    CloseHandle(h);
    return TOOLSISO_OPEN_IO_ERROR;
  }
  if (!tvx::toolsiso::LocalHashInfo(real.get(), h->size, requireHash, certFile, &h->info)) {
    CloseHandle(h);
    return TOOLSISO_OPEN_HASH_ERROR;
  }
  *out_handle = h;
  return TOOLSISO_OPEN_OK;
}

int OpenRemote(const char *imageUrl, Bool requireHash, const char *certFile,
               ToolsIsoRemoteFile **out_handle) {
  auto *h = static_cast<ToolsIsoRemoteFile *>(UtilSafeCalloc0(1, sizeof(ToolsIsoRemoteFile)));
  FileIO_Invalidate(&h->fd);
  h->url = UtilSafeStrdup0(imageUrl);
  HttpError e = Http_Connect(imageUrl, 4, 15000, 0, nullptr, nullptr, &h->conn);
  if (e == HTTP_OK) e = Http_GetFileSize(h->conn, imageUrl, &h->size);
  if (e != HTTP_OK) {
    Log("ToolsISO: Failed to open Tools ISO %s (%s).\n", imageUrl, Http_ErrorString(e));
    CloseHandle(h);
    return TOOLSISO_OPEN_IO_ERROR;
  }
  if (!tvx::toolsiso::HttpHashInfo(h->conn, imageUrl, h->size, requireHash, certFile, &h->info)) {
    CloseHandle(h);
    return TOOLSISO_OPEN_HASH_ERROR;
  }
  *out_handle = h;
  return TOOLSISO_OPEN_OK;
}

}  // namespace

extern "C" {

int ToolsISO_LocalFileOpen(const char *imagePath, Bool requireHash, ToolsIsoLocalFile **out_handle) {
  return ToolsISO_LocalFileOpenEx(imagePath, requireHash, nullptr, out_handle);
}

int ToolsISO_LocalFileOpenEx(const char *imagePath, Bool requireHash, const char *certFile,
                             ToolsIsoLocalFile **out_handle) {
  if (out_handle != nullptr) *out_handle = nullptr;
  if (imagePath == nullptr || out_handle == nullptr) return TOOLSISO_OPEN_IO_ERROR;
  try {
    return OpenLocal(imagePath, requireHash, certFile, out_handle);
  } catch (...) {
    return TOOLSISO_OPEN_IO_ERROR;
  }
}

Bool ToolsISO_LocalFileReadCB(void *handle, void *buffer, size_t length, uint64_t offset,
                              size_t *out_bytesRead) {
  if (handle == nullptr || (buffer == nullptr && length > 0)) return FALSE;
  try {
    return Read(static_cast<ToolsIsoLocalFile *>(handle), buffer, length, offset, out_bytesRead);
  } catch (...) {
    return FALSE;
  }
}

Bool ToolsISO_LocalFileIsoReadCB(void *handle, void *buffer, size_t length, uint64_t offset) {
  return ToolsISO_LocalFileReadCB(handle, buffer, length, offset, nullptr);
}

Bool ToolsISO_LocalFileCloseCB(void *handle) {
  if (handle == nullptr) return FALSE;
  return CloseHandle(static_cast<ToolsIsoLocalFile *>(handle));
}

int ToolsISO_RemoteFileOpen(const char *imageUrl, Bool requireHash, ToolsIsoRemoteFile **out_handle) {
  return ToolsISO_RemoteFileOpenEx(imageUrl, requireHash, nullptr, out_handle);
}

int ToolsISO_RemoteFileOpenEx(const char *imageUrl, Bool requireHash, const char *certFile,
                              ToolsIsoRemoteFile **out_handle) {
  if (out_handle != nullptr) *out_handle = nullptr;
  if (imageUrl == nullptr || out_handle == nullptr) return TOOLSISO_OPEN_IO_ERROR;
  try {
    return OpenRemote(imageUrl, requireHash, certFile, out_handle);
  } catch (...) {
    return TOOLSISO_OPEN_IO_ERROR;
  }
}

Bool ToolsISO_RemoteFileReadCB(void *handle, void *buffer, size_t length, uint64_t offset,
                               size_t *out_bytesRead) {
  return ToolsISO_LocalFileReadCB(handle, buffer, length, offset, out_bytesRead);
}

Bool ToolsISO_RemoteFileIsoReadCB(void *handle, void *buffer, size_t length, uint64_t offset) {
  return ToolsISO_LocalFileReadCB(handle, buffer, length, offset, nullptr);
}

Bool ToolsISO_RemoteFileCloseCB(void *handle) { return ToolsISO_LocalFileCloseCB(handle); }

Bool ToolsISO_GetImageInfo(const void *handle, ToolsIsoImageInfo *out_info) {
  if (out_info != nullptr) memset(out_info, 0, sizeof *out_info);
  if (handle == nullptr || out_info == nullptr) return FALSE;
  const auto *h = static_cast<const ToolsIsoLocalFile *>(handle);
  out_info->imageSize = h->size;
  if (h->info != nullptr) {
    tvx::toolsiso::HashDataHeader hdr = tvx::toolsiso::HeaderOf(*h->info);
    out_info->hashed = TRUE;
    out_info->embeddedSignature = hdr.signatureOffset != 0;
    out_info->blockSize = hdr.blockSize;
    out_info->hashCount = hdr.hashCount;
  }
  return TRUE;
}

}  // extern "C"
