#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "guessGuest/media_table.h"

namespace {

using tvx::guess::CopyField;
using tvx::guess::Text;

bool IsCleared(const GuessResult &r) {
  GuessResult zero;
  std::memset(&zero, 0, sizeof zero);
  return std::memcmp(&r, &zero, sizeof r) == 0;
}

TEST(GuessGuest, ImagesThatDoNotOpenGiveTwoAndAClearedResult) {
  tvxtest::TempDir tmp;
  tvxtest::WriteFileOrDie(tmp.Join("garbage.iso"), std::string(300 * 1024, 'G'));
  tvxtest::WriteFileOrDie(tmp.Join("empty.iso"), "");
  const std::string paths[] = {tmp.Join("missing.iso"), tmp.Join("garbage.iso"),
                               tmp.Join("empty.iso"), tmp.Path()};
  for (const std::string &path : paths) {
    GuessResult r;
    std::memset(&r, 0x5A, sizeof r);
    EXPECT_EQ(Guess_Guest(path.c_str(), nullptr, &r), 2) << path;
    EXPECT_TRUE(IsCleared(r)) << path;
  }
}

GuessResult Sample() {
  GuessResult r{};
  r.guestOS = "ubuntu-64";
  r.version = GUESS_VERSION_UBUNTU_1504_TO_2004;
  CopyField(r.versionText, "18.04");
  CopyField(r.language, "en-US");
  CopyField(r.languageShort, "en-US");
  return r;
}

TEST(GuessIsEqual, ComparesIdentityFieldsOnly) {
  struct Case {
    const char *what;
    void (*change)(GuessResult *);
    bool equal;
  };
  const Case cases[] = {
      {"nothing", [](GuessResult *) {}, true},
      {"displayName", [](GuessResult *r) { CopyField(r->displayName, "Ubuntu"); }, true},
      {"languageShort", [](GuessResult *r) { CopyField(r->languageShort, "de"); }, true},
      {"noIsolinuxConfig", [](GuessResult *r) { r->noIsolinuxConfig = TRUE; }, false},
      {"guestOS text", [](GuessResult *r) { r->guestOS = "ubuntu"; }, false},
      {"guestOS null", [](GuessResult *r) { r->guestOS = nullptr; }, false},
      {"override", [](GuessResult *r) { r->guestOSOverride = "ubuntu-64"; }, false},
      {"version", [](GuessResult *r) { r->version = GUESS_VERSION_UBUNTU_1404; }, false},
      {"versionText", [](GuessResult *r) { CopyField(r->versionText, "20.04"); }, false},
      {"language empty", [](GuessResult *r) { CopyField(r->language, ""); }, false},
      {"languages", [](GuessResult *r) { CopyField(r->languages, "en-US?"); }, false},
      {"editions", [](GuessResult *r) { CopyField(r->editions, "Pro?"); }, false},
  };
  for (const Case &c : cases) {
    GuessResult a = Sample();
    GuessResult b = Sample();
    // Identifier texts are compared as texts, not as pointers.
    std::string copy = a.guestOS;
    b.guestOS = copy.c_str();
    c.change(&b);
    EXPECT_EQ(Guess_IsEqual(&a, &b), c.equal ? TRUE : FALSE) << c.what;
    EXPECT_EQ(Guess_IsEqual(&b, &a), c.equal ? TRUE : FALSE) << c.what;
  }
  GuessResult none1{}, none2{};
  EXPECT_TRUE(Guess_IsEqual(&none1, &none2));
}

TEST(GuessGetVersionString, BuildsDisplayText) {
  struct Case {
    uint32_t version;
    const char *versionText;
    const char *displayName;
    const char *expected;
  };
  const Case cases[] = {
      {GUESS_VERSION_MANDRIVA_2006, "2006", "Windows 8.1", "Windows 8.1"},
      {GUESS_VERSION_MANDRIVA_2006, "2006", "", "Host Name 2006"},
      {GUESS_VERSION_UBUNTU_SERVER_1404, "", "", "Host Name"},
      {GUESS_VERSION_UBUNTU_SERVER_1410, "", "", "Host Name Server"},
      {GUESS_VERSION_UBUNTU_SERVER_1504_OR_HIGHER, "Server 16.04", "", "Host Name Server 16.04"},
      {GUESS_VERSION_SLED_10_SP2_OR_LOWER, "", "", "Host Name Desktop"},
  };
  for (const Case &c : cases) {
    GuessResult r{};
    r.version = c.version;
    CopyField(r.versionText, c.versionText);
    CopyField(r.displayName, c.displayName);
    Text text(Guess_GetVersionString("Host Name", &r));
    ASSERT_NE(text, nullptr);
    EXPECT_STREQ(text.get(), c.expected) << "version " << c.version;
  }
}

}  // namespace

