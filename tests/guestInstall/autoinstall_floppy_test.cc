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

// Sizes around the 512-byte block and the cluster, and several clusters.
TEST(FloppyTransfer, FilesGoInAndComeOutByteForByte) {
  const size_t sizes[] = {0, 1, 511, 512, 513, 1024, 5000, 300000};
  TempDir t;
  std::string img = t.Join("autoinst.flp");
  TestFloppy f;
  ASSERT_EQ(f.Open(img, true), FAT_OK);
  std::set<std::string> names;
  for (size_t n : sizes) {
    std::string name = "f" + std::to_string(n) + ".bin", host = t.Join(name);
    WriteFileOrDie(host, Bytes(n, static_cast<int>(n)));
    ASSERT_TRUE(AddFileToFloppyImg(f.root, host.c_str(), name.c_str())) << n;
    names.insert(name);
  }
  for (size_t n : sizes) {
    std::string name = "f" + std::to_string(n) + ".bin", back = t.Join("back");
    ASSERT_TRUE(GetFileFromFloppyImg(f.root, name.c_str(), back.c_str())) << n;
    EXPECT_TRUE(ReadFileOrDie(back) == Bytes(n, static_cast<int>(n))) << n;
  }
  f.Close();
  EXPECT_EQ(FatProblems(img), "");
  EXPECT_EQ(MtoolsNames(img), names);
  for (size_t n : sizes) {
    std::string out;
    ASSERT_TRUE(MtoolsRead(img, "f" + std::to_string(n) + ".bin", &out)) << n;
    EXPECT_TRUE(out == Bytes(n, static_cast<int>(n))) << n;
  }
}

TEST(FloppyTransfer, ReplacingALongerFileLeavesNoTail) {
  TempDir t;
  std::string img = t.Join("autoinst.flp"), longer = t.Join("long"), shorter = t.Join("short");
  WriteFileOrDie(longer, Bytes(20000, 1));
  WriteFileOrDie(shorter, Bytes(700, 2));
  TestFloppy f;
  ASSERT_EQ(f.Open(img, true), FAT_OK);
  ASSERT_TRUE(AddFileToFloppyImg(f.root, longer.c_str(), "winnt.sif"));
  ASSERT_TRUE(AddFileToFloppyImg(f.root, shorter.c_str(), "WINNT.SIF"));  // same file
  uint64_t free = 0;
  FAT_GetFreeBytes(f.vol, &free);
  EXPECT_EQ(free, (2847u - 2) * 512);  // the 20000 bytes' clusters came back
  f.Close();
  EXPECT_EQ(FatProblems(img), "");
  EXPECT_EQ(MtoolsNames(img), std::set<std::string>{"winnt.sif"});
  std::string out;
  ASSERT_TRUE(MtoolsRead(img, "winnt.sif", &out));
  EXPECT_TRUE(out == Bytes(700, 2));
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
