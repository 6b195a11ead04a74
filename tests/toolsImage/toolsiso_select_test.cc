#include <gtest/gtest.h>

#include <sys/stat.h>

#include <atomic>
#include <memory>
#include <cstdlib>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "lib/toolsImage/toolsiso_image_internal.h"
#include "support/log_capture.h"
#include "support/test_pki.h"
#include "tvx_toolsiso_image.h"

namespace {

using tvxtest::LogCapture;
using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

std::string Real(const std::string &path) {
  char *r = ToolsISO_GetRealPath(path.c_str());
  std::string s = r;
  free(r);
  return s;
}

enum class Map { kNone, kSigned, kUnsigned, kTampered, kStranger, kMalformed };

const char *const kMapText =
    "# guest = image\n"
    "windows9-64 = \"win-custom.iso\"\n"
    "rhel6 = \"linux_v2.iso\"\n"
    "winNT = \"../../etc/passwd.iso\"\n"
    "solaris11-64 = \"/abs/solaris.iso\"\n";

class ToolsImageSelect : public testing::Test {
 protected:
  void SetUp() override { Fresh(); }
  // Fresh starts over: process state as at start-up, an empty tools dir.
  void Fresh() {
    tvx::toolsiso::ResetSelectionState();
    tools_ = std::make_unique<TempDir>();
    ASSERT_EQ(mkdir(tools_->Join("isoimages").c_str(), 0755), 0);
    mapPath_ = tools_->Join("isoimages/isoimages_manifest.txt");
  }
  const TempDir &Dir() const { return *tools_; }
  void TearDown() override { tvx::toolsiso::ResetSelectionState(); }

  void WriteMap(Map kind) {
    if (kind == Map::kNone) return;
    std::string certDir = tvxtest::TestCertDir();
    if (certDir.empty() && kind != Map::kUnsigned) GTEST_SKIP() << "no test PKI in this build";
    std::string text = kind == Map::kMalformed ? std::string("windows9-64 \"no equals\"\n") : kMapText;
    WriteFileOrDie(mapPath_, text);
    if (kind == Map::kUnsigned) return;
    std::string sig = tvxtest::Sign(certDir, kind == Map::kStranger ? "stranger" : "maker", text, false);
    ASSERT_FALSE(sig.empty());
    WriteFileOrDie(mapPath_ + ".sig", sig);
    if (kind == Map::kTampered) WriteFileOrDie(mapPath_, text + "rhel7 = \"linux.iso\"\n");
  }

