// tvxguest tools verify / tools cat: a tools image, local or on a server,
// read with every block checked against its signed hash data.
#include <unistd.h>

#include <cinttypes>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "arg_parser.h"
#include "command_group.h"
#include "json.h"
#include "progress.h"
#include "tools_common.h"
#include "tvx_iso9660.h"
#include "tvx_toolsiso_image.h"

namespace tvxcli {
namespace {

constexpr size_t kChunk = 1 << 20;

bool IsUrl(const std::string &s) {
  return s.rfind("http://", 0) == 0 || s.rfind("https://", 0) == 0;
}

// Verified is an open verified handle of either kind.
struct Verified {
  void *handle = nullptr;
  Bool (*read)(void *, void *, size_t, uint64_t, size_t *) = nullptr;
  Bool (*isoRead)(void *, void *, size_t, uint64_t) = nullptr;
  Bool (*close)(void *) = nullptr;
  ToolsIsoImageInfo info{};

  ~Verified() {
    if (handle != nullptr) close(handle);
  }
  // Release hands the handle on (to the ISO reader, which closes it).
  void *Release() {
    void *h = handle;
    handle = nullptr;
    return h;
  }
};

// Open opens IMAGE or URL with hash data required; the result code of the
// open call (TOOLSISO_OPEN_*).
int Open(const std::string &where, const char *cert, Verified *v) {
  int rc;
  if (IsUrl(where)) {
    ToolsIsoRemoteFile *h = nullptr;
    rc = ToolsISO_RemoteFileOpenEx(where.c_str(), TRUE, cert, &h);
    v->handle = h;
    v->read = ToolsISO_RemoteFileReadCB;
    v->isoRead = ToolsISO_RemoteFileIsoReadCB;
    v->close = ToolsISO_RemoteFileCloseCB;
  } else {
    ToolsIsoLocalFile *h = nullptr;
    rc = ToolsISO_LocalFileOpenEx(where.c_str(), TRUE, cert, &h);
    v->handle = h;
    v->read = ToolsISO_LocalFileReadCB;
    v->isoRead = ToolsISO_LocalFileIsoReadCB;
    v->close = ToolsISO_LocalFileCloseCB;
  }
  if (rc == TOOLSISO_OPEN_OK) ToolsISO_GetImageInfo(v->handle, &v->info);
  return rc;
}

// OpenOrExplain opens and, on failure, says why on standard error; returns
// the command's exit status for a failure (2 cannot read, 3 hash data or
// signature), or 0.
int OpenOrExplain(const std::string &where, const std::string &cert, Verified *v) {
  LogLines log;
  int rc = Open(where, cert.empty() ? nullptr : cert.c_str(), v);
  if (rc == TOOLSISO_OPEN_OK) return 0;
  std::fprintf(stderr, "tvxguest: %s: %s\n", where.c_str(),
               rc == TOOLSISO_OPEN_IO_ERROR ? "cannot open the image"
                                            : "hash data or signature check failed");
  log.Print(stderr);
  return rc == TOOLSISO_OPEN_IO_ERROR ? 2 : 3;
}

constexpr const char *kVerifyUsage =
    "Usage: tvxguest tools verify [--json] [--quiet] [--cert FILE] IMAGE|URL\n\n"
    "Checks a guest-tools ISO image against its signed hash data: IMAGE.sha with its\n"
    "embedded signature or IMAGE.sig beside a local image, or the same companions\n"
    "of an http(s) URL (\".sha\"/\".sig\" inserted after \".iso\"). Every block of the\n"
    "image is read and checked; a bar shows the progress on a terminal.\n\n"
    "Options:\n"
    "  --json      print one JSON object: {\"image\", \"imageSize\", \"blockSize\",\n"
    "              \"blocks\", \"signature\", \"badBlocks\", \"firstBadBlock\",\n"
    "              \"firstBadOffset\", \"verified\"}\n"
    "  --quiet     no progress bar\n"
    "  --cert FILE trust the maker certificates in FILE instead of the installed ones\n"
    "  -h, --help  show this help\n\n"
    "Exit status: 0 every block verified, 1 bad blocks, 2 the image cannot be read,\n"
    "3 hash data missing or invalid or its signature bad, 64 usage error.\n";

struct Scan {
  uint64_t bad = 0;
  int64_t firstBad = -1;
  bool ioError = false;
};

// CheckBlocks reads blocks [first, first + count) one at a time, counting
// the bad ones: a failed chunk is narrowed down to its blocks.
void CheckBlocks(Verified &v, uint64_t first, uint64_t count, std::vector<uint8_t> &buf, Scan *s) {
  uint32_t bs = v.info.blockSize;
  for (uint64_t b = first; b < first + count; b++) {
    size_t got = 0;
    if (!v.read(v.handle, buf.data(), bs, b * bs, &got)) {
      s->bad++;
      if (s->firstBad < 0) s->firstBad = static_cast<int64_t>(b);
    }
  }
}

Scan VerifyAll(Verified &v, bool quiet) {
  Scan s;
  uint32_t bs = v.info.blockSize;
  size_t chunk = kChunk / bs * bs;
  std::vector<uint8_t> buf(chunk);
  Progress bar("verifying", v.info.imageSize, quiet);
  LogLines silence;  // the mismatch lines are summarised below
  for (uint64_t off = 0; off < v.info.imageSize; off += chunk) {
    size_t got = 0;
    if (!v.read(v.handle, buf.data(), chunk, off, &got)) {
      uint64_t left = v.info.imageSize - off;
      uint64_t n = (std::min<uint64_t>(chunk, left) + bs - 1) / bs;
      CheckBlocks(v, off / bs, n, buf, &s);
    }
    bar.Update(std::min<uint64_t>(off + chunk, v.info.imageSize));
  }
  return s;
}

int Verify(const std::vector<std::string> &args) {
  bool json = false, quiet = false;
  std::string cert;
  std::vector<std::string> pos;
  int parsed = ArgParser("tools verify", [] { std::fputs(kVerifyUsage, stdout); })
                   .Flag("--json", &json)
                   .Flag("--quiet", &quiet)
                   .Value("--cert", &cert)
                   .Parse(args, &pos);
  if (parsed >= 0) return parsed;
  if (pos.size() != 1) return UsageError("tools verify", "one IMAGE or URL is needed");
  Verified v;
  if (int rc = OpenOrExplain(pos[0], cert, &v)) return rc;
  Scan s = VerifyAll(v, quiet || json);
  const ToolsIsoImageInfo &i = v.info;
  uint64_t blocks = (i.imageSize + i.blockSize - 1) / i.blockSize;
  const char *sig = i.embeddedSignature ? "embedded" : "detached";
  if (json) {
    JsonObject o;
    o.Str("image", pos[0]).Num("imageSize", static_cast<int64_t>(i.imageSize))
        .Num("blockSize", i.blockSize).Num("blocks", static_cast<int64_t>(blocks))
        .Str("signature", sig).Num("badBlocks", static_cast<int64_t>(s.bad));
    if (s.firstBad >= 0) {
      o.Num("firstBadBlock", s.firstBad).Num("firstBadOffset", s.firstBad * i.blockSize);
    } else {
      o.Raw("firstBadBlock", "null").Raw("firstBadOffset", "null");
    }
    o.Bool("verified", s.bad == 0);
    std::printf("%s\n", o.Text().c_str());
  } else {
    std::string hashWhere = IsUrl(pos[0]) ? "companion URL" : pos[0] + ".sha";
    std::printf("image:      %s (%" PRIu64 " bytes)\n", pos[0].c_str(), i.imageSize);
    std::printf("hash data:  %s, %u-byte blocks, %" PRIu64 " hashes\n", hashWhere.c_str(),
                i.blockSize, i.hashCount);
    std::printf("signature:  %s, valid\n", sig);
    std::printf("blocks:     %" PRIu64 " checked, %" PRIu64 " bad\n", blocks, s.bad);
    if (s.firstBad >= 0) {
      std::printf("first bad:  block %" PRId64 " (offset %" PRId64 ")\n", s.firstBad,
                  s.firstBad * static_cast<int64_t>(i.blockSize));
    }
    std::printf("result:     %s\n", s.bad == 0 ? "verified" : "TAMPERED");
  }
  return s.bad == 0 ? 0 : 1;
}

constexpr const char *kCatUsage =
    "Usage: tvxguest tools cat [--cert FILE] IMAGE|URL PATH\n\n"
    "Writes the file PATH inside a guest-tools ISO image to standard output, byte\n"
    "for byte, reading the image through its signed hash data (as 'tools verify'\n"
    "finds it): any bad block the file touches fails the command. --cert FILE trusts\n"
    "the maker certificates in FILE instead of the installed ones.\n\n"
    "Exit status: 0 success, 1 no such file or a bad block, 2 the image cannot be\n"
    "read, 3 hash data missing or invalid or its signature bad, 64 usage error.\n";

int Cat(const std::vector<std::string> &args) {
  std::string cert;
  std::vector<std::string> pos;
  int parsed = ArgParser("tools cat", [] { std::fputs(kCatUsage, stdout); })
                   .Value("--cert", &cert)
                   .Parse(args, &pos);
  if (parsed >= 0) return parsed;
  if (pos.size() != 2) return UsageError("tools cat", "IMAGE and PATH are needed");
  Verified v;
  if (int rc = OpenOrExplain(pos[0], cert, &v)) return rc;
  LogLines log;
  Iso9660Image *image = nullptr;
  int rc = Iso9660_OpenWithReader(v.isoRead, v.close, v.handle, 0, &image);
  if (rc != ISO9660_OK) {
    std::fprintf(stderr, "tvxguest: %s: not a readable ISO 9660 image (%d)\n", pos[0].c_str(), rc);
    log.Print(stderr);
    return 1;
  }
  v.Release();
  Iso9660DirEntry entry;
  std::memset(&entry, 0, sizeof entry);
  std::snprintf(entry.name, sizeof entry.name, "%s", pos[1].c_str());
  Iso9660File *file = nullptr;
  rc = Iso9660_OpenFile(image, &entry, &file);
  std::vector<char> buf(kChunk);
  while (rc == ISO9660_OK) {
    size_t n = buf.size();
    rc = Iso9660_ReadFile(image, file, buf.data(), &n);
    if (rc == ISO9660_OK && std::fwrite(buf.data(), 1, n, stdout) != n) rc = ISO9660_ERR_IO;
  }
  Iso9660_Close(image);
  if (rc != ISO9660_END || std::fflush(stdout) != 0) {
    std::fprintf(stderr, "tvxguest: %s: %s: %s\n", pos[0].c_str(), pos[1].c_str(),
                 rc == ISO9660_ERR_NOT_FOUND ? "no such file" : "read failed");
    log.Print(stderr);
    return 1;
  }
  return 0;
}

const SubcommandRegistration kVerify(kToolsGroup,
                                     {"verify", "check every block of a tools image", Verify});
const SubcommandRegistration kCat(kToolsGroup,
                                  {"cat", "a file from inside a verified tools image", Cat});

}  // namespace
}  // namespace tvxcli
