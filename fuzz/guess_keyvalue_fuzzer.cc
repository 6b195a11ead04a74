// GuessParseKeyValue on arbitrary setup-file text, entered at every "=" and
// line start the way the Windows recognisers enter it.
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string>

#include "tvx_guess.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size > 4096) return 0;
  std::string text(reinterpret_cast<const char *>(data), size);  // adds the NUL
  for (size_t i = 0; i <= text.size(); ++i) {
    if (i != 0 && text[i - 1] != '\n') continue;
    char *key = nullptr;
    char *value = nullptr;
    if (GuessParseKeyValue(text.c_str() + i, &key, &value)) {
      if (value == nullptr || value[0] == '\0' || key == nullptr) std::abort();
      if (std::strchr(value, '"') != nullptr) std::abort();
    }
    std::free(key);
    std::free(value);
  }
  return 0;
}
