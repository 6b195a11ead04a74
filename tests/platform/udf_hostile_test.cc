// The UDF reader on images built in memory: every layout it must read, and
// hostile images that must fail cleanly (never a crash, hang, leak or wrong
// bytes). Images go through UDF_OpenWithReader, as a caller's callbacks would
// deliver them.
#include <gtest/gtest.h>

#include <filesystem>
#include <functional>

#include "support/log_capture.h"
#include "support/udf_builder.h"
#include "support/udf_walk.h"
#include "tvx_udf.h"

using tvxtest::UdfBuildOptions;
using tvxtest::UdfLayout;
using tvxtest::UdfNodeSpec;

namespace {

using tvxtest::OpenUdfBytes;

// The tree a reader must find below `n`, from what the builder was asked to write.
tvxtest::UdfTree Expected(const UdfNodeSpec &n, const std::string &path = "", tvxtest::UdfTree t = {}) {
  for (const UdfNodeSpec &c : n.children) {
    std::string p = path.empty() ? c.name : path + "/" + c.name;
    if (c.dir) {
      t.dirs[p] = true;
      t = Expected(c, p, std::move(t));
    } else {
      t.files[p] = c.data;
    }
  }
  return t;
}

// Walks `img` (when it opens) and checks that whatever was read is right:
// damage may hide entries or fail reads, never change bytes.
int WalkNeverLies(const std::vector<uint8_t> &img, const tvxtest::UdfTree &want, bool *opened) {
  int failures = -1;
  int closes = 0;
  UDFVolume *vol = OpenUdfBytes(img, &closes);
  *opened = vol != nullptr;
  if (vol != nullptr) {
    tvxtest::UdfTree got = tvxtest::WalkUdf(vol);
    failures = got.failures + static_cast<int>(want.files.size() - got.files.size());
    for (const auto &[path, bytes] : got.files) {
      auto it = want.files.find(path);
      EXPECT_NE(it, want.files.end()) << "invented " << path;
      if (it == want.files.end()) continue;
      if (bytes.size() == it->second.size()) {
        EXPECT_TRUE(bytes == it->second) << path << " read wrong bytes";
      }
    }
    UDF_Close(vol);
  }
  EXPECT_EQ(closes, 1);
  return failures;
}

bool IsDescriptor(const uint8_t *tag) {
  uint8_t sum = 0;
  for (int i = 0; i < 16; i++) {
    if (i != 4) sum = static_cast<uint8_t>(sum + tag[i]);
  }
  unsigned id = tag[0] | (tag[1] << 8);
  return sum == tag[4] && ((id >= 1 && id <= 9) || (id >= 256 && id <= 266));
}

size_t At(const UdfLayout &l, uint32_t sector, size_t off = 0) {
  return size_t{sector} * l.blockSize + off;
}

// Sets a 32-bit field of the descriptor at byte `tag` and reseals it.
void Patch32(std::vector<uint8_t> *img, size_t tag, size_t off, uint32_t value) {
  tvxtest::PutLe32(img, tag + off, value);
  tvxtest::SealTag(img, tag);
}

// Sets a 32-bit field of a descriptor in both volume descriptor sequences,
// so that the reserve copy cannot stand in.
void PatchBothSequences(std::vector<uint8_t> *img, const UdfLayout &l, uint32_t sector,
                        size_t off, uint32_t value) {
  for (uint32_t s : {sector, sector + 16}) Patch32(img, At(l, s), off, value);
}

}  // namespace

TEST(UdfBuilt, ReadsEveryLayout) {
  const UdfNodeSpec tree = tvxtest::SampleUdfTree(50000);
  const tvxtest::UdfTree want = Expected(tree);
  const struct {
    const char *name;
    UdfBuildOptions opt;
  } cases[] = {
      {"1.02 short_ad", {}},
      {"extended entries", {.extendedEntries = true}},
      {"embedded data", {.metadataPartition = true, .embedSmallFiles = true}},
      {"allocation extent chains",
       {.metadataPartition = true, .extentBlocks = 1, .scatterExtents = true, .adsPerEntry = 4}},
      {"512-byte blocks", {.blockSize = 512, .extentBlocks = 7}},
      {"4096-byte blocks", {.blockSize = 4096, .longAds = true}},
  };
  for (const auto &c : cases) {
    SCOPED_TRACE(c.name);
    UdfLayout layout;
    std::vector<uint8_t> img = tvxtest::BuildUdf(tree, c.opt, &layout);
    int closes = 0;
    UDFVolume *vol = OpenUdfBytes(img, &closes);
    ASSERT_NE(vol, nullptr);
    char *id = UDF_GetVolumeId(vol);
    EXPECT_STREQ(id, "TVXBUILT");
    free(id);
    tvxtest::UdfTree got = tvxtest::WalkUdf(vol);
    EXPECT_EQ(got.failures, 0);
    EXPECT_EQ(got.dirs, want.dirs);
    EXPECT_TRUE(got.files == want.files);
    UDF_Close(vol);
    EXPECT_EQ(closes, 1);
  }
}

