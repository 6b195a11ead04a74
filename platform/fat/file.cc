// File contents: a chain of clusters through the FAT, from the first cluster
// in the directory entry to an end mark; the size is in the entry too.
#include <algorithm>
#include <cstddef>
#include <cstring>
#include <new>

#include "platform/endian.h"
#include "platform/fat/fat_internal.h"

using tvx::LoadLe16;
using tvx::LoadLe32;
using tvx::fat::kEntryFirstCluster;
using tvx::fat::kEntrySize;

namespace {

uint32_t FirstCluster(const FATFile *f) {
  return LoadLe16(f->volume->Entry(f->slot) + kEntryFirstCluster);
}
uint32_t Size(const FATFile *f) { return LoadLe32(f->volume->Entry(f->slot) + kEntrySize); }

void SetEntry(FATFile *f, uint32_t first, uint32_t size) {
  uint8_t *e = f->volume->Entry(f->slot);
  tvx::StoreLe16(e + kEntryFirstCluster, static_cast<uint16_t>(first));
  tvx::StoreLe32(e + kEntrySize, size);
  f->volume->dirty = true;
}

// FileChain lists the file's clusters and checks that they hold its size.
// The list is kept until the FAT or the first cluster changes.
unsigned long FileChain(FATFile *f, std::vector<uint32_t> **chain) {
  FATVolume *v = f->volume;
  uint32_t first = FirstCluster(f);
  bool cached = f->chainGeneration == v->fatGeneration &&
                (f->chain.empty() ? first == 0 : f->chain.front() == first);
  if (!cached) {
    f->chainGeneration = UINT64_MAX;
    unsigned long rc = v->Chain(first, &f->chain);
    if (rc != FAT_OK) return rc;
    f->chainGeneration = v->fatGeneration;
  }
  // A size beyond what the chain holds is damage, not data.
  if (static_cast<uint64_t>(f->chain.size()) * v->clusterBytes < Size(f)) return FAT_ERR_CORRUPT;
  *chain = &f->chain;
  return FAT_OK;
}

// Resize makes the file `*size` bytes long: it frees clusters past the end
// or links zeroed new ones. Without enough free clusters it grows as far as
// they reach and lowers *size to that, provided that still gives at least
// `least` bytes; otherwise it changes nothing and fails.
unsigned long Resize(FATFile *f, uint32_t *size, uint32_t least) {
  FATVolume *v = f->volume;
  std::vector<uint32_t> *chain = nullptr;
  unsigned long rc = FileChain(f, &chain);
  if (rc != FAT_OK) return rc;
  uint32_t old = Size(f);
  size_t want = (static_cast<uint64_t>(*size) + v->clusterBytes - 1) / v->clusterBytes;
  std::vector<uint32_t> fresh;
  if (want > chain->size()) fresh = v->FreeClusters(want - chain->size());
  if (chain->size() + fresh.size() < want) {
    uint64_t reach = static_cast<uint64_t>(chain->size() + fresh.size()) * v->clusterBytes;
    if (reach < least) return FAT_ERR_NO_SPACE;
    *size = static_cast<uint32_t>(reach);
    want = chain->size() + fresh.size();
  }
  if (chain->size() > want) {
    tvx::fat::FreeChain(v, std::vector<uint32_t>(chain->begin() + static_cast<std::ptrdiff_t>(want), chain->end()));
    chain->resize(want);
    if (!chain->empty()) v->Set(chain->back(), v->EndMark());
  }
  for (uint32_t c : fresh) {
    std::memset(v->Cluster(c), 0, v->clusterBytes);
    v->Set(c, v->EndMark());
    if (!chain->empty()) v->Set(chain->back(), c);
    chain->push_back(c);
    v->searchFrom = c + 1 < v->clusterCount + 2 ? c + 1 : 2;
  }
  // Bytes between the old end and a larger size read as zeros.
  for (uint32_t at = old; at < *size;) {
    uint32_t off = at % v->clusterBytes;
    uint32_t n = std::min(v->clusterBytes - off, *size - at);
    std::memset(v->Cluster((*chain)[at / v->clusterBytes]) + off, 0, n);
    at += n;
  }
  SetEntry(f, chain->empty() ? 0 : chain->front(), *size);
  f->chainGeneration = v->fatGeneration;
  return FAT_OK;
}

}  // namespace

