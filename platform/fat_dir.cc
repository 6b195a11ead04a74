// The root directory: 32-byte entries. A short entry holds an 8.3 name in
// 11 bytes (0xE5 first: deleted, 0x00 first: end of the directory), the
// attributes, the Windows NT lower-case flags (byte 12) and the first cluster
// and size. A long name (VFAT) is stored in entries of attribute 0x0F just
// before its short entry, last part first, 13 UTF-16 units each, each
// carrying the short name's checksum.
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <strings.h>

#include "platform/fat_internal.h"
#include "platform/utf8.h"
#include "platform/util.h"

using tvx::Le16;
using tvx::Put16;
using tvx::Put32;

namespace {

constexpr uint8_t kAttrDir = 0x10, kAttrVolume = 0x08, kAttrLongName = 0x0F, kAttrArchive = 0x20;
constexpr uint8_t kLowerBase = 0x08, kLowerExt = 0x10;
constexpr int kLongOffsets[13] = {1, 3, 5, 7, 9, 14, 16, 18, 20, 22, 24, 28, 30};

uint8_t Checksum(const uint8_t *shortName) {
  uint8_t sum = 0;
  for (int i = 0; i < 11; i++) sum = static_cast<uint8_t>(((sum & 1) << 7) + (sum >> 1) + shortName[i]);
  return sum;
}


std::string Utf16ToUtf8(const std::vector<uint16_t> &units) {
  std::string out;
  tvx::utf8::AppendUtf16(units.size(), [&units](size_t i) { return units[i]; }, &out);
  return out;
}

bool Utf8ToUtf16(const std::string &s, std::vector<uint16_t> *out) {
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
    if (i + n > s.size()) return false;
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
      uint8_t c = (i == 0 && e[0] == 0x05) ? 0xE5 : e[i];
      if (c >= 0x80) c = '_';  // OEM code page letters: not worth a table here
      if (lower && c >= 'A' && c <= 'Z') c = static_cast<uint8_t>(c - 'A' + 'a');
      s.push_back(static_cast<char>(c));
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
  FATVolume *v = it->dir->volume;
  std::vector<uint16_t> longName;
  int expect = 0;  // long-name part expected next (counting down), 0: none
  uint8_t longSum = 0;
  it->valid = false;
  for (uint32_t slot = it->nextSlot; slot < v->rootEntries; slot++) {
    const uint8_t *e = v->Entry(slot);
    if (e[0] == 0x00) break;
    if (e[0] == 0xE5) {
      expect = 0;
      continue;
    }
    if ((e[11] & 0x3F) == kAttrLongName) {
      int seq = e[0] & 0x1F;
      if ((e[0] & 0x40) != 0) {
        longName.assign(static_cast<size_t>(seq) * 13, 0xFFFF);
        longSum = e[13];
        expect = seq;
      }
      if (seq == 0 || seq != expect || e[13] != longSum) {
        expect = 0;  // an orphaned or out-of-order part: ignore the long name
        continue;
      }
      for (int k = 0; k < 13; k++) longName[(seq - 1) * 13 + k] = Le16(e + kLongOffsets[k]);
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
      longName.resize(n);
      name = Utf16ToUtf8(longName);
    }
    if (name.empty()) name = ShortName(e);
    if (name == "." || name == "..") continue;
    it->name = name;
    it->isDir = (e[11] & kAttrDir) != 0;
    it->slot = slot;
    it->nextSlot = slot + 1;
    it->valid = true;
    return FAT_OK;
  }
  it->nextSlot = v->rootEntries;
  return FAT_ERR_END;
}

// Find looks a name up among long and short names, ASCII case ignored.
bool Find(FATDirectory *dir, const std::string &name, uint32_t *slot, bool *isDir) {
  FATDirIter it;
  it.dir = dir;
  while (Scan(&it) == FAT_OK) {
    if (strcasecmp(it.name.c_str(), name.c_str()) == 0 ||
        strcasecmp(ShortName(dir->volume->Entry(it.slot)).c_str(), name.c_str()) == 0) {
      *slot = it.slot;
      *isDir = it.isDir;
      return true;
    }
  }
  return false;
}

bool IsShortChar(char c) {
  return (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || std::strchr("!#$%&'()-@^_`{}~", c) != nullptr;
}

// Fits83 tells whether `name`, upper-cased, is a valid 8.3 name, and fills
// the 11-byte form.
bool Fits83(const std::string &name, uint8_t out[11]) {
  size_t dot = name.find('.');
  std::string base = name.substr(0, dot);
  std::string ext = dot == std::string::npos ? "" : name.substr(dot + 1);
  if (base.empty() || base.size() > 8 || ext.size() > 3 || ext.find('.') != std::string::npos ||
      (dot != std::string::npos && ext.empty())) {
    return false;
  }
  std::memset(out, ' ', 11);
  for (size_t i = 0; i < base.size(); i++) {
    char c = base[i] >= 'a' && base[i] <= 'z' ? static_cast<char>(base[i] - 32) : base[i];
    if (!IsShortChar(c)) return false;
    out[i] = static_cast<uint8_t>(c);
  }
  for (size_t i = 0; i < ext.size(); i++) {
    char c = ext[i] >= 'a' && ext[i] <= 'z' ? static_cast<char>(ext[i] - 32) : ext[i];
    if (!IsShortChar(c)) return false;
    out[8 + i] = static_cast<uint8_t>(c);
  }
  if (out[0] == 0xE5) out[0] = 0x05;
  return true;
}

bool ShortTaken(FATVolume *v, const uint8_t name[11]) {
  for (uint32_t s = 0; s < v->rootEntries; s++) {
    const uint8_t *e = v->Entry(s);
    if (e[0] == 0x00) break;
    if (e[0] != 0xE5 && (e[11] & 0x3F) != kAttrLongName && std::memcmp(e, name, 11) == 0) return true;
  }
  return false;
}

// MakeShortName derives "BASE~N.EXT" for a name that needs a long entry.
bool MakeShortName(FATVolume *v, const std::string &name, uint8_t out[11]) {
  size_t dot = name.rfind('.');
  std::string rawBase = dot == std::string::npos || dot == 0 ? name : name.substr(0, dot);
  std::string rawExt = dot == std::string::npos || dot == 0 ? "" : name.substr(dot + 1);
  auto clean = [](const std::string &s, size_t max) {
    std::string r;
    for (char c : s) {
      if (c == ' ' || c == '.') continue;
      char u = c >= 'a' && c <= 'z' ? static_cast<char>(c - 32) : c;
      r.push_back(IsShortChar(u) ? u : '_');
      if (r.size() == max) break;
    }
    return r;
  };
  std::string base = clean(rawBase, 8), ext = clean(rawExt, 3);
  if (base.empty()) base = "_";
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

bool ValidLongName(const std::string &name) {
  if (name.empty() || name == "." || name == ".." || name.back() == '.' || name.back() == ' ') {
    return false;
  }
  for (unsigned char c : name) {
    if (c < 0x20 || c == 0x7F || std::strchr("\"*/:<>?\\|", c) != nullptr) return false;
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

}  // namespace

unsigned long FAT_OpenRootDirectory(FATVolume *volume, FATDirectory **out_dir) {
  *out_dir = nullptr;
  if (volume == nullptr) return FAT_ERR_ARGS;
  auto *d = new FATDirectory;
  d->volume = volume;
  d->iter.dir = d;
  volume->openHandles++;
  *out_dir = d;
  return FAT_OK;
}

unsigned long FAT_CloseDirectory(FATDirectory *dir) {
  if (dir == nullptr) return FAT_OK;
  dir->volume->openHandles--;
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

unsigned long FAT_DirIterNext(FATDirIter *iter) { return Scan(iter); }

unsigned long FAT_DirIterGetName(const FATDirIter *iter, char **out_name) {
  *out_name = nullptr;
  if (!iter->valid) return FAT_ERR_END;
  *out_name = UtilSafeStrdup0(iter->name.c_str());
  return FAT_OK;
}

Bool FAT_DirIterIsDir(const FATDirIter *iter) { return iter->valid && iter->isDir; }

unsigned long FAT_OpenFile(FATDirectory *dir, const char *name, FATFile **out_file) {
  *out_file = nullptr;
  if (dir == nullptr || name == nullptr) return FAT_ERR_ARGS;
  uint32_t slot = 0;
  bool isDir = false;
  if (!Find(dir, name, &slot, &isDir) || isDir) return FAT_ERR_NOT_FOUND;
  auto *f = new FATFile{dir->volume, slot};
  dir->volume->openHandles++;
  *out_file = f;
  return FAT_OK;
}

unsigned long FAT_CreateFile(FATDirectory *dir, const char *name, FATFile **out_file) {
  *out_file = nullptr;
  if (dir == nullptr || name == nullptr) return FAT_ERR_ARGS;
  std::string n(name);
  std::vector<uint16_t> units;
  if (!ValidLongName(n) || !Utf8ToUtf16(n, &units) || units.size() > 255) return FAT_ERR_BAD_NAME;
  uint32_t found = 0;
  bool isDir = false;
  if (Find(dir, n, &found, &isDir)) return FAT_ERR_EXISTS;
  FATVolume *v = dir->volume;

  uint8_t shortName[11];
  uint8_t caseFlags = 0;
  bool needLong = true;
  if (Fits83(n, shortName) && !ShortTaken(v, shortName)) {
    size_t dot = n.find('.');
    std::string base = n.substr(0, dot), ext = dot == std::string::npos ? "" : n.substr(dot + 1);
    auto has = [](const std::string &s, char lo, char hi) {
      for (char c : s) {
        if (c >= lo && c <= hi) return true;
      }
      return false;
    };
    // One case per part can be kept in the NT flags; mixed case needs a
    // long name.
    bool mixedBase = has(base, 'a', 'z') && has(base, 'A', 'Z');
    bool mixedExt = has(ext, 'a', 'z') && has(ext, 'A', 'Z');
    if (!mixedBase && !mixedExt) {
      needLong = false;
      if (has(base, 'a', 'z')) caseFlags |= kLowerBase;
      if (has(ext, 'a', 'z')) caseFlags |= kLowerExt;
    }
  } else if (!MakeShortName(v, n, shortName)) {
    return FAT_ERR_NO_SPACE;
  }
  uint32_t longCount = needLong ? static_cast<uint32_t>((units.size() + 12) / 13) : 0;
  uint32_t need = longCount + 1;

  // A run of free slots: deleted ones, or the unused tail after the end mark.
  uint32_t start = 0, run = 0;
  bool placed = false;
  for (uint32_t s = 0; s < v->rootEntries && !placed; s++) {
    uint8_t first = v->Entry(s)[0];
    if (first == 0x00 || first == 0xE5) {
      if (run == 0) start = s;
      placed = ++run == need;
    } else {
      run = 0;
    }
  }
  if (!placed) return FAT_ERR_NO_SPACE;

  uint8_t sum = Checksum(shortName);
  for (uint32_t i = 0; i < longCount; i++) {
    uint32_t seq = longCount - i;  // physical order: last part first
    uint8_t *e = v->Entry(start + i);
    std::memset(e, 0, 32);
    e[0] = static_cast<uint8_t>(seq | (i == 0 ? 0x40 : 0));
    e[11] = kAttrLongName;
    e[13] = sum;
    for (int k = 0; k < 13; k++) {
      size_t at = (seq - 1) * 13 + static_cast<size_t>(k);
      uint16_t u = at < units.size() ? units[at] : at == units.size() ? 0x0000 : 0xFFFF;
      Put16(e + kLongOffsets[k], u);
    }
  }
  uint8_t *e = v->Entry(start + longCount);
  std::memset(e, 0, 32);
  std::memcpy(e, shortName, 11);
  e[11] = kAttrArchive;
  e[12] = caseFlags;
  uint16_t date = 0, time = 0;
  DosNow(&date, &time);
  Put16(e + 14, time);
  Put16(e + 16, date);
  Put16(e + 18, date);
  Put16(e + 22, time);
  Put16(e + 24, date);
  Put32(e + 28, 0);
  v->dirty = true;
  auto *f = new FATFile{v, start + longCount};
  v->openHandles++;
  *out_file = f;
  return FAT_OK;
}
