// Reading values from INI files shaped like real answer files.
#include <gtest/gtest.h>

#include <string>

#include "support/log_capture.h"
#include "tvx_ini.h"

namespace {

using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

const char kWinntSif[] =
    "; generated answer file\n"
    "[Data]\n"
    "AutoPartition=1\n"
    "\n"
    "[Unattended]\n"
    "UnattendMode=FullUnattended\n"
    "OemSkipEula=Yes\n"
    "  Indented = spaced\n"
    "Padded=  \t value with blanks \t \n"
    "Comment=plain ; trailing remark\n"
    "QuotedSemi=\"a;b\"\n"
    "Empty=\n"
    "OnlyQuotes=\"\"\n"
    "OneQuote=\"\n"
    "\n"
    "[GuiUnattended]\n"
    "AdminPassword=\"secret\"\n"
    "TimeZone=85\n"
    "[UserData]\n"
    "FullName=\"Jane Doe\"\n"
    "TimeZone=4\n"
    "[CrLf]\r\nA=\"quoted\"\r\nBare\r\n[Next]\r\n";

struct ReadCase {
  const char *name;
  const char *section;
  const char *key;
  int32_t size;
  Bool result;
  const char *value;  // the buffer afterwards
};

TEST(IniRead, ValuesOfAnswerFile) {
  TempDir dir;
  std::string path = dir.Join("winnt.sif");
  WriteFileOrDie(path, kWinntSif);
  const ReadCase cases[] = {
      {"plain", "Unattended", "UnattendMode", 64, TRUE, "FullUnattended"},
      {"section and key ignore case", "gUIUNATTENDED", "adminpassword", 64, TRUE, "secret"},
      {"same key, second section", "UserData", "TimeZone", 64, TRUE, "4"},
      {"blank before = is part of key", "Unattended", "Indented", 64, TRUE, "untouched"},
      {"leading blanks skipped", "Unattended", "Indented ", 64, TRUE, "spaced"},
      {"value blanks trimmed", "Unattended", "Padded", 64, TRUE, "value with blanks"},
      {"inline comment cut", "Unattended", "Comment", 64, TRUE, "plain"},
      {"inline comment cuts quoted value", "Unattended", "QuotedSemi", 64, TRUE, "\"a"},
      {"empty value", "Unattended", "Empty", 64, TRUE, ""},
      {"only quotes", "Unattended", "OnlyQuotes", 64, TRUE, ""},
      {"single quote kept", "Unattended", "OneQuote", 64, TRUE, "\""},
      {"clip before quote test", "UserData", "FullName", 5, TRUE, "\"Jan"},
      {"size one", "Unattended", "UnattendMode", 1, TRUE, ""},
      {"missing section", "NoSuchSection", "TimeZone", 64, TRUE, "untouched"},
      {"key outside section", "Data", "TimeZone", 64, TRUE, "untouched"},
      {"size zero", "Data", "AutoPartition", 0, FALSE, "untouched"},
      {"CR LF: quotes dropped", "CrLf", "A", 64, TRUE, "quoted"},
      {"CR LF: bare key", "CrLf", "Bare", 64, TRUE, ""},
  };
  for (const ReadCase &c : cases) {
    char buf[64] = "untouched";
    EXPECT_EQ(c.result, IniUtil_GetIniFileString(path.c_str(), c.section, c.key, buf, c.size))
        << c.name;
    EXPECT_STREQ(c.value, buf) << c.name;
  }
}

TEST(IniRead, FileFaults) {
  TempDir dir;
  char buf[16] = "x";
  EXPECT_FALSE(IniUtil_GetIniFileString(dir.Join("absent.ini").c_str(), "S", "K", buf, 16));
  EXPECT_FALSE(IniUtil_GetIniFileString(dir.Path().c_str(), "S", "K", buf, 16));

  // A broken header fails the scan only when the key was not found before it;
  // the inline-comment cut comes first, so "[a;b]" has no "]".
  std::string path = dir.Join("broken.ini");
  WriteFileOrDie(path, "[S]\nK=1\n[broken\nL=2\n[a;b]\n");
  EXPECT_TRUE(IniUtil_GetIniFileString(path.c_str(), "S", "K", buf, 16));
  EXPECT_STREQ("1", buf);
  EXPECT_FALSE(IniUtil_GetIniFileString(path.c_str(), "S", "L", buf, 16));
}

// A physical line longer than 1023 bytes is read as several lines.
TEST(IniRead, LongLinesAreSplitIntoPieces) {
  TempDir dir;
  std::string path = dir.Join("long.ini");
  std::string filler(1023 - 2, 'v');  // "L=" plus filler is exactly one piece
  WriteFileOrDie(path, "[S]\nL=" + filler + "Hidden=yes\n");
  std::string out(2048, '\0');
  EXPECT_TRUE(IniUtil_GetIniFileString(path.c_str(), "S", "L", out.data(), 2048));
  EXPECT_EQ(filler, std::string(out.c_str()));
  char buf[8] = "";
  EXPECT_TRUE(IniUtil_GetIniFileString(path.c_str(), "S", "Hidden", buf, sizeof buf));
  EXPECT_STREQ("yes", buf);
}

TEST(IniReadInt, Conversions) {
  TempDir dir;
  std::string path = dir.Join("int.ini");
  WriteFileOrDie(path,
                 "[N]\nzero=0\nzeros=00\nmixed=42abc\nneg= -17\n"
                 "quotedZero=\"0\"\nwrap=4294967297\n");
  const struct {
    const char *key;
    Bool result;
    int32_t value;
  } cases[] = {
      {"zero", TRUE, 0},       {"zeros", FALSE, 0}, {"mixed", TRUE, 42},
      {"neg", TRUE, -17},      {"quotedZero", TRUE, 0}, {"wrap", TRUE, 1},
  };
  for (const auto &c : cases) {
    int32_t v = 99;
    EXPECT_EQ(c.result, IniUtil_GetIniFileInt(path.c_str(), "N", c.key, &v)) << c.key;
    EXPECT_EQ(c.value, v) << c.key;
  }
  EXPECT_FALSE(IniUtil_GetIniFileInt(path.c_str(), "N", "zero", nullptr));
  int32_t v = 5;
  EXPECT_FALSE(IniUtil_GetIniFileInt(dir.Join("absent").c_str(), "N", "zero", &v));
}

}  // namespace