unsigned long FAT_ReadFile(FATFile *file, uint64_t offset, void *buf, size_t count,
                           size_t *out_count) try {
  *out_count = 0;
  if (file == nullptr || (buf == nullptr && count > 0)) return FAT_ERR_ARGS;
  FATVolume *v = file->volume;
  uint32_t size = Size(file);
  if (offset >= size || count == 0) return FAT_OK;
  std::vector<uint32_t> *chain = nullptr;
  unsigned long rc = FileChain(file, &chain);
  if (rc != FAT_OK) return rc;
  size_t n = static_cast<size_t>(std::min<uint64_t>(count, size - offset));
  auto *out = static_cast<uint8_t *>(buf);
  for (size_t done = 0; done < n;) {
    uint64_t at = offset + done;
    auto off = static_cast<uint32_t>(at % v->clusterBytes);
    size_t k = std::min<size_t>(v->clusterBytes - off, n - done);
    std::memcpy(out + done, v->Cluster((*chain)[at / v->clusterBytes]) + off, k);
    done += k;
  }
  *out_count = n;
  return FAT_OK;
} catch (...) {
  return FAT_ERR_IO;
}

unsigned long FAT_WriteFile(FATFile *file, uint64_t offset, const void *buf, size_t count,
                            size_t *out_written) try {
  *out_written = 0;
  if (file == nullptr || (buf == nullptr && count > 0)) return FAT_ERR_ARGS;
  if (count == 0) return FAT_OK;
  if (offset > UINT32_MAX || count > UINT32_MAX - offset) return FAT_ERR_NO_SPACE;
  FATVolume *v = file->volume;
  auto end = static_cast<uint32_t>(offset + count);
  unsigned long rc = FAT_OK;
  if (end > Size(file)) rc = Resize(file, &end, static_cast<uint32_t>(offset) + 1);
  std::vector<uint32_t> *chain = nullptr;
  if (rc == FAT_OK) rc = FileChain(file, &chain);
  if (rc != FAT_OK) return rc;
  // A full volume: what fits is written, the rest is refused.
  size_t fits = end > offset ? end - static_cast<size_t>(offset) : 0;
  const auto *in = static_cast<const uint8_t *>(buf);
  for (size_t done = 0; done < fits;) {
    uint64_t at = offset + done;
    auto off = static_cast<uint32_t>(at % v->clusterBytes);
    size_t k = std::min<size_t>(v->clusterBytes - off, fits - done);
    std::memcpy(v->Cluster((*chain)[at / v->clusterBytes]) + off, in + done, k);
    done += k;
  }
  v->dirty = true;
  *out_written = fits;
  return fits == count ? FAT_OK : FAT_ERR_NO_SPACE;
} catch (...) {
  return FAT_ERR_IO;
}

unsigned long FAT_SetFileSize(FATFile *file, uint64_t size) try {
  if (file == nullptr) return FAT_ERR_ARGS;
  if (size > UINT32_MAX) return FAT_ERR_NO_SPACE;
  auto want = static_cast<uint32_t>(size);
  return Resize(file, &want, want);
} catch (...) {
  return FAT_ERR_IO;
}

uint64_t FAT_GetFileSize(const FATFile *file) { return file == nullptr ? 0 : Size(file); }

unsigned long FAT_CloseFile(FATFile *file) {
  if (file == nullptr) return FAT_OK;
  unsigned long rc = file->volume->Flush();
  delete file;
  return rc;
}
