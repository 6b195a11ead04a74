// The shared tree walk and extractor, through both readers' C calls, on the
// crafted images that once made them work without end, amplify data or write
// part of a tree before refusing it. Each must fail at once, as corrupt, with
// nothing written.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <string>
#include <vector>

#include "support/crafted_media.h"
#include "support/iso_builder.h"
#include "support/log_capture.h"
#include "support/udf_builder.h"
#include "support/udf_walk.h"
#include "tvx_iso9660.h"
#include "tvx_udf.h"

namespace {

Bool Count(void *ctx, const char *, Bool, uint64_t) {
  ++*static_cast<size_t *>(ctx);
  return TRUE;
}

bool Empty(const std::string &dir) {
  return !std::filesystem::exists(dir) || std::filesystem::is_empty(dir);
}

TEST(MediaTree, CraftedIsoImagesAreRefusedBeforeWriting) {
  const struct {
    int listRc, extractRc;
    const char *log;
  } expected[] = {
      {ISO9660_ERR_CORRUPT, ISO9660_ERR_CORRUPT, "/A/B\" is reached twice\n"},
      {ISO9660_OK, ISO9660_ERR_CORRUPT, "Iso9660: extents of \"BIG\" overlap\n"},
      {ISO9660_OK, ISO9660_ERR_CORRUPT,
       "Iso9660: the files' data adds up to more than the image holds\n"},
      {ISO9660_OK, ISO9660_ERR_CORRUPT,
       "Iso9660: the name \"DUP\" appears twice in one directory\n"},
  };
  std::vector<tvxtest::CraftedImage> images = tvxtest::CraftedIsoImages();
  ASSERT_EQ(images.size(), std::size(expected));
  for (size_t i = 0; i < images.size(); ++i) {
    SCOPED_TRACE(images[i].name);
    Iso9660Image *image = nullptr;
    ASSERT_EQ(tvxtest::OpenMemoryImage(images[i].bytes, 0, &image), ISO9660_OK);
    tvxtest::LogCapture log;
    size_t entries = 0;
    EXPECT_EQ(Iso9660_ListTree(image, "/", TRUE, Count, &entries), expected[i].listRc);
    EXPECT_LT(entries, 1000u);
    tvxtest::TempDir tmp;
    EXPECT_EQ(Iso9660_Extract(image, "/", tmp.Join("out").c_str()), expected[i].extractRc);
    EXPECT_TRUE(log.Contains(expected[i].log)) << log.All();
    EXPECT_TRUE(Empty(tmp.Join("out")));
    Iso9660_Close(image);
  }
}

TEST(MediaTree, CraftedUdfImagesAreRefusedBeforeWriting) {
  const struct {
    int listRc, extractRc;
  } expected[] = {
      {UDF_TREE_ERR_CORRUPT, UDF_TREE_ERR_CORRUPT},
      {UDF_TREE_ERR_CORRUPT, UDF_TREE_ERR_CORRUPT},
      {UDF_TREE_OK, UDF_TREE_ERR_CORRUPT},
  };
  std::vector<tvxtest::CraftedImage> images = tvxtest::CraftedUdfImages({});
  ASSERT_EQ(images.size(), std::size(expected));
  for (size_t i = 0; i < images.size(); ++i) {
    SCOPED_TRACE(images[i].name);
    UDFVolume *vol = tvxtest::OpenUdfBytes(images[i].bytes);
    ASSERT_NE(vol, nullptr);
    tvxtest::LogCapture log;
    size_t entries = 0;
    EXPECT_EQ(UDF_ListTree(vol, "", TRUE, Count, &entries), expected[i].listRc);
    tvxtest::TempDir tmp;
    EXPECT_EQ(UDF_Extract(vol, "", tmp.Join("out").c_str()), expected[i].extractRc);
    EXPECT_TRUE(Empty(tmp.Join("out")));
    UDF_Close(vol);
  }
}

TEST(MediaTree, HolesBecomeSparseOutput) {
  tvxtest::UdfNodeSpec root{"", true, "", {{"huge", false, "tail", {}, uint64_t{5} << 30}}};
  tvxtest::UdfLayout layout;
  std::vector<uint8_t> img = tvxtest::BuildUdf(root, {}, &layout);
  UDFVolume *vol = tvxtest::OpenUdfBytes(img);
  ASSERT_NE(vol, nullptr);
  tvxtest::TempDir tmp;
  ASSERT_EQ(UDF_Extract(vol, "huge", tmp.Path().c_str()), UDF_TREE_OK);
  struct stat st;
  ASSERT_EQ(stat(tmp.Join("huge").c_str(), &st), 0);
  EXPECT_EQ(static_cast<uint64_t>(st.st_size), (uint64_t{5} << 30) + 4);
  EXPECT_LT(static_cast<uint64_t>(st.st_blocks) * 512, uint64_t{1} << 20);
  UDF_Close(vol);
}

}  // namespace
