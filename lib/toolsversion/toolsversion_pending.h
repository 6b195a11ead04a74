// The tools-image calls this subsystem makes, declared here until the
// tools-image and signature layers land (their prototypes are fixed).
#pragma once

#include "tvx_base.h"

TVX_BEGIN_DECLS
typedef struct ToolsIsoLocalFile ToolsIsoLocalFile;
Bool ToolsISO_GetImagePath(const char *toolsDir, const char *guestOS, const char *hint,
                           Bool requireSignature, char **imagePath, char **imageBaseName,
                           uint32_t *isoOpenMode);
char *ToolsISO_GetRealPath(const char *path);
Bool ToolsISO_ReadFile(const char *path, char **buffer, size_t *size);
Bool ToolsISO_VerifySignature(const char *certName, const void *sig, size_t sigLen,
                              const void *data, size_t dataLen);
int ToolsISO_LocalFileOpen(const char *imagePath, Bool requireHash, ToolsIsoLocalFile **handle);
Bool ToolsISO_LocalFileIsoReadCB(void *handle, void *buffer, size_t length, uint64_t offset);
Bool ToolsISO_LocalFileCloseCB(void *handle);
TVX_END_DECLS
