// Differential test: every UDF test image is listed and read by this reader
// and by 7z, and the two views must agree on names, kinds, sizes and bytes.
#include <gtest/gtest.h>

#include "support/log_capture.h"
#include "support/run_argv.h"
#include "support/udf_builder.h"
#include "support/udf_walk.h"

namespace {

// Extracts `image` with 7z into `dir` and returns the tree found there; the
// listing must say 7z read it as UDF, not through an ISO 9660 bridge.
tvxtest::UdfTree SevenZipTree(const std::string &image, const std::string &dir) {
  std::string listing;
  EXPECT_EQ(tvxtest::RunArgv({"7z", "l", "-slt", image}, &listing), 0) << image;
  EXPECT_NE(listing.find("\nType = Udf\n"), std::string::npos) << listing;
  EXPECT_EQ(tvxtest::RunArgv({"7z", "x", "-y", "-o" + dir, image}), 0) << image;
  return tvxtest::HostTree(dir);
}

}  // namespace

TEST(UdfOracle, AgreesWithSevenZip) {
  // Beside the mastered media, a built 2.50 metadata partition holding
  // files. (Scattered and chained extents are checked against the builder's
  // own tree in udf_hostile_test: 7z reports allocation extent descriptor
  // chains as an unsupported method.)
  tvxtest::TempDir built;
  tvxtest::UdfBuildOptions meta;
  meta.metadataPartition = true;
  tvxtest::UdfLayout layout;
  std::vector<uint8_t> img = tvxtest::BuildUdf(tvxtest::SampleUdfTree(100000), meta, &layout);
  tvxtest::WriteFileOrDie(built.Join("meta.img"), std::string(img.begin(), img.end()));
  const std::string images[] = {tvxtest::MediaDir() + "/udf/bridge.iso",
                                tvxtest::MediaDir() + "/udf/udf-only.iso", built.Join("meta.img")};
  for (const std::string &image : images) {
    SCOPED_TRACE(image);
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
