#include "lib/ini/ini_line.h"

#include <algorithm>
#include <cstring>

namespace tvx::ini {

bool LineReader::Next(std::string *piece) {
  piece->clear();
  while (piece->size() < kMaxPiece) {
    if (pos_ == buf_.size()) {
      buf_.resize(64 * 1024);
      size_t n = 0;
      FileIOResult r = FileIO_Read(&fd_, buf_.data(), buf_.size(), &n);
      failed_ = r != FILEIO_SUCCESS && r != FILEIO_READ_ERROR_EOF;
      buf_.resize(failed_ ? 0 : n);
      pos_ = 0;
      if (buf_.empty()) break;
    }
    size_t want = std::min(kMaxPiece - piece->size(), buf_.size() - pos_);
    const char *start = buf_.data() + pos_;
    const void *nl = std::memchr(start, '\n', want);
    size_t take = nl != nullptr ? static_cast<size_t>(static_cast<const char *>(nl) - start) + 1
                                : want;
    piece->append(start, take);
    pos_ += take;
    if (nl != nullptr) break;
  }
  return !piece->empty();
}

bool HeaderName(std::string_view line, std::string_view *out_name) {
  size_t close = line.find(']');
  if (close == std::string_view::npos) return false;
  *out_name = line.substr(1, close - 1);
  return true;
}

KeyLine ParseKeyLine(std::string_view line) {
  KeyLine k;
  size_t start = 0;
  while (start < line.size() && (line[start] == ' ' || line[start] == '\t')) ++start;
  size_t eq = line.find('=', start);
  if (eq != std::string_view::npos) {
    k.key = line.substr(start, eq - start);
    k.hasEquals = true;
    k.valueOffset = eq + 1;
    return k;
  }
  size_t end = line.size();
  while (end > start && (line[end - 1] == '\n' || line[end - 1] == '\r')) --end;
  k.key = line.substr(start, end - start);
  return k;
}

std::string_view AsCString(std::string_view line) {
  size_t nul = line.find('\0');
  return nul == std::string_view::npos ? line : line.substr(0, nul);
}

}  // namespace tvx::ini
