// The root directory: 32-byte entries. A short entry holds an 8.3 name in
// 11 bytes (0xE5 first: deleted, 0x00 first: end of the directory), the
// attributes, the Windows NT lower-case flags (byte 12) and the first cluster
// and size. A long name (VFAT) is stored in entries of attribute 0x0F just
// before its short entry, last part first, 13 UTF-16 units each, each
// carrying the short name's checksum.
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <new>
#include <string_view>

#include "platform/ascii.h"
#include "platform/endian.h"
#include "platform/fat/fat_internal.h"
#include "platform/utf8.h"
#include "platform/util.h"

using tvx::LoadLe16;
using tvx::LoadLe32;
using tvx::StoreLe16;
using tvx::StoreLe32;
using tvx::fat::kAttrDir;
namespace ascii = tvx::ascii;

namespace {

constexpr uint8_t kAttrVolume = 0x08, kAttrLongName = 0x0F, kAttrArchive = 0x20;
constexpr uint8_t kLowerBase = 0x08, kLowerExt = 0x10;
constexpr uint8_t kDeleted = 0xE5;
constexpr int kLongOffsets[13] = {1, 3, 5, 7, 9, 14, 16, 18, 20, 22, 24, 28, 30};

bool IsLongPart(const uint8_t *e) { return (e[11] & 0x3F) == kAttrLongName; }

uint8_t Checksum(const uint8_t *shortName) {
  uint8_t sum = 0;
  for (int i = 0; i < 11; i++) {
    sum = static_cast<uint8_t>(((sum & 1) << 7) + (sum >> 1) + shortName[i]);
  }
  return sum;
}

// Utf8ToUtf16 refuses what is not well-formed UTF-8 (overlong forms,
// surrogates, code points past U+10FFFF): such a name could not be read back
// as written.
bool Utf8ToUtf16(std::string_view s, std::vector<uint16_t> *out) {
  for (size_t i = 0; i < s.size();) {
    auto c = static_cast<unsigned char>(s[i]);
    uint32_t cp;
    size_t n;
    if (c < 0x80) {
      cp = c, n = 1;
    } else if ((c & 0xE0) == 0xC0) {
      cp = c & 0x1F, n = 2;
    } else if ((c & 0xF0) == 0xE0) {
      cp = c & 0x0F, n = 3;
    } else if ((c & 0xF8) == 0xF0) {
      cp = c & 0x07, n = 4;
    } else {
      return false;
    }
    if (n > s.size() - i) return false;
    for (size_t k = 1; k < n; k++) {
      auto cc = static_cast<unsigned char>(s[i + k]);
      if ((cc & 0xC0) != 0x80) return false;
      cp = (cp << 6) | (cc & 0x3F);
    }
    static const uint32_t kMin[] = {0, 0, 0x80, 0x800, 0x10000};
    if (cp < kMin[n] || cp > 0x10FFFF || (cp >= 0xD800 && cp < 0xE000)) return false;
    if (cp >= 0x10000) {
      out->push_back(static_cast<uint16_t>(0xD800 + ((cp - 0x10000) >> 10)));
      out->push_back(static_cast<uint16_t>(0xDC00 + ((cp - 0x10000) & 0x3FF)));
    } else {
      out->push_back(static_cast<uint16_t>(cp));
    }
    i += n;
  }
  return true;
}

std::string ShortName(const uint8_t *e) {
  auto part = [e](int from, int len, bool lower) {
    std::string s;
    for (int i = from; i < from + len; i++) {
      uint8_t c = (i == 0 && e[0] == 0x05) ? kDeleted : e[i];
      if (c >= 0x80) c = '_';  // OEM code page letters: not worth a table here
      s.push_back(lower ? ascii::ToLower(static_cast<char>(c)) : static_cast<char>(c));
    }
    while (!s.empty() && s.back() == ' ') s.pop_back();
    return s;
  };
  std::string base = part(0, 8, (e[12] & kLowerBase) != 0);
  std::string ext = part(8, 3, (e[12] & kLowerExt) != 0);
  return ext.empty() ? base : base + "." + ext;
}

// Scan moves the iterator to the next entry at or after it->nextSlot.
unsigned long Scan(FATDirIter *it) {
  const FATVolume *v = it->dir->volume;
  std::vector<uint16_t> longName;
  int expect = 0;  // long-name part expected next (counting down), 0: none
  uint8_t longSum = 0;
  uint32_t longFirst = 0;
  it->valid = false;
  for (uint32_t slot = it->nextSlot; slot < v->rootEntries; slot++) {
    const uint8_t *e = v->Entry(slot);
    if (e[0] == 0x00) break;
    if (e[0] == kDeleted) {
      expect = 0;
      continue;
    }
    if (IsLongPart(e)) {
      int seq = e[0] & 0x1F;
      if ((e[0] & 0x40) != 0) {
        longName.assign(static_cast<size_t>(seq) * 13, 0xFFFF);
        longSum = e[13];
        longFirst = slot;
        expect = seq;
      }
      if (seq == 0 || seq != expect || e[13] != longSum) {
        expect = 0;  // an orphaned or out-of-order part: ignore the long name
        continue;
      }
      for (int k = 0; k < 13; k++) {
        longName[static_cast<size_t>(seq - 1) * 13 + k] = LoadLe16(e + kLongOffsets[k]);
      }
      expect = seq - 1;
      if (expect == 0) expect = -1;  // complete: the short entry must follow
      continue;
    }
    bool complete = expect == -1 && Checksum(e) == longSum;
    expect = 0;
    if ((e[11] & kAttrVolume) != 0) continue;
    std::string name;
    if (complete) {
      size_t n = 0;
      while (n < longName.size() && longName[n] != 0x0000 && longName[n] != 0xFFFF) n++;
      tvx::utf8::AppendUtf16(n, [&longName](size_t i) { return longName[i]; }, &name);
    }
    if (name.empty()) name = ShortName(e);
    if (name == "." || name == "..") continue;
    it->name = name;
    it->isDir = (e[11] & kAttrDir) != 0;
    it->slot = slot;
    it->firstSlot = complete ? longFirst : slot;
    it->nextSlot = slot + 1;
    it->valid = true;
    return FAT_OK;
  }
  it->nextSlot = v->rootEntries;
  return FAT_ERR_END;
}

// Find looks a name up among long and short names, ASCII case ignored.
bool Find(FATDirectory *dir, std::string_view name, FATDirIter *found) {
  FATDirIter it;
  it.dir = dir;
  while (Scan(&it) == FAT_OK) {
    if (ascii::Equal(it.name, name) || ascii::Equal(ShortName(dir->volume->Entry(it.slot)), name)) {
      *found = it;
      return true;
    }
  }
  return false;
}

bool IsShortChar(char c) {
  return ascii::IsUpper(c) || ascii::IsDigit(c) ||
         (c != '\0' && std::strchr("!#$%&'()-@^_`{}~", c) != nullptr);
}

// Fits83 tells whether `name`, upper-cased, is a valid 8.3 name, and fills
// the 11-byte form.
bool Fits83(std::string_view name, uint8_t out[11]) {
  size_t dot = name.find('.');
  std::string_view base = name.substr(0, dot);
  std::string_view ext = dot == std::string_view::npos ? "" : name.substr(dot + 1);
  if (base.empty() || base.size() > 8 || ext.size() > 3 || ext.find('.') != std::string_view::npos ||
      (dot != std::string_view::npos && ext.empty())) {
    return false;
  }
  std::memset(out, ' ', 11);
  for (size_t i = 0; i < base.size(); i++) {
    char c = ascii::ToUpper(base[i]);
    if (!IsShortChar(c)) return false;
    out[i] = static_cast<uint8_t>(c);
  }
  for (size_t i = 0; i < ext.size(); i++) {
    char c = ascii::ToUpper(ext[i]);
    if (!IsShortChar(c)) return false;
    out[8 + i] = static_cast<uint8_t>(c);
  }
  return true;
}

bool ShortTaken(const FATVolume *v, const uint8_t name[11]) {
  for (uint32_t s = 0; s < v->rootEntries; s++) {
    const uint8_t *e = v->Entry(s);
    if (e[0] == 0x00) break;
    if (e[0] != kDeleted && !IsLongPart(e) && std::memcmp(e, name, 11) == 0) return true;
  }
  return false;
}

// MakeShortName derives "BASE~N.EXT" for a name that needs a long entry.
bool MakeShortName(const FATVolume *v, std::string_view name, uint8_t out[11]) {
  size_t dot = name.rfind('.');
  bool hasExt = dot != std::string_view::npos && dot != 0;
  std::string_view rawBase = hasExt ? name.substr(0, dot) : name;
  std::string_view rawExt = hasExt ? name.substr(dot + 1) : "";
  auto clean = [](std::string_view s, size_t max) {
    std::string r;
    for (char c : s) {
      if (c == ' ' || c == '.') continue;
      char u = ascii::ToUpper(c);
      r.push_back(IsShortChar(u) ? u : '_');
      if (r.size() == max) break;
    }
    return r;
  };
  std::string base = clean(rawBase, 8), ext = clean(rawExt, 3);
  if (base.empty()) base = "_";
  // A root directory holds at most a few hundred names: the first free
  // number is found long before the tail outgrows the base.
  for (unsigned n = 1; n < 1000000; n++) {
    std::string tail = "~" + std::to_string(n);
    std::string b = base.substr(0, 8 - tail.size()) + tail;
    std::memset(out, ' ', 11);
    std::memcpy(out, b.data(), b.size());
    std::memcpy(out + 8, ext.data(), ext.size());
    if (!ShortTaken(v, out)) return true;
  }
  return false;
}

bool ValidLongName(std::string_view name) {
  if (name.empty() || name == "." || name == ".." || name.back() == '.' || name.back() == ' ') {
    return false;
  }
  for (char c : name) {
    if (ascii::IsControl(c) || (c != '\0' && std::strchr("\"*/:<>?\\|", c) != nullptr)) {
      return false;
    }
  }
  return true;
}

void DosNow(uint16_t *date, uint16_t *time) {
  std::time_t t = std::time(nullptr);
  std::tm tm{};
  localtime_r(&t, &tm);
  int year = tm.tm_year + 1900 < 1980 ? 1980 : tm.tm_year + 1900;
  *date = static_cast<uint16_t>(((year - 1980) << 9) | ((tm.tm_mon + 1) << 5) | tm.tm_mday);
  *time = static_cast<uint16_t>((tm.tm_hour << 11) | (tm.tm_min << 5) | (tm.tm_sec / 2));
}

// CaseFlags decides whether a name that fits 8.3 keeps its letter case in
// the NT flags: one case per part can be kept, mixed case needs a long name.
bool CaseFlags(std::string_view name, uint8_t *flags) {
  size_t dot = name.find('.');
  std::string_view base = name.substr(0, dot);
  std::string_view ext = dot == std::string_view::npos ? "" : name.substr(dot + 1);
  auto any = [](std::string_view s, bool (*is)(char)) {
    for (char c : s) {
      if (is(c)) return true;
    }
    return false;
  };
  auto isLower = [](char c) { return ascii::IsLower(c); };
  auto isUpper = [](char c) { return ascii::IsUpper(c); };
  if ((any(base, isLower) && any(base, isUpper)) || (any(ext, isLower) && any(ext, isUpper))) {
    return false;
  }
  *flags = static_cast<uint8_t>((any(base, isLower) ? kLowerBase : 0) |
                                (any(ext, isLower) ? kLowerExt : 0));
  return true;
}

// FreeRun finds `need` consecutive free slots: deleted ones, or the unused
// tail after the end mark.
bool FreeRun(const FATVolume *v, uint32_t need, uint32_t *start) {
  uint32_t run = 0;
  for (uint32_t s = 0; s < v->rootEntries; s++) {
    uint8_t first = v->Entry(s)[0];
    if (first != 0x00 && first != kDeleted) {
      run = 0;
      continue;
    }
    if (run++ == 0) *start = s;
    if (run == need) return true;
  }
  return false;
}

void WriteLongParts(FATVolume *v, uint32_t start, uint32_t count, const uint8_t shortName[11],
                    const std::vector<uint16_t> &units) {
  uint8_t sum = Checksum(shortName);
  for (uint32_t i = 0; i < count; i++) {
    uint32_t seq = count - i;  // physical order: last part first
    uint8_t *e = v->Entry(start + i);
    std::memset(e, 0, 32);
    e[0] = static_cast<uint8_t>(seq | (i == 0 ? 0x40 : 0));
    e[11] = kAttrLongName;
    e[13] = sum;
    for (int k = 0; k < 13; k++) {
      size_t at = (seq - 1) * 13 + static_cast<size_t>(k);
      uint16_t u = at < units.size() ? units[at] : at == units.size() ? 0x0000 : 0xFFFF;
      StoreLe16(e + kLongOffsets[k], u);
    }
  }
}

}  // namespace

