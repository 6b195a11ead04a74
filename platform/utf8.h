// UTF-8 output for the name decoders of the media readers: every on-disk
// name form (Latin-1 bytes, UCS-2/UTF-16 of either byte order) ends up as
// UTF-8 text for the caller.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace tvx::utf8 {

inline void Append(uint32_t cp, std::string *out) {
  if (cp < 0x80) {
    out->push_back(static_cast<char>(cp));
  } else if (cp < 0x800) {
    out->push_back(static_cast<char>(0xC0 | (cp >> 6)));
    out->push_back(static_cast<char>(0x80 | (cp & 0x3F)));
  } else if (cp < 0x10000) {
    out->push_back(static_cast<char>(0xE0 | (cp >> 12)));
    out->push_back(static_cast<char>(0x80 | ((cp >> 6) & 0x3F)));
    out->push_back(static_cast<char>(0x80 | (cp & 0x3F)));
  } else {
    out->push_back(static_cast<char>(0xF0 | (cp >> 18)));
    out->push_back(static_cast<char>(0x80 | ((cp >> 12) & 0x3F)));
    out->push_back(static_cast<char>(0x80 | ((cp >> 6) & 0x3F)));
    out->push_back(static_cast<char>(0x80 | (cp & 0x3F)));
  }
}

// AppendUtf16 appends `count` UTF-16 code units, `unitAt(i)` giving unit i.
// Pairs of surrogates join; a lone surrogate, which names written by
// UCS-2-only tools may hold, becomes U+FFFD rather than ill-formed UTF-8.
template <class UnitAt>
void AppendUtf16(size_t count, UnitAt unitAt, std::string *out) {
  for (size_t i = 0; i < count; ++i) {
    uint32_t u = unitAt(i);
    if (u >= 0xD800 && u <= 0xDBFF && i + 1 < count) {
      uint32_t lo = unitAt(i + 1);
      if (lo >= 0xDC00 && lo <= 0xDFFF) {
        Append(0x10000 + ((u - 0xD800) << 10) + (lo - 0xDC00), out);
        ++i;
        continue;
      }
    }
    if (u >= 0xD800 && u <= 0xDFFF) u = 0xFFFD;
    Append(u, out);
  }
}

}  // namespace tvx::utf8
