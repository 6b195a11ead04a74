// The in-memory FAT volume shared by the volume, directory and file code.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/fat.h"

struct FATDevice {
  std::string path;
};

struct FATVolume {
  std::string path;
  std::vector<uint8_t> image;
  bool dirty = false;
  int openHandles = 0;  // directories and files not yet closed

  uint32_t bytesPerSector = 0;
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

  uint32_t EndMark() const { return fat12 ? 0xFFF : 0xFFFF; }
  bool IsEnd(uint32_t v) const { return v >= (fat12 ? 0xFF8u : 0xFFF8u); }
  bool IsCluster(uint32_t c) const { return c >= 2 && c < clusterCount + 2; }
  uint32_t Get(uint32_t cluster) const;
  void Set(uint32_t cluster, uint32_t value);  // in every FAT copy
  uint8_t *Entry(uint32_t slot) { return image.data() + rootStart + slot * 32u; }
  uint8_t *Cluster(uint32_t c) { return image.data() + dataStart + (c - 2) * clusterBytes; }
  // Chain lists a file's clusters, refusing loops and stray numbers.
  unsigned long Chain(uint32_t first, std::vector<uint32_t> *out) const;
  unsigned long Flush();
};

struct FATDirIter {
  FATDirectory *dir = nullptr;
  uint32_t nextSlot = 0;
  uint32_t slot = 0;  // of the current entry's short entry
  std::string name;
  bool isDir = false;
  bool valid = false;
};

struct FATDirectory {
  FATVolume *volume = nullptr;
  FATDirIter iter;
};

struct FATFile {
  FATVolume *volume = nullptr;
  uint32_t slot = 0;  // root directory entry
};

namespace tvx {

inline uint16_t Le16(const uint8_t *p) { return static_cast<uint16_t>(p[0] | (p[1] << 8)); }
inline uint32_t Le32(const uint8_t *p) {
  return static_cast<uint32_t>(p[0]) | (static_cast<uint32_t>(p[1]) << 8) |
         (static_cast<uint32_t>(p[2]) << 16) | (static_cast<uint32_t>(p[3]) << 24);
}
inline void Put16(uint8_t *p, uint32_t v) {
  p[0] = static_cast<uint8_t>(v);
  p[1] = static_cast<uint8_t>(v >> 8);
}
inline void Put32(uint8_t *p, uint32_t v) {
  Put16(p, v);
  Put16(p + 2, v >> 16);
}

}  // namespace tvx
