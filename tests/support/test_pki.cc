#include "support/test_pki.h"

#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <vector>

#include "support/log_capture.h"

extern char **environ;

#ifndef TVX_TEST_CERT_DIR
#define TVX_TEST_CERT_DIR ""
#endif

namespace tvxtest {

int RunArgv(const std::vector<std::string> &args, std::string *out) {
  std::vector<char *> argv;
  for (const auto &a : args) argv.push_back(const_cast<char *>(a.c_str()));
  argv.push_back(nullptr);
  int fds[2];
  if (pipe(fds) != 0) return -1;
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_adddup2(&actions, fds[1], STDOUT_FILENO);
  posix_spawn_file_actions_addclose(&actions, fds[0]);
  pid_t pid = -1;
  int rc = posix_spawnp(&pid, argv[0], &actions, nullptr, argv.data(), environ);
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

namespace {

// Script runs scripts/make-test-pki with `args`.
bool Script(std::vector<std::string> args) {
  args.insert(args.begin(), SourceDir() + "/scripts/make-test-pki");
  return RunArgv(args) == 0;
}

}  // namespace

std::string TestCertDir() {
  // Only the directory that CMake named as this build's own (inside its
  // build tree) is ever written.
  static const std::string dir = [] {
    std::string d = TVX_TEST_CERT_DIR;
    return !d.empty() && Script({d}) ? d : std::string();
  }();
  return dir;
}

std::string Sign(const std::string &pkiDir, const std::string &signer, const std::string &data,
                 bool embed) {
  TempDir tmp;
  WriteFileOrDie(tmp.Join("in"), data);
  std::vector<std::string> args = {"sign", pkiDir, signer, tmp.Join("in"), tmp.Join("out")};
  if (embed) args.push_back("--embed");
  return Script(args) ? ReadFileOrDie(tmp.Join("out")) : std::string();
}

}  // namespace tvxtest
