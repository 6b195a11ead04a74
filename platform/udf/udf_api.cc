// The exported UDF_* calls: thin translation from handles to the reader.
#include <cstdlib>
#include <cstring>
#include <new>

#include "platform/udf/udf_internal.h"
#include "tvx_udf.h"

using tvx::udf::DirEntry;
using tvx::udf::LbAddr;
using tvx::udf::Node;
using tvx::udf::Status;
using tvx::udf::Volume;

struct UDFVolume {
  std::unique_ptr<Volume> vol;
};

struct UDFDir {
  UDFVolume *volume = nullptr;
  std::vector<LbAddr> chain;  // ICBs from the root down to this directory
  std::vector<DirEntry> entries;
  size_t next = 0;
  const DirEntry *last = nullptr;
};

struct UDFFile {
  UDFVolume *volume = nullptr;
  Node node;
};

namespace {

UDFVolume *OpenSource(tvx::BlockSourcePtr src) {
  if (src == nullptr) return nullptr;
  auto vol = std::make_unique<Volume>(std::move(src));
  if (vol->Mount() != Status::kOk) return nullptr;
  return new UDFVolume{std::move(vol)};
}

// ChainFor returns the ICB chain a lookup starts from: the directory's own,
// or the root's.
std::vector<LbAddr> ChainFor(UDFVolume *volume, UDFDir *dir) {
  if (dir != nullptr) return dir->chain;
  return {volume->vol->Root()};
}

bool IsReadableFile(uint8_t fileType) {
  // Unspecified (0), regular (5) and real-time (249) files hold plain data;
  // every other type is a directory, a link, a device or the volume's own.
  return fileType == 0 || fileType == 5 || fileType == 249;
}

const DirEntry *FindEntry(const UDFDir *dir, const char *name) {
  for (const DirEntry &e : dir->entries) {
    if (e.usable && e.name == name) return &e;
  }
  return nullptr;
}

}  // namespace

