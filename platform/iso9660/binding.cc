// The exported Iso9660_* calls: argument checks, handle bookkeeping and the
// translation of the reader's nodes into Iso9660DirEntry records. Nothing
// here parses image bytes.
#include <cstdlib>
#include <cstring>
#include <new>
#include <unordered_map>

#include "tvx_iso9660.h"
#include "platform/iso9660/image.h"
#include "platform/iso9660/names.h"

using tvx::iso9660::FileReader;
using tvx::iso9660::Image;
using tvx::iso9660::ListingPtr;
using tvx::iso9660::Node;

struct Iso9660Dir {
  ListingPtr listing;
  size_t pos = 0;
};

struct Iso9660File {
  explicit Iso9660File(Node node) : reader(std::move(node)) {}
  FileReader reader;
};

struct Iso9660Image {
  std::unique_ptr<Image> image;
  std::unordered_map<Iso9660Dir *, std::unique_ptr<Iso9660Dir>> dirs;
  std::unordered_map<Iso9660File *, std::unique_ptr<Iso9660File>> files;
};

namespace {

// Ties an entry record to the node it was filled from, so that a record that
// was not (or no longer is) one of ours is refused rather than misread.
constexpr uint64_t kEntryTag = 0x49534f3936363021ull;

uint64_t EntryCheck(const Node &n) {
  return kEntryTag ^ n.extents.front().offset ^ (n.size << 1) ^ n.name.size();
}

void FillEntry(const ListingPtr &listing, size_t index, Iso9660DirEntry *entry) {
  const Node &n = listing->nodes[index];
  std::memset(entry, 0, sizeof *entry);
  std::string name = tvx::iso9660::TruncateUtf8(n.name, sizeof entry->name - 1);
  std::memcpy(entry->name, name.data(), name.size());
  entry->size64 = n.size;
  entry->size = n.size > UINT32_MAX ? UINT32_MAX : static_cast<uint32_t>(n.size);
  entry->isDirectory = n.isDir ? TRUE : FALSE;
  entry->priv[0] = listing->where.offset;
  entry->priv[1] = listing->where.length;
  entry->priv[2] = index + 1;
  entry->priv[3] = EntryCheck(n);
}

int NodeOfEntry(Image &image, const Iso9660DirEntry *entry, Node *out) {
  if (entry->priv[0] == 0 && entry->priv[1] == 0 && entry->priv[2] == 0 && entry->priv[3] == 0) {
    // A record the caller filled with only a name: the name is a path.
    const char *end = static_cast<const char *>(std::memchr(entry->name, '\0', sizeof entry->name));
    if (end == nullptr) return ISO9660_ERR_ARGUMENT;
    return image.Resolve(std::string_view(entry->name, end - entry->name), out);
  }
  Node dir;
  dir.isDir = true;
  dir.extents.push_back({entry->priv[0], entry->priv[1]});
  ListingPtr listing;
  int rc = image.List(dir, &listing);
  if (rc != ISO9660_OK) return ISO9660_ERR_ARGUMENT;
  uint64_t index = entry->priv[2];
  if (index == 0 || index > listing->nodes.size()) return ISO9660_ERR_ARGUMENT;
  const Node &n = listing->nodes[index - 1];
  if (EntryCheck(n) != entry->priv[3]) return ISO9660_ERR_ARGUMENT;
  *out = n;
  return ISO9660_OK;
}

int OpenImage(tvx::BlockSourcePtr src, uint32_t mode, Iso9660Image **out_image) {
  std::unique_ptr<Image> image;
  int rc = Image::Open(std::move(src), mode, &image);
  if (rc != ISO9660_OK) return rc;
  auto handle = std::make_unique<Iso9660Image>();
  handle->image = std::move(image);
  *out_image = handle.release();
  return ISO9660_OK;
}

const char *PathOrRoot(const char *path) { return path == nullptr ? "" : path; }

}  // namespace

