// Character-set conversion of UTF-8 texts into the legacy Windows code pages
// that pre-Unicode Windows setup reads.
#pragma once

// StringEncoding identifies a character set by the platform's number. Only the
// numbers below are known; every other number is refused by the calls here.
typedef int StringEncoding;

enum {
  STRING_ENCODING_UTF8 = 0,
  STRING_ENCODING_WINDOWS_950 = 22,   // Traditional Chinese (Big5 with extensions)
  STRING_ENCODING_WINDOWS_936 = 24,   // Simplified Chinese (GBK)
  STRING_ENCODING_WINDOWS_932 = 27,   // Japanese (Shift_JIS with extensions)
  STRING_ENCODING_WINDOWS_1251 = 34,  // Cyrillic
  STRING_ENCODING_WINDOWS_1252 = 35,  // Western European
  STRING_ENCODING_WINDOWS_949 = 62,   // Korean (Unified Hangul Code)
};

// Unicode_GetAllocBytes converts the UTF-8 text `str` into `encoding` and
// returns the converted bytes with a terminating NUL (malloc'd; free with
// free). Returns null when `str` is null, when the encoding is unknown, when
// `str` is not valid UTF-8 or when a character has no equivalent in the
// target character set: nothing is ever replaced or dropped silently.
char *Unicode_GetAllocBytes(const char *str, StringEncoding encoding);

// Unicode_EncodingEnumToName returns the name of `encoding` ("windows-1252"),
// a constant; "unknown" for numbers that are not listed above.
const char *Unicode_EncodingEnumToName(StringEncoding encoding);
