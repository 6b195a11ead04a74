#include "support/hashdata_builder.h"

#include <openssl/evp.h>

#include <cstring>
#include <stdexcept>

namespace tvxtest {

void PutLe32(std::string *buf, size_t offset, uint32_t value) {
  for (int i = 0; i < 4; i++) (*buf)[offset + i] = static_cast<char>(value >> (8 * i));
}

void PutLe64(std::string *buf, size_t offset, uint64_t value) {
  for (int i = 0; i < 8; i++) (*buf)[offset + i] = static_cast<char>(value >> (8 * i));
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

std::string BuildHashData(const std::string &image, const HashDataLayout &layout) {
  std::string hashes = BlockHashes(image, layout.blockSize);
  std::string buf(layout.metadataLength, '\0');
  std::memcpy(buf.data(), "A Tarvex External Hashdata File", 32);
  uint32_t hashFileBlockSize = layout.hashFileBlockSize;
  if (layout.signatureRoom != 0 && hashFileBlockSize == 0) hashFileBlockSize = layout.blockSize;
  PutLe32(&buf, kHdMetadataLength, layout.metadataLength);
  PutLe32(&buf, kHdBlockSize, layout.blockSize);
  PutLe32(&buf, kHdHashSize, 32);
  PutLe32(&buf, kHdHashFileBlockSize, hashFileBlockSize);
  PutLe64(&buf, kHdFirstHashOffset, layout.metadataLength);
  PutLe64(&buf, kHdHashCount, hashes.size() / 32);
  uint64_t total = layout.metadataLength + hashes.size() + layout.signatureRoom;
  PutLe64(&buf, kHdSignatureOffset, layout.signatureRoom != 0 ? total - layout.signatureRoom : 0);
  PutLe64(&buf, kHdSignatureSize, layout.signatureRoom);
  std::memcpy(buf.data() + kHdAlgorithm, "SHA-256", 8);
  buf += hashes;
  buf.append(layout.signatureRoom, '\0');
  return buf;
}

std::string SignedPart(const std::string &hashData, const HashDataLayout &layout) {
  return hashData.substr(0, hashData.size() - layout.signatureRoom);
}

bool EmbedSignature(std::string *hashData, const HashDataLayout &layout,
                    const std::string &signature) {
  if (signature.size() > layout.signatureRoom) return false;
  std::string tail = signature;
  tail.resize(layout.signatureRoom, '\n');
  hashData->replace(hashData->size() - layout.signatureRoom, layout.signatureRoom, tail);
  return true;
}

}  // namespace tvxtest
