// Crash-safe replacement of a whole file's contents.
#pragma once

#include <string_view>

namespace tvx::ini {

// ReplaceFileContents writes `text` to a temporary file beside `path`,
// flushes it to disk, gives it the permission bits (and, where allowed, the
// owner) of `path` and renames it over `path`. `path` must name an existing
// regular file; a symbolic link is followed so that its target is replaced
// and the link stays. On any failure `path` is untouched, the temporary file
// is removed and false is returned.
bool ReplaceFileContents(const char *path, std::string_view text);

}  // namespace tvx::ini
