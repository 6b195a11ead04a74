// Builds small UDF images in memory for tests and fuzz seeds: plain UDF 1.02
// volumes and UDF 2.50 volumes whose directories and file entries live in a
// metadata partition (no packaged tool writes files into one without
// mounting it). The layout it reports lets hostile-image tests break one
// structure at a time and re-seal its tag.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

namespace tvxtest {

struct UdfNodeSpec {
  std::string name;  // UTF-8; written as 8-bit CS0 when every character fits
  bool dir = false;
  std::string data;  // files
  std::vector<UdfNodeSpec> children;  // directories
  // Files: unrecorded bytes (read as zeros) before `data`, a multiple of the
  // block size; lets tests pass 4 GiB without storing it.
  uint64_t sparseBytes = 0;
};

struct UdfBuildOptions {
  uint32_t blockSize = 2048;
  bool metadataPartition = false;  // UDF 2.50 layout (implies extended entries)
  bool extendedEntries = false;    // Extended File Entries on a plain volume
  bool longAds = false;            // long_ad instead of short_ad where both fit
  bool embedSmallFiles = false;    // data inside the entry when it fits
  uint32_t extentBlocks = 0;       // split file data into extents of N blocks
  bool scatterExtents = false;     // leave a junk block between extents
  uint32_t adsPerEntry = 0;        // >0: continue longer lists in AED blocks
  std::string volumeId = "TVXBUILT";
  bool compact = false;  // structures before sector 256, the image ends with its anchor
};

// Where the builder put things. Sectors are absolute (byte offset / block
// size); "lbn" values are relative to the partition the structure lives in.
struct UdfLayout {
  uint32_t blockSize = 0;
  uint32_t partitionStart = 0;     // sector of physical lbn 0
  uint32_t metadataStart = 0;      // sector of metadata lbn 0 (when present)
  std::vector<uint32_t> vdsSectors;  // main sequence: PVD, PD, LVD, USD, TD
  uint32_t lvdSector = 0, pdSector = 0, fsdSector = 0;
  std::map<std::string, uint32_t> entrySector;  // path ("" root) -> FE sector
  std::map<std::string, uint32_t> dirDataSector;  // first block of its FIDs
  std::map<std::string, std::vector<uint32_t>> aedSectors;
  uint32_t metadataFileSector = 0;
};

std::vector<uint8_t> BuildUdf(const UdfNodeSpec &root, const UdfBuildOptions &opt,
                              UdfLayout *layout);

// SealTag recomputes the CRC (over the length the tag records) and the
// checksum of the descriptor whose tag starts at `offset`.
void SealTag(std::vector<uint8_t> *image, size_t offset);

// Little-endian field writes for tests that patch images.
void PutLe16(std::vector<uint8_t> *image, size_t offset, uint16_t v);
void PutLe32(std::vector<uint8_t> *image, size_t offset, uint32_t v);

// A small tree with a nested directory, a 0-byte file, an 8-bit and a 16-bit
// name and a file of `bigBlocks` blocks of a fixed pattern.
UdfNodeSpec SampleUdfTree(uint32_t bigBytes);

}  // namespace tvxtest
