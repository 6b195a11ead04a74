// Internals of signature validation: the trust files, store building,
// revocation lists, the chain-verification callback and the signer check.
#pragma once

#include <openssl/bio.h>
#include <openssl/pkcs7.h>
#include <openssl/x509_vfy.h>

#include <string>

#include "platform/openssl_unique.h"
#include "tvx_signature.h"

namespace tvx::signature {

// The fallback of every error text copied from OpenSSL's queue.
inline constexpr char kNoReason[] = "unspecified OpenSSL error";

// TrustFiles names the four files one check reads. The exported functions
// use the build-time certificate directory; tests point a check at a PKI of
// their own through the same record, so nothing process-wide changes.
struct TrustFiles {
  std::string makerCert;
  std::string makerCrl;
  std::string partnerCert;
  std::string partnerCrl;
};
// CertDir is the build-time certificate directory, ending in "/".
const char *CertDir();
// TrustFilesIn names the files inside `dir` (which ends in "/").
TrustFiles TrustFilesIn(const std::string &dir);

// SetError stores a copy of `text` in the optional slot.
void SetError(char **err, const char *text);
// ReasonText is OpenSSL's reason string of `code`, or kNoReason.
const char *ReasonText(unsigned long code);

// LoadStore builds a store that trusts the PEM certificates of `certFile` and
// nothing else (no default file, no hashed CA directory). A file that cannot
// be loaded leaves the store empty. Null only when OpenSSL cannot allocate.
UniquePtr<X509_STORE> LoadStore(const char *certFile);
// LoadCrl adds every PEM CRL of `path` to `store` and switches revocation
// checking on. A file that cannot be opened is tolerated (true, nothing
// changed). On failure *err gets one of the fixed CRL texts.
bool LoadCrl(X509_STORE *store, const char *path, char **err);
// VerifyCallback overrides OpenSSL's verdict on one chain error (the table of
// codes that continue or reject lives beside it).
int VerifyCallback(int ok, X509_STORE_CTX *ctx);

// Verify checks every signer of `p7` against the maker's store (`store`
// when given, else one built from files.makerCert) and then the partner
// store. `data` is the detached content or null. Returns the status; on
// ZELSIGN_ERROR *err holds the text. When no signer verifies against the
// maker's store, *makerRefusal (optional) gets OpenSSL's account of why.
uint32_t Verify(PKCS7 *p7, BIO *data, X509_STORE *store, const TrustFiles &files, char **err,
                std::string *makerRefusal);

// CheckValidity runs Verify for the two exported validity functions: true
// for the maker's signature, and for a partner's unless `makerOnly`; false
// otherwise, always with a text in *err (the refusal, or the status text,
// when the check itself set none). `data` null and `len` 0: the content
// inside p7.
bool CheckValidity(PKCS7 *p7, const void *data, size_t len, X509_STORE *store,
                   const TrustFiles &files, bool makerOnly, char **err);

// VerifyStatus wraps detached content (`data`, `len`) in a memory BIO and
// runs Verify; `data` null and `len` 0 checks the content inside p7.
uint32_t VerifyStatus(PKCS7 *p7, const void *data, size_t len, X509_STORE *store,
                      const TrustFiles &files, char **err, std::string *makerRefusal);

}  // namespace tvx::signature
