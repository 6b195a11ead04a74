// Writing single values: IniUtil_WriteIniFileString and IniUtil_WriteIniFileInt.
//
// The file is read piece by piece into one new text, which replaces the file
// only when complete. Lines are copied byte for byte; only the line of the
// key changes, or new lines are added. The structure (comments, headers, keys)
// is judged exactly as the reader judges it, inline comments included, so
// that a value written is the value read back.
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>

#include "lib/ini/ini_line.h"
#include "platform/file_replace.h"
#include "tvx_ini.h"

namespace tvx::ini {
namespace {

// A value may fill its line up to 1020 bytes counted from the line's start,
// which leaves room for two quotes and the newline within one line piece.
constexpr size_t kValueEnd = 1020;

// The view the reader has of a piece: the inline comment and anything behind
// a NUL are not part of it.
std::string_view StructureView(const std::string &piece) {
  if (KindOf(piece) == LineKind::kComment) return piece;
  std::string_view line = AsCString(piece);
  size_t semi = line.find(';', 1);
  return semi == std::string_view::npos ? line : line.substr(0, semi);
}

// Sections and keys that the reader could never find again, and texts that
// would break out of their line, are refused rather than written.
bool Writable(std::string_view section, std::string_view key, std::string_view value) {
  if (section.find_first_of("]\n;") != std::string_view::npos) return false;
  if (key.empty() || key.find_first_of("=\r\n;") != std::string_view::npos) return false;
  if (key[0] == '[' || key[0] == ' ' || key[0] == '\t') return false;
  if (value.find('\n') != std::string_view::npos) return false;
  // A new key or header line must fit one line piece.
  return section.size() + 3 <= kMaxPiece && key.size() + 4 <= kMaxPiece;
}

std::string Quote(std::string_view value, bool quoted) {
  std::string s;
  if (quoted) s += '"';
  s += value;
  if (quoted) s += '"';
  return s;
}

std::string NewKeyLine(std::string_view key, std::string_view value, bool quoted) {
  if (value.empty()) return std::string(key) + "\n";
  value = value.substr(0, std::min(value.size(), kValueEnd - (key.size() + 1)));
  return std::string(key) + "=" + Quote(value, quoted) + "\n";
}

class Writer {
 public:
  Writer(std::string_view section, std::string_view key, std::string_view value, bool quoted)
      : section_(section), key_(key), value_(value), quoted_(quoted) {
    out_.reserve(kOutputBuffer);
  }

  bool Run(const char *path) {
    LineReader reader;
    if (!reader.Open(path)) return false;
    std::string piece;
    bool skipContinuation = false;
    while (reader.Next(&piece)) {
      if (out_.size() > kCollectLimit) return false;
      bool ends = piece.back() == '\n';
      if (skipContinuation) {
        // The rest of a long line whose value was just replaced.
        skipContinuation = !ends;
        continue;
      }
      if (!Piece(piece)) return false;
      if (replacedNow_) {
        replacedNow_ = false;
        skipContinuation = !ends;
      }
    }
    if (reader.Failed()) return false;
    if (!written_) {
      if (out_.size() > kCollectLimit) return false;
      if (!seen_) AppendLine("[" + std::string(section_) + "]\n");
      AppendLine(NewKeyLine(key_, value_, quoted_));
    }
    return true;
  }

  const std::string &Text() const { return out_; }

 private:
  bool Piece(const std::string &piece) {
    std::string_view line = StructureView(piece);
    switch (KindOf(line)) {
      case LineKind::kComment:
        break;
      case LineKind::kHeader: {
        if (inSection_ && !written_) {
          AppendLine(NewKeyLine(key_, value_, quoted_));
          written_ = true;
        }
        std::string_view name;
        if (!HeaderName(line, &name)) return false;
        inSection_ = ascii::Equal(name, section_);
        seen_ = seen_ || inSection_;
        break;
      }
      case LineKind::kKey: {
        if (!inSection_ || written_) break;
        KeyLine k = ParseKeyLine(line);
        if (!ascii::Equal(k.key, key_)) break;
        out_ += Replacement(piece, k);
        written_ = true;
        replacedNow_ = true;
        return true;
      }
    }
    out_ += piece;
    return true;
  }

  // The old line keeps everything up to its "=" and gets the new value;
  // whatever followed the old value goes. A bare key, or a prefix too long to
  // leave room for the quotes, is rewritten as a new key line.
  std::string Replacement(const std::string &piece, const KeyLine &k) const {
    size_t extra = quoted_ ? 2 : 0;
    if (!k.hasEquals || k.valueOffset + extra + 1 > kMaxPiece) {
      return NewKeyLine(key_, value_, quoted_);
    }
    size_t room = k.valueOffset < kValueEnd ? kValueEnd - k.valueOffset : 0;
    std::string_view v = value_.substr(0, std::min(value_.size(), room));
    return piece.substr(0, k.valueOffset) + Quote(v, quoted_) + "\n";
  }

  // A last line without its newline would otherwise run into the new line.
  void AppendLine(const std::string &line) {
    if (!out_.empty() && out_.back() != '\n') out_ += '\n';
    out_ += line;
  }

  std::string_view section_, key_, value_;
  bool quoted_;
  std::string out_;
  bool inSection_ = false;
  bool seen_ = false;
  bool written_ = false;
  bool replacedNow_ = false;
};

Bool WriteString(const char *path, const char *section, const char *key, const char *value,
                 Bool quoted) {
  if (path == nullptr || section == nullptr || key == nullptr || value == nullptr) return FALSE;
  if (!Writable(section, key, value)) return FALSE;
  Writer w(section, key, value, quoted != FALSE);
  if (!w.Run(path)) return FALSE;
  // The caller's existing file is edited: a link to it stays a link.
  FileReplaceOptions options;
  options.links = FileLinkPolicy::kFollowLink;
  options.mustExist = true;
  return File_ReplaceContents(path, w.Text(), options);
}

}  // namespace
}  // namespace tvx::ini

extern "C" {

TVX_EXPORT Bool IniUtil_WriteIniFileString(const char *path, const char *section, const char *key,
                                           const char *value, Bool quoted) {
  try {
    return tvx::ini::WriteString(path, section, key, value, quoted);
  } catch (...) {
    return FALSE;
  }
}

TVX_EXPORT Bool IniUtil_WriteIniFileInt(const char *path, const char *section, const char *key,
                                        int32_t value) {
  char text[64] = {0};
  std::snprintf(text, sizeof text, "%d", value);
  return IniUtil_WriteIniFileString(path, section, key, text, FALSE);
}

}  // extern "C"
