// Checking a hash-data buffer field by field before anything trusts it.
//
// The buffer comes from a file or a server, so every field is hostile until
// checked: the checks run in a fixed order, each logs its own message, and
// every difference of two fields is formed only after a comparison has shown
// that it cannot wrap.
#include <cstdlib>
#include <cstring>

#include "lib/toolsImage/toolsiso_internal.h"
#include "platform/crypto.h"
#include "platform/endian.h"
#include "platform/log.h"
#include "platform/util.h"

namespace tvx::toolsiso {

bool ReadHashDataHeader(const uint8_t *buf, uint64_t size, HashDataHeader *out) {
  ByteCursor all(buf, static_cast<size_t>(size < SIZE_MAX ? size : SIZE_MAX));
  ByteCursor c;
  if (!all.SubAt(kOffMetadataLength, kOffHashAlgorithm + kAlgorithmCompare - kOffMetadataLength,
                 &c)) {
    return false;
  }
  HashDataHeader h;
  uint32_t ignored32 = 0;
  uint64_t ignored64 = 0;
  bool ok = c.GetLe32(&h.metadataLength) && c.GetLe32(&ignored32) && c.GetLe32(&ignored32) &&
            c.GetLe32(&h.blockSize) && c.GetLe32(&h.hashSize) && c.GetLe32(&h.hashFileBlockSize) &&
            c.GetLe64(&ignored64) && c.GetLe64(&h.firstHashOffset) && c.GetLe64(&h.hashCount) &&
            c.GetLe64(&h.signatureOffset) && c.GetLe64(&h.signatureSize) &&
            c.GetText(kAlgorithmCompare, &h.algorithm);
  if (ok) *out = h;
  return ok;
}

HashDataHeader HeaderOf(const ToolsIsoHashInfo &info) {
  HashDataHeader h;
  if (!ReadHashDataHeader(info.data, info.dataSize, &h)) NOT_REACHED_AT("lib/toolsImage/toolsiso");
  return h;
}

const CryptoHash *HashImpl(const char *algorithmName) {
  if (algorithmName == nullptr || std::strcmp(algorithmName, "SHA-256") != 0) {
    Log("ToolsISO: Unsupported hash algo '%s'\n",
        algorithmName != nullptr ? algorithmName : "(null)");
    return nullptr;
  }
  const CryptoHash *hash = nullptr;
  CryptoError error = CryptoHash_FromString(algorithmName, &hash);
  if (error != CRYPTO_ERROR_SUCCESS) {
    Log("ToolsISO: %s (crypto error '%d')\n", CryptoError_ToString(error), static_cast<int>(error));
    return nullptr;
  }
  return hash;
}

namespace {

bool Fail(const char *message) {
  Log("%s", message);
  return false;
}

// Valid runs the checks in their fixed order and logs the first failure.
// The messages, their order and the arithmetic are the file format's
// contract with the tools that write it.
bool Valid(const uint8_t *buf, uint64_t size) {
  if (buf == nullptr) return Fail("ToolsISO: Error hashData is NULL.\n");
  if (size == 0) return Fail("ToolsISO: Error hashDataSize is 0.\n");
  if (size <= kMinHashDataSize) return Fail("ToolsISO: Error hashDataSize is too small.\n");
  if (std::memcmp(buf, kHashDataMagic, kMagicSize) != 0) {
    return Fail("ToolsISO: Error invalid magic string.\n");
  }
  HashDataHeader h;
  if (!ReadHashDataHeader(buf, size, &h)) NOT_REACHED_AT("lib/toolsImage/toolsiso");
  if (h.metadataLength < kMinHashDataSize || h.metadataLength > size) {
    return Fail("ToolsISO: Error invalid metadata length.\n");
  }
  if (h.blockSize < kMinBlockSize || h.blockSize > kMaxBlockSize) {
    return Fail("ToolsISO: Error invalid blockSize.\n");
  }
  if (h.hashSize >= h.blockSize) return Fail("ToolsISO: Error hashSize bigger than blockSize.\n");
  if (h.hashSize == 0 || h.hashSize >= size) return Fail("ToolsISO: Error invalid hashSize.\n");
  if (std::memcmp(h.algorithm.data(), "SHA-256", kAlgorithmCompare) != 0) {
    return Fail("ToolsISO: Error unsupported algorithm.\n");
  }
  const CryptoHash *hash = HashImpl("SHA-256");
  if (hash == nullptr) return Fail("ToolsISO: Error failed to load hashImpl.\n");
  if (h.hashSize != CryptoHash_GetOutputSize(hash)) {
    Log("ToolsISO: Error unexpected hashSize %u, expected %zu.\n", h.hashSize,
        CryptoHash_GetOutputSize(hash));
    return false;
  }
  if (h.hashCount == 0 || h.hashCount > size / h.hashSize) {
    return Fail("ToolsISO: Error hashCount invalid.\n");
  }
  if (h.hashFileBlockSize != 0) {
    if (h.hashFileBlockSize <= h.hashSize) {
      return Fail("ToolsISO: Error hashSize bigger than hashFileBlockSize.\n");
    }
    if (h.hashFileBlockSize < kMinBlockSize || h.hashFileBlockSize > kMaxBlockSize) {
      return Fail("ToolsISO: Error hashFileBlockSize invalid.\n");
    }
  } else if (h.hashCount != (size - h.metadataLength) / h.hashSize) {  // metadataLength <= size
    return Fail("ToolsISO: Error hashCount mismatch.\n");
  }
  if (h.firstHashOffset < h.metadataLength)
    return Fail("ToolsISO: Error firstHashOffset too small.\n");
  if (h.signatureOffset != 0) {
    if (h.signatureSize == 0 || h.signatureSize >= size) {
      return Fail("ToolsISO: Error signature size invalid.\n");
    }
    if (h.signatureOffset != size - h.signatureSize) {
      return Fail("ToolsISO: Error signature is not at the end.\n");
    }
    if (h.firstHashOffset > h.signatureOffset) {
      return Fail("ToolsISO: Error signature and hashes overlap.\n");
    }
    if (h.hashCount > (h.signatureOffset - h.firstHashOffset) / h.hashSize) {
      return Fail("ToolsISO: Error signature offset value unexpected.\n");
    }
  } else {
    // Hashes that would start past the end leave room for none.
    uint64_t room = h.firstHashOffset < size ? (size - h.firstHashOffset) / h.hashSize : 0;
    if (h.hashCount > room) return Fail("ToolsISO: Error hashDataSize is smaller than expected.\n");
  }
  // Without an embedded signature the size field is unchecked so far; one
  // larger than the buffer would wrap, and no table fits that.
  if (h.signatureSize > size || (size - h.signatureSize) % h.hashSize != 0) {
    return Fail("ToolsISO: Error unexpected size for hashes.\n");
  }
  return true;
}

}  // namespace

}  // namespace tvx::toolsiso

namespace iso = tvx::toolsiso;

extern "C" {

TVX_EXPORT ToolsIsoHashInfo *ToolsISO_ParseHashData(uint8_t *buf, uint64_t hashDataSize) {
  try {
    if (!iso::Valid(buf, hashDataSize)) return nullptr;
    auto *info = static_cast<ToolsIsoHashInfo *>(UtilSafeMalloc0(sizeof(ToolsIsoHashInfo)));
    info->header = buf;
    info->data = buf;
    info->dataSize = hashDataSize;
    return info;
  } catch (...) {
    return nullptr;
  }
}

TVX_EXPORT void ToolsISO_FreeHashInfo(ToolsIsoHashInfo *info) {
  if (info == nullptr) return;
  std::free(info->data);
  std::free(info);
}

TVX_EXPORT const void *ToolsISO_GetHashImpl(const char *algorithmName) {
  try {
    return iso::HashImpl(algorithmName);
  } catch (...) {
    return nullptr;
  }
}

}  // extern "C"
