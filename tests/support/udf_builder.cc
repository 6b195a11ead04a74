#include "support/udf_builder.h"

#include <cstring>
#include <stdexcept>

namespace tvxtest {

namespace {

// Where the volume structures go: after the anchor at sector 256, or, for a
// compact image, between the recognition sequence and that anchor, which is
// then the image's last sector.
struct Places {
  uint32_t mainVds, reserveVds, integrity, partitionStart;
};
Places PlacesFor(const UdfBuildOptions &o) {
  if (!o.compact) return {260, 276, 292, 300};
  uint32_t first = (32768 + 3 * 2048 + o.blockSize - 1) / o.blockSize;
  return {first, first + 16, first + 32, first + 34};
}

uint16_t Crc(const uint8_t *p, size_t n) {
  uint16_t crc = 0;
  for (size_t i = 0; i < n; i++) {
    crc ^= static_cast<uint16_t>(p[i] << 8);
    for (int b = 0; b < 8; b++) crc = (crc & 0x8000) ? (crc << 1) ^ 0x1021 : crc << 1;
  }
  return crc;
}

// Standalone (the fuzz seed tool links this file without the library).
void W16(uint8_t *p, uint16_t v) {
  p[0] = v & 0xFF;
  p[1] = v >> 8;
}
void W32(uint8_t *p, uint32_t v) {
  for (int i = 0; i < 4; i++) p[i] = (v >> (8 * i)) & 0xFF;
}
void W64(uint8_t *p, uint64_t v) {
  W32(p, static_cast<uint32_t>(v));
  W32(p + 4, static_cast<uint32_t>(v >> 32));
}

void Seal(uint8_t *d, size_t room) {
  uint16_t crcLen = static_cast<uint16_t>(d[10] | (d[11] << 8));
  if (16u + crcLen > room) crcLen = static_cast<uint16_t>(room - 16);
  W16(d + 8, Crc(d + 16, crcLen));
  uint8_t sum = 0;
  for (int i = 0; i < 16; i++) {
    if (i != 4) sum = static_cast<uint8_t>(sum + d[i]);
  }
  d[4] = sum;
}

void Tag(uint8_t *d, uint16_t id, uint16_t version, uint32_t location, size_t total) {
  W16(d, id);
  W16(d + 2, version);
  W32(d + 12, location);
  W16(d + 10, static_cast<uint16_t>(total - 16));
  Seal(d, total);
}

void Regid(uint8_t *p, const char *ident, uint16_t suffix = 0) {
  std::memcpy(p + 1, ident, std::strlen(ident));
  W16(p + 24, suffix);
}

void Charspec(uint8_t *p) { std::memcpy(p + 1, "OSTA Compressed Unicode", 23); }

void Timestamp(uint8_t *p) {
  W16(p, 0x1000);
  W16(p + 2, 2020);
  p[4] = 1;
  p[5] = 1;
}

std::u32string Utf32(const std::string &s) {
  std::u32string out;
  for (size_t i = 0; i < s.size();) {
    auto c = static_cast<unsigned char>(s[i]);
    int n = c < 0x80 ? 1 : c < 0xE0 ? 2 : c < 0xF0 ? 3 : 4;
    char32_t cp = n == 1 ? c : c & (0x7F >> n);
    for (int k = 1; k < n && i + k < s.size(); k++) cp = (cp << 6) | (s[i + k] & 0x3F);
    out.push_back(cp);
    i += n;
  }
  return out;
}

std::string Cs0(const std::string &utf8) {
  std::u32string u = Utf32(utf8);
  bool wide = false;
  for (char32_t c : u) wide |= c > 0xFF;
  std::string out(1, wide ? 16 : 8);
  for (char32_t c : u) {
    if (!wide) {
      out.push_back(static_cast<char>(c));
    } else if (c >= 0x10000) {
      char32_t v = c - 0x10000, hi = 0xD800 + (v >> 10), lo = 0xDC00 + (v & 0x3FF);
      out += {static_cast<char>(hi >> 8), static_cast<char>(hi & 0xFF), static_cast<char>(lo >> 8),
              static_cast<char>(lo & 0xFF)};
    } else {
      out += {static_cast<char>(c >> 8), static_cast<char>(c & 0xFF)};
    }
  }
  return out;
}

void Dstring(uint8_t *p, size_t field, const std::string &utf8) {
  std::string cs = Cs0(utf8);
  if (cs.size() > field - 1) cs.resize(field - 1);
  std::memcpy(p, cs.data(), cs.size());
  p[field - 1] = static_cast<uint8_t>(cs.size());
}

struct Ad {
  uint32_t length;
  uint32_t type;
  uint32_t lbn;
  uint16_t part;
};

struct Space {
  uint32_t bs;
  std::vector<std::vector<uint8_t>> blocks;
  uint32_t Alloc(uint32_t n, uint8_t fill = 0) {
    auto at = static_cast<uint32_t>(blocks.size());
    for (uint32_t i = 0; i < n; i++) blocks.emplace_back(bs, fill);
    return at;
  }
  uint8_t *At(uint32_t lbn) { return blocks.at(lbn).data(); }
};

class Builder {
 public:
  explicit Builder(const UdfBuildOptions &o) : opt_(o), bs_(o.blockSize), at_(PlacesFor(o)) {
    phys_.bs = meta_.bs = bs_;
    rev_ = opt_.metadataPartition ? 0x0250 : opt_.extendedEntries ? 0x0201 : 0x0102;
    tagVersion_ = rev_ >= 0x0200 ? 3 : 2;
  }

