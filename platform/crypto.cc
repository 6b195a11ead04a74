#include "platform/crypto.h"

#include <openssl/evp.h>

#include "platform/ascii.h"
#include "platform/openssl_unique.h"

struct CryptoHash {
  const char *name;
  const char *aliases[2];
  const char *fetchName;  // OpenSSL's name of the algorithm
  size_t size;
};

namespace {

const CryptoHash kHashes[] = {
    {"SHA-256", {"SHA256", "SHA2-256"}, "SHA2-256", 32},
    {"SHA-1", {"SHA1", nullptr}, "SHA1", 20},
    {"SHA-512", {"SHA512", "SHA2-512"}, "SHA2-512", 64},
};

// Fetched is the algorithm's implementation, fetched once per process: the
// EVP_sha256()-style constants make OpenSSL 3 look the implementation up
// again on every digest. Null when the provider lacks it.
const EVP_MD *Fetched(const CryptoHash *hash) {
  static EVP_MD *const fetched[] = {
      EVP_MD_fetch(nullptr, kHashes[0].fetchName, nullptr),
      EVP_MD_fetch(nullptr, kHashes[1].fetchName, nullptr),
      EVP_MD_fetch(nullptr, kHashes[2].fetchName, nullptr),
  };
  static_assert(sizeof fetched / sizeof fetched[0] == sizeof kHashes / sizeof kHashes[0]);
  return fetched[hash - kHashes];
}

CryptoError Digest(EVP_MD_CTX *ctx, const CryptoHash *hash, const void *data, size_t len,
                   uint8_t *out, size_t outSize) {
  if (outSize != hash->size) return CRYPTO_ERROR_BAD_BUFFER_SIZE;
  const EVP_MD *md = Fetched(hash);
  if (md == nullptr) return CRYPTO_ERROR_UNKNOWN_ALGORITHM;
  unsigned int written = 0;
  if (EVP_DigestInit_ex2(ctx, md, nullptr) != 1 || EVP_DigestUpdate(ctx, data, len) != 1 ||
      EVP_DigestFinal_ex(ctx, out, &written) != 1 || written != hash->size) {
    return CRYPTO_ERROR_OPERATION_FAILED;
  }
  return CRYPTO_ERROR_SUCCESS;
}

}  // namespace

const char *CryptoError_ToString(CryptoError error) {
  switch (error) {
    case CRYPTO_ERROR_SUCCESS: return "success";
    case CRYPTO_ERROR_UNKNOWN_ALGORITHM: return "unknown algorithm";
    case CRYPTO_ERROR_BAD_BUFFER_SIZE: return "bad buffer size";
    case CRYPTO_ERROR_OPERATION_FAILED: return "operation failed";
    case CRYPTO_ERROR_NOMEM: return "out of memory";
  }
  return "unknown error";
}

CryptoError CryptoHash_FromString(const char *name, const CryptoHash **out_hash) {
  *out_hash = nullptr;
  if (name == nullptr) return CRYPTO_ERROR_UNKNOWN_ALGORITHM;
  for (const auto &h : kHashes) {
    bool match = tvx::ascii::Equal(h.name, name);
    for (const char *alias : h.aliases) {
      match = match || (alias != nullptr && tvx::ascii::Equal(alias, name));
    }
    if (match) {
      *out_hash = &h;
      return CRYPTO_ERROR_SUCCESS;
    }
  }
  return CRYPTO_ERROR_UNKNOWN_ALGORITHM;
}

size_t CryptoHash_GetOutputSize(const CryptoHash *hash) { return hash->size; }

CryptoError CryptoHash_Compute(const CryptoHash *hash, const void *data, size_t len,
                               uint8_t *out, size_t outSize) {
  tvx::UniquePtr<EVP_MD_CTX> ctx(EVP_MD_CTX_new());
  if (ctx == nullptr) return CRYPTO_ERROR_NOMEM;
  return Digest(ctx.get(), hash, data, len, out, outSize);
}

CryptoHashSession::CryptoHashSession(const CryptoHash *hash)
    : hash_(hash), ctx_(EVP_MD_CTX_new()) {}

CryptoHashSession::~CryptoHashSession() { EVP_MD_CTX_free(static_cast<EVP_MD_CTX *>(ctx_)); }

CryptoError CryptoHashSession::Compute(const void *data, size_t len, uint8_t *out,
                                       size_t outSize) {
  if (ctx_ == nullptr) return CRYPTO_ERROR_NOMEM;
  return Digest(static_cast<EVP_MD_CTX *>(ctx_), hash_, data, len, out, outSize);
}

Bool Base64_Encode(const uint8_t *in, size_t len, char *out, size_t outSize, size_t *out_len) {
  if (len > (SIZE_MAX - 1) / 4 * 3 - 2) return FALSE;
  size_t need = (len + 2) / 3 * 4 + 1;
  if (out == nullptr || outSize < need) return FALSE;
  // EVP_EncodeBlock takes an int length; encode in whole 3-byte groups.
  constexpr size_t kChunk = 3 * (1u << 20);
  size_t done = 0, written = 0;
  do {
    size_t n = len - done < kChunk ? len - done : kChunk;
    int w = EVP_EncodeBlock(reinterpret_cast<unsigned char *>(out + written), in + done,
                            static_cast<int>(n));
    if (w < 0) return FALSE;
    written += static_cast<size_t>(w);
    done += n;
  } while (done < len);
  out[written] = '\0';
  if (out_len != nullptr) *out_len = written;
  return TRUE;
}