unsigned long FAT_OpenRootDirectory(FATVolume *volume, FATDirectory **out_dir) {
  *out_dir = nullptr;
  if (volume == nullptr) return FAT_ERR_ARGS;
  auto *d = new (std::nothrow) FATDirectory;
  if (d == nullptr) return FAT_ERR_IO;
  d->volume = volume;
  d->iter.dir = d;
  *out_dir = d;
  return FAT_OK;
}

unsigned long FAT_CloseDirectory(FATDirectory *dir) {
  if (dir == nullptr) return FAT_OK;
  unsigned long rc = dir->volume->Flush();
  delete dir;
  return rc;
}

unsigned long FAT_GetDirIter(FATDirectory *dir, FATDirIter **out_iter) {
  *out_iter = nullptr;
  if (dir == nullptr) return FAT_ERR_ARGS;
  dir->iter = FATDirIter();
  dir->iter.dir = dir;
  *out_iter = &dir->iter;
  return FAT_OK;
}

unsigned long FAT_DirIterNext(FATDirIter *iter) {
  if (iter == nullptr) return FAT_ERR_ARGS;
  try {
    return Scan(iter);
  } catch (...) {
    return FAT_ERR_IO;
  }
}

unsigned long FAT_DirIterGetName(const FATDirIter *iter, char **out_name) {
  *out_name = nullptr;
  if (iter == nullptr || !iter->valid) return FAT_ERR_END;
  *out_name = UtilSafeStrdup0(iter->name.c_str());
  return FAT_OK;
}

