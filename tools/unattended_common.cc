#include "unattended_common.h"

#include <strings.h>

#include <cstdio>
#include <cstring>

namespace tvxcli {

int RecogniseImage(const char *cmd, const std::string &image, GuessResult *out) {
  std::memset(out, 0, sizeof *out);
  int result = Guess_Guest(image.c_str(), nullptr, out);
  if (result == 2) {
    std::fprintf(stderr, "tvxguest %s: cannot open '%s' as an install image\n", cmd,
                 image.c_str());
  }
  return result;
}

const char *GuestFamily(const GuessResult &guess) {
  const char *os = guess.guestOS;
  if (os != nullptr && (strncasecmp(os, "win", 3) == 0 || strncasecmp(os, "longhorn", 8) == 0)) {
    return "windows";
  }
  return "linux";
}

std::string GuestLabel(const GuessResult &guess) {
  if (guess.guestOS == nullptr) return "not recognised";
  std::string label = guess.guestOS;
  if (guess.version != GUESS_VERSION_UNKNOWN && guess.version < GUESS_VERSION_DUMMY_LAST) {
    label += std::string(" (") + Guess_GetSubString(static_cast<GuessVersion>(guess.version)) + ")";
  }
  return label;
}

}  // namespace tvxcli
