// Reading single values: IniUtil_GetIniFileString and IniUtil_GetIniFileInt.
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string>

#include "lib/ini/ini_line.h"
#include "tvx_ini.h"

namespace tvx::ini {
namespace {

bool IsBlank(char c) { return c == ' ' || c == '\t'; }
bool IsTrailing(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }

// The value as readers see it: blanks trimmed, clipped to what the caller's
// buffer holds, then one pair of enclosing quotes dropped. The clip comes
// before the quote test, so an over-long quoted value keeps its opening quote.
std::string_view ReadValue(std::string_view value, size_t capacity) {
  size_t b = 0;
  while (b < value.size() && IsBlank(value[b])) ++b;
  size_t e = value.size();
  while (e > b && IsTrailing(value[e - 1])) --e;
  value = value.substr(b, e - b);
  if (value.size() > capacity) value = value.substr(0, capacity);
  if (value.size() >= 2 && value.front() == '"' && value.back() == '"') {
    value = value.substr(1, value.size() - 2);
  }
  return value;
}

Bool GetString(const char *path, const char *section, const char *key, char *out, int32_t size) {
  if (out == nullptr || size < 1 || path == nullptr || section == nullptr || key == nullptr) {
    return FALSE;
  }
  LineReader reader;
  if (!reader.Open(path)) return FALSE;
  std::string piece;
  bool inSection = false;
  while (reader.Next(&piece)) {
    if (KindOf(piece) == LineKind::kComment) continue;
    // Everything from the first ";" after the first byte is an inline comment.
    size_t semi = piece.find(';', 1);
    if (semi != std::string::npos) piece.resize(semi);
    std::string_view line = AsCString(piece);
    if (KindOf(line) == LineKind::kHeader) {
      std::string_view name;
      if (!HeaderName(line, &name)) return FALSE;
      inSection = ascii::Equal(name, section);
      continue;
    }
    if (!inSection) continue;
    KeyLine k = ParseKeyLine(line);
    if (!ascii::Equal(k.key, key)) continue;
    std::string_view raw = k.hasEquals ? line.substr(k.valueOffset) : std::string_view();
    std::string_view v = ReadValue(raw, static_cast<size_t>(size) - 1);
    if (!v.empty()) std::memcpy(out, v.data(), v.size());
    out[v.size()] = '\0';
    return TRUE;
  }
  // A read error is not the end of the file: the key may well be there.
  return reader.Failed() ? FALSE : TRUE;
}

}  // namespace
}  // namespace tvx::ini

extern "C" {

TVX_EXPORT Bool IniUtil_GetIniFileString(const char *path, const char *section, const char *key,
                                         char *out_value, int32_t size) {
  try {
    return tvx::ini::GetString(path, section, key, out_value, size);
  } catch (...) {
    return FALSE;
  }
}

TVX_EXPORT Bool IniUtil_GetIniFileInt(const char *path, const char *section, const char *key,
                                      int32_t *out_value) {
  if (out_value == nullptr) return FALSE;
  *out_value = 0;
  char text[tvx::ini::kLineBuffer] = "";
  if (!IniUtil_GetIniFileString(path, section, key, text, sizeof text)) return FALSE;
  if (std::strcmp(text, "0") == 0) return TRUE;
  long n = std::strtol(text, nullptr, 10);
  // Stored as 32 bits, as the value has always been: larger numbers wrap.
  *out_value = static_cast<int32_t>(static_cast<uint32_t>(static_cast<unsigned long>(n)));
  return *out_value != 0 ? TRUE : FALSE;
}

}  // extern "C"
