// Reading PEM PKCS#7 objects, taking their signed content out unchecked, and
// the error texts that come back to callers.
#include <openssl/err.h>
#include <openssl/pem.h>

#include <climits>
#include <cstdlib>
#include <cstring>

#include "lib/signature/zelsign_internal.h"
#include "platform/util.h"

namespace tvx::signature {

namespace {

constexpr char kUnableToLoad[] = "Unable to load PKCS7 certificate.";

// ReadPem reads one PKCS7 object from `bio`; `bio` null means the BIO could
// not be made, which reports OpenSSL's reason for that.
PKCS7 *ReadPem(BIO *bio, char **err) {
  if (bio == nullptr) {
    SetError(err, ReasonText(ERR_get_error()));
    return nullptr;
  }
  PKCS7 *p7 = PEM_read_bio_PKCS7(bio, nullptr, nullptr, nullptr);
  if (p7 == nullptr) {
    const char *reason = ERR_reason_error_string(ERR_get_error());
    SetError(err, reason != nullptr ? reason : kUnableToLoad);
  }
  return p7;
}

}  // namespace

void SetError(char **err, const char *text) {
  if (err != nullptr) *err = UtilSafeStrdup0(text);
}

const char *ReasonText(unsigned long code) {
  const char *reason = code != 0 ? ERR_reason_error_string(code) : nullptr;
  return reason != nullptr ? reason : kNoReason;
}

}  // namespace tvx::signature

namespace sig = tvx::signature;

extern "C" {

TVX_EXPORT PKCS7 *ZelSign_GetPKCS7FromRawBuffer(const void *buf, uint32_t len, char **err) {
  try {
    // A memory BIO takes an int length, and -1 would mean "up to a NUL".
    if (len > INT_MAX) {
      sig::SetError(err, sig::kNoReason);
      return nullptr;
    }
    tvx::UniquePtr<BIO> bio(BIO_new_mem_buf(buf, static_cast<int>(len)));
    return sig::ReadPem(bio.get(), err);
  } catch (...) {
    return nullptr;
  }
}

TVX_EXPORT PKCS7 *ZelSign_GetPKCS7FromFile(const char *path, char **err) {
  try {
    tvx::UniquePtr<BIO> bio(BIO_new_file(path, "r"));
    return sig::ReadPem(bio.get(), err);
  } catch (...) {
    return nullptr;
  }
}

TVX_EXPORT void ZelSign_GetDigestFromPKCS7(PKCS7 *p7, char **content, size_t *len, char **err) {
  if (content != nullptr) *content = nullptr;
  if (len != nullptr) *len = 0;
  try {
    tvx::UniquePtr<BIO> out(BIO_new(BIO_s_mem()));
    if (out == nullptr || p7 == nullptr ||
        PKCS7_verify(p7, nullptr, nullptr, nullptr, out.get(), PKCS7_BINARY | PKCS7_NOVERIFY) <=
            0) {
      sig::SetError(err, sig::ReasonText(ERR_get_error()));
      return;
    }
    char *bytes = nullptr;
    long n = BIO_get_mem_data(out.get(), &bytes);
    if (n < 0 || content == nullptr) return;
    size_t size = static_cast<size_t>(n);
    auto *copy = static_cast<char *>(std::calloc(size + 1, 1));
    if (copy == nullptr) return;
    if (size != 0) std::memcpy(copy, bytes, size);
    *content = copy;
    if (len != nullptr) *len = size;
  } catch (...) {
  }
}

TVX_EXPORT const char *ZelSign_StatusToString(uint32_t status) {
  switch (status) {
    case ZELSIGN_TRX_SIGNED:
      return "Tarvex Signed";
    case ZELSIGN_PARTNER_SIGNED:
      return "Partner Signed";
    case ZELSIGN_UNSIGNED:
      return "Unsigned";
    case ZELSIGN_INVALID_DIGEST:
      return "Invalid Digest";
    case ZELSIGN_INVALID_CERT:
      return "Invalid Certificate";
    default:
      return "Error";
  }
}

}  // extern "C"