Bool FAT_DirIterIsDir(const FATDirIter *iter) { return iter != nullptr && iter->valid && iter->isDir; }

unsigned long FAT_DirIterGetSize(const FATDirIter *iter, uint64_t *out_size) {
  *out_size = 0;
  if (iter == nullptr || !iter->valid) return FAT_ERR_END;
  if (!iter->isDir) *out_size = LoadLe32(iter->dir->volume->Entry(iter->slot) + tvx::fat::kEntrySize);
  return FAT_OK;
}

unsigned long FAT_OpenFile(FATDirectory *dir, const char *name, FATFile **out_file) try {
  *out_file = nullptr;
  if (dir == nullptr || name == nullptr) return FAT_ERR_ARGS;
  FATDirIter found;
  if (!Find(dir, name, &found) || found.isDir) return FAT_ERR_NOT_FOUND;
  *out_file = new FATFile(dir->volume, found.slot);
  return FAT_OK;
} catch (...) {
  return FAT_ERR_IO;
}

unsigned long FAT_DeleteFile(FATDirectory *dir, const char *name) try {
  if (dir == nullptr || name == nullptr) return FAT_ERR_ARGS;
  FATDirIter found;
  if (!Find(dir, name, &found) || found.isDir) return FAT_ERR_NOT_FOUND;
  FATVolume *v = dir->volume;
  std::vector<uint32_t> chain;
  unsigned long rc =
      v->Chain(LoadLe16(v->Entry(found.slot) + tvx::fat::kEntryFirstCluster), &chain);
  if (rc != FAT_OK) return rc;
  tvx::fat::FreeChain(v, chain);
  for (uint32_t s = found.firstSlot; s <= found.slot; s++) v->Entry(s)[0] = kDeleted;
  v->dirty = true;
  return FAT_OK;
} catch (...) {
  return FAT_ERR_IO;
}

