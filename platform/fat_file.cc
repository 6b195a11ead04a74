// File contents: a chain of clusters through the FAT, from the first cluster
// in the directory entry (bytes 26-27) to an end mark; the size is at bytes
// 28-31.
#include <algorithm>
#include <cstring>

#include "platform/fat_internal.h"

using tvx::Le16;
using tvx::Le32;
using tvx::Put16;
using tvx::Put32;

namespace {

uint32_t FirstCluster(FATFile *f) { return Le16(f->volume->Entry(f->slot) + 26); }
uint32_t Size(const FATFile *f) { return Le32(f->volume->Entry(f->slot) + 28); }

void SetEntry(FATFile *f, uint32_t first, uint32_t size) {
  uint8_t *e = f->volume->Entry(f->slot);
  Put16(e + 26, first);
  Put32(e + 28, size);
  f->volume->dirty = true;
}

// Resize makes the chain hold `size` bytes: it frees clusters past the end or
// links zeroed new ones. Nothing changes when there is not enough room.
unsigned long Resize(FATFile *f, uint32_t size, std::vector<uint32_t> *chain) {
  FATVolume *v = f->volume;
  unsigned long rc = v->Chain(FirstCluster(f), chain);
  if (rc != FAT_OK) return rc;
  size_t want = (static_cast<uint64_t>(size) + v->clusterBytes - 1) / v->clusterBytes;
  // Gather the free clusters first, from where the last search ended, so that
  // nothing changes when there are not enough and appends stay cheap.
  std::vector<uint32_t> fresh;
  for (uint32_t k = 0; chain->size() + fresh.size() < want && k < v->clusterCount; k++) {
    uint32_t c = 2 + (v->searchFrom - 2 + k) % v->clusterCount;
    if (v->Get(c) == 0) fresh.push_back(c);
  }
  if (chain->size() + fresh.size() < want) return FAT_ERR_NO_SPACE;
  while (chain->size() > want) {
    v->Set(chain->back(), 0);
    chain->pop_back();
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
  uint32_t old = Size(f);
  for (uint32_t at = old; at < size && !chain->empty();) {
    uint32_t idx = at / v->clusterBytes, off = at % v->clusterBytes;
    uint32_t n = std::min(v->clusterBytes - off, size - at);
    std::memset(v->Cluster((*chain)[idx]) + off, 0, n);
    at += n;
  }
  SetEntry(f, chain->empty() ? 0 : chain->front(), size);
  return FAT_OK;
}

}  // namespace

unsigned long FAT_ReadFile(FATFile *file, uint64_t offset, void *buf, size_t count,
                           size_t *out_count) {
  *out_count = 0;
  if (file == nullptr) return FAT_ERR_ARGS;
  FATVolume *v = file->volume;
  uint32_t size = Size(file);
  if (offset >= size || count == 0) return FAT_OK;
  std::vector<uint32_t> chain;
  unsigned long rc = v->Chain(FirstCluster(file), &chain);
  if (rc != FAT_OK) return rc;
  // A size beyond what the chain holds is damage, not data.
  if (static_cast<uint64_t>(chain.size()) * v->clusterBytes < size) return FAT_ERR_CORRUPT;
  size_t n = static_cast<size_t>(std::min<uint64_t>(count, size - offset));
  auto *out = static_cast<uint8_t *>(buf);
  for (size_t done = 0; done < n;) {
    uint64_t at = offset + done;
    uint32_t idx = static_cast<uint32_t>(at / v->clusterBytes), off = static_cast<uint32_t>(at % v->clusterBytes);
    size_t k = std::min<size_t>(v->clusterBytes - off, n - done);
    std::memcpy(out + done, v->Cluster(chain[idx]) + off, k);
    done += k;
  }
  *out_count = n;
  return FAT_OK;
}

unsigned long FAT_WriteFile(FATFile *file, uint64_t offset, const void *buf, size_t count,
                            size_t *out_written) {
  *out_written = 0;
  if (file == nullptr || (buf == nullptr && count > 0)) return FAT_ERR_ARGS;
  if (count == 0) return FAT_OK;
  if (offset + count > UINT32_MAX) return FAT_ERR_NO_SPACE;
  FATVolume *v = file->volume;
  std::vector<uint32_t> chain;
  uint32_t end = static_cast<uint32_t>(offset + count);
  unsigned long rc = end > Size(file) ? Resize(file, end, &chain) : v->Chain(FirstCluster(file), &chain);
  if (rc != FAT_OK) return rc;
  if (static_cast<uint64_t>(chain.size()) * v->clusterBytes < end) return FAT_ERR_CORRUPT;
  const auto *in = static_cast<const uint8_t *>(buf);
  for (size_t done = 0; done < count;) {
    uint64_t at = offset + done;
    uint32_t idx = static_cast<uint32_t>(at / v->clusterBytes), off = static_cast<uint32_t>(at % v->clusterBytes);
    size_t k = std::min<size_t>(v->clusterBytes - off, count - done);
    std::memcpy(v->Cluster(chain[idx]) + off, in + done, k);
    done += k;
  }
  v->dirty = true;
  *out_written = count;
  return FAT_OK;
}

unsigned long FAT_SetFileSize(FATFile *file, uint64_t size) {
  if (file == nullptr) return FAT_ERR_ARGS;
  if (size > UINT32_MAX) return FAT_ERR_NO_SPACE;
  std::vector<uint32_t> chain;
  return Resize(file, static_cast<uint32_t>(size), &chain);
}

uint64_t FAT_GetFileSize(const FATFile *file) { return Size(file); }

unsigned long FAT_CloseFile(FATFile *file) {
  if (file == nullptr) return FAT_OK;
  file->volume->openHandles--;
  unsigned long rc = file->volume->Flush();
  delete file;
  return rc;
}
