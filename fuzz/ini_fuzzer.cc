// Fuzzes the INI writer and reader together. Input layout:
//   byte 0   flags: bit 0 quoted; bits 1-7 the body's repeats: 1 to 4, or
//            (values 126, 127) up to just below / just above the size limit
//   then     section NUL key NUL value NUL, then the file body
// Properties checked on every input:
//  - a refused write leaves the file byte for byte as it was;
//  - an accepted write stays within the output limit, changes one region of
//    at most one old line into at most three new lines, reads back as the
//    reading rules say (allowing for the clip of an over-long line), and
//    writing the same value again changes nothing;
//  - no temporary file is left behind.
#include <dirent.h>
#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>

#include "tvx_ini.h"

namespace {

constexpr size_t kMaxInput = 64 * 1024;
constexpr size_t kOutputBuffer = 0x80000;
constexpr size_t kCollectLimit = 0x7F800;

const std::string &WorkDir() {
  static std::string dir = [] {
    // tmpfs makes the writer's fsync calls cheap.
    char shm[] = "/dev/shm/ini_fuzzer_XXXXXX", tmp[] = "/tmp/ini_fuzzer_XXXXXX";
    char *tmpl = mkdtemp(shm) != nullptr ? shm : mkdtemp(tmp);
    if (tmpl == nullptr) std::abort();
    return std::string(tmpl);
  }();
  return dir;
}

std::string ReadAll(const std::string &path) {
  std::string s;
  FILE *f = std::fopen(path.c_str(), "rb");
  if (f == nullptr) std::abort();
  char buf[65536];
  size_t n;
  while ((n = std::fread(buf, 1, sizeof buf, f)) > 0) s.append(buf, n);
  std::fclose(f);
  return s;
}

void WriteAll(const std::string &path, const std::string &s) {
  FILE *f = std::fopen(path.c_str(), "wb");
  if (f == nullptr || std::fwrite(s.data(), 1, s.size(), f) != s.size()) std::abort();
  std::fclose(f);
}

size_t EntryCount(const std::string &dir) {
  size_t n = 0;
  DIR *d = opendir(dir.c_str());
  while (dirent *e = readdir(d)) n += e->d_name[0] != '.' || std::strlen(e->d_name) > 2;
  closedir(d);
  return n;
}

void Require(bool ok, const char *what) {
  if (!ok) {
    std::fprintf(stderr, "ini_fuzzer: property violated: %s\n", what);
    std::abort();
  }
}

// The reading rules, written out independently of the library.
std::string ReadBack(const std::string &written, bool quoted) {
  std::string s = quoted ? "\"" + written + "\"" : written;
  size_t semi = s.find(';');
  if (semi != std::string::npos) s.resize(semi);
  size_t b = s.find_first_not_of(" \t");
  if (b == std::string::npos) return "";
  size_t e = s.find_last_not_of(" \t\r\n");
  s = s.substr(b, e - b + 1);
  if (s.size() > 1023) s.resize(1023);
  if (s.size() >= 2 && s.front() == '"' && s.back() == '"') s = s.substr(1, s.size() - 2);
  return s;
}

size_t Count(std::string_view s, char c) {
  size_t n = 0;
  for (char x : s) n += x == c;
  return n;
}

bool NextField(const uint8_t *&p, const uint8_t *end, std::string *out) {
  const uint8_t *nul = static_cast<const uint8_t *>(std::memchr(p, 0, static_cast<size_t>(end - p)));
  if (nul == nullptr) return false;
  out->assign(reinterpret_cast<const char *>(p), static_cast<size_t>(nul - p));
  p = nul + 1;
  return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size < 1 || size > kMaxInput) return 0;
  bool quoted = data[0] & 1;
  unsigned mode = data[0] >> 1;
  const uint8_t *p = data + 1, *end = data + size;
  std::string section, key, value;
  if (!NextField(p, end, &section) || !NextField(p, end, &key) || !NextField(p, end, &value)) {
    return 0;
  }
  std::string body(reinterpret_cast<const char *>(p), static_cast<size_t>(end - p));
  std::string before;
  if (mode >= 126 && !body.empty()) {
    // Large files only on request, so that most runs stay fast.
    size_t target = mode == 126 ? kCollectLimit - body.size() : kCollectLimit;
    while (before.size() <= target) before += body;
  } else {
    for (unsigned i = 0; i <= (mode & 3); ++i) before += body;
  }

  const std::string &dir = WorkDir();
  std::string path = dir + "/t.ini";
  WriteAll(path, before);
  Bool ok = IniUtil_WriteIniFileString(path.c_str(), section.c_str(), key.c_str(), value.c_str(),
                                       quoted);
  std::string after = ReadAll(path);
  Require(EntryCount(dir) == 1, "temporary file left behind");
  if (!ok) {
    Require(after == before, "refused write changed the file");
    return 0;
  }
  Require(after.size() <= kOutputBuffer, "file grew past the output limit");

  // One contiguous region changed: at most one old line out, three lines in.
  size_t pre = 0, lim = std::min(before.size(), after.size());
  while (pre < lim && before[pre] == after[pre]) ++pre;
  size_t suf = 0;
  while (suf < lim - pre && before[before.size() - 1 - suf] == after[after.size() - 1 - suf]) {
    ++suf;
  }
  std::string_view removed(before.data() + pre, before.size() - pre - suf);
  std::string_view inserted(after.data() + pre, after.size() - pre - suf);
  Require(Count(removed, '\n') <= 1, "more than one old line changed");
  Require(removed.find('\n') == std::string_view::npos || removed.back() == '\n',
          "old lines changed across a line end");
  Require(Count(inserted, '\n') <= 3 && inserted.size() <= 2 * 1024 + 1,
          "more than the key's lines inserted");

  char buf[1024];
  std::memcpy(buf, "\x01untouched", 11);
  Require(IniUtil_GetIniFileString(path.c_str(), section.c_str(), key.c_str(), buf, sizeof buf),
          "written file does not read");
  bool match = false;
  for (size_t len = value.size() + 1; len-- > 0 && !match;) {
    match = ReadBack(value.substr(0, len), quoted) == buf;
  }
  Require(match, "value does not read back");

  // Near the size limit the first write may have pushed the file past it;
  // then the second is refused, which leaves the file as it is too.
  Bool again = IniUtil_WriteIniFileString(path.c_str(), section.c_str(), key.c_str(),
                                          value.c_str(), quoted);
  Require(again || after.size() > kCollectLimit, "second write refused");
  Require(ReadAll(path) == after, "second write of the same value changed the file");
  return 0;
}
