#include "platform/str.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>
#include <vector>

namespace {

std::vector<std::string> Tokens(const char *text, const char *delims) {
  std::vector<std::string> out;
  unsigned int index = 0;
  while (char *t = StrUtil_GetNextToken(&index, text, delims)) {
    out.emplace_back(t);
    std::free(t);
  }
  return out;
}

TEST(StrUtil, TokensSkipRunsOfDelimitersAndKeepCarriageReturns) {
  struct Case {
    const char *text, *delims;
    std::vector<std::string> want;
  } cases[] = {
      {"a\nb\nc", "\n", {"a", "b", "c"}},
      {"\n\nfirst\n\n\nsecond\n", "\n", {"first", "second"}},
      {"line1\r\nline2\r\n", "\n", {"line1\r", "line2\r"}},
      {"", "\n", {}},
      {"version=2008.1, x\nmore", " ,\n", {"version=2008.1", "x", "more"}},
  };
  for (const auto &c : cases) EXPECT_EQ(Tokens(c.text, c.delims), c.want) << c.text;
  unsigned int index = 100;
  EXPECT_EQ(StrUtil_GetNextToken(&index, "short", " "), nullptr);  // index past the end
  index = 0;
  std::free(StrUtil_GetNextToken(&index, "ab cd", " "));
  EXPECT_EQ(index, 3u);  // past the token and one delimiter
}

TEST(StrUtil, IntTokensAreWholeNumbersOnly) {
  struct Case {
    const char *text;
    bool ok;
    int32_t want;
  } cases[] = {
      {"..42..", true, 42},     {"-7", true, -7},          {"+3", true, 3},
      {"11-0", false, 0},       {"5a", false, 0},          {"0x10", false, 0},
      {"2147483647", true, INT32_MAX}, {"-2147483648", true, INT32_MIN},
      {"2147483648", false, 0}, {"99999999999999999999", false, 0}, {"-", false, 0},
  };
  for (const auto &c : cases) {
    int32_t v = 12345;
    unsigned int i = 0;
    EXPECT_EQ(StrUtil_GetNextIntToken(&v, &i, c.text, ".") != 0, c.ok) << c.text;
    if (c.ok) {
      EXPECT_EQ(v, c.want) << c.text;
    }
  }
}

TEST(StrUtil, NumberConversionsRefuseJunkAndOverflow) {
  struct Case {
    const char *text;
    bool intOk;
    int32_t intWant;
    bool uintOk;
    uint32_t uintWant;
  } cases[] = {
      {"  12", true, 12, true, 12},
      {"0x1F", true, 31, true, 31},
      {"-5", true, -5, false, 0},
      {"4294967295", false, 0, true, UINT32_MAX},
      {"4294967296", false, 0, false, 0},
      {"12 ", false, 0, false, 0},
      {"", false, 0, false, 0},
      {"0x", false, 0, false, 0},
  };
  for (const auto &c : cases) {
    int32_t i = 0;
    uint32_t u = 0;
    EXPECT_EQ(StrUtil_StrToInt(&i, c.text) != 0, c.intOk) << c.text;
    if (c.intOk) {
      EXPECT_EQ(i, c.intWant) << c.text;
    }
    EXPECT_EQ(StrUtil_StrToUint(&u, c.text) != 0, c.uintOk) << c.text;
    if (c.uintOk) {
      EXPECT_EQ(u, c.uintWant) << c.text;
    }
  }
}

TEST(Str, SnprintfReportsCuts) {
  char buf[6];
  EXPECT_EQ(Str_Snprintf(buf, sizeof buf, "%s", "12345"), 5);
  EXPECT_EQ(Str_Snprintf(buf, sizeof buf, "%s", "123456"), -1);
  EXPECT_STREQ(buf, "12345");
}

}  // namespace
