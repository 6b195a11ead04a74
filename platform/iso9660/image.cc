// Directory listings and path resolution. A directory is a run of records
// (ECMA-119 9.1) that never cross a 2048-byte block; a zero length byte fills
// the rest of a block. Each record is checked against what remains before any
// field is read. A file larger than 4 GiB is recorded as several consecutive
// records with the same identifier, all but the last flagged multi-extent;
// they become one node. In Rock Ridge mode a directory moved away for depth
// (RRIP "RE") is hidden in its new place and shown where a "CL" link points
// to it.
#include <algorithm>
#include <cstring>

#include "tvx_iso9660.h"
#include "platform/ascii.h"
#include "platform/endian.h"
#include "platform/iso9660/ecma119.h"
#include "platform/iso9660/image.h"
#include "platform/iso9660/names.h"
#include "platform/log.h"

namespace tvx::iso9660 {
namespace {

bool Inside(const Extent &e, uint64_t limit) {
  return e.offset <= limit && e.length <= limit - e.offset;
}

}  // namespace

Image::Image(BlockSourcePtr src, const VolumeFacts &facts, uint32_t nameFormat)
    : src_(std::move(src)), facts_(facts), nameFormat_(nameFormat) {
  root_.isDir = true;
  root_.extents.push_back(nameFormat == ISO9660_FORMAT_JOLIET ? facts.jolietRoot
                                                              : facts.primaryRoot);
  root_.size = root_.extents[0].length;
}

int Image::Open(BlockSourcePtr src, uint32_t mode, std::unique_ptr<Image> *out) {
  constexpr uint32_t kAll =
      ISO9660_FORMAT_PLAIN | ISO9660_FORMAT_JOLIET | ISO9660_FORMAT_ROCKRIDGE;
  if (src == nullptr || (mode & ~kAll) != 0) return ISO9660_ERR_ARGUMENT;
  VolumeFacts facts;
  int rc = ReadVolume(*src, &facts);
  if (rc != ISO9660_OK) return rc;
  uint32_t accepted = mode == 0 ? kAll : mode;
  uint32_t format = ISO9660_FORMAT_PLAIN;
  if ((accepted & facts.formats & ISO9660_FORMAT_ROCKRIDGE) != 0) {
    format = ISO9660_FORMAT_ROCKRIDGE;
  } else if ((accepted & facts.formats & ISO9660_FORMAT_JOLIET) != 0) {
    format = ISO9660_FORMAT_JOLIET;
  }
  out->reset(new Image(std::move(src), facts, format));
  return ISO9660_OK;
}

int Image::ReadAt(uint64_t offset, void *buf, size_t len) {
  return src_->ReadAt(offset, buf, len) ? ISO9660_OK : ISO9660_ERR_IO;
}

int Image::CheckExtents(const Node &file) const {
  for (const Extent &e : file.extents) {
    if (!Inside(e, facts_.limit)) {
      Log("Iso9660: data of \"%s\" lies beyond the end of the image\n", file.name.c_str());
      return ISO9660_ERR_CORRUPT;
    }
  }
  // The extents of one file are distinct parts of the image (ECMA-119 6.5.1):
  // a file of overlapping extents would read the same bytes again and again.
  std::vector<Extent> sorted;
  for (const Extent &e : file.extents) {
    if (e.length != 0) sorted.push_back(e);
  }
  std::sort(sorted.begin(), sorted.end(),
            [](const Extent &a, const Extent &b) { return a.offset < b.offset; });
  for (size_t i = 1; i < sorted.size(); ++i) {
    if (sorted[i].offset < sorted[i - 1].offset + sorted[i - 1].length) {
      Log("Iso9660: extents of \"%s\" overlap\n", file.name.c_str());
      return ISO9660_ERR_CORRUPT;
    }
  }
  return ISO9660_OK;
}

// DirectoryLength reads the length of a relocated directory from its own "."
// record, since the "CL" record that points to it describes a file.
int Image::DirectoryLength(uint32_t block, uint64_t *out) {
  uint8_t r[kDrName + 1];
  uint64_t offset = static_cast<uint64_t>(block) * kBlockSize;
  if (!Inside({offset, sizeof r}, facts_.limit)) return ISO9660_ERR_CORRUPT;
  if (ReadAt(offset, r, sizeof r) != ISO9660_OK) return ISO9660_ERR_IO;
  uint32_t length;
  if (r[kDrLength] < sizeof r || !Both32(r + kDrDataLength, &length)) return ISO9660_ERR_CORRUPT;
  *out = length;
  return ISO9660_OK;
}

int Image::Load(const Extent &where, Listing *out) {
  out->where = where;
  if (where.length > kMaxDirectoryBytes || !Inside(where, facts_.limit)) {
    Log("Iso9660: directory at byte %llu (%llu bytes) lies outside the image\n",
        static_cast<unsigned long long>(where.offset),
        static_cast<unsigned long long>(where.length));
    return ISO9660_ERR_CORRUPT;
  }
  std::vector<uint8_t> buf(where.length);
  if (!buf.empty() && ReadAt(where.offset, buf.data(), buf.size()) != ISO9660_OK) {
    return ISO9660_ERR_IO;
  }
  const bool joliet = nameFormat_ == ISO9660_FORMAT_JOLIET;
  const bool rock = nameFormat_ == ISO9660_FORMAT_ROCKRIDGE;
  const uint64_t limit = facts_.limit;
  AreaReader readArea = [this, limit](uint64_t offset, size_t n, std::string *area) {
    if (offset > limit || n > limit - offset) return false;
    area->assign(n, '\0');
    return ReadAt(offset, area->data(), n) == ISO9660_OK;
  };

  bool continuing = false;  // the previous record announced another extent
  bool skipping = false;    // ... of an entry that is not listed
  std::string_view previousId;
  // Records never cross a block: each block is a cursor of its own, and a
  // zero length byte ends the block's records.
  ByteCursor blocks(buf.data(), buf.size());
  ByteCursor records;
  while (!records.empty() ||
         (!blocks.empty() &&
          blocks.GetSub(std::min<size_t>(kBlockSize, blocks.remaining()), &records))) {
    uint64_t at = where.offset + (buf.size() - blocks.remaining() - records.remaining());
    const uint8_t *r;
    if (!records.Peek(1, &r) || r[0] == 0) {
      records = ByteCursor();  // the rest of the block is padding
      continue;
    }
    size_t len = r[0];
    uint32_t block, size;
    if (len < kDrName + 1 || !records.GetBytes(len, &r) || kDrName + r[kDrNameLength] > len ||
        !Both32(r + kDrExtent, &block) || !Both32(r + kDrDataLength, &size)) {
      Log("Iso9660: invalid directory record at byte %llu\n", static_cast<unsigned long long>(at));
      return ISO9660_ERR_CORRUPT;
    }
    size_t nameLen = r[kDrNameLength];
    uint8_t flags = r[kDrFlags];
    std::string_view id(reinterpret_cast<const char *>(r + kDrName), nameLen);
    Extent data{(static_cast<uint64_t>(block) + r[kDrExtAttrLength]) * kBlockSize, size};
    bool more = (flags & kFlagMultiExtent) != 0;

    if (continuing) {
      if (id != previousId || (flags & kFlagDirectory)) {
        Log("Iso9660: broken multi-extent file at byte %llu\n",
            static_cast<unsigned long long>(at));
        return ISO9660_ERR_CORRUPT;
      }
      if (!skipping) {
        out->nodes.back().extents.push_back(data);
        out->nodes.back().size += size;
      }
      continuing = more;
      continue;
    }
    if (nameLen == 1 && (id[0] == 0 || id[0] == 1)) continue;  // "." and ".."
    if (more && (flags & kFlagDirectory)) {
      Log("Iso9660: directory record with multi-extent flag\n");
      return ISO9660_ERR_CORRUPT;
    }
    continuing = more;
    previousId = id;
    skipping = true;
    // Associated files carry resource data of another entry of the same name.
    if (flags & kFlagAssociated) continue;

    Node node;
    node.isDir = (flags & kFlagDirectory) != 0;
    node.size = size;
    node.extents.push_back(data);
    if (joliet) {
      node.name = JolietName(id);
    } else {
      node.name = IsoName(id);
    }
    if (rock) {
      size_t start = kDrName + nameLen + (nameLen % 2 == 0 ? 1 : 0) + facts_.suspSkip;
      if (start < len) {
        SystemUse su;
        ParseSystemUse(std::string_view(reinterpret_cast<const char *>(r) + start, len - start),
                       readArea, &su);
        if (su.relocated) continue;
        if (su.hasName && !su.nameIsDot) node.name = ToUtf8(su.name);
        node.isSymlink = su.symlink && !node.isDir;
        if (su.hasChildLink) {
          uint64_t dirLength = 0;
          int rc = DirectoryLength(su.childLink, &dirLength);
          if (rc != ISO9660_OK) return rc;
          node.isDir = true;
          node.isSymlink = false;
          node.size = dirLength;
          node.extents.assign(1, {static_cast<uint64_t>(su.childLink) * kBlockSize, dirLength});
        }
      }
    }
    if (node.name.empty()) continue;
    skipping = false;
    out->nodes.push_back(std::move(node));
  }
  if (continuing) {
    Log("Iso9660: multi-extent file without its last extent\n");
    return ISO9660_ERR_CORRUPT;
  }
  // Mastering tools park directories relocated for depth in a root directory
  // of their own; once every entry there shows up at its real place, the
  // parking directory is an artefact and is not listed.
  if (rock && where.offset == root_.extents[0].offset) {
    std::erase_if(out->nodes, [this](const Node &n) {
      if (!n.isDir || (n.name != "rr_moved" && n.name != ".rr_moved")) return false;
      Listing parked;
      return Load(n.extents[0], &parked) == ISO9660_OK && parked.nodes.empty();
    });
  }
  return ISO9660_OK;
}

int Image::List(const Node &dir, ListingPtr *out) {
  if (!dir.isDir || dir.extents.size() != 1) return ISO9660_ERR_NOT_DIR;
  const Extent &where = dir.extents[0];
  auto key = std::make_pair(where.offset, where.length);
  auto it = cache_.find(key);
  if (it != cache_.end()) {
    *out = it->second;
    return ISO9660_OK;
  }
  auto listing = std::make_shared<Listing>();
  int rc = Load(where, listing.get());
  if (rc != ISO9660_OK) return rc;
  // Listings that open handles still hold stay alive through their shared
  // pointers; the cache only bounds what is kept for later lookups.
  if (cache_.size() >= kMaxCachedListings) cache_.clear();
  cache_.emplace(key, listing);
  *out = std::move(listing);
  return ISO9660_OK;
}

int Image::Resolve(std::string_view path, Node *out) {
  Node node = root_;
  std::vector<uint64_t> chain{root_.extents[0].offset};
  while (!path.empty()) {
    size_t slash = path.find('/');
    std::string_view comp = path.substr(0, slash);
    path = slash == std::string_view::npos ? std::string_view() : path.substr(slash + 1);
    if (comp.empty() || comp == ".") continue;
    if (comp == "..") return ISO9660_ERR_NOT_FOUND;
    if (!node.isDir) return ISO9660_ERR_NOT_DIR;
    if (chain.size() > kMaxPathDepth) return ISO9660_ERR_NOT_FOUND;
    ListingPtr listing;
    int rc = List(node, &listing);
    if (rc != ISO9660_OK) return rc;
    const Node *found = nullptr;
    for (const Node &n : listing->nodes) {
      if (n.name == comp) {
        found = &n;
        break;
      }
    }
    if (found == nullptr) {
      for (const Node &n : listing->nodes) {
        if (ascii::Equal(n.name, comp)) {
          found = &n;
          break;
        }
      }
    }
    if (found == nullptr) return ISO9660_ERR_NOT_FOUND;
    if (found->isDir) {
      uint64_t offset = found->extents[0].offset;
      if (std::find(chain.begin(), chain.end(), offset) != chain.end()) {
        Log("Iso9660: directory loop at \"%s\"\n", found->name.c_str());
        return ISO9660_ERR_CORRUPT;
      }
      chain.push_back(offset);
    }
    node = *found;
  }
  *out = std::move(node);
  return ISO9660_OK;
}

}  // namespace tvx::iso9660
