// Entry names. Rock Ridge (RRIP, IEEE P1282) names live in "NM" entries of the
// SUSP area that follows the file identifier of a directory record (SUSP,
// IEEE P1281): 4-byte headers (signature, length, version), possibly spread
// over "CE" continuation areas elsewhere on the image. Joliet names are the
// file identifiers of the supplementary tree, UCS-2 big-endian.
#include "platform/iso9660/names.h"

#include "platform/iso9660/ecma119.h"
#include "platform/utf8.h"

namespace tvx::iso9660 {
namespace {

// Continuation areas are chained; a hostile chain may loop or sprawl, so the
// walk stops after this many hops or bytes. Real images use one or two.
constexpr int kMaxContinuations = 32;
constexpr size_t kMaxContinuationBytes = 64 * 1024;
// Longest alternate name kept; RRIP names are at most a few hundred bytes.
constexpr size_t kMaxNameBytes = 4096;

constexpr uint32_t kModeTypeMask = 0170000;
constexpr uint32_t kModeSymlink = 0120000;
constexpr uint32_t kModeDirectory = 0040000;

// Length of the valid UTF-8 sequence at s[i], or 0.
size_t Utf8SeqLen(std::string_view s, size_t i) {
  auto b = [&](size_t k) { return static_cast<unsigned char>(s[k]); };
  unsigned char c = b(i);
  if (c < 0x80) return 1;
  size_t n;
  uint32_t cp;
  if ((c & 0xE0) == 0xC0) {
    n = 2;
    cp = c & 0x1F;
  } else if ((c & 0xF0) == 0xE0) {
    n = 3;
    cp = c & 0x0F;
  } else if ((c & 0xF8) == 0xF0) {
    n = 4;
    cp = c & 0x07;
  } else {
    return 0;
  }
  if (i + n > s.size()) return 0;
  for (size_t k = 1; k < n; ++k) {
    if ((b(i + k) & 0xC0) != 0x80) return 0;
    cp = cp << 6 | (b(i + k) & 0x3F);
  }
  static constexpr uint32_t kMin[] = {0, 0, 0x80, 0x800, 0x10000};
  if (cp < kMin[n] || cp > 0x10FFFF || (cp >= 0xD800 && cp <= 0xDFFF)) return 0;
  return n;
}

std::string_view DropVersion(std::string_view s) {
  size_t semi = s.rfind(';');
  if (semi == std::string_view::npos) return s;
  for (size_t i = semi + 1; i < s.size(); ++i) {
    if (s[i] < '0' || s[i] > '9') return s;
  }
  return s.substr(0, semi);
}

}  // namespace

std::string ToUtf8(std::string_view bytes) {
  std::string out;
  out.reserve(bytes.size());
  for (size_t i = 0; i < bytes.size();) {
    size_t n = Utf8SeqLen(bytes, i);
    if (n == 0) {
      out += "\xEF\xBF\xBD";  // U+FFFD: the bytes name no character
      ++i;
    } else {
      out.append(bytes.substr(i, n));
      i += n;
    }
  }
  return out;
}

std::string TruncateUtf8(const std::string &s, size_t max) {
  if (s.size() <= max) return s;
  size_t end = max;
  while (end > 0 && (static_cast<unsigned char>(s[end]) & 0xC0) == 0x80) --end;
  return s.substr(0, end);
}

std::string IsoName(std::string_view id) {
  // A file identifier always holds the separator between name and extension
  // (ECMA-119 7.5.1); without an extension it is no part of the name.
  std::string_view name = DropVersion(id);
  if (name.size() > 1 && name.back() == '.') name.remove_suffix(1);
  return ToUtf8(name);
}

std::string JolietName(std::string_view id) {
  std::string out;
  const auto *p = reinterpret_cast<const uint8_t *>(id.data());
  utf8::AppendUtf16(id.size() / 2, [p](size_t i) { return LoadBe16(p + 2 * i); }, &out);
  return std::string(DropVersion(out));
}

void ParseSystemUse(std::string_view area, const AreaReader &readArea, SystemUse *out) {
  std::string continuation;
  int hops = 0;
  size_t continuationBytes = 0;
  bool nameDone = false;
  for (;;) {
    uint64_t nextOffset = 0;
    uint32_t nextLength = 0;
    bool haveNext = false;
    while (area.size() >= 4) {
      const auto *p = reinterpret_cast<const uint8_t *>(area.data());
      size_t len = p[2];
      if (len < 4 || len > area.size()) break;
      std::string_view sig = area.substr(0, 2);
      std::string_view data = area.substr(4, len - 4);
      const auto *d = reinterpret_cast<const uint8_t *>(data.data());
      if (sig == "ST") break;
      if (sig == "SP" && data.size() >= 3 && d[0] == 0xBE && d[1] == 0xEF) {
        out->hasSp = true;
        out->skip = d[2];
      } else if (sig == "CE" && data.size() >= 24) {
        uint32_t block, offset, length;
        if (Both32(d, &block) && Both32(d + 8, &offset) && Both32(d + 16, &length)) {
          nextOffset = static_cast<uint64_t>(block) * kBlockSize + offset;
          nextLength = length;
          haveNext = offset < kBlockSize && length <= kBlockSize - offset;
        }
      } else if (sig == "ER" && data.size() >= 4) {
        size_t idLen = d[0];
        std::string_view id = data.substr(4, std::min(idLen, data.size() - 4));
        if (id == "RRIP_1991A" || id == "IEEE_P1282" || id == "IEEE_1282") out->rockRidge = true;
      } else if (sig == "NM" && data.size() >= 1) {
        out->rockRidge = true;
        uint8_t flags = d[0];
        if (flags & 0x06) {
          out->nameIsDot = true;
        } else if (!nameDone && out->name.size() + data.size() - 1 <= kMaxNameBytes) {
          out->name.append(data.substr(1));
          out->hasName = true;
        }
        if (!(flags & 0x01)) nameDone = true;
      } else if (sig == "PX" && data.size() >= 8) {
        out->rockRidge = true;
        uint32_t mode;
        if (Both32(d, &mode)) {
          if ((mode & kModeTypeMask) == kModeSymlink) out->symlink = true;
          if ((mode & kModeTypeMask) == kModeDirectory) out->directoryMode = true;
        }
      } else if (sig == "SL") {
        out->rockRidge = true;
        out->symlink = true;
      } else if (sig == "CL" && data.size() >= 8) {
        uint32_t block;
        if (Both32(d, &block)) {
          out->hasChildLink = true;
          out->childLink = block;
        }
      } else if (sig == "RE") {
        out->relocated = true;
      } else if (sig == "RR" || sig == "TF" || sig == "PN") {
        out->rockRidge = true;
      }
      area.remove_prefix(len);
    }
    if (!haveNext || ++hops > kMaxContinuations) return;
    continuationBytes += nextLength;
    if (continuationBytes > kMaxContinuationBytes) return;
    if (!readArea || !readArea(nextOffset, nextLength, &continuation)) return;
    area = continuation;
  }
}

}  // namespace tvx::iso9660
