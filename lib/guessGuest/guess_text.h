// Text tests shared by the recognisers.
//
// Marker files come from Guess_ReadFile as NUL-terminated buffers of any
// content. Every helper here treats them as C texts: it stops at the first
// NUL, never reads past it, and never trusts a length stored in the data.
#pragma once

#include <strings.h>

#include <cstdlib>
#include <cstring>
#include <memory>
#include <string_view>

#include "tvx_guess.h"

namespace tvxguess {

struct FreeDeleter {
  void operator()(void *p) const noexcept { std::free(p); }
};
// A malloc'd text: Guess_ReadFile buffers, StrUtil_GetNextToken tokens,
// Iso9660_GetVolumeId identifiers.
using UniqueText = std::unique_ptr<char, FreeDeleter>;

// Contains is a case-sensitive substring test anywhere in `text`.
inline bool Contains(const char *text, const char *needle) {
  return std::strstr(text, needle) != nullptr;
}

// BeginsWith compares the whole literal `prefix`, case counting.
inline bool BeginsWith(const char *text, const char *prefix) {
  return std::strncmp(text, prefix, std::strlen(prefix)) == 0;
}

// BeginsWithCaseless ignores ASCII letter case over the literal's length.
inline bool BeginsWithCaseless(const char *text, const char *prefix) {
  return strncasecmp(text, prefix, std::strlen(prefix)) == 0;
}

// ForEachLine calls fn(line) for every line of `text` that is not empty,
// without its line feed; runs of line feeds count as one, the way a
// "\n"-delimited token walk sees them. A carriage return stays in the line.
// The walk stops early when fn returns false.
template <typename Fn>
void ForEachLine(std::string_view text, Fn &&fn) {
  while (!text.empty()) {
    size_t end = text.find('\n');
    std::string_view line = text.substr(0, end);
    if (!line.empty() && !fn(line)) return;
    if (end == std::string_view::npos) return;
    text.remove_prefix(end + 1);
  }
}

// NotRecognised is the common exit of a recogniser that leaves the result
// alone: a result filled by an earlier recogniser still counts as recognised.
inline Bool NotRecognised(const GuessResult *result) {
  return result->guestOS != nullptr ? TRUE : FALSE;
}

// DirExists opens and closes a directory of the medium.
inline bool DirExists(GuessMedium *medium, const char *path) {
  GuessDir *dir = Guess_OpenDir(medium, path);
  if (dir == nullptr) return false;
  Guess_CloseDir(medium, dir);
  return true;
}

}  // namespace tvxguess
