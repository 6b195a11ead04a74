// Independent checks of FAT images: dosfstools' fsck.fat and mtools, run
// with an argument vector (no shell).
#pragma once

#include <set>
#include <string>
#include <vector>

#include "tvx_fat.h"

namespace tvxtest {

// RunArgv runs argv[0] (searched in PATH) with standard output and error
// captured into `out`; returns its exit status, -1 when it could not run.
int RunArgv(const std::vector<std::string> &argv, std::string *out);

// FatProblems returns "" when `fsck.fat -n` finds the image clean, else its
// report. fsck.fat exits 0 for some findings (long-name trouble among them),
// so its words are read too.
std::string FatProblems(const std::string &image);

// MtoolsNames lists the root directory's entries as mdir shows them (long
// names where there are), directories with a trailing "/".
std::set<std::string> MtoolsNames(const std::string &image);

// MtoolsRead copies one root file out with mcopy; false when mcopy fails.
bool MtoolsRead(const std::string &image, const std::string &name, std::string *data);

// MtoolsWrite copies `data` into the image's root as `name` with mcopy.
bool MtoolsWrite(const std::string &image, const std::string &name, const std::string &data);

// TestFloppy holds a volume and its root directory: a new 1.44 MB floppy or
// an existing image. Close (or the destructor) writes it back.
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
