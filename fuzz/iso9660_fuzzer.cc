// Feeds arbitrary bytes to the ISO 9660 reader as an image read through the
// caller-callback source, in each name mode, and walks everything it lists:
// every directory opened by path, every file read to its end.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string>

#include "tvx_iso9660.h"

namespace {

// Real seeds are a few hundred KiB; larger inputs only slow the search.
constexpr size_t kMaxInput = 4u << 20;
constexpr int kMaxDepth = 24;
constexpr int kMaxEntries = 4096;
constexpr uint64_t kMaxBytesRead = 16u << 20;

struct Input {
  const uint8_t *data;
  size_t size;
};

Bool Read(void *handle, void *buffer, size_t length, uint64_t offset) {
  auto *in = static_cast<Input *>(handle);
  if (offset > in->size || length > in->size - offset) return FALSE;
  std::memcpy(buffer, in->data + offset, length);
  return TRUE;
}

Bool Close(void *) { return TRUE; }

struct Budget {
  int entries = 0;
  uint64_t bytes = 0;
};

void ReadAll(Iso9660Image *image, const Iso9660DirEntry &entry, Budget &budget) {
  Iso9660File *file = nullptr;
  if (Iso9660_OpenFile(image, &entry, &file) != ISO9660_OK) return;
  uint8_t buf[4096];
  size_t n = sizeof buf;
  while (budget.bytes < kMaxBytesRead && Iso9660_ReadFile(image, file, buf, &n) == ISO9660_OK) {
    budget.bytes += n;
    n = sizeof buf;
  }
  Iso9660_CloseFile(image, file);
}

void Walk(Iso9660Image *image, const std::string &path, int depth, Budget &budget) {
  if (depth > kMaxDepth) return;
  Iso9660Dir *dir = nullptr;
  if (Iso9660_OpenDir(image, path.c_str(), &dir) != ISO9660_OK) return;
  Iso9660DirEntry entry;
  while (budget.entries < kMaxEntries && Iso9660_ReadDir(image, dir, &entry) == ISO9660_OK) {
    ++budget.entries;
    if (entry.isDirectory) {
      Walk(image, path + "/" + entry.name, depth + 1, budget);
    } else {
      ReadAll(image, entry, budget);
    }
  }
  Iso9660_RewindDir(image, dir);
  Iso9660_CloseDir(image, dir);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size > kMaxInput) return 0;
  Input input{data, size};
  for (uint32_t mode : {0u, 2u}) {
    Iso9660Image *image = nullptr;
    if (Iso9660_OpenWithReader(Read, Close, &input, mode, &image) != ISO9660_OK) continue;
    free(Iso9660_GetVolumeId(image));
    Budget budget;
    Walk(image, "", 0, budget);
    Iso9660_Close(image);
  }
  return 0;
}
