#include "process.h"

#include <spawn.h>
#include <sys/wait.h>
#include <fcntl.h>

#include <cerrno>

extern char **environ;

int Process_Run(const char *const argv[], int *out_errno) {
  int dummy = 0;
  int &err = out_errno != nullptr ? *out_errno : dummy;
  err = 0;
  if (argv == nullptr || argv[0] == nullptr) {
    err = EINVAL;
    return -1;
  }
  posix_spawn_file_actions_t actions;
  if ((err = posix_spawn_file_actions_init(&actions)) != 0) return -1;
  err = posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
  pid_t pid = -1;
  if (err == 0) {
    // posix_spawn's argv is not const for historical reasons only; the
    // strings are never written.
    err = posix_spawnp(&pid, argv[0], &actions, nullptr, const_cast<char *const *>(argv),
                       environ);
  }
  posix_spawn_file_actions_destroy(&actions);
  if (err != 0) return -1;
  int status = 0;
  while (waitpid(pid, &status, 0) < 0) {
    if (errno != EINTR) {
      err = errno;
      return -1;
    }
  }
  if (WIFEXITED(status)) return WEXITSTATUS(status);
  err = EINTR;
  return -1;
}
