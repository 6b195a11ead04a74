#include "support/fat_oracle.h"

#include <cstdlib>
#include <cstdio>

#include "support/log_capture.h"
#include "support/run_argv.h"

namespace tvxtest {

namespace {

// mtools refuses images whose geometry it doubts unless told not to; every
// mtools run of the test process (here and in the tests) wants that.
[[maybe_unused]] const int kMtoolsSkipCheck = setenv("MTOOLS_SKIP_CHECK", "1", 1);

}  // namespace

std::string FatProblems(const std::string &image) {
  std::string out;
  int status = RunArgv({"fsck.fat", "-n", image}, &out, {.withStderr = true});
  bool clean = status == 0;
  for (const char *bad : {"ong file", "rror", "ree cluster", "Fix", "Unrecover", "orrect",
                          "Duplicate", "Bad", "claimed", "truncat"}) {
    clean = clean && out.find(bad) == std::string::npos;
  }
  return clean ? "" : "fsck.fat exit " + std::to_string(status) + ":\n" + out;
}

std::set<std::string> MtoolsNames(const std::string &image) {
  std::string out;
  std::set<std::string> names;
  if (RunArgv({"mdir", "-b", "-i", image, "::/"}, &out, {.withStderr = true}) != 0) return names;
  size_t start = 0;
  while (start < out.size()) {
    size_t end = out.find('\n', start);
    std::string line = out.substr(start, end == std::string::npos ? std::string::npos : end - start);
    start = end == std::string::npos ? out.size() : end + 1;
    if (line.rfind("::/", 0) == 0) names.insert(line.substr(3));
  }
  return names;
}

bool MtoolsRead(const std::string &image, const std::string &name, std::string *data) {
  TempDir t;
  std::string path = t.Join("out"), log;
  if (RunArgv({"mcopy", "-n", "-i", image, "::/" + name, path}, &log, {.withStderr = true}) != 0) return false;
  *data = ReadFileOrDie(path);
  return true;
}

bool MtoolsWrite(const std::string &image, const std::string &name, const std::string &data) {
  TempDir t;
  std::string path = t.Join("in"), log;
  WriteFileOrDie(path, data);
  return RunArgv({"mcopy", "-o", "-i", image, path, "::/" + name}, &log, {.withStderr = true}) == 0;
}

unsigned long TestFloppy::Open(const std::string &path, bool format) {
  FATDevice *dev = FATDevFileIO_Open(path.c_str());
  unsigned long rc = format ? FAT_FormatVolume(dev, FAT_FLOPPY_SIZE, 0, &vol) : FAT_OpenVolume(dev, &vol);
  if (rc == FAT_OK) rc = FAT_SkipVolumeBoot(vol);
  return rc == FAT_OK ? FAT_OpenRootDirectory(vol, &root) : rc;
}

void TestFloppy::Close() {
  FAT_CloseDirectory(root);
  FAT_CloseVolume(vol);
  root = nullptr;
  vol = nullptr;
}

}  // namespace tvxtest
