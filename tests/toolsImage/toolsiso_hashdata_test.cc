// Hash data: every header check reached by one malformed buffer, and block
// verification over tampered images and awkward ranges. Signatures over hash
// data are checked through the command line (tests/cli/signature.sh).
#include <gtest/gtest.h>
#include <openssl/evp.h>

#include <cstdlib>
#include <cstring>
#include <functional>
#include <vector>

#include "support/hashdata_builder.h"
#include "support/log_capture.h"
#include "tvx_toolsiso.h"

namespace {

using tvxtest::LogCapture;
using tvxtest::PutLe;

constexpr uint32_t kBlock = 4096;

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
  const std::string image = tvxtest::Bytes(2 * kBlock + 1808);
  const std::string plain = tvxtest::BuildHashData(image);  // 608 bytes: 512 + 3 hashes
  const std::string embedded = tvxtest::BuildHashData(image, {kBlock, 64});  // + 64 for a signature
  ASSERT_EQ(plain.size(), 608u);

  using Edit = std::function<void(std::string *)>;
  auto u32 = [](size_t off, uint64_t v) -> Edit {
    return [=](std::string *b) { PutLe(b, off, v, 4); };
  };
  auto u64 = [](size_t off, uint64_t v) -> Edit {
    return [=](std::string *b) { PutLe(b, off, v, 8); };
  };
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
      {"block size 512", false, u32(kHdBlockSize, 512), nullptr},
      {"size 512", false, [](std::string *b) { b->resize(512); }, "hashDataSize is too small."},
      {"magic without its NUL", false, [](std::string *b) { (*b)[31] = 'x'; },
       "invalid magic string."},
      {"metadata 511", false, u32(kHdMetadataLength, 511), "invalid metadata length."},
      {"metadata past the end", false, u32(kHdMetadataLength, 609), "invalid metadata length."},
      {"block size 511", false, u32(kHdBlockSize, 511), "invalid blockSize."},
      {"block size 4097", false, u32(kHdBlockSize, 4097), "invalid blockSize."},
      {"hash as big as a block", false, both(u32(kHdBlockSize, 512), u32(kHdHashSize, 512)),
       "hashSize bigger than blockSize."},
      {"hash size 0", false, u32(kHdHashSize, 0), "invalid hashSize."},
      {"hash size of the buffer", false, u32(kHdHashSize, 608), "invalid hashSize."},
      {"SHA-256 without NUL", false, [](std::string *b) { (*b)[kHdAlgorithm + 7] = 'x'; },
       "unsupported algorithm."},
      {"hash size 20", false, u32(kHdHashSize, 20), "unexpected hashSize 20, expected 32."},
      {"no hashes", false, u64(kHdHashCount, 0), "hashCount invalid."},
      {"more hashes than bytes", false, u64(kHdHashCount, 608 / 32 + 1), "hashCount invalid."},
      {"count disagrees with size", false, u64(kHdHashCount, 2), "hashCount mismatch."},
      {"hash file block 32", false, u32(kHdHashFileBlockSize, 32),
       "hashSize bigger than hashFileBlockSize."},
      {"hash file block 511", false, u32(kHdHashFileBlockSize, 511), "hashFileBlockSize invalid."},
      {"hash file block 4097", false, u32(kHdHashFileBlockSize, 4097),
       "hashFileBlockSize invalid."},
      {"first hash inside metadata", false, u64(kHdFirstHashOffset, 511),
       "firstHashOffset too small."},
      {"signature of size 0", true, u64(kHdSignatureSize, 0), "signature size invalid."},
      {"signature as big as the file", true, u64(kHdSignatureSize, 672), "signature size invalid."},
      {"signature not at the end", true, u64(kHdSignatureOffset, 607),
       "signature is not at the end."},
      {"signature offset that would wrap", true, u64(kHdSignatureOffset, UINT64_MAX),
       "signature is not at the end."},
      {"hashes after the signature", true, u64(kHdFirstHashOffset, 640),
       "signature and hashes overlap."},
      {"hashes run into the signature", true, u64(kHdFirstHashOffset, 544),
       "signature offset value unexpected."},
      {"hashes run past the end", false,
       both(u32(kHdHashFileBlockSize, 4096), u64(kHdFirstHashOffset, 544)),
       "hashDataSize is smaller than expected."},
      {"first hash far past the end", false, u64(kHdFirstHashOffset, UINT64_MAX - 7),
       "hashDataSize is smaller than expected."},
      {"size left for hashes not whole", false, u64(kHdSignatureSize, 1),
       "unexpected size for hashes."},
      {"unsigned size field that would wrap", false, u64(kHdSignatureSize, UINT64_MAX - 31),
       "unexpected size for hashes."},
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
      EXPECT_TRUE(info->data == mem && info->header == mem && info->dataSize == buf.size());
      EXPECT_EQ(log.All(), "");
      ToolsISO_FreeHashInfo(info);
    } else {
      EXPECT_EQ(info, nullptr);
      EXPECT_EQ(log.All(), std::string("ToolsISO: Error ") + c.log + "\n");
      std::free(mem);  // still the caller's after a failure
    }
  }
  LogCapture log;
  uint8_t one = 0;
  EXPECT_EQ(ToolsISO_ParseHashData(nullptr, 608), nullptr);
  EXPECT_EQ(ToolsISO_ParseHashData(&one, 0), nullptr);
  EXPECT_EQ(log.All(), "ToolsISO: Error hashData is NULL.\nToolsISO: Error hashDataSize is 0.\n");
}

