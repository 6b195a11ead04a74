/* OpenSSL's headers first, then the library's: the PKCS7 and X509_STORE
 * declarations must agree in this order too. */
#include <openssl/pkcs7.h>
#include <openssl/x509_vfy.h>

#include "tvx_signature.h"
#include "tvx_toolsiso.h"

const char *CApiOpensslFirst(void);
const char *CApiOpensslFirst(void) {
  PKCS7 *p7 = NULL;
  char *err = NULL;
  return ZelSign_IsSignatureValid(p7, &err) ? "valid" : ZelSign_StatusToString(0);
}
