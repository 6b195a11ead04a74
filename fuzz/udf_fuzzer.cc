// Fuzzes the UDF reader over an in-memory image delivered through the
// caller-callback source: mount, list every directory, read every file.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "tvx_udf.h"

namespace {

constexpr size_t kMaxInput = 4u << 20;
constexpr int kMaxEntries = 4096;
constexpr uint64_t kMaxRead = 1u << 20;

struct Mem {
  const uint8_t *data;
  size_t size;
};

Bool Read(void *h, void *buf, size_t len, uint64_t off) {
  auto *m = static_cast<Mem *>(h);
  if (off > m->size || len > m->size - off) return FALSE;
  std::memcpy(buf, m->data + off, len);
  return TRUE;
}

Bool Close(void *h) {
  delete static_cast<Mem *>(h);
  return TRUE;
}

void Walk(UDFVolume *vol, const std::string &path, int depth, int *budget) {
  UDFDir *dir = UDF_OpenDir(vol, nullptr, path.c_str());
  if (dir == nullptr) return;
  std::vector<std::pair<std::string, bool>> entries;
  while (const char *name = UDF_ReadDir(dir, 0)) {
    if (--*budget < 0) break;
    (void)UDF_DirEntrySize(dir);
    entries.emplace_back(name, UDF_DirEntryIsDir(dir) != 0);
  }
  UDF_RewindDir(dir);
  for (const auto &[name, isDir] : entries) {
    std::string child = path.empty() ? name : path + "/" + name;
    if (isDir) {
      if (depth < 64) Walk(vol, child, depth + 1, budget);
      continue;
    }
    // Both lookups: through the open directory and by path from the root.
    UDFFile *f = UDF_OpenFile(vol, dir, name.c_str());
    if (f == nullptr) f = UDF_OpenFile(vol, nullptr, child.c_str());
    if (f == nullptr) continue;
    uint64_t size = UDF_GetFileSize(vol, f);
    std::vector<uint8_t> buf(64 * 1024);
    for (uint64_t off = 0; off < size && off < kMaxRead; off += buf.size()) {
      size_t n = static_cast<size_t>(std::min<uint64_t>(buf.size(), size - off));
      if (!UDF_PReadFile(f, buf.data(), off, n)) break;
    }
    UDF_CloseFile(f);
  }
  UDF_CloseDir(dir);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size > kMaxInput) return 0;
  UDFVolume *vol = UDF_OpenWithReader(Read, Close, new Mem{data, size});
  if (vol == nullptr) return 0;
  free(UDF_GetVolumeId(vol));
  int budget = kMaxEntries;
  Walk(vol, "", 0, &budget);
  UDF_Close(vol);
  return 0;
}
