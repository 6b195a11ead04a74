// Mac OS X install media. Not part of Guess_Guest's sequence: hosts that
// offer Mac OS X guests probe their media with it themselves.
#include "lib/guessGuest/guess_internal.h"
#include "tvx_guess.h"

namespace {

struct MacProbe {
  const char *dir;
  const char *entry;
  const char *guestOS;
  const char *override;
};

// The Lion installer names its release; older discs are told apart by
// where they keep the Boot Camp guide.
constexpr MacProbe kMacProbes[] = {
    {"/", "Install Mac OS X Lion.app", "darwin11", "darwin11-64"},
    {"/", "Boot Camp Installation & Setup Guide.pdf", "darwin", "darwin-64"},
    {"/Boot Camp/Documentation", "Boot Camp Installation & Setup Guide.pdf", "darwin10",
     "darwin10-64"},
};

}  // namespace

extern "C" TVX_EXPORT Bool Guess_MacOS(GuessMedium *medium, GuessResult *result) {
  for (const MacProbe &probe : kMacProbes) {
    if (!Guess_FileExists(medium, probe.dir, probe.entry)) continue;
    result->guestOS = probe.guestOS;
    result->guestOSOverride = probe.override;
    result->version = GUESS_VERSION_UNKNOWN;
    return TRUE;
  }
  return FALSE;
}
