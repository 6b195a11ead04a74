// File-system helpers. Returned texts are malloc'd (free with free).
#pragma once

#include "tvx_base.h"

// File_GetPathName splits `path` at its last "/" into the directory part
// (without the trailing "/"; "" for a bare name) and the last component. Both
// outputs are optional and newly allocated.
void File_GetPathName(const char *path, char **out_dir, char **out_base);
// File_SplitName splits into volume (always ""), directory (with its trailing
// "/") and base name; outputs optional and allocated.
void File_SplitName(const char *path, char **out_volume, char **out_dir, char **out_base);
// File_PathJoin joins with exactly one "/" between the parts.
char *File_PathJoin(const char *dir, const char *name);
Bool File_Exists(const char *path);
Bool File_IsDirectory(const char *path);
Bool File_IsFile(const char *path);
// File_Copy copies a regular file; with `overwrite` FALSE an existing target
// makes it fail. Permissions of the source are kept.
Bool File_Copy(const char *src, const char *dst, Bool overwrite);
Bool File_CreateDirectory(const char *path);  // TRUE also when it exists already
// File_CreateDirectoryHierarchy creates every missing component; `out_top`
// (optional) receives the topmost directory it created (allocated) or null.
Bool File_CreateDirectoryHierarchy(const char *path, char **out_top);
Bool File_DeleteDirectoryTree(const char *path);
Bool File_DeleteEmptyDirectory(const char *path);
// File_ListDirectory returns the number of entries (without "." and "..")
// and stores their names, sorted, in a malloc'd array of malloc'd texts
// (optional); -1 on failure.
int File_ListDirectory(const char *path, char ***out_names);
// File_UnlinkIfExists: 0 when removed or absent, else errno.
int File_UnlinkIfExists(const char *path);
// File_GetSafeTmpDir returns a private temporary directory ($TMPDIR or /tmp).
char *File_GetSafeTmpDir(Bool create);
// File_FullPath resolves `path` (realpath); null when it does not exist.
char *File_FullPath(const char *path);
