// ICBs: File Entries, Extended File Entries and their allocation descriptors.
//
// An ICB may first hold indirect entries (strategy 4096, ECMA-167 4/A.6)
// that point on to the entry in use; those are followed a bounded number of
// times. The entry's allocation descriptors (short, long or extended, or the
// data itself when embedded) become one list of extents covering the file
// from offset 0; descriptors of type 3 continue the list in an allocation
// extent descriptor elsewhere, and such chains are checked for cycles.
#include <algorithm>
#include <cstring>

#include "platform/log.h"
#include "platform/udf/udf_internal.h"

namespace tvx::udf {

namespace {

// ICB tag (4/14.6) inside both entry kinds.
constexpr size_t kIcbTag = 16;
constexpr size_t kIcbFileType = kIcbTag + 11;
constexpr size_t kIcbFlags = kIcbTag + 18;
constexpr uint16_t kAdTypeMask = 7;
constexpr int kAdShort = 0;
constexpr int kAdLong = 1;
constexpr int kAdExtended = 2;
constexpr int kAdEmbedded = 3;

// Indirect entry (4/14.7).
constexpr size_t kIeIndirectIcb = 36;

// File entry (4/14.9) and extended file entry (4/14.17).
constexpr size_t kEntryInfoLength = 56;
constexpr size_t kFeEaLength = 168;
constexpr size_t kFeAdLength = 172;
constexpr size_t kFeEa = 176;
constexpr size_t kEfeEaLength = 208;
constexpr size_t kEfeAdLength = 212;
constexpr size_t kEfeEa = 216;

// Allocation extent descriptor (4/14.5).
constexpr size_t kAedAdLength = 20;
constexpr size_t kAedAds = 24;

constexpr uint32_t kExtentLengthMask = 0x3FFFFFFF;
constexpr uint32_t kExtentRecorded = 0;
constexpr uint32_t kExtentAllocated = 1;  // allocated, not recorded: reads as zeros
constexpr uint32_t kExtentNextAds = 3;

size_t AdSize(int adType) {
  switch (adType) {
    case kAdShort: return 8;
    case kAdLong: return 16;
    case kAdExtended: return 20;
  }
  return 0;
}

}  // namespace

Status Volume::LoadNode(LbAddr icb, Node *out) {
  std::vector<uint8_t> buf;
  std::vector<LbAddr> seen;
  LbAddr at = icb;
  for (;;) {
    Status st = ReadDescriptor(at, &buf, 0);
    if (st != Status::kOk) return st;
    uint16_t id = LoadLe16(buf.data());
    if (id == kTagFileEntry || id == kTagExtendedFileEntry) break;
    if (id != kTagIndirectEntry) return Status::kCorrupt;
    if (seen.size() >= kMaxIndirectEntries) return Status::kLoop;
    seen.push_back(at);
    at = LbAddr{LoadLe32(buf.data() + kIeIndirectIcb + 4), LoadLe16(buf.data() + kIeIndirectIcb + 8)};
    if (std::find(seen.begin(), seen.end(), at) != seen.end()) return Status::kLoop;
  }

  const uint8_t *d = buf.data();
  bool extended = LoadLe16(d) == kTagExtendedFileEntry;
  Node node;
  node.icb = at;
  node.fileType = d[kIcbFileType];
  node.size = LoadLe64(d + kEntryInfoLength);
  uint64_t eaLen = LoadLe32(d + (extended ? kEfeEaLength : kFeEaLength));
  uint64_t adLen = LoadLe32(d + (extended ? kEfeAdLength : kFeAdLength));
  uint64_t adStart = (extended ? kEfeEa : kFeEa) + eaLen;
  if (adStart > buf.size() || adLen > buf.size() - adStart) return Status::kCorrupt;
  const uint8_t *ads = d + adStart;

  int adType = LoadLe16(d + kIcbFlags) & kAdTypeMask;
  if (adType == kAdEmbedded) {
    if (node.size > adLen) return Status::kCorrupt;
    node.embedded = true;
    node.inlineData.assign(ads, ads + node.size);
    *out = std::move(node);
    return Status::kOk;
  }
  if (AdSize(adType) == 0) return Status::kCorrupt;
  uint64_t covered = 0, allocated = 0;
  std::vector<LbAddr> chain;
  Status st = ParseAllocation(&node, ads, static_cast<size_t>(adLen), adType, &covered,
                              &allocated, &chain);
  if (st != Status::kOk) return st;
  // Descriptors must account for every byte of the recorded size (sparse
  // parts included); a size beyond them would promise data that is nowhere.
  if (covered < node.size) return Status::kCorrupt;
  *out = std::move(node);
  return Status::kOk;
}

Status Volume::ParseAllocation(Node *node, const uint8_t *ads, size_t len, int adType,
                               uint64_t *covered, uint64_t *allocated,
                               std::vector<LbAddr> *chain) {
  const size_t adSize = AdSize(adType);
  std::vector<uint8_t> aed;
  for (;;) {
    bool next = false;
    for (size_t pos = 0; len - pos >= adSize && *covered < node->size; pos += adSize) {
      const uint8_t *ad = ads + pos;
      uint32_t raw = LoadLe32(ad);
      uint32_t length = raw & kExtentLengthMask;
      uint32_t type = raw >> 30;
      // A zero length ends the descriptors (ECMA-167 4/12).
      if (length == 0) return Status::kOk;
      LbAddr where;
      if (adType == kAdShort) {
        where = LbAddr{LoadLe32(ad + 4), node->icb.part};
      } else if (adType == kAdLong) {
        where = LbAddr{LoadLe32(ad + 4), LoadLe16(ad + 8)};
      } else {
        where = LbAddr{LoadLe32(ad + 12), LoadLe16(ad + 16)};
      }
      if (type == kExtentNextAds) {
        if (chain->size() >= kMaxAllocExtents) return Status::kTooLarge;
        if (std::find(chain->begin(), chain->end(), where) != chain->end()) return Status::kLoop;
        chain->push_back(where);
        Status st = ReadDescriptor(where, &aed, kTagAllocExtent);
        if (st != Status::kOk) return st;
        uint32_t aedLen = LoadLe32(aed.data() + kAedAdLength);
        if (aedLen > aed.size() - kAedAds) return Status::kCorrupt;
        ads = aed.data() + kAedAds;
        len = aedLen;
        next = true;
        break;
      }
      if (node->extents.size() >= kMaxExtentsPerFile) return Status::kTooLarge;
      // Recorded and allocated extents occupy blocks of their partition
      // (ECMA-167 4/14.14.1.1), so together they can neither leave it nor
      // outgrow the image; only unallocated extents are free-standing holes.
      if (type == kExtentRecorded || type == kExtentAllocated) {
        if (!ExtentFits(where, length) || length > Capacity() - std::min(Capacity(), *allocated)) {
          Log("UDF: an extent of a file lies outside its partition\n");
          return Status::kCorrupt;
        }
        *allocated += length;
      }
      Extent e;
      e.fileOffset = *covered;
      e.length = static_cast<uint32_t>(std::min<uint64_t>(length, node->size - *covered));
      e.recorded = type == kExtentRecorded;
      e.where = where;
      node->extents.push_back(e);
      *covered += e.length;
    }
    if (!next) return Status::kOk;
  }
}

bool Volume::ExtentFits(LbAddr where, uint32_t length) const {
  if (where.part >= parts_.size()) return false;
  const Partition &p = parts_[where.part];
  uint64_t blocks = (static_cast<uint64_t>(length) + blockSize_ - 1) / blockSize_;
  switch (p.kind) {
    case Partition::kPhysical:
    case Partition::kSparable:
      return where.lbn <= p.length && blocks <= p.length - where.lbn;
    case Partition::kMetadata: {
      uint64_t metaBlocks = p.metadataFile.size / blockSize_;
      return where.lbn <= metaBlocks && blocks <= metaBlocks - where.lbn;
    }
    case Partition::kVirtual:
      return where.lbn <= p.vat.size() && blocks <= p.vat.size() - where.lbn;
  }
  return false;
}

uint64_t Volume::Capacity() const {
  if (sectors_ != 0) return sectors_ * blockSize_;
  uint64_t end = 0;
  for (const Partition &p : parts_) {
    end = std::max(end, (static_cast<uint64_t>(p.start) + p.length) * blockSize_);
  }
  return end;
}

Status Volume::ReadNode(const Node &node, uint64_t offset, void *buf, size_t len) {
  if (offset > node.size || len > node.size - offset) return Status::kIo;
  auto *out = static_cast<uint8_t *>(buf);
  if (node.embedded) {
    if (len != 0) std::memcpy(out, node.inlineData.data() + offset, len);
    return Status::kOk;
  }
  auto it = std::upper_bound(node.extents.begin(), node.extents.end(), offset,
                             [](uint64_t o, const Extent &e) { return o < e.fileOffset; });
  if (len != 0 && it == node.extents.begin()) return Status::kCorrupt;
  if (it != node.extents.begin()) --it;
  while (len > 0) {
    if (it == node.extents.end() || offset - it->fileOffset >= it->length) {
      return Status::kCorrupt;
    }
    uint64_t inner = offset - it->fileOffset;
    size_t n = static_cast<size_t>(std::min<uint64_t>(len, it->length - inner));
    if (it->recorded) {
      Status st = ReadBlocks(it->where, inner, out, n);
      if (st != Status::kOk) return st;
    } else {
      std::memset(out, 0, n);
    }
    out += n;
    offset += n;
    len -= n;
    ++it;
  }
  return Status::kOk;
}

}  // namespace tvx::udf
