// The UDF side of the shared tree walk and extractor. A node's handle is its
// ICB; the last file entry read is kept, since a file is read in many chunks.
#include "platform/udf/udf_internal.h"

namespace tvx::udf {
namespace {

using media::NodeKind;
using media::TreeNode;
using media::TreeStatus;

TreeStatus StatusOf(Status st) {
  switch (st) {
    case Status::kOk: return TreeStatus::kOk;
    case Status::kNotFound: return TreeStatus::kNotFound;
    case Status::kNotDir: return TreeStatus::kNotDir;
    case Status::kIsDir: return TreeStatus::kIsDir;
    case Status::kIo: return TreeStatus::kIo;
    default: return TreeStatus::kCorrupt;
  }
}

NodeKind KindOf(uint8_t fileType) {
  if (fileType == kFileTypeDirectory) return NodeKind::kDirectory;
  // Unspecified (0), regular (5) and real-time (249) files hold plain data;
  // links, devices and the volume's own files are not extracted.
  if (fileType == 0 || fileType == 5 || fileType == 249) return NodeKind::kFile;
  return NodeKind::kOther;
}

class UdfTree final : public media::TreeSource {
 public:
  explicit UdfTree(Volume *vol) : vol_(vol) {}

  TreeStatus Resolve(std::string_view path, TreeNode *out) override {
    std::vector<LbAddr> chain{vol_->Root()};
    Node node;
    Status st = Lookup(vol_, &chain, std::string(path), &node);
    if (st != Status::kOk) return StatusOf(st);
    std::string_view name = path.substr(path.find_last_of('/') + 1);
    *out = Describe(std::string(name), chain.back(), node);
    return TreeStatus::kOk;
  }
  TreeStatus List(const TreeNode &dir, std::vector<TreeNode> *out) override {
    const Node *node;
    Status st = Load(dir, &node);
    std::vector<DirEntry> entries;
    if (st == Status::kOk) st = ReadDirectory(vol_, *node, &entries);
    if (st != Status::kOk) return StatusOf(st);
    out->clear();
    for (const DirEntry &e : entries) {
      Node child;
      st = vol_->LoadNode(e.icb, &child);
      if (st != Status::kOk) return StatusOf(st);
      out->push_back(Describe(e.usable ? e.name : std::string(), e.icb, child));
    }
    return TreeStatus::kOk;
  }
  TreeStatus Layout(const TreeNode &file, std::vector<media::DataRun> *out) override {
    const Node *node;
    Status st = Load(file, &node);
    if (st != Status::kOk) return StatusOf(st);
    out->clear();
    if (node->embedded) {
      if (node->size != 0) out->push_back({0, node->size, true});
      return TreeStatus::kOk;
    }
    for (const Extent &e : node->extents) {
      if (!out->empty() && out->back().recorded == e.recorded &&
          out->back().offset + out->back().length == e.fileOffset) {
        out->back().length += e.length;
      } else {
        out->push_back({e.fileOffset, e.length, e.recorded});
      }
    }
    return TreeStatus::kOk;
  }
  TreeStatus Read(const TreeNode &file, uint64_t offset, void *buf, size_t len) override {
    const Node *node;
    Status st = Load(file, &node);
    if (st == Status::kOk) st = vol_->ReadNode(*node, offset, buf, len);
    return StatusOf(st);
  }
  uint64_t Capacity() const override { return vol_->Capacity(); }
  const char *LogPrefix() const override { return "UDF"; }

 private:
  static TreeNode Describe(std::string name, LbAddr icb, const Node &node) {
    TreeNode t;
    t.name = std::move(name);
    t.kind = KindOf(node.fileType);
    t.size = node.size;
    t.id = static_cast<uint64_t>(icb.part) << 32 | icb.lbn;
    t.ref[0] = icb.lbn;
    t.ref[1] = icb.part;
    return t;
  }
  Status Load(const TreeNode &t, const Node **out) {
    LbAddr icb{static_cast<uint32_t>(t.ref[0]), static_cast<uint16_t>(t.ref[1])};
    if (!haveLast_ || !(lastIcb_ == icb)) {
      haveLast_ = false;
      Status st = vol_->LoadNode(icb, &last_);
      if (st != Status::kOk) return st;
      lastIcb_ = icb;
      haveLast_ = true;
    }
    *out = &last_;
    return Status::kOk;
  }

  Volume *vol_;
  bool haveLast_ = false;
  LbAddr lastIcb_;
  Node last_;
};

}  // namespace

std::unique_ptr<media::TreeSource> NewTreeSource(Volume *vol) {
  return std::make_unique<UdfTree>(vol);
}

}  // namespace tvx::udf