TEST(UdfHostile, MalformedStructuresFailCleanly) {
  struct Case {
    const char *name;
    UdfBuildOptions opt;
    std::function<void(std::vector<uint8_t> *, const UdfLayout &)> damage;
    int opens;        // 0: fails to open; 1: opens, some entries fail; 2: reads whole
    const char *log;  // a line the reader must log, or ""
  };
  auto flipChecksum = [](std::vector<uint8_t> *img, size_t off) { (*img)[off + 4] ^= 0x55; };
  const Case cases[] = {
      {"both anchors broken", {},
       [&](auto *img, const UdfLayout &l) {
         flipChecksum(img, At(l, 256));
         flipChecksum(img, img->size() - l.blockSize);
       },
       0, ""},
      {"main sequence broken, reserve used", {},
       [&](auto *img, const UdfLayout &l) { flipChecksum(img, At(l, l.lvdSector)); }, 2, ""},
      {"both sequences broken", {},
       [&](auto *img, const UdfLayout &l) {
         flipChecksum(img, At(l, l.lvdSector));
         flipChecksum(img, At(l, l.lvdSector + 16));
       },
       0, "UDF: no usable volume descriptor sequence (corrupt structure)\n"},
      {"logical block size lies", {},
       [](auto *img, const UdfLayout &l) { PatchBothSequences(img, l, l.lvdSector, 212, 4096); },
       0, "UDF: logical block size 4096 differs from the sector size 2048\n"},
      {"partition starts past the end", {},
       [](auto *img, const UdfLayout &l) { PatchBothSequences(img, l, l.pdSector, 188, 0x100000); },
       // Callbacks cannot tell the image size, so this shows at the first read.
       0, "UDF: cannot read the file set descriptor (read error)\n"},
      {"partition too short for the root", {},
       [](auto *img, const UdfLayout &l) { PatchBothSequences(img, l, l.pdSector, 192, 2); },
       0, "UDF: cannot read the root directory (corrupt structure)\n"},
      {"partition map table longer than its descriptor", {},
       [](auto *img, const UdfLayout &l) {
         PatchBothSequences(img, l, l.lvdSector, 264, 0xFFFFFF00);
       },
       0, "UDF: partition map table of 4294967040 bytes does not fit its descriptor\n"},
      {"file set descriptor missing", {},
       [&](auto *img, const UdfLayout &l) { flipChecksum(img, At(l, l.fsdSector)); }, 0,
       "UDF: cannot read the file set descriptor (corrupt structure)\n"},
      {"root entry is an indirect entry to itself", {},
       [&](auto *img, const UdfLayout &l) {
         size_t fe = At(l, l.entrySector.at(""));
         tvxtest::PutLe16(img, fe, 259);
         tvxtest::PutLe32(img, fe + 36, l.blockSize);
         tvxtest::PutLe32(img, fe + 40, l.entrySector.at("") - l.partitionStart);
         tvxtest::PutLe16(img, fe + 44, 0);
         tvxtest::SealTag(img, fe);
       },
       0, "UDF: cannot read the root directory (loop)\n"},
      {"metadata file broken, mirror used",
       {.metadataPartition = true},
       [&](auto *img, const UdfLayout &l) { flipChecksum(img, At(l, l.metadataFileSector)); },
       2, ""},
      {"metadata file and mirror broken",
       {.metadataPartition = true},
       [&](auto *img, const UdfLayout &l) {
         flipChecksum(img, At(l, l.metadataFileSector));
         flipChecksum(img, At(l, l.metadataFileSector + 1));
       },
       0, "UDF: cannot read the metadata file of partition 0 (corrupt structure)\n"},
      {"file extent past the end of the image", {},
       [](auto *img, const UdfLayout &l) {
         Patch32(img, At(l, l.entrySector.at("big.bin")), 176 + 4, 0x7FFFFFF0);
       },
       1, ""},
      {"size beyond the allocation descriptors", {},
       [](auto *img, const UdfLayout &l) {  // 4 GiB more than recorded
         Patch32(img, At(l, l.entrySector.at("big.bin")), 60, 1);
       },
       1, ""},
      {"embedded data longer than its entry",
       {.embedSmallFiles = true},
       [](auto *img, const UdfLayout &l) {
         Patch32(img, At(l, l.entrySector.at("README.TXT")), 56, 4000);
       },
       1, ""},
      {"allocation extent chain loops",
       {.extentBlocks = 1, .adsPerEntry = 3},
       [&](auto *img, const UdfLayout &l) {
         // The first AED's continuation (its third descriptor) points back
         // at itself.
         uint32_t aed = l.aedSectors.at("big.bin").at(0);
         Patch32(img, At(l, aed), 24 + 2 * 8 + 4, aed - l.partitionStart);
       },
       1, ""},
      {"file identifier lengths past the directory", {},
       [&](auto *img, const UdfLayout &l) {
         size_t fid = At(l, l.dirDataSector.at(""), 40);
         tvxtest::PutLe16(img, fid + 36, 0xFFFF);
         tvxtest::SealTag(img, fid);
       },
       1, "UDF: file identifier descriptor at offset 40 of a directory is cut short\n"},
  };
  const UdfNodeSpec tree = tvxtest::SampleUdfTree(20000);
  const tvxtest::UdfTree want = Expected(tree);
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    UdfLayout layout;
    std::vector<uint8_t> img = tvxtest::BuildUdf(tree, c.opt, &layout);
    c.damage(&img, layout);
    tvxtest::LogCapture log;
    bool opened = false;
    int failures = WalkNeverLies(img, want, &opened);
    EXPECT_EQ(opened, c.opens != 0);
    if (opened) {
      EXPECT_EQ(failures == 0, c.opens == 2) << failures << " entries failed";
    }
    if (*c.log != '\0') {
      EXPECT_TRUE(log.Contains(c.log)) << log.All();
    }
  }
}

