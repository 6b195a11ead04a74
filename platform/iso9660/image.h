// The reader's core: an opened ISO 9660 volume, its directory listings and
// path resolution. The C binding (binding.cc) and extraction (extract.cc)
// stand on it; result codes are those of tvx_iso9660.h.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/blocksource.h"
#include "platform/media_tree.h"

namespace tvx::iso9660 {

// Byte range of the image.
struct Extent {
  uint64_t offset = 0;
  uint64_t length = 0;
};

// One entry of a directory listing, after names and multi-extent records have
// been folded together.
struct Node {
  std::string name;      // UTF-8, full length
  bool isDir = false;
  bool isSymlink = false;
  uint64_t size = 0;
  std::vector<Extent> extents;  // a directory has exactly one
};

struct Listing {
  Extent where;
  std::vector<Node> nodes;
};
using ListingPtr = std::shared_ptr<const Listing>;

// What the volume descriptors and the root say, before a name format is
// chosen.
struct VolumeFacts {
  std::string volumeId;
  uint32_t formats = 0;   // ISO9660_FORMAT_* present
  Extent primaryRoot;
  Extent jolietRoot;
  uint64_t limit = 0;     // no extent may end beyond this byte
  uint8_t suspSkip = 0;
};

// ReadVolume reads the descriptor set and the root's SUSP header.
int ReadVolume(BlockSource &src, VolumeFacts *out);

class Image {
 public:
  // Open chooses the name format from `mode` (see tvx_iso9660.h) and takes
  // the source.
  static int Open(BlockSourcePtr src, uint32_t mode, std::unique_ptr<Image> *out);

  const std::string &VolumeId() const { return facts_.volumeId; }
  uint32_t Formats() const { return facts_.formats; }
  uint32_t NameFormat() const { return nameFormat_; }
  const Node &Root() const { return root_; }

  // List returns the entries of directory node `dir` (cached).
  int List(const Node &dir, ListingPtr *out);
  // Resolve finds the node a "/"-separated path names: per component an exact
  // match first, then one that ignores ASCII letter case.
  int Resolve(std::string_view path, Node *out);
  // CheckExtents fails with ISO9660_ERR_CORRUPT when a file's data lies
  // outside the image, adds up past its size or overlaps itself.
  int CheckExtents(const Node &file) const;
  // ReadNodeAt reads exactly `len` bytes at `offset` of a file's data.
  int ReadNodeAt(const Node &file, uint64_t offset, void *buf, size_t len);
  uint64_t Limit() const { return facts_.limit; }
  // ReadAt reads image bytes; ISO9660_ERR_IO when the source cannot.
  int ReadAt(uint64_t offset, void *buf, size_t len);

 private:
  Image(BlockSourcePtr src, const VolumeFacts &facts, uint32_t nameFormat);
  int Load(const Extent &where, Listing *out);
  int DirectoryLength(uint32_t block, uint64_t *out);

  BlockSourcePtr src_;
  VolumeFacts facts_;
  uint32_t nameFormat_;
  Node root_;
  std::map<std::pair<uint64_t, uint64_t>, ListingPtr> cache_;
};

// Limits on what a hostile image can make the reader do.
constexpr uint64_t kMaxDirectoryBytes = 16u << 20;
constexpr size_t kMaxPathDepth = 256;
constexpr size_t kMaxCachedListings = 64;

}  // namespace tvx::iso9660

namespace tvx::iso9660 {

// FileReader reads a file node front to back across its extents.
class FileReader {
 public:
  explicit FileReader(Node node) : node_(std::move(node)) {}
  const Node &File() const { return node_; }
  // Read fills up to *inout_len bytes: ISO9660_OK with the count, ISO9660_END
  // (count 0) at the end, or a failure.
  int Read(Image &image, void *buf, size_t *inout_len);
  void Rewind() { pos_ = 0; }

 private:
  Node node_;
  uint64_t pos_ = 0;
};

// TreeSource over an open image for the shared walk and extractor
// (platform/media_tree.h); media::ResultCode gives Iso9660Result numbers.
std::unique_ptr<media::TreeSource> NewTreeSource(Image &image);

}  // namespace tvx::iso9660
