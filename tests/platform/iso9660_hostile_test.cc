// The ISO 9660 reader on crafted images: every malformation ends in a
// documented result code, never a crash, a hang or a write outside the
// destination.
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <sys/stat.h>
#include <unistd.h>
#include <vector>

#include "support/iso_builder.h"
#include "support/log_capture.h"
#include "tvx_iso9660.h"

namespace {

using tvxtest::Both16;
using tvxtest::Both32;
using tvxtest::IsoBuilder;
using tvxtest::IsoRecord;
namespace susp = tvxtest::susp;

constexpr uint32_t kRoot = IsoBuilder::kRoot;
const std::string kRockRoot = susp::SP() + susp::ER();

struct Image {
  explicit Image(std::vector<uint8_t> b = {}) : bytes(std::move(b)) {}
  std::vector<uint8_t> bytes;
  Iso9660Image *image = nullptr;
  int closes = 0;
  int Open(uint32_t mode = 0) { return tvxtest::OpenMemoryImage(bytes, mode, &image, &closes); }
  ~Image() {
    if (image != nullptr) Iso9660_Close(image);
  }
};

std::vector<std::string> List(Iso9660Image *image, const char *dir, int *rc) {
  std::vector<std::string> names;
  Iso9660Dir *d = nullptr;
  *rc = Iso9660_OpenDir(image, dir, &d);
  if (*rc != ISO9660_OK) return names;
  Iso9660DirEntry e;
  while ((*rc = Iso9660_ReadDir(image, d, &e)) == ISO9660_OK) names.push_back(e.name);
  if (*rc == ISO9660_END) *rc = ISO9660_OK;
  Iso9660_CloseDir(image, d);
  return names;
}

// `bytes` with one byte changed.
std::string With(std::string bytes, size_t at, char value) {
  bytes[at] = value;
  return bytes;
}

bool Exists(const std::string &path) {
  struct stat st;
  return lstat(path.c_str(), &st) == 0;
}

TEST(Iso9660Hostile, VolumeDescriptors) {
  struct Case {
    const char *name;
    std::function<void(IsoBuilder &)> edit;
    std::function<void(std::vector<uint8_t> &)> patch;
    int rc;
  } cases[] = {
      {"well formed", nullptr, nullptr, ISO9660_OK},
      {"empty", nullptr, [](auto &b) { b.clear(); }, ISO9660_ERR_FORMAT},
      {"no standard identifier", [](IsoBuilder &b) { b.Put(16 * 2048 + 1, "BEA01"); }, nullptr,
       ISO9660_ERR_FORMAT},
      {"supplementary descriptor only", [](IsoBuilder &b) { b.Put(16 * 2048, "\2"); }, nullptr,
       ISO9660_ERR_FORMAT},
      {"block size 512", [](IsoBuilder &b) { b.Put(16 * 2048 + 128, Both16(512)); }, nullptr,
       ISO9660_ERR_CORRUPT},
      {"volume size copies differ", nullptr, [](auto &b) { b[16 * 2048 + 84] ^= 1; },
       ISO9660_ERR_CORRUPT},
      {"root record too short", [](IsoBuilder &b) { b.Put(16 * 2048 + 156, "\x10"); }, nullptr,
       ISO9660_ERR_CORRUPT},
      {"root beyond the end", [](IsoBuilder &b) { b.SetRoot(5000, 2048); }, nullptr,
       ISO9660_ERR_CORRUPT},
      {"root of length 0", [](IsoBuilder &b) { b.SetRoot(kRoot, 0); }, nullptr, ISO9660_ERR_CORRUPT},
      {"root over 16 MiB", [](IsoBuilder &b) { b.SetRoot(kRoot, 17u << 20); }, nullptr,
       ISO9660_ERR_CORRUPT},
      // Tolerated: a set without terminator ends where "CD001" stops.
      {"no terminator", [](IsoBuilder &b) { b.PutBlock(18, std::string(2048, '\0')); }, nullptr,
       ISO9660_OK},
  };
  for (const Case &c : cases) {
    IsoBuilder b;
    if (c.edit) c.edit(b);
    Image img{b.Bytes()};
    if (c.patch) c.patch(img.bytes);
    EXPECT_EQ(img.Open(), c.rc) << c.name;
    // The caller keeps its handle when the open fails.
    EXPECT_EQ(img.closes, 0) << c.name;
    if (img.image != nullptr) {
      EXPECT_EQ(Iso9660_Close(img.image), ISO9660_OK);
      img.image = nullptr;
      EXPECT_EQ(img.closes, 1) << c.name;
    }
  }
}

// A root holding one directory "SUB" whose records the case writes raw.
TEST(Iso9660Hostile, DirectoryRecords) {
  const std::string file = tvxtest::RecordBytes({"F;1", 40, 10, 0, ""});
  // Records of 250 and 210 bytes after "." and ".." end at byte 2028, where
  // the 37-byte record of F;1 starts and spills into the next block.
  std::string crossing;
  for (int i = 0; i < 8; ++i) {
    std::string id = "F" + std::to_string(i) + "X;1";
    crossing += tvxtest::RecordBytes({id, kRoot, 0, 0, std::string(i < 7 ? 212 : 172, ' ')});
  }
  ASSERT_EQ(crossing.size(), 2028u - 68);
  struct Case {
    const char *name;
    std::string records;  // after "." and ".."
    uint32_t length;      // SUB's length
    int rc;
  } cases[] = {
      {"well formed", file, 4096, ISO9660_OK},
      {"record length below the minimum", std::string("\x14") + file.substr(1), 4096,
       ISO9660_ERR_CORRUPT},
      {"zero fill to the end of a block", std::string(2048 - 68, '\0') + file, 4096, ISO9660_OK},
      {"record crossing its block", crossing + file, 4096, ISO9660_ERR_CORRUPT},
      {"name longer than the record", With(file, 32, 60), 4096, ISO9660_ERR_CORRUPT},
      {"multi-extent file without its last record",
       tvxtest::RecordBytes({"F;1", 40, 2048, 0x80, ""}), 4096, ISO9660_ERR_CORRUPT},
      {"multi-extent pieces with different names",
       tvxtest::RecordBytes({"F;1", 40, 2048, 0x80, ""}) + tvxtest::RecordBytes({"G;1", 41, 1, 0, ""}),
       4096, ISO9660_ERR_CORRUPT},
      {"directory with multi-extent flag", tvxtest::RecordBytes({"D", 40, 2048, 0x82, ""}), 4096,
       ISO9660_ERR_CORRUPT},
      {"directory ending inside a record", file, 68 + 12, ISO9660_ERR_CORRUPT},
      {"directory beyond the end", file, 1u << 24, ISO9660_ERR_CORRUPT},
      {"directory over 16 MiB", file, (16u << 20) + 2048, ISO9660_ERR_CORRUPT},
  };
  for (const Case &c : cases) {
    IsoBuilder b;
    uint32_t sub = b.NewBlocks(2);
    b.NewBlocks(20);
    b.SetRoot(kRoot, b.Dir(kRoot, kRoot, {{"SUB", sub, c.length, 0x02, ""}}));
    std::string dir = tvxtest::RecordBytes({std::string(1, '\0'), sub, 4096, 0x02, ""}) +
                      tvxtest::RecordBytes({std::string(1, '\1'), kRoot, 2048, 0x02, ""});
    b.PutBlock(sub, dir + c.records);
    Image img{b.Bytes()};
    ASSERT_EQ(img.Open(), ISO9660_OK) << c.name;
    int rc;
    List(img.image, "SUB", &rc);
    EXPECT_EQ(rc, c.rc) << c.name;
  }
}

TEST(Iso9660Hostile, DirectoryLoops) {
  IsoBuilder b;
  uint32_t a = b.NewBlocks(1), c = b.NewBlocks(1);
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot, {{"A", a, 2048, 0x02, ""}, {"C", c, 2048, 0x02, ""}}));
  b.Dir(a, kRoot, {{"BACK", kRoot, 2048, 0x02, ""}, {"SELF", a, 2048, 0x02, ""}});
  b.Dir(c, kRoot, {{"X", a, 2048, 0x02, ""}});  // a second way into A
  Image img{b.Bytes()};
  ASSERT_EQ(img.Open(), ISO9660_OK);
  tvxtest::LogCapture log;
  struct Case {
    const char *path;
    int rc;
  } cases[] = {{"A", ISO9660_OK},
               {"A/BACK", ISO9660_ERR_CORRUPT},
               {"C/X", ISO9660_OK}};
  for (const auto &cs : cases) {
    Iso9660Dir *d = nullptr;
    EXPECT_EQ(Iso9660_OpenDir(img.image, cs.path, &d), cs.rc) << cs.path;
    if (d != nullptr) Iso9660_CloseDir(img.image, d);
  }
  EXPECT_TRUE(log.Contains("Iso9660: directory loop at \"BACK\"\n")) << log.All();
}

