// The tree walk shared by listings and extraction, and the extractor. See
// media_tree.h for the rules; the writing side goes through directory
// descriptors opened with O_NOFOLLOW below the destination, so no name on the
// host can redirect it.
#include "platform/media_tree.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <unordered_set>

#include "platform/fd_io.h"
#include "platform/log.h"
#include "platform/unique.h"

namespace tvx::media {
namespace {

// Used when a source cannot tell its size: what a dual-layer disc holds.
constexpr uint64_t kUnknownCapacity = 9ull << 30;
constexpr size_t kCopyChunk = 64 * 1024;

uint64_t CapacityOf(const TreeSource &src) {
  uint64_t c = src.Capacity();
  return c != 0 ? c : kUnknownCapacity;
}

class Walker {
 public:
  Walker(TreeSource &src, bool recursive, const TreeVisitor &visit)
      : src_(src), recursive_(recursive), visit_(visit),
        budget_(CapacityOf(src) / kMinEntryBytes + 1) {}

  TreeStatus Run(const TreeNode &top) {
    visited_.insert(top.id);
    return Dir(top, "", 0);
  }

 private:
  TreeStatus Dir(const TreeNode &dir, const std::string &prefix, size_t depth) {
    if (depth > kMaxTreeDepth) {
      Log("%s: directories nested deeper than %zu levels\n", src_.LogPrefix(), kMaxTreeDepth);
      return TreeStatus::kCorrupt;
    }
    std::vector<TreeNode> list;
    TreeStatus st = src_.List(dir, &list);
    if (st != TreeStatus::kOk) return st;
    for (const TreeNode &n : list) {
      if (++entries_ > budget_) {
        Log("%s: more entries than the image has room for\n", src_.LogPrefix());
        return TreeStatus::kCorrupt;
      }
      std::string path = prefix.empty() ? n.name : prefix + "/" + n.name;
      st = visit_(path, n);
      if (st != TreeStatus::kOk) return st;
      if (!recursive_ || !n.IsDir()) continue;
      // A directory reached twice is a loop or a shared subtree; either makes
      // the walk's work grow without bound on a small image.
      if (!visited_.insert(n.id).second) {
        Log("%s: directory \"%s\" is reached twice\n", src_.LogPrefix(), path.c_str());
        return TreeStatus::kCorrupt;
      }
      st = Dir(n, path, depth + 1);
      if (st != TreeStatus::kOk) return st;
    }
    return TreeStatus::kOk;
  }

  TreeSource &src_;
  bool recursive_;
  const TreeVisitor &visit_;
  uint64_t budget_;
  uint64_t entries_ = 0;
  std::unordered_set<uint64_t> visited_;
};

using Item = PlannedEntry;

// Planner gathers what an extraction will write and checks the rules first.
class Planner {
 public:
  explicit Planner(TreeSource &src) : src_(src), dataLeft_(CapacityOf(src)) {}

  TreeStatus Add(const std::string &path, const TreeNode &n) {
    if (!SafeName(n.name)) {
      Log("%s: refusing to extract unsafe name \"%s\"\n", src_.LogPrefix(), n.name.c_str());
      return TreeStatus::kUnsafe;
    }
    if (!paths_.insert(path).second) {
      Log("%s: the name \"%s\" appears twice in one directory\n", src_.LogPrefix(), path.c_str());
      return TreeStatus::kCorrupt;
    }
    // Links are not recreated: their targets could point anywhere on the host.
    if (n.kind == NodeKind::kOther) return TreeStatus::kOk;
    Item item{path, n, {}};
    if (n.kind == NodeKind::kFile) {
      TreeStatus st = src_.Layout(n, &item.runs);
      if (st != TreeStatus::kOk) return st;
      for (const DataRun &r : item.runs) {
        if (!r.recorded) continue;
        if (r.length > dataLeft_) {
          Log("%s: the files' data adds up to more than the image holds\n", src_.LogPrefix());
          return TreeStatus::kCorrupt;
        }
        dataLeft_ -= r.length;
      }
    }
    items_.push_back(std::move(item));
    return TreeStatus::kOk;
  }
  const std::vector<Item> &Items() const { return items_; }
  std::vector<Item> Take() { return std::move(items_); }

