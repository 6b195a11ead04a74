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
#include "platform/guestos.h"
#include "support/log_capture.h"
#include "support/test_pki.h"
#include "tvx_toolsiso_image.h"

namespace {

using tvxtest::LogCapture;
using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

std::string Real(const std::string &path) {
  return tvxtest::Take(ToolsISO_GetRealPath(path.c_str()));
}

// Choose returns the chosen image path, or "" when the call fails.
std::string Choose(const std::string &dir, const char *guest, const char *hint = nullptr) {
  char *path = nullptr;
  if (!ToolsISO_GetImagePath(dir.c_str(), guest, hint, TRUE, &path, nullptr, nullptr)) return "";
  return tvxtest::Take(path);
}

enum class Map { kNone, kSigned, kUnsigned, kTampered, kMalformed };

const char *const kMapText =
    "# guest = image\n"
    "windows9-64 = \"win-custom.iso\"\n"
    "rhel6 = \"linux_v2.iso\"\n"
    "winNT = \"../../etc/passwd.iso\"\n";

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
    std::string sig = tvxtest::Sign(certDir, "maker", text, false);
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
      {"first row wins for winNT", Map::kNone, "winNT", nullptr, true, "winPre2k.iso", "winPre2k", 2, {}},
      {"hypervisor row has no image", Map::kNone, "zelcore", nullptr, true, nullptr, nullptr, 0, {}},
      {"id in no row", Map::kNone, "windows11-64", nullptr, true, nullptr, nullptr, 0, {}},
      {"hint from the table", Map::kNone, "windows9-64", "linux.iso", true, "linux.iso", "linux", 2, {}},
      {"hint no row names", Map::kNone, "rhel6", "other.iso", true, nullptr, nullptr, 0,
       {"ToolsISO: Error invalid hint 'other.iso' for Tools image.\n"}},
      {"hint with a path", Map::kNone, "rhel6", "../linux.iso", true, nullptr, nullptr, 0,
       {"ToolsISO: Error invalid Tools image name: '../linux.iso'\n"}},
      {"signed map", Map::kSigned, "windows9-64", nullptr, true, "win-custom.iso", "win-custom", 2, {}},
      {"map names compare without case", Map::kSigned, "RHEL6", nullptr, true, "linux_v2.iso", "linux_v2", 4, {}},
      {"guest missing from the map; table not used", Map::kSigned, "darwin10", nullptr, true,
       nullptr, nullptr, 0, {"ToolsISO: Guest 'darwin10' not found in Tools image map file '%m'\n"}},
      {"map value with traversal", Map::kSigned, "winNT", nullptr, true, nullptr, nullptr, 0,
       {"ToolsISO: Error Tools image map file '%m' contains invalid Tools image name: "
        "'../../etc/passwd.iso'\n"}},
      {"hint the map lists", Map::kSigned, "rhel6", "win-custom.iso", true, "win-custom.iso", "win-custom", 4, {}},
      {"hint only the table lists", Map::kSigned, "rhel6", "linux.iso", true, nullptr, nullptr, 0,
       {"ToolsISO: Error unexpected Tools image name: 'linux.iso'\n"}},
      {"unsigned map refused", Map::kUnsigned, "windows9-64", nullptr, true, nullptr, nullptr, 0,
       {"ToolsISO: Unable to read signature file '%m.sig'.\n"}},
      {"unsigned map tolerated", Map::kUnsigned, "windows9-64", nullptr, false, "win-custom.iso", "win-custom", 2,
       {"ToolsISO: Unable to read signature file '%m.sig', ignoring.\n"}},
      {"tampered map", Map::kTampered, "windows9-64", nullptr, false, nullptr, nullptr, 0,
       {"ToolsISO: Error signature check failed for Tools image map '%m'.\n"}},
      {"signed map that does not load", Map::kMalformed, "windows9-64", nullptr, true, nullptr, nullptr, 0,
       {"ToolsISO: Error loading dictionary from Tools image map '%m': "}},
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
    free(path);
    free(base);
  }
}

