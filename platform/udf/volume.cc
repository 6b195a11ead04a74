// Mounting: anchor, volume descriptor sequence, logical volume and file set.
//
// The sector size is not recorded anywhere before the logical volume
// descriptor, so the anchor is looked for at sector 256 for each usual size
// (2048 for optical media, 512/1024/4096 for disk images). Only a tag that
// passes checksum, CRC and its recorded location counts, which is what keeps
// a pure ISO 9660 image (or anything else) from being mistaken for UDF.
#include <cstring>

#include "platform/log.h"
#include "platform/udf/udf_internal.h"

namespace tvx::udf {

namespace {

// Anchor volume descriptor pointer (ECMA-167 3/10.2).
constexpr size_t kAvdpSize = 512;
constexpr size_t kAvdpMainVds = 16;     // extent_ad: length, location
constexpr size_t kAvdpReserveVds = 24;

// Volume descriptor pointer (3/10.3) and partition descriptor (3/10.5).
constexpr size_t kVdSeqNumber = 16;
constexpr size_t kVdpNextExtent = 20;
constexpr size_t kPdNumber = 22;
constexpr size_t kPdStart = 188;
constexpr size_t kPdLength = 192;

// Logical volume descriptor (3/10.6).
constexpr size_t kLvdIdentifier = 84;
constexpr size_t kLvdIdentifierLen = 128;
constexpr size_t kLvdBlockSize = 212;
constexpr size_t kLvdFsdLocation = 248;  // long_ad in LogicalVolumeContentsUse
constexpr size_t kLvdMapTableLength = 264;
constexpr size_t kLvdMapCount = 268;
constexpr size_t kLvdMaps = 440;

// File set descriptor (4/14.1).
constexpr size_t kFsdRootIcb = 400;

constexpr uint32_t kBlockSizes[] = {2048, 512, 1024, 4096};

LbAddr LongAdLocation(const uint8_t *ad) { return LbAddr{LoadLe32(ad + 4), LoadLe16(ad + 8)}; }

}  // namespace

Status Volume::ReadSectors(uint64_t sector, uint64_t offset, void *buf, size_t len) {
  uint64_t pos = sector * blockSize_;
  if (sector > UINT64_MAX / blockSize_ || pos > UINT64_MAX - offset) return Status::kCorrupt;
  pos += offset;
  if (sectors_ != 0) {
    uint64_t size = sectors_ * blockSize_;
    if (pos > size || len > size - pos) return Status::kIo;
  }
  return src_->ReadAt(pos, buf, len) ? Status::kOk : Status::kIo;
}

Status Volume::FindAnchor(uint32_t *mainLoc, uint32_t *mainLen, uint32_t *resLoc,
                          uint32_t *resLen) {
  uint8_t avdp[kAvdpSize];
  uint64_t bytes = src_->Size();
  for (uint32_t bs : kBlockSizes) {
    blockSize_ = bs;
    sectors_ = bytes / bs;
    // Sector 256 first; then the last sector and 256 before it, where
    // mastering tools put the other copies.
    uint64_t candidates[3] = {256, 0, 0};
    int n = 1;
    if (sectors_ > 257) {
      candidates[n++] = sectors_ - 1;
      candidates[n++] = sectors_ - 257;
    }
    for (int i = 0; i < n; i++) {
      uint64_t at = candidates[i];
      if (at > UINT32_MAX) continue;
      if (ReadSectors(at, 0, avdp, sizeof avdp) != Status::kOk) continue;
      if (CheckTag(avdp, sizeof avdp, kTagAnchor, static_cast<uint32_t>(at)) != Status::kOk) {
        continue;
      }
      *mainLen = LoadLe32(avdp + kAvdpMainVds);
      *mainLoc = LoadLe32(avdp + kAvdpMainVds + 4);
      *resLen = LoadLe32(avdp + kAvdpReserveVds);
      *resLoc = LoadLe32(avdp + kAvdpReserveVds + 4);
      return Status::kOk;
    }
  }
  return Status::kNotUdf;
}

Status Volume::ReadVds(uint32_t loc, uint32_t len) {
  std::vector<uint8_t> buf(blockSize_);
  uint32_t descriptors = 0;
  uint32_t pointers = 0;
  uint32_t blocks = len / blockSize_;
  uint32_t i = 0;
  while (i < blocks) {
    if (++descriptors > kMaxVdsDescriptors) return Status::kTooLarge;
    uint64_t sector = static_cast<uint64_t>(loc) + i++;
    if (sector > UINT32_MAX) return Status::kCorrupt;
    Status st = ReadSectors(sector, 0, buf.data(), buf.size());
    if (st != Status::kOk) return st;
    // The sequence ends at a terminating descriptor or at the first block
    // that holds no valid descriptor (ECMA-167 3/8.4.2).
    if (CheckTag(buf.data(), buf.size(), 0, static_cast<uint32_t>(sector)) != Status::kOk) break;
    uint16_t id = LoadLe16(buf.data());
    if (id == kTagTerminating) break;
    uint32_t seq = LoadLe32(buf.data() + kVdSeqNumber);
    if (id == kTagVolumePointer) {
      if (++pointers > kMaxVdsPointers) return Status::kLoop;
      len = LoadLe32(buf.data() + kVdpNextExtent);
      loc = LoadLe32(buf.data() + kVdpNextExtent + 4);
      blocks = len / blockSize_;
      i = 0;
      continue;
    }
    if (id == kTagPartition) {
      PdFacts pd{LoadLe16(buf.data() + kPdNumber), LoadLe32(buf.data() + kPdStart),
                 LoadLe32(buf.data() + kPdLength), seq};
      bool replaced = false;
      for (auto &old : pds_) {
        if (old.number != pd.number) continue;
        if (pd.seq >= old.seq) old = pd;
        replaced = true;
      }
      if (!replaced) pds_.push_back(pd);
    } else if (id == kTagLogicalVolume) {
      if (!haveLvd_ || seq >= lvdSeq_) {
        lvd_ = buf;
        lvdSeq_ = seq;
        haveLvd_ = true;
      }
    }
  }
  return Status::kOk;
}

Status Volume::Mount() {
  uint32_t mainLoc, mainLen, resLoc, resLen;
  Status st = FindAnchor(&mainLoc, &mainLen, &resLoc, &resLen);
  if (st != Status::kOk) return st;

  st = ReadVds(mainLoc, mainLen);
  if (st != Status::kOk || !haveLvd_ || pds_.empty()) {
    // The reserve copy exists for exactly this case.
    pds_.clear();
    haveLvd_ = false;
    Status rst = ReadVds(resLoc, resLen);
    if (rst != Status::kOk) st = rst;
  }
  if (!haveLvd_ || pds_.empty()) {
    Log("UDF: no usable volume descriptor sequence (%s)\n",
        StatusText(st == Status::kOk ? Status::kCorrupt : st));
    return st == Status::kOk ? Status::kCorrupt : st;
  }

  const uint8_t *lvd = lvd_.data();
  uint32_t lbs = LoadLe32(lvd + kLvdBlockSize);
  if (lbs != blockSize_) {
    Log("UDF: logical block size %u differs from the sector size %u\n", lbs, blockSize_);
    return Status::kUnsupported;
  }
  volumeId_ = DecodeDstring(lvd + kLvdIdentifier, kLvdIdentifierLen);
  uint32_t mapLen = LoadLe32(lvd + kLvdMapTableLength);
  if (mapLen > lvd_.size() - kLvdMaps) {
    Log("UDF: partition map table of %u bytes does not fit its descriptor\n", mapLen);
    return Status::kCorrupt;
  }
  st = ParsePartitionMaps(lvd + kLvdMaps, mapLen, LoadLe32(lvd + kLvdMapCount));
  if (st != Status::kOk) return st;

  LbAddr fsdAt = LongAdLocation(lvd + kLvdFsdLocation);
  std::vector<uint8_t> fsd;
  st = ReadDescriptor(fsdAt, &fsd, kTagFileSet);
  if (st != Status::kOk) {
    Log("UDF: cannot read the file set descriptor (%s)\n", StatusText(st));
    return st;
  }
  root_ = LongAdLocation(fsd.data() + kFsdRootIcb);
  Node root;
  st = LoadNode(root_, &root);
  if (st == Status::kOk && root.fileType != kFileTypeDirectory) st = Status::kNotDir;
  if (st != Status::kOk) {
    Log("UDF: cannot read the root directory (%s)\n", StatusText(st));
    return st;
  }
  lvd_.clear();
  pds_.clear();
  return Status::kOk;
}

Status Volume::ReadDescriptor(LbAddr at, std::vector<uint8_t> *out, uint16_t wantTag) {
  out->assign(blockSize_, 0);
  Status st = ReadBlocks(at, 0, out->data(), out->size());
  if (st != Status::kOk) return st;
  return CheckTag(out->data(), out->size(), wantTag, at.lbn);
}

}  // namespace tvx::udf
