// Hash-data files for tests, benchmarks and fuzz seeds, written at the
// format's literal offsets (independently of the library's reader).
#pragma once

#include <cstdint>
#include <string>

namespace tvxtest {

struct HashDataLayout {
  uint32_t blockSize = 4096;
  // Room for an embedded signature at the end (0: none). The header then
  // names it, and hashFileBlockSize is the block size, as the count rules
  // need.
  uint64_t signatureRoom = 0;
};

// BlockHashes is the SHA-256 of each `blockSize` block of `image`, the last
// one short, concatenated.
std::string BlockHashes(const std::string &image, uint32_t blockSize);

// BuildHashData writes a 512-byte header and the hash table for `image`; an
// embedded signature's room is zero-filled. *signedSize (optional) gets the
// size of the part a signature covers.
std::string BuildHashData(const std::string &image, const HashDataLayout &layout = {},
                          size_t *signedSize = nullptr);

// Field offsets, for tests that corrupt one field.
inline constexpr size_t kHdMetadataLength = 32, kHdBlockSize = 44, kHdHashSize = 48,
                        kHdHashFileBlockSize = 52, kHdFirstHashOffset = 64, kHdHashCount = 72,
                        kHdSignatureOffset = 80, kHdSignatureSize = 88, kHdAlgorithm = 96;
// PutLe writes `bytes` little-endian bytes of `value` at `offset`.
void PutLe(std::string *buf, size_t offset, uint64_t value, int bytes);

}  // namespace tvxtest
