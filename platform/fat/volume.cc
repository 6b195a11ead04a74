// FAT12/FAT16 volume layout (as Microsoft documents the format): the boot
// sector's BIOS parameter block gives the sector size, cluster size,
// reserved sectors, number and size of the FATs and the root directory's
// entry count; then come the FATs, the fixed root directory and the data
// clusters, numbered from 2. The FAT type follows from the cluster count
// alone: fewer than 4085 clusters is FAT12, fewer than 65525 FAT16, else
// FAT32.
#include <cstring>
#include <ctime>
#include <memory>
#include <new>

#include <unistd.h>

#include "platform/endian.h"
#include "platform/fat/fat_internal.h"
#include "platform/fd_io.h"
#include "platform/file_replace.h"

using tvx::LoadLe16;
using tvx::StoreLe16;
using tvx::StoreLe32;

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
    {FAT_FLOPPY_SIZE, 2880, 224, 9, 18, 1, 0xF0},
    {2949120, 5760, 240, 9, 36, 2, 0xF0},
};

unsigned long ParseBootSector(FATVolume *v) {
  tvx::ByteCursor bpb;
  if (!tvx::ByteCursor(v->image.data(), v->image.size()).SubAt(11, 25, &bpb)) {
    return FAT_ERR_CORRUPT;
  }
  uint16_t bps = 0, reserved = 0, rootEntries = 0, total16 = 0, fatSectors = 0;
  uint8_t spc = 0, fats = 0;
  uint32_t total = 0;
  if (!bpb.GetLe16(&bps) || !bpb.GetU8(&spc) || !bpb.GetLe16(&reserved) || !bpb.GetU8(&fats) ||
      !bpb.GetLe16(&rootEntries) || !bpb.GetLe16(&total16) || !bpb.Skip(1) ||
      !bpb.GetLe16(&fatSectors) || !bpb.Skip(8) || !bpb.GetLe32(&total)) {
    return FAT_ERR_CORRUPT;
  }
  if (total16 != 0) total = total16;
  if ((bps != 512 && bps != 1024 && bps != 2048 && bps != 4096) || spc == 0 ||
      (spc & (spc - 1)) != 0 || reserved == 0 || fats == 0 || fats > 4 || rootEntries == 0) {
    return FAT_ERR_CORRUPT;
  }
  if (fatSectors == 0) return FAT_ERR_UNSUPPORTED;  // FAT32 keeps its FAT size elsewhere
  uint64_t rootSectors = (rootEntries * 32ull + bps - 1) / bps;
  uint64_t firstData = reserved + static_cast<uint64_t>(fats) * fatSectors + rootSectors;
  // The whole volume must be in the image: every offset below then fits 32
  // bits (the image is at most kMaxImage) and lies inside it.
  if (firstData >= total || static_cast<uint64_t>(total) * bps > v->image.size()) {
    return FAT_ERR_CORRUPT;
  }
  uint64_t clusters = (total - firstData) / spc;
  if (clusters >= 65525) return FAT_ERR_UNSUPPORTED;
  if (clusters == 0) return FAT_ERR_CORRUPT;
  v->fat12 = clusters < 4085;
  // Every cluster needs its FAT entry (a FAT12 entry may straddle two bytes).
  uint64_t needBytes = ((clusters + 2) * (v->fat12 ? 12u : 16u) + 7) / 8 + 1;
  if (needBytes > static_cast<uint64_t>(fatSectors) * bps) return FAT_ERR_CORRUPT;
  v->fatStart = static_cast<uint32_t>(reserved) * bps;
  v->fatBytes = static_cast<uint32_t>(fatSectors) * bps;
  v->numFats = fats;
  v->rootStart = static_cast<uint32_t>((reserved + static_cast<uint64_t>(fats) * fatSectors) * bps);
  v->rootEntries = rootEntries;
  v->dataStart = static_cast<uint32_t>(firstData * bps);
  v->clusterBytes = static_cast<uint32_t>(spc) * bps;
  v->clusterCount = static_cast<uint32_t>(clusters);
  return FAT_OK;
}

