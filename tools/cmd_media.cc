// tvxguest media: look inside an install image the way recognition opens it
// (UDF first, then ISO 9660), or with --iso9660 through the ISO 9660 reader
// only. Listings and extraction are the library's own tree walks, which
// refuse loops, shared directories and data larger than the image.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "arg_parser.h"
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
    "           the first line names the reader and the volume identifier; control\n"
    "           characters in names are shown as \\xNN\n"
    "  cat      write the file PATH to standard output\n"
    "  extract  copy the file PATH, or the contents of the directory PATH, into DESTDIR;\n"
    "           an image that would write outside DESTDIR, repeats a name or loops\n"
    "           writes nothing\n\n"
    "Options:\n"
    "  -R         list subdirectories recursively\n"
    "  --json     print the listing as one JSON object\n"
    "  --iso9660  use the ISO 9660 reader even when the image holds UDF\n"
    "  -h, --help show this help\n\n"
    "Exit status: 0 success, 1 no such path, a read or a write failed, 2 the image\n"
    "cannot be opened, 64 usage error.\n";

struct Entry {
  std::string path;
  bool isDir = false;
  uint64_t size = 0;
};

// Both readers share one set of result numbers for their tree calls.
std::string TreeError(int rc) {
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

Bool Collect(void *ctx, const char *relPath, Bool isDirectory, uint64_t size) {
  static_cast<std::vector<Entry> *>(ctx)->push_back({relPath, isDirectory != 0, size});
  return TRUE;
}

class Medium {
 public:
  virtual ~Medium() = default;
  virtual std::string ReaderName() const = 0;
  virtual std::string VolumeId() = 0;
  // Each returns an error text, or "" on success.
  virtual std::string List(const std::string &dir, bool recursive, std::vector<Entry> *out) = 0;
  virtual std::string Cat(const std::string &path, FILE *out) = 0;
  virtual std::string Extract(const std::string &path, const std::string &dest) = 0;
};

std::string TakeText(char *text) {
  std::string s = text != nullptr ? text : "";
  std::free(text);
  return s;
}

class IsoMedium final : public Medium {
 public:
  IsoMedium(Iso9660Image *image, uint32_t formats) : image_(image), formats_(formats) {}
  ~IsoMedium() override { Iso9660_Close(image_); }

  std::string ReaderName() const override {
    if (formats_ & ISO9660_FORMAT_ROCKRIDGE) return "iso9660 (rock ridge)";
    if (formats_ & ISO9660_FORMAT_JOLIET) return "iso9660 (joliet)";
    return "iso9660";
  }
  std::string VolumeId() override { return TakeText(Iso9660_GetVolumeId(image_)); }
  std::string List(const std::string &dir, bool recursive, std::vector<Entry> *out) override {
    int rc = Iso9660_ListTree(image_, dir.c_str(), recursive, Collect, out);
    return rc == ISO9660_OK ? "" : TreeError(rc);
  }
  std::string Cat(const std::string &path, FILE *out) override {
    // A record holding only a name opens that path from the root.
    Iso9660DirEntry e{};
    if (path.size() >= sizeof e.name) return "path too long";
    std::memcpy(e.name, path.data(), path.size());
    Iso9660File *f = nullptr;
    int rc = Iso9660_OpenFile(image_, &e, &f);
    if (rc != ISO9660_OK) return TreeError(rc);
    std::vector<char> buf(64 * 1024);
    std::string err;
    for (;;) {
      size_t n = buf.size();
      rc = Iso9660_ReadFile(image_, f, buf.data(), &n);
      if (rc == ISO9660_END) break;
      if (rc != ISO9660_OK) {
        err = TreeError(rc);
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
    return rc == ISO9660_OK ? "" : TreeError(rc);
  }

 private:
  Iso9660Image *image_;
  uint32_t formats_;
};

class UdfMedium final : public Medium {
 public:
  explicit UdfMedium(UDFVolume *volume) : volume_(volume) {}
  ~UdfMedium() override { UDF_Close(volume_); }

  std::string ReaderName() const override { return "udf"; }
  std::string VolumeId() override { return TakeText(UDF_GetVolumeId(volume_)); }
  std::string List(const std::string &dir, bool recursive, std::vector<Entry> *out) override {
    int rc = UDF_ListTree(volume_, dir.c_str(), recursive, Collect, out);
    return rc == UDF_TREE_OK ? "" : TreeError(rc);
  }
  std::string Cat(const std::string &path, FILE *out) override {
    UDFFile *f = UDF_OpenFile(volume_, nullptr, path.c_str());
    if (f == nullptr) return "no such file";
    uint64_t size = UDF_GetFileSize(volume_, f);
    std::string err = size == UINT64_MAX ? "cannot read the file size" : "";
    std::vector<char> buf(64 * 1024);
    for (uint64_t off = 0; err.empty() && off < size;) {
      size_t n = static_cast<size_t>(std::min<uint64_t>(buf.size(), size - off));
      if (!UDF_PReadFile(f, buf.data(), off, n)) {
        err = "read failed";
      } else if (std::fwrite(buf.data(), 1, n, out) != n) {
        err = std::strerror(errno);
      }
      off += n;
    }
    UDF_CloseFile(f);
    return err;
  }
  std::string Extract(const std::string &path, const std::string &dest) override {
    int rc = UDF_Extract(volume_, path.c_str(), dest.c_str());
    return rc == UDF_TREE_OK ? "" : TreeError(rc);
  }

 private:
  UDFVolume *volume_;
};

// CheckImage says why `path` cannot be an image before the readers try, in
// the words of the system ("No such file or directory"); a FIFO is refused
// without waiting for a writer.
std::string CheckImage(const std::string &path) {
  int fd = ::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
  if (fd < 0) return std::strerror(errno);
  struct stat st {};
  bool ok = ::fstat(fd, &st) == 0 && (S_ISREG(st.st_mode) || S_ISBLK(st.st_mode));
  ::close(fd);
  return ok ? "" : "not a regular file or block device";
}

std::unique_ptr<Medium> OpenMedium(const std::string &path, bool isoOnly, std::string *err) {
  *err = CheckImage(path);
  if (!err->empty()) return nullptr;
  if (!isoOnly) {
    if (UDFVolume *volume = UDF_Open(path.c_str())) return std::make_unique<UdfMedium>(volume);
  }
  uint32_t formats = 0;
  Iso9660_ListFormats(path.c_str(), &formats);
  Iso9660Image *image = nullptr;
  int rc = Iso9660_Open(path.c_str(), formats, &image);
  if (rc != ISO9660_OK) {
    *err = TreeError(rc);
    return nullptr;
  }
  uint32_t used = formats & ISO9660_FORMAT_ROCKRIDGE ? ISO9660_FORMAT_ROCKRIDGE
                  : formats & ISO9660_FORMAT_JOLIET  ? ISO9660_FORMAT_JOLIET
                                                     : ISO9660_FORMAT_PLAIN;
  return std::make_unique<IsoMedium>(image, used);
}

// Shown writes a name for a terminal: control characters (C0, DEL, C1),
// bytes that are not UTF-8 and the backslash itself become \xNN escapes, so
// a crafted name can neither fake a listing line nor steer the terminal.
std::string Shown(const std::string &name) {
  std::string out;
  auto escape = [&out](unsigned char c) {
    char buf[5];
    std::snprintf(buf, sizeof buf, "\\x%02x", c);
    out += buf;
  };
  for (size_t i = 0; i < name.size();) {
    auto c = static_cast<unsigned char>(name[i]);
    size_t n = c < 0x80 ? 1 : (c & 0xE0) == 0xC0 ? 2 : (c & 0xF0) == 0xE0 ? 3 : (c & 0xF8) == 0xF0 ? 4 : 0;
    bool valid = n != 0 && i + n <= name.size();
    for (size_t k = 1; valid && k < n; ++k) valid = (name[i + k] & 0xC0) == 0x80;
    bool control = c < 0x20 || c == 0x7F || c == '\\' ||
                   (c == 0xC2 && n == 2 && valid && static_cast<unsigned char>(name[i + 1]) < 0xA0);
    if (!valid || control) {
      for (size_t k = 0; k < (valid ? n : 1); ++k) escape(static_cast<unsigned char>(name[i + k]));
      i += valid ? n : 1;
    } else {
      out.append(name, i, n);
      i += n;
    }
  }
  return out;
}

int Fail(const std::string &what, const std::string &err, int status) {
  std::fprintf(stderr, "tvxguest media: %s: %s\n", Shown(what).c_str(), err.c_str());
  return status;
}

// Finish reports a write failure on standard output (a full disk, a closed
// pipe) instead of exiting 0 with the output cut short.
int Finish(int status) {
  if (std::fflush(stdout) != 0 || std::ferror(stdout)) {
    return Fail("standard output", std::strerror(errno != 0 ? errno : EIO), 1);
  }
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
  ArgParser parser("media", [] { std::fputs(kUsage, stdout); });
  parser.Flag("--iso9660", &isoOnly);
  if (sub == "ls") parser.Flag("-R", &recursive).Flag("--json", &json);
  std::vector<std::string> pos;
  if (int rc = parser.Parse({args.begin() + 1, args.end()}, &pos); rc >= 0) return rc;
  size_t want = sub == "ls" ? 1 : sub == "cat" ? 2 : sub == "extract" ? 3 : 0;
  if (want == 0) return UsageError("media", "unknown subcommand " + sub);
  if (pos.size() < want || pos.size() > (sub == "ls" ? 2u : want)) {
    return UsageError("media", "wrong number of arguments for " + sub);
  }
  std::string err;
  std::unique_ptr<Medium> m = OpenMedium(pos[0], isoOnly, &err);
  if (m == nullptr) return Fail(pos[0], err, 2);

  if (sub == "cat") {
    errno = 0;
    err = m->Cat(pos[1], stdout);
    return Finish(err.empty() ? 0 : Fail(pos[1], err, 1));
  }
  if (sub == "extract") {
    err = m->Extract(pos[1], pos[2]);
    return err.empty() ? 0 : Fail(pos[1], err, 1);
  }
  std::string dir = pos.size() > 1 ? pos[1] : "/";
  std::vector<Entry> entries;
  err = m->List(dir, recursive, &entries);
  errno = 0;
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
    std::printf("%s volume \"%s\"\n", m->ReaderName().c_str(), Shown(m->VolumeId()).c_str());
    for (const Entry &e : entries) {
      if (e.isDir) {
        std::printf("%12s  %s/\n", "-", Shown(e.path).c_str());
      } else {
        std::printf("%12llu  %s\n", static_cast<unsigned long long>(e.size), Shown(e.path).c_str());
      }
    }
  }
  return Finish(err.empty() ? 0 : Fail(dir, err, 1));
}

const CommandRegistration kMedia({"media", "list, read or extract files of a UDF or ISO 9660 image",
                                  RunMedia});

}  // namespace
}  // namespace tvxcli
