// Owners for OpenSSL objects (see unique.h for the pattern).
#pragma once

#include <openssl/bio.h>
#include <openssl/evp.h>
#include <openssl/pkcs7.h>
#include <openssl/x509.h>
#include <openssl/x509_vfy.h>

#include "platform/unique.h"

namespace tvx {

TVX_MAKE_DELETER(BIO, BIO_free_all);
TVX_MAKE_DELETER(X509, X509_free);
TVX_MAKE_DELETER(X509_STORE, X509_STORE_free);
TVX_MAKE_DELETER(X509_STORE_CTX, X509_STORE_CTX_free);
TVX_MAKE_DELETER(X509_CRL, X509_CRL_free);
TVX_MAKE_DELETER(PKCS7, PKCS7_free);
TVX_MAKE_DELETER(EVP_MD_CTX, EVP_MD_CTX_free);
TVX_MAKE_DELETER(EVP_MD, EVP_MD_free);
TVX_MAKE_DELETER(EVP_PKEY, EVP_PKEY_free);

// X509Stack owns a STACK_OF(X509) together with the certificates in it.
struct X509StackDeleter {
  void operator()(STACK_OF(X509) * s) const noexcept { sk_X509_pop_free(s, X509_free); }
};
using X509Stack = std::unique_ptr<STACK_OF(X509), X509StackDeleter>;

}  // namespace tvx