  std::vector<uint8_t> Build(const UdfNodeSpec &root, UdfLayout *layout) {
    phys_.Alloc(2);  // FSD + TD, or the metadata file and its mirror
    if (opt_.metadataPartition) meta_.Alloc(2);
    uint32_t rootLbn = Icb().Alloc(1);
    BuildNode(root, "", rootLbn, rootLbn);
    WriteFsd(rootLbn);
    uint32_t metaBase = 0, metaBlocks = 0;
    if (opt_.metadataPartition) {
      metaBlocks = static_cast<uint32_t>(meta_.blocks.size());
      metaBase = static_cast<uint32_t>(phys_.blocks.size());
      for (auto &b : meta_.blocks) phys_.blocks.push_back(b);
      for (uint32_t copy = 0; copy < 2; copy++) {
        std::vector<uint8_t> ad(8);
        W32(ad.data(), metaBlocks * bs_);
        W32(ad.data() + 4, metaBase);
        WriteEntry(phys_, copy, static_cast<uint8_t>(250 + copy), uint64_t{metaBlocks} * bs_,
                   metaBlocks, ad, 0);
      }
    }
    uint32_t partLen = static_cast<uint32_t>(phys_.blocks.size());
    uint32_t total = at_.partitionStart + partLen + 1;
    if (opt_.compact) {
      if (total > 257) throw std::runtime_error("tree too large for a compact image");
      total = 257;
    }
    std::vector<uint8_t> img(static_cast<size_t>(total) * bs_, 0);
    WriteVrs(&img);
    for (uint32_t i = 0; i < partLen; i++) {
      std::memcpy(&img[static_cast<size_t>(at_.partitionStart + i) * bs_], phys_.blocks[i].data(),
                  bs_);
    }
    WriteVds(&img, at_.mainVds, partLen);
    WriteVds(&img, at_.reserveVds, partLen);
    WriteIntegrity(&img);
    WriteAnchor(&img, 256);
    if (total - 1 != 256) WriteAnchor(&img, total - 1);

    layout->blockSize = bs_;
    layout->partitionStart = at_.partitionStart;
    layout->metadataStart = at_.partitionStart + metaBase;
    layout->vdsSectors = {at_.mainVds, at_.mainVds + 1, at_.mainVds + 2, at_.mainVds + 3,
                          at_.mainVds + 4};
    layout->pdSector = at_.mainVds + 1;
    layout->lvdSector = at_.mainVds + 2;
    layout->fsdSector = Sector(0);
    layout->metadataFileSector = at_.partitionStart;
    for (auto &[path, lbn] : entries_) layout->entrySector[path] = Sector(lbn);
    for (auto &[path, lbn] : dirData_) layout->dirDataSector[path] = Sector(lbn);
    for (auto &[path, v] : aeds_) {
      for (uint32_t lbn : v) layout->aedSectors[path].push_back(Sector(lbn));
    }
    return img;
  }