TEST(Iso9660Hostile, AbsurdNesting) {
  IsoBuilder b;
  constexpr int kDepth = 200;
  uint32_t first = b.NewBlocks(kDepth);
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot, {{"D", first, 2048, 0x02, ""}}));
  std::string path = "D";
  for (int i = 0; i < kDepth; ++i) {
    uint32_t self = first + i;
    std::vector<IsoRecord> child;
    if (i + 1 < kDepth) child.push_back({"D", self + 1, 2048, 0x02, ""});
    b.Dir(self, i == 0 ? kRoot : self - 1, child);
    if (i + 1 < kDepth) path += "/D";
  }
  Image img{b.Bytes()};
  ASSERT_EQ(img.Open(), ISO9660_OK);
  int rc;
  List(img.image, path.c_str(), &rc);
  EXPECT_EQ(rc, ISO9660_OK) << "a deep but finite path still resolves";
  tvxtest::LogCapture log;
  tvxtest::TempDir tmp;
  EXPECT_EQ(Iso9660_Extract(img.image, "", tmp.Path().c_str()), ISO9660_ERR_CORRUPT);
  EXPECT_TRUE(log.Contains("Iso9660: directories nested deeper than 128 levels\n")) << log.All();
  EXPECT_FALSE(Exists(tmp.Join("D")));
}

