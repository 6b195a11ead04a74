// Shared by the `tools` subcommands.
#pragma once

#include <cstdio>
#include <string>
#include <vector>

#include "command.h"
#include "tvx_log.h"

namespace tvxcli {

inline constexpr const char *kToolsGroup = "tools";

// LogLines collects the library's log lines while it lives (unless -v sends
// them to standard error), so a command can explain a failure.
class LogLines {
 public:
  LogLines();
  ~LogLines();
  LogLines(const LogLines &) = delete;
  LogLines &operator=(const LogLines &) = delete;
  void Print(FILE *out) const;
  bool Contains(const char *text) const;
  std::vector<std::string> lines;

 private:
  static void Sink(TvxLogLevel level, const char *text, void *ctx);
};

}  // namespace tvxcli
