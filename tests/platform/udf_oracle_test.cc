// Differential test: every UDF test image is listed and read by this reader
// and by 7z, and the two views must agree on names, kinds, sizes and bytes.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>

#include "support/log_capture.h"
#include "support/udf_walk.h"

namespace fs = std::filesystem;

namespace {

bool HaveSevenZip() { return std::system("command -v 7z >/dev/null 2>&1") == 0; }

// Extracts `image` with 7z into `dir` and returns the tree found there; the
// listing must say 7z read it as UDF, not through an ISO 9660 bridge.
tvxtest::UdfTree SevenZipTree(const std::string &image, const std::string &dir) {
  std::string cmd = "7z l -slt '" + image + "' | grep -qx 'Type = Udf' && 7z x -y -o'" + dir +
                    "' '" + image + "' >/dev/null";
  EXPECT_EQ(std::system(cmd.c_str()), 0) << cmd;
  tvxtest::UdfTree tree;
  for (const auto &e : fs::recursive_directory_iterator(dir)) {
    std::string rel = fs::relative(e.path(), dir).string();
    if (e.is_directory()) {
      tree.dirs[rel] = true;
    } else {
      tree.files[rel] = tvxtest::ReadFileOrDie(e.path().string());
    }
  }
  return tree;
}

}  // namespace

TEST(UdfOracle, AgreesWithSevenZip) {
  if (!HaveSevenZip()) GTEST_SKIP() << "7z is not installed";
  for (const char *name : {"bridge.iso", "udf-only.iso"}) {
    SCOPED_TRACE(name);
    std::string image = tvxtest::MediaDir() + "/udf/" + name;
    bool opened = false;
    tvxtest::UdfTree ours = tvxtest::WalkUdfImage(image, &opened);
    ASSERT_TRUE(opened);
    EXPECT_EQ(ours.failures, 0);
    tvxtest::TempDir tmp;
    tvxtest::UdfTree theirs = SevenZipTree(image, tmp.Path());
    EXPECT_EQ(ours.dirs, theirs.dirs);
    ASSERT_EQ(ours.files.size(), theirs.files.size());
    for (const auto &[path, bytes] : theirs.files) {
      auto it = ours.files.find(path);
      ASSERT_NE(it, ours.files.end()) << path;
      EXPECT_EQ(it->second.size(), bytes.size()) << path;
      EXPECT_TRUE(it->second == bytes) << path << ": contents differ";
    }
  }
}