TEST(Iso9660Hostile, UnsafeNamesAreListedButNeverExtracted) {
  struct Case {
    const char *name;
    uint32_t mode;
    std::string isoId;
    std::string systemUse;
    const char *listed;
  } cases[] = {
      {"Rock Ridge parent", 4, "A;1", susp::NM(".."), ".."},
      {"Joliet slash", 2, std::string("\0.\0.\0/\0x", 8), "", "../x"},
  };
  for (const Case &c : cases) {
    IsoBuilder b;
    uint32_t data = b.NewBlocks(1);
    b.PutBlock(data, "payload");
    std::vector<IsoRecord> root = {{"OK;1", data, 7, 0, ""}, {c.isoId, data, 7, 0, c.systemUse}};
    if (c.mode == 2) {
      uint32_t jroot = b.NewBlocks(1);
      b.AddJoliet(jroot, b.Dir(jroot, jroot, {{std::string("\0O\0K", 4), data, 7, 0, ""},
                                               {c.isoId, data, 7, 0, ""}}));
    }
    b.SetRoot(kRoot, b.Dir(kRoot, kRoot, root, c.mode == 4 ? kRockRoot : ""));
    Image img{b.Bytes()};
    ASSERT_EQ(img.Open(c.mode), ISO9660_OK) << c.name;
    int rc;
    std::vector<std::string> names = List(img.image, "/", &rc);
    EXPECT_EQ(rc, ISO9660_OK) << c.name;
    ASSERT_EQ(names.size(), 2u) << c.name;
    EXPECT_EQ(names[1], c.listed) << c.name;
    tvxtest::LogCapture log;
    tvxtest::TempDir tmp;
    EXPECT_EQ(Iso9660_Extract(img.image, "/", tmp.Join("out").c_str()), ISO9660_ERR_UNSAFE)
        << c.name;
    EXPECT_TRUE(log.Contains(std::string("Iso9660: refusing to extract unsafe name \"") +
                             c.listed + "\"\n"))
        << log.All();
    EXPECT_FALSE(Exists(tmp.Join("out/OK"))) << c.name << ": checked before writing";
  }
}

