// Medium access for the recognisers: directory listing, existence tests and
// whole-file reads on an install image, the same calls whether the image was
// opened as UDF or as ISO 9660.
//
// Install media disagree about letter case: old Windows and DOS-era media
// carry upper-case level-1 names, Linux media lower-case Rock Ridge names,
// and some mastering tools fold one into the other. Paths and names are
// therefore tried as given, then upper-cased, then lower-cased, so that a
// recogniser names a file once, the way its vendor usually writes it.
#include <cstdlib>
#include <cstring>

#include "lib/guessGuest/guess_internal.h"
#include "platform/dynbuf.h"
#include "platform/file.h"
#include "platform/str.h"
#include "platform/util.h"

namespace {

constexpr size_t kIsoReadChunk = 2048;
constexpr uint32_t kIsoSizeUnknown = 0xFFFFFFFFu;
constexpr uint64_t kUdfSizeUnknown = ~uint64_t{0};

// CaseVariants yields `text` unchanged, upper-cased and lower-cased, in that
// order, converting one private copy in place. A variant equal to the one
// tried just before is skipped: it would fail the same way and cost another
// directory scan.
class CaseVariants {
 public:
  explicit CaseVariants(const char *text)
      : copy_(UtilSafeStrdup0(text)), before_(UtilSafeStrdup0(text)) {}
  ~CaseVariants() {
    std::free(copy_);
    std::free(before_);
  }
  CaseVariants(const CaseVariants &) = delete;
  CaseVariants &operator=(const CaseVariants &) = delete;

  // Next returns the next distinct variant, or null when all were tried.
  const char *Next() {
    while (step_ < 3) {
      int step = step_++;
      if (step == 0) return copy_;
      std::strcpy(before_, copy_);  // same length: the conversions keep it
      if (step == 1) {
        Str_ToUpper(copy_);
      } else {
        Str_ToLower(copy_);
      }
      if (std::strcmp(before_, copy_) != 0) return copy_;
    }
    return nullptr;
  }

