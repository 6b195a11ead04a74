// File-system helpers. Returned texts are malloc'd (free with free).
#pragma once

#include "tvx_base.h"

// File_GetPathName splits `path` at its last "/" into the directory part
// (without the trailing "/"s; "" for a bare name, "/" for a name directly in
// the root) and the last component ("" when `path` ends in "/"):
// "I386/TXTSETUP.SIF" gives "I386" and "TXTSETUP.SIF", "README" gives "" and
// "README". Both outputs are optional and newly allocated.
void File_GetPathName(const char *path, char **out_dir, char **out_base);
// File_SplitName splits into volume (always ""), directory (with its trailing
// "/") and base name; outputs optional and allocated.
void File_SplitName(const char *path, char **out_volume, char **out_dir, char **out_base);
// File_PathJoin joins with exactly one "/" between the parts; an empty `dir`
// gives `name` without leading "/"s.
char *File_PathJoin(const char *dir, const char *name);
Bool File_Exists(const char *path);
Bool File_IsDirectory(const char *path);
Bool File_IsFile(const char *path);
// File_Copy copies a regular file; with `overwrite` FALSE an existing target
// makes it fail. Permissions of the source are kept. Copying a file onto
// itself fails without harm; a new target that could not be fully written is
// removed.
Bool File_Copy(const char *src, const char *dst, Bool overwrite);
Bool File_CreateDirectory(const char *path);  // TRUE also when it exists already
// File_CreateDirectoryHierarchy creates every missing component; `out_top`
// (optional) receives the topmost directory it created (allocated) or null.
Bool File_CreateDirectoryHierarchy(const char *path, char **out_top);
// File_DeleteDirectoryTree removes a directory and everything below it,
// never following symbolic links. FALSE when something could not be removed
// (or the directory does not exist).
Bool File_DeleteDirectoryTree(const char *path);
Bool File_DeleteEmptyDirectory(const char *path);
// File_ListDirectory returns the number of entries (without "." and "..")
// and stores their names, sorted bytewise, in a malloc'd array of malloc'd
// texts, followed by one null pointer (optional; null on failure); -1 on
// failure.
int File_ListDirectory(const char *path, char ***out_names);
// File_UnlinkIfExists: 0 when removed or absent, else errno.
int File_UnlinkIfExists(const char *path);
// File_GetSafeTmpDir returns a private temporary directory,
// "$TMPDIR/tvxguest-<uid>" (else under /tmp), creating it with mode 0700 when
// `create` is TRUE. Null when it is missing, not a directory of this user, or
// open to others.
char *File_GetSafeTmpDir(Bool create);
