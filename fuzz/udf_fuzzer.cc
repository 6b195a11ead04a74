// Feeds arbitrary bytes to the UDF reader as an in-memory image: mount, then
// the library's recursive listing and extraction plan with the bounds of
// media_tree_harness.h.
#include <cstddef>
#include <cstdint>

#include "fuzz/media_tree_harness.h"
#include "platform/udf/udf_internal.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  tvx::udf::Volume vol(tvx::MemorySource(data, size));
  if (vol.Mount() != tvx::udf::Status::kOk) return 0;
  auto tree = tvx::udf::NewTreeSource(&vol);
  tvxfuzz::ExerciseTree(*tree, size);
  return 0;
}
