// Internals of the read-only UDF reader.
//
// A UDF volume (ECMA-167 with the OSTA UDF profile) is found through an
// anchor volume descriptor pointer at sector 256 (or at the end of the
// image). The anchor names the volume descriptor sequence, which gives the
// logical volume (block size, partition maps, where the file set descriptor
// lives) and the partitions (where their blocks start on the medium). The
// file set descriptor names the root directory's ICB: a File Entry or
// Extended File Entry whose allocation descriptors say where the directory's
// bytes are. A directory is a stream of File Identifier Descriptors, each
// naming one child and its ICB.
//
// Everything read from the image is checked before use: descriptor tags
// (checksum, CRC, recorded location), lengths against the bytes that hold
// them, extents against their partition, and every chain (allocation extent
// descriptors, indirect entries, directory nesting) against a bound.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "platform/blocksource.h"
#include "platform/endian.h"
#include "platform/media_tree.h"

namespace tvx::udf {

// One status type inside the reader; the C binding turns it into NULL/FALSE.
enum class Status {
  kOk,
  kNotUdf,       // no anchor: the image is not UDF (quiet: callers probe)
  kIo,           // the source could not deliver bytes (truncated image)
  kCorrupt,      // a structure failed validation
  kUnsupported,  // valid UDF that this reader does not handle
  kNotFound,
  kNotDir,
  kIsDir,
  kLoop,         // a chain or the directory tree loops
  kTooLarge,     // a size beyond the reader's caps
};

const char *StatusText(Status s);

// Limits that keep hostile images from costing unbounded memory or time.
constexpr uint32_t kMaxVdsDescriptors = 4096;
constexpr uint32_t kMaxVdsPointers = 16;
constexpr uint32_t kMaxIndirectEntries = 16;
constexpr uint32_t kMaxAllocExtents = 65536;      // allocation extent descriptors per file
constexpr size_t kMaxExtentsPerFile = 1u << 20;   // allocation descriptors per file
constexpr uint64_t kMaxDirectoryBytes = 64u << 20;
constexpr uint32_t kMaxPathDepth = 256;
constexpr size_t kMaxPathLength = 4096;
constexpr uint64_t kMaxVatBytes = 64u << 20;
constexpr uint32_t kVatSearchSectors = 256;

// Descriptor tag identifiers (ECMA-167 3/7.2.1 and 4/7.2.1).
enum TagId : uint16_t {
  kTagPrimaryVolume = 1,
  kTagAnchor = 2,
  kTagVolumePointer = 3,
  kTagImplUseVolume = 4,
  kTagPartition = 5,
  kTagLogicalVolume = 6,
  kTagUnallocatedSpace = 7,
  kTagTerminating = 8,
  kTagIntegrity = 9,
  kTagFileSet = 256,
  kTagFileIdentifier = 257,
  kTagAllocExtent = 258,
  kTagIndirectEntry = 259,
  kTagTerminalEntry = 260,
  kTagFileEntry = 261,
  kTagExtendedFileEntry = 266,
};

constexpr size_t kTagSize = 16;

// Crc16 is the CRC of ECMA-167 3/7.2.6 (CRC-ITU-T, x^16+x^12+x^5+1, init 0).
uint16_t Crc16(const uint8_t *data, size_t len);

// CheckTag validates the 16-byte tag at the start of `buf` (of `len` bytes):
// identifier (`want`, or any when 0), checksum, CRC over the bytes that
// follow the tag, and the recorded location (skipped when `location` is
// UINT32_MAX). The CRC must fit in `len`.
Status CheckTag(const uint8_t *buf, size_t len, uint16_t want, uint32_t location);

// Decoding of OSTA CS0 text into UTF-8. The first byte is the compression id:
// 8 (or 254) for one byte per character (Latin-1), 16 (or 255) for UTF-16BE.
// Returns false on an unknown compression id. Unpaired surrogates become
// U+FFFD.
bool DecodeCs0(const uint8_t *p, size_t len, std::string *out);
// DecodeDstring decodes a fixed-size dstring field (ECMA-167 1/7.2.12): the
// last byte is the number of bytes in use. Trailing NULs are dropped.
std::string DecodeDstring(const uint8_t *p, size_t fieldLen);

// A logical block address within a partition (lb_addr, ECMA-167 4/7.1).
struct LbAddr {
  uint32_t lbn = 0;
  uint16_t part = 0;  // partition reference number: index into the maps
  bool operator==(const LbAddr &o) const { return lbn == o.lbn && part == o.part; }
};

// One piece of a file's data.
struct Extent {
  uint64_t fileOffset = 0;
  uint32_t length = 0;  // bytes
  bool recorded = true; // false: reads as zeros (allocated-unrecorded or sparse)
  LbAddr where;
};

// An opened ICB: the facts of one File Entry or Extended File Entry.
struct Node {
  LbAddr icb;
  uint8_t fileType = 0;
  uint64_t size = 0;
  bool embedded = false;
  std::vector<uint8_t> inlineData;  // embedded data (allocation type 3)
  std::vector<Extent> extents;      // sorted by fileOffset, contiguous
};

constexpr uint8_t kFileTypeDirectory = 4;
constexpr uint8_t kFileTypeSymlink = 12;

struct Partition {
  enum Kind { kPhysical, kSparable, kMetadata, kVirtual } kind = kPhysical;
  uint16_t number = 0;       // partition number from the map
  uint32_t start = 0;        // first sector (physical and sparable)
  uint32_t length = 0;       // blocks
  // Sparable: packet size and the remapped packets (original -> mapped).
  uint16_t packetLength = 0;
  std::vector<std::pair<uint32_t, uint32_t>> sparing;
  // Metadata and virtual: the partition whose blocks they are made of.
  uint16_t underlying = 0;
  // Metadata: the metadata file, whose extents lie in `underlying`.
  Node metadataFile;
  // Virtual: the allocation table, virtual block -> block of `underlying`.
  std::vector<uint32_t> vat;
};

class Volume {
 public:
  explicit Volume(BlockSourcePtr src) : src_(std::move(src)) {}

