// Helpers shared by the recognisers of lib/guessGuest: owning wrappers for
// what medium access hands out, bounded writes into GuessResult fields, and
// small text tests. Recognisers read the medium only through the Guess_*
// medium-access calls; these helpers add no other way in.
#pragma once

#include <cstring>
#include <string_view>

#include "platform/ascii.h"
#include "platform/log.h"
#include "platform/unique.h"
#include "tvx_guess.h"

// The source path named by the recognition code's internal-error stops.
#define GUESS_SOURCE_PATH "lib/guessGuest/guess"
#define GUESS_NOT_REACHED() NOT_REACHED_AT(GUESS_SOURCE_PATH)

namespace tvx::guess {

// ---- Owning wrappers ----

// A malloc'd text: file contents from Guess_ReadFile*, values from
// GuessParseKeyValue, texts from Str_* and Msg_*.
using Text = tvx::CharPtr;

// ReadText reads a whole file by path (case variants as Guess_ReadFileName
// tries them); empty when the file cannot be read. `out_size` is optional.
inline Text ReadText(GuessMedium *medium, const char *path, uint64_t *out_size = nullptr) {
  return Text(Guess_ReadFileName(medium, path, out_size));
}

// ParsedValue runs GuessParseKeyValue on `text` and returns the value, or
// empty when the entry has none.
inline Text ParsedValue(const char *text) {
  char *value = nullptr;
  if (!GuessParseKeyValue(text, nullptr, &value)) return Text();
  return Text(value);
}

// Dir owns a GuessDir and closes it on the medium it was opened on.
class Dir {
 public:
  Dir(GuessMedium *medium, const char *path)
      : medium_(medium), dir_(Guess_OpenDir(medium, path)) {}
  ~Dir() {
    if (dir_ != nullptr) Guess_CloseDir(medium_, dir_);
  }
  Dir(const Dir &) = delete;
  Dir &operator=(const Dir &) = delete;

  explicit operator bool() const { return dir_ != nullptr; }
  GuessDir *get() const { return dir_; }
  // Next entry name, or null at the end (see Guess_ReadDir).
  const char *Next() { return Guess_ReadDir(medium_, dir_); }
  Text ReadFile(const char *name, uint64_t *out_size = nullptr) {
    return Text(Guess_ReadFile(medium_, dir_, name, out_size));
  }

 private:
  GuessMedium *medium_;
  GuessDir *dir_;
};

// ---- Result fields ----

// CopyField copies `src` into a fixed-width text field of GuessResult,
// cutting and terminating within the field's width. A null `src` empties it.
template <size_t N>
inline void CopyField(char (&field)[N], std::string_view src) {
  size_t n = src.size() < N - 1 ? src.size() : N - 1;
  std::memmove(field, src.data(), n);
  field[n] = '\0';
}
template <size_t N>
inline void CopyField(char (&field)[N], const char *src) {
  CopyField(field, std::string_view(src != nullptr ? src : ""));
}

// Recognised writes the two fields every recogniser sets on success and
// returns TRUE, so a recogniser can end with `return Recognised(...)`.
inline Bool Recognised(GuessResult *result, const char *guestOS, uint32_t version) {
  result->guestOS = guestOS;
  result->version = version;
  return TRUE;
}

// NotRecognised is what a recogniser returns when the medium is not its own:
// whether an earlier recogniser (or the host) already filled the result.
inline Bool NotRecognised(const GuessResult *result) {
  return result->guestOS != nullptr ? TRUE : FALSE;
}

// ---- Text tests (case counts unless the name says otherwise) ----

inline bool Contains(const char *text, const char *needle) {
  return text != nullptr && std::strstr(text, needle) != nullptr;
}
inline bool StartsWith(std::string_view text, std::string_view prefix) {
  return text.substr(0, prefix.size()) == prefix;
}
inline bool ContainsView(std::string_view text, std::string_view needle) {
  return text.find(needle) != std::string_view::npos;
}

// Lines walks a NUL-terminated text line by line: each line is the text up to
// (not including) the next "\n" or the end. A "\r" before the "\n" stays in
// the line (StripCr removes it); empty lines are returned; a final "\n" does
// not start another line.
//
//   for (std::string_view line : Lines(text)) ...
class Lines {
 public:
  explicit Lines(const char *text) : text_(text != nullptr ? text : "") {}

  class iterator {
   public:
    explicit iterator(const char *pos) : pos_(pos) { Measure(); }
    std::string_view operator*() const { return std::string_view(pos_, len_); }
    iterator &operator++() {
      pos_ += len_;
      if (*pos_ == '\n') ++pos_;
      Measure();
      return *this;
    }
    bool operator!=(const iterator &other) const { return pos_ != other.pos_; }

   private:
    void Measure() {
      const char *nl = std::strchr(pos_, '\n');
      len_ = nl != nullptr ? static_cast<size_t>(nl - pos_) : std::strlen(pos_);
    }
    const char *pos_;
    size_t len_ = 0;
  };

  iterator begin() const { return iterator(text_); }
  iterator end() const { return iterator(text_ + std::strlen(text_)); }

 private:
  const char *text_;
};

inline std::string_view StripCr(std::string_view line) {
  if (!line.empty() && line.back() == '\r') line.remove_suffix(1);
  return line;
}

// ---- The medium outside Guess_Guest ----

// OpenMedium opens the image at `path` the way Guess_Guest does (UDF first,
// else ISO 9660 with the formats the image lists) and fills `medium`; FALSE
// when it opens as neither (the medium is then of kind 0). Tests and tools
// use it to run single recognisers and medium-access calls.
Bool OpenMedium(const char *path, GuessMedium *medium);
// CloseMedium closes the reader handle and frees the path; harmless on a
// medium of kind 0.
void CloseMedium(GuessMedium *medium);

}  // namespace tvx::guess

namespace tvx::guess {

// DirExists opens and closes a directory of the medium (with its case
// variants, as Guess_OpenDir tries them).
inline bool DirExists(GuessMedium *medium, const char *path) {
  return static_cast<bool>(Dir(medium, path));
}

}  // namespace tvx::guess
