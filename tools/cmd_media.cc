// tvxguest media: look inside an install image the way recognition opens it
// (UDF first, then ISO 9660), or with --iso9660 through the ISO 9660 reader
// only.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "command.h"
#include "json.h"
#include "tvx_iso9660.h"
#include "tvx_udf.h"

namespace tvxcli {
namespace {

constexpr const char *kUsage =
    "Usage: tvxguest media ls [-R] [--json] [--iso9660] IMAGE [DIR]\n"
    "       tvxguest media cat [--iso9660] IMAGE PATH\n"
    "       tvxguest media extract [--iso9660] IMAGE PATH DESTDIR\n\n"
    "Look inside a UDF or ISO 9660 image. The image opens as UDF when it holds a\n"
    "UDF volume, else as ISO 9660 with the richest names it carries (Rock Ridge,\n"
    "then Joliet, then plain), as recognition opens it.\n\n"
    "  ls       list DIR (default the root): size and name, directories end in \"/\";\n"
    "           the first line names the reader and the volume identifier\n"
    "  cat      write the file PATH to standard output\n"
    "  extract  copy the file PATH, or the contents of the directory PATH, into DESTDIR\n\n"
    "Options:\n"
    "  -R         list subdirectories recursively\n"
    "  --json     print the listing as one JSON object\n"
    "  --iso9660  use the ISO 9660 reader even when the image holds UDF\n"
    "  -h, --help show this help\n\n"
    "Exit status: 0 success, 1 no such path or a read failed, 2 the image cannot be\n"
    "opened, 64 usage error.\n";

// A recursive listing stops here: a hostile image could otherwise make it run
// for ever through shared subdirectories.
constexpr size_t kMaxDepth = 128;
constexpr size_t kMaxEntries = 1000000;

struct Entry {
  std::string path;
  bool isDir = false;
  uint64_t size = 0;
};

class Medium {
 public:
  virtual ~Medium() = default;
  virtual std::string ReaderName() const = 0;
  virtual std::string VolumeId() = 0;
  // List appends the entries of `dir` with paths prefixed by `prefix`;
  // returns an error text or "".
  virtual std::string List(const std::string &dir, std::vector<Entry> *out) = 0;
  virtual std::string Cat(const std::string &path, FILE *out) = 0;
  virtual std::string Extract(const std::string &path, const std::string &dest) = 0;
};

std::string IsoError(int rc) {
  switch (rc) {
    case ISO9660_ERR_ARGUMENT: return "invalid argument";
    case ISO9660_ERR_IO: return "read or write failed";
    case ISO9660_ERR_NOT_FOUND: return "no such path";
    case ISO9660_ERR_CORRUPT: return "corrupt image structure";
    case ISO9660_ERR_FORMAT: return "not an ISO 9660 image";
    case ISO9660_ERR_UNSAFE: return "an entry name would leave the destination";
    case ISO9660_ERR_NOT_DIR: return "not a directory";
    case ISO9660_ERR_IS_DIR: return "is a directory";
    default: return "error " + std::to_string(rc);
  }
}

class IsoMedium final : public Medium {
 public:
  explicit IsoMedium(Iso9660Image *image, uint32_t formats) : image_(image), formats_(formats) {}
  ~IsoMedium() override { Iso9660_Close(image_); }

