// What the ISO 9660 and UDF fuzz targets share: run the library's own tree
// listing and extraction planning over an in-memory image, read every byte an
// extraction would write, and treat unbounded work as a finding.
//
// An input is an image without its first 32 KiB: that system area is all
// zeros to both readers, and leaving it out keeps inputs small (fast to copy,
// and every mutation lands on bytes the readers look at). SystemAreaSource
// puts it back.
//
// The bounds are the ones the library promises, with no cap of the harness's
// own:
//   - entries visited: at most one per kMinEntryBytes of the image;
//   - bytes an extraction writes (recorded runs): at most the image's size;
//   - bytes read from the image: at most kReadFactor times its size, plus
//     a fixed allowance for the volume descriptors probed at fixed places.
#pragma once

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "platform/blocksource.h"
#include "platform/media_tree.h"

namespace tvxfuzz {

constexpr size_t kSystemArea = 32 * 1024;
constexpr uint64_t kReadFactor = 64;
constexpr uint64_t kReadAllowance = 4u << 20;

// SystemAreaSource serves zeros for the system area, then the input.
class SystemAreaSource final : public tvx::BlockSource {
 public:
  SystemAreaSource(const uint8_t *data, size_t size) : data_(data), size_(size) {}
  bool ReadAt(uint64_t offset, void *buf, size_t len) override {
    if (offset > Size() || len > Size() - offset) return false;
    // Zeros count as read too: a reader looping over the system area is
    // unbounded work all the same.
    tvx::g_sourceBytesRead.fetch_add(len, std::memory_order_relaxed);
    auto *out = static_cast<uint8_t *>(buf);
    if (offset < kSystemArea) {
      size_t zeros = std::min<uint64_t>(len, kSystemArea - offset);
      std::memset(out, 0, zeros);
      out += zeros;
      len -= zeros;
      offset += zeros;
    }
    if (len > 0) std::memcpy(out, data_ + (offset - kSystemArea), len);
    return true;
  }
  uint64_t Size() const override { return kSystemArea + size_; }

 private:
  const uint8_t *data_;
  size_t size_;
};

inline tvx::BlockSourcePtr ImageSource(const uint8_t *data, size_t size) {
  return std::make_unique<SystemAreaSource>(data, size);
}

inline void Fail(const char *what, uint64_t got, uint64_t bound) {
  std::fprintf(stderr, "bound broken: %s %llu > %llu\n", what, static_cast<unsigned long long>(got),
               static_cast<unsigned long long>(bound));
  std::abort();
}

// ExerciseTree walks and plans over `src`, an image of `imageSize` bytes.
inline void ExerciseTree(tvx::media::TreeSource &src, uint64_t imageSize) {
  using tvx::media::TreeStatus;
  uint64_t readBefore = tvx::g_sourceBytesRead.load();
  uint64_t entryBound = src.Capacity() / tvx::media::kMinEntryBytes + 1;
  tvx::media::TreeNode root;
  if (src.Resolve("", &root) != TreeStatus::kOk) return;
  uint64_t entries = 0;
  tvx::media::WalkTree(src, root, true, [&entries](const std::string &, const auto &) {
    ++entries;
    return TreeStatus::kOk;
  });
  if (entries > entryBound) Fail("entries listed", entries, entryBound);

  std::vector<tvx::media::PlannedEntry> plan;
  if (tvx::media::PlanExtraction(src, "", &plan) == TreeStatus::kOk) {
    uint64_t written = 0;
    static std::vector<uint8_t> buf(64 * 1024);  // once: zeroing it per input cost a tenth
    for (const auto &e : plan) {
      for (const auto &r : e.runs) {
        if (!r.recorded) continue;
        written += r.length;
        for (uint64_t done = 0; done < r.length;) {
          size_t n = static_cast<size_t>(std::min<uint64_t>(buf.size(), r.length - done));
          if (src.Read(e.node, r.offset + done, buf.data(), n) != TreeStatus::kOk) break;
          done += n;
        }
      }
    }
    if (written > src.Capacity()) Fail("bytes extracted", written, src.Capacity());
  }
  uint64_t read = tvx::g_sourceBytesRead.load() - readBefore;
  uint64_t readBound = kReadFactor * imageSize + kReadAllowance;
  if (read > readBound) Fail("bytes read", read, readBound);
}

}  // namespace tvxfuzz
