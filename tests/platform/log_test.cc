#include "platform/log.h"

#include <gtest/gtest.h>

#include "support/log_capture.h"

namespace {

TEST(Log, SinkReceivesExactFormattedText) {
  tvxtest::LogCapture cap;
  Log("%s: FileIO_Open failed, error: %d\n", "AddFileToFloppyImg", 6);
  Warning("no newline here");
  Log_Level(6, "detail %u\n", 7u);
  ASSERT_EQ(cap.Lines().size(), 3u);
  EXPECT_EQ(cap.Lines()[0], "AddFileToFloppyImg: FileIO_Open failed, error: 6\n");
  EXPECT_EQ(cap.Lines()[1], "no newline here");
  EXPECT_EQ(cap.Lines()[2], "detail 7\n");
}

TEST(Log, LongMessagesAreNotCut) {
  tvxtest::LogCapture cap;
  std::string big(5000, 'x');
  Log("%s\n", big.c_str());
  ASSERT_EQ(cap.Lines().size(), 1u);
  EXPECT_EQ(cap.Lines()[0].size(), 5001u);
}

}  // namespace
