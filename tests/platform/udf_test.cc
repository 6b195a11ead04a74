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

// The generated file the media script adds to the tree.
std::string BigPattern() {
  std::string block(4096, '\0');
  for (int i = 0; i < 4096; i++) block[i] = static_cast<char>((i * 7 + i / 251) & 0xFF);
  std::string all;
  for (int i = 0; i < 75; i++) all += block;
  return all;
}

struct VolumeCloser {
  void operator()(UDFVolume *v) const { UDF_Close(v); }
};
using VolumePtr = std::unique_ptr<UDFVolume, VolumeCloser>;

}  // namespace

TEST(UdfMedia, ReadsTheSourceTree) {
  std::string src = tvxtest::SourceDir() + "/tests/data/udf/tree";
  tvxtest::UdfTree want;
  for (const auto &e : fs::recursive_directory_iterator(src)) {
    std::string rel = fs::relative(e.path(), src).string();
    if (e.is_directory()) {
      want.dirs[rel] = true;
    } else {
      want.files[rel] = tvxtest::ReadFileOrDie(e.path().string());
    }
  }
  want.files["sources/big.bin"] = BigPattern();
  bool opened = false;
  tvxtest::UdfTree got = tvxtest::WalkUdfImage(Image("udf-only.iso"), &opened);
  ASSERT_TRUE(opened);
  EXPECT_EQ(got.failures, 0);
  EXPECT_EQ(got.dirs, want.dirs);
  EXPECT_TRUE(got.files == want.files);
}

TEST(UdfMedia, EmptyVolumeOfEachRevision) {
  const struct {
    const char *file, *label;
  } cases[] = {
      {"empty-102.img", "EMPTY102"}, {"empty-150.img", "EMPTY150"},
      {"empty-200.img", "EMPTY200"}, {"empty-201.img", "EMPTY201"},
      {"empty-250.img", "EMPTY250"}, {"empty-260.img", "EMPTY260"},
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
  std::string iso = tmp.Join("plain.iso");
  std::string cmd = "genisoimage -quiet -J -R -o '" + iso + "' '" + tvxtest::SourceDir() +
                    "/tests/data/udf/tree' 2>/dev/null";
  ASSERT_EQ(std::system(cmd.c_str()), 0);
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

TEST_F(UdfApi, DirectoryListing) {
  UDFDir *root = UDF_OpenDir(vol_.get(), nullptr, "");
  ASSERT_NE(root, nullptr);
  std::map<std::string, std::pair<bool, uint64_t>> seen;
  while (const char *name = UDF_ReadDir(root, 0)) {
    seen[name] = {UDF_DirEntryIsDir(root) != 0, UDF_DirEntrySize(root)};
  }
  EXPECT_EQ(seen.size(), 5u);
  EXPECT_EQ(seen["README.TXT"], std::make_pair(false, uint64_t{16}));
  EXPECT_EQ(seen["empty.bin"], std::make_pair(false, uint64_t{0}));
  EXPECT_TRUE(seen["sources"].first);
  EXPECT_EQ(UDF_DirEntrySize(root), UINT64_MAX);  // nothing returned last
  UDF_RewindDir(root);
  const char *first = UDF_ReadDir(root, 0);
  ASSERT_NE(first, nullptr);
  EXPECT_EQ(seen.count(first), 1u);
  // A directory handle is a starting point for relative opens.
  UDFDir *sub = UDF_OpenDir(vol_.get(), root, "sources/en-us");
  ASSERT_NE(sub, nullptr);
  EXPECT_STREQ(UDF_ReadDir(sub, 0), "lang.ini");
  EXPECT_EQ(ReadAll(sub, "lang.ini"), "lang=en-us\n");
  EXPECT_TRUE(UDF_CloseDir(sub));
  EXPECT_TRUE(UDF_CloseDir(root));
  EXPECT_FALSE(UDF_CloseDir(nullptr));
  EXPECT_EQ(UDF_OpenDir(vol_.get(), nullptr, "README.TXT"), nullptr);
  EXPECT_EQ(UDF_OpenDir(vol_.get(), nullptr, "nothing"), nullptr);
}

TEST_F(UdfApi, InterleavedReadsAreIndependent) {
  const std::string big = BigPattern();
  UDFFile *a = UDF_OpenFile(vol_.get(), nullptr, "sources/big.bin");
  UDFFile *b = UDF_OpenFile(vol_.get(), nullptr, "sources/big.bin");
  UDFFile *c = UDF_OpenFile(vol_.get(), nullptr, "README.TXT");
  ASSERT_TRUE(a && b && c);
  // a walks forward, b backward, c in between: no shared position.
  const size_t chunk = 3000;
  for (size_t i = 0; i * chunk < big.size(); i++) {
    size_t offA = i * chunk;
    size_t offB = big.size() - std::min(big.size(), (i + 1) * chunk);
    char bufA[chunk], bufB[chunk], bufC[16];
    size_t nA = std::min(chunk, big.size() - offA);
    size_t nB = std::min(chunk, big.size() - i * chunk);
    ASSERT_TRUE(UDF_PReadFile(a, bufA, offA, nA));
    ASSERT_TRUE(UDF_PReadFile(c, bufC, 0, sizeof bufC));
    ASSERT_TRUE(UDF_PReadFile(b, bufB, offB, nB));
    ASSERT_EQ(std::string(bufA, nA), big.substr(offA, nA));
    ASSERT_EQ(std::string(bufB, nB), big.substr(offB, nB));
    ASSERT_EQ(std::string(bufC, sizeof bufC), "UDF test medium\n");
  }
  // Reads past the end fail whole; a read of nothing at the end succeeds.
  char byte;
  EXPECT_FALSE(UDF_PReadFile(a, &byte, big.size(), 1));
  char small[16];
  EXPECT_FALSE(UDF_PReadFile(c, small, 10, 7));
  EXPECT_TRUE(UDF_PReadFile(a, &byte, big.size(), 0));
  EXPECT_EQ(UDF_GetFileSize(vol_.get(), nullptr), UINT64_MAX);
  UDF_CloseFile(a);
  UDF_CloseFile(b);
  UDF_CloseFile(c);
}
