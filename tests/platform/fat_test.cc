#include "platform/fat.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <set>
#include <string>
#include <vector>

#include "support/log_capture.h"

namespace {

using tvxtest::ReadFileOrDie;
using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

std::string Shell(const std::string &cmd, int *status) {
  std::string out;
  FILE *p = popen((cmd + " 2>&1").c_str(), "r");
  if (p == nullptr) return out;
  char buf[4096];
  size_t n;
  while ((n = fread(buf, 1, sizeof buf, p)) > 0) out.append(buf, n);
  int rc = pclose(p);
  *status = WIFEXITED(rc) ? WEXITSTATUS(rc) : -1;
  return out;
}

std::string Bytes(size_t n, int seed) {
  std::string s(n, '\0');
  for (size_t i = 0; i < n; i++) s[i] = static_cast<char>((i * 31 + static_cast<size_t>(seed)) % 251);
  return s;
}

struct Floppy {
  FATVolume *vol = nullptr;
  FATDirectory *root = nullptr;
  unsigned long Open(const std::string &path, bool format) {
    FATDevice *dev = FATDevFileIO_Open(path.c_str());
    unsigned long rc = format ? FAT_FormatVolume(dev, 1474560, 0, &vol) : FAT_OpenVolume(dev, &vol);
    if (rc != FAT_OK) return rc;
    if ((rc = FAT_SkipVolumeBoot(vol)) != FAT_OK) return rc;
    return FAT_OpenRootDirectory(vol, &root);
  }
  unsigned long Add(const std::string &name, const std::string &data) {
    FATFile *f = nullptr;
    unsigned long rc = FAT_CreateFile(root, name.c_str(), &f);
    if (rc != FAT_OK) return rc;
    // In 512-byte blocks, the way floppy files are copied in.
    for (size_t at = 0; at < data.size() && rc == FAT_OK; at += 512) {
      size_t written = 0;
      rc = FAT_WriteFile(f, at, data.data() + at, std::min<size_t>(512, data.size() - at), &written);
    }
    FAT_CloseFile(f);
    return rc;
  }
  std::string Read(const std::string &name, unsigned long *rc) {
    FATFile *f = nullptr;
    std::string out;
    *rc = FAT_OpenFile(root, name.c_str(), &f);
    if (*rc != FAT_OK) return out;
    char buf[512];
    size_t n = 0;
    while ((*rc = FAT_ReadFile(f, out.size(), buf, sizeof buf, &n)) == FAT_OK && n > 0) out.append(buf, n);
    FAT_CloseFile(f);
    return out;
  }
  std::vector<std::string> List() {
    std::vector<std::string> names;
    FATDirIter *it = nullptr;
    FAT_GetDirIter(root, &it);
    while (FAT_DirIterNext(it) == FAT_OK) {
      char *n = nullptr;
      FAT_DirIterGetName(it, &n);
      names.push_back(std::string(n) + (FAT_DirIterIsDir(it) ? "/" : ""));
      std::free(n);
    }
    return names;
  }
  ~Floppy() {
    FAT_CloseDirectory(root);
    FAT_CloseVolume(vol);
  }
};

const std::vector<std::pair<std::string, std::string>> kFiles = {
    {"preseed.cfg", Bytes(1500, 1)},
    {"TXTSETUP.OEM", Bytes(512, 2)},
    {"storePwd.ini", Bytes(0, 3)},
    {"TarvexToolsUpgrader.exe", Bytes(100000, 4)},
    {"auto_i~1.cfg", Bytes(1, 5)},
    {"Ünïcode name.txt", Bytes(700, 6)},
};

TEST(FAT, FormattedFloppyWithFilesPassesFsckAndMtoolsReadsThem) {
  TempDir t;
  std::string img = t.Join("autoinst.flp");
  {
    Floppy f;
    ASSERT_EQ(f.Open(img, true), FAT_OK);
    for (const auto &[name, data] : kFiles) ASSERT_EQ(f.Add(name, data), FAT_OK) << name;
  }
  EXPECT_EQ(ReadFileOrDie(img).size(), 1474560u);
  int status = -1;
  std::string fsck = Shell("fsck.fat -n '" + img + "'", &status);
  EXPECT_EQ(status, 0) << fsck;
  // fsck.fat can exit 0 while complaining about long names: read its words.
  for (const char *bad : {"ong file", "rror", "ree cluster", "Fix", "Unrecover"}) {
    EXPECT_EQ(fsck.find(bad), std::string::npos) << fsck;
  }
  std::string mdir = Shell("MTOOLS_SKIP_CHECK=1 mdir -i '" + img + "' -b ::", &status);
  ASSERT_EQ(status, 0) << mdir;
  for (const auto &[name, data] : kFiles) {
    EXPECT_NE(mdir.find("::/" + name), std::string::npos) << name << "\n" << mdir;
    std::string out = t.Join("out.bin");
    std::remove(out.c_str());
    Shell("MTOOLS_SKIP_CHECK=1 mcopy -n -i '" + img + "' '::/" + name + "' '" + out + "'", &status);
    ASSERT_EQ(status, 0) << name;
    EXPECT_EQ(ReadFileOrDie(out), data) << name;
  }
}

TEST(FAT, ReadsFloppiesThatOtherToolsWrote) {
  TempDir t;
  std::string img = t.Join("tvxscsi.flp");
  int status = -1;
  Shell("mkfs.fat -C '" + img + "' 1440", &status);
  ASSERT_EQ(status, 0);
  WriteFileOrDie(t.Join("A Long Driver Name.sys"), Bytes(3000, 7));
  WriteFileOrDie(t.Join("OEMSETUP.INF"), Bytes(10, 8));
  Shell("MTOOLS_SKIP_CHECK=1 mcopy -i '" + img + "' '" + t.Join("A Long Driver Name.sys") + "' '" +
          t.Join("OEMSETUP.INF") + "' ::/ && MTOOLS_SKIP_CHECK=1 mmd -i '" + img + "' ::/SUBDIR",
      &status);
  ASSERT_EQ(status, 0);
  Floppy f;
  ASSERT_EQ(f.Open(img, false), FAT_OK);
  std::set<std::string> names;
  for (const auto &n : f.List()) names.insert(n);
  EXPECT_EQ(names, (std::set<std::string>{"A Long Driver Name.sys", "OEMSETUP.INF", "SUBDIR/"}));
  unsigned long rc;
  EXPECT_EQ(f.Read("a long driver name.SYS", &rc), Bytes(3000, 7));
  EXPECT_EQ(rc, FAT_OK);
  EXPECT_EQ(f.Read("oemsetup.inf", &rc), Bytes(10, 8));
  f.Read("SUBDIR", &rc);
  EXPECT_EQ(rc, FAT_ERR_NOT_FOUND);  // a directory is not a file
}

TEST(FAT, TruncateAndRewriteReusesClusters) {
  TempDir t;
  std::string img = t.Join("f.flp");
  {
    Floppy f;
    ASSERT_EQ(f.Open(img, true), FAT_OK);
    ASSERT_EQ(f.Add("big.bin", Bytes(1400000, 9)), FAT_OK);
    ASSERT_EQ(f.Add("more.bin", Bytes(200000, 9)), FAT_ERR_NO_SPACE);  // the floppy is full
    FATFile *file = nullptr;
    ASSERT_EQ(FAT_OpenFile(f.root, "BIG.BIN", &file), FAT_OK);
    ASSERT_EQ(FAT_SetFileSize(file, 0), FAT_OK);
    size_t written = 0;
    ASSERT_EQ(FAT_WriteFile(file, 10, "xyz", 3, &written), FAT_OK);  // a gap reads as zeros
    EXPECT_EQ(FAT_GetFileSize(file), 13u);
    FAT_CloseFile(file);
    ASSERT_EQ(f.Add("after.bin", Bytes(1000000, 10)), FAT_OK);
  }
  Floppy f;
  ASSERT_EQ(f.Open(img, false), FAT_OK);
  unsigned long rc;
  EXPECT_EQ(f.Read("big.bin", &rc), std::string(10, '\0') + "xyz");
  EXPECT_EQ(f.Read("after.bin", &rc), Bytes(1000000, 10));
  int status = -1;
  std::string fsck = Shell("fsck.fat -n '" + img + "'", &status);
  EXPECT_EQ(status, 0) << fsck;
}

TEST(FAT, NamesThatCannotBeStoredAreRefused) {
  TempDir t;
  Floppy f;
  ASSERT_EQ(f.Open(t.Join("n.flp"), true), FAT_OK);
  ASSERT_EQ(f.Add("winnt.sif", "x"), FAT_OK);
  struct Case {
    std::string name;
    unsigned long want;
  } cases[] = {
      {"WINNT.SIF", FAT_ERR_EXISTS}, {"", FAT_ERR_BAD_NAME},     {"a/b", FAT_ERR_BAD_NAME},
      {"x.", FAT_ERR_BAD_NAME},      {"what?", FAT_ERR_BAD_NAME}, {"\xff\xfe", FAT_ERR_BAD_NAME},
      {std::string(256, 'n'), FAT_ERR_BAD_NAME},
  };
  for (const auto &c : cases) EXPECT_EQ(f.Add(c.name, ""), c.want) << c.name;
  // The root directory of a 1.44 MB floppy has 224 entries.
  unsigned long rc = FAT_OK;
  int added = 1;
  while (rc == FAT_OK && added < 300) {
    rc = f.Add("F" + std::to_string(added) + ".TXT", "");
    if (rc == FAT_OK) added++;
  }
  EXPECT_EQ(rc, FAT_ERR_NO_SPACE);
  EXPECT_EQ(added, 224);
}

TEST(FAT, DamagedImagesAreRefused) {
  TempDir t;
  std::string good = t.Join("good.flp");
  {
    Floppy f;
    ASSERT_EQ(f.Open(good, true), FAT_OK);
    ASSERT_EQ(f.Add("file.bin", Bytes(5000, 11)), FAT_OK);
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
      {"no FATs", patched(16, 0), FAT_ERR_CORRUPT},
      {"cluster size 3", patched(13, 3), FAT_ERR_CORRUPT},
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
  EXPECT_EQ(FAT_FormatVolume(FATDevFileIO_Open(t.Join("odd").c_str()), 1000000, 0, &v),
            FAT_ERR_UNSUPPORTED);

  // A cluster chain that loops back on itself: reading stops with an error.
  // The file's first cluster is 2; FAT12 entry 2 lives in bytes 3-4 of the
  // FAT (sector 1), its low 12 bits pointing at the next cluster.
  std::string loop = bytes;
  loop[512 + 3] = 0x02;
  loop[512 + 4] = static_cast<char>((loop[512 + 4] & 0xF0) | 0x00);
  std::string path = t.Join("loop.flp");
  WriteFileOrDie(path, loop);
  Floppy f;
  ASSERT_EQ(f.Open(path, false), FAT_OK);
  unsigned long rc;
  f.Read("file.bin", &rc);
  EXPECT_EQ(rc, FAT_ERR_CORRUPT);
}

}  // namespace
