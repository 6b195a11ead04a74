#include "platform/util.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "platform/dynbuf.h"

namespace {

int Sign(int v) { return v < 0 ? -1 : v > 0 ? 1 : 0; }

TEST(Util, CompareDottedHandlesUnevenVersionsAndTails) {
  struct Case {
    const char *a, *b;
    int want;
  } cases[] = {
      {"8", "8.0", 0},
      {"14.04.2", "14.04", 1},
      {"14.04", "14.4", 0},  // numbers, not texts
      {"9", "10", -1},
      {"14.04.2-desktop", "14.04.2", 1},
      {"14.04.2-desktop", "14.04.3", -1},
      {"14.04.2-desktop", "14.04.2-server", -1},
      {"1.alpha", "1.beta", -1},
      {"12345678901234567890", "12345678901234567891", -1},
      {"", "0", 0},
      {"", "1", -1},
  };
  for (const auto &c : cases) {
    EXPECT_EQ(Sign(Util_CompareDotted(c.a, c.b)), c.want) << c.a << " vs " << c.b;
    EXPECT_EQ(Sign(Util_CompareDotted(c.b, c.a)), -c.want) << c.b << " vs " << c.a;
  }
}

TEST(DynBuf, AppendsGrowAndDetachTerminatesEmpty) {
  DynBuf b;
  DynBuf_Init(&b);
  std::string want;
  for (int i = 0; i < 1000; i++) {
    DynBuf_Strcat(&b, "block ");
    want += "block ";
  }
  // Appending the buffer's own bytes must survive the reallocation.
  DynBuf_Append(&b, DynBuf_Get(&b), DynBuf_GetSize(&b));
  want += want;
  DynBuf_AppendByte(&b, '\0');
  EXPECT_EQ(DynBuf_GetSize(&b), want.size() + 1);
  EXPECT_STREQ(DynBuf_Get(&b), want.c_str());
  char *detached = static_cast<char *>(DynBuf_Detach(&b));
  EXPECT_EQ(DynBuf_GetSize(&b), 0u);
  std::free(detached);
  char *empty = static_cast<char *>(DynBuf_Detach(&b));
  ASSERT_NE(empty, nullptr);
  EXPECT_EQ(empty[0], '\0');
  std::free(empty);
  DynBuf_Destroy(&b);
}

}  // namespace
