/*
 * tvx_signature.h -- PKCS#7 signature validation against the product's
 * certificate and revocation-list files.
 *
 * Conventions (beyond tvx_base.h):
 * 1. PKCS7 and X509_STORE are OpenSSL 3's own types. This header declares them
 *    itself, compatibly with OpenSSL's typedefs, so it may be included before
 *    or after the OpenSSL headers, or without them. A PKCS7 object handed out
 *    here is freed by the caller with OpenSSL's PKCS7_free().
 * 2. Error texts: every `err` parameter is a slot for one malloc'd text that
 *    the caller frees with free(). The slot is optional (may be NULL) for the
 *    loaders and the digest extraction, and required for the two validity
 *    checks. Texts are OpenSSL's reason strings or the fixed texts quoted
 *    below.
 * 3. Trust comes only from the certificate directory fixed when the library
 *    was built ("/usr/share/certs/" in a release build) or from a store or a
 *    certificate file that the caller names. No environment variable and no
 *    system-wide CA directory takes part. The directory holds:
 *      tarvex.cert      trusted certificates of the maker's store (PEM)
 *      tarvex.crl       revocation lists for the maker's store (PEM)
 *      tvxpartner.cert  trusted certificates of the partner store (PEM)
 *      tvxpartner.crl   revocation lists for the partner store (PEM)
 *    A missing .crl file leaves revocation checking off for its store; an
 *    existing one (even empty) switches it on.
 * 4. Nothing here logs. Each call builds and releases its own stores and
 *    BIOs, so calls on different threads need no locking. OpenSSL's
 *    per-thread error queue is left as OpenSSL leaves it.
 *
 * Decisions on the points left open or unsafe
 *  1. Neither store trusts OpenSSL's default certificate file or hashed CA
 *     directory: a publicly trusted chain must never count as the maker's or a
 *     partner's signature. Trust comes only from the files above, a caller's
 *     certificate file, or a caller's store.
 *  2. When OpenSSL's error queue gives no reason string, the text is
 *     "unspecified OpenSSL error" (the PKCS#7 loaders keep
 *     "Unable to load PKCS7 certificate."). An error slot is never set to a
 *     copy of NULL.
 *  3. A validity check that fails without an error of its own (the signature
 *     is not trusted, or trusted only as a partner's where the maker's is
 *     required, or the content does not match) sets the text to why the
 *     maker's store refused it: OpenSSL's reason with the first chain error
 *     that was not let pass, "certificate verify error (certificate
 *     revoked)", or OpenSSL's reason and detail for any other refusal
 *     ("signature failure (...)"), or the status text when OpenSSL recorded
 *     nothing. So a FALSE result always comes with a text.
 *  4. A validity check whose slot already holds a text on entry returns FALSE
 *     at once and leaves the text alone (it is neither freed nor replaced).
 *  5. Buffers of 2 GiB or more are refused (OpenSSL's memory BIOs take an int
 *     length) with the text of decision 2.
 *  6. A caller's store is never freed, but it is configured as the maker's
 *     store: the maker's revocation lists are added to it (adding the same
 *     list again is harmless), its verification flags gain revocation
 *     checking when tarvex.crl exists, and its verification callback is
 *     replaced by the library's.
 */
#ifndef TVX_SIGNATURE_H
#define TVX_SIGNATURE_H

#include "tvx_base.h"

/* The same declarations as OpenSSL's <openssl/types.h> and <openssl/pkcs7.h>;
 * C11 and C++ both accept a repeated identical typedef. */
struct pkcs7_st;
typedef struct pkcs7_st PKCS7;
struct x509_store_st;
typedef struct x509_store_st X509_STORE;

TVX_BEGIN_DECLS

/* Signature status (unsigned 32-bit). The checks here produce ERROR,
 * TRX_SIGNED, PARTNER_SIGNED and INVALID_CERT; UNSIGNED and INVALID_DIGEST are
 * for callers that find no signature or a wrong digest themselves. */
