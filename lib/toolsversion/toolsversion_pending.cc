// Stand-ins for the tools-image calls until those layers are merged: every
// one fails, so the status falls back as it does without a tools image.
#include "lib/toolsversion/toolsversion_pending.h"

#include <fcntl.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "platform/fd_io.h"
#include "platform/unique.h"

extern "C" {
__attribute__((weak)) Bool ToolsISO_GetImagePath(const char *, const char *, const char *, Bool,
                                                 char **imagePath, char **imageBaseName,
                                                 uint32_t *isoOpenMode) {
  if (imagePath != nullptr) *imagePath = nullptr;
  if (imageBaseName != nullptr) *imageBaseName = nullptr;
  if (isoOpenMode != nullptr) *isoOpenMode = 0;
  return FALSE;
}
__attribute__((weak)) char *ToolsISO_GetRealPath(const char *path) { return realpath(path, nullptr); }
__attribute__((weak)) Bool ToolsISO_ReadFile(const char *path, char **out, size_t *size) {
  std::string text;
  tvx::UniqueFd fd(open(path, O_RDONLY | O_CLOEXEC));
  if (!fd || !tvx::ReadAllLimited(fd.get(), 1 << 28, &text)) return FALSE;
  *out = static_cast<char *>(malloc(text.size() + 1));
  memcpy(*out, text.c_str(), text.size() + 1);
  *size = text.size();
  return TRUE;
}
__attribute__((weak)) int ToolsISO_LocalFileOpen(const char *, Bool, ToolsIsoLocalFile **h) {
  *h = nullptr;
  return 1;
}
__attribute__((weak)) Bool ToolsISO_LocalFileIsoReadCB(void *, void *, size_t, uint64_t) {
  return FALSE;
}
__attribute__((weak)) Bool ToolsISO_LocalFileCloseCB(void *) { return FALSE; }
}
