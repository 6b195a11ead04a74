// Walks a whole UDF volume through the public calls, for comparisons with
// other readers and for hostile-image tests; and a directory that another
// reader extracted, into the same shape.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "tvx_udf.h"

namespace tvxtest {

struct UdfTree {
  // Paths are "dir/file", without a leading "/".
  std::map<std::string, std::string> files;  // path -> bytes, of files read whole
  std::map<std::string, bool> dirs;
  int failures = 0;  // entries that could not be opened or read
};

// Opens a copy of `image` through UDF_OpenWithReader, as a caller's
// callbacks would deliver it; `closes` (optional) counts close callbacks.
UDFVolume *OpenUdfBytes(const std::vector<uint8_t> &image, int *closes = nullptr);

// WalkUdf lists every directory and reads every file below the root.
UdfTree WalkUdf(UDFVolume *volume);

// Opens the image at `path` and walks it; `opened` says whether it opened.
UdfTree WalkUdfImage(const std::string &path, bool *opened);

// HostTree reads every directory and file below `dir` on disk.
UdfTree HostTree(const std::string &dir);

}  // namespace tvxtest
