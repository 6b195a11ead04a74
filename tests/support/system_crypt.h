// The system's crypt(3) (libxcrypt), loaded at run time, as an independent
// oracle for password hashes.
#pragma once

#include <string>

namespace tvxtest {

// SystemCrypt returns crypt(key, setting), or "" when the library refuses
// the setting (it does not clamp rounds below 1000) or is missing.
std::string SystemCrypt(const std::string &key, const std::string &setting);

}  // namespace tvxtest
