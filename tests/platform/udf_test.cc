// The UDF reader on mastered media: what callers of UDF_* rely on.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <map>
#include <memory>

#include "support/log_capture.h"
#include "support/udf_walk.h"
#include "tvx_udf.h"

namespace fs = std::filesystem;

namespace {

std::string Image(const char *name) { return tvxtest::MediaDir() + "/udf/" + name; }

struct VolumeCloser {
  void operator()(UDFVolume *v) const { UDF_Close(v); }
};
using VolumePtr = std::unique_ptr<UDFVolume, VolumeCloser>;

}  // namespace

TEST(UdfMedia, EmptyVolumeOfEachRevision) {
  const struct {
    const char *file, *label;
  } cases[] = {
      {"empty-102.img", "EMPTY102"},       {"empty-250.img", "EMPTY250"},
      {"empty-sparable.img", "EMPTYSPAR"}, {"empty-vat150.img", "EMPTYVAT15"},
  };
  for (const auto &c : cases) {
    SCOPED_TRACE(c.file);
    VolumePtr vol(UDF_Open(Image(c.file).c_str()));
    ASSERT_NE(vol, nullptr);
    char *id = UDF_GetVolumeId(vol.get());
    ASSERT_NE(id, nullptr);
    EXPECT_STREQ(id, c.label);
    free(id);
    UDFDir *root = UDF_OpenDir(vol.get(), nullptr, "/");
    ASSERT_NE(root, nullptr);
    EXPECT_EQ(UDF_ReadDir(root, 0), nullptr);
    EXPECT_TRUE(UDF_CloseDir(root));
  }
}

TEST(UdfMedia, NotUdfFailsQuietly) {
  tvxtest::TempDir tmp;
  std::string iso = tvxtest::MediaDir() + "/iso9660/rr-joliet.iso";
  tvxtest::WriteFileOrDie(tmp.Join("zeros.img"), std::string(1 << 20, '\0'));
  tvxtest::LogCapture log;
  for (std::string path : {iso, tmp.Join("zeros.img"), tmp.Join("missing.iso"), tmp.Path()}) {
    EXPECT_EQ(UDF_Open(path.c_str()), nullptr) << path;
  }
  EXPECT_EQ(UDF_Open(nullptr), nullptr);
  // Probing a medium that is not UDF is routine for callers: no noise.
  EXPECT_EQ(log.All(), "");
}

class UdfApi : public testing::Test {
 protected:
  void SetUp() override {
    vol_.reset(UDF_Open(Image("udf-only.iso").c_str()));
    ASSERT_NE(vol_, nullptr);
  }
  std::string ReadAll(UDFDir *dir, const char *path) {
    UDFFile *f = UDF_OpenFile(vol_.get(), dir, path);
    if (f == nullptr) return "<none>";
    std::string data(UDF_GetFileSize(vol_.get(), f), '\0');
    bool ok = UDF_PReadFile(f, data.data(), 0, data.size());
    UDF_CloseFile(f);
    return ok ? data : "<read failed>";
  }
  VolumePtr vol_;
};

TEST_F(UdfApi, OpenFileResolvesPathsExactly) {
  UDFDir *ab = UDF_OpenDir(vol_.get(), nullptr, "a/b");
  ASSERT_NE(ab, nullptr);
  const struct {
    UDFDir *dir;
    const char *path, *want;
  } cases[] = {
      {nullptr, "README.TXT", "UDF test medium\n"},
      {nullptr, "/README.TXT", "UDF test medium\n"},
      {nullptr, "a//b/c/d/deep.txt", "deep\n"},
      {ab, "c/d/deep.txt", "deep\n"},
      {nullptr, "Docs/Grüße.txt", "grüße\n"},
      {nullptr, "empty.bin", ""},
      {nullptr, "readme.txt", "<none>"},       // names match exactly
      {nullptr, "a", "<none>"},                // a directory
      {nullptr, "", "<none>"},                 // the root
      {nullptr, "a/b/../b/c/d/deep.txt", "<none>"},
      {nullptr, "README.TXT/x", "<none>"},
      {ab, "README.TXT", "<none>"},
  };
  for (const auto &c : cases) {
    EXPECT_EQ(ReadAll(c.dir, c.path), c.want) << c.path;
  }
  UDF_CloseDir(ab);
}

