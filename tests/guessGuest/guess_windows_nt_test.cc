#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "lib/guessGuest/guess_internal.h"
#include "support/log_capture.h"

namespace {

std::string Image(const std::string &name) {
  return tvxtest::MediaDir() + "/windows-legacy/" + name + ".iso";
}

struct MediumCase {
  const char *image;
  int code;
  const char *guestOS;  // null when not recognised
  const char *language;
};

void ExpectDetected(const MediumCase &c) {
  SCOPED_TRACE(c.image);
  GuessResult r;
  std::memset(&r, 0x5A, sizeof r);  // every field must be rewritten
  ASSERT_EQ(Guess_Guest(Image(c.image).c_str(), nullptr, &r), c.code);
  if (c.guestOS == nullptr) {
    EXPECT_EQ(r.guestOS, nullptr);
    return;
  }
  ASSERT_NE(r.guestOS, nullptr);
  EXPECT_STREQ(r.guestOS, c.guestOS);
  EXPECT_EQ(r.guestOSOverride, nullptr);
  EXPECT_EQ(r.version, GUESS_VERSION_UNKNOWN);
  EXPECT_FALSE(r.noIsolinuxConfig);
  EXPECT_STREQ(r.language, c.language);
  for (const char *field : {r.versionText, r.languageShort, r.languages, r.editions,
                            r.displayName}) {
    EXPECT_STREQ(field, "");
  }
}

// Text-mode setup media: the product name in TXTSETUP.SIF decides, the
// Localization of PRODSPEC.INI (I386, else AMD64) gives the language.
TEST(GuessWindowsNT, RecognisesSetupMediaEndToEnd) {
  const MediumCase cases[] = {
      {"win2000pro", 0, "win2000Pro", "English"},      // plain level-1 names
      {"win2000srv", 0, "win2000Serv", "French"},      // srv_id only
      {"win2000adv", 0, "win2000AdvServ", "English"},  // unquoted value
      {"winxppro", 0, "winXPPro", "German"},
      {"winxphome", 0, "winXPHome", ""},  // no PRODSPEC.INI
      {"winxpmce", 0, "winXPHome", "English"},
      {"winxppro-x64", 0, "winXPPro-64", "English"},  // AMD64 layout
      {"win2003std", 0, "winNetStandard", "English"},
      {"win2003ent", 0, "winNetEnterprise", "Japanese"},  // wks_id beats srv_id
      {"win2003web", 0, "winNetWeb", ""},
      {"win2003sbs", 0, "winNetBusiness", "Spanish"},
      {"win2003std-x64", 0, "winNetStandard-64", "German"},
      {"win2003ent-x64", 0, "winNetEnterprise-64", "English"},  // read as UDF
      {"nt4wks", 0, "winNT", ""},  // value on the line after "wks_id ="
      {"nt4srv", 0, "winNT", ""},
  };
  for (const MediumCase &c : cases) ExpectDetected(c);
}

TEST(GuessWindowsNT, IgnoresMediaWithoutAKnownProduct) {
  const MediumCase cases[] = {
      {"lowercase-product", 1, nullptr, ""},  // table rows match with case
      {"no-product-id", 1, nullptr, ""},
  };
  for (const MediumCase &c : cases) ExpectDetected(c);
}

// The legacy directories are probed in order and the last one present wins.
TEST(GuessWindowsLegacy, RecognisesSetupDirectories) {
  const MediumCase cases[] = {
      {"win95", 0, "win95", ""},
      {"win98", 0, "win98", ""},  // lower-case Rock Ridge name
      {"winme", 0, "winMe", ""},  // WIN9X and WIN95
  };
  for (const MediumCase &c : cases) ExpectDetected(c);
}

// A recogniser run by the host on a result that another one filled keeps
// the result and reports it as recognised.
TEST(GuessWindowsNT, KeepsResultFilledBeforeWhenMediumIsNotItsOwn) {
  struct Case {
    const char *image;
    Bool (*recogniser)(GuessMedium *, GuessResult *);
  };
  for (const Case &c : {Case{"win95", Guess_WindowsNT}, Case{"winxppro", Guess_WindowsLegacy}}) {
    SCOPED_TRACE(c.image);
    GuessMedium medium;
    ASSERT_TRUE(tvx::guess::OpenMedium(Image(c.image).c_str(), &medium));
    GuessResult empty{};
    EXPECT_FALSE(c.recogniser(&medium, &empty));
    EXPECT_EQ(empty.guestOS, nullptr);

    GuessResult filled{};
    filled.guestOS = "debian10-64";
    tvx::guess::CopyField(filled.language, "en-US");
    GuessResult before = filled;
    EXPECT_TRUE(c.recogniser(&medium, &filled));
    EXPECT_EQ(std::memcmp(&before, &filled, sizeof filled), 0);
    tvx::guess::CloseMedium(&medium);
  }
}

TEST(GuessParseKeyValue, ReadsValuesAsSetupFilesWriteThem) {
  struct Case {
    const char *text;
    bool found;
    const char *key;
    const char *value;
  };
  const Case cases[] = {
      {"wks_id = \"Microsoft Windows XP Professional\"\r\n", true, "wks_id",
       "Microsoft Windows XP Professional"},
      {"srv_id = Windows Server 2003, Standard\r\nnext = 1", true, "srv_id",
       "Windows Server 2003, Standard"},  // blanks inside the value
      {"Localization=English\r\n", true, "Localization", "English"},
      {"key=value\tcomment", true, "key", "value"},
      {"wks_id =\r\n    \"Windows NT Workstation Version 4.00\"", true, "wks_id",
       "Windows NT Workstation Version 4.00"},  // runs onto the next line
      {"empty =\r\nnext = 2\r\n", true, "empty", "next = 2"},
      {"key  =  \"a\"b", true, "key", "a"},
      {"de-DE = 1\r\n", true, "de-DE", "1"},
      {"two words = x", true, "two", "x"},  // key ends at the first blank
      {"\"quoted\"", false, nullptr, nullptr},  // no "="
      {"key = \"\"", false, nullptr, nullptr},
      {"key = \"", false, nullptr, nullptr},
      {"key = ", false, nullptr, nullptr},
      {"key = \r\n", false, nullptr, nullptr},
      {"key = \x01tail", false, nullptr, nullptr},
      {"", false, nullptr, nullptr},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.text);
    char *key = reinterpret_cast<char *>(1);
    char *value = reinterpret_cast<char *>(1);
    ASSERT_EQ(GuessParseKeyValue(c.text, &key, &value), c.found ? TRUE : FALSE);
    if (!c.found) {
      EXPECT_EQ(key, nullptr);
      EXPECT_EQ(value, nullptr);
      continue;
    }
    EXPECT_STREQ(key, c.key);
    EXPECT_STREQ(value, c.value);
    std::free(key);
    std::free(value);

    tvx::guess::Text alone(nullptr);
    char *v = nullptr;
    ASSERT_TRUE(GuessParseKeyValue(c.text, nullptr, &v));
    alone.reset(v);
    EXPECT_STREQ(alone.get(), c.value);
  }
}

}  // namespace
