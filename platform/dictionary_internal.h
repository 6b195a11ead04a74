// The dictionary's representation, shared by its accessors and its text
// reader and writer.
#pragma once

#include <string>
#include <vector>

#include "platform/dictionary.h"

struct DictionaryEntry {
  std::string name;
  std::string value;
};

struct Dictionary {
  std::vector<DictionaryEntry> entries;
};

namespace tvx {

// ParseDictionaryText parses the text format into `out`; on failure it
// appends one message naming the line to `messages` and returns false.
bool ParseDictionaryText(const char *buf, size_t size, std::vector<DictionaryEntry> *out,
                         MsgList **messages);
// WriteDictionaryText renders entries in the text format.
std::string WriteDictionaryText(const std::vector<DictionaryEntry> &entries);
// IsWritableName: the name can stand unquoted before "=".
bool IsWritableName(const std::string &name);

}  // namespace tvx
