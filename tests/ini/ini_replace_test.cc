// The rewrite must never leave a damaged file behind.
#include <dirent.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "support/log_capture.h"
#include "tvx_ini.h"

namespace {

using tvxtest::ReadFileOrDie;
using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

std::vector<std::string> Entries(const std::string &dir) {
  std::vector<std::string> names;
  DIR *d = opendir(dir.c_str());
  while (dirent *e = readdir(d)) {
    std::string n = e->d_name;
    if (n != "." && n != "..") names.push_back(n);
  }
  closedir(d);
  return names;
}

TEST(IniReplace, KeepsPermissionBits) {
  TempDir dir;
  std::string path = dir.Join("storePwd.ini");
  WriteFileOrDie(path, "[S]\n");
  for (mode_t mode : {0600, 0640, 0755}) {
    ASSERT_EQ(0, chmod(path.c_str(), mode));
    ASSERT_TRUE(IniUtil_WriteIniFileInt(path.c_str(), "S", "K", static_cast<int32_t>(mode)));
    struct stat st;
    ASSERT_EQ(0, stat(path.c_str(), &st));
    EXPECT_EQ(mode, st.st_mode & 07777);
  }
  EXPECT_EQ(std::vector<std::string>{"storePwd.ini"}, Entries(dir.Path()));
}

TEST(IniReplace, SymlinkTargetIsEdited) {
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

// A full disk is simulated with a file-size limit in a child process: the
// temporary file hits it, and the original must survive untouched.
TEST(IniReplace, FullDiskKeepsOriginal) {
  TempDir dir;
  std::string path = dir.Join("winnt.sif");
  std::string original = "[S]\n";
  while (original.size() < 8192) original += "Key" + std::to_string(original.size()) + "=v\n";
  WriteFileOrDie(path, original);
  pid_t pid = fork();
  ASSERT_GE(pid, 0);
  if (pid == 0) {
    signal(SIGXFSZ, SIG_IGN);
    struct rlimit lim = {4096, 4096};
    setrlimit(RLIMIT_FSIZE, &lim);
    _exit(IniUtil_WriteIniFileString(path.c_str(), "S", "K", "v", FALSE) ? 1 : 0);
  }
  int status = 0;
  ASSERT_EQ(pid, waitpid(pid, &status, 0));
  ASSERT_TRUE(WIFEXITED(status));
  EXPECT_EQ(0, WEXITSTATUS(status)) << "the write should have failed";
  EXPECT_EQ(original, ReadFileOrDie(path));
  EXPECT_EQ(std::vector<std::string>{"winnt.sif"}, Entries(dir.Path()));
}

TEST(IniReplace, UnwritableDirectoryKeepsOriginal) {
  if (geteuid() == 0) GTEST_SKIP() << "root may write anywhere";
  TempDir dir;
  std::string sub = dir.Join("ro");
  ASSERT_EQ(0, mkdir(sub.c_str(), 0755));
  std::string path = sub + "/a.ini";
  WriteFileOrDie(path, "[S]\nK=1\n");
  ASSERT_EQ(0, chmod(sub.c_str(), 0555));
  EXPECT_FALSE(IniUtil_WriteIniFileString(path.c_str(), "S", "K", "2", FALSE));
  chmod(sub.c_str(), 0755);
  EXPECT_EQ("[S]\nK=1\n", ReadFileOrDie(path));
}

}  // namespace
