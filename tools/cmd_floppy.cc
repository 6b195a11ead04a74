// tvxguest floppy: look into and edit the FAT floppy images that unattended
// installs use, through the library's own FAT code.
#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "arg_parser.h"
#include "command.h"
#include "floppy_cli.h"
#include "json.h"
#include "tools_common.h"
#include "tvx_fat.h"
#include "tvx_floppy.h"

namespace tvxcli {
namespace {

constexpr char kName[] = "floppy";

constexpr const char *kUsage =
    "Usage: tvxguest floppy ls [--json] IMAGE\n"
    "       tvxguest floppy get IMAGE NAME [HOSTFILE]\n"
    "       tvxguest floppy add IMAGE HOSTFILE [NAME]\n"
    "       tvxguest floppy format [--size KB] [--force] IMAGE\n\n"
    "Look into and edit FAT12/FAT16 floppy images such as autoinst.flp. Names on the\n"
    "floppy match without regard to letter case.\n\n"
    "  ls      list the root directory: size and name, directories end in \"/\"; the\n"
    "          last line gives the free room\n"
    "  get     copy the file NAME out to HOSTFILE (\"-\" or none: standard output)\n"
    "  add     copy HOSTFILE in as NAME (default: HOSTFILE's own name), replacing a\n"
    "          file of that name\n"
    "  format  make IMAGE a new empty floppy of 1440 KB (or --size 720 or 2880)\n\n"
    "Options:\n"
    "  --json     print the listing as one JSON object\n"
    "  --size KB  floppy size for format: 720, 1440 or 2880\n"
    "  --force    let format replace an existing IMAGE\n"
    "  -h, --help show this help\n\n"
    "Exit status: 0 success, 1 the operation failed, 2 IMAGE cannot be opened,\n"
    "64 usage error.\n";

int Fail(const std::string &what, const std::string &why, int status) {
  std::fprintf(stderr, "tvxguest %s: %s: %s\n", kName, what.c_str(), why.c_str());
  return status;
}

// Floppy holds an open image and its root directory.
class Floppy {
 public:
  ~Floppy() {
    FAT_CloseDirectory(root_);
    FAT_CloseVolume(volume_);
  }
  unsigned long Open(const std::string &path) {
    unsigned long rc = FAT_OpenVolume(FATDevFileIO_Open(path.c_str()), &volume_);
    return rc == FAT_OK ? FAT_OpenRootDirectory(volume_, &root_) : rc;
  }
  // Close writes the image back and says whether that worked.
  unsigned long Close() {
    unsigned long rc = FAT_CloseDirectory(root_);
    unsigned long rv = FAT_CloseVolume(volume_);
    root_ = nullptr;
    volume_ = nullptr;
    return rc != FAT_OK ? rc : rv;
  }
  FATVolume *volume() const { return volume_; }
  FATDirectory *root() const { return root_; }

