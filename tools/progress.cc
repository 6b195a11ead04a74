#include "progress.h"

#include <unistd.h>

#include <cstdio>

namespace tvxcli {

namespace {
constexpr int kWidth = 30;
}

Progress::Progress(const char *label, uint64_t total, bool quiet)
    : label_(label), total_(total), active_(!quiet && isatty(STDERR_FILENO) == 1) {}

Progress::~Progress() { Finish(); }

void Progress::Update(uint64_t done) {
  if (!active_) return;
  if (done > total_) done = total_;
  int percent = total_ == 0 ? 100 : static_cast<int>(done * 100 / total_);
  if (percent == shown_) return;
  shown_ = percent;
  char bar[kWidth + 1];
  int filled = percent * kWidth / 100;
  for (int i = 0; i < kWidth; i++) bar[i] = i < filled ? '#' : '.';
  bar[kWidth] = '\0';
  std::fprintf(stderr, "\r%s [%s] %3d%% %llu/%llu MiB", label_.c_str(), bar, percent,
               static_cast<unsigned long long>(done >> 20),
               static_cast<unsigned long long>(total_ >> 20));
  std::fflush(stderr);
}

void Progress::Finish() {
  if (!active_) return;
  if (shown_ >= 0) std::fprintf(stderr, "\r\033[K");
  std::fflush(stderr);
  active_ = false;
}

}  // namespace tvxcli
