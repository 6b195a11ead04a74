// Entry names: ISO 9660 identifiers, Joliet UCS-2 identifiers and the Rock
// Ridge entries of the System Use Sharing Protocol (SUSP) area of a record.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>

namespace tvx::iso9660 {

// IsoName turns a d-character identifier into the entry name: the ";N"
// version and the separator dot of a name without extension go. Bytes that
// are not UTF-8 become U+FFFD.
std::string IsoName(std::string_view id);
// JolietName decodes a UCS-2/UTF-16 big-endian identifier to UTF-8 and drops
// the ";N" version. An odd trailing byte is ignored; lone surrogates become
// U+FFFD.
std::string JolietName(std::string_view id);
// ToUtf8 keeps valid UTF-8 and turns every other byte into U+FFFD.
std::string ToUtf8(std::string_view bytes);
// TruncateUtf8 cuts `s` to at most `max` bytes without splitting a character.
std::string TruncateUtf8(const std::string &s, size_t max);

// What the SUSP area of one directory record says.
struct SystemUse {
  bool hasSp = false;       // "SP": SUSP in use (only in the root's "." record)
  uint8_t skip = 0;         // its LEN_SKP
  bool rockRidge = false;   // "ER" naming RRIP, or an RRIP entry seen
  bool hasName = false;     // "NM"
  std::string name;         // raw bytes of the alternate name
  bool nameIsDot = false;   // NM flags CURRENT or PARENT
  bool relocated = false;   // "RE": listed elsewhere through a child link
  bool hasChildLink = false;  // "CL"
  uint32_t childLink = 0;
  bool symlink = false;     // "SL", or a PX mode of a symbolic link
  bool directoryMode = false;  // PX mode says directory
};

// Reads `len` bytes of a continuation area at byte `offset` of the image into
// `out`; false when it cannot.
using AreaReader = std::function<bool(uint64_t offset, size_t len, std::string *out)>;

// ParseSystemUse reads the SUSP entries of one record, following "CE"
// continuation areas through `readArea` (bounded in count and bytes). A
// malformed entry ends the walk: names are an extra, and what was read so far
// stays usable.
void ParseSystemUse(std::string_view area, const AreaReader &readArea, SystemUse *out);

}  // namespace tvx::iso9660
