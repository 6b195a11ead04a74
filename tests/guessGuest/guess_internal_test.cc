#include "lib/guessGuest/guess_internal.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using tvx::guess::CopyField;
using tvx::guess::Lines;

std::vector<std::string> SplitLines(const char *text) {
  std::vector<std::string> out;
  for (std::string_view line : Lines(text)) out.emplace_back(line);
  return out;
}

TEST(GuessLines, SplitsAtLineFeedsOnly) {
  struct Case {
    const char *text;
    std::vector<std::string> lines;
  };
  const Case cases[] = {
      {"", {}},
      {"one", {"one"}},
      {"one\n", {"one"}},
      {"one\n\nthree", {"one", "", "three"}},
      {"\n", {""}},
      {"a\r\nb\r\n", {"a\r", "b\r"}},
  };
  for (const Case &c : cases) {
    EXPECT_EQ(SplitLines(c.text), c.lines) << "text: " << c.text;
  }
  EXPECT_TRUE(SplitLines(nullptr).empty());
  EXPECT_EQ(tvx::guess::StripCr("a\r"), "a");
  EXPECT_EQ(tvx::guess::StripCr("a"), "a");
}

TEST(GuessCopyField, CutsAndTerminatesWithinWidth) {
  GuessResult r{};
  std::string long_text(40, 'x');
  CopyField(r.versionText, long_text.c_str());
  EXPECT_EQ(std::string(r.versionText), std::string(31, 'x'));
  CopyField(r.versionText, std::string_view("2006.0 extra", 4));
  EXPECT_STREQ(r.versionText, "2006");
  CopyField(r.versionText, nullptr);
  EXPECT_STREQ(r.versionText, "");
}

}  // namespace
