// Hash data: every header check reached by one malformed buffer, block
// verification over tampered images and awkward ranges, and signatures over
// hash data (embedded and detached) from the test PKI.
#include <gtest/gtest.h>

#include <openssl/err.h>
#include <openssl/evp.h>

#include <cstdlib>
#include <cstring>
#include <functional>

#include "support/hashdata_builder.h"
#include "support/log_capture.h"
#include "support/test_pki.h"
#include "tvx_toolsiso.h"

namespace {

using tvxtest::HashDataLayout;
using tvxtest::LogCapture;
using tvxtest::PutLe32;
using tvxtest::PutLe64;

constexpr uint32_t kBlock = 4096;

// Image of two full blocks and a short one; three hashes, 608 bytes of hash
// data without a signature.
std::string Image(size_t size) {
  std::string image(size, '\0');
  for (size_t i = 0; i < size; i++) image[i] = static_cast<char>((i * 131 + i / 4096) & 0xff);
  return image;
}

uint8_t *MallocCopy(const std::string &s) {
  auto *p = static_cast<uint8_t *>(std::malloc(s.size() + 1));
  std::memcpy(p, s.data(), s.size());
  return p;
}

std::string Base64(const std::string &bytes) {
  std::string out((bytes.size() + 2) / 3 * 4 + 1, '\0');
  int n = EVP_EncodeBlock(reinterpret_cast<unsigned char *>(out.data()),
                          reinterpret_cast<const unsigned char *>(bytes.data()),
                          static_cast<int>(bytes.size()));
  out.resize(static_cast<size_t>(n));
  return out;
}

TEST(ToolsIsoParseHashData, EveryCheckInOrder) {
  const std::string image = Image(2 * kBlock + 1808);
  const std::string plain = tvxtest::BuildHashData(image);  // 608 bytes
  HashDataLayout signedLayout;
  signedLayout.signatureRoom = 64;
  const std::string embedded = tvxtest::BuildHashData(image, signedLayout);  // 672 bytes
  ASSERT_EQ(plain.size(), 608u);
  ASSERT_EQ(embedded.size(), 672u);

  using Edit = std::function<void(std::string *)>;
  auto u32 = [](size_t off, uint32_t v) -> Edit { return [=](std::string *b) { PutLe32(b, off, v); }; };
  auto u64 = [](size_t off, uint64_t v) -> Edit { return [=](std::string *b) { PutLe64(b, off, v); }; };
  auto both = [](Edit a, Edit b) -> Edit { return [=](std::string *x) { a(x), b(x); }; };
  using namespace tvxtest;
  struct Case {
    const char *name;
    bool embedded;
    Edit edit;
    const char *log;  // null: parses
  } cases[] = {
      {"plain", false, nullptr, nullptr},
      {"embedded signature", true, nullptr, nullptr},
      {"block size 512", false, both(u32(kHdBlockSize, 512), u32(kHdHashFileBlockSize, 0)), nullptr},
      {"size 512", false, [](std::string *b) { b->resize(512); },
       "ToolsISO: Error hashDataSize is too small.\n"},
      {"magic without its NUL", false, [](std::string *b) { (*b)[31] = 'x'; },
       "ToolsISO: Error invalid magic string.\n"},
      {"metadata 511", false, u32(kHdMetadataLength, 511), "ToolsISO: Error invalid metadata length.\n"},
      {"metadata past the end", false, u32(kHdMetadataLength, 609),
       "ToolsISO: Error invalid metadata length.\n"},
      {"block size 511", false, u32(kHdBlockSize, 511), "ToolsISO: Error invalid blockSize.\n"},
      {"block size 4097", false, u32(kHdBlockSize, 4097), "ToolsISO: Error invalid blockSize.\n"},
      {"hash as big as a block", false, both(u32(kHdBlockSize, 512), u32(kHdHashSize, 512)),
       "ToolsISO: Error hashSize bigger than blockSize.\n"},
      {"hash size 0", false, u32(kHdHashSize, 0), "ToolsISO: Error invalid hashSize.\n"},
      {"hash size past the buffer", false, u32(kHdHashSize, 608), "ToolsISO: Error invalid hashSize.\n"},
      {"SHA-1", false, [](std::string *b) { std::memcpy(b->data() + kHdAlgorithm, "SHA-1\0\0", 8); },
       "ToolsISO: Error unsupported algorithm.\n"},
      {"SHA-256 without NUL", false, [](std::string *b) { (*b)[kHdAlgorithm + 7] = 'x'; },
       "ToolsISO: Error unsupported algorithm.\n"},
      {"hash size 20", false, u32(kHdHashSize, 20), "ToolsISO: Error unexpected hashSize 20, expected 32.\n"},
      {"no hashes", false, u64(kHdHashCount, 0), "ToolsISO: Error hashCount invalid.\n"},
      {"more hashes than bytes", false, u64(kHdHashCount, 608 / 32 + 1),
       "ToolsISO: Error hashCount invalid.\n"},
      {"count disagrees with size", false, u64(kHdHashCount, 2), "ToolsISO: Error hashCount mismatch.\n"},
      {"hash file block 32", false, u32(kHdHashFileBlockSize, 32),
       "ToolsISO: Error hashSize bigger than hashFileBlockSize.\n"},
      {"hash file block 511", false, u32(kHdHashFileBlockSize, 511),
       "ToolsISO: Error hashFileBlockSize invalid.\n"},
      {"hash file block 4097", false, u32(kHdHashFileBlockSize, 4097),
       "ToolsISO: Error hashFileBlockSize invalid.\n"},
      {"first hash inside metadata", false, u64(kHdFirstHashOffset, 511),
       "ToolsISO: Error firstHashOffset too small.\n"},
      {"signature of size 0", true, u64(kHdSignatureSize, 0), "ToolsISO: Error signature size invalid.\n"},
      {"signature as big as the file", true, u64(kHdSignatureSize, 672),
       "ToolsISO: Error signature size invalid.\n"},
      {"signature not at the end", true, u64(kHdSignatureOffset, 607),
       "ToolsISO: Error signature is not at the end.\n"},
      {"signature offset that would wrap", true, u64(kHdSignatureOffset, UINT64_MAX),
       "ToolsISO: Error signature is not at the end.\n"},
      {"hashes after the signature", true, u64(kHdFirstHashOffset, 640),
       "ToolsISO: Error signature and hashes overlap.\n"},
      {"hashes run into the signature", true, u64(kHdFirstHashOffset, 544),
       "ToolsISO: Error signature offset value unexpected.\n"},
      {"hashes run past the end", false,
       both(u32(kHdHashFileBlockSize, 4096), u64(kHdFirstHashOffset, 544)),
       "ToolsISO: Error hashDataSize is smaller than expected.\n"},
      {"first hash far past the end", false, u64(kHdFirstHashOffset, UINT64_MAX - 7),
       "ToolsISO: Error hashDataSize is smaller than expected.\n"},
      {"size left for hashes not whole", false, u64(kHdSignatureSize, 1),
       "ToolsISO: Error unexpected size for hashes.\n"},
      {"unsigned size field that would wrap", false, u64(kHdSignatureSize, UINT64_MAX - 31),
       "ToolsISO: Error unexpected size for hashes.\n"},
  };
  for (const auto &c : cases) {
    SCOPED_TRACE(c.name);
    std::string buf = c.embedded ? embedded : plain;
    if (c.edit) c.edit(&buf);
    uint8_t *mem = MallocCopy(buf);
    LogCapture log;
    ToolsIsoHashInfo *info = ToolsISO_ParseHashData(mem, buf.size());
    if (c.log == nullptr) {
      ASSERT_NE(info, nullptr) << log.All();
      EXPECT_EQ(info->data, mem);
      EXPECT_EQ(info->header, mem);
      EXPECT_EQ(info->dataSize, buf.size());
      EXPECT_TRUE(log.Lines().empty()) << log.All();
      ToolsISO_FreeHashInfo(info);
    } else {
      EXPECT_EQ(info, nullptr);
      EXPECT_EQ(log.All(), c.log);
      std::free(mem);  // still the caller's after a failure
    }
  }

  LogCapture log;
  EXPECT_EQ(ToolsISO_ParseHashData(nullptr, 608), nullptr);
  uint8_t one = 0;
  EXPECT_EQ(ToolsISO_ParseHashData(&one, 0), nullptr);
  EXPECT_EQ(log.All(), "ToolsISO: Error hashData is NULL.\nToolsISO: Error hashDataSize is 0.\n");
  ToolsISO_FreeHashInfo(nullptr);
}

class ToolsIsoVerifyHashes : public testing::Test {
 protected:
  // Three full blocks and a short one: four hashes.
  void SetUp() override {
    image_ = Image(3 * kBlock + 1000);
    std::string hd = tvxtest::BuildHashData(image_);
    info_ = ToolsISO_ParseHashData(MallocCopy(hd), hd.size());
    ASSERT_NE(info_, nullptr);
  }
  void TearDown() override { ToolsISO_FreeHashInfo(info_); }
  bool Verify(const std::string &image, uint64_t offset, size_t length, bool go = false) {
    return ToolsISO_VerifyHashes(info_, offset,
                                 reinterpret_cast<const uint8_t *>(image.data()) + offset, length,
                                 go) != FALSE;
  }
  std::string Mismatch(const std::string &bad, uint64_t blockOffset) {
    std::string want = tvxtest::BlockHashes(image_, kBlock).substr(blockOffset / kBlock * 32, 32);
    std::string got = tvxtest::BlockHashes(bad, kBlock).substr(blockOffset / kBlock * 32, 32);
    char head[64];
    std::snprintf(head, sizeof head, "0x%lx", static_cast<unsigned long>(blockOffset));
    return std::string("ToolsISO: Error hash mismatch at offset ") + head + ", expected hash [" +
           Base64(want) + "], but found [" + Base64(got) + "]\n";
  }
  std::string image_;
  ToolsIsoHashInfo *info_ = nullptr;
};

TEST_F(ToolsIsoVerifyHashes, OneFlippedByteCaughtInItsBlock) {
  struct Case {
    const char *name;
    size_t at;
    uint64_t block;
  } cases[] = {
      {"first byte", 0, 0},
      {"middle of a middle block", kBlock + kBlock / 2, kBlock},
      {"last byte of a full block", 3 * kBlock - 1, 2 * kBlock},
      {"last byte of the short last block", 3 * kBlock + 999, 3 * kBlock},
  };
  ASSERT_TRUE(Verify(image_, 0, image_.size()));
  for (const auto &c : cases) {
    SCOPED_TRACE(c.name);
    std::string bad = image_;
    bad[c.at] = static_cast<char>(bad[c.at] ^ 0x01);
    LogCapture log;
    EXPECT_FALSE(Verify(bad, 0, bad.size()));
    EXPECT_EQ(log.All(), Mismatch(bad, c.block));
  }
}

TEST_F(ToolsIsoVerifyHashes, Ranges) {
  std::string twoBad = image_;
  twoBad[1] ^= 1;
  twoBad[2 * kBlock + 5] ^= 1;
  struct Case {
    const char *name;
    const std::string *image;
    uint64_t offset;
    size_t length;
    bool go;
    bool result;
    std::string log;
  } cases[] = {
      {"blocks 1 and 2", &image_, kBlock, 2 * kBlock, false, true, ""},
      {"to the short end", &image_, 2 * kBlock, kBlock + 1000, false, true, ""},
      {"empty, aligned", &image_, kBlock, 0, false, true, ""},
      {"empty at the end", &image_, 4 * kBlock, 0, false, true, ""},
      {"short range inside the image", &image_, kBlock, 100, false, false,
       Mismatch(image_.substr(0, kBlock + 100), kBlock)},
      {"unaligned", &image_, 100, 10, false, false,
       "ToolsISO: Error offset 100 is not aligned to blockSize 4096.\n"},
      {"one block past the table", &image_, 2 * kBlock, 3 * kBlock, false, false,
       "ToolsISO: Error 1 blocks of unsigned data.\n"},
      {"empty past the table", &image_, 5 * kBlock, 0, false, false,
       "ToolsISO: Error 1 blocks of unsigned data.\n"},
      {"two bad blocks, stop at the first", &twoBad, 0, twoBad.size(), false, false,
       Mismatch(twoBad, 0)},
      {"two bad blocks, report both", &twoBad, 0, twoBad.size(), true, false,
       Mismatch(twoBad, 0) + Mismatch(twoBad, 2 * kBlock)},
  };
  for (const auto &c : cases) {
    SCOPED_TRACE(c.name);
    // The range may run past the test image (it is refused before reading).
    std::string padded = *c.image + std::string(6 * kBlock, '\0');
    LogCapture log;
    EXPECT_EQ(Verify(padded, c.offset, c.length, c.go), c.result);
    EXPECT_EQ(log.All(), c.log);
  }
}

TEST(ToolsIsoHashImpl, OnlySha256) {
  EXPECT_NE(ToolsISO_GetHashImpl("SHA-256"), nullptr);
  LogCapture log;
  EXPECT_EQ(ToolsISO_GetHashImpl("sha-256"), nullptr);
  EXPECT_EQ(ToolsISO_GetHashImpl("MD5"), nullptr);
  EXPECT_EQ(log.All(),
            "ToolsISO: Unsupported hash algo 'sha-256'\nToolsISO: Unsupported hash algo 'MD5'\n");
}

TEST(ToolsIsoVerifySignature, EmbeddedAndDetached) {
  std::string certDir = tvxtest::TestCertDir();
  if (certDir.empty()) GTEST_SKIP() << "the build trusts a directory outside its tree";
  std::string image = Image(5 * kBlock);
  HashDataLayout room;
  room.signatureRoom = 4096;
  std::string embedded = tvxtest::BuildHashData(image, room);
  std::string covered = tvxtest::SignedPart(embedded, room);
  ASSERT_TRUE(tvxtest::EmbedSignature(&embedded, room,
                                      tvxtest::Sign(certDir, "maker", covered, false)));
  std::string plain = tvxtest::BuildHashData(image);
  std::string detached = tvxtest::Sign(certDir, "maker", plain, false);
  std::string stranger = tvxtest::Sign(certDir, "stranger", plain, false);
  std::string partner = tvxtest::Sign(certDir, "partner", plain, false);
  std::string tampered = plain;
  tampered[600] ^= 1;
  std::string partnerCert = certDir + "tvxpartner.cert";
  struct Case {
    const char *name;
    const char *cert;
    std::string sig, data;
    std::string log;  // "" valid; a prefix of the single log line otherwise
  } cases[] = {
      {"embedded", nullptr, embedded.substr(covered.size()), covered, ""},
      {"detached", nullptr, detached, plain, ""},
      {"partner under the partner certificate", partnerCert.c_str(), partner, plain, ""},
      {"tampered", nullptr, detached, tampered,
       "ToolsISO: Error failed to verify signature using default cert: "},
      {"partner", nullptr, partner, plain,
       "ToolsISO: Error failed to verify signature using default cert: certificate verify error"},
      {"stranger under a named certificate", partnerCert.c_str(), stranger, plain,
       "ToolsISO: Error failed to verify signature using " + partnerCert + " cert: "},
      {"not a signature", nullptr, "garbage", plain,
       "ToolsISO: Error failed to load signature buffer: no start line\n"},
  };
  for (const auto &c : cases) {
    SCOPED_TRACE(c.name);
    LogCapture log;
    Bool ok = ToolsISO_VerifySignature(c.cert, c.sig.data(), c.sig.size(), c.data.data(),
                                       c.data.size());
    EXPECT_EQ(ok != FALSE, c.log.empty());
    if (!c.log.empty()) {
      ASSERT_EQ(log.Lines().size(), 1u) << log.All();
      EXPECT_EQ(log.Lines()[0].substr(0, c.log.size()), c.log);
    }
    EXPECT_EQ(ERR_peek_error(), 0u) << "the error queue is cleared after a failure";
    ERR_clear_error();
  }
}

}  // namespace
