// Certificate stores, revocation lists and the verdict on chain errors.
#include <openssl/err.h>
#include <openssl/pem.h>

#include "lib/signature/zelsign_internal.h"

#ifndef TVX_CERT_DIR
#error "TVX_CERT_DIR must name the certificate directory (CMake cache variable)"
#endif

namespace tvx::signature {

const char *CertDir() { return TVX_CERT_DIR; }

TrustFiles TrustFilesIn(const std::string &dir) {
  return TrustFiles{dir + "tarvex.cert", dir + "tarvex.crl", dir + "tvxpartner.cert",
                    dir + "tvxpartner.crl"};
}

UniquePtr<X509_STORE> LoadStore(const char *certFile) {
  UniquePtr<X509_STORE> store(X509_STORE_new());
  if (store == nullptr) return store;
  X509_LOOKUP *lookup = X509_STORE_add_lookup(store.get(), X509_LOOKUP_file());
  if (lookup != nullptr && certFile != nullptr) {
    // A file that does not load leaves an empty store: nothing verifies.
    (void)X509_LOOKUP_load_file(lookup, certFile, X509_FILETYPE_PEM);
  }
  // Deliberately no X509_LOOKUP_hash_dir and no default file: the system's
  // CA collection would let any publicly trusted chain pass as ours.
  return store;
}

bool LoadCrl(X509_STORE *store, const char *path, char **err) {
  UniquePtr<BIO> bio(BIO_new(BIO_s_file()));
  if (bio == nullptr) {
    SetError(err, "error creating bio in ZelSignLoadCrl\n");
    return false;
  }
  // Without the file, revocation stays unchecked for this store.
  if (BIO_read_filename(bio.get(), path) <= 0) return true;
  for (;;) {
    UniquePtr<X509_CRL> crl(PEM_read_bio_X509_CRL(bio.get(), nullptr, nullptr, nullptr));
    if (crl == nullptr) break;
    if (X509_STORE_add_crl(store, crl.get()) != 1) {
      SetError(err, "unable to add CRL\n");
      return false;
    }
  }
  // Running out of PEM blocks ends the file with "no start line"; any other
  // reason means a block that is there but broken.
  if (ERR_GET_REASON(ERR_peek_last_error()) != PEM_R_NO_START_LINE) {
    SetError(err, "CRL appears to be corrupted\n");
    return false;
  }
  ERR_clear_error();
  X509_STORE_set_flags(
      store, X509_V_FLAG_CRL_CHECK | X509_V_FLAG_CRL_CHECK_ALL | X509_V_FLAG_POLICY_CHECK);
  if (err != nullptr) *err = nullptr;
  return true;
}

namespace {

// ContinuesAfter says whether verification goes on past chain error `code`.
// The numbers are fixed: they were chosen against OpenSSL's numbering of the
// time, and in OpenSSL 3 code 24 became "no issuer public key" while "invalid
// CA" moved to 79, so 24 continues and 79 rejects.
bool ContinuesAfter(int code) {
  switch (code) {
    case X509_V_OK:
    case X509_V_ERR_UNSPECIFIED:
    case X509_V_ERR_UNABLE_TO_GET_CRL:
    case X509_V_ERR_CERT_NOT_YET_VALID:
    case X509_V_ERR_CERT_HAS_EXPIRED:
    case X509_V_ERR_CRL_NOT_YET_VALID:
    case X509_V_ERR_CRL_HAS_EXPIRED:
    case X509_V_ERR_ERROR_IN_CERT_NOT_BEFORE_FIELD:
    case X509_V_ERR_ERROR_IN_CERT_NOT_AFTER_FIELD:
    case X509_V_ERR_ERROR_IN_CRL_LAST_UPDATE_FIELD:
    case X509_V_ERR_ERROR_IN_CRL_NEXT_UPDATE_FIELD:
    case X509_V_ERR_CERT_CHAIN_TOO_LONG:
    case X509_V_ERR_NO_ISSUER_PUBLIC_KEY:
    case X509_V_ERR_PATH_LENGTH_EXCEEDED:
    case X509_V_ERR_INVALID_PURPOSE:
      return true;
    case X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT:
    case X509_V_ERR_UNABLE_TO_DECRYPT_CERT_SIGNATURE:
    case X509_V_ERR_UNABLE_TO_DECRYPT_CRL_SIGNATURE:
    case X509_V_ERR_UNABLE_TO_DECODE_ISSUER_PUBLIC_KEY:
    case X509_V_ERR_CERT_SIGNATURE_FAILURE:
    case X509_V_ERR_CRL_SIGNATURE_FAILURE:
    case X509_V_ERR_OUT_OF_MEM:
    case X509_V_ERR_DEPTH_ZERO_SELF_SIGNED_CERT:
    case X509_V_ERR_SELF_SIGNED_CERT_IN_CHAIN:
    case X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT_LOCALLY:
    case X509_V_ERR_UNABLE_TO_VERIFY_LEAF_SIGNATURE:
    case X509_V_ERR_CERT_REVOKED:
    case X509_V_ERR_CERT_UNTRUSTED:
    case X509_V_ERR_CERT_REJECTED:
    case X509_V_ERR_INVALID_CA:
      return false;
    default:
      return code > X509_V_ERR_CERT_REJECTED;
  }
}

}  // namespace

int VerifyCallback(int ok, X509_STORE_CTX *ctx) {
  int code = X509_STORE_CTX_get_error(ctx);
  int depth = X509_STORE_CTX_get_error_depth(ctx);
  if (!ok) {
    X509_STORE_CTX_set_error(ctx, depth >= 5 ? X509_V_ERR_CERT_CHAIN_TOO_LONG : X509_V_OK);
  }
  return ContinuesAfter(code) ? 1 : 0;
}

}  // namespace tvx::signature
