// Independent checks of FAT images: dosfstools' fsck.fat and mtools, run
// with an argument vector (no shell).
#pragma once

#include <set>
#include <string>
#include <vector>

#include "tvx_fat.h"

namespace tvxtest {

// FatProblems returns "" when `fsck.fat -n` finds the image clean, else its
// report. fsck.fat exits 0 for some findings (long-name trouble among them),
// so its words are read too.
std::string FatProblems(const std::string &image);

// MtoolsNames: the root directory's names as mdir shows them.
std::set<std::string> MtoolsNames(const std::string &image);

// MtoolsRead / MtoolsWrite copy one root file out or in with mcopy.
bool MtoolsRead(const std::string &image, const std::string &name, std::string *data);
bool MtoolsWrite(const std::string &image, const std::string &name, const std::string &data);

// TestFloppy: a new 1.44 MB floppy or an existing image, with its root.
struct TestFloppy {
  FATVolume *vol = nullptr;
  FATDirectory *root = nullptr;
  unsigned long Open(const std::string &path, bool format);
  void Close();
  ~TestFloppy() { Close(); }
};

// Bytes gives `n` bytes of a pattern that differs with `seed`.
std::string Bytes(size_t n, int seed);

}  // namespace tvxtest