 private:
  FATVolume *volume_ = nullptr;
  FATDirectory *root_ = nullptr;
};

int List(Floppy &f, const std::string &image, bool json) {
  struct Entry {
    std::string name;
    uint64_t size;
    bool isDir;
  };
  std::vector<Entry> entries;
  FATDirIter *it = nullptr;
  FAT_GetDirIter(f.root(), &it);
  while (FAT_DirIterNext(it) == FAT_OK) {
    char *name = nullptr;
    uint64_t size = 0;
    FAT_DirIterGetName(it, &name);
    FAT_DirIterGetSize(it, &size);
    entries.push_back({name != nullptr ? name : "", size, FAT_DirIterIsDir(it) != FALSE});
    std::free(name);
  }
  uint64_t free = 0;
  FAT_GetFreeBytes(f.volume(), &free);
  if (json) {
    std::string list = "[";
    for (size_t i = 0; i < entries.size(); ++i) {
      JsonObject o;
      o.Str("name", entries[i].name).Bool("directory", entries[i].isDir);
      o.Num("size", static_cast<int64_t>(entries[i].size));
      list += (i ? ", " : "") + o.Text();
    }
    std::printf("%s\n", JsonObject()
                            .Str("image", image)
                            .Raw("entries", list + "]")
                            .Num("freeBytes", static_cast<int64_t>(free))
                            .Text()
                            .c_str());
    return 0;
  }
  for (const Entry &e : entries) {
    if (e.isDir) {
      std::printf("%10s  %s/\n", "-", e.name.c_str());
    } else {
      std::printf("%10llu  %s\n", static_cast<unsigned long long>(e.size), e.name.c_str());
    }
  }
  std::printf("%llu bytes free\n", static_cast<unsigned long long>(free));
  return 0;
}

int GetToStdout(Floppy &f, const std::string &name) {
  FATFile *file = nullptr;
  unsigned long rc = FAT_OpenFile(f.root(), name.c_str(), &file);
  if (rc != FAT_OK) return Fail(name, FatErrorText(rc), 1);
  char buf[4096];
  size_t n = 0;
  uint64_t at = 0;
  while ((rc = FAT_ReadFile(file, at, buf, sizeof buf, &n)) == FAT_OK && n > 0) {
    if (std::fwrite(buf, 1, n, stdout) != n) break;
    at += n;
  }
  FAT_CloseFile(file);
  if (rc != FAT_OK) return Fail(name, FatErrorText(rc), 1);
  return std::fflush(stdout) == 0 ? 0 : Fail(name, "cannot write standard output", 1);
}

int Format(const std::string &image, uint64_t kb, bool force) {
  struct stat st;
  if (!force && lstat(image.c_str(), &st) == 0) {
    return Fail(image, "exists (give --force to replace it)", 1);
  }
  FATVolume *volume = nullptr;
  unsigned long rc = FAT_FormatVolume(FATDevFileIO_Open(image.c_str()), kb * 1024, 0, &volume);
  if (rc == FAT_OK) rc = FAT_CloseVolume(volume);
  if (rc != FAT_OK) return Fail(image, FatErrorText(rc), 1);
  std::printf("formatted %s: %llu KB\n", image.c_str(), static_cast<unsigned long long>(kb));
  return 0;
}

std::string BaseName(const std::string &path) {
  size_t slash = path.find_last_of('/');
  return slash == std::string::npos ? path : path.substr(slash + 1);
}

int Run(const std::vector<std::string> &args) {
  if (args.empty()) return UsageError(kName, "missing subcommand (ls, get, add or format)");
  const std::string &sub = args[0];
  bool json = false, force = false;
  uint64_t kb = 1440;
  auto help = [] { std::fputs(kUsage, stdout); };
  if (IsHelp(sub)) {
    help();
    return 0;
  }
  ArgParser parser(kName, help);
  if (sub == "ls") parser.Flag("--json", &json);
  if (sub == "format") {
    parser.Flag("--force", &force).Value("--size", [&kb](const std::string &v) {
      if (v != "720" && v != "1440" && v != "2880")
        return std::string("--size is 720, 1440 or 2880");
      kb = std::strtoull(v.c_str(), nullptr, 10);
      return std::string();
    });
  }
  std::vector<std::string> pos;
  int status = parser.Parse({args.begin() + 1, args.end()}, &pos);
  if (status >= 0) return status;
  struct Arity {
    const char *sub;
    size_t min, max;
  };
  const Arity arities[] = {{"ls", 1, 1}, {"get", 2, 3}, {"add", 2, 3}, {"format", 1, 1}};
  const Arity *arity = nullptr;
  for (const Arity &a : arities) arity = sub == a.sub ? &a : arity;
  if (arity == nullptr) return UsageError(kName, "unknown subcommand " + sub);
  if (pos.size() < arity->min || pos.size() > arity->max) {
    return UsageError(kName, "wrong number of arguments for " + sub);
  }
  const std::string &image = pos[0];
  if (sub == "format") return Format(image, kb, force);

  Floppy f;
  unsigned long rc = f.Open(image);
  if (rc != FAT_OK) return Fail(image, FatErrorText(rc), 2);
  if (sub == "ls") return List(f, image, json);
  if (sub == "get" && (pos.size() == 2 || pos[2] == "-")) return GetToStdout(f, pos[1]);

  LogLines log;
  bool ok = sub == "get" ? GetFileFromFloppyImg(f.root(), pos[1].c_str(), pos[2].c_str())
                         : AddFileToFloppyImg(f.root(), pos[1].c_str(),
                                              (pos.size() > 2 ? pos[2] : BaseName(pos[1])).c_str());
  rc = f.Close();
  if (ok && rc == FAT_OK) return 0;
  std::fprintf(stderr, "tvxguest %s %s: failed%s\n", kName, sub.c_str(),
               rc != FAT_OK ? (std::string(": image ") + FatErrorText(rc)).c_str() : "");
  log.Print(stderr);
  return 1;
}

const CommandRegistration kRegistration({kName, "list, read, add or format files of a FAT floppy image",
                                         Run});

}  // namespace
}  // namespace tvxcli
