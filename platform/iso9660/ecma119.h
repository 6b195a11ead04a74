// On-disk layout of ECMA-119 volumes as this reader needs it: the offsets of
// the volume descriptor and directory record fields, and checked readers for
// the both-endian numbers they hold.
#pragma once

#include <cstddef>
#include <cstdint>

#include "platform/endian.h"

namespace tvx::iso9660 {

constexpr uint32_t kBlockSize = 2048;
constexpr uint64_t kFirstDescriptorBlock = 16;

// Volume descriptor (ECMA-119 8.1, 8.4, 8.5).
constexpr size_t kVdType = 0;
constexpr size_t kVdId = 1;  // "CD001"
constexpr size_t kVdVersion = 6;
constexpr size_t kVdVolumeId = 40;
constexpr size_t kVdVolumeIdLen = 32;
constexpr size_t kVdSpaceSize = 80;       // both-endian 32
constexpr size_t kVdEscapes = 88;         // supplementary: Joliet level marks
constexpr size_t kVdLogicalBlockSize = 128;  // both-endian 16
constexpr size_t kVdRootRecord = 156;
constexpr size_t kVdRootRecordLen = 34;
static_assert(kVdRootRecord + kVdRootRecordLen == 190, "root record ends at BP 190");

constexpr uint8_t kVdTypeBoot = 0;
constexpr uint8_t kVdTypePrimary = 1;
constexpr uint8_t kVdTypeSupplementary = 2;
constexpr uint8_t kVdTypeTerminator = 255;

// Directory record (ECMA-119 9.1).
constexpr size_t kDrLength = 0;
constexpr size_t kDrExtAttrLength = 1;
constexpr size_t kDrExtent = 2;     // both-endian 32
constexpr size_t kDrDataLength = 10;  // both-endian 32
constexpr size_t kDrFlags = 25;
constexpr size_t kDrNameLength = 32;
constexpr size_t kDrName = 33;
static_assert(kDrName == 33, "file identifier starts at BP 34");

constexpr uint8_t kFlagHidden = 0x01;
constexpr uint8_t kFlagDirectory = 0x02;
constexpr uint8_t kFlagAssociated = 0x04;
constexpr uint8_t kFlagMultiExtent = 0x80;

// Both32 reads a both-byte-order number (ECMA-119 7.3.3); false when the two
// copies disagree. The caller has checked that 8 bytes are there.
inline bool Both32(const uint8_t *p, uint32_t *out) {
  *out = LoadLe32(p);
  return *out == LoadBe32(p + 4);
}
inline bool Both16(const uint8_t *p, uint16_t *out) {
  *out = LoadLe16(p);
  return *out == LoadBe16(p + 2);
}

}  // namespace tvx::iso9660
