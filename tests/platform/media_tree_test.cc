// The shared tree walk and extractor, through both readers' C calls, on the
// crafted images that once made them work without end, amplify data or write
// part of a tree before refusing it. Each must fail at once, as corrupt, with
// nothing written.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "support/iso_builder.h"
#include "support/log_capture.h"
#include "support/udf_builder.h"
#include "support/udf_walk.h"
#include "tvx_iso9660.h"
#include "tvx_udf.h"

namespace {

using tvxtest::IsoBuilder;
using tvxtest::IsoRecord;
constexpr uint32_t kRoot = IsoBuilder::kRoot;

Bool Count(void *ctx, const char *, Bool, uint64_t) {
  ++*static_cast<size_t *>(ctx);
  return TRUE;
}

bool Empty(const std::string &dir) {
  return !std::filesystem::exists(dir) || std::filesystem::is_empty(dir);
}

// A chain of 40 levels whose directories "A" and "B" both lead to the next
// level: 2^40 paths on a few blocks.
std::vector<uint8_t> IsoSharedLevels() {
  IsoBuilder b;
  std::vector<uint32_t> level(41);
  for (uint32_t &l : level) l = b.NewBlocks(1);
  for (int i = 39; i >= 0; --i) {
    b.Dir(level[i], level[i], {{"A", level[i + 1], 2048, 0x02, ""}, {"B", level[i + 1], 2048, 0x02, ""}});
  }
  b.Dir(level[40], level[39], {{"F;1", level[40], 4, 0, ""}});
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot, {{"TOP", level[0], 2048, 0x02, ""}}));
  return b.Bytes();
}

// One file of 100 multi-extent records, each the whole image.
std::vector<uint8_t> IsoOverlappingExtents() {
  IsoBuilder b;
  b.NewBlocks(4);
  std::vector<IsoRecord> records(100, {"BIG;1", 0, 8 * 2048, 0x80, ""});
  records.back().flags = 0;
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot, records));
  return b.Bytes();
}

// 200 files that each name the whole image: 200 times its size on extraction.
std::vector<uint8_t> IsoRepeatedData() {
  IsoBuilder b;
  b.NewBlocks(4);
  std::vector<IsoRecord> records;
  for (int i = 0; i < 200; ++i) records.push_back({"F" + std::to_string(i) + ";1", 0, 24 * 2048, 0, ""});
  uint32_t dir = b.NewBlocks(4);
  b.Dir(dir, kRoot, records);
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot, {{"D", dir, 4 * 2048, 0x02, ""}}));
  return b.Bytes();
}

std::vector<uint8_t> IsoDuplicateNames() {
  IsoBuilder b;
  uint32_t data = b.NewBlocks(1);
  b.PutBlock(data, "one");
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot, {{"A;1", data, 3, 0, ""}, {"DUP;1", data, 3, 0, ""},
                                        {"DUP;1", data, 3, 0, ""}}));
  return b.Bytes();
}

TEST(MediaTree, CraftedIsoImagesAreRefusedBeforeWriting) {
  const struct {
    const char *name;
    std::vector<uint8_t> (*build)();
    int listRc, extractRc;
    const char *log;
  } cases[] = {
      {"shared directories", IsoSharedLevels, ISO9660_ERR_CORRUPT, ISO9660_ERR_CORRUPT,
       "/A/B\" is reached twice\n"},
      {"overlapping extents", IsoOverlappingExtents, ISO9660_OK, ISO9660_ERR_CORRUPT,
       "Iso9660: extents of \"BIG\" overlap\n"},
      {"data repeated past the image", IsoRepeatedData, ISO9660_OK, ISO9660_ERR_CORRUPT,
       "Iso9660: the files' data adds up to more than the image holds\n"},
      {"duplicate names", IsoDuplicateNames, ISO9660_OK, ISO9660_ERR_CORRUPT,
       "Iso9660: the name \"DUP\" appears twice in one directory\n"},
  };
  for (const auto &c : cases) {
    SCOPED_TRACE(c.name);
    std::vector<uint8_t> bytes = c.build();
    Iso9660Image *image = nullptr;
    ASSERT_EQ(tvxtest::OpenMemoryImage(bytes, 0, &image), ISO9660_OK);
    tvxtest::LogCapture log;
    size_t entries = 0;
    EXPECT_EQ(Iso9660_ListTree(image, "/", TRUE, Count, &entries), c.listRc);
    EXPECT_LT(entries, 1000u);
    tvxtest::TempDir tmp;
    EXPECT_EQ(Iso9660_Extract(image, "/", tmp.Join("out").c_str()), c.extractRc);
    EXPECT_TRUE(log.Contains(c.log)) << log.All();
    EXPECT_TRUE(Empty(tmp.Join("out")));
    Iso9660_Close(image);
  }
}

