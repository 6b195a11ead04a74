// The ISO 9660 side of the shared tree walk and extractor: listings become
// TreeNodes whose handle is an index into the nodes this source has handed
// out, so a file's extents are at hand when it is laid out or read.
#include <deque>

#include "tvx_iso9660.h"
#include "platform/iso9660/image.h"

namespace tvx::iso9660 {
namespace {

using media::NodeKind;
using media::TreeNode;
using media::TreeStatus;

TreeStatus StatusOf(int rc) {
  switch (rc) {
    case ISO9660_OK: return TreeStatus::kOk;
    case ISO9660_ERR_NOT_FOUND: return TreeStatus::kNotFound;
    case ISO9660_ERR_NOT_DIR: return TreeStatus::kNotDir;
    case ISO9660_ERR_IS_DIR: return TreeStatus::kIsDir;
    case ISO9660_ERR_UNSAFE: return TreeStatus::kUnsafe;
    case ISO9660_ERR_IO: return TreeStatus::kIo;
    default: return TreeStatus::kCorrupt;
  }
}

class IsoTree final : public media::TreeSource {
 public:
  explicit IsoTree(Image &image) : image_(image) {}

  TreeStatus Resolve(std::string_view path, TreeNode *out) override {
    Node node;
    int rc = image_.Resolve(path, &node);
    if (rc != ISO9660_OK) return StatusOf(rc);
    *out = Keep(node);
    return TreeStatus::kOk;
  }
  TreeStatus List(const TreeNode &dir, std::vector<TreeNode> *out) override {
    ListingPtr listing;
    int rc = image_.List(nodes_.at(dir.ref[0]), &listing);
    if (rc != ISO9660_OK) return StatusOf(rc);
    out->clear();
    for (const Node &n : listing->nodes) out->push_back(Keep(n));
    return TreeStatus::kOk;
  }
  TreeStatus Layout(const TreeNode &file, std::vector<media::DataRun> *out) override {
    const Node &n = nodes_.at(file.ref[0]);
    int rc = image_.CheckExtents(n);
    if (rc != ISO9660_OK) return StatusOf(rc);
    out->clear();
    uint64_t at = 0;
    for (const Extent &e : n.extents) {
      if (e.length != 0) out->push_back({at, e.length, true});
      at += e.length;
    }
    return TreeStatus::kOk;
  }
  TreeStatus Read(const TreeNode &file, uint64_t offset, void *buf, size_t len) override {
    return StatusOf(image_.ReadNodeAt(nodes_.at(file.ref[0]), offset, buf, len));
  }
  uint64_t Capacity() const override { return image_.Limit(); }
  const char *LogPrefix() const override { return "Iso9660"; }

 private:
  TreeNode Keep(const Node &n) {
    TreeNode t;
    t.name = n.name;
    t.kind = n.isSymlink ? NodeKind::kOther : n.isDir ? NodeKind::kDirectory : NodeKind::kFile;
    t.size = n.size;
    t.id = n.extents.empty() ? 0 : n.extents[0].offset;
    t.ref[0] = nodes_.size();
    nodes_.push_back(n);
    return t;
  }

  Image &image_;
  std::deque<Node> nodes_;
};

}  // namespace

std::unique_ptr<media::TreeSource> NewTreeSource(Image &image) {
  return std::make_unique<IsoTree>(image);
}

}  // namespace tvx::iso9660