 private:
  char *copy_;
  char *before_;
  int step_ = 0;
};

GuessDir *OpenDirOnce(GuessMedium *medium, const char *path) {
  auto *dir = static_cast<GuessDir *>(UtilSafeCalloc0(1, sizeof(GuessDir)));
  bool opened = false;
  if (medium->kind == GUESS_MEDIUM_ISO9660) {
    opened = Iso9660_OpenDir(medium->isoImage, path, &dir->isoDir) == ISO9660_OK;
  } else {
    dir->udfDir = UDF_OpenDir(medium->udfVolume, nullptr, path);
    opened = dir->udfDir != nullptr;
  }
  if (!opened) {
    std::free(dir);
    return nullptr;
  }
  dir->path = UtilSafeStrdup0(path);
  return dir;
}

// ReadIsoFile loads an open ISO 9660 file whole. The entry's size, when
// known, sizes the buffer once; the reader's end-of-file decides the length.
char *ReadIsoFile(Iso9660Image *image, Iso9660File *file, uint32_t size32, uint64_t *out_size) {
  DynBuf buf;
  DynBuf_Init(&buf);
  if (size32 != kIsoSizeUnknown) DynBuf_Enlarge(&buf, size_t{size32} + 1);
  char chunk[kIsoReadChunk];
  for (;;) {
    size_t len = sizeof chunk;
    int rc = Iso9660_ReadFile(image, file, chunk, &len);
    if (rc == ISO9660_END) break;
    // A reader that reports success without bytes would never reach the
    // end; treat it as the failure it is rather than loop.
    if (rc != ISO9660_OK || len == 0 || len > sizeof chunk) {
      DynBuf_Destroy(&buf);
      return nullptr;
    }
    DynBuf_Append(&buf, chunk, len);
  }
  size_t length = DynBuf_GetSize(&buf);
  DynBuf_AppendByte(&buf, '\0');
  if (out_size != nullptr) *out_size = length;
  return static_cast<char *>(DynBuf_Detach(&buf));
}

// FindIso looks `name` up in the directory `dir` names, on a fresh reader
// directory so that the caller's listing position is left alone.
bool FindIso(GuessMedium *medium, GuessDir *dir, const char *name, bool wantData,
             char **out_data, uint64_t *out_size) {
  Iso9660Dir *scan = nullptr;
  if (Iso9660_OpenDir(medium->isoImage, dir->path, &scan) != ISO9660_OK) return false;
  Iso9660DirEntry entry;
  std::memset(&entry, 0, sizeof entry);
  bool found = false;
  while (Iso9660_ReadDir(medium->isoImage, scan, &entry) == ISO9660_OK) {
    if (tvx::ascii::Equal(entry.name, name)) {
      found = true;
      break;
    }
  }
  bool ok = false;
  Iso9660File *file = nullptr;
  if (found && !wantData) {
    // Some media mark themselves by a folder (an application bundle), so a
    // presence test counts directories; only their data cannot be read.
    ok = entry.isDirectory || Iso9660_OpenFile(medium->isoImage, &entry, &file) == ISO9660_OK;
    if (ok && out_size != nullptr) *out_size = 0;
  } else if (found && Iso9660_OpenFile(medium->isoImage, &entry, &file) == ISO9660_OK) {
    *out_data = ReadIsoFile(medium->isoImage, file, entry.size, out_size);
    ok = *out_data != nullptr;
  }
  if (file != nullptr) Iso9660_CloseFile(medium->isoImage, file);
  Iso9660_CloseDir(medium->isoImage, scan);
  return ok;
}

bool FindUdf(GuessMedium *medium, GuessDir *dir, const char *name, bool wantData,
             char **out_data, uint64_t *out_size) {
  UDFFile *file = UDF_OpenFile(medium->udfVolume, dir->udfDir, name);
  if (file == nullptr) {
    // As on ISO 9660, a presence test also finds a directory of that name.
    if (wantData) return false;
    UDFDir *sub = UDF_OpenDir(medium->udfVolume, dir->udfDir, name);
    if (sub == nullptr) return false;
    UDF_CloseDir(sub);
    return true;
  }
  bool ok = true;
  if (wantData) {
    uint64_t size = UDF_GetFileSize(medium->udfVolume, file);
    char *data = nullptr;
    // Sizes are the image's word; one that does not fit memory is refused
    // by the allocation rather than trusted.
    if (size == kUdfSizeUnknown || size >= SIZE_MAX) {
      ok = false;
    } else {
      data = static_cast<char *>(std::malloc(static_cast<size_t>(size) + 1));
      ok = data != nullptr &&
           UDF_PReadFile(file, data, 0, static_cast<size_t>(size));
    }
    if (ok) {
      data[size] = '\0';
      *out_data = data;
      if (out_size != nullptr) *out_size = size;
    } else {
      std::free(data);
    }
  }
  UDF_CloseFile(file);
  return ok;
}

// FindName tests (and with `wantData` reads) one spelling of a name in an
// open directory.
bool FindName(GuessMedium *medium, GuessDir *dir, const char *name, bool wantData,
              char **out_data, uint64_t *out_size) {
  // An empty name would match nothing on UDF and could only find a nameless
  // record on ISO 9660; refuse it alike on both.
  if (name[0] == '\0') return false;
  switch (medium->kind) {
    case GUESS_MEDIUM_ISO9660:
      return FindIso(medium, dir, name, wantData, out_data, out_size);
    case GUESS_MEDIUM_UDF:
      return FindUdf(medium, dir, name, wantData, out_data, out_size);
    default:
      GUESS_NOT_REACHED();
  }
}

void CheckKind(const GuessMedium *medium) {
  if (medium->kind != GUESS_MEDIUM_ISO9660 && medium->kind != GUESS_MEDIUM_UDF) {
    GUESS_NOT_REACHED();
  }
}

}  // namespace

