// Fuzzes the PKCS#7 loaders and what runs on a loaded object: the PEM reader
// (from a buffer), taking the signed content out, and the signer check with
// its store building, which walks signer infos and certificates of the
// object. No certificate directory is needed: without one every signer is
// untrusted. Properties: a loaded object's content copy is NUL-terminated,
// a failure always comes with an error text, and the check's status is one
// it can produce.
#include <openssl/err.h>
#include <openssl/pkcs7.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "tvx_signature.h"

namespace {

constexpr size_t kMaxInput = 64 * 1024;

void Require(bool ok, const char *what) {
  if (!ok) {
    std::fprintf(stderr, "pkcs7_fuzzer: property violated: %s\n", what);
    std::abort();
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size > kMaxInput) return 0;
  char *err = nullptr;
  PKCS7 *p7 = ZelSign_GetPKCS7FromRawBuffer(data, static_cast<uint32_t>(size), &err);
  Require((p7 == nullptr) == (err != nullptr), "load result and error text disagree");
  std::free(err);
  err = nullptr;
  if (p7 != nullptr) {
    char *content = nullptr;
    size_t len = 0;
    ZelSign_GetDigestFromPKCS7(p7, &content, &len, &err);
    Require(content == nullptr || content[len] == '\0', "content copy not terminated");
    Require(content != nullptr || err != nullptr || len == 0, "failure without a text");
    std::free(content);
    std::free(err);
    err = nullptr;
    uint32_t status = ZelSign_VerifyStatus(p7, nullptr, 0, nullptr, nullptr, &err);
    Require(status == ZELSIGN_ERROR || status == ZELSIGN_TRX_SIGNED ||
                status == ZELSIGN_PARTNER_SIGNED || status == ZELSIGN_INVALID_CERT,
            "status the check cannot produce");
    Require((status == ZELSIGN_ERROR) == (err != nullptr), "error status without a text");
    std::free(err);
    err = nullptr;
    // Detached content, as the tools-image checks pass it.
    Bool valid = ZelSign_IsTrxSignatureValid(p7, data, size, nullptr, nullptr, &err);
    Require(valid != (err != nullptr), "validity and error text disagree");
    std::free(err);
    PKCS7_free(p7);
  }
  ERR_clear_error();
  return 0;
}
