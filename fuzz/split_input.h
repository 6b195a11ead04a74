// SplitAtNul cuts a fuzz input into `N` texts at its first N-1 NUL bytes
// (later NULs stay in the last text), so one input can feed several parsers.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>

template <size_t N>
std::array<std::string, N> SplitAtNul(const uint8_t *data, size_t size) {
  std::array<std::string, N> parts;
  size_t part = 0;
  for (size_t i = 0; i < size; i++) {
    if (data[i] == 0 && part + 1 < N) {
      part++;
    } else {
      parts[part] += static_cast<char>(data[i]);
    }
  }
  return parts;
}