extern "C" {

TVX_EXPORT GuessDir *Guess_OpenDir(GuessMedium *medium, const char *path) {
  if (medium == nullptr || path == nullptr) return nullptr;
  CheckKind(medium);
  CaseVariants variants(path);
  for (const char *v = variants.Next(); v != nullptr; v = variants.Next()) {
    GuessDir *dir = OpenDirOnce(medium, v);
    if (dir != nullptr) return dir;
  }
  return nullptr;
}

TVX_EXPORT const char *Guess_ReadDir(GuessMedium *medium, GuessDir *dir) {
  if (medium == nullptr || dir == nullptr) return nullptr;
  switch (medium->kind) {
    case GUESS_MEDIUM_ISO9660:
      if (Iso9660_ReadDir(medium->isoImage, dir->isoDir, &dir->isoEntry) != ISO9660_OK) {
        return nullptr;
      }
      return dir->isoEntry.name;
    case GUESS_MEDIUM_UDF:
      return UDF_ReadDir(dir->udfDir, 0);
    default:
      GUESS_NOT_REACHED();
  }
}

TVX_EXPORT Bool Guess_RewindDir(GuessMedium *medium, GuessDir *dir) {
  if (medium == nullptr || dir == nullptr) return FALSE;
  switch (medium->kind) {
    case GUESS_MEDIUM_ISO9660:
      return Iso9660_RewindDir(medium->isoImage, dir->isoDir) == ISO9660_OK ? TRUE : FALSE;
    case GUESS_MEDIUM_UDF:
      UDF_RewindDir(dir->udfDir);
      return TRUE;
    default:
      GUESS_NOT_REACHED();
  }
}

TVX_EXPORT Bool Guess_CloseDir(GuessMedium *medium, GuessDir *dir) {
  if (medium == nullptr || dir == nullptr) return FALSE;
  bool closed = false;
  switch (medium->kind) {
    case GUESS_MEDIUM_ISO9660:
      closed = Iso9660_CloseDir(medium->isoImage, dir->isoDir) == ISO9660_OK;
      break;
    case GUESS_MEDIUM_UDF:
      closed = UDF_CloseDir(dir->udfDir);
      break;
    default:
      GUESS_NOT_REACHED();
  }
  if (!closed) return FALSE;
  std::free(dir->path);
  std::free(dir);
  return TRUE;
}

TVX_EXPORT char *Guess_ReadFile(GuessMedium *medium, GuessDir *dir, const char *name,
                                uint64_t *out_size) {
  if (medium == nullptr || dir == nullptr || name == nullptr) return nullptr;
  CaseVariants variants(name);
  for (const char *v = variants.Next(); v != nullptr; v = variants.Next()) {
    char *data = nullptr;
    if (FindName(medium, dir, v, true, &data, out_size)) return data;
  }
  return nullptr;
}

TVX_EXPORT char *Guess_ReadFileName(GuessMedium *medium, const char *path, uint64_t *out_size) {
  if (medium == nullptr || path == nullptr) return nullptr;
  char *dirPart = nullptr;
  char *base = nullptr;
  try {
    File_GetPathName(path, &dirPart, &base);
  } catch (...) {  // allocation failure inside the platform's splitter
    return nullptr;
  }
  char *data = nullptr;
  GuessDir *dir = Guess_OpenDir(medium, dirPart != nullptr ? dirPart : "");
  if (dir != nullptr) {
    data = Guess_ReadFile(medium, dir, base != nullptr ? base : "", out_size);
    Guess_CloseDir(medium, dir);
  }
  std::free(dirPart);
  std::free(base);
  return data;
}

TVX_EXPORT Bool Guess_FileExists(GuessMedium *medium, const char *dirPath, const char *name) {
  if (medium == nullptr || dirPath == nullptr || name == nullptr) return FALSE;
  GuessDir *dir = Guess_OpenDir(medium, dirPath);
  if (dir == nullptr) return FALSE;
  bool found = FindName(medium, dir, name, false, nullptr, nullptr);
  Guess_CloseDir(medium, dir);
  return found ? TRUE : FALSE;
}

TVX_EXPORT Bool Guess_FileExistsWithPrefix(GuessMedium *medium, const char *dirPath,
                                           const char *prefix) {
  if (medium == nullptr || dirPath == nullptr || prefix == nullptr) return FALSE;
  GuessDir *dir = Guess_OpenDir(medium, dirPath);
  if (dir == nullptr) return FALSE;
  bool found = false;
  for (const char *name = Guess_ReadDir(medium, dir); name != nullptr && !found;
       name = Guess_ReadDir(medium, dir)) {
    found = StrUtil_CaselessStartsWith(name, prefix);
  }
  Guess_CloseDir(medium, dir);
  return found ? TRUE : FALSE;
}

TVX_EXPORT GuessElfArch Guess_ELF_Arch(const void *buffer, size_t length) {
  // Only the low byte of e_machine (offset 18) matters: install media ship
  // little-endian kernels, and the values told apart all fit one byte.
  constexpr size_t kMachineOffset = 18;
  if (buffer == nullptr || length <= kMachineOffset) return GUESS_ELF_ARCH_UNKNOWN;
  switch (static_cast<const unsigned char *>(buffer)[kMachineOffset]) {
    case 62:  // EM_X86_64
      return GUESS_ELF_ARCH_X86_64;
    case 3:  // EM_386
    case 6:  // EM_486
    case 7:  // EM_860
      return GUESS_ELF_ARCH_X86;
    case 183:  // EM_AARCH64
      return GUESS_ELF_ARCH_ARM64;
    default:
      return GUESS_ELF_ARCH_UNKNOWN;
  }
}

}  // extern "C"
