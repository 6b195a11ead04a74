#include "platform/file_replace.h"

#include <gtest/gtest.h>

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <string>

#include "support/log_capture.h"

namespace {

using tvxtest::ReadFileOrDie;
using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

mode_t ModeOf(const std::string &path) {
  struct stat st;
  EXPECT_EQ(::lstat(path.c_str(), &st), 0) << path;
  return st.st_mode;
}

int EntryCount(const std::string &dir) {
  return static_cast<int>(std::distance(std::filesystem::directory_iterator(dir), {}));
}

// What sits at the target's name before the write, and what each policy must
// leave there afterwards.
enum class Before { kNothing, kFile0640, kSymlinkToVictim, kHardlinkToVictim, kDirectory, kFifo };

TEST(FileReplace, PoliciesOnWhatIsAlreadyThere) {
  struct Case {
    const char *label;
    Before before;
    FileReplaceOptions options;
    bool ok;
    int err;
    mode_t mode;           // permission bits of the target afterwards
    bool victimUntouched;  // the file a link led to still holds "victim"
  } cases[] = {
      {"new file takes newMode", Before::kNothing, {}, true, 0, 0644, true},
      {"new secret is 0600", Before::kNothing, {.secret = true}, true, 0, 0600, true},
      {"existing keeps its bits", Before::kFile0640, {}, true, 0, 0640, true},
      {"existing secret becomes 0600", Before::kFile0640, {.secret = true}, true, 0, 0600, true},
      {"mustExist on a missing name", Before::kNothing, {.mustExist = true}, false, ENOENT, 0, true},
      {"planted symlink is replaced", Before::kSymlinkToVictim, {.secret = true}, true, 0, 0600, true},
      {"followed symlink rewrites its target",
       Before::kSymlinkToVictim, {.links = FileLinkPolicy::kFollowLink}, true, 0, 0644, false},
      {"hard link is never written through", Before::kHardlinkToVictim, {}, true, 0, 0644, true},
      {"directory is refused", Before::kDirectory, {}, false, EISDIR, 0, true},
      {"fifo is refused", Before::kFifo, {}, false, EINVAL, 0, true},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.label);
    TempDir dir;
    std::string target = dir.Join("answer.txt"), victim = dir.Join("victim");
    WriteFileOrDie(victim, "victim");
    ::chmod(victim.c_str(), 0644);
    switch (c.before) {
      case Before::kNothing: break;
      case Before::kFile0640:
        WriteFileOrDie(target, "old contents that are longer than the new");
        ::chmod(target.c_str(), 0640);
        break;
      case Before::kSymlinkToVictim: ASSERT_EQ(::symlink(victim.c_str(), target.c_str()), 0); break;
      case Before::kHardlinkToVictim: ASSERT_EQ(::link(victim.c_str(), target.c_str()), 0); break;
      case Before::kDirectory: ASSERT_EQ(::mkdir(target.c_str(), 0755), 0); break;
      case Before::kFifo: ASSERT_EQ(::mkfifo(target.c_str(), 0644), 0); break;
    }
    int before = EntryCount(dir.Path());
    int err = 0;
    EXPECT_EQ(File_ReplaceContents(target.c_str(), "new", c.options, &err), c.ok ? TRUE : FALSE);
    EXPECT_EQ(err, c.err);
    EXPECT_EQ(EntryCount(dir.Path()), before + (c.ok && c.before == Before::kNothing ? 1 : 0))
        << "a temporary file stayed behind";
    EXPECT_EQ(ReadFileOrDie(victim) == "victim", c.victimUntouched);
    if (!c.ok) continue;
    EXPECT_EQ(ReadFileOrDie(target), "new");
    std::string written = c.options.links == FileLinkPolicy::kFollowLink ? victim : target;
    EXPECT_TRUE(S_ISREG(ModeOf(written)));
    EXPECT_EQ(ModeOf(written) & 07777, c.mode);
  }
}

TEST(FileReplace, FailedFillLeavesOldFileAndNoTemporary) {
  TempDir dir;
  std::string target = dir.Join("config.xml");
  WriteFileOrDie(target, "old");
  std::string seenTmp;
  int err = 0;
  Bool ok = File_ReplaceWith(
      target.c_str(), {},
      [&](int fd, const char *tmp) {
        seenTmp = tmp;
        (void)::write(fd, "partial", 7);
        errno = ENOSPC;
        return false;
      },
      &err);
  EXPECT_FALSE(ok);
  EXPECT_EQ(err, ENOSPC);
  EXPECT_EQ(ReadFileOrDie(target), "old");
  EXPECT_EQ(seenTmp.rfind(dir.Path() + "/", 0), 0u) << "temporary file must sit beside the target";
  EXPECT_NE(::access(seenTmp.c_str(), F_OK), 0);
  EXPECT_EQ(EntryCount(dir.Path()), 1);
}

}  // namespace
