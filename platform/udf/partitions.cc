// Partition maps: from (partition reference, logical block) to a sector.
//
// Three kinds are read. A type 1 map is a plain partition: its blocks follow
// its start sector. A sparable partition (rewritable optical media) is the
// same except for packets that a sparing table moved elsewhere. A metadata
// partition (UDF 2.50 and later) has no sectors of its own: its blocks are
// the bytes of the metadata file, a file in the underlying partition, so
// every metadata block goes through that file's extents. A virtual partition
// (sequentially written media) maps its blocks through the virtual allocation
// table, a file recorded last on the medium.
#include <algorithm>
#include <cstring>

#include "platform/log.h"
#include "platform/udf/udf_internal.h"

namespace tvx::udf {

namespace {

constexpr uint8_t kMapType1 = 1;
constexpr uint8_t kMapType2 = 2;
constexpr size_t kMapType1Len = 6;
constexpr size_t kMapType2Len = 64;
constexpr uint32_t kMaxPartitionMaps = 64;

// Type 2 map fields (OSTA UDF 2.2.8 to 2.2.10).
constexpr size_t kMapIdent = 5;  // regid identifier, after its flags byte
constexpr size_t kMapPartNumber = 38;
constexpr size_t kSparPacketLength = 40;
constexpr size_t kSparTableCount = 42;
constexpr size_t kSparTableSize = 44;
constexpr size_t kSparTableLocations = 48;
constexpr size_t kMetaFileLocation = 40;
constexpr size_t kMetaMirrorLocation = 44;

// Sparing table (OSTA UDF 2.2.12).
constexpr size_t kSpTableIdent = 17;
constexpr size_t kSpTableEntries = 48;
constexpr size_t kSpTableMap = 56;
constexpr uint32_t kMaxSparingTableSize = 1u << 20;
constexpr uint32_t kSpFirstReserved = 0xFFFFFFF0;  // available and defective entries

// Virtual allocation table (OSTA UDF 2.2.11; 1.50 form in UDF 1.50 2.2.10).
constexpr uint8_t kFileTypeVat = 248;
constexpr size_t kVatHeaderMin = 152;
constexpr size_t kVat150Trailer = 36;
constexpr uint32_t kVatUnused = 0xFFFFFFFF;

constexpr uint8_t kFileTypeMetadata = 250;
constexpr uint8_t kFileTypeMetadataMirror = 251;

bool IdentIs(const uint8_t *map, const char *name) {
  size_t n = std::strlen(name);
  return std::memcmp(map + kMapIdent, name, n) == 0;
}

}  // namespace

Status Volume::ParsePartitionMaps(const uint8_t *maps, size_t len, uint32_t count) {
  if (count == 0 || count > kMaxPartitionMaps) {
    Log("UDF: %u partition maps\n", count);
    return Status::kCorrupt;
  }
  struct Pending {
    size_t index;
    uint32_t file, mirror;
  };
  std::vector<Pending> pending;
  size_t pos = 0;
  for (uint32_t i = 0; i < count; i++) {
    if (len - pos < 2 || maps[pos + 1] < 2 || maps[pos + 1] > len - pos) {
      Log("UDF: partition map %u is cut short\n", i);
      return Status::kCorrupt;
    }
    const uint8_t *m = maps + pos;
    uint8_t type = m[0], mlen = m[1];
    pos += mlen;
    Partition p;
    if (type == kMapType1 && mlen == kMapType1Len) {
      p.kind = Partition::kPhysical;
      p.number = LoadLe16(m + 4);
    } else if (type == kMapType2 && mlen == kMapType2Len) {
      p.number = LoadLe16(m + kMapPartNumber);
      if (IdentIs(m, "*UDF Sparable Partition")) {
        p.kind = Partition::kSparable;
      } else if (IdentIs(m, "*UDF Metadata Partition")) {
        p.kind = Partition::kMetadata;
        pending.push_back({parts_.size(), LoadLe32(m + kMetaFileLocation),
                           LoadLe32(m + kMetaMirrorLocation)});
      } else if (IdentIs(m, "*UDF Virtual Partition")) {
        p.kind = Partition::kVirtual;
        pending.push_back({parts_.size(), 0, 0});
      } else {
        Log("UDF: partition map %u is of an unsupported kind\n", i);
        return Status::kUnsupported;
      }
    } else {
      Log("UDF: partition map %u has type %u and length %u\n", i, type, mlen);
      return Status::kCorrupt;
    }
    if (p.kind == Partition::kPhysical || p.kind == Partition::kSparable) {
      auto pd = std::find_if(pds_.begin(), pds_.end(),
                             [&](const PdFacts &f) { return f.number == p.number; });
      if (pd == pds_.end()) {
        Log("UDF: partition %u has no partition descriptor\n", p.number);
        return Status::kCorrupt;
      }
      p.start = pd->start;
      p.length = pd->length;
      if (sectors_ != 0 && p.start >= sectors_) {
        Log("UDF: partition %u starts past the end of the image\n", p.number);
        return Status::kCorrupt;
      }
    }
    parts_.push_back(std::move(p));
    if (parts_.back().kind == Partition::kSparable) {
      Status st = LoadSparingTable(&parts_.back(), m);
      if (st != Status::kOk) return st;
    }
  }
  // Both kinds read their table through the underlying partition, so they
  // are opened once every map is known.
  for (const Pending &pm : pending) {
    Partition *p = &parts_[pm.index];
    Status st = FindUnderlying(p);
    if (st == Status::kOk) {
      st = p->kind == Partition::kMetadata ? OpenMetadata(p, pm.file, pm.mirror) : OpenVat(p);
    }
    if (st != Status::kOk) return st;
  }
  return Status::kOk;
}

Status Volume::LoadSparingTable(Partition *p, const uint8_t *map) {
  p->packetLength = LoadLe16(map + kSparPacketLength);
  uint8_t tables = map[kSparTableCount];
  uint32_t size = LoadLe32(map + kSparTableSize);
  if (p->packetLength == 0 || tables == 0 || tables > 4 || size < kSpTableMap ||
      size > kMaxSparingTableSize) {
    Log("UDF: sparable partition %u has a bad sparing table description\n", p->number);
    return Status::kCorrupt;
  }
  std::vector<uint8_t> buf(size);
  // Every copy holds the same table; the first one that reads and validates
  // is used.
  for (uint8_t t = 0; t < tables; t++) {
    uint32_t loc = LoadLe32(map + kSparTableLocations + 4u * t);
    if (ReadSectors(loc, 0, buf.data(), buf.size()) != Status::kOk) continue;
    if (CheckTag(buf.data(), buf.size(), 0, loc) != Status::kOk) continue;
    if (std::memcmp(buf.data() + kSpTableIdent, "*UDF Sparing Table", 18) != 0) continue;
    uint32_t entries = LoadLe16(buf.data() + kSpTableEntries);
    if (kSpTableMap + 8ull * entries > size) continue;
    for (uint32_t e = 0; e < entries; e++) {
      const uint8_t *ent = buf.data() + kSpTableMap + 8u * e;
      uint32_t original = LoadLe32(ent);
      if (original < kSpFirstReserved) p->sparing.emplace_back(original, LoadLe32(ent + 4));
    }
    std::sort(p->sparing.begin(), p->sparing.end());
    return Status::kOk;
  }
  Log("UDF: sparable partition %u has no readable sparing table\n", p->number);
  return Status::kCorrupt;
}

Status Volume::FindUnderlying(Partition *p) {
  auto under = std::find_if(parts_.begin(), parts_.end(), [&](const Partition &q) {
    return (q.kind == Partition::kPhysical || q.kind == Partition::kSparable) &&
           q.number == p->number;
  });
  if (under == parts_.end()) {
    Log("UDF: partition %u has no underlying partition\n", p->number);
    return Status::kCorrupt;
  }
  p->underlying = static_cast<uint16_t>(under - parts_.begin());
  return Status::kOk;
}

Status Volume::OpenVat(Partition *p) {
  // The table is the last file written: found from the end of the image,
  // which a caller's callbacks cannot tell.
  const Partition &under = parts_[p->underlying];
  if (sectors_ != 0) {
    for (uint64_t s = sectors_ - 1; s >= under.start && s + kVatSearchSectors >= sectors_; s--) {
      uint64_t lbn = s - under.start;
      if (lbn < under.length && LoadVat(p, static_cast<uint32_t>(lbn)) == Status::kOk) {
        return Status::kOk;
      }
      if (s == 0) break;
    }
  }
  Log("UDF: no virtual allocation table for partition %u\n", p->number);
  return Status::kUnsupported;
}

Status Volume::LoadVat(Partition *p, uint32_t lbn) {
  Node node;
  Status st = LoadNode(LbAddr{lbn, p->underlying}, &node);
  if (st != Status::kOk) return st;
  size_t header = 0, trailer = 0;
  if (node.fileType == kFileTypeVat) {
    header = 1;  // length read from the table itself below
  } else if (node.fileType == 0 && node.size >= kVat150Trailer) {
    trailer = kVat150Trailer;  // the older form ends with its identifier
  } else {
    return Status::kNotFound;
  }
  if (node.size > kMaxVatBytes) return Status::kTooLarge;
  std::vector<uint8_t> data(static_cast<size_t>(node.size));
  st = ReadNode(node, 0, data.data(), data.size());
  if (st != Status::kOk) return st;
  if (header != 0) {
    if (data.size() < kVatHeaderMin) return Status::kCorrupt;
    header = LoadLe16(data.data());
    if (header < kVatHeaderMin || header > data.size()) return Status::kCorrupt;
  } else if (std::memcmp(data.data() + data.size() - trailer + 1, "*UDF Virtual Alloc Tbl", 22) !=
             0) {
    return Status::kNotFound;
  }
  size_t count = (data.size() - header - trailer) / 4;
  p->vat.resize(count);
  for (size_t i = 0; i < count; i++) p->vat[i] = LoadLe32(data.data() + header + 4 * i);
  return Status::kOk;
}

Status Volume::OpenMetadata(Partition *p, uint32_t fileLoc, uint32_t mirrorLoc) {
  // The mirror holds the same blocks; it is there for a damaged main file.
  Status st = Status::kCorrupt;
  for (int copy = 0; copy < 2; copy++) {
    Node node;
    uint32_t loc = copy == 0 ? fileLoc : mirrorLoc;
    st = LoadNode(LbAddr{loc, p->underlying}, &node);
    if (st != Status::kOk) continue;
    uint8_t want = copy == 0 ? kFileTypeMetadata : kFileTypeMetadataMirror;
    bool ok = node.fileType == want && !node.embedded;
    for (const Extent &e : node.extents) {
      // Metadata blocks must resolve in the underlying partition, or mapping
      // one would recurse into the metadata partition itself.
      if (e.where.part != p->underlying || !e.recorded) ok = false;
    }
    if (!ok) {
      st = Status::kCorrupt;
      continue;
    }
    p->metadataFile = std::move(node);
    return Status::kOk;
  }
  Log("UDF: cannot read the metadata file of partition %u (%s)\n", p->number, StatusText(st));
  return st;
}

Status Volume::MapBlock(uint16_t part, uint32_t lbn, uint64_t *sector) {
  if (part >= parts_.size()) return Status::kCorrupt;
  const Partition &p = parts_[part];
  switch (p.kind) {
    case Partition::kPhysical:
      if (lbn >= p.length) return Status::kCorrupt;
      *sector = static_cast<uint64_t>(p.start) + lbn;
      return Status::kOk;
    case Partition::kSparable: {
      if (lbn >= p.length) return Status::kCorrupt;
      uint32_t packet = lbn - lbn % p.packetLength;
      auto it = std::lower_bound(p.sparing.begin(), p.sparing.end(),
                                 std::make_pair(packet, uint32_t{0}));
      if (it != p.sparing.end() && it->first == packet) {
        *sector = static_cast<uint64_t>(it->second) + (lbn - packet);
      } else {
        *sector = static_cast<uint64_t>(p.start) + lbn;
      }
      return Status::kOk;
    }
    case Partition::kMetadata: {
      const std::vector<Extent> &ext = p.metadataFile.extents;
      uint64_t off = static_cast<uint64_t>(lbn) * blockSize_;
      auto it = std::upper_bound(ext.begin(), ext.end(), off,
                                 [](uint64_t o, const Extent &e) { return o < e.fileOffset; });
      if (it == ext.begin()) return Status::kCorrupt;
      --it;
      if (off - it->fileOffset >= it->length) return Status::kCorrupt;
      uint64_t inner = it->where.lbn + (off - it->fileOffset) / blockSize_;
      if (inner > UINT32_MAX) return Status::kCorrupt;
      return MapBlock(it->where.part, static_cast<uint32_t>(inner), sector);
    }
    case Partition::kVirtual:
      if (lbn >= p.vat.size() || p.vat[lbn] == kVatUnused) return Status::kCorrupt;
      return MapBlock(p.underlying, p.vat[lbn], sector);
  }
  return Status::kCorrupt;
}

Status Volume::ReadBlocks(LbAddr at, uint64_t offset, void *buf, size_t len) {
  if (at.part >= parts_.size()) return Status::kCorrupt;
  auto *out = static_cast<uint8_t *>(buf);
  const Partition &p = parts_[at.part];
  if (len == 0) return Status::kOk;
  uint64_t first = at.lbn + offset / blockSize_;
  uint64_t last = at.lbn + (offset + len - 1) / blockSize_;
  if (p.kind == Partition::kPhysical ||
      (p.kind == Partition::kSparable && p.sparing.empty())) {
    // One read for the whole run: the common case, and the fast one.
    if (last >= p.length) return Status::kCorrupt;
    return ReadSectors(p.start + first, offset % blockSize_, out, len);
  }
  if (last > UINT32_MAX) return Status::kCorrupt;
  uint64_t inBlock = offset % blockSize_;
  for (uint64_t b = first; b <= last; b++) {
    size_t n = static_cast<size_t>(std::min<uint64_t>(len, blockSize_ - inBlock));
    uint64_t sector;
    Status st = MapBlock(at.part, static_cast<uint32_t>(b), &sector);
    if (st != Status::kOk) return st;
    st = ReadSectors(sector, inBlock, out, n);
    if (st != Status::kOk) return st;
    out += n;
    len -= n;
    inBlock = 0;
  }
  return Status::kOk;
}

}  // namespace tvx::udf
