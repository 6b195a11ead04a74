#include "support/fat_oracle.h"

#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <cstdio>

#include "support/log_capture.h"

extern char **environ;

namespace tvxtest {

namespace {

// Run runs argv (searched in PATH) with standard output and error into
// `out`, since fsck.fat reports some findings on either; the exit status, -1
// when it could not run.
int Run(const std::vector<std::string> &argv, std::string *out) {
  // mtools refuses images whose geometry it doubts unless told not to.
  setenv("MTOOLS_SKIP_CHECK", "1", 1);
  int fds[2];
  if (pipe(fds) != 0) return -1;
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_adddup2(&actions, fds[1], 1);
  posix_spawn_file_actions_adddup2(&actions, fds[1], 2);
  posix_spawn_file_actions_addclose(&actions, fds[0]);
  std::vector<char *> args;
  for (const std::string &a : argv) args.push_back(const_cast<char *>(a.c_str()));
  args.push_back(nullptr);
  pid_t pid = -1;
  int rc = posix_spawnp(&pid, args[0], &actions, nullptr, args.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  close(fds[1]);
  char buf[4096];
  ssize_t n;
  while ((n = read(fds[0], buf, sizeof buf)) > 0) out->append(buf, static_cast<size_t>(n));
  close(fds[0]);
  if (rc != 0) return -1;
  int status = 0;
  if (waitpid(pid, &status, 0) != pid) return -1;
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

}  // namespace

std::string FatProblems(const std::string &image) {
  std::string out;
  int status = Run({"fsck.fat", "-n", image}, &out);
  bool clean = status == 0;
  for (const char *bad : {"ong file", "rror", "ree cluster", "Fix", "Unrecover", "orrect",
                          "Duplicate", "Bad", "claimed", "truncat"}) {
    clean = clean && out.find(bad) == std::string::npos;
  }
  return clean ? "" : "fsck.fat exit " + std::to_string(status) + ":\n" + out;
}

std::set<std::string> MtoolsNames(const std::string &image) {
  std::string out;
  std::set<std::string> names;
  if (Run({"mdir", "-b", "-i", image, "::/"}, &out) != 0) return names;
  size_t start = 0;
  while (start < out.size()) {
    size_t end = out.find('\n', start);
    std::string line = out.substr(start, end == std::string::npos ? std::string::npos : end - start);
    start = end == std::string::npos ? out.size() : end + 1;
    if (line.rfind("::/", 0) == 0) names.insert(line.substr(3));
  }
  return names;
}

bool MtoolsRead(const std::string &image, const std::string &name, std::string *data) {
  TempDir t;
  std::string path = t.Join("out"), log;
  if (Run({"mcopy", "-n", "-i", image, "::/" + name, path}, &log) != 0) return false;
  *data = ReadFileOrDie(path);
  return true;
}

bool MtoolsWrite(const std::string &image, const std::string &name, const std::string &data) {
  TempDir t;
  std::string path = t.Join("in"), log;
  WriteFileOrDie(path, data);
  return Run({"mcopy", "-o", "-i", image, path, "::/" + name}, &log) == 0;
}

unsigned long TestFloppy::Open(const std::string &path, bool format) {
  FATDevice *dev = FATDevFileIO_Open(path.c_str());
  unsigned long rc = format ? FAT_FormatVolume(dev, FAT_FLOPPY_SIZE, 0, &vol) : FAT_OpenVolume(dev, &vol);
  if (rc == FAT_OK) rc = FAT_SkipVolumeBoot(vol);
  return rc == FAT_OK ? FAT_OpenRootDirectory(vol, &root) : rc;
}

void TestFloppy::Close() {
  FAT_CloseDirectory(root);
  FAT_CloseVolume(vol);
  root = nullptr;
  vol = nullptr;
}

std::string Bytes(size_t n, int seed) {
  std::string s(n, '\0');
  for (size_t i = 0; i < n; i++) s[i] = static_cast<char>((i * 31 + static_cast<size_t>(seed)) % 251);
  return s;
}

}  // namespace tvxtest