void WriteBootSector(uint8_t *b, const FloppyGeometry &g) {
  static const uint8_t kJump[] = {0xEB, 0x3C, 0x90};
  std::memcpy(b, kJump, 3);
  std::memcpy(b + 3, "MSWIN4.1", 8);
  StoreLe16(b + 11, 512);
  b[13] = g.clusterSectors;
  StoreLe16(b + 14, 1);
  b[16] = 2;
  StoreLe16(b + 17, g.rootEntries);
  StoreLe16(b + 19, g.sectors);
  b[21] = g.media;
  StoreLe16(b + 22, g.fatSectors);
  StoreLe16(b + 24, g.sectorsPerTrack);
  StoreLe16(b + 26, 2);  // heads
  b[36] = 0;             // drive number: a floppy
  b[38] = 0x29;          // extended boot signature: the next three fields are valid
  StoreLe32(b + 39, static_cast<uint32_t>(std::time(nullptr)));
  std::memcpy(b + 43, "NO NAME    ", 11);
  std::memcpy(b + 54, "FAT12   ", 8);
  // Booting from the floppy prints nothing useful and halts.
  b[62] = 0xF4;  // hlt
  b[63] = 0xEB;  // jmp back to the hlt
  b[64] = 0xFD;
  b[510] = 0x55;
  b[511] = 0xAA;
}

std::string TakeDevice(FATDevice *dev) {
  std::string path = std::move(dev->path);
  delete dev;
  return path;
}

}  // namespace

uint32_t FATVolume::Get(uint32_t cluster) const {
  const uint8_t *fat = image.data() + fatStart;
  if (fat12) {
    uint32_t v = LoadLe16(fat + cluster + cluster / 2);
    return (cluster & 1) != 0 ? v >> 4 : v & 0xFFF;
  }
  return LoadLe16(fat + cluster * 2);
}

void FATVolume::Set(uint32_t cluster, uint32_t value) {
  for (uint32_t i = 0; i < numFats; i++) {
    uint8_t *fat = image.data() + fatStart + i * fatBytes;
    if (fat12) {
      uint8_t *at = fat + cluster + cluster / 2;
      uint32_t old = LoadLe16(at);
      uint32_t v = (cluster & 1) != 0 ? (old & 0x000F) | (value << 4)
                                      : (old & 0xF000) | (value & 0xFFF);
      StoreLe16(at, static_cast<uint16_t>(v));
    } else {
      StoreLe16(fat + cluster * 2, static_cast<uint16_t>(value));
    }
  }
  fatGeneration++;
  dirty = true;
}

unsigned long FATVolume::Chain(uint32_t first, std::vector<uint32_t> *out) const {
  out->clear();
  if (first == 0) return FAT_OK;
  // A chain longer than the volume has clusters must pass one twice.
  for (uint32_t c = first;;) {
    if (!IsCluster(c) || out->size() >= clusterCount) return FAT_ERR_CORRUPT;
    out->push_back(c);
    uint32_t next = Get(c);
    if (IsEnd(next)) return FAT_OK;
    c = next;
  }
}

std::vector<uint32_t> FATVolume::FreeClusters(size_t want) const {
  std::vector<uint32_t> fresh;
  for (uint32_t k = 0; fresh.size() < want && k < clusterCount; k++) {
    uint32_t c = 2 + (searchFrom - 2 + k) % clusterCount;
    if (Get(c) == 0) fresh.push_back(c);
  }
  return fresh;
}

unsigned long FATVolume::Flush() {
  if (!dirty) return FAT_OK;
  if (!tvx::PwriteAll(fd.fd, image.data(), image.size(), 0)) return FAT_ERR_IO;
  dirty = false;
  return FAT_OK;
}

void tvx::fat::FreeChain(FATVolume *v, const std::vector<uint32_t> &chain) {
  for (uint32_t c : chain) v->Set(c, 0);
}

