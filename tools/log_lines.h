// LogLines collects the library's log lines while it lives, so a command can
// explain a failure in its own report. With -v the lines also go to standard
// error as they arrive. One at a time: it holds the process-wide log sink and
// gives it back when it ends.
#pragma once

#include <cstdio>
#include <string>
#include <vector>

namespace tvxcli {

class LogLines {
 public:
  LogLines();
  ~LogLines();
  LogLines(const LogLines &) = delete;
  LogLines &operator=(const LogLines &) = delete;

  const std::vector<std::string> &Lines() const { return lines; }
  // Print writes each line, indented, to `out`.
  void Print(std::FILE *out) const;
  bool Contains(const char *text) const;

  // The lines so far, without their final newline; a command may add its own.
  std::vector<std::string> lines;
};

}  // namespace tvxcli
