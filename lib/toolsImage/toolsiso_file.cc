// The small file routines the tools-image code shares: canonical paths and
// whole-file reads with a ceiling.
#include <cerrno>
#include <climits>
#include <cstdlib>

#include "lib/toolsImage/toolsiso_image_internal.h"
#include "platform/fileio.h"
#include "platform/log.h"
#include "platform/unique.h"
#include "platform/util.h"

namespace {

// Nothing the tools code reads whole (hash data, signatures, maps) comes near
// this; a larger file is refused rather than allocated.
constexpr uint64_t kMaxFileSize = 256ull * 1024 * 1024;

Bool ReadWholeFile(const char *path, char **out_buffer, size_t *out_size) {
  FileIODescriptor fd;
  FileIO_Invalidate(&fd);
  FileIOResult rc = FileIO_Open(&fd, path, FILEIO_OPEN_ACCESS_READ, FILEIO_OPEN);
  if (rc != FILEIO_SUCCESS) {
    Log("ToolsISO: open of %s failed: %s\n", path, FileIO_ErrorEnglish(rc));
    return FALSE;
  }
  uint64_t size = FileIO_GetSize(&fd);
  if (size == UINT64_MAX || size > kMaxFileSize) {
    Log("ToolsISO: getSize of %s failed.\n", path);
    FileIO_Close(&fd);
    return FALSE;
  }
  tvx::CharPtr buf(static_cast<char *>(UtilSafeMalloc0(static_cast<size_t>(size) + 1)));
  rc = FileIO_Read(&fd, buf.get(), static_cast<size_t>(size), nullptr);
  if (rc != FILEIO_SUCCESS) {
    Log("ToolsISO: read of %s failed: %s\n", path, FileIO_ErrorEnglish(rc));
    FileIO_Close(&fd);
    return FALSE;
  }
  if (FileIO_Close(&fd) != FILEIO_SUCCESS) {
    Log("ToolsISO: close of %s failed\n", path);
    return FALSE;
  }
  buf.get()[size] = '\0';
  *out_buffer = buf.release();
  *out_size = static_cast<size_t>(size);
  return TRUE;
}

}  // namespace

extern "C" {

char *ToolsISO_GetRealPath(const char *path) {
  if (path == nullptr) return nullptr;
  try {
    char *resolved = realpath(path, nullptr);
    if (resolved != nullptr) return resolved;
    Log("ToolsISO: Failed to get realpath for '%s' (error=%d)\n", path, errno);
    return UtilSafeStrdup0(path);
  } catch (...) {
    return nullptr;
  }
}

Bool ToolsISO_ReadFile(const char *path, char **out_buffer, size_t *out_size) {
  if (out_buffer != nullptr) *out_buffer = nullptr;
  if (out_size != nullptr) *out_size = 0;
  if (path == nullptr || out_buffer == nullptr || out_size == nullptr) return FALSE;
  try {
    return ReadWholeFile(path, out_buffer, out_size);
  } catch (...) {
    return FALSE;
  }
}

}  // extern "C"
