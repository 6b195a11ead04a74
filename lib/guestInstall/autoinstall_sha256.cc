#include "lib/guestInstall/autoinstall_sha256.h"

#include "platform/log.h"

namespace tvx::autoinstall {
namespace {

// The algorithm is fetched once per process; starting a context with it
// again is then a reset rather than a provider look-up.
const EVP_MD *Sha256Md() {
  static const UniquePtr<EVP_MD> md(EVP_MD_fetch(nullptr, "SHA256", nullptr));
  if (md == nullptr) Panic("SHA256_crypt: SHA-256 is not available\n");
  return md.get();
}

}  // namespace

Sha256::Sha256() : ctx_(EVP_MD_CTX_new()) {
  if (ctx_ == nullptr) Panic("SHA256_crypt: cannot allocate a digest context\n");
}

void Sha256::Init() {
  if (EVP_DigestInit_ex2(ctx_.get(), Sha256Md(), nullptr) != 1) {
    Panic("SHA256_crypt: cannot start a SHA-256 digest\n");
  }
}

void Sha256::Update(const void *data, size_t len) {
  if (EVP_DigestUpdate(ctx_.get(), data, len) != 1) Panic("SHA256_crypt: digest update failed\n");
}

void Sha256::Final(uint8_t digest[32]) {
  unsigned int n = 0;
  if (EVP_DigestFinal_ex(ctx_.get(), digest, &n) != 1 || n != 32) {
    Panic("SHA256_crypt: digest final failed\n");
  }
}

}  // namespace tvx::autoinstall
