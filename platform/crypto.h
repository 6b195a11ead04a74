// Hashing and base64 over OpenSSL's EVP interface.
#pragma once

#include "tvx_base.h"

#include <cstddef>
#include <cstdint>

// CryptoError: 0 is success; the other values name what went wrong
// (CryptoError_ToString gives a constant English text).
enum CryptoError {
  CRYPTO_ERROR_SUCCESS = 0,
  CRYPTO_ERROR_UNKNOWN_ALGORITHM = 1,
  CRYPTO_ERROR_BAD_BUFFER_SIZE = 2,
  CRYPTO_ERROR_OPERATION_FAILED = 3,
  CRYPTO_ERROR_NOMEM = 4,
};
const char *CryptoError_ToString(CryptoError error);

// A hash algorithm: a constant of the library, never freed.
struct CryptoHash;

// CryptoHash_FromString finds an algorithm by name ("SHA-256", "SHA-1",
// "SHA-512"; case ignored; also "SHA256"...). *out_hash is null on failure.
CryptoError CryptoHash_FromString(const char *name, const CryptoHash **out_hash);
// CryptoHash_GetOutputSize: digest bytes (32 for SHA-256).
size_t CryptoHash_GetOutputSize(const CryptoHash *hash);
// CryptoHash_Compute hashes `len` bytes into `out`, which must hold exactly
// the output size (`outSize`), else CRYPTO_ERROR_BAD_BUFFER_SIZE.
CryptoError CryptoHash_Compute(const CryptoHash *hash, const void *data, size_t len,
                               uint8_t *out, size_t outSize);

// CryptoHashSession computes many digests with one algorithm and one reused
// context: for callers that hash thousands of small blocks, where setting a
// context up per block would cost as much as the hashing.
class CryptoHashSession {
 public:
  explicit CryptoHashSession(const CryptoHash *hash);
  ~CryptoHashSession();
  CryptoHashSession(const CryptoHashSession &) = delete;
  CryptoHashSession &operator=(const CryptoHashSession &) = delete;
  // Compute is CryptoHash_Compute on the session's context.
  CryptoError Compute(const void *data, size_t len, uint8_t *out, size_t outSize);

 private:
  const CryptoHash *hash_;
  void *ctx_;  // EVP_MD_CTX, owned
};

// Base64_Encode writes the standard base64 form (with "=" padding) of `len`
// bytes and a terminating NUL into `out` of `outSize` bytes; FALSE when it
// does not fit ((len + 2) / 3 * 4 + 1 bytes are needed). `out_len`
// (optional) receives the text length.
Bool Base64_Encode(const uint8_t *in, size_t len, char *out, size_t outSize, size_t *out_len);