TEST(UdfHostile, NamesThatLeaveTheTreeAreHidden) {
  UdfNodeSpec root{"", true, "", {}};
  for (const char *bad : {"..", ".", "a/b", "../escape", ""}) {
    root.children.push_back({bad, false, "x", {}});
  }
  root.children.push_back({"good", false, "ok", {}});
  UdfLayout layout;
  std::vector<uint8_t> img = tvxtest::BuildUdf(root, {}, &layout);
  tvxtest::LogCapture log;
  int closes = 0;
  UDFVolume *vol = OpenUdfBytes(img, &closes);
  ASSERT_NE(vol, nullptr);
  tvxtest::UdfTree got = tvxtest::WalkUdf(vol);
  EXPECT_EQ(got.files.size(), 1u);
  EXPECT_EQ(got.files["good"], "ok");
  for (const char *path : {"..", "a/b", "../escape", "a"}) {
    EXPECT_EQ(UDF_OpenFile(vol, nullptr, path), nullptr) << path;
  }
  // Extraction refuses the tree rather than leave entries out unseen.
  tvxtest::TempDir tmp;
  EXPECT_EQ(UDF_Extract(vol, "", tmp.Join("out").c_str()), UDF_TREE_ERR_UNSAFE);
  EXPECT_FALSE(std::filesystem::exists(tmp.Join("out/good")));
  UDF_Close(vol);
}

TEST(UdfHostile, DirectoryLoopAndDeepNestingAreBounded) {
  // "loop" is recorded as a directory whose entry is the root's own.
  UdfNodeSpec root{"", true, "", {{"loop", true, "", {}}}};
  UdfLayout layout;
  std::vector<uint8_t> img = tvxtest::BuildUdf(root, {}, &layout);
  Patch32(&img, At(layout, layout.dirDataSector.at(""), 40), 24,
          layout.entrySector.at("") - layout.partitionStart);
  tvxtest::LogCapture log;
  int closes = 0;
  UDFVolume *vol = OpenUdfBytes(img, &closes);
  ASSERT_NE(vol, nullptr);
  EXPECT_EQ(UDF_OpenDir(vol, nullptr, "loop"), nullptr);
  EXPECT_TRUE(log.Contains("UDF: directory structure contains a loop\n"));
  UDF_Close(vol);

  UdfNodeSpec deep{"", true, "", {}};
  UdfNodeSpec *at = &deep;
  std::string path;
  for (int i = 0; i < 300; i++) {
    at->children.push_back({"d", true, "", {}});
    at = &at->children.back();
    path += path.empty() ? "d" : "/d";
  }
  img = tvxtest::BuildUdf(deep, {}, &layout);
  vol = OpenUdfBytes(img, &closes);
  ASSERT_NE(vol, nullptr);
  UDFDir *ok = UDF_OpenDir(vol, nullptr, path.substr(0, 2 * 200 - 1).c_str());
  EXPECT_NE(ok, nullptr);
  UDF_CloseDir(ok);
  EXPECT_EQ(UDF_OpenDir(vol, nullptr, path.c_str()), nullptr);
  EXPECT_TRUE(log.Contains("UDF: directories nest deeper than 256 levels\n"));
  UDF_Close(vol);
  EXPECT_EQ(closes, 2);
}

TEST(UdfHostile, EveryTruncationAndEveryBrokenTag) {
  UdfBuildOptions opt;
  opt.metadataPartition = true;
  opt.extentBlocks = 2;
  opt.adsPerEntry = 3;
  const UdfNodeSpec tree = tvxtest::SampleUdfTree(12000);
  const tvxtest::UdfTree want = Expected(tree);
  UdfLayout layout;
  const std::vector<uint8_t> img = tvxtest::BuildUdf(tree, opt, &layout);
  const size_t sectors = img.size() / layout.blockSize;
  for (size_t s = 0; s < sectors; s++) {
    SCOPED_TRACE(s);
    std::vector<uint8_t> cut(img.begin(), img.begin() + static_cast<long>(s * layout.blockSize));
    bool opened;
    WalkNeverLies(cut, want, &opened);
    // File data has no checksum to catch a flipped byte: only descriptors
    // are broken.
    if (!IsDescriptor(&img[s * layout.blockSize])) continue;
    std::vector<uint8_t> broken = img;
    broken[s * layout.blockSize + 4] ^= 0xFF;
    WalkNeverLies(broken, want, &opened);
  }
}

