// The dictionary text reader on arbitrary bytes: it must never crash, and a
// text it accepts must come back entry for entry after a write and a re-read.
#include <cstdint>
#include <cstdlib>
#include <string>
#include <utility>
#include <vector>

#include "platform/dictionary.h"

namespace {

using Entries = std::vector<std::pair<std::string, std::string>>;

Entries All(const Dictionary *d) {
  Entries out;
  Dictionary_Iterate(
      d,
      [](const char *n, const char *v, void *ctx) -> Bool {
        static_cast<Entries *>(ctx)->emplace_back(n, v);
        return TRUE;
      },
      &out);
  return out;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size > 65536) return 0;
  Dictionary *d = Dictionary_Create();
  MsgList *msgs = nullptr;
  if (Dictionary_LoadFromBufferEx(d, reinterpret_cast<const char *>(data), size, &msgs)) {
    size_t len = 0;
    char *text = Dictionary_WriteToBuffer(d, &len);
    Dictionary *again = Dictionary_Create();
    if (!Dictionary_LoadFromBufferEx(again, text, len, nullptr) || All(again) != All(d)) std::abort();
    Dictionary_Free(again);
    std::free(text);
  } else if (MsgList_IsEmpty(msgs) || Dictionary_NumberOfEntries(d) != 0) {
    std::abort();  // a refusal must say why and add nothing
  }
  MsgList_Free(msgs);
  Dictionary_Free(d);
  return 0;
}
