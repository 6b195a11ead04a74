// Builds small ISO 9660 images byte by byte, so tests can hand the reader
// exactly the malformation they are about. Layout: blocks 16 primary
// descriptor, 17 free for a Joliet descriptor, 18 terminator, 19 root
// directory; further blocks are appended on demand.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "tvx_iso9660.h"

namespace tvxtest {

// Both-endian encodings (ECMA-119 7.2.3, 7.3.3).
std::string Both16(uint16_t v);
std::string Both32(uint32_t v);

struct IsoRecord {
  std::string id;         // raw file identifier ("\0" is ".", "\1" is "..")
  uint32_t block = 0;
  uint32_t size = 0;
  uint8_t flags = 0;      // 0x02 directory, 0x80 multi-extent
  std::string systemUse;  // SUSP bytes after the identifier
};
// RecordBytes encodes one directory record (with the padding byte).
std::string RecordBytes(const IsoRecord &r);

// SUSP / Rock Ridge entries.
namespace susp {
std::string SP();
std::string ER();  // RRIP_1991A
std::string NM(const std::string &name, uint8_t flags = 0);
std::string CE(uint32_t block, uint32_t offset, uint32_t length);
}  // namespace susp

class IsoBuilder {
 public:
  static constexpr uint32_t kRoot = 19;
  IsoBuilder();
  // NewBlocks appends `n` zeroed blocks; returns the first one's number.
  uint32_t NewBlocks(uint32_t n);
  // Dir writes "." and ".." and `entries` into the directory at `block`
  // (records never cross a block; more blocks follow when needed and must
  // exist). Returns the directory's length in bytes. `dotSystemUse` goes into
  // the "." record (the root's holds "SP" and "ER" for Rock Ridge).
  uint32_t Dir(uint32_t block, uint32_t parent, const std::vector<IsoRecord> &entries,
               const std::string &dotSystemUse = "");
  // SetRoot points the primary descriptor's root record at a directory.
  void SetRoot(uint32_t block, uint32_t length);
  // AddJoliet writes a Joliet supplementary descriptor whose root is given.
  void AddJoliet(uint32_t block, uint32_t length);
  void Put(uint64_t offset, const std::string &bytes);
  void PutBlock(uint32_t block, const std::string &bytes) { Put(uint64_t{block} * 2048, bytes); }
  // Bytes returns the image with the volume space size filled in.
  std::vector<uint8_t> Bytes();

 private:
  std::vector<uint8_t> image_;
};

// MemoryImage opens bytes through Iso9660_OpenWithReader; the bytes must
// outlive the image. `closes` (optional) counts close callbacks.
int OpenMemoryImage(const std::vector<uint8_t> &bytes, uint32_t mode, Iso9660Image **out,
                    int *closes = nullptr);

// Walk lists a tree through the public API: "path" for files, "path/" for
// directories, with sizes; reads every file. Returns the first failure code.
struct WalkedEntry {
  std::string path;
  uint64_t size;
  std::string data;
};
int WalkImage(Iso9660Image *image, const std::string &dir, std::vector<WalkedEntry> *out,
              int depth = 0);

}  // namespace tvxtest
