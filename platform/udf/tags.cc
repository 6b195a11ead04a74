// Descriptor tags and OSTA CS0 text: the two encodings every UDF structure
// shares.
#include <array>

#include "platform/udf/udf_internal.h"
#include "platform/utf8.h"

namespace tvx::udf {

const char *StatusText(Status s) {
  switch (s) {
    case Status::kOk: return "ok";
    case Status::kNotUdf: return "no UDF anchor";
    case Status::kIo: return "read error";
    case Status::kCorrupt: return "corrupt structure";
    case Status::kUnsupported: return "unsupported structure";
    case Status::kNotFound: return "not found";
    case Status::kNotDir: return "not a directory";
    case Status::kIsDir: return "is a directory";
    case Status::kLoop: return "loop";
    case Status::kTooLarge: return "too large";
  }
  return "unknown";
}

namespace {

constexpr std::array<uint16_t, 256> MakeCrcTable() {
  std::array<uint16_t, 256> t{};
  for (unsigned i = 0; i < 256; i++) {
    unsigned c = i << 8;
    for (int b = 0; b < 8; b++) c = (c & 0x8000) ? ((c << 1) ^ 0x1021) : (c << 1);
    t[i] = static_cast<uint16_t>(c);
  }
  return t;
}

constexpr std::array<uint16_t, 256> kCrcTable = MakeCrcTable();

}  // namespace

uint16_t Crc16(const uint8_t *data, size_t len) {
  uint16_t crc = 0;
  for (size_t i = 0; i < len; i++) {
    crc = static_cast<uint16_t>((crc << 8) ^ kCrcTable[((crc >> 8) ^ data[i]) & 0xFF]);
  }
  return crc;
}

Status CheckTag(const uint8_t *buf, size_t len, uint16_t want, uint32_t location) {
  if (len < kTagSize) return Status::kCorrupt;
  uint8_t sum = 0;
  for (size_t i = 0; i < kTagSize; i++) {
    if (i != 4) sum = static_cast<uint8_t>(sum + buf[i]);
  }
  if (sum != buf[4]) return Status::kCorrupt;
  uint16_t id = LoadLe16(buf);
  if (want != 0 && id != want) return Status::kCorrupt;
  uint16_t crcLen = LoadLe16(buf + 10);
  if (crcLen > len - kTagSize) return Status::kCorrupt;
  if (Crc16(buf + kTagSize, crcLen) != LoadLe16(buf + 8)) return Status::kCorrupt;
  if (location != UINT32_MAX && LoadLe32(buf + 12) != location) return Status::kCorrupt;
  return Status::kOk;
}

bool DecodeCs0(const uint8_t *p, size_t len, std::string *out) {
  out->clear();
  if (len == 0) return true;
  uint8_t comp = p[0];
  if (comp == 8 || comp == 254) {
    for (size_t i = 1; i < len; i++) utf8::Append(p[i], out);
    return true;
  }
  if (comp != 16 && comp != 255) return false;
  // A trailing odd byte cannot be a character; it is dropped.
  utf8::AppendUtf16(
      (len - 1) / 2,
      [p](size_t i) { return (static_cast<uint32_t>(p[1 + 2 * i]) << 8) | p[2 + 2 * i]; }, out);
  return true;
}

std::string DecodeDstring(const uint8_t *p, size_t fieldLen) {
  std::string s;
  if (fieldLen < 2) return s;
  size_t used = p[fieldLen - 1];
  if (used > fieldLen - 1) used = fieldLen - 1;
  if (!DecodeCs0(p, used, &s)) s.clear();
  while (!s.empty() && s.back() == '\0') s.pop_back();
  return s;
}

}  // namespace tvx::udf