TEST(ToolsImageName, NamesAndFamilies) {
  for (const std::string &ok : std::vector<std::string>{"a.iso", "linux-1.2_b.iso", std::string(251, 'a') + ".iso"}) {
    EXPECT_TRUE(ToolsISO_ValidateName(ok.c_str())) << ok;
  }
  for (const std::string &bad : std::vector<std::string>{".iso", std::string(252, 'a') + ".iso", "a b.iso", "linux.iso.sha"}) {
    EXPECT_FALSE(ToolsISO_ValidateName(bad.c_str())) << bad;
  }
  // Boundaries of the table's id sets; 20595 belongs to two rows.
  EXPECT_STREQ(ToolsISO_GetImageBaseName(20632), "linux.iso");
  EXPECT_EQ(ToolsISO_GetImageBaseName(20595), nullptr);
  EXPECT_EQ(ToolsISO_GetImageBaseName(20514), nullptr);
  // An Arm guest is never offered an x86 family image.
  for (size_t i = 0; i < GuestOS_TableSize(); i++) {
    std::string name = GuestOS_GetNameByOSID(GuestOS_TableId(i));
    if (name.rfind("arm-", 0) == 0) {
      EXPECT_EQ(ToolsISO_GetImageBaseName(GuestOS_TableId(i)), nullptr) << name;
    }
  }
}

// The tools directory is fixed by the first call that succeeds; trailing
// slashes are dropped, a lone "/" is kept and joined as it is.
TEST_F(ToolsImageSelect, FirstToolsDirectoryStays) {
  EXPECT_EQ(Choose(Dir().Path() + "///", "rhel6"), Dir().Path() + "/isoimages/linux.iso");
  EXPECT_EQ(Choose(TempDir().Path(), "rhel6", "linux.iso"), Dir().Path() + "/isoimages/linux.iso");
  tvx::toolsiso::ResetSelectionState();
  LogCapture log;
  EXPECT_EQ(Choose(Dir().Join("missing"), "rhel6"), "");
  EXPECT_TRUE(log.Contains("ToolsISO: Tools Dir path '" + Dir().Join("missing") +
                           "' is not a directory.\n"));
  EXPECT_EQ(Choose("/", "rhel6", "linux.iso"), "//isoimages/linux.iso");
}

// While the refresh count is 1 every call reads again; after an update the
// next call refills the cache, which then answers every guest (a Windows
// guest is given the Linux image). A hint neither reads nor fills the cache.
TEST_F(ToolsImageSelect, CacheFollowsTheRefreshCount) {
  const std::string linux = Dir().Path() + "/isoimages/linux.iso";
  EXPECT_EQ(Choose(Dir().Path(), "rhel6"), linux);
  EXPECT_EQ(Choose(Dir().Path(), "windows9-64"), Dir().Path() + "/isoimages/windows.iso");
  ToolsISO_UpdateRefreshCount();
  EXPECT_EQ(Choose(Dir().Path(), "rhel6"), linux);
  EXPECT_EQ(Choose(Dir().Path(), "rhel6", "darwin.iso"), Dir().Path() + "/isoimages/darwin.iso");
  EXPECT_EQ(Choose(Dir().Path(), "windows9-64"), linux);
}

// Many threads choosing while others bump the counter: every answer is one
// a single call could give, no update is lost, and (under the sanitizers)
// no cached name is read after it was freed.
TEST_F(ToolsImageSelect, ConcurrentCallersAndRefreshes) {
  constexpr int kChoosers = 6, kCalls = 150, kUpdaters = 2, kUpdates = 60;
  std::set<std::string> possible;
  for (const char *n : {"linux.iso", "windows.iso", "darwin.iso"}) possible.insert(Dir().Path() + "/isoimages/" + n);
  const char *guests[] = {"rhel6", "windows9-64", "darwin10"};
  std::atomic<int> bad{0};
  std::vector<std::thread> threads;
  for (int t = 0; t < kChoosers; t++) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < kCalls; i++) bad += possible.count(Choose(Dir().Path(), guests[(t + i) % 3])) == 0;
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

TEST(ToolsImageFiles, ReadFileCeilingAndRealPathFallback) {
  TempDir dir;
  LogCapture log;
  // A sparse file above the ceiling is refused before anything is allocated.
  std::string big = dir.Join("big");
  WriteFileOrDie(big, "");
  ASSERT_EQ(truncate(big.c_str(), (256ll << 20) + 1), 0);
  char *buf = nullptr;
  size_t size = 0;
  EXPECT_FALSE(ToolsISO_ReadFile(big.c_str(), &buf, &size));
  EXPECT_EQ(buf, nullptr);
  EXPECT_TRUE(log.Contains("ToolsISO: getSize of " + big + " failed.\n"));
  EXPECT_EQ(Real(dir.Join("gone")), dir.Join("gone"));
}

}  // namespace
