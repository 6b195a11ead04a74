// Internals of the guest-tools image subsystem.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

#include "tvx_toolsiso.h"

struct CryptoHash;

namespace tvx::toolsiso {

// ---- Hash data (toolsiso_hashdata.cc, toolsiso_verify.cc) -----------------

// Layout of the hash-data header; every offset counts from the file's start.
inline constexpr char kHashDataMagic[] = "A Tarvex External Hashdata File";
inline constexpr size_t kMagicSize = 32;  // the text and its NUL
inline constexpr size_t kOffMetadataLength = 32;
inline constexpr size_t kOffBlockSize = 44;
inline constexpr size_t kOffHashSize = 48;
inline constexpr size_t kOffHashFileBlockSize = 52;
inline constexpr size_t kOffFirstHashOffset = 64;
inline constexpr size_t kOffHashCount = 72;
inline constexpr size_t kOffSignatureOffset = 80;
inline constexpr size_t kOffSignatureSize = 88;
inline constexpr size_t kOffHashAlgorithm = 96;
inline constexpr size_t kAlgorithmCompare = 8;   // "SHA-256" and its NUL
inline constexpr size_t kMinHashDataSize = 512;  // a buffer must be larger
inline constexpr uint32_t kMinBlockSize = 512;
inline constexpr uint32_t kMaxBlockSize = 4096;
static_assert(sizeof kHashDataMagic == kMagicSize);
static_assert(kOffHashAlgorithm + kAlgorithmCompare <= kMinHashDataSize);

// HashDataHeader holds the header fields that the checks use.
struct HashDataHeader {
  uint32_t metadataLength = 0;
  uint32_t blockSize = 0;
  uint32_t hashSize = 0;
  uint32_t hashFileBlockSize = 0;
  uint64_t firstHashOffset = 0;
  uint64_t hashCount = 0;
  uint64_t signatureOffset = 0;
  uint64_t signatureSize = 0;
  std::string_view algorithm;  // the 8 compared bytes, NUL included
};

// ReadHashDataHeader decodes the header of a buffer; false when the buffer is
// too short to hold it. Nothing is validated: see ToolsISO_ParseHashData.
bool ReadHashDataHeader(const uint8_t *buf, uint64_t size, HashDataHeader *out);

// HeaderOf decodes the header of a parsed record (which always holds one).
HashDataHeader HeaderOf(const ToolsIsoHashInfo &info);

// SignedSize is the number of bytes the signature covers:
// hashDataSize - signatureSize (never wraps for a parsed record).
inline uint64_t SignedSize(const ToolsIsoHashInfo &info) {
  return info.dataSize - HeaderOf(info).signatureSize;
}

// HashImpl is ToolsISO_GetHashImpl with its platform type.
const CryptoHash *HashImpl(const char *algorithmName);

// ---- end of hash data -----------------------------------------------------

}  // namespace tvx::toolsiso
