// Feeds arbitrary bytes to the UDF reader as an in-memory image (from the
// recognition sequence on, see media_tree_harness.h): mount, then the
// library's recursive listing and extraction plan within the harness's
// bounds.
#include <cstddef>
#include <cstdint>

#include "fuzz/media_tree_harness.h"
#include "platform/udf/udf_internal.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  tvx::udf::Volume vol(tvxfuzz::ImageSource(data, size));
  if (vol.Mount() != tvx::udf::Status::kOk) return 0;
  auto tree = tvx::udf::NewTreeSource(&vol);
  tvxfuzz::ExerciseTree(*tree, tvxfuzz::kSystemArea + size);
  return 0;
}
