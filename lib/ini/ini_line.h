// Line-level rules shared by the INI reader and writer: the 1023-byte line
// pieces, the kind of a line and the key of a key line.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "platform/ascii.h"
#include "platform/fileio.h"

namespace tvx::ini {

// The historical line buffer held 1024 bytes, so a physical line is consumed
// in pieces of at most 1023 bytes; files written by other tools may rely on
// that splitting, so it is kept exactly.
inline constexpr size_t kLineBuffer = 1024;
inline constexpr size_t kMaxPiece = kLineBuffer - 1;

// The rewritten text may reach this size before the last lines are added;
// the 2,048 bytes up to kOutputBuffer hold one line piece and one new line.
inline constexpr size_t kCollectLimit = 0x7F800;
inline constexpr size_t kOutputBuffer = 0x80000;

// Reads pieces of a file: up to and including the next '\n', at most
// kMaxPiece bytes. Bytes are kept as they are, NULs included.
class LineReader {
 public:
  LineReader() { FileIO_Invalidate(&fd_); }
  ~LineReader() { FileIO_Close(&fd_); }
  LineReader(const LineReader &) = delete;
  LineReader &operator=(const LineReader &) = delete;

  bool Open(const char *path) {
    return FileIO_Open(&fd_, path, FILEIO_OPEN_ACCESS_READ, FILEIO_OPEN) == FILEIO_SUCCESS;
  }
  // False at end of file or on a read error (see Failed).
  bool Next(std::string *piece);
  bool Failed() const { return failed_; }

 private:
  FileIODescriptor fd_;
  bool failed_ = false;
  std::string buf_;
  size_t pos_ = 0;
};

enum class LineKind { kComment, kHeader, kKey };

inline LineKind KindOf(std::string_view line) {
  if (!line.empty() && line[0] == ';') return LineKind::kComment;
  if (!line.empty() && line[0] == '[') return LineKind::kHeader;
  return LineKind::kKey;
}

// HeaderName gives the text between "[" and the first "]"; false when the
// header has no "]".
bool HeaderName(std::string_view line, std::string_view *out_name);

// The parts of a key line. A line without "=" is a bare key: its key runs to
// the line end (CR and LF excluded) and its value is empty.
struct KeyLine {
  std::string_view key;
  bool hasEquals = false;
  size_t valueOffset = 0;  // first byte after the "=" (hasEquals only)
};
KeyLine ParseKeyLine(std::string_view line);

// Cuts `line` at the first NUL, as a C string would end.
std::string_view AsCString(std::string_view line);

}  // namespace tvx::ini
