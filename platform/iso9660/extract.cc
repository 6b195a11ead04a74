// Extraction to the host. The whole tree is walked and checked first (names,
// loops, depth, data inside the image), so an image that would escape its
// destination writes nothing. Writing then goes through directory descriptors
// with O_NOFOLLOW below the destination: an existing symbolic link there is
// refused instead of followed.
#include <cerrno>
#include <fcntl.h>
#include <set>
#include <string>
#include <sys/stat.h>
#include <unistd.h>
#include <vector>

#include "tvx_iso9660.h"
#include "platform/iso9660/image.h"
#include "platform/log.h"

namespace tvx::iso9660 {
namespace {

constexpr size_t kMaxExtractDepth = 128;
constexpr size_t kMaxExtractEntries = 1u << 20;
constexpr size_t kCopyChunk = 64 * 1024;

class Fd {
 public:
  explicit Fd(int fd = -1) : fd_(fd) {}
  ~Fd() {
    if (fd_ >= 0) ::close(fd_);
  }
  Fd(const Fd &) = delete;
  Fd &operator=(const Fd &) = delete;
  Fd(Fd &&o) noexcept : fd_(o.fd_) { o.fd_ = -1; }
  Fd &operator=(Fd &&o) noexcept {
    std::swap(fd_, o.fd_);
    return *this;
  }
  int get() const { return fd_; }
  int Release() {
    int fd = fd_;
    fd_ = -1;
    return fd;
  }