struct UdfCase {
  const char *name;
  tvxtest::UdfNodeSpec tree;
  std::function<void(std::vector<uint8_t> *, const tvxtest::UdfLayout &)> patch;
  int listRc, extractRc;
};

TEST(MediaTree, CraftedUdfImagesAreRefusedBeforeWriting) {
  using tvxtest::UdfNodeSpec;
  UdfNodeSpec twoDirs{"", true, "", {{"a", true, "", {{"f", false, "data", {}}}},
                                     {"b", true, "", {}}}};
  UdfNodeSpec sparse{"", true, "", {{"huge", false, "tail", {}, uint64_t{200} << 30}}};
  UdfNodeSpec dups{"", true, "", {{"x", false, "1", {}}, {"y", false, "2", {}}}};
  const UdfCase cases[] = {
      // "b" points at the directory entry of its sibling "a".
      {"shared directory", twoDirs,
       [](std::vector<uint8_t> *img, const tvxtest::UdfLayout &l) {
         size_t fid = size_t{l.dirDataSector.at("")} * l.blockSize + 80;
         tvxtest::PutLe32(img, fid + 24, l.entrySector.at("a") - l.partitionStart);
         tvxtest::SealTag(img, fid);
       },
       UDF_TREE_ERR_CORRUPT, UDF_TREE_ERR_CORRUPT},
      // Holes marked allocated claim a gigabyte of blocks each.
      {"allocated extents beyond the partition", sparse,
       [](std::vector<uint8_t> *img, const tvxtest::UdfLayout &l) {
         size_t fe = size_t{l.entrySector.at("huge")} * l.blockSize;
         for (size_t ad = fe + 176; (*img)[ad + 3] >> 6 == 2; ad += 8) (*img)[ad + 3] ^= 0xC0;
         tvxtest::SealTag(img, fe);
       },
       UDF_TREE_ERR_CORRUPT, UDF_TREE_ERR_CORRUPT},
      {"duplicate names", dups,
       [](std::vector<uint8_t> *img, const tvxtest::UdfLayout &l) {
         size_t fid = size_t{l.dirDataSector.at("")} * l.blockSize + 80;
         (*img)[fid + 39] = 'x';
         tvxtest::SealTag(img, fid);
       },
       UDF_TREE_OK, UDF_TREE_ERR_CORRUPT},
  };
  for (const UdfCase &c : cases) {
    SCOPED_TRACE(c.name);
    tvxtest::UdfLayout layout;
    std::vector<uint8_t> img = tvxtest::BuildUdf(c.tree, {}, &layout);
    c.patch(&img, layout);
    UDFVolume *vol = tvxtest::OpenUdfBytes(img);
    ASSERT_NE(vol, nullptr);
    tvxtest::LogCapture log;
    size_t entries = 0;
    EXPECT_EQ(UDF_ListTree(vol, "", TRUE, Count, &entries), c.listRc);
    tvxtest::TempDir tmp;
    EXPECT_EQ(UDF_Extract(vol, "", tmp.Join("out").c_str()), c.extractRc);
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
