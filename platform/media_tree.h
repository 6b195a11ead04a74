// One walk and one extractor over both media readers. The ISO 9660 and UDF
// readers each implement TreeSource (list a directory, lay out and read a
// file); everything that goes through a whole tree -- recursive listings and
// extraction to the host -- runs here, so the rules against hostile images are
// kept once:
//   - every directory is reached once: a directory met a second time (a loop,
//     or children shared between directories) makes the image corrupt;
//   - the walk visits at most as many entries as the image has room to record
//     (kMinEntryBytes each), and nests at most kMaxTreeDepth levels;
//   - extraction decides everything before it writes: names that cannot be
//     one host path component, duplicate names in a directory and data that
//     adds up past the image's size refuse the whole extraction; unrecorded
//     parts of files become holes in the output, never written zeros.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace tvx::media {

enum class TreeStatus {
  kOk,
  kNotFound,
  kNotDir,
  kIsDir,
  kCorrupt,  // the image's structure is invalid (loops, shared directories, ...)
  kUnsafe,   // a name cannot be written below the destination
  kIo,       // the image or the host could not be read or written
};

enum class NodeKind : uint8_t { kFile, kDirectory, kOther };

// One entry as a reader lists it.
struct TreeNode {
  std::string name;  // UTF-8
  NodeKind kind = NodeKind::kOther;
  uint64_t size = 0;
  uint64_t id = 0;       // identity of a directory on the image (unique per directory)
  uint64_t ref[3] = {};  // the reader's own handle on the entry
  bool IsDir() const { return kind == NodeKind::kDirectory; }
};

// A run of a file's bytes: `length` bytes from file offset `offset`, stored
// on the image (recorded) or not (a hole that reads as zeros).
struct DataRun {
  uint64_t offset = 0;
  uint64_t length = 0;
  bool recorded = true;
};

class TreeSource {
 public:
  virtual ~TreeSource() = default;
  // Resolve finds the node a "/"-separated path names ("" and "/": the root).
  virtual TreeStatus Resolve(std::string_view path, TreeNode *out) = 0;
  // List returns a directory's entries, unsafe names included.
  virtual TreeStatus List(const TreeNode &dir, std::vector<TreeNode> *out) = 0;
  // Layout returns a file's runs, covering 0 to its size in order.
  virtual TreeStatus Layout(const TreeNode &file, std::vector<DataRun> *out) = 0;
  // Read reads exactly `len` bytes at `offset` of a file.
  virtual TreeStatus Read(const TreeNode &file, uint64_t offset, void *buf, size_t len) = 0;
  // Capacity is the image's size in bytes: the bound on what it can record.
  virtual uint64_t Capacity() const = 0;
  // LogPrefix names the reader in log lines ("Iso9660", "UDF").
  virtual const char *LogPrefix() const = 0;
};

// Smallest number of image bytes that one directory entry occupies on either
// format; Capacity() / kMinEntryBytes bounds the entries of any real tree.
constexpr uint64_t kMinEntryBytes = 32;
constexpr size_t kMaxTreeDepth = 128;

// TreeVisitor receives each entry with its path relative to the walk's top.
using TreeVisitor = std::function<TreeStatus(const std::string &relPath, const TreeNode &node)>;

// WalkTree lists `top` and, when `recursive`, every directory below it,
// depth-first in listing order. A visitor result other than kOk ends the
// walk with that result.
TreeStatus WalkTree(TreeSource &src, const TreeNode &top, bool recursive,
                    const TreeVisitor &visit);

// PlannedEntry is one entry an extraction will write, with a file's runs.
struct PlannedEntry {
  std::string path;  // relative to the destination
  TreeNode node;
  std::vector<DataRun> runs;
};

// PlanExtraction makes ExtractTree's decisions without writing: the entries
// below `path` (or the file at `path`) in the order they are written, or the
// reason the tree is refused.
TreeStatus PlanExtraction(TreeSource &src, std::string_view path, std::vector<PlannedEntry> *out);

// ExtractTree writes the file at `path` into `destDir` under its own name, or
// the contents of the directory at `path` (created with its parents). Nothing
// is written when the tree breaks a rule (see above). Symbolic links and other
// special entries are left out. An existing file where an entry goes is
// replaced, never written through (a symbolic or hard link keeps its target);
// an existing symbolic link where a directory goes is refused (kUnsafe).
TreeStatus ExtractTree(TreeSource &src, std::string_view path, const char *destDir);
// ExtractFile writes the file at `path` to the host path `target` (replaced
// the same way; removed again when the copy fails).
TreeStatus ExtractFile(TreeSource &src, std::string_view path, const char *target);

// ListTree is WalkTree from a path, for the readers' C calls: each entry goes
// to `callback` (same shape as Iso9660TreeCB and UDFTreeCB); a FALSE from it
// stops the walk with kIo.
using TreeCallback = unsigned char (*)(void *ctx, const char *relPath, unsigned char isDirectory,
                                       uint64_t size);
TreeStatus ListTree(TreeSource &src, std::string_view path, bool recursive,
                    TreeCallback callback, void *ctx);

// ResultCode gives the readers' shared C result numbers: 0 ok, 2 I/O, 3 not
// found, 4 corrupt, 7 unsafe, 8 not a directory, 9 a directory.
int ResultCode(TreeStatus st);

// SafeName tells whether `name` can be one host path component.
bool SafeName(std::string_view name);

}  // namespace tvx::media
