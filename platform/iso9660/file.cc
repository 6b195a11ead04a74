// Reading file data. A node's extents are read in order; their lengths add up
// to the file size, so a read never runs past the last one.
#include <algorithm>

#include "tvx_iso9660.h"
#include "platform/iso9660/image.h"

namespace tvx::iso9660 {

int FileReader::Read(Image &image, void *buf, size_t *inout_len) {
  size_t room = *inout_len;
  *inout_len = 0;
  if (pos_ >= node_.size) return ISO9660_END;
  if (room == 0) return ISO9660_ERR_ARGUMENT;
  auto *out = static_cast<uint8_t *>(buf);
  size_t done = 0;
  uint64_t start = 0;  // file offset where the current extent begins
  for (const Extent &e : node_.extents) {
    if (done == room || pos_ >= node_.size) break;
    uint64_t end = start + e.length;
    if (pos_ < end) {
      uint64_t inExtent = pos_ - start;
      size_t n = static_cast<size_t>(std::min<uint64_t>(end - pos_, room - done));
      int rc = image.ReadAt(e.offset + inExtent, out + done, n);
      if (rc != ISO9660_OK) {
        *inout_len = 0;
        return rc;
      }
      done += n;
      pos_ += n;
    }
    start = end;
  }
  *inout_len = done;
  return done == 0 ? ISO9660_END : ISO9660_OK;
}

int Image::ReadNodeAt(const Node &file, uint64_t offset, void *buf, size_t len) {
  if (offset > file.size || len > file.size - offset) return ISO9660_ERR_IO;
  auto *out = static_cast<uint8_t *>(buf);
  uint64_t start = 0;
  for (const Extent &e : file.extents) {
    if (len == 0) break;
    uint64_t end = start + e.length;
    if (offset < end) {
      size_t n = static_cast<size_t>(std::min<uint64_t>(end - offset, len));
      int rc = ReadAt(e.offset + (offset - start), out, n);
      if (rc != ISO9660_OK) return rc;
      out += n;
      offset += n;
      len -= n;
    }
    start = end;
  }
  return len == 0 ? ISO9660_OK : ISO9660_ERR_IO;
}

}  // namespace tvx::iso9660
