// FAT12/FAT16 volume layout (as Microsoft documents the format): the boot sector's
// BIOS parameter block gives the sector size, cluster size, reserved
// sectors, number and size of the FATs and the root directory's entry count;
// then come the FATs, the fixed root directory and the data clusters,
// numbered from 2. The FAT type follows from the cluster count alone: fewer
// than 4085 clusters is FAT12, fewer than 65525 FAT16, else FAT32.
#include <cstring>
#include <ctime>
#include <memory>

#include "platform/fat_internal.h"
#include "platform/fileio.h"

using tvx::Le16;
using tvx::Le32;
using tvx::Put16;
using tvx::Put32;

namespace {

// The whole volume is held in memory; floppy images are 1.44 MB, and an
// image this large is no floppy.
constexpr uint64_t kMaxImage = 64u << 20;

struct FloppyGeometry {
  uint64_t size;
  uint16_t sectors, rootEntries, fatSectors, sectorsPerTrack;
  uint8_t clusterSectors, media;
};

constexpr FloppyGeometry kFloppies[] = {
    {737280, 1440, 112, 3, 9, 2, 0xF9},
    {1474560, 2880, 224, 9, 18, 1, 0xF0},
    {2949120, 5760, 240, 9, 36, 2, 0xF0},
};

unsigned long ParseBootSector(FATVolume *v) {
  const uint8_t *b = v->image.data();
  if (v->image.size() < 512) return FAT_ERR_CORRUPT;
  uint32_t bps = Le16(b + 11), spc = b[13], reserved = Le16(b + 14), fats = b[16];
  uint32_t rootEntries = Le16(b + 17), total = Le16(b + 19), fatSectors = Le16(b + 22);
  if (total == 0) total = Le32(b + 32);
  if ((bps != 512 && bps != 1024 && bps != 2048 && bps != 4096) || spc == 0 || (spc & (spc - 1)) != 0 ||
      reserved == 0 || fats == 0 || fats > 4 || rootEntries == 0) {
    return FAT_ERR_CORRUPT;
  }
  if (fatSectors == 0) return FAT_ERR_UNSUPPORTED;  // FAT32 keeps its FAT size elsewhere
  uint64_t rootSectors = (rootEntries * 32ull + bps - 1) / bps;
  uint64_t firstData = reserved + static_cast<uint64_t>(fats) * fatSectors + rootSectors;
  if (firstData >= total || static_cast<uint64_t>(total) * bps > v->image.size()) {
    return FAT_ERR_CORRUPT;
  }
  uint64_t clusters = (total - firstData) / spc;
  if (clusters >= 65525) return FAT_ERR_UNSUPPORTED;
  if (clusters == 0) return FAT_ERR_CORRUPT;
  v->fat12 = clusters < 4085;
  // Every cluster needs its FAT entry.
  uint64_t needBits = (clusters + 2) * (v->fat12 ? 12u : 16u);
  if (needBits > static_cast<uint64_t>(fatSectors) * bps * 8) return FAT_ERR_CORRUPT;
  v->bytesPerSector = bps;
  v->fatStart = reserved * bps;
  v->fatBytes = fatSectors * bps;
  v->numFats = fats;
  v->rootStart = static_cast<uint32_t>((reserved + fats * fatSectors) * bps);
  v->rootEntries = rootEntries;
  v->dataStart = static_cast<uint32_t>(firstData * bps);
  v->clusterBytes = spc * bps;
  v->clusterCount = static_cast<uint32_t>(clusters);
  return FAT_OK;
}

void WriteBootSector(uint8_t *b, const FloppyGeometry &g) {
  static const uint8_t kJump[] = {0xEB, 0x3C, 0x90};
  std::memcpy(b, kJump, 3);
  std::memcpy(b + 3, "MSWIN4.1", 8);
  Put16(b + 11, 512);
  b[13] = g.clusterSectors;
  Put16(b + 14, 1);
  b[16] = 2;
  Put16(b + 17, g.rootEntries);
  Put16(b + 19, g.sectors);
  b[21] = g.media;
  Put16(b + 22, g.fatSectors);
  Put16(b + 24, g.sectorsPerTrack);
  Put16(b + 26, 2);  // heads
  b[36] = 0;         // drive number: a floppy
  b[38] = 0x29;      // extended boot signature: the next three fields are valid
  Put32(b + 39, static_cast<uint32_t>(std::time(nullptr)));
  std::memcpy(b + 43, "NO NAME    ", 11);
  std::memcpy(b + 54, "FAT12   ", 8);
  // Booting from the floppy prints nothing useful and halts.
  b[62] = 0xF4;  // hlt
  b[63] = 0xEB;  // jmp back to the hlt
  b[64] = 0xFD;
  b[510] = 0x55;
  b[511] = 0xAA;
}

}  // namespace

uint32_t FATVolume::Get(uint32_t cluster) const {
  const uint8_t *fat = image.data() + fatStart;
  if (fat12) {
    uint32_t at = cluster + cluster / 2;
    uint32_t v = Le16(fat + at);
    return (cluster & 1) != 0 ? v >> 4 : v & 0xFFF;
  }
  return Le16(fat + cluster * 2);
}

