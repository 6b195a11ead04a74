// Debian and Ubuntu install media.
//
// Both families describe themselves in one line, ".disk/info", such as
//   Debian GNU/Linux 10.4.0 "Buster" - Official amd64 NETINST 20200509-10:25
//   Ubuntu-Server 14.04.2 LTS "Trusty Tahr" - Release amd64 (20150218.1)
// The leading words name the distribution and release, an architecture word
// somewhere in the line picks the 32-bit, 64-bit or Arm identifier. Ubuntu
// releases are further split into the version classes that the host's
// unattended installer keys its answer files on.
#include <cstdint>

#include "lib/guessGuest/guess_internal.h"
#include "platform/str.h"
#include "platform/util.h"
#include "tvx_guess.h"

namespace {

using tvx::guess::Contains;
using tvx::guess::NotRecognised;
using tvx::guess::StartsWith;
using tvx::guess::Text;

struct DebianRow {
  const char *prefix;
  const char *amd64;
  const char *i386;
  const char *arm64;
};

// Arm media before Debian 10 have no identifier of their own; the host
// installs them as Arm Ubuntu.
constexpr DebianRow kDebianRows[] = {
    {"Debian GNU/Linux 4.0", "debian4-64", "debian4", "arm-ubuntu-64"},
    {"Debian GNU/Linux 5.0", "debian5-64", "debian5", "arm-ubuntu-64"},
    {"Debian GNU/Linux 6.0", "debian6-64", "debian6", "arm-ubuntu-64"},
    {"Debian GNU/Linux 7.", "debian7-64", "debian7", "arm-ubuntu-64"},
    {"Debian GNU/Linux 8.", "debian8-64", "debian8", "arm-ubuntu-64"},
    {"Debian GNU/Linux 9.", "debian9-64", "debian9", "arm-ubuntu-64"},
    {"Debian GNU/Linux 10.", "debian10-64", "debian10", "arm-debian10-64"},
    {"Debian GNU/Linux 11.", "debian11-64", "debian11", "arm-debian11-64"},
};

// Kubuntu, Xubuntu and Edubuntu share Ubuntu's identifiers and classes;
// server images ("Ubuntu-Server ...") take the first row.
constexpr const char *kUbuntuPrefixes[] = {"Ubuntu", "Kubuntu", "Xubuntu", "Edubuntu"};

const char *ByArchitecture(const char *info, const char *amd64, const char *i386,
                           const char *arm64) {
  if (Contains(info, "amd64")) return amd64;
  if (Contains(info, "i386")) return i386;
  if (Contains(info, "arm64")) return arm64;
  return nullptr;
}

bool AtLeast(const char *v, const char *threshold) { return Util_CompareDotted(v, threshold) >= 0; }
bool Below(const char *v, const char *threshold) { return Util_CompareDotted(v, threshold) < 0; }
bool SameVersion(const char *v, const char *other) { return Util_CompareDotted(v, other) == 0; }
// Any 14.04 point release, however many components its version word has.
bool Is1404(const char *v) { return AtLeast(v, "14.04") && Below(v, "14.04.99"); }

uint32_t ServerClass(const char *v) {
  if (Is1404(v)) {
    return Below(v, "14.04.02") ? GUESS_VERSION_UBUNTU_SERVER_1404
                                : GUESS_VERSION_UBUNTU_SERVER_140402;
  }
  if (SameVersion(v, "14.10")) return GUESS_VERSION_UBUNTU_SERVER_1410;
  if (AtLeast(v, "15.04")) return GUESS_VERSION_UBUNTU_SERVER_1504_OR_HIGHER;
  if (Below(v, "8.10")) return GUESS_VERSION_UBUNTU_SERVER_804_OR_LOWER;
  return GUESS_VERSION_UBUNTU_SERVER_810_OR_HIGHER;
}

// Desktop media from 20.10 on boot without isolinux whatever the medium
// seems to hold, so the class also settles `noIsolinux`.
uint32_t DesktopClass(const char *v, Bool *noIsolinux) {
  if (Is1404(v)) return GUESS_VERSION_UBUNTU_1404;
  if (SameVersion(v, "14.10")) return GUESS_VERSION_UBUNTU_1410;
  if (AtLeast(v, "20.10")) {
    *noIsolinux = FALSE;
    return GUESS_VERSION_UBUNTU_2010_OR_HIGHER;
  }
  if (AtLeast(v, "15.04")) return GUESS_VERSION_UBUNTU_1504_TO_2004;
  if (AtLeast(v, "7.10")) return GUESS_VERSION_UBUNTU_710_OR_HIGHER;
  return GUESS_VERSION_UBUNTU_704_OR_LOWER;
}

Bool Recognised(GuessResult *result, const char *guestOS, uint32_t version, Bool noIsolinux) {
  result->noIsolinuxConfig = noIsolinux;
  return tvx::guess::Recognised(result, guestOS, version);
}

}  // namespace

extern "C" TVX_EXPORT Bool Guess_Debian(GuessMedium *medium, GuessResult *result) {
  Text info = tvx::guess::ReadText(medium, ".disk/info");
  if (!info) return NotRecognised(result);
  const char *text = info.get();
  Bool noIsolinux = Guess_FileExists(medium, "isolinux", "isolinux.cfg") ? FALSE : TRUE;

  for (const DebianRow &row : kDebianRows) {
    if (!StartsWith(text, row.prefix)) continue;
    const char *id = ByArchitecture(text, row.amd64, row.i386, row.arm64);
    if (id == nullptr) return NotRecognised(result);
    return Recognised(result, id, GUESS_VERSION_UNKNOWN, noIsolinux);
  }

  bool ubuntu = false;
  for (const char *prefix : kUbuntuPrefixes) ubuntu = ubuntu || StartsWith(text, prefix);
  if (!ubuntu) return NotRecognised(result);

  const char *id = ByArchitecture(text, "ubuntu-64", "ubuntu", "arm-ubuntu-64");
  uint32_t version = GUESS_VERSION_UBUNTU_704_OR_LOWER;
  unsigned int index = 0;
  Text first(StrUtil_GetNextToken(&index, text, " "));
  Text word(first ? StrUtil_GetNextToken(&index, text, " ") : nullptr);
  if (word) {
    const char *v = word.get();
    const char *prefix = "";
    if (Contains(text, "Ubuntu-Server")) {
      prefix = "Server ";
      version = ServerClass(v);
    } else {
      version = DesktopClass(v, &noIsolinux);
    }
    // Written before the architecture is known to be usable, so it stays
    // behind on a medium that ends up not recognised.
    Str_Snprintf(result->versionText, sizeof result->versionText, "%s%s", prefix, v);
  }
  if (id == nullptr) return NotRecognised(result);
  return Recognised(result, id, version, noIsolinux);
}
