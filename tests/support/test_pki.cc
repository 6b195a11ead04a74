#include "support/test_pki.h"

#include <vector>

#include "support/log_capture.h"

#ifndef TVX_TEST_CERT_DIR
#define TVX_TEST_CERT_DIR ""
#endif

namespace tvxtest {

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