 private:
  Space &Icb() { return opt_.metadataPartition ? meta_ : phys_; }
  uint16_t IcbPart() const { return opt_.metadataPartition ? 1 : 0; }
  bool Efe() const { return opt_.metadataPartition || opt_.extendedEntries; }
  size_t EntryBase() const { return Efe() ? 216 : 176; }
  // Only valid after the metadata blocks were appended to the partition.
  uint32_t Sector(uint32_t icbLbn) const {
    return at_.partitionStart + icbLbn +
           (opt_.metadataPartition
                ? static_cast<uint32_t>(phys_.blocks.size() - meta_.blocks.size())
                : 0);
  }

  void BuildNode(const UdfNodeSpec &n, const std::string &path, uint32_t self, uint32_t parent) {
    entries_[path] = self;
    if (!n.dir) {
      BuildFile(n, path, self);
      return;
    }
    struct Child {
      std::string name;
      bool dir;
      uint32_t lbn;
    };
    std::vector<Child> kids;
    for (const UdfNodeSpec &c : n.children) {
      uint32_t lbn = Icb().Alloc(1);
      BuildNode(c, path.empty() ? c.name : path + "/" + c.name, lbn, self);
      kids.push_back({c.name, c.dir, lbn});
    }
    // FIDs: the parent entry, then the children, packed across blocks.
    std::vector<std::pair<size_t, std::string>> fids;  // offset, bytes
    std::string stream;
    auto addFid = [&](uint8_t chars, const std::string &name, uint32_t lbn) {
      std::string cs = name.empty() ? "" : Cs0(name);
      size_t len = (38 + cs.size() + 3) & ~size_t{3};
      std::string f(len, '\0');
      auto *p = reinterpret_cast<uint8_t *>(f.data());
      W16(p + 16, 1);
      p[18] = chars;
      p[19] = static_cast<uint8_t>(cs.size());
      W32(p + 20, bs_);
      W32(p + 24, lbn);
      W16(p + 28, IcbPart());
      std::memcpy(p + 38, cs.data(), cs.size());
      fids.emplace_back(stream.size(), f);
      stream += f;
    };
    addFid(0x0A, "", parent);
    for (const Child &k : kids) addFid(k.dir ? 0x02 : 0x00, k.name, k.lbn);

    std::vector<uint8_t> ads;
    bool embed = opt_.embedSmallFiles && stream.size() <= bs_ - EntryBase();
    uint32_t dataLbn = self;
    uint32_t blocks = 0;
    if (!embed) {
      blocks = static_cast<uint32_t>((stream.size() + bs_ - 1) / bs_);
      dataLbn = Icb().Alloc(blocks);
      dirData_[path] = dataLbn;
    }
    std::string sealed = stream;
    for (auto &[off, f] : fids) {
      uint32_t loc = embed ? self : dataLbn + static_cast<uint32_t>(off / bs_);
      auto *p = reinterpret_cast<uint8_t *>(sealed.data() + off);
      Tag(p, 257, tagVersion_, loc, f.size());
    }
    if (embed) {
      ads.assign(sealed.begin(), sealed.end());
      WriteEntry(Icb(), self, 4, sealed.size(), 0, ads, 3);
      return;
    }
    for (uint32_t b = 0; b < blocks; b++) {
      size_t off = size_t{b} * bs_;
      std::memcpy(Icb().At(dataLbn + b), sealed.data() + off,
                  std::min<size_t>(bs_, sealed.size() - off));
    }
    bool longAd = opt_.longAds;
    ads = EncodeAds({{static_cast<uint32_t>(sealed.size()), 0, dataLbn, IcbPart()}}, longAd, path);
    WriteEntry(Icb(), self, 4, sealed.size(), blocks, ads, longAd ? 1 : 0);
  }

