// Mandrake and Mandriva install media.
//
// Three generations, three places to look:
//   "VERSION" at the root    Mandrake and Mandriva up to 2006
//                            ("Mandriva Linux 2006.0 (Official) for x86_64")
//   the volume identifier    2008.1 and later ("Mandriva.2010.0 i586")
//   "<arch>/product.id"      2007 and later, comma-separated key=value pairs
//                            ("vendor=Mandriva,...,version=2008.0,...,arch=i586")
#include <cstdint>
#include <cstring>

#include "lib/guessGuest/guess_internal.h"
#include "platform/str.h"
#include "platform/util.h"
#include "tvx_guess.h"
#include "tvx_iso9660.h"

namespace {

using tvx::guess::StartsWith;
using tvx::guess::Contains;
using tvx::guess::Text;

const char *ByArchitecture(const char *text) {
  if (Contains(text, "x86_64")) return "mandriva-64";
  if (Contains(text, "i586")) return "mandriva";
  return nullptr;
}

Bool FromVersionFile(const char *text, GuessResult *result) {
  // Media of this generation are taken to boot with isolinux, unprobed.
  result->noIsolinuxConfig = FALSE;
  if (StartsWith(text, "Mandrake")) {
    result->guestOS = "mandrake";
    result->version = GUESS_VERSION_UNKNOWN;
    return TRUE;
  }
  if (!StartsWith(text, "Mandriva")) return tvx::guess::NotRecognised(result);

  const char *id = ByArchitecture(text);
  if (Contains(text, " 2006.")) {
    tvx::guess::CopyField(result->versionText, "2006");
    result->version = GUESS_VERSION_MANDRIVA_2006;
  } else {
    result->version = GUESS_VERSION_UNKNOWN;
  }
  if (id == nullptr) return tvx::guess::NotRecognised(result);
  result->guestOS = id;
  return TRUE;
}

bool HasIsolinuxConfig(GuessMedium *medium) {
  for (const char *dir : {"isolinux", "i586/isolinux", "x86_64/isolinux"}) {
    if (Guess_FileExists(medium, dir, "isolinux.cfg")) return true;
  }
  return false;
}

// The volume identifier of 2008.1 and later media is "Mandriva.<release>
// <arch>"; a release of 201x with a dot after the year, such as 2010.0, is
// 2008.1 or newer. Returns true when the identifier alone settles the class
// and the identifier.
bool FromVolumeId(GuessMedium *medium, const char **id, uint32_t *version) {
  if (medium->kind != GUESS_MEDIUM_ISO9660 || medium->isoImage == nullptr) return false;
  Text volumeId(Iso9660_GetVolumeId(medium->isoImage));
  if (!volumeId || !StartsWith(volumeId.get(), "Mandriva.")) return false;
  const char *release = volumeId.get() + std::strlen("Mandriva.");
  *id = ByArchitecture(release);
  if (StartsWith(release, "201") && std::strlen(volumeId.get()) > 13 && volumeId.get()[13] == '.') {
    *version = GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER;
    return *id != nullptr;
  }
  return false;
}

void FromProductId(const char *text, GuessResult *result, const char **id, uint32_t *version) {
  if (!StartsWith(text, "vendor=Mandriva")) return;
  const char *arch = std::strstr(text, "arch=");
  if (arch == nullptr) return;
  arch += std::strlen("arch=");
  if (StartsWith(arch, "x86_6")) {
    *id = "mandriva-64";
  } else if (StartsWith(arch, "i586")) {
    *id = "mandriva";
  }

  const char *field = std::strstr(text, "version=");
  if (field == nullptr) return;
  unsigned int index = static_cast<unsigned int>(std::strlen("version="));
  Text word(StrUtil_GetNextToken(&index, field, " ,\n"));
  if (!word) return;
  const char *v = word.get();
  tvx::guess::CopyField(result->versionText, v);
  if (StartsWith(v, "2007.")) {
    *version = GUESS_VERSION_MANDRIVA_2007;
  } else if (StartsWith(v, "2008.0")) {
    *version = GUESS_VERSION_MANDRIVA_2008_0;
  } else if (Util_CompareDotted(v, "2008.1") >= 0) {
    *version = GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER;
  }
}

Bool WithoutVersionFile(GuessMedium *medium, GuessResult *result) {
  Bool noIsolinux = HasIsolinuxConfig(medium) ? FALSE : TRUE;
  const char *id = nullptr;
  uint32_t version = GUESS_VERSION_UNKNOWN;
  if (!FromVolumeId(medium, &id, &version)) {
    Text productId = tvx::guess::ReadText(medium, "i586/product.id");
    if (!productId) productId = tvx::guess::ReadText(medium, "x86_64/product.id");
    if (productId) FromProductId(productId.get(), result, &id, &version);
  }
  if (id == nullptr) return tvx::guess::NotRecognised(result);
  result->guestOS = id;
  result->version = version;
  result->noIsolinuxConfig = noIsolinux;
  return TRUE;
}

}  // namespace

extern "C" TVX_EXPORT Bool Guess_Mandriva(GuessMedium *medium, GuessResult *result) {
  Text versionFile = tvx::guess::ReadText(medium, "VERSION");
  if (versionFile) return FromVersionFile(versionFile.get(), result);
  return WithoutVersionFile(medium, result);
}
