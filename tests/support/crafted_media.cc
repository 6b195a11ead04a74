#include "support/crafted_media.h"

#include <functional>

#include "support/iso_builder.h"

namespace tvxtest {

namespace {

constexpr uint32_t kRoot = IsoBuilder::kRoot;

std::vector<uint8_t> IsoSharedLevels() {
  IsoBuilder b;
  std::vector<uint32_t> level(41);
  for (uint32_t &l : level) l = b.NewBlocks(1);
  for (int i = 39; i >= 0; --i) {
    b.Dir(level[i], level[i],
          {{"A", level[i + 1], 2048, 0x02, ""}, {"B", level[i + 1], 2048, 0x02, ""}});
  }
  b.Dir(level[40], level[39], {{"F;1", level[40], 4, 0, ""}});
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot, {{"TOP", level[0], 2048, 0x02, ""}}));
  return b.Bytes();
}

std::vector<uint8_t> IsoOverlappingExtents() {
  IsoBuilder b;
  b.NewBlocks(4);
  std::vector<IsoRecord> records(100, {"BIG;1", 0, 8 * 2048, 0x80, ""});
  records.back().flags = 0;
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot, records));
  return b.Bytes();
}

std::vector<uint8_t> IsoRepeatedData() {
  IsoBuilder b;
  b.NewBlocks(4);
  std::vector<IsoRecord> records;
  for (int i = 0; i < 200; ++i) {
    records.push_back({"F" + std::to_string(i) + ";1", 0, 24 * 2048, 0, ""});
  }
  uint32_t dir = b.NewBlocks(4);
  b.Dir(dir, kRoot, records);
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot, {{"D", dir, 4 * 2048, 0x02, ""}}));
  return b.Bytes();
}

std::vector<uint8_t> IsoDuplicateNames() {
  IsoBuilder b;
  uint32_t data = b.NewBlocks(1);
  b.PutBlock(data, "one");
  b.SetRoot(kRoot,
            b.Dir(kRoot, kRoot,
                  {{"A;1", data, 3, 0, ""}, {"DUP;1", data, 3, 0, ""}, {"DUP;1", data, 3, 0, ""}}));
  return b.Bytes();
}

// The root's second identifier descriptor, the one after "." (48 bytes with
// its name) and ".." (40).
size_t SecondRootFid(const UdfLayout &l) {
  return size_t{l.dirDataSector.at("")} * l.blockSize + 80;
}

}  // namespace

std::vector<CraftedImage> CraftedIsoImages() {
  return {{"shared directories", IsoSharedLevels()},
          {"overlapping extents", IsoOverlappingExtents()},
          {"data repeated past the image", IsoRepeatedData()},
          {"duplicate names", IsoDuplicateNames()}};
}

std::vector<CraftedImage> CraftedUdfImages(const UdfBuildOptions &opt) {
  using Patch = std::function<void(std::vector<uint8_t> *, const UdfLayout &)>;
  const struct {
    const char *name;
    UdfNodeSpec tree;
    Patch patch;
  } shapes[] = {
      {"shared directory",
       {"", true, "", {{"a", true, "", {{"f", false, "data", {}}}}, {"b", true, "", {}}}},
       [](std::vector<uint8_t> *img, const UdfLayout &l) {
         PutLe32(img, SecondRootFid(l) + 24, l.entrySector.at("a") - l.partitionStart);
         SealTag(img, SecondRootFid(l));
       }},
      {"allocated extents beyond the partition",
       {"", true, "", {{"huge", false, "tail", {}, uint64_t{20} << 30}}},
       [](std::vector<uint8_t> *img, const UdfLayout &l) {
         size_t fe = size_t{l.entrySector.at("huge")} * l.blockSize;
         for (size_t ad = fe + 176; (*img)[ad + 3] >> 6 == 2; ad += 8) (*img)[ad + 3] ^= 0xC0;
         SealTag(img, fe);
       }},
      {"duplicate names",
       {"", true, "", {{"x", false, "1", {}}, {"y", false, "2", {}}}},
       [](std::vector<uint8_t> *img, const UdfLayout &l) {
         (*img)[SecondRootFid(l) + 39] = 'x';
         SealTag(img, SecondRootFid(l));
       }},
  };
  std::vector<CraftedImage> out;
  for (const auto &s : shapes) {
    UdfLayout layout;
    std::vector<uint8_t> img = BuildUdf(s.tree, opt, &layout);
    s.patch(&img, layout);
    out.push_back({s.name, std::move(img)});
  }
  return out;
}

}  // namespace tvxtest
