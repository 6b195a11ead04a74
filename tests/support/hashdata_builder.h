// Hash-data files for tests, benchmarks and fuzz seeds, written at the
// format's literal offsets (independently of the library's reader).
#pragma once

#include <cstdint>
#include <string>

namespace tvxtest {

struct HashDataLayout {
  uint32_t metadataLength = 512;
  uint32_t blockSize = 4096;
  uint32_t hashFileBlockSize = 0;
  // Room for an embedded signature at the end (0: none). The header then
  // names it, and hashFileBlockSize defaults to the block size, which the
  // count rules need.
  uint64_t signatureRoom = 0;
};

// BlockHashes is the SHA-256 of each `blockSize` block of `image`, the last
// one short, concatenated.
std::string BlockHashes(const std::string &image, uint32_t blockSize);

// BuildHashData writes header and hash table for `image`; an embedded
// signature's room is zero-filled (see EmbedSignature).
std::string BuildHashData(const std::string &image, const HashDataLayout &layout = {});

// SignedPart is the part of `hashData` that a signature covers.
std::string SignedPart(const std::string &hashData, const HashDataLayout &layout);

// EmbedSignature puts PEM `signature` into the room at the end, padded with
// newlines (which PEM readers skip); false when it does not fit.
bool EmbedSignature(std::string *hashData, const HashDataLayout &layout,
                    const std::string &signature);

// Field offsets, for tests that corrupt one field.
inline constexpr size_t kHdMetadataLength = 32, kHdBlockSize = 44, kHdHashSize = 48,
                        kHdHashFileBlockSize = 52, kHdFirstHashOffset = 64, kHdHashCount = 72,
                        kHdSignatureOffset = 80, kHdSignatureSize = 88, kHdAlgorithm = 96;
void PutLe32(std::string *buf, size_t offset, uint32_t value);
void PutLe64(std::string *buf, size_t offset, uint64_t value);

}  // namespace tvxtest