TEST(Iso9660Hostile, ExistingLinksInDestinationAreNeverWrittenThrough) {
  IsoBuilder b;
  uint32_t data = b.NewBlocks(1), sub = b.NewBlocks(1);
  b.PutBlock(data, "payload");
  b.Dir(sub, kRoot, {{"INNER;1", data, 7, 0, ""}});
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot, {{"F;1", data, 7, 0, ""}, {"SUB", sub, 2048, 0x02, ""}}));
  Image img{b.Bytes()};
  ASSERT_EQ(img.Open(), ISO9660_OK);
  tvxtest::TempDir tmp;
  tvxtest::WriteFileOrDie(tmp.Join("outside"), "keep");
  ASSERT_EQ(mkdir(tmp.Join("dest").c_str(), 0755), 0);
  // A symbolic link and a hard link where files go lose their names; their
  // targets keep their contents.
  ASSERT_EQ(symlink(tmp.Join("outside").c_str(), tmp.Join("dest/F").c_str()), 0);
  ASSERT_EQ(mkdir(tmp.Join("dest/SUB").c_str(), 0755), 0);
  ASSERT_EQ(link(tmp.Join("outside").c_str(), tmp.Join("dest/SUB/INNER").c_str()), 0);
  EXPECT_EQ(Iso9660_Extract(img.image, "/", tmp.Join("dest").c_str()), ISO9660_OK);
  EXPECT_EQ(tvxtest::ReadFileOrDie(tmp.Join("outside")), "keep");
  EXPECT_EQ(tvxtest::ReadFileOrDie(tmp.Join("dest/F")), "payload");
  EXPECT_EQ(tvxtest::ReadFileOrDie(tmp.Join("dest/SUB/INNER")), "payload");

  ASSERT_EQ(mkdir(tmp.Join("elsewhere").c_str(), 0755), 0);
  ASSERT_EQ(mkdir(tmp.Join("dest2").c_str(), 0755), 0);
  ASSERT_EQ(symlink(tmp.Join("elsewhere").c_str(), tmp.Join("dest2/SUB").c_str()), 0);
  EXPECT_EQ(Iso9660_Extract(img.image, "/", tmp.Join("dest2").c_str()), ISO9660_ERR_UNSAFE);
  EXPECT_FALSE(Exists(tmp.Join("elsewhere/INNER")));
}

TEST(Iso9660Hostile, SuspContinuationAreas) {
  struct Case {
    const char *name;
    std::function<std::string(uint32_t ce)> inRecord;
    std::function<std::string(uint32_t ce)> area;
    const char *listed;
  } cases[] = {
      {"name continued in a CE area",
       [](uint32_t ce) { return susp::NM("first-", 1) + susp::CE(ce, 100, 64); },
       [](uint32_t) { return susp::NM("second"); }, "first-second"},
      {"CE pointing at itself stops",
       [](uint32_t ce) { return susp::CE(ce, 0, 28 + 10); },
       [](uint32_t ce) { return susp::CE(ce, 0, 28 + 10) + susp::NM("ab", 1); }, "F"},
      {"CE beyond the image", [](uint32_t) { return susp::CE(90000, 0, 100); },
       [](uint32_t) { return std::string(); }, "F"},
      {"CE crossing its block", [](uint32_t ce) { return susp::CE(ce, 2000, 100); },
       [](uint32_t) { return std::string(); }, "F"},
      {"entry longer than the area", [](uint32_t) { return std::string("NM\x60\1\0abc", 8); },
       [](uint32_t) { return std::string(); }, "F"},
  };
  for (const Case &c : cases) {
    IsoBuilder b;
    uint32_t ce = b.NewBlocks(1);
    std::string area = c.area(ce);
    b.Put(uint64_t{ce} * 2048 + (std::string(c.name).find("itself") != std::string::npos ? 0 : 100),
          area);
    b.SetRoot(kRoot, b.Dir(kRoot, kRoot, {{"F;1", ce, 0, 0, c.inRecord(ce)}}, kRockRoot));
    Image img{b.Bytes()};
    ASSERT_EQ(img.Open(4), ISO9660_OK) << c.name;
    int rc;
    std::vector<std::string> names = List(img.image, "/", &rc);
    EXPECT_EQ(rc, ISO9660_OK) << c.name;
    if (std::string(c.name).find("itself") != std::string::npos) {
      ASSERT_EQ(names.size(), 1u);
      EXPECT_LE(names[0].size(), 80u) << "the chain is cut after a bounded number of hops";
    } else {
      EXPECT_EQ(names, std::vector<std::string>{c.listed}) << c.name;
    }
  }
}

