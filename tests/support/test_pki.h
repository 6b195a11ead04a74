// The test PKI (scripts/make-test-pki) from C++ tests: the build's own
// certificate directory with the PKI in it, and signatures by its signers.
#pragma once

#include <string>
#include <vector>

#include "support/run_argv.h"

namespace tvxtest {

// TestCertDir is the certificate directory the library was built to trust,
// with the test PKI made there on first use; it ends in "/". Empty when that
// directory lies outside the build tree (a product build): tests then skip,
// they never write to a system directory.
std::string TestCertDir();

// Sign returns a PEM PKCS#7 signature of `data` by `signer` of the PKI in
// `pkiDir`, detached or with the content embedded; empty on failure.
std::string Sign(const std::string &pkiDir, const std::string &signer, const std::string &data,
                 bool embed);

}  // namespace tvxtest