#define ZELSIGN_ERROR 0u
#define ZELSIGN_TRX_SIGNED 1u
#define ZELSIGN_PARTNER_SIGNED 2u
#define ZELSIGN_UNSIGNED 3u
#define ZELSIGN_INVALID_DIGEST 4u
#define ZELSIGN_INVALID_CERT 5u

/* ZelSign_GetPKCS7FromRawBuffer reads one PEM "PKCS7" block from the `len`
 * bytes at `buf`. Returns the object (free with PKCS7_free) or NULL with *err
 * (optional) set to OpenSSL's reason, or "Unable to load PKCS7 certificate."
 * when OpenSSL recorded none. */
TVX_EXPORT PKCS7 *ZelSign_GetPKCS7FromRawBuffer(const void *buf, uint32_t len, char **err);

/* ZelSign_GetPKCS7FromFile is the same for the file at `path`. */
TVX_EXPORT PKCS7 *ZelSign_GetPKCS7FromFile(const char *path, char **err);

/* ZelSign_GetDigestFromPKCS7 extracts the content signed inside `p7` without
 * checking the signature or any certificate. On success *content gets a
 * malloc'd copy with a terminating NUL (free with free()) and *len its length
 * without the NUL. On failure *content is NULL, *len is 0 and *err (optional)
 * gets OpenSSL's reason. */
TVX_EXPORT void ZelSign_GetDigestFromPKCS7(PKCS7 *p7, char **content, size_t *len, char **err);

/* ZelSign_IsSignatureValid: TRUE when the content signed inside `p7` verifies
 * with a certificate chaining to the maker's or to the partner certificates
 * (status TRX_SIGNED or PARTNER_SIGNED). FALSE otherwise, always with a text
 * in *err (required; must be NULL on entry): a revocation list that cannot be
 * read ("CRL appears to be corrupted\n", "unable to add CRL\n",
 * "error creating bio in ZelSignLoadCrl\n"), "out of memory", or the reason of
 * decision 3. */
TVX_EXPORT Bool ZelSign_IsSignatureValid(PKCS7 *p7, char **err);

/* ZelSign_IsTrxSignatureValid: TRUE only when `p7` is a detached signature of
 * the `len` bytes at `data` by a certificate that the maker's store trusts; a
 * partner's signature gives FALSE. The maker's store is `store` when given
 * (optional; it stays the caller's, see decision 6), else one built from
 * `certFile` (optional), else from tarvex.cert of the certificate directory.
 * `len` 0 gives FALSE with "Data buffer too small." without looking at `p7`.
 * Every FALSE comes with a text in *err (required; must be NULL on entry), as
 * for ZelSign_IsSignatureValid. */
TVX_EXPORT Bool ZelSign_IsTrxSignatureValid(PKCS7 *p7, const void *data, size_t len,
                                            const char *certFile, X509_STORE *store, char **err);

/* ZelSign_VerifyStatus runs the check behind the two validity functions and
 * returns its status: TRX_SIGNED, PARTNER_SIGNED, INVALID_CERT (no signer
 * verifies against either store, whether or not the signature itself is
 * sound), or ERROR with *err (required; must be NULL on entry) set. `data`
 * (optional) is the detached content of `len` bytes; NULL checks the content
 * inside `p7`. `certFile` and `store` are as for ZelSign_IsTrxSignatureValid.
 * Unlike the validity functions it sets no text for INVALID_CERT. */
TVX_EXPORT uint32_t ZelSign_VerifyStatus(PKCS7 *p7, const void *data, size_t len,
                                         const char *certFile, X509_STORE *store, char **err);

/* ZelSign_StatusToString returns the constant text of a status: "Error",
 * "Tarvex Signed", "Partner Signed", "Unsigned", "Invalid Digest",
 * "Invalid Certificate"; "Error" for any other value. */
TVX_EXPORT const char *ZelSign_StatusToString(uint32_t status);

TVX_END_DECLS

#endif /* TVX_SIGNATURE_H */
