// Runs rows of expected recognition results through Guess_Guest on the
// mastered test media, and opens a medium for calling one recogniser by
// itself.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>

#include "lib/guessGuest/guess_internal.h"
#include "platform/guestos.h"
#include "support/log_capture.h"
#include "tvx_guess.h"

namespace tvxtest {

// One mastered image and what Guess_Guest must make of it. A null guestOS
// means "not recognised" (result 1); versionText may still be expected then.
constexpr bool kNoIso = true;  // GuessRow::noIsolinux
constexpr bool kIso = false;
struct GuessRow {
  const char *image;  // below $TVX_MEDIA_DIR, without ".iso"
  const char *guestOS;
  uint32_t version = GUESS_VERSION_UNKNOWN;
  bool noIsolinux = false;
  const char *versionText = "";
  const char *override = nullptr;
};

// The language and Windows fields. The defaults are what every medium gets
// that no Windows recogniser knows: the fourth recogniser writes the default
// language into any result it does not recognise.
struct GuessExtras {
  const char *language = "en-US";
  const char *languageShort = nullptr;  // null: `language` cut to its field
  const char *languages = "";
  const char *editions = "";  // the whole list, or only its first name (editionCount)
  const char *displayName = "";
  // Most edition lists are fixed texts of the recogniser; what can go wrong is
  // the choice of list, which its first name and its length tell apart.
  int editionCount = -1;  // -1: `editions` is the whole list
};

inline std::string MediaPath(const std::string &image) { return MediaDir() + "/" + image + ".iso"; }

inline void ExpectGuess(const GuessRow &row, const GuessExtras &x = {}) {
  SCOPED_TRACE(row.image);
  GuessResult r;
  std::memset(&r, 0x5a, sizeof r);  // Guess_Guest clears it first
  int rc = Guess_Guest(MediaPath(row.image).c_str(), nullptr, &r);
  ASSERT_NE(rc, 2) << "the image did not open";
  EXPECT_EQ(rc, row.guestOS != nullptr ? 0 : 1);
  EXPECT_STREQ(r.guestOS, row.guestOS);
  if (r.guestOS != nullptr) {
    EXPECT_NE(GuestOS_GetOSIDByName(r.guestOS), GUESTOS_ID_UNKNOWN) << "not in the guest table";
  }
  EXPECT_STREQ(r.guestOSOverride, row.override);
  EXPECT_EQ(r.version, row.version) << Guess_GetSubString(static_cast<GuessVersion>(r.version));
  EXPECT_EQ(r.noIsolinuxConfig != 0, row.noIsolinux);
  EXPECT_STREQ(r.versionText, row.versionText);
  EXPECT_STREQ(r.language, x.language);
  EXPECT_EQ(std::string(r.languageShort),
            x.languageShort != nullptr ? x.languageShort : std::string(x.language).substr(0, 31));
  EXPECT_STREQ(r.languages, x.languages);
  if (x.editionCount < 0) {
    EXPECT_STREQ(r.editions, x.editions);
  } else {
    std::string_view list(r.editions);
    EXPECT_EQ(list.substr(0, list.find('?')), x.editions);
    EXPECT_EQ(std::count(list.begin(), list.end(), '?'), x.editionCount) << list;
  }
  EXPECT_STREQ(r.displayName, x.displayName);
}

// ExpectGuesses runs rows of one family directory ("redhat": images below
// $TVX_MEDIA_DIR/redhat).
template <size_t N>
void ExpectGuesses(const std::string &family, const GuessRow (&rows)[N]) {
  for (GuessRow row : rows) {
    std::string image = family + "/" + row.image;
    row.image = image.c_str();
    ExpectGuess(row);
  }
}

// An image opened the way Guess_Guest opens it, for calling one recogniser
// directly.
class OpenedMedium {
 public:
  explicit OpenedMedium(const std::string &image) {
    ok_ = tvx::guess::OpenMedium(MediaPath(image).c_str(), &medium_) != 0;
  }
  ~OpenedMedium() { tvx::guess::CloseMedium(&medium_); }
  OpenedMedium(const OpenedMedium &) = delete;
  OpenedMedium &operator=(const OpenedMedium &) = delete;

  bool ok() const { return ok_; }
  GuessMedium *get() { return &medium_; }

 private:
  GuessMedium medium_{};
  bool ok_ = false;
};

}  // namespace tvxtest
