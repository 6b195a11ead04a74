/*
 * tvx_toolsiso.h -- guest-tools ISO images: signed hash data and block
 * verification.
 *
 * Conventions (beyond tvx_base.h):
 * 1. Every diagnostic goes to the log sink (tvx_log.h) and begins with
 *    "ToolsISO: ".
 * 2. Checks fail closed: a FALSE or NULL result hands out nothing partial.
 *
 * ---------------------------------------------------------------------------
 * Hash data
 *
 * A hash-data file guards one tools image. All integers are unsigned
 * little-endian; offsets count from the file's first byte:
 *
 *   offset size field
 *        0   32 magic "A Tarvex External Hashdata File" and one NUL
 *       32    4 metadataLength     512 .. hashDataSize
 *       36    4 (not examined)
 *       40    4 (not examined)
 *       44    4 blockSize          512 .. 4096: image bytes per hash
 *       48    4 hashSize           the algorithm's output size (32)
 *       52    4 hashFileBlockSize  0, or 512 .. 4096 and above hashSize
 *       56    8 (not examined)
 *       64    8 firstHashOffset    at least metadataLength
 *       72    8 hashCount          one hash per image block, in block order
 *       80    8 signatureOffset    0, or where the embedded signature starts
 *       88    8 signatureSize      size of the embedded signature
 *       96    . hashAlgorithm      NUL-terminated, "SHA-256"
 *
 * Hash i covers image bytes [i * blockSize, (i + 1) * blockSize), the last
 * one up to the image's end, and lies at firstHashOffset + i * hashSize. The
 * signature (PEM PKCS#7, embedded or in a companion file) covers the first
 * hashDataSize - signatureSize bytes of the file; embedded, it is exactly the
 * file's tail.
 *
 * Decisions on the points left open or unsafe
 *  1. Every sum, product and difference of header fields is computed with an
 *     overflow check or after a comparison that rules the wrap out; a header
 *     whose arithmetic would wrap is refused with the message of the check it
 *     fails. In particular (hashDataSize - firstHashOffset) and
 *     (signatureOffset - firstHashOffset) are only formed once the offset is
 *     known to be smaller.
 *  2. The count rule without hashFileBlockSize, hashCount ==
 *     (hashDataSize - metadataLength) / hashSize, leaves no room for an
 *     embedded signature unless the signature fits in the division's
 *     remainder. A producer that embeds its signature therefore writes a
 *     non-zero hashFileBlockSize (the writer of this project writes the block
 *     size), which replaces that rule by the range check of the field.
 *  3. A verified range must start on a block boundary and may end anywhere;
 *     its bytes are hashed block by block, the last block of the range with
 *     the bytes the range holds. A range that ends inside a block that is not
 *     the image's last block therefore fails with a hash mismatch: a short
 *     last block is only right at the image's end.
 *  4. The fields at offsets 36, 40 and 56 and the header bytes after the
 *     algorithm name are neither examined nor given a meaning; the writer of
 *     this project fills them with zeros.
 */
#ifndef TVX_TOOLSISO_H
#define TVX_TOOLSISO_H

#include "tvx_base.h"

TVX_BEGIN_DECLS

/* ---- Hash data and signatures ------------------------------------------- */

/* ToolsIsoHashInfo is a parsed hash-data buffer. `header` and `data` both
 * point at the buffer (read `header` through the layout above); the record
 * owns it. `dataSize` is the buffer's size. */
typedef struct ToolsIsoHashInfo {
  const void *header;
  uint8_t *data;
  uint64_t dataSize;
} ToolsIsoHashInfo;

/* ToolsISO_ParseHashData checks the `hashDataSize` bytes at `buf` field by
 * field and returns a new record that owns `buf` (which must come from
 * malloc), or NULL after logging the first failed check; the caller then still
 * owns `buf`. The signature is not checked here: see
 * ToolsISO_VerifySignature. */
TVX_EXPORT ToolsIsoHashInfo *ToolsISO_ParseHashData(uint8_t *buf, uint64_t hashDataSize);

/* ToolsISO_VerifyHashes checks the `length` image bytes at `bytes`, which
 * start at image offset `offset`, against the hash table of `info`: TRUE when
 * every block matches. `offset` must be a multiple of the block size; a range
 * that reaches past the table's last hash fails before anything is hashed.
 * A length of 0 is TRUE. Each mismatch is logged with its image offset; with
 * `continueOnMismatch` every block is checked (and logged) before FALSE is
 * returned, without it the first mismatch returns FALSE. */
TVX_EXPORT Bool ToolsISO_VerifyHashes(ToolsIsoHashInfo *info, uint64_t offset,
                                      const uint8_t *bytes, size_t length,
                                      Bool continueOnMismatch);

/* ToolsISO_VerifySignature: TRUE when `sig` (`sigLen` bytes of PEM PKCS#7) is
 * a detached signature of the `dataLen` bytes at `data` by a certificate that
 * the maker's store trusts (tvx_signature.h). `certName` (optional) names the
 * certificate file to trust instead of the installed maker certificates. */
TVX_EXPORT Bool ToolsISO_VerifySignature(const char *certName, const void *sig, size_t sigLen,
                                         const void *data, size_t dataLen);

/* ToolsISO_GetHashImpl returns the hash handle for `algorithmName`: a constant
 * of the library for "SHA-256", NULL (logged) for any other name. */
TVX_EXPORT const void *ToolsISO_GetHashImpl(const char *algorithmName);

/* ToolsISO_FreeHashInfo frees the record and its buffer; NULL is ignored. */
TVX_EXPORT void ToolsISO_FreeHashInfo(ToolsIsoHashInfo *info);

/* ---- end of hash data and signatures ------------------------------------ */

TVX_END_DECLS

#endif /* TVX_TOOLSISO_H */