  std::string ReaderName() const override {
    if (formats_ & ISO9660_FORMAT_ROCKRIDGE) return "iso9660 (rock ridge)";
    if (formats_ & ISO9660_FORMAT_JOLIET) return "iso9660 (joliet)";
    return "iso9660";
  }
  std::string VolumeId() override {
    char *id = Iso9660_GetVolumeId(image_);
    std::string s = id != nullptr ? id : "";
    std::free(id);
    return s;
  }
  std::string List(const std::string &dir, std::vector<Entry> *out) override {
    Iso9660Dir *d = nullptr;
    int rc = Iso9660_OpenDir(image_, dir.c_str(), &d);
    if (rc != ISO9660_OK) return IsoError(rc);
    Iso9660DirEntry e;
    while ((rc = Iso9660_ReadDir(image_, d, &e)) == ISO9660_OK) {
      out->push_back({e.name, e.isDirectory != 0, e.size64});
    }
    Iso9660_CloseDir(image_, d);
    return rc == ISO9660_END ? "" : IsoError(rc);
  }
  std::string Cat(const std::string &path, FILE *out) override {
    // A record holding only a name opens that path from the root.
    Iso9660DirEntry e{};
    if (path.size() >= sizeof e.name) return "path too long";
    std::memcpy(e.name, path.data(), path.size());
    Iso9660File *f = nullptr;
    int rc = Iso9660_OpenFile(image_, &e, &f);
    if (rc != ISO9660_OK) return IsoError(rc);
    std::vector<char> buf(64 * 1024);
    std::string err;
    for (;;) {
      size_t n = buf.size();
      rc = Iso9660_ReadFile(image_, f, buf.data(), &n);
      if (rc == ISO9660_END) break;
      if (rc != ISO9660_OK) {
        err = IsoError(rc);
        break;
      }
      if (std::fwrite(buf.data(), 1, n, out) != n) {
        err = std::strerror(errno);
        break;
      }
    }
    Iso9660_CloseFile(image_, f);
    return err;
  }
  std::string Extract(const std::string &path, const std::string &dest) override {
    int rc = Iso9660_Extract(image_, path.c_str(), dest.c_str());
    return rc == ISO9660_OK ? "" : IsoError(rc);
  }

 private:
  Iso9660Image *image_;
  uint32_t formats_;
};

// The UDF reader has no extraction of its own: files are copied here, with
// the same refusals as the ISO 9660 reader's (names that would leave the
// destination, symbolic links below it).
bool SafeName(const std::string &name) {
  return !name.empty() && name != "." && name != ".." && name.find('/') == std::string::npos;
}

class UdfMedium final : public Medium {
 public:
  explicit UdfMedium(UDFVolume *volume) : volume_(volume) {}
  ~UdfMedium() override { UDF_Close(volume_); }

  std::string ReaderName() const override { return "udf"; }
  std::string VolumeId() override {
    char *id = UDF_GetVolumeId(volume_);
    std::string s = id != nullptr ? id : "";
    std::free(id);
    return s;
  }
  std::string List(const std::string &dir, std::vector<Entry> *out) override {
    UDFDir *d = UDF_OpenDir(volume_, nullptr, dir.c_str());
    if (d == nullptr) return "no such directory";
    while (const char *name = UDF_ReadDir(d, 0)) {
      out->push_back({name, UDF_DirEntryIsDir(d) != 0, UDF_DirEntrySize(d)});
    }
    UDF_CloseDir(d);
    return "";
  }
  std::string Cat(const std::string &path, FILE *out) override {
    return Copy(path, [out](const char *buf, size_t n) { return std::fwrite(buf, 1, n, out) == n; });
  }
  std::string Extract(const std::string &path, const std::string &dest) override {
    std::string err = MakeDirs(dest);
    if (!err.empty()) return err;
    int fd = ::open(dest.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0) return dest + ": " + std::strerror(errno);
    UDFDir *d = UDF_OpenDir(volume_, nullptr, path.c_str());
    if (d != nullptr) {
      UDF_CloseDir(d);
      err = ExtractDir(path, fd, 0);
    } else {
      size_t slash = path.find_last_of('/');
      err = ExtractFile(path, fd, slash == std::string::npos ? path : path.substr(slash + 1));
    }
    ::close(fd);
    return err;
  }

