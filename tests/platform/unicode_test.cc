#include "platform/unicode.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

namespace {

struct Conversion {
  const char *utf8;
  StringEncoding encoding;
  const char *expected;  // null: the conversion must be refused
};

// Bytes checked against the published code-page charts. The euro sign and
// the half-width katakana tell the Windows code pages from their ISO and JIS
// relatives, which lack them or place them elsewhere.
const Conversion kConversions[] = {
    {"\xE6\x97\xA5\xE6\x9C\xAC", STRING_ENCODING_WINDOWS_932, "\x93\xFA\x96\x7B"},
    {"\xEF\xBD\xB1", STRING_ENCODING_WINDOWS_932, "\xB1"},
    {"\xD0\x98\xD0\xB2\xD0\xB0\xD0\xBD", STRING_ENCODING_WINDOWS_1251, "\xC8\xE2\xE0\xED"},
    {"\xED\x95\x9C\xEA\xB5\xAD", STRING_ENCODING_WINDOWS_949, "\xC7\xD1\xB1\xB9"},
    {"\xE4\xB8\xAD\xE6\x96\x87", STRING_ENCODING_WINDOWS_936, "\xD6\xD0\xCE\xC4"},
    {"\xE4\xB8\xAD\xE6\x96\x87", STRING_ENCODING_WINDOWS_950, "\xA4\xA4\xA4\xE5"},
    {"Caf\xC3\xA9 \xE2\x82\xAC", STRING_ENCODING_WINDOWS_1252, "Caf\xE9 \x80"},
    {"", STRING_ENCODING_WINDOWS_932, ""},
    {"Caf\xC3\xA9", STRING_ENCODING_UTF8, "Caf\xC3\xA9"},
    // No equivalent in the target: refused rather than replaced.
    {"\xE6\x97\xA5\xE6\x9C\xAC", STRING_ENCODING_WINDOWS_1252, nullptr},
    {"\xD0\x98", STRING_ENCODING_WINDOWS_932 + 1000, nullptr},
    // Not UTF-8: a stray continuation byte, a cut sequence, an overlong form.
    {"ab\x80", STRING_ENCODING_WINDOWS_1252, nullptr},
    {"ab\xE6\x97", STRING_ENCODING_WINDOWS_932, nullptr},
    {"\xC0\xAF", STRING_ENCODING_UTF8, nullptr},
};

TEST(Unicode, ConvertsToWindowsCodePages) {
  for (const Conversion &c : kConversions) {
    char *out = Unicode_GetAllocBytes(c.utf8, c.encoding);
    if (c.expected == nullptr) {
      EXPECT_EQ(out, nullptr) << "input " << c.utf8 << " encoding " << c.encoding;
    } else if (out == nullptr) {
      ADD_FAILURE() << "refused " << c.utf8 << " encoding " << c.encoding;
    } else {
      EXPECT_EQ(std::string(out), c.expected) << "encoding " << c.encoding;
    }
    std::free(out);
  }
}

TEST(Unicode, LongInputGrowsTheOutput) {
  // Three bytes of UTF-8 become two of windows-932; many one-byte inputs
  // become one byte each, and a long text must not be cut.
  std::string in;
  for (int i = 0; i < 5000; ++i) in += "\xE6\x97\xA5" "a";
  char *out = Unicode_GetAllocBytes(in.c_str(), STRING_ENCODING_WINDOWS_932);
  ASSERT_NE(out, nullptr);
  EXPECT_EQ(std::string(out).size(), 15000u);
  std::free(out);
  EXPECT_EQ(Unicode_GetAllocBytes(nullptr, STRING_ENCODING_WINDOWS_1252), nullptr);
}

}  // namespace
