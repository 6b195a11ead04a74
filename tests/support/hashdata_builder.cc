#include "support/hashdata_builder.h"

#include <openssl/evp.h>

#include <stdexcept>

namespace tvxtest {

void PutLe(std::string *buf, size_t offset, uint64_t value, int bytes) {
  for (int i = 0; i < bytes; i++) (*buf)[offset + i] = static_cast<char>(value >> (8 * i));
}

std::string BlockHashes(const std::string &image, uint32_t blockSize) {
  std::string out;
  for (size_t at = 0; at < image.size(); at += blockSize) {
    unsigned char md[EVP_MAX_MD_SIZE];
    unsigned int n = 0;
    size_t len = image.size() - at < blockSize ? image.size() - at : blockSize;
    if (EVP_Digest(image.data() + at, len, md, &n, EVP_sha256(), nullptr) != 1) {
      throw std::runtime_error("EVP_Digest failed");
    }
    out.append(reinterpret_cast<char *>(md), n);
  }
  return out;
}

std::string BuildHashData(const std::string &image, const HashDataLayout &layout,
                          size_t *signedSize) {
  std::string buf(512, '\0');
  buf.replace(0, 32, "A Tarvex External Hashdata File", 32);  // with its NUL
  buf += BlockHashes(image, layout.blockSize);
  uint64_t room = layout.signatureRoom;
  PutLe(&buf, kHdMetadataLength, 512, 4);
  PutLe(&buf, kHdBlockSize, layout.blockSize, 4);
  PutLe(&buf, kHdHashSize, 32, 4);
  PutLe(&buf, kHdHashFileBlockSize, room != 0 ? layout.blockSize : 0, 4);
  PutLe(&buf, kHdFirstHashOffset, 512, 8);
  PutLe(&buf, kHdHashCount, (buf.size() - 512) / 32, 8);
  PutLe(&buf, kHdSignatureOffset, room != 0 ? buf.size() : 0, 8);
  PutLe(&buf, kHdSignatureSize, room, 8);
  buf.replace(kHdAlgorithm, 8, "SHA-256", 8);
  if (signedSize != nullptr) *signedSize = buf.size();
  buf.append(room, '\0');
  return buf;
}

}  // namespace tvxtest
