#include "support/test_pki.h"

#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>

#include "support/log_capture.h"

extern char **environ;

#ifndef TVX_TEST_CERT_DIR
#define TVX_TEST_CERT_DIR ""
#endif

namespace tvxtest {

int RunArgv(const std::vector<std::string> &argv, std::string *out) {
  std::vector<char *> args;
  for (const auto &a : argv) args.push_back(const_cast<char *>(a.c_str()));
  args.push_back(nullptr);
  int pipefd[2];
  if (pipe(pipefd) != 0) return -1;
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_adddup2(&actions, pipefd[1], STDOUT_FILENO);
  posix_spawn_file_actions_addclose(&actions, pipefd[0]);
  pid_t pid = -1;
  int rc = posix_spawnp(&pid, args[0], &actions, nullptr, args.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  close(pipefd[1]);
  char buf[4096];
  ssize_t n;
  while ((n = read(pipefd[0], buf, sizeof buf)) > 0) {
    if (out != nullptr) out->append(buf, static_cast<size_t>(n));
  }
  close(pipefd[0]);
  if (rc != 0) return -1;
  int status = 0;
  if (waitpid(pid, &status, 0) != pid || !WIFEXITED(status)) return -1;
  return WEXITSTATUS(status);
}

bool MakePki(const std::string &dir) {
  return RunArgv({SourceDir() + "/scripts/make-test-pki", dir}) == 0;
}

std::string TestCertDir() {
  // Only a directory that the build itself configured as its test directory
  // (inside its build tree, named by CMake) is ever written.
  static const std::string dir = [] {
    std::string d = TVX_TEST_CERT_DIR;
    return !d.empty() && MakePki(d) ? d : std::string();
  }();
  return dir;
}

std::string Sign(const std::string &pkiDir, const std::string &signer, const std::string &data,
                 bool embed) {
  TempDir tmp;
  WriteFileOrDie(tmp.Join("in"), data);
  std::vector<std::string> argv = {SourceDir() + "/scripts/make-test-pki", "sign", pkiDir, signer,
                                   tmp.Join("in"), tmp.Join("out")};
  if (embed) argv.push_back("--embed");
  if (RunArgv(argv) != 0) return std::string();
  return ReadFileOrDie(tmp.Join("out"));
}

}  // namespace tvxtest