unsigned long FAT_CreateFile(FATDirectory *dir, const char *name, FATFile **out_file) try {
  *out_file = nullptr;
  if (dir == nullptr || name == nullptr) return FAT_ERR_ARGS;
  std::string_view n(name);
  std::vector<uint16_t> units;
  if (!ValidLongName(n) || !Utf8ToUtf16(n, &units) || units.size() > 255) return FAT_ERR_BAD_NAME;
  FATDirIter found;
  if (Find(dir, n, &found)) return FAT_ERR_EXISTS;
  FATVolume *v = dir->volume;

  uint8_t shortName[11];
  uint8_t caseFlags = 0;
  bool needLong = true;
  if (Fits83(n, shortName) && !ShortTaken(v, shortName)) {
    needLong = !CaseFlags(n, &caseFlags);
  } else if (!MakeShortName(v, n, shortName)) {
    return FAT_ERR_NO_SPACE;
  }
  uint32_t longCount = needLong ? static_cast<uint32_t>((units.size() + 12) / 13) : 0;
  uint32_t start = 0;
  if (!FreeRun(v, longCount + 1, &start)) return FAT_ERR_NO_SPACE;
  auto *f = new FATFile(v, start + longCount);

  WriteLongParts(v, start, longCount, shortName, units);
  uint8_t *e = v->Entry(start + longCount);
  std::memset(e, 0, 32);
  std::memcpy(e, shortName, 11);
  e[11] = kAttrArchive;
  e[12] = caseFlags;
  uint16_t date = 0, time = 0;
  DosNow(&date, &time);
  StoreLe16(e + 14, time);
  StoreLe16(e + 16, date);
  StoreLe16(e + 18, date);
  StoreLe16(e + 22, time);
  StoreLe16(e + 24, date);
  v->dirty = true;
  *out_file = f;
  return FAT_OK;
} catch (...) {
  return FAT_ERR_IO;
}
