// Feeds arbitrary bytes to the ISO 9660 reader as an in-memory image, in
// each name mode: the library's recursive listing and extraction plan run
// over it with the bounds of media_tree_harness.h, and the C binding's
// directory and file calls over the root.
#include <cstddef>
#include <cstdint>
#include <cstdlib>

#include "fuzz/media_tree_harness.h"
#include "platform/iso9660/image.h"
#include "tvx_iso9660.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  for (uint32_t mode : {0u, ISO9660_FORMAT_JOLIET, ISO9660_FORMAT_PLAIN}) {
    std::unique_ptr<tvx::iso9660::Image> image;
    if (tvx::iso9660::Image::Open(tvx::MemorySource(data, size), mode, &image) != ISO9660_OK) {
      return 0;
    }
    auto tree = tvx::iso9660::NewTreeSource(*image);
    tvxfuzz::ExerciseTree(*tree, size);
  }
  return 0;
}