  std::unique_ptr<TempDir> tools_;
  std::string mapPath_;
};

// The choice of image: table rows, the map, the hint and the map's
// signature, each with the log lines that explain a refusal.
TEST_F(ToolsImageSelect, ChoosesFromTableMapAndHint) {
  struct Case {
    const char *what;
    Map map;
    const char *guest;
    const char *hint;
    bool requireSignature;
    const char *image;  // null: FALSE expected
    const char *base;
    uint32_t mode;
    std::vector<std::string> logs;  // "%m" stands for the canonical map path
  } cases[] = {
      {"windows row", Map::kNone, "windows9-64", nullptr, true, "windows.iso", "windows", 2, {}},
      {"first row wins for winNT", Map::kNone, "winNT", nullptr, true, "winPre2k.iso", "winPre2k", 2, {}},
      {"linux row", Map::kNone, "rhel6", nullptr, true, "linux.iso", "linux", 4, {}},
      {"hypervisor row has no image", Map::kNone, "zelcore", nullptr, true, nullptr, nullptr, 0, {}},
      {"id in no row", Map::kNone, "windows11-64", nullptr, true, nullptr, nullptr, 0, {}},
      {"unknown guest", Map::kNone, "no-such-guest", nullptr, true, nullptr, nullptr, 0, {}},
      {"hint from the table", Map::kNone, "windows9-64", "linux.iso", true, "linux.iso", "linux", 2, {}},
      {"hint no row names", Map::kNone, "rhel6", "other.iso", true, nullptr, nullptr, 0,
       {"ToolsISO: Error unexpected Tools image name: 'other.iso'\n",
        "ToolsISO: Error invalid hint 'other.iso' for Tools image.\n"}},
      {"hint with traversal", Map::kNone, "rhel6", "../linux.iso", true, nullptr, nullptr, 0,
       {"ToolsISO: Error invalid Tools image name: '../linux.iso'\n",
        "ToolsISO: Error invalid hint '../linux.iso' for Tools image.\n"}},
      {"absolute hint", Map::kNone, "rhel6", "/tmp/linux.iso", true, nullptr, nullptr, 0,
       {"ToolsISO: Error invalid Tools image name: '/tmp/linux.iso'\n"}},
      {"hint in another case", Map::kNone, "rhel6", "LINUX.ISO", true, nullptr, nullptr, 0,
       {"ToolsISO: Error invalid Tools image name: 'LINUX.ISO'\n"}},
      {"signed map", Map::kSigned, "windows9-64", nullptr, true, "win-custom.iso", "win-custom", 2, {}},
      {"map names compare without case", Map::kSigned, "RHEL6", nullptr, true, "linux_v2.iso", "linux_v2", 4, {}},
      {"guest missing from the map; table not used", Map::kSigned, "darwin10", nullptr, true,
       nullptr, nullptr, 0, {"ToolsISO: Guest 'darwin10' not found in Tools image map file '%m'\n"}},
      {"map value with traversal", Map::kSigned, "winNT", nullptr, true, nullptr, nullptr, 0,
       {"ToolsISO: Error Tools image map file '%m' contains invalid Tools image name: "
        "'../../etc/passwd.iso'\n"}},
      {"map value absolute", Map::kSigned, "solaris11-64", nullptr, true, nullptr, nullptr, 0,
       {"ToolsISO: Error Tools image map file '%m' contains invalid Tools image name: "
        "'/abs/solaris.iso'\n"}},
      {"hint the map lists", Map::kSigned, "rhel6", "win-custom.iso", true, "win-custom.iso", "win-custom", 4, {}},
      {"hint only the table lists", Map::kSigned, "rhel6", "linux.iso", true, nullptr, nullptr, 0,
       {"ToolsISO: Error unexpected Tools image name: 'linux.iso'\n"}},
      {"unsigned map refused", Map::kUnsigned, "windows9-64", nullptr, true, nullptr, nullptr, 0,
       {"ToolsISO: Unable to read signature file '%m.sig'.\n"}},
      {"unsigned map tolerated", Map::kUnsigned, "windows9-64", nullptr, false, "win-custom.iso", "win-custom", 2,
       {"ToolsISO: Unable to read signature file '%m.sig', ignoring.\n"}},
      {"tampered map", Map::kTampered, "windows9-64", nullptr, false, nullptr, nullptr, 0,
       {"ToolsISO: Error signature check failed for Tools image map '%m'.\n"}},
      {"tampered map with a hint", Map::kTampered, "rhel6", "win-custom.iso", false, nullptr, nullptr, 0,
       {"ToolsISO: Error signature check failed for Tools image map '%m'.\n",
        "ToolsISO: Error unexpected Tools image name: 'win-custom.iso'\n"}},
      {"map signed by a stranger", Map::kStranger, "windows9-64", nullptr, true, nullptr, nullptr, 0,
       {"ToolsISO: Error signature check failed for Tools image map '%m'.\n"}},
      {"signed map that does not load", Map::kMalformed, "windows9-64", nullptr, true, nullptr, nullptr, 0, {}},
  };
  for (const Case &k : cases) {
    SCOPED_TRACE(k.what);
    Fresh();
    WriteMap(k.map);
    if (IsSkipped()) return;
    LogCapture log;
    char *path = reinterpret_cast<char *>(1), *base = reinterpret_cast<char *>(1);
    uint32_t mode = 99;
    Bool ok = ToolsISO_GetImagePath(Dir().Path().c_str(), k.guest, k.hint, k.requireSignature,
                                    &path, &base, &mode);
    if (k.image == nullptr) {
      EXPECT_FALSE(ok);
      EXPECT_EQ(path, nullptr);
      EXPECT_EQ(base, nullptr);
      EXPECT_EQ(mode, 0u);
    } else {
      ASSERT_TRUE(ok) << log.All();
      EXPECT_EQ(std::string(path), Dir().Path() + "/isoimages/" + k.image);
      EXPECT_STREQ(base, k.base);
      EXPECT_EQ(mode, k.mode);
      EXPECT_TRUE(log.Contains(std::string("ToolsISO: Selected Tools ISO '") + k.image + "' for '" +
                               k.guest + "' guest.\n"))
          << log.All();
    }
    for (std::string want : k.logs) {
      size_t at = want.find("%m");
      if (at != std::string::npos) want.replace(at, 2, Real(mapPath_));
      EXPECT_TRUE(log.Contains(want)) << "missing: " << want << "\nlog:\n" << log.All();
    }
    if (k.map == Map::kMalformed) {
      EXPECT_TRUE(log.Contains("ToolsISO: Error loading dictionary from Tools image map '" +
                               Real(mapPath_) + "': "))
          << log.All();
    }
    free(path);
    free(base);
  }
}

TEST(ToolsImageName, ValidNames) {
  struct Case {
    std::string name;
    bool valid;
  } cases[] = {
      {"a.iso", true},
      {".iso", false},
      {"x.ISO", false},
      {"linux-1.2_b.iso", true},
      {std::string(251, 'a') + ".iso", true},
      {std::string(252, 'a') + ".iso", false},
      {"a b.iso", false},
      {"a/b.iso", false},
      {"..\\x.iso", false},
      {"linux.iso.sha", false},
      {"l\xc3\xa9.iso", false},
  };
  for (const Case &k : cases) EXPECT_EQ(ToolsISO_ValidateName(k.name.c_str()), k.valid) << k.name;
  EXPECT_FALSE(ToolsISO_ValidateName(nullptr));
}

TEST(ToolsImageName, BaseNamesOfTheFamilies) {
  struct Case {
    uint32_t id;
    const char *base;
  } cases[] = {{20483, "windows.iso"}, {20486, "windows.iso"}, {20513, "windows.iso"},
               {20514, nullptr},       {20595, nullptr},       {20603, "linux.iso"},
               {20632, "linux.iso"},   {20566, "solaris.iso"}, {20551, "freebsd.iso"},
               {20592, "netware.iso"}, {20589, "darwin.iso"},  {20480, nullptr},
               {20633, nullptr}};
  for (const Case &k : cases) {
    const char *got = ToolsISO_GetImageBaseName(k.id);
    EXPECT_STREQ(got, k.base) << k.id;
  }
}

// The tools directory is fixed by the first call that succeeds; trailing
// slashes are dropped, a lone "/" is kept.
TEST_F(ToolsImageSelect, FirstToolsDirectoryStays) {
  char *path = nullptr;
  ASSERT_TRUE(ToolsISO_GetImagePath((Dir().Path() + "///").c_str(), "rhel6", nullptr, TRUE, &path,
                                    nullptr, nullptr));
  EXPECT_EQ(std::string(path), Dir().Path() + "/isoimages/linux.iso");
  free(path);
  TempDir other;
  ASSERT_TRUE(ToolsISO_GetImagePath(other.Path().c_str(), "rhel6", "linux.iso", TRUE, &path,
                                    nullptr, nullptr));
  EXPECT_EQ(std::string(path), Dir().Path() + "/isoimages/linux.iso");
  free(path);

  tvx::toolsiso::ResetSelectionState();
  LogCapture log;
  EXPECT_FALSE(ToolsISO_GetImagePath(Dir().Join("missing").c_str(), "rhel6", nullptr, TRUE, &path,
                                     nullptr, nullptr));
  EXPECT_TRUE(log.Contains("ToolsISO: Tools Dir path '" + Dir().Join("missing") +
                           "' is not a directory.\n"));
  ASSERT_TRUE(ToolsISO_GetImagePath("/", "rhel6", "linux.iso", TRUE, &path, nullptr, nullptr));
  EXPECT_STREQ(path, "//isoimages/linux.iso");  // the directory is joined as it is
  free(path);
}

// While the refresh count is 1 every call reads again; after an update the
// next call refills the cache, which then answers every guest.
TEST_F(ToolsImageSelect, CacheFollowsTheRefreshCount) {
  auto choose = [&](const char *guest) {
    char *path = nullptr;
    EXPECT_TRUE(ToolsISO_GetImagePath(Dir().Path().c_str(), guest, nullptr, TRUE, &path, nullptr, nullptr));
    std::string s = path != nullptr ? path : "";
    free(path);
    return s.substr(s.rfind('/') + 1);
  };
  EXPECT_EQ(ToolsISO_GetRefreshCount(), 1u);
  EXPECT_EQ(choose("rhel6"), "linux.iso");
  LogCapture log;
  EXPECT_EQ(choose("windows9-64"), "windows.iso");
  EXPECT_TRUE(log.Contains("ToolsISO: Refreshing imageName for 'windows9-64' (refreshCount=1, "
                           "lastCount=1).\n"))
      << log.All();
  ToolsISO_UpdateRefreshCount();
  EXPECT_EQ(ToolsISO_GetRefreshCount(), 2u);
  EXPECT_EQ(choose("rhel6"), "linux.iso");
  log.Clear();
  EXPECT_EQ(choose("windows9-64"), "linux.iso");
  EXPECT_TRUE(log.Contains("ToolsISO: Using cached imageName 'linux.iso' for 'windows9-64' "
                           "(refreshCount=2, lastCount=2).\n"))
      << log.All();
  // A hint neither reads nor fills the cache.
  char *path = nullptr;
  ASSERT_TRUE(ToolsISO_GetImagePath(Dir().Path().c_str(), "rhel6", "darwin.iso", TRUE, &path, nullptr, nullptr));
  free(path);
  EXPECT_EQ(choose("windows9-64"), "linux.iso");
}

// Many threads choosing while others bump the counter: every answer is one
// a single call could give, no update is lost, and (under the sanitizers)
// no cached name is read after it was freed.
TEST_F(ToolsImageSelect, ConcurrentCallersAndRefreshes) {
  constexpr int kChoosers = 6, kCalls = 150, kUpdaters = 2, kUpdates = 60;
  const std::set<std::string> possible = {"linux.iso", "windows.iso", "darwin.iso"};
  const char *guests[] = {"rhel6", "windows9-64", "darwin10"};
  std::atomic<int> bad{0};
  std::vector<std::thread> threads;
  for (int t = 0; t < kChoosers; t++) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < kCalls; i++) {
        char *path = nullptr, *base = nullptr;
        if (!ToolsISO_GetImagePath(Dir().Path().c_str(), guests[(t + i) % 3], nullptr, TRUE, &path,
                                   &base, nullptr)) {
          bad++;
          continue;
        }
        std::string name = std::string(path).substr(Dir().Path().size() + 11);
        if (possible.count(name) == 0 || name.rfind(base, 0) != 0) bad++;
        free(path);
        free(base);
      }
    });
  }
  for (int t = 0; t < kUpdaters; t++) {
    threads.emplace_back([] {
      for (int i = 0; i < kUpdates; i++) ToolsISO_UpdateRefreshCount();
    });
  }
  for (auto &th : threads) th.join();
  EXPECT_EQ(bad.load(), 0);
  EXPECT_EQ(ToolsISO_GetRefreshCount(), 1u + kUpdaters * kUpdates);
}

