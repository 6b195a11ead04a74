// Verified reading of real tools images: mastered with xorriso, hash data
// written and signed by `tvxguest hashdata create` with the test PKI, served
// from disk, by lighttpd and by the fault-injecting server.
#include <gtest/gtest.h>

#include <sys/stat.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <cstring>
#include <string>
#include <vector>

#include "lib/toolsImage/toolsiso_image_internal.h"
#include "platform/http.h"
#include "support/http_server.h"
#include "support/log_capture.h"
#include "support/test_pki.h"
#include "tvx_iso9660.h"
#include "tvx_toolsiso_image.h"

namespace {

using tvxtest::LogCapture;
using tvxtest::ReadFileOrDie;
using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

std::string Pattern(size_t n, unsigned seed) {
  std::string s(n, '\0');
  for (size_t i = 0; i < n; i++) s[i] = static_cast<char>((i * 131 + seed * 7 + i / 251) & 0xff);
  return s;
}

// A tools tree with a manifest and a file of many blocks, mastered with
// Rock Ridge and Joliet names.
std::string MasterIso(const TempDir &dir, const std::string &name) {
  std::string tree = dir.Join("tree-" + name);
  std::filesystem::create_directories(tree + "/vmtools");
  WriteFileOrDie(tree + "/manifest.txt", "tools.version = \"12.1.0\"\n");
  WriteFileOrDie(tree + "/vmtools/payload.bin", Pattern(150001, 3));
  std::string iso = dir.Join(name);
  int rc = tvxtest::RunArgv({"xorriso", "-as", "mkisofs", "-quiet", "-R", "-J", "-o", iso, tree});
  EXPECT_EQ(rc, 0);
  return iso;
}

// SignerCert is the maker's leaf with its chain, as the hash-data writer
// takes it.
std::string SignerCert(const std::string &certDir, const TempDir &dir) {
  std::string path = dir.Join("maker-chain.pem");
  WriteFileOrDie(path, ReadFileOrDie(certDir + "signers/maker.pem") +
                           ReadFileOrDie(certDir + "signers/maker.chain"));
  return path;
}

int WriteHashData(const std::string &certDir, const std::string &cert, const std::string &iso,
                  uint32_t blockSize, bool embed) {
  std::vector<std::string> argv = {tvxtest::ToolPath(), "hashdata", "create", "--block-size",
                                   std::to_string(blockSize), "--quiet", "--key",
                                   certDir + "signers/maker.key", "--cert", cert};
  if (embed) argv.push_back("--embed-signature");
  argv.push_back(iso);
  argv.push_back(iso + ".sha");
  return tvxtest::RunArgv(argv);
}

void FlipByte(const std::string &path, uint64_t offset) {
  std::string b = ReadFileOrDie(path);
  b[offset] = static_cast<char>(b[offset] ^ 0x5a);
  WriteFileOrDie(path, b);
}

class ToolsImageRead : public testing::Test {
 protected:
  void SetUp() override {
    certDir_ = tvxtest::TestCertDir();
    if (certDir_.empty()) GTEST_SKIP() << "no test PKI in this build";
    cert_ = SignerCert(certDir_, dir_);
  }
  // Image makes IMAGE (+ .sha, + .sig unless embedded) in the temp dir.
  std::string Image(const std::string &name, uint32_t blockSize = 2048, bool embed = false) {
    std::string iso = MasterIso(dir_, name);
    EXPECT_EQ(WriteHashData(certDir_, cert_, iso, blockSize, embed), 0);
    return iso;
  }

