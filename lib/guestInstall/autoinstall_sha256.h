// The SHA-256 context the password crypt runs its thousands of short
// digests through. Not exported.
#pragma once

#include <cstddef>
#include <cstdint>

#ifdef TVX_CRYPT_PLATFORM_SHA
#include "platform/crypto.h"
#else
#include "platform/openssl_unique.h"
#endif

namespace tvx::autoinstall {

#ifdef TVX_CRYPT_PLATFORM_SHA
class Sha256 {
 public:
  Sha256() = default;
  Sha256(const Sha256 &) = delete;
  Sha256 &operator=(const Sha256 &) = delete;
  ~Sha256() {
    if (ctx_.state != nullptr) CryptoHash_AbortSHA256(&ctx_);
  }
  void Init() { CryptoHash_InitSHA256(&ctx_); }
  void Update(const void *data, size_t len) { CryptoHash_UpdateSHA256(&ctx_, data, len); }
  void Final(uint8_t digest[32]) { CryptoHash_FinalSHA256(&ctx_, digest); }

 private:
  CryptoHashSHA256Context ctx_{nullptr};
};
#else
// One digest context reused for every digest of a crypt: the platform's
// context allocates and fetches the algorithm on every start, which costs
// more than hashing the two blocks of a round.
class Sha256 {
 public:
  Sha256();
  Sha256(const Sha256 &) = delete;
  Sha256 &operator=(const Sha256 &) = delete;
  // Freeing the context wipes its state.
  ~Sha256() = default;
  void Init();
  void Update(const void *data, size_t len);
  void Final(uint8_t digest[32]);

 private:
  UniquePtr<EVP_MD_CTX> ctx_;
};
#endif

}  // namespace tvx::autoinstall
