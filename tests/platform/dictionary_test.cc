#include "platform/dictionary.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>
#include <utility>
#include <vector>

#include "platform/msg.h"
#include "support/log_capture.h"

namespace {

using Entries = std::vector<std::pair<std::string, std::string>>;

using tvxtest::Take;

Entries All(const Dictionary *d) {
  Entries out;
  Dictionary_Iterate(
      d,
      [](const char *n, const char *v, void *ctx) -> Bool {
        static_cast<Entries *>(ctx)->emplace_back(n, v);
        return TRUE;
      },
      &out);
  return out;
}

// Parse returns the entries, or the loader's message after "ERROR ".
std::string Parse(const std::string &text, Entries *out) {
  Dictionary *d = Dictionary_Create();
  MsgList *msgs = nullptr;
  std::string result;
  if (Dictionary_LoadFromBufferEx(d, text.data(), text.size(), &msgs)) {
    *out = All(d);
    EXPECT_TRUE(MsgList_IsEmpty(msgs));
  } else {
    result = "ERROR " + Take(MsgList_ToEnglishString(msgs));
    EXPECT_EQ(Dictionary_NumberOfEntries(d), 0u) << "a refused text must add nothing";
  }
  MsgList_Free(msgs);
  Dictionary_Free(d);
  return result;
}

// Accepted text gives its entries; refused text names the line at fault.
TEST(Dictionary, ParsesEntriesOrNamesTheMalformedLine) {
  struct Case {
    std::string text;
    Entries want;
    std::string error = "";  // "" when accepted
  } cases[] = {
      {"a = \"1\"\nb=2\n", {{"a", "1"}, {"b", "2"}}},
      {"# comment\n\n   \t\n  name  =  \"spaced value\"  # trailing\n", {{"name", "spaced value"}}},
      {"v = 10.0.0#3 , 9.4   \n", {{"v", "10.0.0#3 , 9.4"}}},
      {"v = bare # comment\n", {{"v", "bare"}}},
      {"v = #only a comment\n", {{"v", ""}}},
      {"v = \"\"\n", {{"v", ""}}},
      {"v = \"a#b\"\n", {{"v", "a#b"}}},
      {"crlf = \"x\"\r\nnext = y\r\n", {{"crlf", "x"}, {"next", "y"}}},
      {"\xEF\xBB\xBF" "bom = 1", {{"bom", "1"}}},
      {"esc = \"q\\\" b\\\\ n\\n t\\t h\\x41\"", {{"esc", "q\" b\\ n\n t\t hA"}}},
      {"a.version = 1\nA.VERSION = 2\n", {{"a.version", "1"}, {"A.VERSION", "2"}}},
      {"", {}},
      {"ok = 1\n\n# c\nname\n", {}, "line 4: \"=\" expected after \"name\""},
      {"= value\n", {}, "line 1: an entry must start with a name"},
      {"a = \"open\n", {}, "line 1: the quoted value has no closing quote"},
      {"a = \"x\" y\n", {}, "line 1: unexpected text after the closing quote"},
      {"a = \"C:\\tools\\new\"\n", {{"a", "C:\tools\new"}}},  // escapes, not a path
      {"a = \"C:\\Program\"\n", {}, "line 1: unknown escape in a value"},
      {"a = \"\\x00\"\n", {}, "line 1: unknown escape in a value"},
      {"a = \"ends in \\", {}, "line 1: the quoted value has no closing quote"},
      {"a = half\"quoted\n", {}, "line 1: a double quote inside an unquoted value"},
      {"a = bell\x07\n", {}, "line 1: control character in a value"},
      {"a\x01 = 1\n", {}, "line 1: control character in a name"},
      {std::string("a = 1\nb = 2\0\n", 13), {}, "line 2: NUL byte"},
  };
  for (const auto &c : cases) {
    Entries got;
    EXPECT_EQ(Parse(c.text, &got), c.error.empty() ? "" : "ERROR " + c.error) << c.text;
    EXPECT_EQ(got, c.want) << c.text;
  }
}

TEST(Dictionary, LookupsSeeTheLastOccurrenceWithoutCase) {
  Dictionary *d = Dictionary_Create();
  const char text[] =
      "guestOS = \"winXPPro\"\nvirtualHW.version = 19\nGUESTOS = ubuntu-64\n"
      "installed = yes\nbad = 12x\n";
  ASSERT_TRUE(Dictionary_LoadFromBuffer(d, text, sizeof text - 1));
  EXPECT_EQ(Dictionary_NumberOfEntries(d), 5u);
  EXPECT_EQ(Take(Dict_GetString(d, nullptr, "guestos")), "ubuntu-64");
  EXPECT_EQ(Dict_GetString(d, nullptr, "libdir"), nullptr);
  int32_t hw = 1;
  EXPECT_TRUE(Dictionary_Get(d, "virtualHW.version", DICT_INT32, &hw));
  EXPECT_EQ(hw, 19);
  int32_t untouched = 7;
  EXPECT_FALSE(Dictionary_Get(d, "bad", DICT_INT32, &untouched));
  EXPECT_EQ(untouched, 7);
  // Iterate counts its visits, so that an early stop shows.
  int calls = 0;
  auto stopAtSecond = [](const char *, const char *, void *ctx) -> Bool {
    return ++*static_cast<int *>(ctx) < 2;
  };
  EXPECT_EQ(Dictionary_Iterate(d, stopAtSecond, &calls), 2u);

  // Setting a repeated name leaves one entry holding the new value.
  ASSERT_TRUE(Dict_SetString(d, "windows9-64", "GuestOS"));
  EXPECT_EQ(Dictionary_NumberOfEntries(d), 4u);
  EXPECT_EQ(Take(Dict_GetString(d, nullptr, "guestOS")), "windows9-64");
  EXPECT_FALSE(Dict_SetString(d, "x", "bad name"));
  EXPECT_FALSE(Dict_SetString(d, "x", "%s", ""));
  Dictionary_Free(d);
}

// A failed load from a buffer without a message list posts to the pending
// messages; one from a file says why.
TEST(Dictionary, LoadFailuresSayWhy) {
  Take(Msg_GetMessagesAndReset());
  Dictionary *d = Dictionary_Create();
  const char text[] = "a = 1\nb\n";
  EXPECT_FALSE(Dictionary_LoadFromBuffer(d, text, sizeof text - 1));
  EXPECT_EQ(Take(Msg_GetMessagesAndReset()), "line 2: \"=\" expected after \"b\"");
  tvxtest::TempDir t;
  MsgList *msgs = nullptr;
  std::string missing = t.Join("missing.txt");
  EXPECT_FALSE(Dictionary_LoadEx(d, missing.c_str(), &msgs));
  EXPECT_EQ(Take(MsgList_ToEnglishString(msgs)),
            "cannot open \"" + missing + "\": Could not find the file");
  MsgList_Free(msgs);
  msgs = nullptr;
  EXPECT_FALSE(Dictionary_LoadEx(d, t.Path().c_str(), &msgs));  // a directory
  EXPECT_FALSE(MsgList_IsEmpty(msgs));
  MsgList_Free(msgs);
  Dictionary_Free(d);
}

TEST(Dictionary, StringToBool) {
  struct Case {
    const char *text;
    int whenDefaultFalse, whenDefaultTrue;
  } cases[] = {
      {"TRUE", 1, 1}, {"yes", 1, 1},  {" On ", 1, 1}, {"1", 1, 1},     {"false", 0, 0},
      {"No", 0, 0},   {"off", 0, 0},  {"0", 0, 0},    {"maybe", 0, 1}, {"", 0, 1},
      {"truex", 0, 1}, {nullptr, 0, 1},
  };
  for (const auto &c : cases) {
    const char *label = c.text != nullptr ? c.text : "(null)";
    EXPECT_EQ(Dictionary_StringToBool(c.text, FALSE), c.whenDefaultFalse) << label;
    EXPECT_EQ(Dictionary_StringToBool(c.text, TRUE), c.whenDefaultTrue) << label;
  }
}

}  // namespace
