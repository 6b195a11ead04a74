#include "support/iso_builder.h"

#include <cstring>

namespace tvxtest {

std::string Both16(uint16_t v) {
  char lo = static_cast<char>(v & 0xFF), hi = static_cast<char>(v >> 8);
  return {lo, hi, hi, lo};
}

std::string Both32(uint32_t v) {
  std::string s(8, '\0');
  for (int i = 0; i < 4; ++i) {
    s[i] = static_cast<char>((v >> (8 * i)) & 0xFF);
    s[7 - i] = s[i];
  }
  return s;
}

std::string RecordBytes(const IsoRecord &r) {
  std::string s(33, '\0');
  s.replace(2, 8, Both32(r.block));
  s.replace(10, 8, Both32(r.size));
  s[25] = static_cast<char>(r.flags);
  s.replace(28, 4, Both16(1));
  s[32] = static_cast<char>(r.id.size());
  s += r.id;
  if (r.id.size() % 2 == 0) s += '\0';
  s += r.systemUse;
  s[0] = static_cast<char>(s.size());
  return s;
}

namespace susp {
namespace {
std::string Entry(const char *sig, const std::string &data) {
  std::string s = sig;
  s += static_cast<char>(4 + data.size());
  s += '\1';
  return s + data;
}
}  // namespace
std::string SP() { return Entry("SP", std::string("\xBE\xEF\0", 3)); }
std::string ER() {
  // Identifier length 10, no descriptor or source, extension version 1.
  return Entry("ER", std::string("\x0A\0\0\1", 4) + "RRIP_1991A");
}
std::string NM(const std::string &name, uint8_t flags) {
  return Entry("NM", std::string(1, static_cast<char>(flags)) + name);
}
std::string CE(uint32_t block, uint32_t offset, uint32_t length) {
  return Entry("CE", Both32(block) + Both32(offset) + Both32(length));
}
}  // namespace susp

IsoBuilder::IsoBuilder() : image_(20 * 2048, 0) {
  std::string pvd(2048, '\0');
  pvd[0] = 1;
  pvd.replace(1, 5, "CD001");
  pvd[6] = 1;
  pvd.replace(40, 32, std::string(32, ' '));
  pvd.replace(40, 8, "TESTVOL");
  pvd.replace(120, 4, Both16(1));
  pvd.replace(124, 4, Both16(1));
  pvd.replace(128, 4, Both16(2048));
  PutBlock(16, pvd);
  std::string term(7, '\0');
  term[0] = static_cast<char>(0xFF);
  term.replace(1, 5, "CD001");
  term[6] = 1;
  PutBlock(17, term);
  PutBlock(18, term);
  SetRoot(kRoot, Dir(kRoot, kRoot, {}));
}

uint32_t IsoBuilder::NewBlocks(uint32_t n) {
  uint32_t first = static_cast<uint32_t>(image_.size() / 2048);
  image_.resize(image_.size() + size_t{n} * 2048, 0);
  return first;
}

void IsoBuilder::Put(uint64_t offset, const std::string &bytes) {
  if (offset + bytes.size() > image_.size()) image_.resize(offset + bytes.size(), 0);
  std::memcpy(image_.data() + offset, bytes.data(), bytes.size());
}

uint32_t IsoBuilder::Dir(uint32_t block, uint32_t parent, const std::vector<IsoRecord> &entries,
                         const std::string &dotSystemUse) {
  std::vector<std::string> recs;
  recs.push_back(RecordBytes({std::string(1, '\0'), block, 0, 0x02, dotSystemUse}));
  recs.push_back(RecordBytes({std::string(1, '\1'), parent, 0, 0x02, ""}));
  for (const IsoRecord &r : entries) recs.push_back(RecordBytes(r));
  uint64_t pos = 0;
  for (const std::string &r : recs) {
    if (pos % 2048 + r.size() > 2048) pos = (pos / 2048 + 1) * 2048;
    Put(uint64_t{block} * 2048 + pos, r);
    pos += r.size();
  }
  uint32_t length = static_cast<uint32_t>((pos + 2047) / 2048 * 2048);
  // Fill in the "." length now that it is known.
  Put(uint64_t{block} * 2048 + 10, Both32(length));
  return length;
}

void IsoBuilder::SetRoot(uint32_t block, uint32_t length) {
  Put(16 * 2048 + 156, RecordBytes({std::string(1, '\0'), block, length, 0x02, ""}));
}

void IsoBuilder::AddJoliet(uint32_t block, uint32_t length) {
  std::string svd(2048, '\0');
  std::memcpy(svd.data(), image_.data() + 16 * 2048, 2048);
  svd[0] = 2;
  svd.replace(88, 3, "%/E");
  svd.replace(156, 34, RecordBytes({std::string(1, '\0'), block, length, 0x02, ""}));
  PutBlock(17, svd);
}

std::vector<uint8_t> IsoBuilder::Bytes() {
  Put(16 * 2048 + 80, Both32(static_cast<uint32_t>(image_.size() / 2048)));
  return image_;
}

namespace {
struct MemHandle {
  const std::vector<uint8_t> *bytes;
  int *closes;
};
Bool MemRead(void *h, void *buf, size_t len, uint64_t off) {
  auto *m = static_cast<MemHandle *>(h);
  if (off > m->bytes->size() || len > m->bytes->size() - off) return FALSE;
  std::memcpy(buf, m->bytes->data() + off, len);
  return TRUE;
}
Bool MemClose(void *h) {
  auto *m = static_cast<MemHandle *>(h);
  if (m->closes != nullptr) ++*m->closes;
  delete m;
  return TRUE;
}
}  // namespace

int OpenMemoryImage(const std::vector<uint8_t> &bytes, uint32_t mode, Iso9660Image **out,
                    int *closes) {
  auto *h = new MemHandle{&bytes, closes};
  int rc = Iso9660_OpenWithReader(MemRead, MemClose, h, mode, out);
  if (rc != ISO9660_OK) delete h;
  return rc;
}

int WalkImage(Iso9660Image *image, const std::string &dir, std::vector<WalkedEntry> *out,
              int depth) {
  if (depth > 64) return -1;
  Iso9660Dir *d = nullptr;
  int rc = Iso9660_OpenDir(image, dir.c_str(), &d);
  if (rc != ISO9660_OK) return rc;
  Iso9660DirEntry e;
  std::vector<std::string> subdirs;
  while ((rc = Iso9660_ReadDir(image, d, &e)) == ISO9660_OK) {
    std::string path = dir.empty() ? e.name : dir + "/" + e.name;
    if (e.isDirectory) {
      out->push_back({path + "/", e.size64, ""});
      subdirs.push_back(path);
      continue;
    }
    WalkedEntry w{path, e.size64, ""};
    Iso9660File *f = nullptr;
    int frc = Iso9660_OpenFile(image, &e, &f);
    if (frc != ISO9660_OK) {
      Iso9660_CloseDir(image, d);
      return frc;
    }
    char buf[2048];
    size_t n;
    while (n = sizeof buf, (frc = Iso9660_ReadFile(image, f, buf, &n)) == ISO9660_OK) {
      w.data.append(buf, n);
    }
    Iso9660_CloseFile(image, f);
    if (frc != ISO9660_END) {
      Iso9660_CloseDir(image, d);
      return frc;
    }
    out->push_back(std::move(w));
  }
  Iso9660_CloseDir(image, d);
  if (rc != ISO9660_END) return rc;
  for (const std::string &s : subdirs) {
    rc = WalkImage(image, s, out, depth + 1);
    if (rc != ISO9660_OK) return rc;
  }
  return ISO9660_OK;
}

}  // namespace tvxtest
