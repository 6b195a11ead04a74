#include "support/run_argv.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>

#include "support/log_capture.h"

extern char **environ;

namespace tvxtest {

int RunArgv(const std::vector<std::string> &argv, std::string *out, const RunOptions &options) {
  std::vector<char *> args;
  for (const std::string &a : argv) args.push_back(const_cast<char *>(a.c_str()));
  args.push_back(nullptr);
  int fds[2];
  if (pipe(fds) != 0) return -1;
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
  posix_spawn_file_actions_adddup2(&actions, fds[1], STDOUT_FILENO);
  if (options.withStderr) posix_spawn_file_actions_adddup2(&actions, fds[1], STDERR_FILENO);
  posix_spawn_file_actions_addclose(&actions, fds[0]);
  if (options.cwd != nullptr) posix_spawn_file_actions_addchdir_np(&actions, options.cwd);
  pid_t pid = -1;
  int rc = posix_spawnp(&pid, args[0], &actions, nullptr, args.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  close(fds[1]);
  char buf[4096];
  for (ssize_t n; (n = read(fds[0], buf, sizeof buf)) > 0;) {
    if (out != nullptr) out->append(buf, static_cast<size_t>(n));
  }
  close(fds[0]);
  int status = 0;
  if (rc != 0 || waitpid(pid, &status, 0) != pid || !WIFEXITED(status)) return -1;
  return WEXITSTATUS(status);
}

std::string MakeSparseVmdk(const std::string &path, unsigned toolsVersion) {
  if (RunArgv({"qemu-img", "create", "-q", "-f", "vmdk", path, "1M"}) != 0) return "";
  std::string bytes = ReadFileOrDie(path);
  size_t at = bytes.find("ddb.toolsVersion = \"2147483647\"");
  if (at == std::string::npos) return "";
  char digits[11];
  std::snprintf(digits, sizeof digits, "%010u", toolsVersion);
  bytes.replace(at + 20, 10, digits);
  WriteFileOrDie(path, bytes);
  return path;
}

}  // namespace tvxtest
