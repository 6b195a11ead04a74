// Running the oracle tools of the tests (openssl, xorriso, mtools, perl ...)
// with an argument vector: no shell, so no argument is ever reinterpreted.
#pragma once

#include <string>
#include <vector>

namespace tvxtest {

struct RunOptions {
  const char *cwd = nullptr;  // working directory of the program (optional)
  bool withStderr = false;    // collect standard error into `out` as well
};

// RunArgv runs argv (a bare name is searched in PATH) with standard input
// from /dev/null and returns its exit status; -1 when it could not start or
// died of a signal. `out` (optional) collects its standard output.
int RunArgv(const std::vector<std::string> &argv, std::string *out = nullptr,
            const RunOptions &options = {});

// MakeSparseVmdk makes a 1 MiB sparse disk at `path` with qemu-img and puts
// `toolsVersion` into its disk database (qemu writes a placeholder of the
// same length). Returns `path`, or "" when that fails.
std::string MakeSparseVmdk(const std::string &path, unsigned toolsVersion);

}  // namespace tvxtest
