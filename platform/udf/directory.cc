// Directories: File Identifier Descriptors and path lookup.
//
// A directory's data is a packed run of File Identifier Descriptors (ECMA-167
// 4/14.4), each padded to four bytes, that may cross block boundaries, so the
// whole directory is read first (bounded) and parsed from memory. Names are
// OSTA CS0 and come back as UTF-8. A name that cannot be one component of a
// "/" path (empty, ".", "..", or holding "/" or NUL) is marked: it never
// matches a lookup, and the extractor refuses a tree that holds one rather
// than leave it out unseen.
#include <algorithm>

#include "platform/endian.h"
#include "platform/log.h"
#include "platform/udf/udf_internal.h"

namespace tvx::udf {

namespace {

constexpr size_t kFidCharacteristics = 18;
constexpr size_t kFidNameLength = 19;
constexpr size_t kFidIcb = 20;
constexpr size_t kFidImplUseLength = 36;
constexpr size_t kFidImplUse = 38;

constexpr uint8_t kFidDirectory = 0x02;
constexpr uint8_t kFidDeleted = 0x04;
constexpr uint8_t kFidParent = 0x08;

bool AllZero(const uint8_t *p, size_t n) {
  return std::all_of(p, p + n, [](uint8_t b) { return b == 0; });
}

}  // namespace

Status ReadDirectory(Volume *vol, const Node &node, std::vector<DirEntry> *out) {
  out->clear();
  if (node.fileType != kFileTypeDirectory) return Status::kNotDir;
  if (node.size > kMaxDirectoryBytes) {
    Log("UDF: directory of %llu bytes is too large\n",
        static_cast<unsigned long long>(node.size));
    return Status::kTooLarge;
  }
  size_t size = static_cast<size_t>(node.size);
  std::vector<uint8_t> data(size);
  Status st = vol->ReadNode(node, 0, data.data(), size);
  if (st != Status::kOk) return st;

  ByteCursor rest(data.data(), size);
  while (!rest.empty()) {
    size_t pos = size - rest.remaining();
    // Some writers pad the last block of a directory with zeros.
    if (AllZero(rest.data(), rest.remaining())) break;
    const uint8_t *f;
    if (!rest.Peek(kFidImplUse, &f) ||
        CheckTag(f, rest.remaining(), kTagFileIdentifier, UINT32_MAX) != Status::kOk) {
      Log("UDF: bad file identifier descriptor at offset %zu of a directory\n", pos);
      return Status::kCorrupt;
    }
    size_t nameLen = f[kFidNameLength];
    size_t implLen = LoadLe16(f + kFidImplUseLength);
    size_t used = kFidImplUse + implLen + nameLen;
    ByteCursor fid;
    if (!rest.GetSub(used, &fid)) {
      Log("UDF: file identifier descriptor at offset %zu of a directory is cut short\n", pos);
      return Status::kCorrupt;
    }
    // Descriptors start on four-byte boundaries; the last may end unpadded.
    rest.Skip(std::min(((used + 3) & ~size_t{3}) - used, rest.remaining()));
    uint8_t chars = f[kFidCharacteristics];
    if (chars & (kFidDeleted | kFidParent)) continue;
    DirEntry e;
    e.usable = DecodeCs0(f + kFidImplUse + implLen, nameLen, &e.name) && media::SafeName(e.name);
    e.isDir = (chars & kFidDirectory) != 0;
    e.icb = LbAddr{LoadLe32(f + kFidIcb + 4), LoadLe16(f + kFidIcb + 8)};
    out->push_back(std::move(e));
  }
  return Status::kOk;
}

Status Lookup(Volume *vol, std::vector<LbAddr> *chain, const std::string &path, Node *node) {
  if (path.size() > kMaxPathLength) return Status::kTooLarge;
  if (chain->empty()) return Status::kNotFound;
  Node cur;
  Status st = vol->LoadNode(chain->back(), &cur);
  if (st != Status::kOk) return st;
  std::vector<DirEntry> entries;
  size_t pos = 0;
  while (pos <= path.size()) {
    size_t end = path.find('/', pos);
    if (end == std::string::npos) end = path.size();
    std::string comp = path.substr(pos, end - pos);
    pos = end + 1;
    if (comp.empty()) continue;
    st = ReadDirectory(vol, cur, &entries);
    if (st != Status::kOk) return st;
    auto it = std::find_if(entries.begin(), entries.end(),
                           [&](const DirEntry &e) { return e.usable && e.name == comp; });
    if (it == entries.end()) return Status::kNotFound;
    Node next;
    st = vol->LoadNode(it->icb, &next);
    if (st != Status::kOk) return st;
    if (next.fileType == kFileTypeDirectory) {
      // A directory that is its own ancestor would let a walker run forever.
      if (std::find(chain->begin(), chain->end(), it->icb) != chain->end()) {
        Log("UDF: directory structure contains a loop\n");
        return Status::kLoop;
      }
      if (chain->size() >= kMaxPathDepth) {
        Log("UDF: directories nest deeper than %u levels\n", kMaxPathDepth);
        return Status::kTooLarge;
      }
    }
    chain->push_back(it->icb);
    cur = std::move(next);
  }
  *node = std::move(cur);
  return Status::kOk;
}

}  // namespace tvx::udf
