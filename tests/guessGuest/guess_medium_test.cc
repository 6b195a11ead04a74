#include <gtest/gtest.h>

#include <cstdlib>
#include <set>
#include <string>

#include "guessGuest/media_table.h"

namespace {

using tvx::guess::Text;

// Every test opens one of the guess-medium images: rr, plain or udf.
const std::string kDir = "guess-medium/";

std::string SeqText(int n) {
  std::string s;
  for (int i = 1; i <= n; ++i) s += std::to_string(i) + "\n";
  return s;
}

// The directory path is tried as given, upper-cased, lower-cased; the
// variant that opened is the one kept in the GuessDir.
TEST(GuessMedium, OpenDirTriesCaseVariants) {
  struct Case {
    const char *image;
    const char *asked;
    const char *opened;  // null: must not open
  };
  const Case cases[] = {
      {"udf", "i386", "I386"},       {"udf", "LOWER", "lower"},
      {"udf", "Mixed", "Mixed"},     {"udf", "mixed", nullptr},
      {"rr", "i386", "i386"},        {"udf", "", ""},
      {"rr", "/", "/"},
  };
  for (const Case &c : cases) {
    tvxtest::OpenedMedium m(kDir + c.image);
    ASSERT_TRUE(m.ok());
    GuessDir *dir = Guess_OpenDir(m.get(), c.asked);
    if (c.opened == nullptr) {
      EXPECT_EQ(dir, nullptr) << c.image << ": " << c.asked;
      continue;
    }
    ASSERT_NE(dir, nullptr) << c.image << ": " << c.asked;
    EXPECT_STREQ(dir->path, c.opened) << c.image << ": " << c.asked;
    EXPECT_TRUE(Guess_CloseDir(m.get(), dir));
  }
}

// A whole file with a terminator after it; nothing for a missing name, a
// directory or an empty name.
TEST(GuessMedium, ReadFileNameReturnsWholeFileWithTerminator) {
  struct Case {
    const char *image;
    const char *path;
    std::string content;
    bool found = true;
  };
  const std::string big = SeqText(3000);
  const Case cases[] = {
      {"rr", "BIG.TXT", big},
      {"udf", "BIG.TXT", big},
      {"plain", "empty.txt", ""},
      {"udf", "EMPTY.TXT", ""},
      {"udf", "i386/txtsetup.sif", "[Strings]\nwks_id = \"Sample\"\n"},
      {"udf", "LOWER/NOTES.TXT", "stored in a lower-case directory\n"},
      {"rr", "/Mixed/Data.txt", "stored in a mixed-case directory\n"},
      {"rr", "NOTHERE.TXT", "", false},  {"rr", "I386", "", false},
      {"udf", "I386", "", false},        {"rr", "nodir/file", "", false},
      {"rr", "I386/", "", false},
  };
  for (const Case &c : cases) {
    tvxtest::OpenedMedium m(kDir + c.image);
    ASSERT_TRUE(m.ok());
    uint64_t size = 12345;
    Text data(Guess_ReadFileName(m.get(), c.path, &size));
    if (!c.found) {
      EXPECT_EQ(data, nullptr) << c.image << ": " << c.path;
      continue;
    }
    ASSERT_NE(data, nullptr) << c.image << ": " << c.path;
    EXPECT_EQ(size, c.content.size()) << c.image << ": " << c.path;
    EXPECT_EQ(std::string(data.get(), size), c.content) << c.image << ": " << c.path;
    EXPECT_EQ(data.get()[size], '\0');
  }
}

// FileExists tries the directory's case variants but the name only as given:
// ISO 9660 compares names without case anyway, UDF exactly. A directory is
// present too (installer bundles are folders), though it cannot be read.
TEST(GuessMedium, FileExistsMatchesNameCaseAsTheFormatDoes) {
  struct Case {
    const char *image;
    const char *dir;
    const char *name;
    bool exists;
  };
  const Case cases[] = {
      {"rr", "isolinux", "ISOLINUX.CFG", true},  {"plain", "ISOLINUX", "isolinux.cfg", true},
      {"udf", "ISOLINUX", "isolinux.cfg", true}, {"udf", "isolinux", "ISOLINUX.CFG", false},
      {"rr", "", "isolinux", true},              {"udf", "", "isolinux", true},
      {"udf", "", "ISOLINUX", false},            {"rr", "", "", false},
      {"rr", "nodir", "README", false},
  };
  for (const Case &c : cases) {
    tvxtest::OpenedMedium m(kDir + c.image);
    ASSERT_TRUE(m.ok());
    EXPECT_EQ(Guess_FileExists(m.get(), c.dir, c.name), c.exists ? TRUE : FALSE)
        << c.image << ": " << c.dir << "/" << c.name;
  }
}

// The prefix scan walks Guess_ReadDir, whose listing the next test checks on
// both formats; UDF is the one that compares names exactly.
TEST(GuessMedium, FileExistsWithPrefixIgnoresCase) {
  struct Case {
    const char *dir;
    const char *prefix;
    bool exists;
  };
  const Case cases[] = {
      {"SOURCES", "INSTALL_WINDOWS 7 ultimate", true},
      {"sources", "install.esd", false},
      {"nodir", "install", false},
      {"", "read", true},
  };
  tvxtest::OpenedMedium m(kDir + "udf");
  ASSERT_TRUE(m.ok());
  for (const Case &c : cases) {
    EXPECT_EQ(Guess_FileExistsWithPrefix(m.get(), c.dir, c.prefix), c.exists ? TRUE : FALSE)
        << c.dir << " " << c.prefix;
  }
}

// Reading a listed entry through the same directory must not disturb the
// listing: lookups scan a directory of their own.
TEST(GuessMedium, ListingSurvivesLookupsAndRewinds) {
  const std::set<std::string> expected = {"BIG.TXT", "EMPTY.TXT", "I386",    "isolinux",
                                          "lower",   "Mixed",     "README",  "sources"};
  for (const char *image : {"rr", "udf"}) {
    tvxtest::OpenedMedium m(kDir + image);
    ASSERT_TRUE(m.ok());
    GuessDir *dir = Guess_OpenDir(m.get(), "");
    ASSERT_NE(dir, nullptr);
    for (int pass = 0; pass < 2; ++pass) {
      std::set<std::string> seen;
      while (const char *name = Guess_ReadDir(m.get(), dir)) {
        seen.insert(name);
        if (std::string(name) == "README") {
          Text data(Guess_ReadFile(m.get(), dir, name, nullptr));
          EXPECT_NE(data, nullptr) << image;
        }
      }
      EXPECT_EQ(seen, expected) << image << " pass " << pass;
      EXPECT_EQ(Guess_ReadDir(m.get(), dir), nullptr);
      EXPECT_TRUE(Guess_RewindDir(m.get(), dir));
    }
    EXPECT_TRUE(Guess_CloseDir(m.get(), dir));
  }
}

TEST(GuessElfArch, ClassifiesByMachineLowByte) {
  struct Case {
    size_t length;
    unsigned char machine;
    GuessElfArch arch;
  };
  const Case cases[] = {
      {64, 62, GUESS_ELF_ARCH_X86_64}, {64, 3, GUESS_ELF_ARCH_X86},
      {19, 0xB7, GUESS_ELF_ARCH_ARM64},
      {18, 62, GUESS_ELF_ARCH_UNKNOWN},  // too short
      {64, 40, GUESS_ELF_ARCH_UNKNOWN},  // 32-bit Arm
  };
  for (const Case &c : cases) {
    unsigned char header[64] = {0x7F, 'E', 'L', 'F'};
    header[18] = c.machine;
    EXPECT_EQ(Guess_ELF_Arch(header, c.length), c.arch)
        << "machine " << int{c.machine} << " length " << c.length;
  }
}

}  // namespace
