#include <cstdlib>

#include "guessGuest/media_table.h"

namespace {

struct MediumCase {
  const char *image;
  const char *guestOS;  // null when not recognised
  const char *language;
};

// Text-mode setup media: the product name in TXTSETUP.SIF decides, the
// Localization of PRODSPEC.INI (I386, else AMD64) gives the language. Windows
// 9x media: the legacy directories are probed in order and the last one
// present wins. Both leave the short language empty; the default language
// goes into a result nothing recognises.
TEST(GuessWindowsLegacy, RecognisesSetupMediaEndToEnd) {
  const MediumCase cases[] = {
      {"win2000pro", "win2000Pro", "English"},      // plain level-1 names
      {"win2000srv", "win2000Serv", "French"},      // srv_id only
      {"win2000adv", "win2000AdvServ", "English"},  // unquoted value
      {"winxppro", "winXPPro", "German"},
      {"winxphome", "winXPHome", ""},  // no PRODSPEC.INI
      {"winxppro-x64", "winXPPro-64", "English"},  // AMD64 layout
      {"win2003ent", "winNetEnterprise", "Japanese"},  // wks_id beats srv_id
      {"nt4wks", "winNT", ""},                               // value on the line after "wks_id ="
      {"lowercase-product", nullptr, "en-US"},  // table rows match with case
      {"no-product-id", nullptr, "en-US"},
      {"win95", "win95", ""},
      {"win98", "win98", ""},  // lower-case Rock Ridge name
      {"winme", "winMe", ""},  // WIN9X and WIN95
  };
  for (const MediumCase &c : cases) {
    std::string image = std::string("windows-legacy/") + c.image;
    tvxtest::ExpectGuess({image.c_str(), c.guestOS}, {c.language, c.guestOS ? "" : nullptr});
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
      {"key=value\tcomment", true, "key", "value"},
      {"wks_id =\r\n    \"Windows NT Workstation Version 4.00\"", true, "wks_id",
       "Windows NT Workstation Version 4.00"},  // runs onto the next line
      {"empty =\r\nnext = 2\r\n", true, "empty", "next = 2"},
      {"key  =  \"a\"b", true, "key", "a"},
      {"two words = x", true, "two", "x"},      // key ends at the first blank
      {"\"quoted\"", false, nullptr, nullptr},  // no "="
      {"key = \"\"", false, nullptr, nullptr},
      {"key = ", false, nullptr, nullptr},
      {"key = \x01tail", false, nullptr, nullptr},  // a control character ends the value at once
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
  }
  // Without a place for the key only the value is made.
  char *value = nullptr;
  ASSERT_TRUE(GuessParseKeyValue("key = value", nullptr, &value));
  EXPECT_STREQ(tvx::guess::Text(value).get(), "value");
}

}  // namespace
