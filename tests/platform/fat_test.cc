#include "tvx_fat.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <unistd.h>
#include <set>
#include <string>
#include <vector>

#include "support/fat_oracle.h"
#include "support/log_capture.h"

namespace {

using tvxtest::Bytes;
using tvxtest::FatProblems;
using tvxtest::MtoolsNames;
using tvxtest::MtoolsRead;
using tvxtest::ReadFileOrDie;
using tvxtest::TempDir;
using tvxtest::TestFloppy;
using tvxtest::WriteFileOrDie;

// Add writes a new file in 512-byte blocks, the way floppy files are copied in.
unsigned long Add(FATDirectory *root, const std::string &name, const std::string &data) {
  FATFile *f = nullptr;
  unsigned long rc = FAT_CreateFile(root, name.c_str(), &f);
  for (size_t at = 0; at < data.size() && rc == FAT_OK; at += 512) {
    size_t written = 0;
    rc = FAT_WriteFile(f, at, data.data() + at, std::min<size_t>(512, data.size() - at), &written);
  }
  FAT_CloseFile(f);
  return rc;
}

std::string Read(FATDirectory *root, const std::string &name, unsigned long *rc) {
  FATFile *f = nullptr;
  std::string out;
  *rc = FAT_OpenFile(root, name.c_str(), &f);
  char buf[700];  // not a sector multiple: reads straddle clusters
  size_t n = 0;
  while (*rc == FAT_OK && (*rc = FAT_ReadFile(f, out.size(), buf, sizeof buf, &n)) == FAT_OK && n > 0) {
    out.append(buf, n);
  }
  FAT_CloseFile(f);
  return out;
}

// Growing, shrinking, deleting and a full volume, checked by fsck.fat after
// each round so that no cluster is lost or shared.
TEST(FAT, FilesGrowShrinkAndFillTheVolume) {
  TempDir t;
  std::string img = t.Join("f.flp");
  TestFloppy f;
  ASSERT_EQ(f.Open(img, true), FAT_OK);
  uint64_t empty = 0;
  ASSERT_EQ(FAT_GetFreeBytes(f.vol, &empty), FAT_OK);
  EXPECT_EQ(empty, 2847u * 512);
  ASSERT_EQ(Add(f.root, "big.bin", Bytes(1400000, 9)), FAT_OK);

  // A write that does not fit writes what does, and says so.
  FATFile *more = nullptr;
  ASSERT_EQ(FAT_CreateFile(f.root, "more.bin", &more), FAT_OK);
  std::string tail = Bytes(100000, 10);
  size_t written = 0;
  EXPECT_EQ(FAT_WriteFile(more, 0, tail.data(), tail.size(), &written), FAT_ERR_NO_SPACE);
  EXPECT_EQ(written, empty - 1400320);
  EXPECT_EQ(FAT_GetFileSize(more), written);
  EXPECT_EQ(FAT_SetFileSize(more, 1 << 20), FAT_ERR_NO_SPACE);  // all or nothing
  FAT_CloseFile(more);
  f.Close();
  EXPECT_EQ(FatProblems(img), "");

  ASSERT_EQ(f.Open(img, false), FAT_OK);
  FATFile *big = nullptr;
  ASSERT_EQ(FAT_OpenFile(f.root, "BIG.BIN", &big), FAT_OK);
  ASSERT_EQ(FAT_SetFileSize(big, 0), FAT_OK);
  ASSERT_EQ(FAT_WriteFile(big, 10, "xyz", 3, &written), FAT_OK);  // a gap reads as zeros
  ASSERT_EQ(FAT_SetFileSize(big, 3000), FAT_OK);                  // so does an extension
  FAT_CloseFile(big);
  ASSERT_EQ(FAT_DeleteFile(f.root, "more.bin"), FAT_OK);
  EXPECT_EQ(FAT_DeleteFile(f.root, "more.bin"), FAT_ERR_NOT_FOUND);
  ASSERT_EQ(Add(f.root, "after.bin", Bytes(1000000, 10)), FAT_OK);
  f.Close();
  EXPECT_EQ(FatProblems(img), "");
  EXPECT_EQ(MtoolsNames(img), (std::set<std::string>{"big.bin", "after.bin"}));
  std::string out;
  ASSERT_TRUE(MtoolsRead(img, "big.bin", &out));
  EXPECT_EQ(out, std::string(10, '\0') + "xyz" + std::string(2987, '\0'));
  ASSERT_TRUE(MtoolsRead(img, "after.bin", &out));
  EXPECT_TRUE(out == Bytes(1000000, 10));
}

TEST(FAT, NamesThatCannotBeStoredAreRefused) {
  TempDir t;
  TestFloppy f;
  ASSERT_EQ(f.Open(t.Join("n.flp"), true), FAT_OK);
  ASSERT_EQ(Add(f.root, "winnt.sif", "x"), FAT_OK);
  struct Case {
    std::string name;
    unsigned long want;
  } cases[] = {
      {"WINNT.SIF", FAT_ERR_EXISTS}, {"", FAT_ERR_BAD_NAME},     {"a/b", FAT_ERR_BAD_NAME},
      {"x.", FAT_ERR_BAD_NAME},      {"\xff\xfe", FAT_ERR_BAD_NAME},
      {"\xed\xa0\x80", FAT_ERR_BAD_NAME},  // a UTF-16 surrogate spelled in UTF-8
      {std::string(256, 'n'), FAT_ERR_BAD_NAME},
  };
  for (const auto &c : cases) EXPECT_EQ(Add(f.root, c.name, ""), c.want) << c.name;
  // The root directory of a 1.44 MB floppy has 224 entries.
  unsigned long rc = FAT_OK;
  int added = 1;
  while (rc == FAT_OK && added < 300) {
    rc = Add(f.root, "F" + std::to_string(added) + ".TXT", "");
    if (rc == FAT_OK) added++;
  }
  EXPECT_EQ(rc, FAT_ERR_NO_SPACE);
  EXPECT_EQ(added, 224);
}

TEST(FAT, DamagedImagesAreRefused) {
  TempDir t;
  std::string good = t.Join("good.flp");
  {
    TestFloppy f;
    ASSERT_EQ(f.Open(good, true), FAT_OK);
    ASSERT_EQ(Add(f.root, "file.bin", Bytes(5000, 11)), FAT_OK);
  }
  std::string bytes = ReadFileOrDie(good);
  auto patched = [&](size_t at, unsigned char v) {
    std::string b = bytes;
    b[at] = static_cast<char>(v);
    return b;
  };
  struct Case {
    const char *label;
    std::string image;
    unsigned long want;
  } cases[] = {
      {"empty", "", FAT_ERR_CORRUPT},
      {"truncated", bytes.substr(0, 100000), FAT_ERR_CORRUPT},
      {"sector size 0", patched(12, 0), FAT_ERR_CORRUPT},
      {"cluster size 3", patched(13, 3), FAT_ERR_CORRUPT},
      {"FAT too small for the clusters", patched(22, 1), FAT_ERR_CORRUPT},
      {"FAT32-style BPB", patched(22, 0), FAT_ERR_UNSUPPORTED},
  };
  for (const auto &c : cases) {
    std::string path = t.Join("bad.flp");
    WriteFileOrDie(path, c.image);
    FATVolume *v = nullptr;
    EXPECT_EQ(FAT_OpenVolume(FATDevFileIO_Open(path.c_str()), &v), c.want) << c.label;
    EXPECT_EQ(v, nullptr);
  }
  FATVolume *v = nullptr;
  EXPECT_EQ(FAT_OpenVolume(FATDevFileIO_Open(t.Join("absent").c_str()), &v), FAT_ERR_IO);
  EXPECT_NE(access(t.Join("absent").c_str(), F_OK), 0);  // opening never creates
  EXPECT_EQ(FAT_FormatVolume(FATDevFileIO_Open(t.Join("odd").c_str()), 1000000, 0, &v),
            FAT_ERR_UNSUPPORTED);

  // Chains that cannot be followed: the file's first cluster is 2, whose
  // FAT12 entry is bytes 3-4 of the FAT (sector 1), low 12 bits.
  struct Chain {
    const char *label;
    unsigned char lo, hiNibble;
  } chains[] = {
      {"loops onto itself", 0x02, 0x0},
      {"points past the last cluster", 0xFE, 0xF - 0x1},  // 0xEFE
      {"ends early", 0xFF, 0xF},  // end mark: one cluster for 5000 bytes
  };
  for (const auto &c : chains) {
    std::string b = bytes;
    b[512 + 3] = static_cast<char>(c.lo);
    b[512 + 4] = static_cast<char>((b[512 + 4] & 0xF0) | c.hiNibble);
    std::string path = t.Join("chain.flp");
    WriteFileOrDie(path, b);
    TestFloppy f;
    ASSERT_EQ(f.Open(path, false), FAT_OK);
    unsigned long rc;
    Read(f.root, "file.bin", &rc);
    EXPECT_EQ(rc, FAT_ERR_CORRUPT) << c.label;
    FATFile *file = nullptr;
    ASSERT_EQ(FAT_OpenFile(f.root, "file.bin", &file), FAT_OK);
    size_t written = 0;
    EXPECT_EQ(FAT_WriteFile(file, 0, "x", 1, &written), FAT_ERR_CORRUPT) << c.label;
    FAT_CloseFile(file);
  }
}

}  // namespace
