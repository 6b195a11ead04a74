// Volume recognition. An ECMA-119 volume starts with a set of 2048-byte volume
// descriptors at block 16, ended by a terminator (type 255): the primary
// descriptor holds the volume identifier and the root of the ISO 9660 tree; a
// supplementary descriptor with a Joliet escape sequence holds the root of
// the UCS-2 tree. Rock Ridge announces itself in the SUSP area of the root's
// "." record. Nothing beyond the descriptors is trusted until checked.
#include <algorithm>
#include <cstring>

#include "tvx_iso9660.h"
#include "platform/iso9660/ecma119.h"
#include "platform/iso9660/image.h"
#include "platform/iso9660/names.h"
#include "platform/log.h"

namespace tvx::iso9660 {
namespace {

// A set with more descriptors than this is not a real one; the bound keeps a
// missing terminator from turning into a scan of the whole image.
constexpr uint64_t kMaxDescriptors = 64;

bool IsJolietEscape(const uint8_t *esc) {
  // ECMA-35 escape sequences of UCS-2 levels 1 to 3 (Joliet).
  return esc[0] == '%' && esc[1] == '/' && (esc[2] == '@' || esc[2] == 'C' || esc[2] == 'E');
}

// RootRecord reads the 34-byte root directory record of a descriptor.
int RootRecord(const uint8_t *vd, Extent *out) {
  const uint8_t *r = vd + kVdRootRecord;
  uint32_t block, length;
  if (r[kDrLength] < kVdRootRecordLen || !Both32(r + kDrExtent, &block) ||
      !Both32(r + kDrDataLength, &length) || !(r[kDrFlags] & kFlagDirectory)) {
    Log("Iso9660: invalid root directory record\n");
    return ISO9660_ERR_CORRUPT;
  }
  if (length == 0 || length > kMaxDirectoryBytes) {
    Log("Iso9660: root directory length %u out of range\n", length);
    return ISO9660_ERR_CORRUPT;
  }
  out->offset = static_cast<uint64_t>(block) * kBlockSize;
  out->length = length;
  return ISO9660_OK;
}

std::string VolumeIdText(const uint8_t *vd) {
  std::string id(reinterpret_cast<const char *>(vd + kVdVolumeId), kVdVolumeIdLen);
  while (!id.empty() && (id.back() == ' ' || id.back() == '\0')) id.pop_back();
  id.erase(std::find(id.begin(), id.end(), '\0'), id.end());
  return ToUtf8(id);
}

// RootSystemUse reads the SUSP area of the root's "." record: the "SP" entry
// there says SUSP is used (and how many bytes to skip in every other record),
// and an "ER" entry or RRIP entries say it carries Rock Ridge.
void RootSystemUse(BlockSource &src, const VolumeFacts &facts, SystemUse *su) {
  uint8_t block[kBlockSize];
  if (facts.primaryRoot.offset + kBlockSize > facts.limit ||
      !src.ReadAt(facts.primaryRoot.offset, block, sizeof block)) {
    return;
  }
  size_t len = block[kDrLength];
  if (len < kDrName + 1 || len > sizeof block) return;
  size_t nameLen = block[kDrNameLength];
  size_t start = kDrName + nameLen + (nameLen % 2 == 0 ? 1 : 0);
  if (start >= len) return;
  std::string_view area(reinterpret_cast<const char *>(block) + start, len - start);
  uint64_t limit = facts.limit;
  ParseSystemUse(area,
                 [&src, limit](uint64_t offset, size_t n, std::string *out) {
                   if (offset > limit || n > limit - offset) return false;
                   out->assign(n, '\0');
                   return src.ReadAt(offset, out->data(), n);
                 },
                 su);
}

}  // namespace

int ReadVolume(BlockSource &src, VolumeFacts *out) {
  *out = VolumeFacts{};
  uint8_t vd[kBlockSize];
  bool havePrimary = false;
  uint64_t spaceBlocks = 0;
  for (uint64_t i = 0; i < kMaxDescriptors; ++i) {
    uint64_t block = kFirstDescriptorBlock + i;
    if (!src.ReadAt(block * kBlockSize, vd, sizeof vd)) {
      if (i == 0) return ISO9660_ERR_FORMAT;
      break;  // a set cut short after its primary descriptor still serves
    }
    if (std::memcmp(vd + kVdId, "CD001", 5) != 0) {
      if (i == 0) return ISO9660_ERR_FORMAT;
      // Some bridge images follow the set with the UDF recognition sequence
      // without a terminator; the set ends where "CD001" stops.
      break;
    }
    uint8_t type = vd[kVdType];
    if (type == kVdTypeTerminator) break;
    if (type == kVdTypePrimary && !havePrimary) {
      uint16_t blockSize;
      if (!Both16(vd + kVdLogicalBlockSize, &blockSize) || blockSize != kBlockSize) {
        Log("Iso9660: unsupported logical block size\n");
        return ISO9660_ERR_CORRUPT;
      }
      uint32_t space;
      if (!Both32(vd + kVdSpaceSize, &space)) {
        Log("Iso9660: volume space size copies disagree\n");
        return ISO9660_ERR_CORRUPT;
      }
      int rc = RootRecord(vd, &out->primaryRoot);
      if (rc != ISO9660_OK) return rc;
      spaceBlocks = space;
      out->volumeId = VolumeIdText(vd);
      havePrimary = true;
      // The volume set size, sequence number and the reserved bytes are not
      // checked: several mastering tools leave them 0 or fill them with blanks.
    } else if (type == kVdTypeSupplementary && vd[kVdVersion] == 1 &&
               IsJolietEscape(vd + kVdEscapes) && !(out->formats & ISO9660_FORMAT_JOLIET)) {
      if (RootRecord(vd, &out->jolietRoot) == ISO9660_OK) out->formats |= ISO9660_FORMAT_JOLIET;
    }
  }
  if (!havePrimary) return ISO9660_ERR_FORMAT;
  out->formats |= ISO9660_FORMAT_PLAIN;
  uint64_t size = src.Size();
  out->limit = size != 0 ? size : spaceBlocks * kBlockSize;
  auto inside = [&](const Extent &e) {
    return e.offset <= out->limit && e.length <= out->limit - e.offset;
  };
  if (!inside(out->primaryRoot)) {
    Log("Iso9660: root directory lies beyond the end of the image\n");
    return ISO9660_ERR_CORRUPT;
  }
  if ((out->formats & ISO9660_FORMAT_JOLIET) && !inside(out->jolietRoot)) {
    out->formats &= ~ISO9660_FORMAT_JOLIET;
  }
  SystemUse su;
  RootSystemUse(src, *out, &su);
  if (su.hasSp && su.rockRidge) {
    out->formats |= ISO9660_FORMAT_ROCKRIDGE;
    out->suspSkip = su.skip;
  }
  return ISO9660_OK;
}

}  // namespace tvx::iso9660
