// Solaris install media, known by the release directory at their root
// ("Solaris_10"); Solaris 11 media have none and describe themselves in
// ".image_info" instead.

#include "lib/guessGuest/guess_internal.h"
#include "tvx_guess.h"

namespace {

struct SolarisRow {
  const char *entry;
  const char *guestOS;
  const char *override;  // the 64-bit identifier hosts prefer, or null
};

constexpr SolarisRow kSolarisRows[] = {
    {"Solaris_2.7", "solaris7", nullptr},
    {"Solaris_8", "solaris8", nullptr},
    {"Solaris_9", "solaris9", nullptr},
    {"Solaris_10", "solaris10", "solaris10-64"},
};
constexpr SolarisRow kSolaris11 = {".image_info", "solaris11-64", nullptr};

const SolarisRow *RowOf(const char *name) {
  for (const SolarisRow &row : kSolarisRows) {
    if (tvx::ascii::Equal(name, row.entry)) return &row;
  }
  return nullptr;
}

enum class ImageInfo { kUnknown, kAbsent, kNamesSolaris11, kOther };

// Whether the root holds ".image_info" cannot change during one listing;
// asking once keeps a root of many entries from costing one scan each.
ImageInfo ProbeImageInfo(GuessMedium *medium) {
  if (!Guess_FileExists(medium, "", ".image_info")) return ImageInfo::kAbsent;
  tvx::guess::Text text = tvx::guess::ReadText(medium, ".image_info");
  return text && tvx::guess::Contains(text.get(), "Oracle Solaris 11") ? ImageInfo::kNamesSolaris11
                                                                     : ImageInfo::kOther;
}

// Entries in listing order: a release directory names its row; any other
// entry defers to ".image_info" when there is one.
const SolarisRow *Decide(GuessMedium *medium, tvx::guess::Dir *root) {
  ImageInfo info = ImageInfo::kUnknown;
  for (const char *name; (name = root->Next()) != nullptr;) {
    if (const SolarisRow *row = RowOf(name)) return row;
    if (info == ImageInfo::kUnknown) info = ProbeImageInfo(medium);
    if (info == ImageInfo::kNamesSolaris11) return &kSolaris11;
    if (info == ImageInfo::kOther) return nullptr;
  }
  return nullptr;
}

}  // namespace

extern "C" TVX_EXPORT Bool Guess_Solaris(GuessMedium *medium, GuessResult *result) {
  const SolarisRow *row = nullptr;
  {
    tvx::guess::Dir root(medium, "/");
    if (!root) return FALSE;
    row = Decide(medium, &root);
  }
  if (row == nullptr) return FALSE;
  result->guestOSOverride = row->override;
  return tvx::guess::Recognised(result, row->guestOS, GUESS_VERSION_UNKNOWN);
}
