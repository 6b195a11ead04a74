#include "log_lines.h"

#include "command.h"
#include "tvx_log.h"

namespace tvxcli {
namespace {

void Collect(TvxLogLevel level, const char *text, void *ctx) {
  if (Verbose()) VerboseLogSink(level, text, nullptr);
  std::string line(text);
  while (!line.empty() && line.back() == '\n') line.pop_back();
  static_cast<LogLines *>(ctx)->lines.push_back(line);
}

}  // namespace

LogLines::LogLines() { Tvx_SetLogSink(Collect, this); }

LogLines::~LogLines() { Tvx_SetLogSink(Verbose() ? VerboseLogSink : nullptr, nullptr); }

void LogLines::Print(std::FILE *out) const {
  for (const std::string &l : lines) std::fprintf(out, "  %s\n", l.c_str());
}

bool LogLines::Contains(const char *text) const {
  for (const std::string &l : lines) {
    if (l.find(text) != std::string::npos) return true;
  }
  return false;
}

}  // namespace tvxcli
