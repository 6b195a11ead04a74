// The in-memory FAT volume shared by the volume, directory and file code.
//
// Every offset below is checked against the image once, when the boot
// sector is parsed: the FATs, the root directory and every data cluster lie
// inside `image`, and the FATs have an entry for every cluster. Entry() and
// Cluster() rely on that and on their callers keeping slot < rootEntries and
// IsCluster(c).
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/fileio.h"
#include "tvx_fat.h"

struct FATDevice {
  std::string path;
};

struct FATVolume {
  FileIODescriptor fd{-1};  // the image, open for reading and writing
  std::vector<uint8_t> image;
  bool dirty = false;
  uint64_t fatGeneration = 0;  // counts FAT changes, for FATFile's chain cache

  uint32_t fatStart = 0;      // byte offset of the first FAT
  uint32_t fatBytes = 0;      // bytes of one FAT
  uint32_t numFats = 0;
  uint32_t rootStart = 0;     // byte offset of the root directory
  uint32_t rootEntries = 0;
  uint32_t dataStart = 0;     // byte offset of cluster 2
  uint32_t clusterBytes = 0;
  uint32_t clusterCount = 0;  // data clusters: numbers 2 .. clusterCount + 1
  bool fat12 = true;
  uint32_t searchFrom = 2;  // where the next free-cluster search starts

  ~FATVolume() { FileIO_Close(&fd); }

  uint32_t EndMark() const { return fat12 ? 0xFFF : 0xFFFF; }
  bool IsEnd(uint32_t v) const { return v >= (fat12 ? 0xFF8u : 0xFFF8u); }
  bool IsCluster(uint32_t c) const { return c >= 2 && c < clusterCount + 2; }
  uint32_t Get(uint32_t cluster) const;
  void Set(uint32_t cluster, uint32_t value);  // in every FAT copy
  uint8_t *Entry(uint32_t slot) { return image.data() + rootStart + slot * 32u; }
  const uint8_t *Entry(uint32_t slot) const { return image.data() + rootStart + slot * 32u; }
  uint8_t *Cluster(uint32_t c) { return image.data() + dataStart + (c - 2) * clusterBytes; }
  // Chain lists a file's clusters, refusing loops and stray numbers.
  unsigned long Chain(uint32_t first, std::vector<uint32_t> *out) const;
  // FreeClusters gathers up to `want` free clusters, from where the last
  // search ended so that appends stay cheap.
  std::vector<uint32_t> FreeClusters(size_t want) const;
  unsigned long Flush();
};

struct FATDirIter {
  FATDirectory *dir = nullptr;
  uint32_t nextSlot = 0;
  uint32_t slot = 0;  // of the current entry's short entry
  uint32_t firstSlot = 0;  // of its first long-name part (== slot without one)
  std::string name;
  bool isDir = false;
  bool valid = false;
};

struct FATDirectory {
  FATVolume *volume = nullptr;
  FATDirIter iter;
};

struct FATFile {
  FATFile(FATVolume *v, uint32_t s) : volume(v), slot(s) {}
  FATVolume *volume;
  uint32_t slot;  // root directory entry
  // The file's clusters as of FAT generation `chainGeneration`, so that a
  // copy in blocks does not walk the chain again for every block.
  std::vector<uint32_t> chain;
  uint64_t chainGeneration = UINT64_MAX;
};

namespace tvx::fat {

constexpr uint8_t kAttrDir = 0x10;
// Byte offsets inside a 32-byte short directory entry.
constexpr uint32_t kEntryFirstCluster = 26, kEntrySize = 28;

// Free releases a chain's clusters (the directory entry is the caller's).
void FreeChain(FATVolume *v, const std::vector<uint32_t> &chain);

}  // namespace tvx::fat
