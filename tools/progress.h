// A progress bar for long operations: drawn on standard error when that is a
// terminal, silent otherwise or when the caller asks for quiet.
//
//   Progress bar("verifying", imageSize, quiet);
//   for (...) { ...; bar.Update(done); }
//   bar.Finish();  // also done by the destructor
#pragma once

#include <cstdint>
#include <string>

namespace tvxcli {

class Progress {
 public:
  Progress(const char *label, uint64_t total, bool quiet);
  ~Progress();
  Progress(const Progress &) = delete;
  Progress &operator=(const Progress &) = delete;

  // Update shows `done` of the total; it redraws only when the shown
  // percentage changes, so calling it per block costs nothing.
  void Update(uint64_t done);
  // Finish removes the bar, leaving the line empty for what follows.
  void Finish();
  bool Active() const { return active_; }

 private:
  std::string label_;
  uint64_t total_;
  bool active_;
  int shown_ = -1;
};

}  // namespace tvxcli
