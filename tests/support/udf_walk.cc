#include "support/udf_walk.h"

#include <cstring>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <vector>

namespace tvxtest {

namespace {

struct MemImage {
  std::vector<uint8_t> bytes;
  int *closes;
};
Bool ReadMem(void *h, void *buf, size_t len, uint64_t off) {
  const std::vector<uint8_t> &b = static_cast<MemImage *>(h)->bytes;
  if (off > b.size() || len > b.size() - off) return FALSE;
  std::memcpy(buf, b.data() + off, len);
  return TRUE;
}
Bool CloseMem(void *h) {
  auto *m = static_cast<MemImage *>(h);
  if (m->closes != nullptr) ++*m->closes;
  delete m;
  return TRUE;
}

void WalkDir(UDFVolume *volume, const std::string &prefix, UdfTree *tree, int depth) {
  UDFDir *dir = UDF_OpenDir(volume, nullptr, prefix.c_str());
  if (dir == nullptr) {
    tree->failures++;
    return;
  }
  std::vector<std::pair<std::string, bool>> entries;
  while (const char *name = UDF_ReadDir(dir, 0)) entries.emplace_back(name, UDF_DirEntryIsDir(dir));
  UDF_CloseDir(dir);
  for (const auto &[name, isDir] : entries) {
    std::string path = prefix.empty() ? name : prefix + "/" + name;
    if (isDir) {
      tree->dirs[path] = true;
      if (depth < 300) WalkDir(volume, path, tree, depth + 1);
      continue;
    }
    UDFFile *file = UDF_OpenFile(volume, nullptr, path.c_str());
    if (file == nullptr) {
      tree->failures++;
      continue;
    }
    uint64_t size = UDF_GetFileSize(volume, file);
    std::string data;
    bool ok = size <= (64u << 20);
    if (ok) {
      data.resize(size);
      ok = UDF_PReadFile(file, data.data(), 0, data.size());
    }
    UDF_CloseFile(file);
    if (ok) {
      tree->files[path] = data;
    } else {
      tree->failures++;
    }
  }
}

}  // namespace

UDFVolume *OpenUdfBytes(const std::vector<uint8_t> &image, int *closes) {
  return UDF_OpenWithReader(ReadMem, CloseMem, new MemImage{image, closes});
}

UdfTree WalkUdf(UDFVolume *volume) {
  UdfTree tree;
  WalkDir(volume, "", &tree, 0);
  return tree;
}

UdfTree WalkUdfImage(const std::string &path, bool *opened) {
  UDFVolume *volume = UDF_Open(path.c_str());
  *opened = volume != nullptr;
  if (volume == nullptr) return {};
  UdfTree tree = WalkUdf(volume);
  UDF_Close(volume);
  return tree;
}

UdfTree HostTree(const std::string &dir) {
  UdfTree tree;
  for (const auto &e : std::filesystem::recursive_directory_iterator(dir)) {
    std::string rel = std::filesystem::relative(e.path(), dir).string();
    if (e.is_directory()) {
      tree.dirs[rel] = true;
    } else {
      std::ostringstream bytes;
      bytes << std::ifstream(e.path(), std::ios::binary).rdbuf();
      tree.files[rel] = bytes.str();
    }
  }
  return tree;
}

}  // namespace tvxtest
