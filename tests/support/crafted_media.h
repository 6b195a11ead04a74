// Crafted images that once made a media reader work without end, amplify
// data or let one file overwrite another on extraction. The media tests
// check each is refused before anything is written; the fuzz seeds start
// from them, so mutations explore around the shapes that broke before.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/udf_builder.h"

namespace tvxtest {

struct CraftedImage {
  std::string name;
  std::vector<uint8_t> bytes;
};

// ISO 9660: "shared directories" (40 levels whose two entries lead to the
// same next level: 2^40 paths), "overlapping extents" (one file of 100
// multi-extent records, each the whole image), "data repeated past the
// image" (200 files each naming the whole image), "duplicate names".
std::vector<CraftedImage> CraftedIsoImages();

// UDF, built with `opt`: "shared directory" ("b" points at the entry of its
// sibling "a"), "allocated extents beyond the partition" (holes marked
// allocated, a gigabyte each), "duplicate names".
std::vector<CraftedImage> CraftedUdfImages(const UdfBuildOptions &opt);

}  // namespace tvxtest
