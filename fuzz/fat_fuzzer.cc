// FAT volumes from arbitrary image bytes: open, list the root directory, read
// every file, then edit: cut and grow files, delete one, add one until the
// volume is full, and open the written image again. Nothing may crash or
// loop, whatever the chains and directory entries say.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include <unistd.h>

#include "tvx_fat.h"

namespace {

std::vector<std::string> ReadAll(FATDirectory *root) {
  std::vector<std::string> files;
  FATDirIter *it = nullptr;
  if (FAT_GetDirIter(root, &it) != FAT_OK) return files;
  for (int entries = 0; FAT_DirIterNext(it) == FAT_OK && entries < 100000; entries++) {
    char *name = nullptr;
    uint64_t size = 0;
    FAT_DirIterGetName(it, &name);
    FAT_DirIterGetSize(it, &size);
    if (name != nullptr && !FAT_DirIterIsDir(it)) files.push_back(name);
    std::free(name);
  }
  for (const std::string &name : files) {
    FATFile *file = nullptr;
    if (FAT_OpenFile(root, name.c_str(), &file) != FAT_OK) continue;
    char buf[4096];
    size_t n = 0;
    for (uint64_t at = 0; FAT_ReadFile(file, at, buf, sizeof buf, &n) == FAT_OK && n > 0; at += n) {
    }
    FAT_CloseFile(file);
  }
  return files;
}

void Edit(FATDirectory *root, const std::vector<std::string> &files) {
  for (const std::string &name : files) {
    FATFile *file = nullptr;
    if (FAT_OpenFile(root, name.c_str(), &file) != FAT_OK) continue;
    uint64_t size = FAT_GetFileSize(file);
    size_t written = 0;
    FAT_SetFileSize(file, size / 2);
    FAT_WriteFile(file, size / 2 + 700, "grow", 4, &written);
    FAT_CloseFile(file);
  }
  if (!files.empty()) FAT_DeleteFile(root, files.front().c_str());
  FATFile *added = nullptr;
  if (FAT_CreateFile(root, "A Fuzzed Name.txt", &added) == FAT_OK) {
    static const std::string block(512, 'z');
    size_t written = 0;
    for (uint64_t at = 0; at < (1u << 20); at += written) {
      if (FAT_WriteFile(added, at, block.data(), block.size(), &written) != FAT_OK) break;
    }
    FAT_CloseFile(added);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size > 262144) return 0;
  static const std::string path = "/tmp/tvx_fat_fuzz_" + std::to_string(getpid()) + ".img";
  FILE *f = std::fopen(path.c_str(), "wb");
  if (f == nullptr) return 0;
  std::fwrite(data, 1, size, f);
  std::fclose(f);
  for (int round = 0; round < 2; round++) {
    FATVolume *vol = nullptr;
    if (FAT_OpenVolume(FATDevFileIO_Open(path.c_str()), &vol) != FAT_OK) break;
    uint64_t free = 0;
    FAT_GetFreeBytes(vol, &free);
    FATDirectory *root = nullptr;
    if (FAT_OpenRootDirectory(vol, &root) == FAT_OK) {
      std::vector<std::string> files = ReadAll(root);
      if (round == 0) Edit(root, files);
      FAT_CloseDirectory(root);
    }
    FAT_CloseVolume(vol);
  }
  return 0;
}
