// FAT volumes from arbitrary image bytes: open, list the root directory, read
// every file, then add one file. Nothing may crash or loop.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <unistd.h>

#include "tvx_fat.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size > 262144) return 0;
  static std::string path = "/tmp/tvx_fat_fuzz_" + std::to_string(getpid()) + ".img";
  FILE *f = std::fopen(path.c_str(), "wb");
  if (f == nullptr) return 0;
  std::fwrite(data, 1, size, f);
  std::fclose(f);
  FATVolume *vol = nullptr;
  if (FAT_OpenVolume(FATDevFileIO_Open(path.c_str()), &vol) != FAT_OK) return 0;
  FATDirectory *root = nullptr;
  if (FAT_OpenRootDirectory(vol, &root) == FAT_OK) {
    FATDirIter *it = nullptr;
    FAT_GetDirIter(root, &it);
    int entries = 0;
    while (FAT_DirIterNext(it) == FAT_OK && entries++ < 100000) {
      char *name = nullptr;
      FAT_DirIterGetName(it, &name);
      FATFile *file = nullptr;
      if (!FAT_DirIterIsDir(it) && FAT_OpenFile(root, name, &file) == FAT_OK) {
        char buf[4096];
        size_t n = 0;
        for (uint64_t at = 0; FAT_ReadFile(file, at, buf, sizeof buf, &n) == FAT_OK && n > 0; at += n) {
        }
        FAT_CloseFile(file);
      }
      std::free(name);
    }
    FATFile *added = nullptr;
    if (FAT_CreateFile(root, "A Fuzzed Name.txt", &added) == FAT_OK) {
      size_t written = 0;
      FAT_WriteFile(added, 100, "data", 4, &written);
      FAT_CloseFile(added);
    }
    FAT_CloseDirectory(root);
  }
  FAT_CloseVolume(vol);
  return 0;
}
