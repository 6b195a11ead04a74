// Differential test: every directory listing, size and file byte that the
// ISO 9660 reader returns on the mastered images, against libcdio's iso-info
// and iso-read and against 7z, which read the same images independently.
#include <gtest/gtest.h>

#include <map>
#include <regex>
#include <sstream>
#include <string>
#include <vector>

#include "support/iso_builder.h"
#include "support/log_capture.h"
#include "support/run_argv.h"
#include "support/udf_walk.h"
#include "tvx_iso9660.h"

namespace {

struct Item {
  bool dir = false;
  uint64_t size = 0;
  bool operator==(const Item &o) const { return dir == o.dir && (dir || size == o.size); }
};
using Tree = std::map<std::string, Item>;

std::ostream &operator<<(std::ostream &os, const Item &i) {
  return os << (i.dir ? "dir" : "file " + std::to_string(i.size));
}

// libcdio and 7z show level-1 names lower-cased or without the trailing dot
// of an extension-less name; compare plain names in one spelling.
std::string Fold(std::string path, bool plain) {
  if (!plain) return path;
  std::string out;
  for (size_t i = 0; i < path.size(); ++i) {
    if (path[i] == '.' && (i + 1 == path.size() || path[i + 1] == '/')) continue;
    out += static_cast<char>(std::tolower(static_cast<unsigned char>(path[i])));
  }
  return out;
}

Tree Fold(const Tree &t, bool plain) {
  Tree out;
  for (const auto &[k, v] : t) out[Fold(k, plain)] = v;
  return out;
}

Tree Ours(const std::string &image, uint32_t mode, std::map<std::string, std::string> *data) {
  Iso9660Image *img = nullptr;
  EXPECT_EQ(Iso9660_Open(image.c_str(), mode, &img), ISO9660_OK) << image;
  Tree t;
  if (img == nullptr) return t;
  std::vector<tvxtest::WalkedEntry> walked;
  EXPECT_EQ(tvxtest::WalkImage(img, "", &walked), ISO9660_OK) << image;
  Iso9660_Close(img);
  for (auto &w : walked) {
    bool dir = !w.path.empty() && w.path.back() == '/';
    std::string path = dir ? w.path.substr(0, w.path.size() - 1) : w.path;
    t[path] = {dir, w.size};
    EXPECT_EQ(w.data.size(), dir ? 0 : w.size) << path;
    if (!dir && data != nullptr) (*data)[path] = std::move(w.data);
  }
  return t;
}

Tree IsoInfo(const std::string &image, const std::string &flags) {
  std::string out;
  std::vector<std::string> argv{"iso-info", "--no-header", "-q", "-l", "-i", image};
  if (!flags.empty()) argv.insert(argv.begin() + 4, flags);
  EXPECT_EQ(tvxtest::RunArgv(argv, &out), 0) << image;
  static const std::regex header(R"(^(/.*)/?:$)");
  static const std::regex line(
      R"(^\s+([d-])\s+\[LSN\s+\d+\]\s+(\d+)\s+\w{3} \d{2} \d{4} \d{2}:\d{2}:\d{2}  (.*)$)");
  Tree t;
  std::string dir;
  std::istringstream lines(out);
  for (std::string l; std::getline(lines, l);) {
    std::smatch m;
    if (std::regex_match(l, m, header)) {
      dir = m[1].str();
      while (!dir.empty() && dir.back() == '/') dir.pop_back();
      if (!dir.empty()) dir.erase(0, 1);
    } else if (std::regex_match(l, m, line)) {
      std::string name = m[3].str();
      if (name == "." || name == "..") continue;
      t[dir.empty() ? name : dir + "/" + name] = {m[1] == "d", std::stoull(m[2].str())};
    }
  }
  return t;
}

struct Case {
  const char *image;
  uint32_t mode;          // our open mode
  const char *isoInfo;    // iso-info flags selecting the same names
  bool sevenZip;          // 7z reads the same names (Joliet, else plain)
  uint32_t formats;       // name sets the image records
};

class Iso9660Oracle : public testing::TestWithParam<Case> {};

TEST_P(Iso9660Oracle, ListingsAndBytesAgree) {
  const Case &c = GetParam();
  const std::string image = tvxtest::MediaDir() + "/iso9660/" + c.image;
  const bool plain = c.mode == ISO9660_FORMAT_PLAIN;
  std::map<std::string, std::string> data;
  uint32_t formats = 0;
  EXPECT_EQ(Iso9660_ListFormats(image.c_str(), &formats), ISO9660_OK);
  EXPECT_EQ(formats, c.formats);
  Tree ours = Ours(image, c.mode, &data);
  ASSERT_GT(ours.size(), 10u);

  EXPECT_EQ(Fold(ours, plain), Fold(IsoInfo(image, c.isoInfo), plain)) << "iso-info " << c.isoInfo;

  // Bytes through iso-read, which looks paths up by Rock Ridge or translated
  // ISO names (not Joliet ones: 7z covers those). It
  // cannot follow relocated directories: files below them are compared by
  // listing only.
  int compared = 0;
  tvxtest::TempDir tmp;
  const bool isoRead = c.mode != ISO9660_FORMAT_JOLIET;
  std::string junk;
  for (const auto &[path, bytes] : data) {
    if (!isoRead || std::count(path.begin(), path.end(), '/') >= 8) continue;
    std::string out = tmp.Join("f" + std::to_string(compared));
    // iso-read finds some Rock Ridge files only by their translated ISO
    // name (lower case, no trailing dot); try that spelling second.
    auto read = [&](const std::string &p) {
      return tvxtest::RunArgv({"iso-read", "-i", image, "-e", "/" + p, "-o", out}, &junk) == 0;
    };
    ASSERT_TRUE(read(Fold(path, plain)) || read(Fold(path, true))) << path;
    EXPECT_EQ(tvxtest::ReadFileOrDie(out), bytes) << path;
    ++compared;
  }
  if (isoRead) {
    EXPECT_GT(compared, 8);
  }

  if (!c.sevenZip) return;
  // 7z's names, kinds and bytes, from what it extracts (level-1 names as
  // recorded, minus a trailing dot).
  ASSERT_EQ(tvxtest::RunArgv({"7z", "x", "-tiso", "-y", "-o" + tmp.Join("7z"), image}, &junk), 0);
  tvxtest::UdfTree theirs = tvxtest::HostTree(tmp.Join("7z"));
  Tree extracted;
  for (const auto &[path, bytes] : theirs.files) extracted[path] = {false, bytes.size()};
  for (const auto &dir : theirs.dirs) extracted[dir.first] = {true, 0};
  EXPECT_EQ(Fold(ours, plain), Fold(extracted, plain)) << "7z";
  for (const auto &[path, bytes] : data) {
    std::string name = plain && path.back() == '.' ? path.substr(0, path.size() - 1) : path;
    EXPECT_TRUE(theirs.files[name] == bytes) << "7z " << path;
  }
}

INSTANTIATE_TEST_SUITE_P(
    Images, Iso9660Oracle,
    testing::Values(Case{"rr-joliet.iso", 4, "", false, 7},
                    Case{"rr-joliet.iso", 2, "--no-rock-ridge", true, 7},
                    Case{"rr-relocated.iso", 4, "", false, 7},
                    Case{"joliet-only.iso", 2, "", true, 3},
                    Case{"plain-l1.iso", 1, "", true, 1}),
    [](const testing::TestParamInfo<Case> &param) {
      std::string n = param.param.image;
      n = n.substr(0, n.find('.')) + "_mode" + std::to_string(param.param.mode);
      for (char &ch : n) ch = std::isalnum(static_cast<unsigned char>(ch)) ? ch : '_';
      return n;
    });

}  // namespace
