// Fuzzes the hash-data checks and block verification. The input is a
// hash-data file. Properties checked on every accepted input:
//  - every hash lies inside the buffer, and before an embedded signature;
//  - the signed part (size - signatureSize) neither wraps nor grows;
//  - verifying an all-zero image over the table's first blocks, at an
//    aligned and an unaligned offset, and past the table, returns without
//    reading outside the buffers (ASan) and refuses what lies past the end.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "tvx_log.h"
#include "tvx_toolsiso.h"

namespace {

constexpr size_t kMaxInput = 1 << 20;

uint64_t Le(const uint8_t *p, int n) {
  uint64_t v = 0;
  for (int i = n - 1; i >= 0; i--) v = v << 8 | p[i];
  return v;
}

void Require(bool ok, const char *what) {
  if (!ok) {
    std::fprintf(stderr, "hashdata_fuzzer: property violated: %s\n", what);
    std::abort();
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size > kMaxInput) return 0;
  // The buffer is handed over exactly as large as the input, so ASan sees
  // any read past its end.
  auto *buf = static_cast<uint8_t *>(std::malloc(size == 0 ? 1 : size));
  if (size != 0) std::memcpy(buf, data, size);
  ToolsIsoHashInfo *info = ToolsISO_ParseHashData(buf, size);
  if (info == nullptr) {
    std::free(buf);
    return 0;
  }
  const uint8_t *h = buf;
  uint32_t blockSize = static_cast<uint32_t>(Le(h + 44, 4));
  uint32_t hashSize = static_cast<uint32_t>(Le(h + 48, 4));
  uint64_t first = Le(h + 64, 8), count = Le(h + 72, 8);
  uint64_t sigOffset = Le(h + 80, 8), sigSize = Le(h + 88, 8);
  uint64_t end = sigOffset != 0 ? sigOffset : size;
  Require(first <= end && count <= (end - first) / hashSize, "hash table outside the buffer");
  Require(sigSize <= size, "signed part wraps");
  Require(blockSize >= 512 && blockSize <= 4096 && hashSize == 32, "block or hash size");

  uint64_t blocks = count < 8 ? count : 8;
  std::vector<uint8_t> image(static_cast<size_t>(blocks * blockSize + 1), 0);
  ToolsISO_VerifyHashes(info, 0, image.data(), static_cast<size_t>(blocks * blockSize - 7), TRUE);
  Require(!ToolsISO_VerifyHashes(info, 1, image.data(), 1, FALSE), "unaligned offset accepted");
  Require(!ToolsISO_VerifyHashes(info, count * blockSize, image.data(), 1, FALSE),
          "block past the table accepted");
  Require(ToolsISO_VerifyHashes(info, count * blockSize, image.data(), 0, FALSE),
          "empty range at the end refused");
  ToolsISO_FreeHashInfo(info);
  return 0;
}
