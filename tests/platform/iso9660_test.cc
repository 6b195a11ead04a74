// The ISO 9660 reader on images mastered from tests/data/iso9660/tree by real
// mastering tools: lookups and file records. Formats, names per open mode
// and bytes are compared with other readers in iso9660_oracle_test.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <string>
#include <sys/stat.h>
#include <vector>

#include "support/iso_builder.h"
#include "support/log_capture.h"
#include "tvx_iso9660.h"

namespace {

using tvxtest::MediaDir;

std::string Image(const std::string &name) { return MediaDir() + "/iso9660/" + name; }

struct Opened {
  Iso9660Image *image = nullptr;
  ~Opened() {
    if (image != nullptr) Iso9660_Close(image);
  }
};

// The formats each image records are checked in iso9660_oracle_test.
TEST(Iso9660Media, UnreadableImagesAndBadModes) {
  uint32_t formats = 0;
  EXPECT_EQ(Iso9660_ListFormats(Image("missing.iso").c_str(), &formats), ISO9660_ERR_IO);
  Opened o;
  EXPECT_EQ(Iso9660_Open(Image("missing.iso").c_str(), 0, &o.image), ISO9660_ERR_IO);
  EXPECT_EQ(o.image, nullptr);
  EXPECT_EQ(Iso9660_Open(Image("plain-l1.iso").c_str(), 8, &o.image), ISO9660_ERR_ARGUMENT);
}

TEST(Iso9660Media, LookupIgnoresCaseOnlyAfterExactMatch) {
  Opened o;
  ASSERT_EQ(Iso9660_Open(Image("rr-joliet.iso").c_str(), 4, &o.image), ISO9660_OK);
  struct Case {
    const char *path;
    int rc;
  } cases[] = {
      {"", ISO9660_OK},                    {"MIXED DIR", ISO9660_OK},
      {"/docs//nested/", ISO9660_OK},      {"DOCS/NESTED", ISO9660_OK},
      {"docs/missing", ISO9660_ERR_NOT_FOUND}, {"README.TXT", ISO9660_ERR_NOT_DIR},
      {"README.TXT/x", ISO9660_ERR_NOT_DIR}, {"docs/..", ISO9660_ERR_NOT_FOUND},
  };
  for (const Case &c : cases) {
    Iso9660Dir *d = nullptr;
    EXPECT_EQ(Iso9660_OpenDir(o.image, c.path, &d), c.rc) << c.path;
    if (d != nullptr) Iso9660_CloseDir(o.image, d);
  }
}

TEST(Iso9660Media, EntryRecordsOpenFiles) {
  Opened o;
  ASSERT_EQ(Iso9660_Open(Image("plain-l1.iso").c_str(), 0, &o.image), ISO9660_OK);
  Iso9660Dir *d = nullptr;
  ASSERT_EQ(Iso9660_OpenDir(o.image, "/", &d), ISO9660_OK);
  Iso9660DirEntry e, empty{}, dir{};
  bool sawEmpty = false;
  while (Iso9660_ReadDir(o.image, d, &e) == ISO9660_OK) {
    if (std::strcmp(e.name, "EMPTY.DAT") == 0) empty = e, sawEmpty = true;
    if (std::strcmp(e.name, "DOCS") == 0) dir = e;
  }
  ASSERT_TRUE(sawEmpty);
  EXPECT_EQ(Iso9660_RewindDir(o.image, d), ISO9660_OK);
  EXPECT_EQ(Iso9660_ReadDir(o.image, d, &e), ISO9660_OK);
  EXPECT_STREQ(e.name, "A_RATHER.TEX");
  EXPECT_EQ(Iso9660_CloseDir(o.image, d), ISO9660_OK);

  // The record outlives its directory handle.
  Iso9660File *f = nullptr;
  ASSERT_EQ(Iso9660_OpenFile(o.image, &empty, &f), ISO9660_OK);
  char buf[2048];
  size_t n = sizeof buf;
  EXPECT_EQ(Iso9660_ReadFile(o.image, f, buf, &n), ISO9660_END);
  EXPECT_EQ(n, 0u);
  EXPECT_EQ(Iso9660_CloseFile(o.image, f), ISO9660_OK);
  EXPECT_EQ(Iso9660_CloseFile(o.image, f), ISO9660_ERR_ARGUMENT);

  EXPECT_EQ(Iso9660_OpenFile(o.image, &dir, &f), ISO9660_ERR_IS_DIR);
  Iso9660DirEntry forged = empty;
  forged.priv[3] ^= 1;
  EXPECT_EQ(Iso9660_OpenFile(o.image, &forged, &f), ISO9660_ERR_ARGUMENT);
  forged = empty;
  forged.priv[2] = 999;
  EXPECT_EQ(Iso9660_OpenFile(o.image, &forged, &f), ISO9660_ERR_ARGUMENT);
  EXPECT_EQ(f, nullptr);
}

}  // namespace
