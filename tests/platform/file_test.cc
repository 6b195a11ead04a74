#include "platform/file.h"
#include "platform/fileio.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>
#include <sys/stat.h>
#include <vector>

#include "support/log_capture.h"

namespace {

using tvxtest::ReadFileOrDie;
using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

using tvxtest::Take;

TEST(File, GetPathNameSplitsAtLastSlash) {
  struct Case {
    const char *path, *dir, *base;
  } cases[] = {
      {"I386/TXTSETUP.SIF", "I386", "TXTSETUP.SIF"},
      {"README", "", "README"},
      {"/x", "/", "x"},
      {"a//b", "a", "b"},
      {"dir/", "dir", ""},
      {"", "", ""},
  };
  for (const auto &c : cases) {
    char *dir = nullptr, *base = nullptr;
    File_GetPathName(c.path, &dir, &base);
    EXPECT_EQ(Take(dir), c.dir) << c.path;
    EXPECT_EQ(Take(base), c.base) << c.path;
  }
}

TEST(File, PathJoinPutsExactlyOneSlash) {
  struct Case {
    const char *dir, *name, *want;
  } cases[] = {
      {"out", "autoinst.flp", "out/autoinst.flp"},
      {"out//", "/x", "out/x"},
      {"/", "x", "/x"},
      {"", "x", "x"},
  };
  for (const auto &c : cases) EXPECT_EQ(Take(File_PathJoin(c.dir, c.name)), c.want);
}

TEST(File, CopyKeepsModeAndHonoursOverwrite) {
  TempDir t;
  std::string src = t.Join("src"), dst = t.Join("dst");
  WriteFileOrDie(src, std::string(200000, 'q'));
  chmod(src.c_str(), 0640);
  ASSERT_TRUE(File_Copy(src.c_str(), dst.c_str(), FALSE));
  EXPECT_EQ(ReadFileOrDie(dst), std::string(200000, 'q'));
  struct stat st;
  ASSERT_EQ(stat(dst.c_str(), &st), 0);
  EXPECT_EQ(st.st_mode & 0777, 0640u);

  WriteFileOrDie(src, "new");
  EXPECT_FALSE(File_Copy(src.c_str(), dst.c_str(), FALSE));
  EXPECT_EQ(ReadFileOrDie(dst).size(), 200000u);
  EXPECT_TRUE(File_Copy(src.c_str(), dst.c_str(), TRUE));
  EXPECT_EQ(ReadFileOrDie(dst), "new");

  // Onto itself: refused, and the data survives.
  EXPECT_FALSE(File_Copy(src.c_str(), src.c_str(), TRUE));
  EXPECT_EQ(ReadFileOrDie(src), "new");
  EXPECT_FALSE(File_Copy(t.Join("absent").c_str(), dst.c_str(), TRUE));
  EXPECT_FALSE(File_Copy(t.Path().c_str(), t.Join("dircopy").c_str(), TRUE));
  EXPECT_FALSE(File_Exists(t.Join("dircopy").c_str()));
}

TEST(File, DirectoriesCreateListAndDelete) {
  TempDir t;
  std::string deep = t.Join("a/b/c");
  char *top = nullptr;
  ASSERT_TRUE(File_CreateDirectoryHierarchy(deep.c_str(), &top));
  EXPECT_EQ(Take(top), t.Join("a"));
  ASSERT_TRUE(File_CreateDirectoryHierarchy(deep.c_str(), &top));
  EXPECT_EQ(top, nullptr);
  EXPECT_TRUE(File_CreateDirectory(deep.c_str()));
  WriteFileOrDie(t.Join("a/zeta"), "z");
  WriteFileOrDie(t.Join("a/alpha"), "a");
  WriteFileOrDie(t.Join("outside"), "keep");
  ASSERT_EQ(symlink(t.Join("outside").c_str(), t.Join("a/b/link").c_str()), 0);

  char **names = nullptr;
  ASSERT_EQ(File_ListDirectory(t.Join("a").c_str(), &names), 3);
  std::vector<std::string> got;
  for (int i = 0; i < 3; i++) got.push_back(Take(names[i]));
  EXPECT_EQ(names[3], nullptr);
  std::free(names);
  EXPECT_EQ(got, (std::vector<std::string>{"alpha", "b", "zeta"}));
  EXPECT_EQ(File_ListDirectory(t.Join("nope").c_str(), &names), -1);
  EXPECT_EQ(names, nullptr);

  EXPECT_FALSE(File_DeleteEmptyDirectory(t.Join("a").c_str()));
  EXPECT_TRUE(File_DeleteDirectoryTree(t.Join("a").c_str()));
  EXPECT_FALSE(File_Exists(t.Join("a").c_str()));
  EXPECT_EQ(ReadFileOrDie(t.Join("outside")), "keep");
  EXPECT_EQ(File_UnlinkIfExists(t.Join("outside").c_str()), 0);
  EXPECT_EQ(File_UnlinkIfExists(t.Join("outside").c_str()), 0);
  std::string blocker = t.Join("blocker");
  WriteFileOrDie(blocker, "");
  EXPECT_FALSE(File_CreateDirectoryHierarchy((blocker + "/sub").c_str(), nullptr));
  EXPECT_FALSE(File_CreateDirectory(blocker.c_str()));
}

TEST(FileIO, OpenResultCodes) {
  TempDir t;
  std::string existing = t.Join("existing"), fresh = t.Join("fresh");
  WriteFileOrDie(existing, "data");
  struct Case {
    std::string path;
    unsigned access;
    int action;
    FileIOResult want;
  } cases[] = {
      {t.Join("missing"), 1, FILEIO_OPEN, FILEIO_FILE_NOT_FOUND},
      {t.Join("no/dir/x"), 2, FILEIO_OPEN_CREATE, FILEIO_FILE_NOT_FOUND},
      {existing, 0x2001, FILEIO_OPEN, FILEIO_SUCCESS},
      {existing, 2, FILEIO_OPEN_CREATE_SAFE, FILEIO_OPEN_ERROR_EXIST},
      {existing, 0, FILEIO_OPEN, FILEIO_ERROR},
      {existing, 1, 99, FILEIO_ERROR},
      {existing, 1, FILEIO_OPEN_CREATE_EMPTY, FILEIO_ERROR},  // emptying needs write
      {t.Path(), 1, FILEIO_OPEN, FILEIO_ERROR},
      {t.Join(std::string(300, 'n')), 1, FILEIO_OPEN, FILEIO_FILE_NAME_TOO_LONG},
      {fresh, 2, FILEIO_OPEN_CREATE, FILEIO_SUCCESS},
  };
  for (const auto &c : cases) {
    FileIODescriptor fd;
    EXPECT_EQ(FileIO_Open(&fd, c.path.c_str(), c.access, c.action), c.want) << c.path;
    EXPECT_EQ(FileIO_IsValid(&fd) != 0, c.want == FILEIO_SUCCESS) << c.path;
    FileIO_Close(&fd);
  }
  EXPECT_EQ(ReadFileOrDie(existing), "data");
}

}  // namespace
