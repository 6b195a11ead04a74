// A small JSON writer for --json output: objects of scalars, arrays of texts.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace tvxcli {

class JsonObject {
 public:
  JsonObject &Str(const char *key, const std::string &value);
  JsonObject &StrOrNull(const char *key, const char *value);
  JsonObject &Num(const char *key, int64_t value);
  JsonObject &Bool(const char *key, bool value);
  JsonObject &Raw(const char *key, const std::string &json);
  JsonObject &StrArray(const char *key, const std::vector<std::string> &values);
  std::string Text() const { return "{" + body_ + "}"; }

 private:
  void Key(const char *key);
  std::string body_;
};

// Escape quotes a text as a JSON string (with the quotes); invalid UTF-8
// bytes become U+FFFD so the output always parses.
std::string JsonQuote(const std::string &text);

}  // namespace tvxcli
