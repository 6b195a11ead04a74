#include "platform/str.h"

#include <string_view>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "platform/ascii.h"
#include "platform/log.h"

// Formatting goes through the caller's format text by design; the callers'
// own literals are checked through the TVX_PRINTF attributes in str.h.
#pragma GCC diagnostic ignored "-Wformat-nonliteral"

int Str_Snprintf(char *buf, size_t size, const char *fmt, ...) {
  va_list args;
  va_start(args, fmt);
  int n = std::vsnprintf(buf, size, fmt, args);
  va_end(args);
  if (n < 0 || static_cast<size_t>(n) >= size) return -1;
  return n;
}

char *Str_Vasprintf(size_t *out_length, const char *fmt, va_list args) {
  va_list copy;
  va_copy(copy, args);
  int n = std::vsnprintf(nullptr, 0, fmt, copy);
  va_end(copy);
  if (n < 0) return nullptr;
  char *out = static_cast<char *>(std::malloc(static_cast<size_t>(n) + 1));
  if (out == nullptr) return nullptr;
  std::vsnprintf(out, static_cast<size_t>(n) + 1, fmt, args);
  if (out_length != nullptr) *out_length = static_cast<size_t>(n);
  return out;
}

char *Str_Asprintf(size_t *out_length, const char *fmt, ...) {
  va_list args;
  va_start(args, fmt);
  char *out = Str_Vasprintf(out_length, fmt, args);
  va_end(args);
  return out;
}

char *Str_SafeAsprintf(size_t *out_length, const char *fmt, ...) {
  va_list args;
  va_start(args, fmt);
  char *out = Str_Vasprintf(out_length, fmt, args);
  va_end(args);
  if (out == nullptr) Panic("Str_SafeAsprintf: cannot format \"%s\"\n", fmt);
  return out;
}

char *Str_ToUpper(char *s) {
  for (char *p = s; *p != '\0'; p++) *p = tvx::ascii::ToUpper(*p);
  return s;
}

char *Str_ToLower(char *s) {
  for (char *p = s; *p != '\0'; p++) *p = tvx::ascii::ToLower(*p);
  return s;
}

char *StrUtil_GetNextToken(unsigned int *index, const char *str, const char *delimiters) {
  size_t len = std::strlen(str);
  size_t i = *index;
  if (i >= len) return nullptr;
  i += std::strspn(str + i, delimiters);
  if (i >= len) {
    *index = static_cast<unsigned int>(len);
    return nullptr;
  }
  size_t n = std::strcspn(str + i, delimiters);
  char *token = static_cast<char *>(std::malloc(n + 1));
  if (token == nullptr) Panic("StrUtil_GetNextToken: out of memory\n");
  std::memcpy(token, str + i, n);
  token[n] = '\0';
  i += n;
  if (str[i] != '\0') i++;
  *index = static_cast<unsigned int>(i);
  return token;
}

namespace {

// ParseWhole reads [sign][0x]digits covering all of `s` into a 64-bit value,
// refusing anything outside [lo, hi].
bool ParseWhole(const char *s, bool allowSign, long long lo, long long hi, long long *out) {
  bool negative = false;
  if (allowSign && (*s == '+' || *s == '-')) {
    negative = *s == '-';
    s++;
  }
  int base = 10;
  if (s[0] == '0' && (s[1] == 'x' || s[1] == 'X')) {
    base = 16;
    s += 2;
  }
  if (*s == '\0') return false;
  unsigned long long v = 0;
  for (; *s != '\0'; s++) {
    int d;
    if (*s >= '0' && *s <= '9') {
      d = *s - '0';
    } else if (base == 16 && tvx::ascii::IsXDigit(*s)) {
      d = tvx::ascii::ToLower(*s) - 'a' + 10;
    } else {
      return false;
    }
    v = v * static_cast<unsigned>(base) + static_cast<unsigned>(d);
    if (v > 0x100000000ull) return false;  // past every 32-bit range
  }
  long long value = negative ? -static_cast<long long>(v) : static_cast<long long>(v);
  if (value < lo || value > hi) return false;
  *out = value;
  return true;
}

}  // namespace

Bool StrUtil_GetNextIntToken(int32_t *out, unsigned int *index, const char *str,
                             const char *delimiters) {
  char *token = StrUtil_GetNextToken(index, str, delimiters);
  if (token == nullptr) return FALSE;
  const char *p = token;
  if (*p == '+' || *p == '-') p++;
  bool digitsOnly = *p != '\0' && std::strspn(p, "0123456789") == std::strlen(p);
  long long v = 0;
  bool ok = digitsOnly && ParseWhole(token, true, INT32_MIN, INT32_MAX, &v);
  std::free(token);
  if (!ok) return FALSE;
  *out = static_cast<int32_t>(v);
  return TRUE;
}

Bool StrUtil_StartsWith(const char *s, const char *prefix) {
  return std::strncmp(s, prefix, std::strlen(prefix)) == 0;
}

Bool StrUtil_EndsWith(const char *s, const char *suffix) {
  size_t n = std::strlen(s), m = std::strlen(suffix);
  return m <= n && std::memcmp(s + n - m, suffix, m) == 0;
}

Bool StrUtil_CaselessStartsWith(const char *s, const char *prefix) {
  return tvx::ascii::StartsWith(s, prefix);
}

Bool StrUtil_DecimalStrToUint(unsigned int *out, const char **str) {
  const char *p = *str;
  unsigned long long v = 0;
  size_t digits = 0;
  for (; *p >= '0' && *p <= '9'; p++, digits++) {
    v = v * 10 + static_cast<unsigned>(*p - '0');
    if (v > UINT_MAX) return FALSE;
  }
  if (digits == 0) return FALSE;
  *out = static_cast<unsigned int>(v);
  *str = p;
  return TRUE;
}

Bool StrUtil_StrToInt(int32_t *out, const char *str) {
  while (*str == ' ' || *str == '\t') str++;
  long long v = 0;
  if (!ParseWhole(str, true, INT32_MIN, INT32_MAX, &v)) return FALSE;
  *out = static_cast<int32_t>(v);
  return TRUE;
}

Bool StrUtil_StrToUint(uint32_t *out, const char *str) {
  while (*str == ' ' || *str == '\t') str++;
  long long v = 0;
  if (!ParseWhole(str, false, 0, UINT32_MAX, &v)) return FALSE;
  *out = static_cast<uint32_t>(v);
  return TRUE;
}
