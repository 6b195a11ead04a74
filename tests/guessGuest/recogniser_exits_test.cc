// Recognisers called by themselves on a result that another recogniser has
// already filled, as hosts may do: what each one returns and what it writes
// when it does not recognise the medium.
#include "guessGuest/media_table.h"

namespace {

using Recogniser = Bool (*)(GuessMedium *, GuessResult *);

struct ExitRow {
  const char *recogniser;
  Recogniser call;
  const char *image;
  bool returns;
  void (*writes)(GuessResult *);  // applied to the filled result; null: untouched
};

GuessResult Filled() {
  GuessResult r;
  std::memset(&r, 0, sizeof r);
  r.guestOS = "winXPPro";
  r.guestOSOverride = "other-64";
  r.version = GUESS_VERSION_CENTOS_7;
  r.noIsolinuxConfig = TRUE;
  std::strcpy(r.versionText, "keep");
  std::strcpy(r.language, "de-DE");
  return r;
}

void ExpectSame(const GuessResult &got, const GuessResult &want) {
  EXPECT_STREQ(got.guestOS, want.guestOS);
  EXPECT_STREQ(got.guestOSOverride, want.guestOSOverride);
  EXPECT_EQ(got.version, want.version);
  EXPECT_EQ(got.noIsolinuxConfig, want.noIsolinuxConfig);
  EXPECT_STREQ(got.versionText, want.versionText);
  EXPECT_EQ(0, std::memcmp(&got, &want, sizeof got)) << "some other field changed";
}

void VersionZero(GuessResult *r) { r->version = GUESS_VERSION_UNKNOWN; }

TEST(GuessRecogniserExits, FilledResultIsKeptOrNamedFieldsWritten) {
  const ExitRow rows[] = {
      {"Debian", Guess_Debian, "suse/sles10sp2", true, nullptr},
      {"Debian", Guess_Debian, "debian/deb12-amd64", true, nullptr},
      {"SUSE", Guess_SUSE, "debian/deb4-i386", true, nullptr},
      {"SUSE", Guess_SUSE, "suse/unknown", true, nullptr},
      {"Mandriva", Guess_Mandriva, "debian/deb4-i386", true, nullptr},
      {"Mandriva", Guess_Mandriva, "mandriva/other", true,
       [](GuessResult *r) { r->noIsolinuxConfig = FALSE; }},
      {"Mandriva", Guess_Mandriva, "mandriva/pid-ppc", true,
       [](GuessResult *r) { std::strcpy(r->versionText, "2008.0"); }},
      {"TurboLinux", Guess_TurboLinux, "mandriva/turbo-caps", true, nullptr},
      {"Solaris", Guess_Solaris, "solaris/sol-none", false, nullptr},
      {"Solaris", Guess_Solaris, "solaris/sol11-other", false, nullptr},
      {"NetWare", Guess_NetWare, "netware/nw-none", true, nullptr},
      {"FreeBSD", Guess_FreeBSD, "debian/deb4-i386", false, nullptr},
      {"FreeBSD", Guess_FreeBSD, "freebsd/fbsd-arm32", false, VersionZero},
      {"Orka", Guess_Orka, "orka/orka35", true, nullptr},
      {"Orka", Guess_Orka, "orka/orka-truncated", true, nullptr},
      {"Orkai", Guess_Orkai, "debian/deb4-i386", false, nullptr},
      {"Orkai", Guess_Orkai, "orka/orkai80", true, VersionZero},
      {"Lumen", Guess_Lumen, "debian/deb4-i386", true, nullptr},
      {"Lumen", Guess_Lumen, "mandriva/lumen-both", true,
       [](GuessResult *r) {
         r->version = GUESS_VERSION_UNKNOWN;
         r->noIsolinuxConfig = FALSE;
       }},
      {"MacOS", Guess_MacOS, "macos/none", false, nullptr},
  };
  for (const ExitRow &row : rows) {
    SCOPED_TRACE(std::string(row.recogniser) + " on " + row.image);
    tvxtest::OpenedMedium medium(row.image);
    ASSERT_TRUE(medium.ok());
    GuessResult got = Filled();
    GuessResult want = Filled();
    if (row.writes != nullptr) row.writes(&want);
    EXPECT_EQ(row.call(medium.get(), &got) != 0, row.returns);
    ExpectSame(got, want);
  }
}

// A recogniser that recognises writes its identifier over an earlier one;
// only the Solaris and Mac OS X recognisers touch the override.
TEST(GuessRecogniserExits, RecognitionOverwritesAFilledResult) {
  struct Row {
    Recogniser call;
    const char *image;
    const char *guestOS;
    const char *override;
  } const rows[] = {
      {Guess_Solaris, "solaris/sol9", "solaris9", nullptr},
      {Guess_Solaris, "solaris/sol10", "solaris10", "solaris10-64"},
      {Guess_MacOS, "macos/lion", "darwin11", "darwin11-64"},
      {Guess_MacOS, "macos/lion-udf", "darwin11", "darwin11-64"},
      {Guess_MacOS, "macos/lion-file", "darwin11", "darwin11-64"},
      {Guess_MacOS, "macos/bootcamp-root", "darwin", "darwin-64"},
      {Guess_MacOS, "macos/bootcamp-docs", "darwin10", "darwin10-64"},
      {Guess_FreeBSD, "freebsd/fbsd13-64", "freeBSD13-64", "other-64"},
      {Guess_NetWare, "netware/nw65", "netware6", "other-64"},
  };
  for (const Row &row : rows) {
    SCOPED_TRACE(row.image);
    tvxtest::OpenedMedium medium(row.image);
    ASSERT_TRUE(medium.ok());
    GuessResult r = Filled();
    EXPECT_TRUE(row.call(medium.get(), &r));
    EXPECT_STREQ(r.guestOS, row.guestOS);
    EXPECT_STREQ(r.guestOSOverride, row.override);
    EXPECT_EQ(r.version, static_cast<uint32_t>(GUESS_VERSION_UNKNOWN));
    EXPECT_STREQ(r.versionText, "keep");
  }
}

// Guess_Guest never runs the Mac OS X recogniser.
TEST(GuessRecogniserExits, MacMediaAreNotInTheSequence) {
  tvxtest::ExpectGuess({"macos/lion", nullptr});
}

}  // namespace