FATDevice *FATDevFileIO_Open(const char *path) {
  if (path == nullptr) return nullptr;
  return new (std::nothrow) FATDevice{path};
}

void FATDev_Close(FATDevice *dev) { delete dev; }

unsigned long FAT_FormatVolume(FATDevice *dev, uint64_t size, unsigned flags,
                               FATVolume **out_volume) try {
  *out_volume = nullptr;
  if (dev == nullptr) return FAT_ERR_ARGS;
  std::string path = TakeDevice(dev);
  const FloppyGeometry *g = nullptr;
  for (const auto &f : kFloppies) g = f.size == size ? &f : g;
  if (g == nullptr) return FAT_ERR_UNSUPPORTED;
  auto v = std::make_unique<FATVolume>();
  v->image.assign(size, 0);
  WriteBootSector(v->image.data(), *g);
  if (ParseBootSector(v.get()) != FAT_OK) return FAT_ERR_CORRUPT;
  v->Set(0, 0xF00u | g->media);
  v->Set(1, v->EndMark());
  // The finished image replaces the target in one rename; the descriptor
  // kept for write-back is the temporary file's, which becomes the image.
  // Floppies carry answer files, some with passwords: owner-only.
  FileReplaceOptions options;
  options.secret = true;
  int kept = -1;
  Bool ok = File_ReplaceWith(path.c_str(), options, [&](int fd, const char *) {
    if (!tvx::WriteAll(fd, v->image.data(), v->image.size())) return false;
    kept = ::dup(fd);
    return kept >= 0;
  });
  if (!ok) {
    if (kept >= 0) ::close(kept);
    return FAT_ERR_IO;
  }
  v->fd.fd = kept;
  v->dirty = false;
  *out_volume = v.release();
  return FAT_OK;
} catch (...) {
  return FAT_ERR_IO;
}

unsigned long FAT_OpenVolume(FATDevice *dev, FATVolume **out_volume) try {
  *out_volume = nullptr;
  if (dev == nullptr) return FAT_ERR_ARGS;
  std::string path = TakeDevice(dev);
  auto v = std::make_unique<FATVolume>();
  if (FileIO_Open(&v->fd, path.c_str(), FILEIO_OPEN_ACCESS_READ | FILEIO_OPEN_ACCESS_WRITE,
                  FILEIO_OPEN) != FILEIO_SUCCESS) {
    return FAT_ERR_IO;
  }
  uint64_t size = FileIO_GetSize(&v->fd);
  if (size == UINT64_MAX) return FAT_ERR_IO;
  if (size > kMaxImage) return FAT_ERR_UNSUPPORTED;
  v->image.resize(static_cast<size_t>(size));
  if (size > 0 && FileIO_Pread(&v->fd, v->image.data(), v->image.size(), 0) != FILEIO_SUCCESS) {
    return FAT_ERR_IO;
  }
  unsigned long rc = ParseBootSector(v.get());
  if (rc != FAT_OK) return rc;
  *out_volume = v.release();
  return FAT_OK;
} catch (...) {
  return FAT_ERR_IO;
}

unsigned long FAT_SkipVolumeBoot(FATVolume *volume) {
  return volume == nullptr ? FAT_ERR_ARGS : FAT_OK;
}

unsigned long FAT_GetFreeBytes(FATVolume *volume, uint64_t *out_bytes) {
  *out_bytes = 0;
  if (volume == nullptr) return FAT_ERR_ARGS;
  uint64_t n = 0;
  for (uint32_t c = 2; c < volume->clusterCount + 2; c++) n += volume->Get(c) == 0 ? 1 : 0;
  *out_bytes = n * volume->clusterBytes;
  return FAT_OK;
}

unsigned long FAT_CloseVolume(FATVolume *volume) {
  if (volume == nullptr) return FAT_OK;
  unsigned long rc = volume->Flush();
  if (FileIO_Close(&volume->fd) != FILEIO_SUCCESS && rc == FAT_OK) rc = FAT_ERR_IO;
  delete volume;
  return rc;
}
