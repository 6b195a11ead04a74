#include "tvx_floppy.h"

#include <gtest/gtest.h>

#include <set>
#include <string>

#include "support/fat_oracle.h"
#include "support/log_capture.h"

namespace {

using tvxtest::Bytes;
using tvxtest::FatProblems;
using tvxtest::LogCapture;
using tvxtest::MtoolsNames;
using tvxtest::MtoolsRead;
using tvxtest::ReadFileOrDie;
using tvxtest::TempDir;
using tvxtest::TestFloppy;
using tvxtest::WriteFileOrDie;

// Sizes around the 512-byte block and the cluster, several clusters; short,
// mixed-case, long and non-ASCII names; a file replaced by a shorter one.
TEST(FloppyTransfer, FilesGoInAndComeOutByteForByte) {
  std::pair<std::string, size_t> files[] = {
      {"empty", 0},          {"f1.bin", 1},           {"TXTSETUP.OEM", 511},
      {"storePwd.ini", 512}, {"auto_i~1.cfg", 513},   {"Ünïcode name.txt", 5000},
      {std::string(200, 'L') + ".long", 1024},        {"TarvexToolsUpgrader.exe", 300000},
  };
  TempDir t;
  std::string img = t.Join("autoinst.flp"), host = t.Join("host"), back = t.Join("back");
  TestFloppy f;
  ASSERT_EQ(f.Open(img, true), FAT_OK);
  std::set<std::string> names;
  for (const auto &[name, n] : files) {
    WriteFileOrDie(host, Bytes(n, static_cast<int>(n)));
    ASSERT_TRUE(AddFileToFloppyImg(f.root, host.c_str(), name.c_str())) << name;
    names.insert(name);
  }
  // The entry stays, with its name, and the old contents leave no tail.
  files[7].second = 700;
  WriteFileOrDie(host, Bytes(700, 700));
  ASSERT_TRUE(AddFileToFloppyImg(f.root, host.c_str(), "tarvextoolsupgrader.EXE"));
  for (const auto &[name, n] : files) {
    ASSERT_TRUE(GetFileFromFloppyImg(f.root, name.c_str(), back.c_str())) << name;
    EXPECT_TRUE(ReadFileOrDie(back) == Bytes(n, static_cast<int>(n))) << name;
  }
  f.Close();
  EXPECT_EQ(ReadFileOrDie(img).size(), FAT_FLOPPY_SIZE);
  EXPECT_EQ(FatProblems(img), "");
  EXPECT_EQ(MtoolsNames(img), names);
  for (const auto &[name, n] : files) {
    std::string out;
    ASSERT_TRUE(MtoolsRead(img, name, &out)) << name;
    EXPECT_TRUE(out == Bytes(n, static_cast<int>(n))) << name;
  }
}

TEST(FloppyTransfer, FailuresAreLoggedAndLeaveWhatWasCopied) {
  TempDir t;
  std::string img = t.Join("autoinst.flp"), host = t.Join("host");
  WriteFileOrDie(host, "data");
  TestFloppy f;
  ASSERT_EQ(f.Open(img, true), FAT_OK);
  ASSERT_TRUE(AddFileToFloppyImg(f.root, host.c_str(), "there.txt"));
  struct Case {
    const char *label;
    bool add;
    std::string from, to;
    std::string log;
  } cases[] = {
      {"missing host file", true, t.Join("absent"), "new.txt",
       "AddFileToFloppyImg: FileIO_Open failed, error: 6\n"},
      {"name FAT cannot hold", true, host, "a:b", "AddFileToFloppyImg: FAT_CreateFile failed, error: 7\n"},
      {"missing image file", false, "absent.txt", t.Join("out"),
       "GetFileFromFloppyImg: FAT_OpenFile failed, error: 4\n"},
      {"host folder missing", false, "there.txt", t.Join("no/out"),
       "GetFileFromFloppyImg: FileIO_Open failed, error: 6\n"},
  };
  for (const Case &c : cases) {
    LogCapture log;
    Bool ok = c.add ? AddFileToFloppyImg(f.root, c.from.c_str(), c.to.c_str())
                    : GetFileFromFloppyImg(f.root, c.from.c_str(), c.to.c_str());
    EXPECT_FALSE(ok) << c.label;
    EXPECT_EQ(log.All(), c.log) << c.label;
  }

  // A file larger than the room left: the blocks that fit stay.
  std::string huge = t.Join("huge");
  WriteFileOrDie(huge, Bytes(1500000, 3));
  LogCapture log;
  EXPECT_FALSE(AddFileToFloppyImg(f.root, huge.c_str(), "huge.bin"));
  EXPECT_EQ(log.All(), "AddFileToFloppyImg: FAT_WriteFile failed, error: 6\n");
  f.Close();
  EXPECT_EQ(FatProblems(img), "");
  EXPECT_EQ(MtoolsNames(img), (std::set<std::string>{"there.txt", "huge.bin"}));
  std::string out;
  ASSERT_TRUE(MtoolsRead(img, "huge.bin", &out));
  EXPECT_EQ(out.size(), (2847u - 1) * 512);
  EXPECT_TRUE(out == Bytes(1500000, 3).substr(0, out.size()));
}

}  // namespace