  // Mount finds the anchor and reads the volume structures down to the root.
  Status Mount();

  uint32_t BlockSize() const { return blockSize_; }
  const LbAddr &Root() const { return root_; }
  const std::string &VolumeId() const { return volumeId_; }

  // ReadBlocks reads `len` bytes starting `offset` bytes into the logical
  // block `at`, crossing into the following blocks of the same partition.
  Status ReadBlocks(LbAddr at, uint64_t offset, void *buf, size_t len);
  // ReadDescriptor reads the block at `at` and validates its tag.
  Status ReadDescriptor(LbAddr at, std::vector<uint8_t> *out, uint16_t wantTag);

  // LoadNode reads the ICB at `icb` with its allocation descriptors.
  Status LoadNode(LbAddr icb, Node *out);
  // ReadNode reads exactly `len` bytes at `offset` of the node's data.
  Status ReadNode(const Node &node, uint64_t offset, void *buf, size_t len);
  // Capacity is the size of the image in bytes, or, when the source cannot
  // tell, the end of its furthest partition.
  uint64_t Capacity() const;

 private:
  Status FindAnchor(uint32_t *mainLoc, uint32_t *mainLen, uint32_t *resLoc, uint32_t *resLen);
  Status ReadVds(uint32_t loc, uint32_t len);
  Status ParsePartitionMaps(const uint8_t *maps, size_t len, uint32_t count);
  Status LoadSparingTable(Partition *p, const uint8_t *map);
  Status OpenMetadata(Partition *p, uint32_t fileLoc, uint32_t mirrorLoc);
  Status FindUnderlying(Partition *p);
  Status OpenVat(Partition *p);
  Status LoadVat(Partition *p, uint32_t lbn);
  Status MapBlock(uint16_t part, uint32_t lbn, uint64_t *sector);
  Status ReadSectors(uint64_t sector, uint64_t offset, void *buf, size_t len);
  bool ExtentFits(LbAddr where, uint32_t length) const;
  Status ParseAllocation(Node *node, const uint8_t *ads, size_t len, int adType,
                         uint64_t *covered, uint64_t *allocated, std::vector<LbAddr> *chain);

  BlockSourcePtr src_;
  uint32_t blockSize_ = 2048;
  uint64_t sectors_ = 0;  // 0 when the source cannot tell its size
  std::vector<Partition> parts_;
  LbAddr root_;
  std::string volumeId_;

  // Raw facts of the volume descriptor sequence, kept while mounting.
  struct PdFacts {
    uint16_t number;
    uint32_t start, length, seq;
  };
  std::vector<PdFacts> pds_;
  std::vector<uint8_t> lvd_;
  uint32_t lvdSeq_ = 0;
  bool haveLvd_ = false;
};

// A directory's children, as read from its File Identifier Descriptors.
struct DirEntry {
  std::string name;  // UTF-8
  bool isDir = false;
  bool usable = true;  // false: the name cannot be one path component
  LbAddr icb;
};

// ReadDirectory lists the directory `node`; parent and deleted entries are
// left out, entries whose names cannot be a path component are marked.
Status ReadDirectory(Volume *vol, const Node &node, std::vector<DirEntry> *out);

// Lookup resolves `path` (components separated by "/") from the directory
// whose ICB chain from the root is `chain` (chain.back() is the start).
// On success `node` is the target and `chain` is extended through the
// directories passed; the target is appended too.
Status Lookup(Volume *vol, std::vector<LbAddr> *chain, const std::string &path, Node *node);

// TreeSource over a mounted volume for the shared walk and extractor
// (platform/media_tree.h).
std::unique_ptr<media::TreeSource> NewTreeSource(Volume *vol);

}  // namespace tvx::udf