  void BuildFile(const UdfNodeSpec &n, const std::string &path, uint32_t self) {
    const std::string &d = n.data;
    if (opt_.embedSmallFiles && n.sparseBytes == 0 && d.size() <= bs_ - EntryBase()) {
      WriteEntry(Icb(), self, 5, d.size(), 0, std::vector<uint8_t>(d.begin(), d.end()), 3);
      return;
    }
    uint32_t blocks = static_cast<uint32_t>((d.size() + bs_ - 1) / bs_);
    uint32_t per = opt_.extentBlocks == 0 ? blocks : opt_.extentBlocks;
    std::vector<Ad> list;
    // Holes: unallocated extents of whole blocks, at most 1 GiB each.
    const uint32_t maxHole = (0x3FFFFFFFu / bs_) * bs_;
    for (uint64_t left = n.sparseBytes; left > 0;) {
      uint32_t len = static_cast<uint32_t>(std::min<uint64_t>(left, maxHole));
      list.push_back({len, 2, 0, 0});
      left -= len;
    }
    for (uint32_t b = 0; b < blocks; b += per) {
      uint32_t n2 = std::min(per, blocks - b);
      uint32_t lbn = phys_.Alloc(n2);
      size_t off = size_t{b} * bs_;
      size_t bytes = std::min<size_t>(size_t{n2} * bs_, d.size() - off);
      for (uint32_t k = 0; k < n2; k++) {
        size_t o = off + size_t{k} * bs_;
        std::memcpy(phys_.At(lbn + k), d.data() + o, std::min<size_t>(bs_, d.size() - o));
      }
      list.push_back({static_cast<uint32_t>(bytes), 0, lbn, 0});
      if (opt_.scatterExtents) phys_.Alloc(1, 0xEE);
    }
    // File data lives in the physical partition: from the metadata partition
    // only long_ads can say so.
    bool longAd = opt_.longAds || opt_.metadataPartition;
    std::vector<uint8_t> ads = EncodeAds(list, longAd, path);
    WriteEntry(Icb(), self, 5, n.sparseBytes + d.size(), blocks, ads, longAd ? 1 : 0);
  }

  void PutAd(std::vector<uint8_t> *out, const Ad &a, bool longAd) {
    size_t at = out->size();
    out->resize(at + (longAd ? 16 : 8));
    W32(out->data() + at, a.length | (a.type << 30));
    W32(out->data() + at + 4, a.lbn);
    if (longAd) W16(out->data() + at + 8, a.part);
  }

  std::vector<uint8_t> EncodeAds(const std::vector<Ad> &ads, bool longAd, const std::string &path) {
    size_t per = opt_.adsPerEntry;
    std::vector<std::vector<Ad>> groups;
    size_t i = 0;
    while (per >= 2 && ads.size() - i > per) {
      groups.emplace_back(ads.begin() + i, ads.begin() + i + per - 1);
      i += per - 1;
    }
    groups.emplace_back(ads.begin() + i, ads.end());
    std::vector<uint32_t> aedLbn;
    for (size_t g = 1; g < groups.size(); g++) aedLbn.push_back(Icb().Alloc(1));
    aeds_[path] = aedLbn;
    std::vector<uint8_t> first;
    for (size_t g = 0; g < groups.size(); g++) {
      std::vector<uint8_t> bytes;
      for (const Ad &a : groups[g]) PutAd(&bytes, a, longAd);
      if (g + 1 < groups.size()) PutAd(&bytes, {bs_, 3, aedLbn[g], IcbPart()}, longAd);
      if (g == 0) {
        first = bytes;
        continue;
      }
      uint8_t *p = Icb().At(aedLbn[g - 1]);
      W32(p + 16, g >= 2 ? aedLbn[g - 2] : 0);
      W32(p + 20, static_cast<uint32_t>(bytes.size()));
      std::memcpy(p + 24, bytes.data(), bytes.size());
      Tag(p, 258, tagVersion_, aedLbn[g - 1], 24 + bytes.size());
    }
    return first;
  }