extern "C" {

TVX_EXPORT UDFVolume *UDF_Open(const char *path) {
  try {
    return OpenSource(tvx::OpenFileSource(path));
  } catch (...) {
    return nullptr;
  }
}

TVX_EXPORT UDFVolume *UDF_OpenWithReader(UDFReadCB readCB, UDFCloseCB closeCB, void *handle) {
  try {
    if (readCB == nullptr) {
      if (closeCB != nullptr) closeCB(handle);
      return nullptr;
    }
    // The source owns the handle from here: destroying it runs closeCB.
    return OpenSource(tvx::CallbackSource(readCB, closeCB, handle));
  } catch (...) {
    return nullptr;
  }
}

TVX_EXPORT void UDF_Close(UDFVolume *volume) { delete volume; }

TVX_EXPORT char *UDF_GetVolumeId(UDFVolume *volume) {
  if (volume == nullptr) return nullptr;
  return strdup(volume->vol->VolumeId().c_str());
}

TVX_EXPORT UDFDir *UDF_OpenDir(UDFVolume *volume, UDFDir *parent, const char *path) {
  if (volume == nullptr || path == nullptr) return nullptr;
  try {
    auto dir = std::make_unique<UDFDir>();
    dir->volume = volume;
    dir->chain = ChainFor(volume, parent);
    Node node;
    if (tvx::udf::Lookup(volume->vol.get(), &dir->chain, path, &node) != Status::kOk) {
      return nullptr;
    }
    if (tvx::udf::ReadDirectory(volume->vol.get(), node, &dir->entries) != Status::kOk) {
      return nullptr;
    }
    return dir.release();
  } catch (...) {
    return nullptr;
  }
}

TVX_EXPORT const char *UDF_ReadDir(UDFDir *dir, int flags) {
  (void)flags;
  if (dir == nullptr) return nullptr;
  while (dir->next < dir->entries.size()) {
    dir->last = &dir->entries[dir->next++];
    if (dir->last->usable) return dir->last->name.c_str();
  }
  dir->last = nullptr;
  return nullptr;
}

TVX_EXPORT Bool UDF_DirEntryIsDir(UDFDir *dir) {
  return dir != nullptr && dir->last != nullptr && dir->last->isDir ? TRUE : FALSE;
}

TVX_EXPORT uint64_t UDF_DirEntrySize(UDFDir *dir) {
  if (dir == nullptr || dir->last == nullptr) return UINT64_MAX;
  try {
    Node node;
    if (dir->volume->vol->LoadNode(dir->last->icb, &node) != Status::kOk) return UINT64_MAX;
    return node.size;
  } catch (...) {
    return UINT64_MAX;
  }
}

TVX_EXPORT void UDF_RewindDir(UDFDir *dir) {
  if (dir == nullptr) return;
  dir->next = 0;
  dir->last = nullptr;
}

TVX_EXPORT Bool UDF_CloseDir(UDFDir *dir) {
  if (dir == nullptr) return FALSE;
  delete dir;
  return TRUE;
}

TVX_EXPORT UDFFile *UDF_OpenFile(UDFVolume *volume, UDFDir *dir, const char *name) {
  if (volume == nullptr || name == nullptr) return nullptr;
  try {
    auto file = std::make_unique<UDFFile>();
    file->volume = volume;
    if (dir != nullptr && std::strchr(name, '/') == nullptr) {
      // A plain name in an open directory: its listing is already in memory,
      // which keeps probing many names cheap.
      const DirEntry *e = FindEntry(dir, name);
      if (e == nullptr || volume->vol->LoadNode(e->icb, &file->node) != Status::kOk) {
        return nullptr;
      }
    } else {
      std::vector<LbAddr> chain = ChainFor(volume, dir);
      if (tvx::udf::Lookup(volume->vol.get(), &chain, name, &file->node) != Status::kOk) {
        return nullptr;
      }
    }
    if (!IsReadableFile(file->node.fileType)) return nullptr;
    return file.release();
  } catch (...) {
    return nullptr;
  }
}

TVX_EXPORT uint64_t UDF_GetFileSize(UDFVolume *volume, UDFFile *file) {
  if (volume == nullptr || file == nullptr) return UINT64_MAX;
  return file->node.size;
}

TVX_EXPORT Bool UDF_PReadFile(UDFFile *file, void *buffer, uint64_t offset, size_t length) {
  if (file == nullptr || (buffer == nullptr && length != 0)) return FALSE;
  try {
    return file->volume->vol->ReadNode(file->node, offset, buffer, length) == Status::kOk
               ? TRUE
               : FALSE;
  } catch (...) {
    return FALSE;
  }
}

TVX_EXPORT void UDF_CloseFile(UDFFile *file) { delete file; }

TVX_EXPORT int UDF_ListTree(UDFVolume *volume, const char *path, Bool recursive,
                            UDFTreeCB callback, void *ctx) {
  if (volume == nullptr || callback == nullptr) return UDF_TREE_ERR_ARGUMENT;
  try {
    auto tree = tvx::udf::NewTreeSource(volume->vol.get());
    return tvx::media::ResultCode(
        tvx::media::ListTree(*tree, path != nullptr ? path : "", recursive != 0, callback, ctx));
  } catch (...) {
    return UDF_TREE_ERR_IO;
  }
}

TVX_EXPORT int UDF_Extract(UDFVolume *volume, const char *pathInImage, const char *destDir) {
  if (volume == nullptr || destDir == nullptr || destDir[0] == '\0') return UDF_TREE_ERR_ARGUMENT;
  try {
    auto tree = tvx::udf::NewTreeSource(volume->vol.get());
    return tvx::media::ResultCode(tvx::media::ExtractTree(
        *tree, pathInImage != nullptr ? pathInImage : "", destDir));
  } catch (...) {
    return UDF_TREE_ERR_IO;
  }
}

}  // extern "C"
