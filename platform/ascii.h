// ASCII-only character classes and caseless comparison. These never consult
// the C locale, so a host that sets a Turkish or multibyte locale sees the
// same answers as "C" (strcasecmp and <cctype> do not promise that), and they
// never take a negative char into a table.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace tvx::ascii {

constexpr bool IsUpper(char c) { return c >= 'A' && c <= 'Z'; }
constexpr bool IsLower(char c) { return c >= 'a' && c <= 'z'; }
constexpr bool IsAlpha(char c) { return IsUpper(c) || IsLower(c); }
constexpr bool IsDigit(char c) { return c >= '0' && c <= '9'; }
constexpr bool IsAlnum(char c) { return IsAlpha(c) || IsDigit(c); }
constexpr bool IsXDigit(char c) {
  return IsDigit(c) || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}
// IsSpace: blank, tab, newline, vertical tab, form feed, carriage return.
constexpr bool IsSpace(char c) { return c == ' ' || (c >= '\t' && c <= '\r'); }
// IsControl: C0 controls and DEL.
constexpr bool IsControl(char c) {
  return static_cast<unsigned char>(c) < 0x20 || c == 0x7f;
}
constexpr char ToLower(char c) { return IsUpper(c) ? static_cast<char>(c - 'A' + 'a') : c; }
constexpr char ToUpper(char c) { return IsLower(c) ? static_cast<char>(c - 'a' + 'A') : c; }

// Compare orders caselessly as strcmp of the lower-cased texts would.
constexpr int Compare(std::string_view a, std::string_view b) {
  size_t n = a.size() < b.size() ? a.size() : b.size();
  for (size_t i = 0; i < n; ++i) {
    unsigned char x = static_cast<unsigned char>(ToLower(a[i]));
    unsigned char y = static_cast<unsigned char>(ToLower(b[i]));
    if (x != y) return x < y ? -1 : 1;
  }
  return a.size() == b.size() ? 0 : (a.size() < b.size() ? -1 : 1);
}
constexpr bool Equal(std::string_view a, std::string_view b) {
  return a.size() == b.size() && Compare(a, b) == 0;
}
constexpr bool StartsWith(std::string_view text, std::string_view prefix) {
  return text.size() >= prefix.size() && Equal(text.substr(0, prefix.size()), prefix);
}
constexpr bool EndsWith(std::string_view text, std::string_view suffix) {
  return text.size() >= suffix.size() &&
         Equal(text.substr(text.size() - suffix.size()), suffix);
}

inline std::string Lower(std::string_view text) {
  std::string out(text);
  for (char &c : out) c = ToLower(c);
  return out;
}
inline std::string Upper(std::string_view text) {
  std::string out(text);
  for (char &c : out) c = ToUpper(c);
  return out;
}

}  // namespace tvx::ascii