  void WriteEntry(Space &sp, uint32_t lbn, uint8_t type, uint64_t size, uint64_t blocks,
                  const std::vector<uint8_t> &ads, int adType) {
    uint8_t *p = sp.At(lbn);
    std::memset(p, 0, bs_);
    size_t base = EntryBase();
    if (base + ads.size() > bs_) throw std::runtime_error("allocation descriptors overflow");
    W16(p + 16 + 4, 4);  // strategy 4
    W16(p + 16 + 8, 1);
    p[16 + 11] = type;
    W16(p + 16 + 18, static_cast<uint16_t>(adType));
    W32(p + 44, type == 4 ? 0x1CE7 : 0x14A5);
    W16(p + 48, 1);
    W64(p + 56, size);
    uint64_t unique = type == 4 && lbn == 0 ? 0 : nextUnique_++;
    if (Efe()) {
      W64(p + 64, size);
      W64(p + 72, blocks);
      for (size_t t : {80, 92, 104, 116}) Timestamp(p + t);
      W32(p + 128, 1);
      Regid(p + 168, "*tvx builder");
      W64(p + 200, unique);
      W32(p + 212, static_cast<uint32_t>(ads.size()));
    } else {
      W64(p + 64, blocks);
      for (size_t t : {72, 84, 96}) Timestamp(p + t);
      W32(p + 108, 1);
      Regid(p + 128, "*tvx builder");
      W64(p + 160, unique);
      W32(p + 172, static_cast<uint32_t>(ads.size()));
    }
    if (!ads.empty()) std::memcpy(p + base, ads.data(), ads.size());
    Tag(p, Efe() ? 266 : 261, tagVersion_, lbn, base + ads.size());
  }

  void WriteFsd(uint32_t rootLbn) {
    uint8_t *p = Icb().At(0);
    Timestamp(p + 16);
    W16(p + 28, 3);
    W16(p + 30, 3);
    W32(p + 32, 1);
    W32(p + 36, 1);
    Charspec(p + 48);
    Dstring(p + 112, 128, opt_.volumeId);
    Charspec(p + 240);
    Dstring(p + 304, 32, opt_.volumeId);
    W32(p + 400, bs_);
    W32(p + 404, rootLbn);
    W16(p + 408, IcbPart());
    Regid(p + 416, "*OSTA UDF Compliant", rev_);
    Tag(p, 256, tagVersion_, 0, 512);
    Tag(Icb().At(1), 8, tagVersion_, 1, 512);
  }

  void WriteVrs(std::vector<uint8_t> *img) {
    const char *ids[] = {"BEA01", rev_ >= 0x0200 ? "NSR03" : "NSR02", "TEA01"};
    for (int i = 0; i < 3; i++) {
      uint8_t *p = img->data() + 32768 + 2048 * i;
      std::memcpy(p + 1, ids[i], 5);
      p[6] = 1;
    }
  }

  uint8_t *SectorPtr(std::vector<uint8_t> *img, uint32_t s) {
    return img->data() + size_t{s} * bs_;
  }

  void WriteVds(std::vector<uint8_t> *img, uint32_t at, uint32_t partLen) {
    uint8_t *pvd = SectorPtr(img, at);
    W32(pvd + 16, 1);
    Dstring(pvd + 24, 32, opt_.volumeId);
    W16(pvd + 56, 1);
    W16(pvd + 58, 1);
    W16(pvd + 60, 2);
    W16(pvd + 62, 2);
    W32(pvd + 64, 1);
    W32(pvd + 68, 1);
    Dstring(pvd + 72, 128, "0123456789ABCDEF" + opt_.volumeId);
    Charspec(pvd + 200);
    Charspec(pvd + 264);
    Timestamp(pvd + 376);
    Regid(pvd + 388, "*tvx builder");
    Tag(pvd, 1, tagVersion_, at, 512);

    uint8_t *pd = SectorPtr(img, at + 1);
    W32(pd + 16, 2);
    W16(pd + 20, 1);
    W16(pd + 22, 0);
    Regid(pd + 24, rev_ >= 0x0200 ? "+NSR03" : "+NSR02");
    W32(pd + 184, 1);
    W32(pd + 188, at_.partitionStart);
    W32(pd + 192, partLen);
    Regid(pd + 196, "*tvx builder");
    Tag(pd, 5, tagVersion_, at + 1, 512);

    uint8_t *lvd = SectorPtr(img, at + 2);
    W32(lvd + 16, 3);
    Charspec(lvd + 20);
    Dstring(lvd + 84, 128, opt_.volumeId);
    W32(lvd + 212, bs_);
    Regid(lvd + 216, "*OSTA UDF Compliant", rev_);
    W32(lvd + 248, bs_);
    W32(lvd + 252, 0);
    W16(lvd + 256, IcbPart());
    Regid(lvd + 272, "*tvx builder");
    W32(lvd + 432, 2 * bs_);
    W32(lvd + 436, at_.integrity);
    uint8_t *m = lvd + 440;
    m[0] = 1;
    m[1] = 6;
    W16(m + 2, 1);
    W16(m + 4, 0);
    uint32_t mapLen = 6, maps = 1;
    if (opt_.metadataPartition) {
      uint8_t *m2 = m + 6;
      m2[0] = 2;
      m2[1] = 64;
      Regid(m2 + 4, "*UDF Metadata Partition", 0x0250);
      W16(m2 + 36, 1);
      W16(m2 + 38, 0);
      W32(m2 + 40, 0);
      W32(m2 + 44, 1);
      W32(m2 + 48, 0xFFFFFFFF);
      W32(m2 + 52, 32);
      W16(m2 + 56, 1);
      mapLen += 64;
      maps++;
    }
    W32(lvd + 264, mapLen);
    W32(lvd + 268, maps);
    Tag(lvd, 6, tagVersion_, at + 2, 440 + mapLen);

    uint8_t *usd = SectorPtr(img, at + 3);
    W32(usd + 16, 4);
    Tag(usd, 7, tagVersion_, at + 3, 24);
    Tag(SectorPtr(img, at + 4), 8, tagVersion_, at + 4, 512);
  }