// Recognisers called by themselves on a result that another recogniser has
// already filled, as hosts may do: what each one returns and what it writes
// when it does not recognise the medium.
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
void EnUs(GuessResult *r) {
  std::strcpy(r->language, "en-US");
  std::strcpy(r->languageShort, "en-US");
}

TEST(GuessRecogniserExits, FilledResultIsKeptOrNamedFieldsWritten) {
  const ExitRow rows[] = {
      {"Debian", Guess_Debian, "suse/sles10sp2", true, nullptr},
      {"SUSE", Guess_SUSE, "suse/unknown", true, nullptr},
      {"Mandriva", Guess_Mandriva, "mandriva/other", true,
       [](GuessResult *r) { r->noIsolinuxConfig = FALSE; }},
      {"Mandriva", Guess_Mandriva, "mandriva/pid-ppc", true,
       [](GuessResult *r) { std::strcpy(r->versionText, "2008.0"); }},
      {"TurboLinux", Guess_TurboLinux, "mandriva/turbo-caps", true, nullptr},
      {"Solaris", Guess_Solaris, "solaris/sol-none", false, nullptr},
      {"NetWare", Guess_NetWare, "netware/nw-none", true, nullptr},
      {"FreeBSD", Guess_FreeBSD, "freebsd/fbsd-arm32", false, VersionZero},
      {"Orka", Guess_Orka, "orka/orka35", true, nullptr},
      {"Orkai", Guess_Orkai, "debian/deb4-i386", false, nullptr},
      {"Orkai", Guess_Orkai, "orka/orkai80", true, VersionZero},
      {"Lumen", Guess_Lumen, "mandriva/lumen-both", true,
       [](GuessResult *r) {
         r->version = GUESS_VERSION_UNKNOWN;
         r->noIsolinuxConfig = FALSE;
       }},
      {"MacOS", Guess_MacOS, "macos/none", false, nullptr},
      {"RedHat", Guess_RedHat, "redhat/ppc64", true, nullptr},
      {"WindowsNT", Guess_WindowsNT, "windows-legacy/win95", true, nullptr},
      {"WindowsLegacy", Guess_WindowsLegacy, "windows-legacy/winxppro", true, nullptr},
      // The default language is written whatever the medium.
      {"WindowsVista", Guess_WindowsVistaAndNewer, "windows/lang-missing", true, EnUs},
      {"WindowsVista", Guess_WindowsVistaAndNewer, "windows/winmain-client", true, EnUs},
      // Display name and editions are written before the missing BuildArch shows.
      {"WindowsVista", Guess_WindowsVistaAndNewer, "windows/win81-no-arch", true,
       [](GuessResult *r) {
         EnUs(r);
         std::strcpy(r->displayName, "Windows 8.1");
         std::strcpy(r->editions, "Windows 8.1 Pro?Windows 8.1?");
       }},
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
      {Guess_MacOS, "macos/bootcamp-root", "darwin", "darwin-64"},
      {Guess_MacOS, "macos/bootcamp-docs", "darwin10", "darwin10-64"},
      {Guess_FreeBSD, "freebsd/fbsd13-64", "freeBSD13-64", "other-64"},
      {Guess_WindowsVistaAndNewer, "windows/server2019", "windows2019srv-64", "other-64"},
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