void FATVolume::Set(uint32_t cluster, uint32_t value) {
  for (uint32_t i = 0; i < numFats; i++) {
    uint8_t *fat = image.data() + fatStart + i * fatBytes;
    if (fat12) {
      uint32_t at = cluster + cluster / 2;
      uint32_t old = Le16(fat + at);
      uint32_t v = (cluster & 1) != 0 ? (old & 0x000F) | (value << 4) : (old & 0xF000) | (value & 0xFFF);
      Put16(fat + at, v);
    } else {
      Put16(fat + cluster * 2, value);
    }
  }
  dirty = true;
}

unsigned long FATVolume::Chain(uint32_t first, std::vector<uint32_t> *out) const {
  out->clear();
  if (first == 0) return FAT_OK;
  uint32_t c = first;
  while (true) {
    if (!IsCluster(c) || out->size() >= clusterCount) return FAT_ERR_CORRUPT;
    out->push_back(c);
    uint32_t next = Get(c);
    if (IsEnd(next)) return FAT_OK;
    c = next;
  }
}

unsigned long FATVolume::Flush() {
  if (!dirty) return FAT_OK;
  FileIODescriptor fd;
  if (FileIO_Open(&fd, path.c_str(), FILEIO_OPEN_ACCESS_WRITE, FILEIO_OPEN) != FILEIO_SUCCESS) {
    return FAT_ERR_IO;
  }
  FileIOResult rc = FileIO_Write(&fd, image.data(), image.size(), nullptr);
  FileIOResult closed = FileIO_Close(&fd);
  if (rc != FILEIO_SUCCESS || closed != FILEIO_SUCCESS) return FAT_ERR_IO;
  dirty = false;
  return FAT_OK;
}

FATDevice *FATDevFileIO_Open(const char *path) {
  if (path == nullptr) return nullptr;
  return new FATDevice{path};
}

void FATDev_Close(FATDevice *dev) { delete dev; }

unsigned long FAT_FormatVolume(FATDevice *dev, uint64_t size, unsigned flags,
                               FATVolume **out_volume) {
  *out_volume = nullptr;
  if (dev == nullptr) return FAT_ERR_ARGS;
  std::string path = dev->path;
  delete dev;
  const FloppyGeometry *g = nullptr;
  for (const auto &f : kFloppies) g = f.size == size ? &f : g;
  if (g == nullptr) return FAT_ERR_UNSUPPORTED;
  auto v = std::make_unique<FATVolume>();
  v->path = path;
  v->image.assign(size, 0);
  WriteBootSector(v->image.data(), *g);
  if (ParseBootSector(v.get()) != FAT_OK) return FAT_ERR_CORRUPT;
  v->Set(0, 0xF00u | g->media);
  v->Set(1, v->EndMark());
  FileIODescriptor fd;
  if (FileIO_Open(&fd, path.c_str(), FILEIO_OPEN_ACCESS_WRITE, FILEIO_OPEN_CREATE_EMPTY) !=
      FILEIO_SUCCESS) {
    return FAT_ERR_IO;
  }
  FileIO_Close(&fd);
  if (v->Flush() != FAT_OK) return FAT_ERR_IO;
  *out_volume = v.release();
  return FAT_OK;
}

unsigned long FAT_OpenVolume(FATDevice *dev, FATVolume **out_volume) {
  *out_volume = nullptr;
  if (dev == nullptr) return FAT_ERR_ARGS;
  std::string path = dev->path;
  delete dev;
  FileIODescriptor fd;
  if (FileIO_Open(&fd, path.c_str(), FILEIO_OPEN_ACCESS_READ | FILEIO_OPEN_ACCESS_WRITE,
                  FILEIO_OPEN) != FILEIO_SUCCESS) {
    return FAT_ERR_IO;
  }
  uint64_t size = FileIO_GetSize(&fd);
  auto v = std::make_unique<FATVolume>();
  v->path = path;
  unsigned long rc = FAT_OK;
  if (size == UINT64_MAX) {
    rc = FAT_ERR_IO;
  } else if (size > kMaxImage) {
    rc = FAT_ERR_UNSUPPORTED;
  } else {
    v->image.resize(static_cast<size_t>(size));
    if (FileIO_Read(&fd, v->image.data(), v->image.size(), nullptr) != FILEIO_SUCCESS) {
      rc = FAT_ERR_IO;
    }
  }
  FileIO_Close(&fd);
  if (rc == FAT_OK) rc = ParseBootSector(v.get());
  if (rc != FAT_OK) return rc;
  *out_volume = v.release();
  return FAT_OK;
}

unsigned long FAT_SkipVolumeBoot(FATVolume *volume) {
  return volume == nullptr ? FAT_ERR_ARGS : FAT_OK;
}

unsigned long FAT_CloseVolume(FATVolume *volume) {
  if (volume == nullptr) return FAT_OK;
  unsigned long rc = volume->Flush();
  delete volume;
  return rc;
}
