// A sparse extent begins with a 512-byte header: magic "KDMV", version,
// flags, capacity, grain size, then the descriptor's offset and size, both in
// 512-byte sectors (little-endian 64-bit at bytes 28 and 36). The descriptor
// is text: "# Disk DescriptorFile", extent lines, and the disk database as
// ddb.name = "value" lines.
#include "platform/disklib.h"

#include <cstring>
#include <map>
#include <string>
#include <string_view>

#include "platform/ascii.h"
#include "platform/endian.h"
#include "platform/fileio.h"
#include "platform/util.h"

struct DiskLibHandle {
  std::map<std::string, std::string> ddb;  // names lower-cased, without "ddb."
};

namespace {

constexpr uint64_t kSector = 512;
constexpr size_t kDescriptorOffsetField = 28;
constexpr size_t kDescriptorSizeField = 36;
// Descriptors are a few hundred bytes; a claim of more is a damaged header.
constexpr uint64_t kMaxDescriptor = 1u << 20;
constexpr char kDescriptorMagic[] = "# Disk DescriptorFile";


// ParseDdb collects the ddb.* lines; other lines of the descriptor are of no
// interest here and are skipped whatever they hold.
void ParseDdb(const std::string &text, std::map<std::string, std::string> *out) {
  size_t pos = 0;
  while (pos < text.size()) {
    size_t end = text.find('\n', pos);
    if (end == std::string::npos) end = text.size();
    std::string line = text.substr(pos, end - pos);
    pos = end + 1;
    size_t i = line.find_first_not_of(" \t");
    if (i == std::string::npos || !tvx::ascii::StartsWith(std::string_view(line).substr(i), "ddb.")) continue;
    size_t eq = line.find('=', i);
    if (eq == std::string::npos) continue;
    size_t nameEnd = line.find_last_not_of(" \t", eq - 1);
    std::string name = tvx::ascii::Lower(line.substr(i + 4, nameEnd + 1 - (i + 4)));
    size_t v = line.find_first_not_of(" \t", eq + 1);
    std::string value;
    if (v != std::string::npos) {
      if (line[v] == '"') {
        size_t close = line.find('"', v + 1);
        value = line.substr(v + 1, (close == std::string::npos ? line.size() : close) - v - 1);
      } else {
        size_t last = line.find_last_not_of(" \t\r");
        if (last != std::string::npos && last >= v) value = line.substr(v, last + 1 - v);
      }
    }
    (*out)[name] = value;
  }
}

DiskLibError ReadDescriptor(FileIODescriptor *fd, std::string *out) {
  uint64_t size = FileIO_GetSize(fd);
  if (size == UINT64_MAX) return DISKLIB_ERR_OPEN;
  unsigned char header[kSector] = {};
  size_t got = 0;
  FileIOResult rc = FileIO_Read(fd, header, sizeof header, &got);
  if (rc != FILEIO_SUCCESS && rc != FILEIO_READ_ERROR_EOF) return DISKLIB_ERR_OPEN;
  if (got >= 4 && std::memcmp(header, "KDMV", 4) == 0) {
    if (got < kSector) return DISKLIB_ERR_FORMAT;
    tvx::ByteCursor fields(header, got);
    uint64_t offset = 0, sectors = 0;
    static_assert(kDescriptorSizeField == kDescriptorOffsetField + 8);
    if (!fields.Skip(kDescriptorOffsetField) || !fields.GetLe64(&offset) ||
        !fields.GetLe64(&sectors) || offset == 0 || sectors == 0 || sectors > kMaxDescriptor / kSector ||
        offset > size / kSector || sectors > size / kSector - offset) {
      return DISKLIB_ERR_FORMAT;
    }
    out->assign(sectors * kSector, '\0');
    if (FileIO_Pread(fd, out->data(), out->size(), offset * kSector) != FILEIO_SUCCESS) {
      return DISKLIB_ERR_OPEN;
    }
    out->resize(std::strlen(out->c_str()));  // the area is NUL-padded
  } else {
    if (size > kMaxDescriptor) return DISKLIB_ERR_FORMAT;
    out->assign(static_cast<size_t>(size), '\0');
    if (FileIO_Pread(fd, out->data(), out->size(), 0) != FILEIO_SUCCESS) return DISKLIB_ERR_OPEN;
  }
  if (out->compare(0, sizeof kDescriptorMagic - 1, kDescriptorMagic) != 0) {
    return DISKLIB_ERR_FORMAT;
  }
  return DISKLIB_OK;
}

}  // namespace

DiskLibError DiskLib_Open(const char *path, unsigned flags, unsigned reserved,
                          DiskLibHandle **out_handle) {
  *out_handle = nullptr;
  FileIODescriptor fd;
  if (FileIO_Open(&fd, path, FILEIO_OPEN_ACCESS_READ, FILEIO_OPEN) != FILEIO_SUCCESS) {
    return DISKLIB_ERR_OPEN;
  }
  std::string text;
  DiskLibError rc = ReadDescriptor(&fd, &text);
  FileIO_Close(&fd);
  if (rc != DISKLIB_OK) return rc;
  auto *h = new DiskLibHandle;
  ParseDdb(text, &h->ddb);
  *out_handle = h;
  return DISKLIB_OK;
}

DiskLibError DiskLib_DBGet(const DiskLibHandle *handle, const char *key, char **out_value) {
  *out_value = nullptr;
  std::string k = tvx::ascii::Lower(key);
  if (k.rfind("ddb.", 0) == 0) k.erase(0, 4);
  auto it = handle->ddb.find(k);
  if (it == handle->ddb.end()) return DISKLIB_ERR_NOT_FOUND;
  *out_value = UtilSafeStrdup0(it->second.c_str());
  return DISKLIB_OK;
}

void DiskLib_Close(DiskLibHandle *handle) { delete handle; }
