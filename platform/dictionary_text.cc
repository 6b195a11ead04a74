// The dictionary text format (docs/dictionary-format.md): one entry per line,
//   name = "quoted value"   or   name = bare value
// with "#" comments and blank lines. The reader refuses, naming the line,
// anything else, so a damaged manifest or configuration is noticed rather
// than half-read.
#include <cstdint>
#include <cstring>

#include "platform/dictionary_internal.h"

namespace tvx {

namespace {

bool IsBlank(char c) { return c == ' ' || c == '\t'; }
bool IsControl(unsigned char c) { return c < 0x20 || c == 0x7f; }

int HexValue(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  return -1;
}

class LineParser {
 public:
  LineParser(const char *p, size_t n, unsigned lineNo, MsgList **messages)
      : p_(p), n_(n), line_(lineNo), messages_(messages) {}

  // Parse returns false on a malformed line; *has is false for blank and
  // comment lines.
  bool Parse(DictionaryEntry *out, bool *has) {
    *has = false;
    SkipBlanks();
    if (AtEnd() || Peek() == '#') return true;
    size_t start = i_;
    while (!AtEnd() && !IsBlank(Peek()) && Peek() != '=' && Peek() != '#' && Peek() != '"') {
      if (IsControl(static_cast<unsigned char>(Peek()))) {
        return Fail("@&!*@*@(msg.dictionary.controlInName)line %u: control character in a name");
      }
      i_++;
    }
    out->name.assign(p_ + start, i_ - start);
    if (out->name.empty()) {
      return Fail("@&!*@*@(msg.dictionary.noName)line %u: an entry must start with a name");
    }
    SkipBlanks();
    if (AtEnd() || Peek() != '=') {
      MsgList_Append(messages_, "@&!*@*@(msg.dictionary.noEquals)line %u: \"=\" expected after \"%s\"",
                     line_, out->name.c_str());
      return false;
    }
    i_++;
    SkipBlanks();
    bool ok = !AtEnd() && Peek() == '"' ? Quoted(&out->value) : Bare(&out->value);
    *has = ok;
    return ok;
  }

 private:
  bool AtEnd() const { return i_ >= n_; }
  char Peek() const { return p_[i_]; }
  void SkipBlanks() {
    while (!AtEnd() && IsBlank(Peek())) i_++;
  }
  bool Fail(const char *idFmt) {
    MsgList_Append(messages_, idFmt, line_);
    return false;
  }

  bool Quoted(std::string *value) {
    i_++;  // the opening quote
    for (;;) {
      if (AtEnd()) {
        return Fail("@&!*@*@(msg.dictionary.unterminated)line %u: the quoted value has no closing quote");
      }
      char c = p_[i_++];
      if (c == '"') break;
      if (c == '\\') {
        if (!Escape(value)) return false;
        continue;
      }
      if (c != '\t' && IsControl(static_cast<unsigned char>(c))) {
        return Fail("@&!*@*@(msg.dictionary.controlInValue)line %u: control character in a value");
      }
      value->push_back(c);
    }
    SkipBlanks();
    if (!AtEnd() && Peek() != '#') {
      return Fail("@&!*@*@(msg.dictionary.afterQuote)line %u: unexpected text after the closing quote");
    }
    return true;
  }

  bool Escape(std::string *value) {
    if (AtEnd()) {
      return Fail("@&!*@*@(msg.dictionary.unterminated)line %u: the quoted value has no closing quote");
    }
    char c = p_[i_++];
    switch (c) {
      case '\\': value->push_back('\\'); return true;
      case '"': value->push_back('"'); return true;
      case 'n': value->push_back('\n'); return true;
      case 'r': value->push_back('\r'); return true;
      case 't': value->push_back('\t'); return true;
      case 'x': {
        int hi = i_ < n_ ? HexValue(p_[i_]) : -1;
        int lo = i_ + 1 < n_ ? HexValue(p_[i_ + 1]) : -1;
        if (hi < 0 || lo < 0 || (hi == 0 && lo == 0)) break;
        value->push_back(static_cast<char>(hi * 16 + lo));
        i_ += 2;
        return true;
      }
      default: break;
    }
    return Fail("@&!*@*@(msg.dictionary.badEscape)line %u: unknown escape in a value");
  }

  bool Bare(std::string *value) {
    size_t start = i_;
    // A "#" starts a comment at the start of the value or after a blank;
    // inside a word it is part of the value ("11.0.0#4").
    while (!AtEnd() && !(Peek() == '#' && (i_ == start || IsBlank(p_[i_ - 1])))) {
      char c = Peek();
      if (c == '"') {
        return Fail("@&!*@*@(msg.dictionary.strayQuote)line %u: a double quote inside an unquoted value");
      }
      if (c != '\t' && IsControl(static_cast<unsigned char>(c))) {
        return Fail("@&!*@*@(msg.dictionary.controlInValue)line %u: control character in a value");
      }
      i_++;
    }
    size_t end = i_;
    while (end > start && IsBlank(p_[end - 1])) end--;
    value->assign(p_ + start, end - start);
    return true;
  }

  const char *p_;
  size_t n_;
  size_t i_ = 0;
  unsigned line_;
  MsgList **messages_;
};

}  // namespace

bool ParseDictionaryText(const char *buf, size_t size, std::vector<DictionaryEntry> *out,
                         MsgList **messages) {
  size_t pos = 0;
  // A byte-order mark from a Windows editor is not part of the first name.
  if (size >= 3 && std::memcmp(buf, "\xEF\xBB\xBF", 3) == 0) pos = 3;
  unsigned lineNo = 0;
  while (pos < size) {
    lineNo++;
    const void *nl = std::memchr(buf + pos, '\n', size - pos);
    size_t end = nl != nullptr ? static_cast<size_t>(static_cast<const char *>(nl) - buf) : size;
    size_t len = end - pos;
    if (std::memchr(buf + pos, '\0', len) != nullptr) {
      MsgList_Append(messages, "@&!*@*@(msg.dictionary.nul)line %u: NUL byte", lineNo);
      return false;
    }
    if (len > 0 && buf[pos + len - 1] == '\r') len--;
    DictionaryEntry entry;
    bool has = false;
    if (!LineParser(buf + pos, len, lineNo, messages).Parse(&entry, &has)) return false;
    if (has) out->push_back(std::move(entry));
    pos = end + 1;
  }
  return true;
}

bool IsWritableName(const std::string &name) {
  if (name.empty()) return false;
  for (unsigned char c : name) {
    if (IsControl(c) || c == ' ' || c == '=' || c == '#' || c == '"') return false;
  }
  return true;
}

std::string WriteDictionaryText(const std::vector<DictionaryEntry> &entries) {
  static const char kHex[] = "0123456789ABCDEF";
  std::string out;
  // The reader drops one byte-order mark at the start; a first name that
  // begins with those bytes must not lose them.
  if (!entries.empty() && entries[0].name.compare(0, 3, "\xEF\xBB\xBF") == 0) out = "\xEF\xBB\xBF";
  for (const auto &e : entries) {
    out += e.name;
    out += " = \"";
    for (unsigned char c : e.value) {
      switch (c) {
        case '\\': out += "\\\\"; break;
        case '"': out += "\\\""; break;
        case '\n': out += "\\n"; break;
        case '\r': out += "\\r"; break;
        case '\t': out += "\\t"; break;
        default:
          if (IsControl(c)) {
            out += "\\x";
            out += kHex[c >> 4];
            out += kHex[c & 15];
          } else {
            out += static_cast<char>(c);
          }
      }
    }
    out += "\"\n";
  }
  return out;
}

}  // namespace tvx
