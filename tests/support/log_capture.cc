#include "support/log_capture.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <unistd.h>

namespace tvxtest {

LogCapture::LogCapture() { Tvx_SetLogSink(&LogCapture::Sink, this); }
LogCapture::~LogCapture() { Tvx_SetLogSink(nullptr, nullptr); }

void LogCapture::Sink(TvxLogLevel, const char *text, void *ctx) {
  static_cast<LogCapture *>(ctx)->lines_.emplace_back(text);
}

std::string LogCapture::All() const {
  std::string all;
  for (const auto &l : lines_) all += l;
  return all;
}

bool LogCapture::Contains(const std::string &text) const {
  for (const auto &l : lines_) {
    if (l.find(text) != std::string::npos) return true;
  }
  return false;
}

static std::string Env(const char *name, const char *fallback) {
  const char *v = std::getenv(name);
  return v != nullptr ? v : fallback;
}

#ifndef TVX_TEST_SOURCE_DIR
#define TVX_TEST_SOURCE_DIR "."
#define TVX_TEST_MEDIA_DIR "test-media"
#define TVX_TEST_TOOL "tvxguest"
#endif

std::string SourceDir() { return Env("TVX_SOURCE_DIR", TVX_TEST_SOURCE_DIR); }
std::string MediaDir() { return Env("TVX_MEDIA_DIR", TVX_TEST_MEDIA_DIR); }
std::string ToolPath() { return Env("TVX_TOOL", TVX_TEST_TOOL); }

TempDir::TempDir() {
  std::string tmpl = (std::filesystem::temp_directory_path() / "tvxtest-XXXXXX").string();
  if (mkdtemp(tmpl.data()) == nullptr) throw std::runtime_error("mkdtemp failed");
  path_ = tmpl;
}

TempDir::~TempDir() {
  std::error_code ec;
  std::filesystem::remove_all(path_, ec);
}

std::string ReadFileOrDie(const std::string &path) {
  std::ifstream in(path, std::ios::binary);
  if (!in) throw std::runtime_error("cannot read " + path);
  std::ostringstream ss;
  ss << in.rdbuf();
  return ss.str();
}

void WriteFileOrDie(const std::string &path, const std::string &content) {
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  if (!out) throw std::runtime_error("cannot write " + path);
  out << content;
}

std::string Take(char *s) {
  std::string out = s != nullptr ? s : "<null>";
  std::free(s);
  return out;
}

std::string Bytes(size_t n, int seed) {
  std::string s(n, '\0');
  for (size_t i = 0; i < n; i++) s[i] = static_cast<char>((i * 31 + static_cast<size_t>(seed)) % 251);
  return s;
}

}  // namespace tvxtest