TEST(ToolsImageFiles, ReadFileAndRealPath) {
  TempDir dir;
  LogCapture log;
  WriteFileOrDie(dir.Join("f"), std::string("ab\0c", 4));
  char *buf = nullptr;
  size_t size = 0;
  ASSERT_TRUE(ToolsISO_ReadFile(dir.Join("f").c_str(), &buf, &size));
  EXPECT_EQ(std::string(buf, size + 1), std::string("ab\0c\0", 5));
  free(buf);
  EXPECT_FALSE(ToolsISO_ReadFile(dir.Join("none").c_str(), &buf, &size));
  EXPECT_EQ(buf, nullptr);
  EXPECT_TRUE(log.Contains("ToolsISO: open of " + dir.Join("none") + " failed: "));
  // A sparse file above the ceiling is refused before anything is allocated.
  std::string big = dir.Join("big");
  WriteFileOrDie(big, "");
  ASSERT_EQ(truncate(big.c_str(), (256ll << 20) + 1), 0);
  EXPECT_FALSE(ToolsISO_ReadFile(big.c_str(), &buf, &size));
  EXPECT_TRUE(log.Contains("ToolsISO: getSize of " + big + " failed.\n"));

  ASSERT_EQ(symlink("f", dir.Join("link").c_str()), 0);
  char *real = ToolsISO_GetRealPath(dir.Join("link").c_str());
  EXPECT_EQ(std::string(real), Real(dir.Path()) + "/f");
  free(real);
  real = ToolsISO_GetRealPath(dir.Join("gone").c_str());
  EXPECT_EQ(std::string(real), dir.Join("gone"));
  free(real);
  EXPECT_TRUE(log.Contains("ToolsISO: Failed to get realpath for '" + dir.Join("gone") +
                           "' (error=2)\n"));
}

}  // namespace