std::string Mismatch(const std::string &good, const std::string &bad, uint64_t block) {
  std::string want = tvxtest::BlockHashes(good, kBlock).substr(block * 32, 32);
  std::string got = tvxtest::BlockHashes(bad, kBlock).substr(block * 32, 32);
  char at[32];
  std::snprintf(at, sizeof at, "0x%lx", static_cast<unsigned long>(block * kBlock));
  return std::string("ToolsISO: Error hash mismatch at offset ") + at + ", expected hash [" +
         Base64(want) + "], but found [" + Base64(got) + "]\n";
}

// Three full blocks and a short one (four hashes); flipped bytes in the
// first, a middle and the short last block; ranges that cross blocks, stop
// early or run past the table.
TEST(ToolsIsoVerifyHashes, FlippedBytesAndRanges) {
  const std::string image = tvxtest::Bytes(3 * kBlock + 1000);
  std::string hd = tvxtest::BuildHashData(image);
  ToolsIsoHashInfo *info = ToolsISO_ParseHashData(MallocCopy(hd), hd.size());
  ASSERT_NE(info, nullptr);
  struct Case {
    const char *name;
    std::vector<size_t> flips;
    uint64_t offset;
    size_t length;
    bool go;                    // continueOnMismatch
    std::vector<uint64_t> bad;  // blocks reported as mismatching
    const char *log;            // another failure's message
  } cases[] = {
      {"whole image", {}, 0, image.size(), false, {}, nullptr},
      {"last byte of the short block", {3 * kBlock + 999}, 0, image.size(), false, {3}, nullptr},
      {"two bad blocks, stop at the first",
       {1, 2 * kBlock + 5},
       0,
       image.size(),
       false,
       {0},
       nullptr},
      {"two bad blocks, report both", {1, 2 * kBlock + 5}, 0, image.size(), true, {0, 2}, nullptr},
      {"empty at the end", {}, 4 * kBlock, 0, false, {}, nullptr},
      {"range ending inside a block", {}, kBlock, 100, false, {1}, nullptr},
      {"unaligned",
       {},
       100,
       10,
       false,
       {},
       "ToolsISO: Error offset 100 is not aligned to blockSize 4096.\n"},
      {"empty past the table",
       {},
       5 * kBlock,
       0,
       false,
       {},
       "ToolsISO: Error 1 blocks of unsigned data.\n"},
  };
  for (const auto &c : cases) {
    SCOPED_TRACE(c.name);
    std::string bad = image;
    for (size_t at : c.flips) bad[at] ^= 1;
    // What the hashes of the range see: a range ending early is a short block.
    std::string seen =
        bad.substr(0, c.offset + c.length < bad.size() ? c.offset + c.length : bad.size());
    std::string want = c.log != nullptr ? c.log : "";
    for (uint64_t b : c.bad) want += Mismatch(image, seen, b);
    bad.resize(6 * kBlock);  // ranges past the table are refused before reading
    LogCapture log;
    EXPECT_EQ(ToolsISO_VerifyHashes(info, c.offset,
                                    reinterpret_cast<const uint8_t *>(bad.data()) + c.offset,
                                    c.length, c.go) != FALSE,
              c.bad.empty() && c.log == nullptr);
    EXPECT_EQ(log.All(), want);
  }
  ToolsISO_FreeHashInfo(info);
}

TEST(ToolsIsoHashImpl, OnlySha256) {
  EXPECT_NE(ToolsISO_GetHashImpl("SHA-256"), nullptr);
  LogCapture log;
  EXPECT_EQ(ToolsISO_GetHashImpl("sha-256"), nullptr);
  EXPECT_EQ(log.All(), "ToolsISO: Unsupported hash algo 'sha-256'\n");
}

}  // namespace
