#include "guessGuest/media_table.h"

namespace {

using tvxtest::ExpectGuess;
using tvxtest::GuessRow;

TEST(GuessFreeBSDNetWare, MasteredMedia) {
  const GuessRow rows[] = {
      // FreeBSD: the kernel's machine and the release.
      {"freebsd/fbsd13-64", "freeBSD13-64"},
      {"freebsd/fbsd13-32", "freeBSD13"},
      {"freebsd/fbsd13-arm", "arm-freeBSD13-64"},
      // No 32-bit identifier for 14: the generic one stays.
      {"freebsd/fbsd14-32", "freeBSD"},
      {"freebsd/fbsd14-arm", "arm-freeBSD14-64"},
      {"freebsd/fbsd-nonotes", "freeBSD-64"},
      {"freebsd/fbsd14-line2", "freeBSD-64"},
      {"freebsd/fbsd4-old", "freeBSD"},
      // Plain ISO 9660 shows the kernel as "KERNEL.".
      {"freebsd/fbsd13-plain", "freeBSD13-64"},
      // FreeBSD: unusable kernels.
      {"freebsd/fbsd-arm32", nullptr},
      {"freebsd/fbsd-notes-only", nullptr},
      // NetWare: the first listed release directory.
      {"netware/nw65", "netware6"},
      {"netware/nw6-upper", "netware6"},
      {"netware/nw51-first", "netware5"},
      {"netware/nw-none", nullptr},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

}  // namespace
