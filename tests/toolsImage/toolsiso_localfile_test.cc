// Verified reading of real tools images: mastered with xorriso, hash data
// written and signed by `tvxguest hashdata create` with the test PKI, served
// from disk, by lighttpd and by the fault-injecting server. Reading files
// through Iso9660_OpenWithReader is covered by tests/cli/tools_image.sh.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include "support/http_server.h"
#include "support/log_capture.h"
#include "support/test_pki.h"
#include "toolsImage/signed_image.h"
#include "tvx_toolsiso_image.h"

namespace {

using tvxtest::LogCapture;
using tvxtest::ReadFileOrDie;
using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

class ToolsImageRead : public testing::Test {
 protected:
  void SetUp() override {
    certDir_ = tvxtest::TestCertDir();
    if (certDir_.empty()) GTEST_SKIP() << "no test PKI in this build";
  }
  std::string Image(const std::string &name, uint32_t blockSize = 2048, bool embed = false,
                    size_t pad = 0) {
    std::string iso = tvxtest::SignedToolsImage(dir_, certDir_, name, "tools.version = \"12.1.0\"\n",
                                                blockSize, embed, pad);
    EXPECT_NE(iso, "");
    return iso;
  }

  TempDir dir_;
  std::string certDir_;
};

ToolsIsoLocalFile *OpenOk(const std::string &iso) {
  ToolsIsoLocalFile *h = nullptr;
  EXPECT_EQ(ToolsISO_LocalFileOpen(iso.c_str(), TRUE, &h), TOOLSISO_OPEN_OK);
  return h;
}

// Every block read through both callbacks; a flipped byte fails exactly the
// block that holds it, wherever it lies.
TEST_F(ToolsImageRead, FlippedByteFailsExactlyItsBlock) {
  std::string iso = Image("linux.iso");
  std::string pristine = ReadFileOrDie(iso);
  const uint64_t bs = 2048, blocks = pristine.size() / bs;
  ASSERT_EQ(pristine.size() % bs, 0u);
  for (uint64_t flipped : std::vector<uint64_t>{~0ull, 0ull, blocks / 2, blocks - 1}) {
    SCOPED_TRACE(flipped);
    std::string bytes = pristine;
    if (flipped != ~0ull) bytes[flipped * bs + 1000] ^= 0x5a;
    WriteFileOrDie(iso, bytes);
    ToolsIsoLocalFile *h = OpenOk(iso);
    ASSERT_NE(h, nullptr);
    std::vector<char> buf(bs);
    LogCapture log;
    for (uint64_t b = 0; b < blocks; b++) {
      size_t got = 7;
      bool good = b != flipped;
      EXPECT_EQ(ToolsISO_LocalFileReadCB(h, buf.data(), bs, b * bs, &got), good) << b;
      EXPECT_EQ(got, good ? bs : 0) << b;
      if (good) {
        EXPECT_EQ(std::memcmp(buf.data(), pristine.data() + b * bs, bs), 0) << b;
      }
      EXPECT_EQ(ToolsISO_LocalFileIsoReadCB(h, buf.data(), bs, b * bs), good) << b;
    }
    if (flipped != ~0ull) {
      char want[64];
      std::snprintf(want, sizeof want, "ToolsISO: Invalid data at offset %lx (bytes 2048)\n",
                    static_cast<unsigned long>(flipped * bs));
      EXPECT_EQ(std::count(log.Lines().begin(), log.Lines().end(), std::string(want)), 2);
    }
    EXPECT_TRUE(ToolsISO_LocalFileCloseCB(h));
  }
}

// Edges of a read: the image's end and a short last block. Ranges the hashes
// cannot vouch for (misaligned, ending inside a block) are refused by
// ToolsISO_VerifyHashes, whose own test covers them.
TEST_F(ToolsImageRead, ReadsAtTheEdges) {
  std::string iso = Image("edge.iso", 4096, true, 2048 + 100);
  std::string bytes = ReadFileOrDie(iso);
  const uint64_t size = bytes.size(), last = (size - 1) / 4096 * 4096;
  ASSERT_NE(size % 4096, 0u);
  ToolsIsoLocalFile *h = OpenOk(iso);
  ASSERT_NE(h, nullptr);
  std::vector<char> buf(16384);
  struct Case {
    const char *what;
    uint64_t offset;
    size_t length;
    bool withOut;
    bool ok;
    size_t got;
  } cases[] = {
      {"past the end, with out", size + 8192, 4096, true, true, 0},
      {"at the end, iso callback", size, 4096, false, false, 0},
      {"short last block, clipped", last, 16384, true, true, size - last},
      {"short last block, iso callback", last, 16384, false, false, 0},
  };
  for (const Case &k : cases) {
    SCOPED_TRACE(k.what);
    LogCapture log;
    size_t got = 99;
    Bool ok = k.withOut ? ToolsISO_LocalFileReadCB(h, buf.data(), k.length, k.offset, &got)
                        : ToolsISO_LocalFileIsoReadCB(h, buf.data(), k.length, k.offset);
    EXPECT_EQ(ok, k.ok) << log.All();
    if (k.withOut) {
      EXPECT_EQ(got, k.got);
    }
    if (ok && k.got > 0) {
      EXPECT_EQ(std::string(buf.data(), k.got), bytes.substr(k.offset, k.got));
    }
  }
  EXPECT_TRUE(ToolsISO_LocalFileCloseCB(h));
}

// The hash data and its signature: whatever is present must be sound; only
// missing hash data may be tolerated, and only when the caller allows it.
TEST_F(ToolsImageRead, OpenChecksHashDataAndSignature) {
  std::string iso = Image("tools.iso");
  std::string sha = ReadFileOrDie(iso + ".sha"), sig = ReadFileOrDie(iso + ".sig");
  const std::string image = ReadFileOrDie(iso);
  const std::string real = std::filesystem::canonical(iso);
  std::string stranger = tvxtest::Sign(certDir_, "stranger", sha, false);
  ASSERT_FALSE(stranger.empty());
  const std::string huge(image.size(), 'x');
  struct Case {
    const char *what;
    const std::string *sha;  // null: no .sha file
    const std::string *sig;  // null: no .sig file
    bool requireHash;
    int result;
    std::string log;
  } cases[] = {
      {"signed", &sha, &sig, true, TOOLSISO_OPEN_OK, ""},
      {"no hash data, not required", nullptr, nullptr, false, TOOLSISO_OPEN_OK,
       "ToolsISO: Unable to read hash file " + real + ".sha, ignoring.\n"},
      {"no hash data, required", nullptr, nullptr, true, TOOLSISO_OPEN_HASH_ERROR,
       "ToolsISO: Unable to read hash file " + real + ".sha.\n"},
      {"hash data without signature", &sha, nullptr, false, TOOLSISO_OPEN_HASH_ERROR,
       "ToolsISO: Unable to read signature file '" + real + ".sig'.\n"},
      {"signed by a stranger", &sha, &stranger, false, TOOLSISO_OPEN_HASH_ERROR,
       "ToolsISO: Signature verification failed for '" + real + "'.\n"},
      {"hash data as large as the image", &huge, &sig, false, TOOLSISO_OPEN_HASH_ERROR,
       "ToolsISO: Hash file '" + real + ".sha' too big (" + std::to_string(huge.size()) + " bytes).\n"},
  };
  for (const Case &k : cases) {
    SCOPED_TRACE(k.what);
    std::filesystem::remove(iso + ".sha");
    std::filesystem::remove(iso + ".sig");
    if (k.sha != nullptr) WriteFileOrDie(iso + ".sha", *k.sha);
    if (k.sig != nullptr) WriteFileOrDie(iso + ".sig", *k.sig);
    LogCapture log;
    ToolsIsoLocalFile *h = reinterpret_cast<ToolsIsoLocalFile *>(1);
    EXPECT_EQ(ToolsISO_LocalFileOpen(iso.c_str(), k.requireHash, &h), k.result) << log.All();
    EXPECT_TRUE(k.log.empty() || log.Contains(k.log)) << log.All();
    EXPECT_EQ(h != nullptr, k.result == TOOLSISO_OPEN_OK);
    if (h != nullptr) {
      EXPECT_TRUE(ToolsISO_LocalFileCloseCB(h));
    }
  }
}

// Fetching the hash data over HTTP: only a missing file is an absent hash.
// The good path against a real web server is tests/cli/tools_image.sh's.
TEST_F(ToolsImageRead, HashDataOverHttp) {
  std::string iso = Image("linux.iso");
  std::string bytes = ReadFileOrDie(iso);
  LogCapture log;
  const std::string sha = ReadFileOrDie(iso + ".sha"), sig = ReadFileOrDie(iso + ".sig");
  using Mode = tvxtest::HttpServer::Mode;
  struct Case {
    const char *what;
    Mode mode;
    bool withSha;
    bool requireHash;
    bool ok;
    std::string log;  // "%u" stands for the hash URL
  } cases[] = {
      {"no hash data, not required", Mode::kNormal, false, false, true,
       "ToolsISO: Unable to get the size for hash '%u' (error=4), ignoring.\n"},
      {"no hash data, required", Mode::kNormal, false, true, false,
       "ToolsISO: Unable to get the size for hash '%u' (error=4).\n"},
      {"server failing is not an absent hash", Mode::kError500, true, false, false,
       "ToolsISO: Unable to get the size for hash '%u' (error=5).\n"},
      {"hash body cut short", Mode::kShortBody, true, true, false,
       "ToolsISO: Unable to fetch hash '%u' (error=6).\n"},
  };
  for (const Case &k : cases) {
    SCOPED_TRACE(k.what);
    std::map<std::string, std::string> files = {{"/t/linux.iso", bytes}, {"/t/linux.iso.sig", sig}};
    if (k.withSha) files["/t/linux.iso.sha"] = sha;
    tvxtest::HttpServer server(files, k.mode);
    std::string u = server.Url("/t/linux.iso");
    std::string want = k.log;
    if (size_t at = want.find("%u"); at != std::string::npos) want.replace(at, 2, u + ".sha");
    log.Clear();
    ToolsIsoHashInfo *info = reinterpret_cast<ToolsIsoHashInfo *>(1);
    EXPECT_EQ(ToolsISO_GetHttpHashInfo(nullptr, u.c_str(), bytes.size(), k.requireHash, &info), k.ok)
        << log.All();
    EXPECT_EQ(info, nullptr);
    EXPECT_TRUE(log.Contains(want)) << log.All();
  }
}

}  // namespace
