#include "json.h"

#include <cstdio>

namespace tvxcli {

std::string JsonQuote(const std::string &text) {
  std::string out = "\"";
  const auto *s = reinterpret_cast<const unsigned char *>(text.data());
  size_t n = text.size();
  for (size_t i = 0; i < n;) {
    unsigned char c = s[i];
    if (c == '"' || c == '\\') {
      out += '\\';
      out += static_cast<char>(c);
      ++i;
    } else if (c < 0x20) {
      char esc[8];
      std::snprintf(esc, sizeof esc, "\\u%04x", c);
      out += esc;
      ++i;
    } else if (c < 0x80) {
      out += static_cast<char>(c);
      ++i;
    } else {
      size_t len = c >= 0xF0 && c <= 0xF4 ? 4 : c >= 0xE0 ? 3 : c >= 0xC2 && c <= 0xDF ? 2 : 0;
      bool ok = len != 0 && i + len <= n;
      for (size_t k = 1; ok && k < len; ++k) ok = (s[i + k] & 0xC0) == 0x80;
      if (ok) {
        out.append(text, i, len);
        i += len;
      } else {
        out += "\xEF\xBF\xBD";
        ++i;
      }
    }
  }
  out += '"';
  return out;
}

void JsonObject::Key(const char *key) {
  if (!body_.empty()) body_ += ", ";
  body_ += JsonQuote(key);
  body_ += ": ";
}

JsonObject &JsonObject::Str(const char *key, const std::string &value) {
  Key(key);
  body_ += JsonQuote(value);
  return *this;
}

JsonObject &JsonObject::StrOrNull(const char *key, const char *value) {
  Key(key);
  body_ += value ? JsonQuote(value) : "null";
  return *this;
}

JsonObject &JsonObject::Num(const char *key, int64_t value) {
  Key(key);
  body_ += std::to_string(value);
  return *this;
}

JsonObject &JsonObject::Bool(const char *key, bool value) {
  Key(key);
  body_ += value ? "true" : "false";
  return *this;
}

JsonObject &JsonObject::Raw(const char *key, const std::string &json) {
  Key(key);
  body_ += json;
  return *this;
}

JsonObject &JsonObject::StrArray(const char *key, const std::vector<std::string> &values) {
  Key(key);
  body_ += "[";
  for (size_t i = 0; i < values.size(); ++i) {
    if (i) body_ += ", ";
    body_ += JsonQuote(values[i]);
  }
  body_ += "]";
  return *this;
}

}  // namespace tvxcli