extern "C" {

TVX_EXPORT int Iso9660_ListFormats(const char *path, uint32_t *inout_formats) {
  if (path == nullptr || inout_formats == nullptr) return ISO9660_ERR_ARGUMENT;
  try {
    tvx::BlockSourcePtr src = tvx::OpenFileSource(path);
    if (src == nullptr) return ISO9660_ERR_IO;
    tvx::iso9660::VolumeFacts facts;
    int rc = tvx::iso9660::ReadVolume(*src, &facts);
    if (rc != ISO9660_OK) return rc;
    *inout_formats = facts.formats;
    return ISO9660_OK;
  } catch (...) {
    return ISO9660_ERR_IO;
  }
}

TVX_EXPORT int Iso9660_Open(const char *path, uint32_t mode, Iso9660Image **out_image) {
  if (out_image == nullptr) return ISO9660_ERR_ARGUMENT;
  *out_image = nullptr;
  if (path == nullptr) return ISO9660_ERR_ARGUMENT;
  try {
    tvx::BlockSourcePtr src = tvx::OpenFileSource(path);
    if (src == nullptr) return ISO9660_ERR_IO;
    return OpenImage(std::move(src), mode, out_image);
  } catch (...) {
    return ISO9660_ERR_IO;
  }
}

TVX_EXPORT int Iso9660_OpenWithReader(Iso9660ReadCB readCB, Iso9660CloseCB closeCB,
                                      void *handle, uint32_t mode, Iso9660Image **out_image) {
  if (out_image == nullptr) return ISO9660_ERR_ARGUMENT;
  *out_image = nullptr;
  if (readCB == nullptr) return ISO9660_ERR_ARGUMENT;
  try {
    // Until the image opens, the handle stays the caller's: the source is
    // built without the close callback and gets it only on success.
    tvx::BlockSourcePtr probe = tvx::CallbackSource(readCB, nullptr, handle);
    tvx::iso9660::VolumeFacts facts;
    int rc = tvx::iso9660::ReadVolume(*probe, &facts);
    if (rc != ISO9660_OK) return rc;
    probe.reset();
    return OpenImage(tvx::CallbackSource(readCB, closeCB, handle), mode, out_image);
  } catch (...) {
    return ISO9660_ERR_IO;
  }
}

TVX_EXPORT int Iso9660_Close(Iso9660Image *image) {
  if (image == nullptr) return ISO9660_ERR_ARGUMENT;
  delete image;  // handles first, then the image and its source (closeCB)
  return ISO9660_OK;
}

TVX_EXPORT char *Iso9660_GetVolumeId(Iso9660Image *image) {
  if (image == nullptr) return nullptr;
  return strdup(image->image->VolumeId().c_str());
}

TVX_EXPORT int Iso9660_OpenDir(Iso9660Image *image, const char *path, Iso9660Dir **out_dir) {
  if (out_dir == nullptr) return ISO9660_ERR_ARGUMENT;
  *out_dir = nullptr;
  if (image == nullptr) return ISO9660_ERR_ARGUMENT;
  try {
    Node node;
    int rc = image->image->Resolve(PathOrRoot(path), &node);
    if (rc != ISO9660_OK) return rc;
    if (!node.isDir) return ISO9660_ERR_NOT_DIR;
    auto dir = std::make_unique<Iso9660Dir>();
    rc = image->image->List(node, &dir->listing);
    if (rc != ISO9660_OK) return rc;
    Iso9660Dir *raw = dir.get();
    image->dirs.emplace(raw, std::move(dir));
    *out_dir = raw;
    return ISO9660_OK;
  } catch (...) {
    return ISO9660_ERR_IO;
  }
}

TVX_EXPORT int Iso9660_ReadDir(Iso9660Image *image, Iso9660Dir *dir, Iso9660DirEntry *entry) {
  if (image == nullptr || dir == nullptr || entry == nullptr || image->dirs.count(dir) == 0) {
    return ISO9660_ERR_ARGUMENT;
  }
  try {
    if (dir->pos >= dir->listing->nodes.size()) return ISO9660_END;
    FillEntry(dir->listing, dir->pos++, entry);
    return ISO9660_OK;
  } catch (...) {
    return ISO9660_ERR_IO;
  }
}

TVX_EXPORT int Iso9660_RewindDir(Iso9660Image *image, Iso9660Dir *dir) {
  if (image == nullptr || dir == nullptr || image->dirs.count(dir) == 0) {
    return ISO9660_ERR_ARGUMENT;
  }
  dir->pos = 0;
  return ISO9660_OK;
}

TVX_EXPORT int Iso9660_CloseDir(Iso9660Image *image, Iso9660Dir *dir) {
  if (image == nullptr || dir == nullptr) return ISO9660_ERR_ARGUMENT;
  return image->dirs.erase(dir) == 1 ? ISO9660_OK : ISO9660_ERR_ARGUMENT;
}

TVX_EXPORT int Iso9660_OpenFile(Iso9660Image *image, const Iso9660DirEntry *entry,
                                Iso9660File **out_file) {
  if (out_file == nullptr) return ISO9660_ERR_ARGUMENT;
  *out_file = nullptr;
  if (image == nullptr || entry == nullptr) return ISO9660_ERR_ARGUMENT;
  try {
    Node node;
    int rc = NodeOfEntry(*image->image, entry, &node);
    if (rc != ISO9660_OK) return rc;
    if (node.isDir) return ISO9660_ERR_IS_DIR;
    rc = image->image->CheckExtents(node);
    if (rc != ISO9660_OK) return rc;
    auto file = std::make_unique<Iso9660File>(std::move(node));
    Iso9660File *raw = file.get();
    image->files.emplace(raw, std::move(file));
    *out_file = raw;
    return ISO9660_OK;
  } catch (...) {
    return ISO9660_ERR_IO;
  }
}

TVX_EXPORT int Iso9660_ReadFile(Iso9660Image *image, Iso9660File *file, void *buffer,
                                size_t *inout_length) {
  if (inout_length == nullptr) return ISO9660_ERR_ARGUMENT;
  if (image == nullptr || file == nullptr || buffer == nullptr || image->files.count(file) == 0) {
    *inout_length = 0;
    return ISO9660_ERR_ARGUMENT;
  }
  try {
    return file->reader.Read(*image->image, buffer, inout_length);
  } catch (...) {
    *inout_length = 0;
    return ISO9660_ERR_IO;
  }
}

TVX_EXPORT int Iso9660_CloseFile(Iso9660Image *image, Iso9660File *file) {
  if (image == nullptr || file == nullptr) return ISO9660_ERR_ARGUMENT;
  return image->files.erase(file) == 1 ? ISO9660_OK : ISO9660_ERR_ARGUMENT;
}

TVX_EXPORT int Iso9660_Extract(Iso9660Image *image, const char *pathInImage,
                               const char *destDir) {
  if (image == nullptr || destDir == nullptr || destDir[0] == '\0') return ISO9660_ERR_ARGUMENT;
  try {
    auto tree = tvx::iso9660::NewTreeSource(*image->image);
    return tvx::media::ResultCode(
        tvx::media::ExtractTree(*tree, PathOrRoot(pathInImage), destDir));
  } catch (...) {
    return ISO9660_ERR_IO;
  }
}

TVX_EXPORT int Iso9660_ExtractFileEx(Iso9660Image *image, const char *pathInImage,
                                     const char *targetPath) {
  if (image == nullptr || pathInImage == nullptr || targetPath == nullptr ||
      targetPath[0] == '\0') {
    return ISO9660_ERR_ARGUMENT;
  }
  try {
    auto tree = tvx::iso9660::NewTreeSource(*image->image);
    return tvx::media::ResultCode(tvx::media::ExtractFile(*tree, pathInImage, targetPath));
  } catch (...) {
    return ISO9660_ERR_IO;
  }
}

TVX_EXPORT int Iso9660_ListTree(Iso9660Image *image, const char *path, Bool recursive,
                                Iso9660TreeCB callback, void *ctx) {
  if (image == nullptr || callback == nullptr) return ISO9660_ERR_ARGUMENT;
  try {
    auto tree = tvx::iso9660::NewTreeSource(*image->image);
    return tvx::media::ResultCode(
        tvx::media::ListTree(*tree, PathOrRoot(path), recursive != 0, callback, ctx));
  } catch (...) {
    return ISO9660_ERR_IO;
  }
}

}  // extern "C"
