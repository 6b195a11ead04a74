#include "platform/msg.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

namespace {

std::string Take(char *s) {
  std::string out = s != nullptr ? s : "<null>";
  std::free(s);
  return out;
}

TEST(Msg, DefaultTextsWithoutCatalogue) {
  Msg_SetLocale("");
  struct Case {
    const char *id;
    std::string get, safe;
  } cases[] = {
      {"@&!*@*@(msg.guessGuest.ubuntuServer)Server", "Server", "Server"},
      {"@&!*@*@(msg.x)", "", ""},
      {"plain text", "plain text", "plain text"},
      {"@&!*@*@(msg.unclosed Server", "<null>", "@&!*@*@(msg.unclosed Server"},
      {"@&!*@*@no parenthesis", "<null>", "@&!*@*@no parenthesis"},
      {"@&!*@*@()empty id", "<null>", "@&!*@*@()empty id"},
  };
  for (const auto &c : cases) {
    EXPECT_EQ(Take(Msg_GetString(c.id)), c.get) << c.id;
    EXPECT_EQ(Take(Msg_GetStringSafe(c.id)), c.safe) << c.id;
  }
  EXPECT_EQ(Msg_GetStringSafe(nullptr), nullptr);
  EXPECT_EQ(Take(Msg_Format("@&!*@*@(msg.n)%d of %s", 3, "five")), "3 of five");
}

TEST(Msg, PendingMessagesJoinAndReset) {
  Take(Msg_GetMessagesAndReset());
  EXPECT_EQ(Take(Msg_GetMessagesAndReset()), "");
  Msg_Append("@&!*@*@(msg.a)line %d: bad\n", 3);
  Msg_Append("second");
  EXPECT_EQ(Take(Msg_GetMessagesAndReset()), "line 3: bad; second");
  EXPECT_EQ(Take(Msg_GetMessagesAndReset()), "");
}

}  // namespace
