#include "support/test_pki.h"

#include <spawn.h>
#include <sys/wait.h>

#include <vector>

#include "support/log_capture.h"

extern char **environ;

#ifndef TVX_TEST_CERT_DIR
#define TVX_TEST_CERT_DIR ""
#endif

namespace tvxtest {

namespace {

// Script runs scripts/make-test-pki with `args`, without a shell.
bool Script(std::vector<std::string> args) {
  args.insert(args.begin(), SourceDir() + "/scripts/make-test-pki");
  std::vector<char *> argv;
  for (auto &a : args) argv.push_back(a.data());
  argv.push_back(nullptr);
  pid_t pid = -1;
  int status = 0;
  return posix_spawn(&pid, argv[0], nullptr, nullptr, argv.data(), environ) == 0 &&
         waitpid(pid, &status, 0) == pid && WIFEXITED(status) && WEXITSTATUS(status) == 0;
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
