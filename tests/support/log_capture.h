// Captures the library's log lines for the lifetime of the object, so tests
// can assert exact messages.
#pragma once

#include <string>
#include <vector>

#include "tvx_log.h"

namespace tvxtest {

class LogCapture {
 public:
  LogCapture();
  ~LogCapture();
  LogCapture(const LogCapture &) = delete;
  LogCapture &operator=(const LogCapture &) = delete;

  const std::vector<std::string> &Lines() const { return lines_; }
  std::string All() const;
  bool Contains(const std::string &text) const;
  void Clear() { lines_.clear(); }

 private:
  static void Sink(TvxLogLevel level, const char *text, void *ctx);
  std::vector<std::string> lines_;
};

// Path helpers from the test environment (set by CTest).
std::string SourceDir();  // the repository
std::string MediaDir();   // mastered test images
std::string ToolPath();   // the tvxguest command
// A fresh empty directory under the system temp dir, removed by the object.
class TempDir {
 public:
  TempDir();
  ~TempDir();
  TempDir(const TempDir &) = delete;
  TempDir &operator=(const TempDir &) = delete;
  const std::string &Path() const { return path_; }
  std::string Join(const std::string &name) const { return path_ + "/" + name; }

 private:
  std::string path_;
};

// Whole-file helpers for fixtures.
std::string ReadFileOrDie(const std::string &path);
void WriteFileOrDie(const std::string &path, const std::string &content);
// Take returns a malloc'd text the callee handed over ("<null>" for none)
// and frees it.
std::string Take(char *s);
// Bytes gives `n` bytes of a pattern that differs with `seed`.
std::string Bytes(size_t n, int seed = 0);

}  // namespace tvxtest
