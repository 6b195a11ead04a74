#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "lib/guessGuest/guess_internal.h"
#include "support/log_capture.h"

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

TEST(GuessGuest, UnknownMediumGivesOne) {
  GuessResult r;
  std::string path = tvxtest::MediaDir() + "/guess-medium/rr.iso";
  EXPECT_EQ(Guess_Guest(path.c_str(), nullptr, &r), 1);
  EXPECT_EQ(r.guestOS, nullptr);
  EXPECT_EQ(r.version, 0u);
}

TEST(GuessGuest, RepeatedCallsGiveEqualResults) {
  std::string path = tvxtest::MediaDir() + "/windows-legacy/winxppro.iso";
  GuessResult a, b;
  ASSERT_EQ(Guess_Guest(path.c_str(), nullptr, &a), 0);
  ASSERT_EQ(Guess_Guest(path.c_str(), nullptr, &b), 0);
  EXPECT_TRUE(Guess_IsEqual(&a, &b));
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

TEST(GuessGetOsKey, PrefersOverride) {
  GuessResult r{};
  EXPECT_EQ(Guess_GetOsKey(&r), nullptr);
  r.guestOS = "solaris10";
  EXPECT_STREQ(Guess_GetOsKey(&r), "solaris10");
  r.guestOSOverride = "solaris10-64";
  EXPECT_STREQ(Guess_GetOsKey(&r), "solaris10-64");
}

TEST(GuessGetVersionString, BuildsDisplayText) {
  struct Case {
    uint32_t version;
    const char *versionText;
    const char *displayName;
    const char *expected;
  };
  const Case cases[] = {
      {GUESS_VERSION_WINDOWS_81_PLAIN, "", "Windows 8.1", "Windows 8.1"},
      {GUESS_VERSION_MANDRIVA_2006, "2006", "Windows 8.1", "Windows 8.1"},
      {GUESS_VERSION_MANDRIVA_2006, "2006", "", "Host Name 2006"},
      {GUESS_VERSION_UBUNTU_SERVER_1404, "", "", "Host Name"},
      {GUESS_VERSION_UBUNTU_SERVER_140402, "", "", "Host Name"},
      {GUESS_VERSION_UBUNTU_SERVER_1410, "", "", "Host Name Server"},
      {GUESS_VERSION_UBUNTU_SERVER_810_OR_HIGHER, "", "", "Host Name Server"},
      {GUESS_VERSION_UBUNTU_SERVER_1504_OR_HIGHER, "Server 16.04", "", "Host Name Server 16.04"},
      {GUESS_VERSION_SLED_10_SP2_OR_LOWER, "", "", "Host Name Desktop"},
      {GUESS_VERSION_SLED_ALL, "", "", "Host Name Desktop"},
      {GUESS_VERSION_UBUNTU_1404, "", "", "Host Name"},
      {GUESS_VERSION_UNKNOWN, "", "", "Host Name"},
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

TEST(GuessSubNames, NameEveryVersionInOrder) {
  EXPECT_STREQ(Guess_GetSubString(GUESS_VERSION_UNKNOWN), "GUESS_VERSION_UNKNOWN");
  EXPECT_STREQ(Guess_GetSubString(GUESS_VERSION_CENTOS_7), "GUESS_VERSION_CENTOS_7");
  EXPECT_STREQ(Guess_GetSubString(GUESS_VERSION_WINDOWS_10_ESD), "GUESS_VERSION_WINDOWS_10_ESD");
  EXPECT_STREQ(Guess_GetSubString(GUESS_VERSION_DUMMY_LAST), "GUESS_VERSION_DUMMY_LAST");
  for (int v = 0; v <= GUESS_VERSION_DUMMY_LAST; ++v) {
    ASSERT_NE(SUB_NAMES[v], nullptr) << v;
    EXPECT_EQ(std::strncmp(SUB_NAMES[v], "GUESS_VERSION_", 14), 0) << v;
  }
}

}  // namespace
