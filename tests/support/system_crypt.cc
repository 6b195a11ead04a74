#include "support/system_crypt.h"

#include <dlfcn.h>

#include <vector>

namespace tvxtest {

std::string SystemCrypt(const std::string &key, const std::string &setting) {
  using CryptRn = char *(*)(const char *, const char *, void *, int);
  static void *lib = dlopen("libcrypt.so.1", RTLD_NOW | RTLD_LOCAL);
  static auto crypt_rn =
      lib != nullptr ? reinterpret_cast<CryptRn>(dlsym(lib, "crypt_rn")) : nullptr;
  if (crypt_rn == nullptr) return "";
  // Larger than libxcrypt's struct crypt_data, so no development header is
  // needed.
  std::vector<char> data(1 << 16);
  const char *out =
      crypt_rn(key.c_str(), setting.c_str(), data.data(), static_cast<int>(data.size()));
  // Failures come back as NULL or as a text beginning with '*'.
  return out != nullptr && out[0] != '*' ? out : "";
}

}  // namespace tvxtest