 private:
  template <typename Sink>
  std::string Copy(const std::string &path, Sink sink) {
    UDFFile *f = UDF_OpenFile(volume_, nullptr, path.c_str());
    if (f == nullptr) return "no such file";
    uint64_t size = UDF_GetFileSize(volume_, f);
    std::string err = size == UINT64_MAX ? "cannot read the file size" : "";
    std::vector<char> buf(64 * 1024);
    for (uint64_t off = 0; err.empty() && off < size;) {
      size_t n = static_cast<size_t>(std::min<uint64_t>(buf.size(), size - off));
      if (!UDF_PReadFile(f, buf.data(), off, n)) {
        err = "read failed";
      } else if (!sink(buf.data(), n)) {
        err = std::strerror(errno);
      }
      off += n;
    }
    UDF_CloseFile(f);
    return err;
  }
  static std::string MakeDirs(const std::string &path) {
    for (size_t i = 1; i <= path.size(); ++i) {
      if (i < path.size() && path[i] != '/') continue;
      std::string part = path.substr(0, i);
      if (::mkdir(part.c_str(), 0755) != 0 && errno != EEXIST) return part + ": " + std::strerror(errno);
    }
    return "";
  }
  std::string ExtractFile(const std::string &path, int dirFd, const std::string &name) {
    if (!SafeName(name)) return "unsafe name \"" + name + "\"";
    int fd = ::openat(dirFd, name.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW | O_CLOEXEC, 0644);
    if (fd < 0) return name + ": " + std::strerror(errno);
    std::string err = Copy(path, [fd](const char *buf, size_t n) {
      for (size_t done = 0; done < n;) {
        ssize_t w = ::write(fd, buf + done, n - done);
        if (w < 0 && errno == EINTR) continue;
        if (w <= 0) return false;
        done += static_cast<size_t>(w);
      }
      return true;
    });
    if (::close(fd) != 0 && err.empty()) err = std::strerror(errno);
    return err.empty() ? "" : path + ": " + err;
  }
  std::string ExtractDir(const std::string &path, int dirFd, size_t depth) {
    if (depth >= kMaxDepth) return path + ": directories nested too deep";
    std::vector<Entry> entries;
    std::string err = List(path, &entries);
    if (!err.empty()) return path + ": " + err;
    for (const Entry &e : entries) {
      if (!SafeName(e.path)) return "unsafe name \"" + e.path + "\"";
    }
    for (const Entry &e : entries) {
      std::string inImage = path.empty() || path == "/" ? e.path : path + "/" + e.path;
      if (!e.isDir) {
        err = ExtractFile(inImage, dirFd, e.path);
      } else if (::mkdirat(dirFd, e.path.c_str(), 0755) != 0 && errno != EEXIST) {
        err = inImage + ": " + std::strerror(errno);
      } else {
        int sub = ::openat(dirFd, e.path.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
        if (sub < 0) return inImage + ": " + std::strerror(errno);
        err = ExtractDir(inImage, sub, depth + 1);
        ::close(sub);
      }
      if (!err.empty()) return err;
    }
    return "";
  }

  UDFVolume *volume_;
};

std::unique_ptr<Medium> OpenIso(const std::string &path, std::string *err) {
  uint32_t formats = 0;
  Iso9660_ListFormats(path.c_str(), &formats);
  Iso9660Image *image = nullptr;
  int rc = Iso9660_Open(path.c_str(), formats, &image);
  if (rc != ISO9660_OK) {
    *err = IsoError(rc);
    return nullptr;
  }
  uint32_t used = formats & ISO9660_FORMAT_ROCKRIDGE   ? ISO9660_FORMAT_ROCKRIDGE
                  : formats & ISO9660_FORMAT_JOLIET ? ISO9660_FORMAT_JOLIET
                                                    : ISO9660_FORMAT_PLAIN;
  return std::make_unique<IsoMedium>(image, used);
}

std::unique_ptr<Medium> OpenMedium(const std::string &path, bool isoOnly, std::string *err) {
  if (!isoOnly) {
    if (UDFVolume *volume = UDF_Open(path.c_str())) return std::make_unique<UdfMedium>(volume);
  }
  return OpenIso(path, err);
}

std::string JoinPath(const std::string &dir, const std::string &name) {
  if (dir.empty() || dir == "/") return name;
  return dir.back() == '/' ? dir + name : dir + "/" + name;
}

std::string Walk(Medium &m, const std::string &dir, const std::string &shown, size_t depth,
                 bool recursive, std::vector<Entry> *out) {
  std::vector<Entry> here;
  std::string err = m.List(dir, &here);
  if (!err.empty()) return dir + ": " + err;
  for (Entry &e : here) {
    if (out->size() >= kMaxEntries) return "too many entries";
    std::string inImage = JoinPath(dir, e.path);
    e.path = shown.empty() ? e.path : shown + "/" + e.path;
    out->push_back(e);
    if (recursive && e.isDir) {
      if (depth >= kMaxDepth) return inImage + ": directories nested too deep";
      err = Walk(m, inImage, e.path, depth + 1, recursive, out);
      if (!err.empty()) return err;
    }
  }
  return "";
}

int Fail(const std::string &what, const std::string &err, int status) {
  std::fprintf(stderr, "tvxguest media: %s: %s\n", what.c_str(), err.c_str());
  return status;
}

int RunMedia(const std::vector<std::string> &args) {
  if (args.empty()) return UsageError("media", "missing subcommand (ls, cat or extract)");
  if (IsHelp(args[0])) {
    std::fputs(kUsage, stdout);
    return 0;
  }
  const std::string &sub = args[0];
  bool recursive = false, json = false, isoOnly = false;
  std::vector<std::string> pos;
  for (size_t i = 1; i < args.size(); ++i) {
    const std::string &a = args[i];
    if (IsHelp(a)) {
      std::fputs(kUsage, stdout);
      return 0;
    } else if (a == "--iso9660") {
      isoOnly = true;
    } else if (a == "-R" && sub == "ls") {
      recursive = true;
    } else if (a == "--json" && sub == "ls") {
      json = true;
    } else if (a.size() > 1 && a[0] == '-') {
      return UsageError("media", "unknown option " + a);
    } else {
      pos.push_back(a);
    }
  }
  size_t want = sub == "ls" ? 1 : sub == "cat" ? 2 : sub == "extract" ? 3 : 0;
  if (want == 0) return UsageError("media", "unknown subcommand " + sub);
  if (pos.size() < want || pos.size() > (sub == "ls" ? 2u : want)) {
    return UsageError("media", "wrong number of arguments for " + sub);
  }
  std::string err;
  std::unique_ptr<Medium> m = OpenMedium(pos[0], isoOnly, &err);
  if (m == nullptr) return Fail(pos[0], err, 2);

  if (sub == "cat") {
    err = m->Cat(pos[1], stdout);
    return err.empty() ? 0 : Fail(pos[1], err, 1);
  }
  if (sub == "extract") {
    err = m->Extract(pos[1], pos[2]);
    return err.empty() ? 0 : Fail(pos[1], err, 1);
  }
  std::string dir = pos.size() > 1 ? pos[1] : "/";
  std::vector<Entry> entries;
  err = Walk(*m, dir, "", 0, recursive, &entries);
  if (json) {
    std::string list = "[";
    for (size_t i = 0; i < entries.size(); ++i) {
      JsonObject o;
      o.Str("path", entries[i].path).Bool("directory", entries[i].isDir);
      o.Num("size", static_cast<int64_t>(entries[i].size));
      list += (i ? ", " : "") + o.Text();
    }
    list += "]";
    JsonObject top;
    top.Str("reader", m->ReaderName()).Str("volumeId", m->VolumeId()).Raw("entries", list);
    if (!err.empty()) top.Str("error", err);
    std::printf("%s\n", top.Text().c_str());
  } else {
    std::printf("%s volume \"%s\"\n", m->ReaderName().c_str(), m->VolumeId().c_str());
    for (const Entry &e : entries) {
      if (e.isDir) {
        std::printf("%12s  %s/\n", "-", e.path.c_str());
      } else {
        std::printf("%12llu  %s\n", static_cast<unsigned long long>(e.size), e.path.c_str());
      }
    }
  }
  return err.empty() ? 0 : Fail(dir, err, 1);
}

const CommandRegistration kMedia({"media", "list, read or extract files of a UDF or ISO 9660 image",
                                  RunMedia});

}  // namespace
}  // namespace tvxcli