  void WriteIntegrity(std::vector<uint8_t> *img) {
    uint8_t *p = SectorPtr(img, at_.integrity);
    uint32_t n = opt_.metadataPartition ? 2 : 1;
    Timestamp(p + 16);
    W32(p + 28, 1);
    W64(p + 40, nextUnique_);
    W32(p + 72, n);
    W32(p + 76, 46);
    size_t iu = 80 + 8 * n;
    Regid(p + iu, "*tvx builder");
    W16(p + iu + 40, rev_);
    W16(p + iu + 42, rev_);
    W16(p + iu + 44, rev_);
    Tag(p, 9, tagVersion_, at_.integrity, iu + 46);
    Tag(SectorPtr(img, at_.integrity + 1), 8, tagVersion_, at_.integrity + 1, 512);
  }

  void WriteAnchor(std::vector<uint8_t> *img, uint32_t at) {
    uint8_t *p = SectorPtr(img, at);
    W32(p + 16, 16 * bs_);
    W32(p + 20, at_.mainVds);
    W32(p + 24, 16 * bs_);
    W32(p + 28, at_.reserveVds);
    Tag(p, 2, tagVersion_, at, 512);
  }

  UdfBuildOptions opt_;
  uint32_t bs_;
  Places at_;
  uint16_t rev_, tagVersion_;
  uint64_t nextUnique_ = 16;
  Space phys_, meta_;
  std::map<std::string, uint32_t> entries_, dirData_;
  std::map<std::string, std::vector<uint32_t>> aeds_;
};

}  // namespace

std::vector<uint8_t> BuildUdf(const UdfNodeSpec &root, const UdfBuildOptions &opt,
                              UdfLayout *layout) {
  Builder b(opt);
  return b.Build(root, layout);
}

void SealTag(std::vector<uint8_t> *image, size_t offset) {
  Seal(image->data() + offset, image->size() - offset);
}

void PutLe16(std::vector<uint8_t> *image, size_t offset, uint16_t v) { W16(&(*image)[offset], v); }
void PutLe32(std::vector<uint8_t> *image, size_t offset, uint32_t v) { W32(&(*image)[offset], v); }

UdfNodeSpec SampleUdfTree(uint32_t bigBytes) {
  std::string big(bigBytes, '\0');
  for (uint32_t i = 0; i < bigBytes; i++) big[i] = static_cast<char>((i * 31 + i / 509) & 0xFF);
  UdfNodeSpec deep{"deep.txt", false, "deep\n", {}};
  UdfNodeSpec b{"b", true, "", {deep}};
  UdfNodeSpec a{"a", true, "", {b}};
  UdfNodeSpec root{"", true, "", {}};
  root.children = {
      {"README.TXT", false, "built by the test builder\n", {}},
      {"empty.bin", false, "", {}},
      {"Grüße.txt", false, "latin-1 name\n", {}},
      {"日本語.txt", false, "16-bit name\n", {}},
      {"big.bin", false, big, {}},
      a,
  };
  return root;
}

}  // namespace tvxtest