  TempDir dir_;
  std::string certDir_, cert_;
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
    WriteFileOrDie(iso, pristine);
    if (flipped != ~0ull) FlipByte(iso, flipped * bs + 1000);
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

// Edges of a read: the image's end, a misaligned start, a short last block.
TEST_F(ToolsImageRead, ReadsAtTheEdges) {
  std::string iso = Image("edge.iso", 4096, true);
  std::string bytes = ReadFileOrDie(iso);
  const uint64_t size = bytes.size();
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
      {"at the end, with out", size, 4096, true, true, 0},
      {"past the end, with out", size + 8192, 4096, true, true, 0},
      {"at the end, iso callback", size, 4096, false, false, 0},
      {"nothing asked at the end", size, 0, false, true, 0},
      {"last block, clipped", (size - 1) / 4096 * 4096, 16384, true, true, size - (size - 1) / 4096 * 4096},
      {"last block, clipped, iso callback", (size - 1) / 4096 * 4096, 16384, false, false, 0},
      {"three blocks", 4096, 12288, false, true, 12288},
      {"misaligned", 2048, 4096, true, false, 0},
      {"ends inside a block", 0, 5000, true, false, 0},
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
  LogCapture log;
  size_t got = 0;
  EXPECT_FALSE(ToolsISO_LocalFileReadCB(h, buf.data(), 4096, 2048, &got));
  EXPECT_TRUE(log.Contains("ToolsISO: Error offset 2048 is not aligned to blockSize 4096.\n"));
  EXPECT_TRUE(log.Contains("ToolsISO: Invalid data at offset 800 (bytes 4096)\n"));
  ToolsIsoImageInfo info;
  ASSERT_TRUE(ToolsISO_GetImageInfo(h, &info));
  EXPECT_EQ(info.imageSize, size);
  EXPECT_EQ(info.blockSize, 4096u);
  EXPECT_TRUE(info.embeddedSignature);
  EXPECT_TRUE(ToolsISO_LocalFileCloseCB(h));
}

// The hash data and its signature: whatever is present must be sound; only
// missing hash data may be tolerated, and only when the caller allows it.
TEST_F(ToolsImageRead, OpenChecksHashDataAndSignature) {
  std::string iso = Image("tools.iso");
  std::string sha = ReadFileOrDie(iso + ".sha"), sig = ReadFileOrDie(iso + ".sig");
  const std::string image = ReadFileOrDie(iso);
  char *realC = ToolsISO_GetRealPath(iso.c_str());
  const std::string real = realC;
  free(realC);
  std::string stranger = tvxtest::Sign(certDir_, "stranger", sha, false);
  ASSERT_FALSE(stranger.empty());
  std::string flippedHash = sha;
  flippedHash[600] = static_cast<char>(flippedHash[600] ^ 1);
  const std::string garbage = "not hash data";
  struct Case {
    const char *what;
    const std::string *sha;  // null: no .sha file
    const std::string *sig;  // null: no .sig file
    bool requireHash;
    int result;
    bool hashed;
    std::string log;
  } cases[] = {
      {"signed", &sha, &sig, true, TOOLSISO_OPEN_OK, true, ""},
      {"no hash data, not required", nullptr, nullptr, false, TOOLSISO_OPEN_OK, false,
       "ToolsISO: Unable to read hash file " + real + ".sha, ignoring.\n"},
      {"no hash data, required", nullptr, nullptr, true, TOOLSISO_OPEN_HASH_ERROR, false,
       "ToolsISO: Unable to read hash file " + real + ".sha.\n"},
      {"hash data without signature", &sha, nullptr, false, TOOLSISO_OPEN_HASH_ERROR, false,
       "ToolsISO: Unable to read signature file '" + real + ".sig'.\n"},
      {"signed by a stranger", &sha, &stranger, false, TOOLSISO_OPEN_HASH_ERROR, false,
       "ToolsISO: Signature verification failed for '" + real + "'.\n"},
      {"hash data changed after signing", &flippedHash, &sig, false,
       TOOLSISO_OPEN_HASH_ERROR, false, "ToolsISO: Signature verification failed for '" + real + "'.\n"},
      {"hash data garbage", &garbage, &sig, false, TOOLSISO_OPEN_HASH_ERROR, false,
       "ToolsISO: Unable to parse the hash '" + real + ".sha'.\n"},
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
    if (!k.log.empty()) {
      EXPECT_TRUE(log.Contains(k.log)) << log.All();
    }
    if (k.result != TOOLSISO_OPEN_OK) {
      EXPECT_EQ(h, nullptr);
      continue;
    }
    ToolsIsoImageInfo info;
    ASSERT_TRUE(ToolsISO_GetImageInfo(h, &info));
    EXPECT_EQ(info.hashed, k.hashed);
    EXPECT_TRUE(ToolsISO_LocalFileCloseCB(h));
  }

  // Sizes: hash data as large as the image, a signature above the ceiling.
  std::filesystem::remove(iso + ".sig");
  WriteFileOrDie(iso + ".sha", std::string(image.size(), 'x'));
  LogCapture log;
  ToolsIsoHashInfo *info = nullptr;
  EXPECT_FALSE(ToolsISO_GetLocalFileHashInfo(iso.c_str(), image.size(), FALSE, &info));
  EXPECT_TRUE(log.Contains("ToolsISO: Hash file '" + real + ".sha' too big (" +
                           std::to_string(image.size()) + " bytes).\n"));
  WriteFileOrDie(iso + ".sha", sha);
  WriteFileOrDie(iso + ".sig", sig + std::string(64 * 1024, '\n'));
  EXPECT_FALSE(ToolsISO_GetLocalFileHashInfo(iso.c_str(), image.size(), FALSE, &info));
  EXPECT_TRUE(log.Contains("ToolsISO: Signature file '" + real + ".sig' too big (" +
                           std::to_string(sig.size() + 64 * 1024) + " bytes).\n"));
  EXPECT_EQ(info, nullptr);

  ToolsIsoLocalFile *h = nullptr;
  EXPECT_EQ(ToolsISO_LocalFileOpen(dir_.Join("absent.iso").c_str(), FALSE, &h), TOOLSISO_OPEN_IO_ERROR);
  EXPECT_TRUE(log.Contains("ToolsISO: Failed to open Tools ISO " + dir_.Join("absent.iso") +
                           " (FileIOResult=6).\n"))
      << log.All();
}

// Files come out of the image through the ISO reader byte-exact, and a
// flipped byte inside one file fails that file only.
TEST_F(ToolsImageRead, IsoReaderOverVerifiedCallbacks) {
  std::string iso = Image("win.iso");
  struct Case {
    const char *path;
    std::string want;
  } files[] = {{"manifest.txt", "tools.version = \"12.1.0\"\n"},
               {"vmtools/payload.bin", Pattern(150001, 3)}};
  auto readAll = [&](const char *path, std::string *out) {
    ToolsIsoLocalFile *h = OpenOk(iso);
    Iso9660Image *image = nullptr;
    if (h == nullptr) return -1;
    int rc = Iso9660_OpenWithReader(ToolsISO_LocalFileIsoReadCB, ToolsISO_LocalFileCloseCB, h,
                                    ISO9660_FORMAT_ROCKRIDGE, &image);
    if (rc != ISO9660_OK) {
      ToolsISO_LocalFileCloseCB(h);
      return rc;
    }
    Iso9660DirEntry e;
    std::memset(&e, 0, sizeof e);
    std::snprintf(e.name, sizeof e.name, "%s", path);
    Iso9660File *f = nullptr;
    rc = Iso9660_OpenFile(image, &e, &f);
    char buf[3000];  // deliberately not a multiple of the block size
    while (rc == ISO9660_OK) {
      size_t n = sizeof buf;
      rc = Iso9660_ReadFile(image, f, buf, &n);
      if (rc == ISO9660_OK) out->append(buf, n);
    }
    Iso9660_Close(image);
    return rc == ISO9660_END ? 0 : rc;
  };
  for (const Case &k : files) {
    std::string got;
    EXPECT_EQ(readAll(k.path, &got), 0) << k.path;
    EXPECT_EQ(got, k.want) << k.path;
  }
  // Tamper with the middle of the payload: the payload fails, the manifest
  // (in other blocks) still reads.
  std::string bytes = ReadFileOrDie(iso);
  size_t at = bytes.find(Pattern(150001, 3).substr(70000, 64));
  ASSERT_NE(at, std::string::npos);
  FlipByte(iso, at);
  std::string got;
  LogCapture log;
  EXPECT_NE(readAll("vmtools/payload.bin", &got), 0);
  EXPECT_TRUE(log.Contains("ToolsISO: Error hash mismatch at offset 0x"));
  got.clear();
  EXPECT_EQ(readAll("manifest.txt", &got), 0);
  EXPECT_EQ(got, files[0].want);
}

// The same image over HTTP: a real web server for the good paths, the
// fault-injecting one for the failures.
TEST_F(ToolsImageRead, OverHttp) {
  std::string iso = Image("linux.iso");
  std::string bytes = ReadFileOrDie(iso);
  tvxtest::WebServer web(dir_.Path());
  ASSERT_TRUE(web.Ok());
  LogCapture log;
  for (std::string url : {web.Url("/linux.iso"), web.Url("/linux.iso?v=2")}) {
    SCOPED_TRACE(url);
    ToolsIsoRemoteFile *h = nullptr;
    ASSERT_EQ(ToolsISO_RemoteFileOpen(url.c_str(), TRUE, &h), TOOLSISO_OPEN_OK) << log.All();
    std::string got(bytes.size(), '\0');
    for (size_t off = 0; off < bytes.size(); off += 65536) {
      size_t n = 0;
      ASSERT_TRUE(ToolsISO_RemoteFileReadCB(h, got.data() + off, 65536, off, &n)) << off;
    }
    EXPECT_EQ(got, bytes);
    EXPECT_TRUE(ToolsISO_RemoteFileCloseCB(h));
  }

  // The caller's connection stays open; the hash info is the caller's.
  std::string url = web.Url("/linux.iso");
  HttpConnection *conn = nullptr;
  ASSERT_EQ(Http_Connect(url.c_str(), 4, 15000, 0, nullptr, nullptr, &conn), HTTP_OK);
  ToolsIsoHashInfo *info = nullptr;
  EXPECT_TRUE(ToolsISO_GetHttpHashInfo(conn, url.c_str(), bytes.size(), TRUE, &info));
  ASSERT_NE(info, nullptr);
  ToolsISO_FreeHashInfo(info);
  uint64_t size = 0;
  EXPECT_EQ(Http_GetFileSize(conn, url.c_str(), &size), HTTP_OK);
  Http_Close(conn);

  const std::string sha = ReadFileOrDie(iso + ".sha"), sig = ReadFileOrDie(iso + ".sig");
  using Mode = tvxtest::HttpServer::Mode;
  struct Case {
    const char *what;
    Mode mode;
    bool withSha;
    bool requireHash;
    bool ok;
    bool hashed;
    std::string log;  // "%u" stands for the hash URL
  } cases[] = {
      {"no hash data, not required", Mode::kNormal, false, false, true, false,
       "ToolsISO: Unable to get the size for hash '%u' (error=4), ignoring.\n"},
      {"no hash data, required", Mode::kNormal, false, true, false, false,
       "ToolsISO: Unable to get the size for hash '%u' (error=4).\n"},
      {"server failing, not required", Mode::kError500, true, false, false, false,
       "ToolsISO: Unable to get the size for hash '%u' (error=5).\n"},
      {"hash body cut short", Mode::kShortBody, true, true, false, false,
       "ToolsISO: Unable to fetch hash '%u' (error=6).\n"},
      {"range ignored is fine for a whole file", Mode::kIgnoreRanges, true, true, true, true, ""},
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
    info = reinterpret_cast<ToolsIsoHashInfo *>(1);
    EXPECT_EQ(ToolsISO_GetHttpHashInfo(nullptr, u.c_str(), bytes.size(), k.requireHash, &info), k.ok)
        << log.All();
    EXPECT_EQ(info != nullptr, k.hashed);
    ToolsISO_FreeHashInfo(info);
    if (!want.empty()) {
      EXPECT_TRUE(log.Contains(want)) << log.All();
    }
  }
  // Nobody listening: not an absent hash, so not tolerated.
  log.Clear();
  EXPECT_FALSE(ToolsISO_GetHttpHashInfo(nullptr, "http://127.0.0.1:1/linux.iso", 1 << 20, FALSE, &info));
  EXPECT_TRUE(log.Contains("ToolsISO: Unable to get the size for hash "
                           "'http://127.0.0.1:1/linux.iso.sha' (error=8).\n"))
      << log.All();
}

TEST(ToolsImageUrl, CompanionUrls) {
  struct Case {
    const char *url;
    const char *sha;  // "" when there is none
  } cases[] = {
      {"http://h/tools/linux.iso", "http://h/tools/linux.iso.sha"},
      {"http://h/tools/linux.iso?v=2&x=.iso", "http://h/tools/linux.iso.sha?v=2&x=.iso"},
      {"http://h/a.iso/b.iso", "http://h/a.iso.sha/b.iso"},
      {"http://h/tools/linux.ISO", ""},
      {"http://h/tools/linux", ""},
  };
  for (const Case &k : cases) {
    LogCapture log;
    EXPECT_EQ(tvx::toolsiso::MakeCompanionUrl(k.url, "sha"), k.sha) << k.url;
    if (*k.sha == '\0') {
      EXPECT_TRUE(log.Contains(std::string("ToolsISO: Tools ISO URL '") + k.url +
                               "' does not have '.iso' extension?\n"));
    }
  }
}

}  // namespace
