// Shared by the `unattended` subcommands: recognising the image and naming
// the answer-limit family of a guest.
#pragma once

#include <string>

#include "tvx_guess.h"

namespace tvxcli {

inline constexpr const char *kUnattendedGroup = "unattended";

// RecogniseImage runs Guess_Guest on `image` and returns its result: 0
// recognised, 1 opened but not recognised, 2 not an image (an error line for
// `cmd` is printed on standard error then).
int RecogniseImage(const char *cmd, const std::string &image, GuessResult *out);

// GuestFamily gives "windows" for Windows guest identifiers and "linux" for
// every other, as the host picks the family of its answer limits.
const char *GuestFamily(const GuessResult &guess);

// GuestLabel: "centos7-64 (GUESS_VERSION_CENTOS_7)", or "not recognised".
std::string GuestLabel(const GuessResult &guess);

}  // namespace tvxcli
