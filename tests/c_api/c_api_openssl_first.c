/* OpenSSL's headers first, then the library's: the PKCS7 and X509_STORE
 * declarations must agree in this order too (c_api_test.c has the other). */
#include <openssl/pkcs7.h>
#include <openssl/x509_vfy.h>

#include "tvx_signature.h"

uint32_t CApiOpensslFirst(PKCS7 *p7, X509_STORE *store, char **err);
uint32_t CApiOpensslFirst(PKCS7 *p7, X509_STORE *store, char **err) {
  return ZelSign_VerifyStatus(p7, NULL, 0, NULL, store, err);
}
