// Editing INI files: exact output forms, placement and the size limit. How a
// rewrite survives a failure is the crash-safe writer's own test.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "support/log_capture.h"
#include "tvx_ini.h"

namespace {

using tvxtest::ReadFileOrDie;
using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

struct WriteCase {
  const char *name;
  const char *before;
  const char *section;
  const char *key;
  const char *value;
  Bool quoted;
  const char *after;  // null: refused, the file stays as it was
};

TEST(IniWrite, ResultingTextOrRefusal) {
  const WriteCase cases[] = {
      {"empty file", "", "S", "K", "v", FALSE, "[S]\nK=v\n"},
      {"new empty value is a bare key", "", "S", "K", "", TRUE, "[S]\nK\n"},
      {"replace with empty quoted", "[S]\nK=old\n", "S", "K", "", TRUE, "[S]\nK=\"\"\n"},
      {"replace keeps the key's spelling and indent", "[s]\n  key=1\n", "S", "KEY", "2", FALSE,
       "[s]\n  key=2\n"},
      {"only the wanted section", "[A]\nK=1\n[B]\nK=2\n", "B", "K", "3", FALSE,
       "[A]\nK=1\n[B]\nK=3\n"},
      {"missing key ends its section", "[A]\nX=1\n\n[B]\nY=2\n", "A", "K", "v", FALSE,
       "[A]\nX=1\n\nK=v\n[B]\nY=2\n"},
      {"missing section at the end", "[A]\nX=1\n", "B", "K", "v", FALSE,
       "[A]\nX=1\n[B]\nK=v\n"},
      {"blank before = is another key", "[A]\nK =1\n[B]\n", "A", "K", "2", FALSE,
       "[A]\nK =1\nK=2\n[B]\n"},
      {"old remark and CR dropped", "[A]\r\nK=1 ; remark\r\nL=2\r\n", "A", "K", "9", FALSE,
       "[A]\r\nK=9\nL=2\r\n"},
      {"comments copied", "; c1\n[A]\n;K=1\nK=2\n", "A", "K", "3", FALSE,
       "; c1\n[A]\n;K=1\nK=3\n"},
      {"bare key replaced", "[A]\nK\nL=1\n", "A", "K", "v", TRUE, "[A]\nK=\"v\"\nL=1\n"},
      {"last line without newline", "[A]\nX=1", "A", "K", "v", FALSE, "[A]\nX=1\nK=v\n"},
      {"only the first match", "[A]\nK=1\nK=2\n", "A", "K", "3", FALSE, "[A]\nK=3\nK=2\n"},
      {"repeated section", "[A]\nX=1\n[B]\n[A]\nK=1\n", "A", "K", "2", FALSE,
       "[A]\nX=1\nK=2\n[B]\n[A]\nK=1\n"},
      {"key hidden by a remark", "[A]\nK;note=1\n", "A", "K", "2", FALSE, "[A]\nK=2\n"},
      {"value kept as given", "[A]\n", "A", "K", "a\"b;c", FALSE, "[A]\nK=a\"b;c\n"},
      {"header without ]", "[A]\nK=1\n[broken\n", "A", "New", "v", FALSE, nullptr},
      {"line break in value", "[A]\n", "A", "K", "1\n[B]", FALSE, nullptr},
      {"] in section", "[A]\n", "A]", "K", "1", FALSE, nullptr},
      {"= in key", "[A]\n", "A", "K=L", "1", FALSE, nullptr},
      {"key looks like a header", "[A]\n", "A", "[K", "1", FALSE, nullptr},
      {"empty key", "[A]\n", "A", "", "1", FALSE, nullptr},
  };
  TempDir dir;
  std::string path = dir.Join("t.ini");
  for (const WriteCase &c : cases) {
    WriteFileOrDie(path, c.before);
    EXPECT_EQ(IniUtil_WriteIniFileString(path.c_str(), c.section, c.key, c.value, c.quoted),
              c.after != nullptr ? TRUE : FALSE)
        << c.name;
    EXPECT_EQ(c.after != nullptr ? c.after : c.before, ReadFileOrDie(path)) << c.name;
  }
}

TEST(IniWrite, NeverCreatesAFile) {
  TempDir dir;
  std::string path = dir.Join("absent.ini");
  EXPECT_FALSE(IniUtil_WriteIniFileString(path.c_str(), "S", "K", "v", FALSE));
  struct stat st;
  EXPECT_NE(0, stat(path.c_str(), &st));
  EXPECT_FALSE(IniUtil_WriteIniFileString(dir.Path().c_str(), "S", "K", "v", FALSE));
}

// Each rewritten or added line fits one 1023-byte piece, so it reads back whole.
TEST(IniWrite, LongValuesAreClippedToOneLine) {
  TempDir dir;
  std::string path = dir.Join("long.ini");
  std::string value(3000, 'x');
  const struct {
    const char *before;
    Bool quoted;
    size_t kept;
  } cases[] = {
      {"", TRUE, 1020 - 2},          // new "K=\"...\"" line
      {"[S]\n   K=1\n", TRUE, 1020 - 5},  // replaced after an indent
  };
  for (const auto &c : cases) {
    WriteFileOrDie(path, c.before);
    ASSERT_TRUE(IniUtil_WriteIniFileString(path.c_str(), "S", "K", value.c_str(), c.quoted));
    std::string out(4096, '\0');
    ASSERT_TRUE(IniUtil_GetIniFileString(path.c_str(), "S", "K", out.data(), 4096));
    EXPECT_EQ(c.kept, std::string(out.c_str()).size()) << c.before;
  }
  // A replaced line longer than one piece loses its old continuation.
  WriteFileOrDie(path, "[S]\nK=" + std::string(2500, 'o') + "\nL=1\n");
  ASSERT_TRUE(IniUtil_WriteIniFileString(path.c_str(), "S", "K", "new", FALSE));
  EXPECT_EQ("[S]\nK=new\nL=1\n", ReadFileOrDie(path));
}

// The collected text may reach 522,240 bytes; one byte more is refused.
TEST(IniWrite, SizeLimit) {
  TempDir dir;
  std::string path = dir.Join("big.ini");
  const size_t kLimit = 522240;
  for (size_t size : {kLimit, kLimit + 1}) {
    std::string text = "[S]\n";
    std::string line = ";" + std::string(98, 'c') + "\n";  // 100 bytes
    while (text.size() + line.size() <= size) text += line;
    text += ";" + std::string(size - text.size() - 2, 'c') + "\n";
    ASSERT_EQ(size, text.size());
    WriteFileOrDie(path, text);
    Bool ok = IniUtil_WriteIniFileString(path.c_str(), "S", "K", "v", FALSE);
    EXPECT_EQ(size == kLimit, ok) << size;
    EXPECT_EQ(size == kLimit ? text + "K=v\n" : text, ReadFileOrDie(path)) << size;
  }
}

TEST(IniWrite, SymlinkTargetIsEdited) {
  TempDir dir;
  std::string target = dir.Join("real.ini"), link = dir.Join("link.ini");
  WriteFileOrDie(target, "[S]\n");
  ASSERT_EQ(0, symlink("real.ini", link.c_str()));
  ASSERT_TRUE(IniUtil_WriteIniFileString(link.c_str(), "S", "K", "v", FALSE));
  struct stat st;
  ASSERT_EQ(0, lstat(link.c_str(), &st));
  EXPECT_TRUE(S_ISLNK(st.st_mode));
  EXPECT_EQ("[S]\nK=v\n", ReadFileOrDie(target));
}

}  // namespace
