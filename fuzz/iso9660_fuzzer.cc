// Feeds arbitrary bytes to the ISO 9660 reader as an in-memory image (from
// block 16 on, see media_tree_harness.h) in one of the name modes, chosen by
// the input's length so that each input is read once and every mode still
// sees every shape: the library's recursive listing and extraction plan run
// over it within the harness's bounds.
#include <cstddef>
#include <cstdint>
#include <cstdlib>

#include "fuzz/media_tree_harness.h"
#include "platform/iso9660/image.h"
#include "tvx_iso9660.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  const uint32_t modes[] = {0u, ISO9660_FORMAT_JOLIET, ISO9660_FORMAT_PLAIN};
  std::unique_ptr<tvx::iso9660::Image> image;
  if (tvx::iso9660::Image::Open(tvxfuzz::ImageSource(data, size), modes[size % 3], &image) !=
      ISO9660_OK) {
    return 0;
  }
  auto tree = tvx::iso9660::NewTreeSource(*image);
  tvxfuzz::ExerciseTree(*tree, tvxfuzz::kSystemArea + size);
  return 0;
}