TEST(Iso9660Hostile, MultiExtentFileIsOneEntry) {
  IsoBuilder b;
  uint32_t x = b.NewBlocks(1), y = b.NewBlocks(2), z = b.NewBlocks(1);
  b.PutBlock(x, std::string(2048, 'x'));
  b.PutBlock(z, std::string(2048, 'z'));
  b.PutBlock(y, std::string(100, 'y'));
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot,
                         {{"BIG;1", z, 2048, 0x80, ""},
                          {"BIG;1", x, 2048, 0x80, ""},
                          {"BIG;1", y, 100, 0, ""},
                          {"HUGE;1", 0, 0xFFFFF800u, 0x80, ""},
                          {"HUGE;1", 0, 0xFFFFF800u, 0, ""},
                          {"NEXT;1", y, 3, 0, ""}}));
  Image img{b.Bytes()};
  ASSERT_EQ(img.Open(), ISO9660_OK);
  Iso9660Dir *d = nullptr;
  ASSERT_EQ(Iso9660_OpenDir(img.image, "/", &d), ISO9660_OK);
  Iso9660DirEntry e;
  std::vector<Iso9660DirEntry> entries;
  while (Iso9660_ReadDir(img.image, d, &e) == ISO9660_OK) entries.push_back(e);
  Iso9660_CloseDir(img.image, d);
  ASSERT_EQ(entries.size(), 3u);
  EXPECT_STREQ(entries[0].name, "BIG");
  EXPECT_EQ(entries[0].size64, 4196u);
  EXPECT_STREQ(entries[1].name, "HUGE");
  EXPECT_EQ(entries[1].size64, 2ull * 0xFFFFF800u);
  EXPECT_EQ(entries[1].size, UINT32_MAX) << "too large for 32 bits";
  EXPECT_STREQ(entries[2].name, "NEXT");

  Iso9660File *f = nullptr;
  ASSERT_EQ(Iso9660_OpenFile(img.image, &entries[0], &f), ISO9660_OK);
  std::string got;
  char buf[3000];  // not a multiple of the block: reads straddle extents
  size_t n = sizeof buf;
  while (Iso9660_ReadFile(img.image, f, buf, &n) == ISO9660_OK) {
    got.append(buf, n);
    n = sizeof buf;
  }
  Iso9660_CloseFile(img.image, f);
  EXPECT_EQ(got, std::string(2048, 'z') + std::string(2048, 'x') + std::string(100, 'y'));
  EXPECT_EQ(Iso9660_OpenFile(img.image, &entries[1], &f), ISO9660_ERR_CORRUPT)
      << "the extents lie beyond the end of the image";
}

TEST(Iso9660Hostile, DataBeyondTheEnd) {
  IsoBuilder b;
  b.SetRoot(kRoot, b.Dir(kRoot, kRoot, {{"A;1", kRoot, 10, 0, ""}, {"FAR;1", 100000, 10, 0, ""}}));
  Image img{b.Bytes()};
  ASSERT_EQ(img.Open(), ISO9660_OK);
  tvxtest::TempDir tmp;
  EXPECT_EQ(Iso9660_ExtractFileEx(img.image, "FAR", tmp.Join("t").c_str()), ISO9660_ERR_CORRUPT);
  EXPECT_EQ(Iso9660_Extract(img.image, "/", tmp.Join("d").c_str()), ISO9660_ERR_CORRUPT);
  EXPECT_FALSE(Exists(tmp.Join("t")));
  EXPECT_FALSE(Exists(tmp.Join("d/A")));
}

// Every prefix of a real image: whatever is cut off, the reader answers with
// a result code.
TEST(Iso9660Hostile, EveryTruncationOfARealImage) {
  std::string whole = tvxtest::ReadFileOrDie(tvxtest::MediaDir() + "/iso9660/rr-joliet.iso");
  ASSERT_GT(whole.size(), 40u * 2048);
  int opened = 0;
  for (size_t len = 0; len < whole.size(); len += len < 40 * 2048 ? 1021 : 2048 * 7) {
    Image img;
    img.bytes.assign(whole.begin(), whole.begin() + static_cast<long>(len));
    int rc = img.Open();
    if (rc != ISO9660_OK) {
      EXPECT_TRUE(rc == ISO9660_ERR_FORMAT || rc == ISO9660_ERR_CORRUPT) << len << ": " << rc;
      continue;
    }
    ++opened;
    std::vector<tvxtest::WalkedEntry> walked;
    rc = tvxtest::WalkImage(img.image, "", &walked);
    EXPECT_TRUE(rc == ISO9660_OK || rc == ISO9660_ERR_IO || rc == ISO9660_ERR_CORRUPT)
        << len << ": " << rc;
  }
  EXPECT_GT(opened, 10);
}

}  // namespace
