// TurboLinux and Lumen install media: each is known by one marker at the
// root of the medium.
#include "lib/guessGuest/guess_internal.h"
#include "tvx_guess.h"

extern "C" TVX_EXPORT Bool Guess_TurboLinux(GuessMedium *medium, GuessResult *result) {
  tvx::guess::Text readme = tvx::guess::ReadText(medium, "README");
  // The vendor spells its name "Turbolinux" on the first line of README;
  // other spellings belong to other media.
  if (!readme || !tvx::guess::StartsWith(readme.get(), "Turbolinux")) {
    return tvx::guess::NotRecognised(result);
  }
  result->guestOS = "turbolinux";
  result->version = GUESS_VERSION_UNKNOWN;
  return TRUE;
}

// Lumen media carry a "LUMEN_TARVEX_CD" at the root and their
// packages below "RPMS/<arch>". A medium with packages of both
// architectures is ambiguous and names no identifier.
extern "C" TVX_EXPORT Bool Guess_Lumen(GuessMedium *medium, GuessResult *result) {
  if (!Guess_FileExists(medium, "", "LUMEN_TARVEX_CD")) return tvx::guess::NotRecognised(result);
  bool x86_64 = tvx::guess::DirExists(medium, "RPMS/x86_64");
  bool aarch64 = tvx::guess::DirExists(medium, "RPMS/aarch64");
  if (x86_64 && !aarch64) {
    result->guestOS = "tarvex-lumen-64";
  } else if (aarch64 && !x86_64) {
    result->guestOS = "arm-tarvex-lumen-64";
  }
  result->version = GUESS_VERSION_UNKNOWN;
  result->noIsolinuxConfig = FALSE;
  return result->guestOS != nullptr ? TRUE : FALSE;
}