 private:
  TreeSource &src_;
  uint64_t dataLeft_;
  std::unordered_set<std::string> paths_;
  std::vector<Item> items_;
};

TreeStatus FromErrno(int err) {
  return err == ELOOP || err == ENOTDIR || err == EISDIR ? TreeStatus::kUnsafe : TreeStatus::kIo;
}

TreeStatus WriteData(TreeSource &src, const Item &item, int fd) {
  std::vector<uint8_t> buf(kCopyChunk);
  for (const DataRun &r : item.runs) {
    if (!r.recorded) continue;  // a hole: the final size leaves it sparse
    for (uint64_t done = 0; done < r.length;) {
      size_t n = static_cast<size_t>(std::min<uint64_t>(buf.size(), r.length - done));
      TreeStatus st = src.Read(item.node, r.offset + done, buf.data(), n);
      if (st != TreeStatus::kOk) return st;
      if (!PwriteAll(fd, buf.data(), n, r.offset + done)) return TreeStatus::kIo;
      done += n;
    }
  }
  return ::ftruncate(fd, static_cast<off_t>(item.node.size)) == 0 ? TreeStatus::kOk
                                                                 : TreeStatus::kIo;
}

// WriteFile creates `name` in `dirFd` afresh: whatever file or link had the
// name loses it first, so neither is ever written through.
TreeStatus WriteFile(TreeSource &src, const Item &item, int dirFd, const char *name) {
  struct stat st;
  if (::fstatat(dirFd, name, &st, AT_SYMLINK_NOFOLLOW) == 0) {
    if (S_ISDIR(st.st_mode)) return TreeStatus::kIsDir;
    if (::unlinkat(dirFd, name, 0) != 0) return FromErrno(errno);
  }
  UniqueFd fd(::openat(dirFd, name, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0644));
  if (!fd) return FromErrno(errno);
  TreeStatus rc = WriteData(src, item, fd.get());
  if (!fd.Close() && rc == TreeStatus::kOk) rc = TreeStatus::kIo;
  if (rc != TreeStatus::kOk) ::unlinkat(dirFd, name, 0);
  return rc;
}

TreeStatus MakeHostDirs(const std::string &path) {
  for (size_t i = 1; i <= path.size(); ++i) {
    if (i < path.size() && path[i] != '/') continue;
    std::string part = path.substr(0, i);
    if (::mkdir(part.c_str(), 0755) != 0 && errno != EEXIST) {
      Log("cannot create \"%s\" (errno %d)\n", part.c_str(), errno);
      return TreeStatus::kIo;
    }
  }
  return TreeStatus::kOk;
}

TreeStatus WriteItem(TreeSource &src, int destFd, const Item &item) {
  UniqueFd parent(::dup(destFd));
  if (!parent) return TreeStatus::kIo;
  size_t start = 0;
  for (size_t slash; (slash = item.path.find('/', start)) != std::string::npos; start = slash + 1) {
    std::string part = item.path.substr(start, slash - start);
    UniqueFd next(::openat(parent.get(), part.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    if (!next) return FromErrno(errno);
    parent = std::move(next);
  }
  std::string name = item.path.substr(start);
  if (item.node.kind == NodeKind::kDirectory) {
    if (::mkdirat(parent.get(), name.c_str(), 0755) != 0 && errno != EEXIST) return TreeStatus::kIo;
    UniqueFd check(::openat(parent.get(), name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    return check ? TreeStatus::kOk : FromErrno(errno);
  }
  return WriteFile(src, item, parent.get(), name.c_str());
}

}  // namespace

bool SafeName(std::string_view name) {
  return !name.empty() && name != "." && name != ".." && name.find('/') == std::string_view::npos &&
         name.find('\0') == std::string_view::npos;
}

TreeStatus WalkTree(TreeSource &src, const TreeNode &top, bool recursive,
                    const TreeVisitor &visit) {
  if (!top.IsDir()) return TreeStatus::kNotDir;
  return Walker(src, recursive, visit).Run(top);
}

TreeStatus ListTree(TreeSource &src, std::string_view path, bool recursive,
                    TreeCallback callback, void *ctx) {
  TreeNode top;
  TreeStatus st = src.Resolve(path, &top);
  if (st != TreeStatus::kOk) return st;
  return WalkTree(src, top, recursive, [callback, ctx](const std::string &rel, const TreeNode &n) {
    return callback(ctx, rel.c_str(), n.IsDir() ? 1 : 0, n.size) ? TreeStatus::kOk
                                                                 : TreeStatus::kIo;
  });
}

int ResultCode(TreeStatus st) {
  switch (st) {
    case TreeStatus::kOk: return 0;
    case TreeStatus::kIo: return 2;
    case TreeStatus::kNotFound: return 3;
    case TreeStatus::kCorrupt: return 4;
    case TreeStatus::kUnsafe: return 7;
    case TreeStatus::kNotDir: return 8;
    case TreeStatus::kIsDir: return 9;
  }
  return 4;
}

TreeStatus PlanExtraction(TreeSource &src, std::string_view path, std::vector<PlannedEntry> *out) {
  TreeNode top;
  TreeStatus st = src.Resolve(path, &top);
  if (st != TreeStatus::kOk) return st;
  Planner plan(src);
  if (top.IsDir()) {
    st = WalkTree(src, top, true, [&plan](const std::string &rel, const TreeNode &n) {
      return plan.Add(rel, n);
    });
  } else if (top.kind == NodeKind::kFile) {
    st = plan.Add(top.name, top);
  } else {
    st = TreeStatus::kNotFound;
  }
  if (st == TreeStatus::kOk) *out = plan.Take();
  return st;
}

TreeStatus ExtractTree(TreeSource &src, std::string_view path, const char *destDir) {
  std::vector<PlannedEntry> items;
  TreeStatus st = PlanExtraction(src, path, &items);
  if (st != TreeStatus::kOk) return st;

  st = MakeHostDirs(destDir);
  if (st != TreeStatus::kOk) return st;
  UniqueFd dest(::open(destDir, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!dest) return FromErrno(errno);
  for (const Item &item : items) {
    st = WriteItem(src, dest.get(), item);
    if (st != TreeStatus::kOk) {
      Log("%s: cannot extract \"%s\" into \"%s\"\n", src.LogPrefix(), item.path.c_str(), destDir);
      return st;
    }
  }
  return TreeStatus::kOk;
}

TreeStatus ExtractFile(TreeSource &src, std::string_view path, const char *target) {
  TreeNode node;
  TreeStatus st = src.Resolve(path, &node);
  if (st != TreeStatus::kOk) return st;
  if (node.IsDir()) return TreeStatus::kIsDir;
  if (node.kind != NodeKind::kFile) return TreeStatus::kNotFound;
  Planner plan(src);
  // The host name is the caller's: only the data is checked.
  node.name = "file";
  st = plan.Add(node.name, node);
  if (st != TreeStatus::kOk) return st;
  std::string dir = target, name = target;
  size_t slash = dir.rfind('/');
  if (slash == std::string::npos) {
    dir = ".";
  } else {
    dir = slash == 0 ? "/" : dir.substr(0, slash);
    name = name.substr(slash + 1);
  }
  UniqueFd dirFd(::open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!dirFd) {
    Log("%s: cannot create \"%s\" (errno %d)\n", src.LogPrefix(), target, errno);
    return TreeStatus::kIo;
  }
  return WriteFile(src, plan.Items().front(), dirFd.get(), name.c_str());
}

}  // namespace tvx::media