 private:
  int fd_;
};

struct Item {
  std::vector<std::string> parents;  // directories below the destination
  Node node;
};

bool SafeName(const std::string &name) {
  return !name.empty() && name != "." && name != ".." &&
         name.find('/') == std::string::npos && name.find('\0') == std::string::npos;
}

int Refuse(const std::string &name) {
  Log("Iso9660: refusing to extract unsafe name \"%s\"\n", name.c_str());
  return ISO9660_ERR_UNSAFE;
}

int Plan(Image &image, const Node &dir, std::vector<std::string> &parents,
         std::set<uint64_t> &visited, std::vector<Item> *out) {
  if (parents.size() > kMaxExtractDepth) {
    Log("Iso9660: directories nested deeper than %zu levels\n", kMaxExtractDepth);
    return ISO9660_ERR_CORRUPT;
  }
  ListingPtr listing;
  int rc = image.List(dir, &listing);
  if (rc != ISO9660_OK) return rc;
  for (const Node &n : listing->nodes) {
    if (!SafeName(n.name)) return Refuse(n.name);
    // Links are not recreated: their targets could point anywhere on the host.
    if (n.isSymlink) continue;
    if (out->size() >= kMaxExtractEntries) {
      Log("Iso9660: more than %zu entries to extract\n", kMaxExtractEntries);
      return ISO9660_ERR_CORRUPT;
    }
    out->push_back({parents, n});
    if (n.isDir) {
      if (!visited.insert(n.extents[0].offset).second) {
        Log("Iso9660: directory loop at \"%s\"\n", n.name.c_str());
        return ISO9660_ERR_CORRUPT;
      }
      parents.push_back(n.name);
      rc = Plan(image, n, parents, visited, out);
      parents.pop_back();
      if (rc != ISO9660_OK) return rc;
    } else {
      rc = image.CheckExtents(n);
      if (rc != ISO9660_OK) return rc;
    }
  }
  return ISO9660_OK;
}

int ErrnoResult(int err) { return err == ELOOP || err == ENOTDIR ? ISO9660_ERR_UNSAFE : ISO9660_ERR_IO; }

int MakeHostDirs(const std::string &path) {
  for (size_t i = 1; i <= path.size(); ++i) {
    if (i == path.size() || path[i] == '/') {
      std::string part = path.substr(0, i);
      if (::mkdir(part.c_str(), 0755) != 0 && errno != EEXIST) {
        Log("Iso9660: cannot create \"%s\" (errno %d)\n", part.c_str(), errno);
        return ISO9660_ERR_IO;
      }
    }
  }
  struct stat st;
  if (::stat(path.c_str(), &st) != 0 || !S_ISDIR(st.st_mode)) return ISO9660_ERR_IO;
  return ISO9660_OK;
}

int CopyTo(Image &image, const Node &file, int fd) {
  FileReader reader(file);
  std::vector<uint8_t> buf(kCopyChunk);
  for (;;) {
    size_t n = buf.size();
    int rc = reader.Read(image, buf.data(), &n);
    if (rc == ISO9660_END) return ISO9660_OK;
    if (rc != ISO9660_OK) return rc;
    for (size_t off = 0; off < n;) {
      ssize_t w = ::write(fd, buf.data() + off, n - off);
      if (w < 0 && errno == EINTR) continue;
      if (w <= 0) return ISO9660_ERR_IO;
      off += static_cast<size_t>(w);
    }
  }
}

int WriteItem(Image &image, int destFd, const Item &item) {
  Fd parent(::dup(destFd));
  if (parent.get() < 0) return ISO9660_ERR_IO;
  for (const std::string &p : item.parents) {
    Fd next(::openat(parent.get(), p.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    if (next.get() < 0) return ErrnoResult(errno);
    parent = std::move(next);
  }
  const char *name = item.node.name.c_str();
  if (item.node.isDir) {
    if (::mkdirat(parent.get(), name, 0755) != 0 && errno != EEXIST) return ISO9660_ERR_IO;
    Fd check(::openat(parent.get(), name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    return check.get() < 0 ? ErrnoResult(errno) : ISO9660_OK;
  }
  Fd out(::openat(parent.get(), name, O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW | O_CLOEXEC, 0644));
  if (out.get() < 0) return ErrnoResult(errno);
  int rc = CopyTo(image, item.node, out.get());
  if (::close(out.Release()) != 0 && rc == ISO9660_OK) rc = ISO9660_ERR_IO;
  if (rc != ISO9660_OK) ::unlinkat(parent.get(), name, 0);
  return rc;
}

}  // namespace

int ExtractTree(Image &image, std::string_view path, const char *destDir) {
  Node top;
  int rc = image.Resolve(path, &top);
  if (rc != ISO9660_OK) return rc;
  std::vector<Item> items;
  if (top.isDir) {
    std::vector<std::string> parents;
    std::set<uint64_t> visited{top.extents[0].offset};
    rc = Plan(image, top, parents, visited, &items);
    if (rc != ISO9660_OK) return rc;
  } else {
    if (!SafeName(top.name)) return Refuse(top.name);
    rc = image.CheckExtents(top);
    if (rc != ISO9660_OK) return rc;
    items.push_back({{}, top});
  }
  rc = MakeHostDirs(destDir);
  if (rc != ISO9660_OK) return rc;
  Fd dest(::open(destDir, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (dest.get() < 0) return ISO9660_ERR_IO;
  for (const Item &item : items) {
    rc = WriteItem(image, dest.get(), item);
    if (rc != ISO9660_OK) {
      Log("Iso9660: cannot extract \"%s\" into \"%s\" (%d)\n", item.node.name.c_str(), destDir, rc);
      return rc;
    }
  }
  return ISO9660_OK;
}

int ExtractFileTo(Image &image, std::string_view path, const char *target) {
  Node node;
  int rc = image.Resolve(path, &node);
  if (rc != ISO9660_OK) return rc;
  if (node.isDir) return ISO9660_ERR_IS_DIR;
  rc = image.CheckExtents(node);
  if (rc != ISO9660_OK) return rc;
  Fd out(::open(target, O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0644));
  if (out.get() < 0) {
    Log("Iso9660: cannot create \"%s\" (errno %d)\n", target, errno);
    return ISO9660_ERR_IO;
  }
  rc = CopyTo(image, node, out.get());
  if (::close(out.Release()) != 0 && rc == ISO9660_OK) rc = ISO9660_ERR_IO;
  if (rc != ISO9660_OK) ::unlink(target);
  return rc;
}

}  // namespace tvx::iso9660
