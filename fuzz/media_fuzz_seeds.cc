// Writes the seed images of iso9660_fuzzer and udf_fuzzer into OUTDIR/iso9660
// and OUTDIR/udf: the crafted images of the media tests, and for UDF each
// layout the reader knows, compact (512-byte blocks, everything before the
// anchor at block 256, which ends the image) so a seed stays under 100 KiB.
// The first 32 KiB of each image is left out: the targets supply that system
// area themselves.
#include <sys/stat.h>

#include <cstdio>
#include <string>
#include <vector>

#include "fuzz/media_tree_harness.h"
#include "support/crafted_media.h"
#include "support/udf_builder.h"

namespace {

bool Write(const std::string &path, const std::vector<uint8_t> &img) {
  if (img.size() <= tvxfuzz::kSystemArea) return false;
  FILE *f = std::fopen(path.c_str(), "wb");
  if (f == nullptr) return false;
  size_t n = img.size() - tvxfuzz::kSystemArea;
  bool ok = std::fwrite(img.data() + tvxfuzz::kSystemArea, 1, n, f) == n;
  return std::fclose(f) == 0 && ok;
}

std::string FileName(std::string name) {
  for (char &c : name) {
    if (c == ' ') c = '-';
  }
  return name;
}

}  // namespace

int main(int argc, char **argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: media_fuzz_seeds OUTDIR\n");
    return 2;
  }
  std::string iso = std::string(argv[1]) + "/iso9660", udf = std::string(argv[1]) + "/udf";
  mkdir(argv[1], 0755);
  mkdir(iso.c_str(), 0755);
  mkdir(udf.c_str(), 0755);
  bool ok = true;
  for (const auto &c : tvxtest::CraftedIsoImages()) {
    ok = Write(iso + "/crafted-" + FileName(c.name) + ".iso", c.bytes) && ok;
  }
  tvxtest::UdfBuildOptions compact;
  compact.blockSize = 512;
  compact.compact = true;
  for (const auto &c : tvxtest::CraftedUdfImages(compact)) {
    ok = Write(udf + "/crafted-" + FileName(c.name) + ".img", c.bytes) && ok;
  }
  tvxtest::UdfNodeSpec tree = tvxtest::SampleUdfTree(3000);
  for (int variant = 0; variant < 6; variant++) {
    tvxtest::UdfBuildOptions opt = compact;
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
    ok = Write(udf + "/built-" + std::to_string(variant) + ".img",
               tvxtest::BuildUdf(tree, opt, &layout)) &&
         ok;
  }
  if (!ok) std::fprintf(stderr, "media_fuzz_seeds: cannot write the seeds into %s\n", argv[1]);
  return ok ? 0 : 1;
}
