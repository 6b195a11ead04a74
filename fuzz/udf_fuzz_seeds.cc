// Writes small UDF images from the test builder into a directory, as seeds
// for udf_fuzzer: each layout the reader knows, in 512-byte blocks so the
// seeds stay small.
#include <cstdio>
#include <string>
#include <vector>

#include "support/udf_builder.h"

int main(int argc, char **argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: udf_fuzz_seeds OUTDIR\n");
    return 2;
  }
  tvxtest::UdfNodeSpec tree = tvxtest::SampleUdfTree(6000);
  for (int variant = 0; variant < 6; variant++) {
    tvxtest::UdfBuildOptions opt;
    opt.blockSize = 512;
    opt.metadataPartition = variant >= 3;
    opt.longAds = variant == 1;
    opt.extendedEntries = variant == 2;
    opt.embedSmallFiles = variant == 4;
    if (variant == 5) {
      opt.extentBlocks = 1;
      opt.adsPerEntry = 3;
      opt.scatterExtents = true;
    }
    tvxtest::UdfLayout layout;
    std::vector<uint8_t> img = tvxtest::BuildUdf(tree, opt, &layout);
    std::string path = std::string(argv[1]) + "/built-" + std::to_string(variant) + ".img";
    FILE *f = std::fopen(path.c_str(), "wb");
    if (f == nullptr || std::fwrite(img.data(), 1, img.size(), f) != img.size()) return 1;
    std::fclose(f);
  }
  // Crafted inputs that once made the tree walk and extraction run without
  // end or amplify data: "b" sharing its sibling's directory, and holes
  // marked allocated that claim a gigabyte of blocks each.
  tvxtest::UdfNodeSpec shared{"", true, "", {{"a", true, "", {{"f", false, "x", {}}}},
                                             {"b", true, "", {}}}};
  tvxtest::UdfNodeSpec holes{"", true, "", {{"huge", false, "tail", {}, uint64_t{20} << 30}}};
  for (int variant = 0; variant < 2; variant++) {
    tvxtest::UdfBuildOptions opt;
    opt.blockSize = 512;
    tvxtest::UdfLayout l;
    std::vector<uint8_t> img = tvxtest::BuildUdf(variant == 0 ? shared : holes, opt, &l);
    if (variant == 0) {
      size_t fid = size_t{l.dirDataSector.at("")} * l.blockSize + 80;
      tvxtest::PutLe32(&img, fid + 24, l.entrySector.at("a") - l.partitionStart);
      tvxtest::SealTag(&img, fid);
    } else {
      size_t fe = size_t{l.entrySector.at("huge")} * l.blockSize;
      for (size_t ad = fe + 176; img[ad + 3] >> 6 == 2; ad += 8) img[ad + 3] ^= 0xC0;
      tvxtest::SealTag(&img, fe);
    }
    std::string path = std::string(argv[1]) + "/crafted-" + std::to_string(variant) + ".img";
    FILE *f = std::fopen(path.c_str(), "wb");
    if (f == nullptr || std::fwrite(img.data(), 1, img.size(), f) != img.size()) return 1;
    std::fclose(f);
  }
  return 0;
}
