#include "platform/log.h"
#include "platform/msg.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "support/log_capture.h"

namespace {

using tvxtest::Take;

TEST(Log, SinkReceivesExactTextHoweverLong) {
  tvxtest::LogCapture cap;
  Log("%s: FileIO_Open failed, error: %d\n", "AddFileToFloppyImg", 6);
  Log("no newline here");
  Log_Level(6, "detail %u\n", 7u);
  std::string big(5000, 'x');
  Log("%s\n", big.c_str());
  EXPECT_EQ(cap.Lines(),
            (std::vector<std::string>{"AddFileToFloppyImg: FileIO_Open failed, error: 6\n",
                                      "no newline here", "detail 7\n", big + "\n"}));
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
  };
  for (const auto &c : cases) {
    EXPECT_EQ(Take(Msg_GetString(c.id)), c.get) << c.id;
    EXPECT_EQ(Take(Msg_GetStringSafe(c.id)), c.safe) << c.id;
  }
  EXPECT_EQ(Msg_GetStringSafe(nullptr), nullptr);
}

TEST(Msg, PendingMessagesJoinAndReset) {
  Take(Msg_GetMessagesAndReset());
  EXPECT_EQ(Take(Msg_GetMessagesAndReset()), "");
  Msg_Append("@&!*@*@(msg.a)line %d: bad\n", 3);
  Msg_Append("second");
  EXPECT_EQ(Take(Msg_GetMessagesAndReset()), "line 3: bad; second");
  EXPECT_EQ(Take(Msg_GetMessagesAndReset()), "");
}

TEST(MsgCatalogue, LocaleHitMissAndFaultyTranslations) {
  tvxtest::TempDir t;
  std::string path = t.Join("fr.txt");
  tvxtest::WriteFileOrDie(path,
                          "# French\n"
                          "msg.guessGuest.ubuntuServer = \"Serveur\"\n"
                          "msg.count = \"%d sur %s\"\n"
                          "msg.swapped = \"%s sur %d\"\n");
  ASSERT_TRUE(Msg_LoadCatalogue("fr", path.c_str()));
  Msg_SetLocale("fr");
  EXPECT_EQ(Take(Msg_GetString("@&!*@*@(msg.guessGuest.ubuntuServer)Server")), "Serveur");
  // An id the catalogue lacks keeps its default text.
  EXPECT_EQ(Take(Msg_GetString("@&!*@*@(msg.guessGuest.sledDesktop)Desktop")), "Desktop");
  EXPECT_EQ(Take(Msg_Format("@&!*@*@(msg.count)%d of %s", 3, "five")), "3 sur five");
  // A translation whose conversions differ would read the wrong arguments.
  EXPECT_EQ(Take(Msg_Format("@&!*@*@(msg.swapped)%d of %s", 3, "five")), "3 of five");
  Msg_SetLocale("de");  // no catalogue: defaults
  EXPECT_EQ(Take(Msg_GetString("@&!*@*@(msg.guessGuest.ubuntuServer)Server")), "Server");
  Msg_SetLocale("");
}

}  // namespace
