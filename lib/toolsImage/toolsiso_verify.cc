// Checking image bytes against the hash table, and signatures over buffers.
#include <openssl/err.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "lib/signature/zelsign_internal.h"
#include "lib/toolsImage/toolsiso_internal.h"
#include "platform/crypto.h"
#include "platform/log.h"
#include "platform/openssl_unique.h"
#include "tvx_signature.h"

namespace tvx::toolsiso {

namespace {

constexpr size_t kMaxHashSize = 64;

void LogMismatch(uint64_t offset, const uint8_t *stored, const uint8_t *found, size_t hashSize) {
  char want[(kMaxHashSize + 2) / 3 * 4 + 1];
  char got[sizeof want];
  size_t size = (hashSize + 2) / 3 * 4 + 1;
  if (Base64_Encode(stored, hashSize, want, size, nullptr) &&
      Base64_Encode(found, hashSize, got, size, nullptr)) {
    Log("ToolsISO: Error hash mismatch at offset 0x%lx, expected hash [%s], but found [%s]\n",
        static_cast<unsigned long>(offset), want, got);
  } else {
    Log("ToolsISO: Error hash mismatch at offset 0x%lx!\n", static_cast<unsigned long>(offset));
  }
}

bool VerifyHashes(const ToolsIsoHashInfo &info, uint64_t offset, const uint8_t *bytes,
                  size_t length, bool continueOnMismatch) {
  HashDataHeader h = HeaderOf(info);
  std::string algorithm(h.algorithm.substr(0, h.algorithm.find('\0')));
  const CryptoHash *hash = HashImpl(algorithm.c_str());
  if (hash == nullptr) {
    Log("ToolsISO: Error failed to load hashImpl.\n");
    return false;
  }
  if (offset % h.blockSize != 0) {
    Log("ToolsISO: Error offset %lu is not aligned to blockSize %u.\n",
        static_cast<unsigned long>(offset), h.blockSize);
    return false;
  }
  uint64_t first = offset / h.blockSize;
  uint64_t blocks = length / h.blockSize + (length % h.blockSize != 0 ? 1 : 0);
  // first <= 2^64 / 512 and blocks <= 2^64 / 512: the sum cannot wrap.
  if (first + blocks > h.hashCount) {
    Log("ToolsISO: Error %zu blocks of unsigned data.\n",
        static_cast<size_t>(first + blocks - h.hashCount));
    return false;
  }
  if (length == 0) return true;
  // A parsed record keeps hashSize at the algorithm's output size.
  if (h.hashSize > kMaxHashSize || bytes == nullptr) return false;

  CryptoHashSession session(hash);
  const uint8_t *stored = info.data + h.firstHashOffset + first * h.hashSize;
  uint8_t found[kMaxHashSize];
  bool allMatch = true;
  for (size_t done = 0; done < length; done += h.blockSize, stored += h.hashSize) {
    size_t n = length - done < h.blockSize ? length - done : h.blockSize;
    CryptoError error = session.Compute(bytes + done, n, found, h.hashSize);
    if (error != CRYPTO_ERROR_SUCCESS) {
      Log("ToolsISO: Error %s (crypto error '%d').\n", CryptoError_ToString(error),
          static_cast<int>(error));
      return false;
    }
    if (std::memcmp(found, stored, h.hashSize) != 0) {
      LogMismatch(offset + done, stored, found, h.hashSize);
      if (!continueOnMismatch) return false;
      allMatch = false;
    }
  }
  return allMatch;
}

bool VerifySignature(const char *certName, const void *sig, size_t sigLen, const void *data,
                     size_t dataLen) {
  char *err = nullptr;
  // The loader takes a 32-bit length; a longer signature is refused whole.
  UniquePtr<PKCS7> p7(sigLen <= UINT32_MAX
                          ? ZelSign_GetPKCS7FromRawBuffer(sig, static_cast<uint32_t>(sigLen), &err)
                          : nullptr);
  if (p7 == nullptr) {
    Log("ToolsISO: Error failed to load signature buffer: %s\n",
        err != nullptr ? err : signature::kNoReason);
    ERR_clear_error();
    std::free(err);
    return false;
  }
  if (!ZelSign_IsTrxSignatureValid(p7.get(), data, dataLen, certName, nullptr, &err)) {
    Log("ToolsISO: Error failed to verify signature using %s cert: %s\n",
        certName != nullptr ? certName : "default", err != nullptr ? err : signature::kNoReason);
    ERR_clear_error();
    std::free(err);
    return false;
  }
  return true;
}

}  // namespace

}  // namespace tvx::toolsiso

namespace iso = tvx::toolsiso;

extern "C" {

TVX_EXPORT Bool ToolsISO_VerifyHashes(ToolsIsoHashInfo *info, uint64_t offset, const uint8_t *bytes,
                                      size_t length, Bool continueOnMismatch) {
  try {
    return info != nullptr && iso::VerifyHashes(*info, offset, bytes, length, continueOnMismatch);
  } catch (...) {
    return FALSE;
  }
}

TVX_EXPORT Bool ToolsISO_VerifySignature(const char *certName, const void *sig, size_t sigLen,
                                         const void *data, size_t dataLen) {
  try {
    return iso::VerifySignature(certName, sig, sigLen, data, dataLen);
  } catch (...) {
    return FALSE;
  }
}

}  // extern "C"
