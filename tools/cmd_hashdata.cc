// tvxguest hashdata: write signed hash data for a tools image (`create`) and
// check an image against it (`check`), through the library's own checks.
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "arg_parser.h"
#include "command_group.h"
#include "hashdata_writer.h"
#include "json.h"
#include "log_lines.h"
#include "platform/endian.h"
#include "progress.h"
#include "tvx_log.h"
#include "tvx_toolsiso.h"

namespace tvxcli {
namespace {

constexpr const char *kCreate = "hashdata create";
constexpr const char *kCheck = "hashdata check";
constexpr uint64_t kMaxHashData = 256u << 20;  // as the library reads companions

void PrintCreateHelp(FILE *out) {
  std::fprintf(out,
               "Usage: tvxguest hashdata create --block-size N [--embed-signature] --key KEY\n"
               "           --cert CERT [--sig SIG] [--quiet] IMAGE OUT\n\n"
               "Hashes IMAGE block by block and writes the hash-data file OUT, signed with the\n"
               "private key KEY. CERT holds the signing certificate, optionally followed by the\n"
               "intermediate certificates that the signature should carry (PEM).\n\n"
               "Options:\n"
               "  --block-size N     image bytes per hash, 512 to 4096\n"
               "  --embed-signature  put the signature at the end of OUT (else it goes to SIG)\n"
               "  --sig SIG          the detached signature file (default: OUT with its\n"
               "                     \".sha\" replaced by \".sig\", else OUT.sig)\n"
               "  --quiet            no progress bar\n"
               "  -h, --help         show this help\n\n"
               "Exit status: 0 written, 1 failed, 64 usage error.\n");
}

void PrintCheckHelp(FILE *out) {
  std::fprintf(out,
               "Usage: tvxguest hashdata check [--json] [--cert CERT] [--sig SIG] [--quiet]\n"
               "           HASHDATA IMAGE\n\n"
               "Checks the hash-data file HASHDATA, its signature (embedded, or detached in SIG)\n"
               "and every block of IMAGE against it, and reports the first bad block and how\n"
               "many there are.\n\n"
               "Options:\n"
               "  --cert CERT  trust this certificate file instead of the installed maker\n"
               "               certificates\n"
               "  --sig SIG    the detached signature (default: HASHDATA with its \".sha\"\n"
               "               replaced by \".sig\", else HASHDATA.sig)\n"
               "  --json       print one JSON object\n"
               "  --quiet      no progress bar\n"
               "  -h, --help   show this help\n\n"
               "Exit status: 0 all good, 1 bad signature or bad blocks, 2 HASHDATA refused or a\n"
               "file unreadable, 64 usage error.\n");
}

std::string CompanionSig(const std::string &path) {
  size_t n = path.size();
  if (n > 4 && path.compare(n - 4, 4, ".sha") == 0) return path.substr(0, n - 4) + ".sig";
  return path + ".sig";
}

int Create(const std::vector<std::string> &args) {
  HashDataOptions options;
  std::string key, cert, sigPath, blockText;
  std::vector<std::string> files;
  int parsed = ArgParser(kCreate, [] { PrintCreateHelp(stdout); })
                   .Value("--block-size", &blockText)
                   .Flag("--embed-signature", &options.embedSignature)
                   .Value("--key", &key)
                   .Value("--cert", &cert)
                   .Value("--sig", &sigPath)
                   .Flag("--quiet", &options.quiet)
                   .Parse(args, &files);
  if (parsed >= 0) return parsed;
  if (files.size() != 2) return UsageError(kCreate, "IMAGE and OUT are needed");
  char *end = nullptr;
  unsigned long block = std::strtoul(blockText.c_str(), &end, 10);
  if (blockText.empty() || *end != '\0' || block < 512 || block > 4096) {
    return UsageError(kCreate, "--block-size must be a number from 512 to 4096");
  }
  if (key.empty() || cert.empty()) return UsageError(kCreate, "--key and --cert are needed");
  options.blockSize = static_cast<uint32_t>(block);
  if (sigPath.empty()) sigPath = CompanionSig(files[1]);

  std::string error, detached;
  std::unique_ptr<Signer> signer = Signer::Load(key, cert, &error);
  std::string out = signer != nullptr
                        ? CreateHashData(files[0], options, *signer, &detached, &error)
                        : std::string();
  bool ok = !out.empty() && WriteWhole(files[1], out, &error) &&
            (options.embedSignature || WriteWhole(sigPath, detached, &error));
  if (!ok) {
    std::fprintf(stderr, "tvxguest %s: %s\n", kCreate, error.c_str());
    return 1;
  }
  std::printf(
      "%s: %llu hashes of %u-byte blocks, signature %s\n", files[1].c_str(),
      static_cast<unsigned long long>(
          tvx::LoadLe64(reinterpret_cast<const uint8_t *>(out.data()) + 72)),
      options.blockSize, options.embedSignature ? "embedded" : sigPath.c_str());
  return 0;
}

struct BlockReport {
  uint64_t blocks = 0;
  uint64_t bad = 0;
  int64_t firstBad = -1;
  std::string problem;  // a reason that is not a bad block
};

// CheckBlocks verifies the image a chunk at a time; a chunk that fails is
// gone through again block by block to count and place the bad ones.
BlockReport CheckBlocks(ToolsIsoHashInfo *info, const std::string &image, bool quiet) {
  const auto *h = static_cast<const uint8_t *>(info->header);
  uint32_t blockSize = tvx::LoadLe32(h + 44);
  uint64_t hashCount = tvx::LoadLe64(h + 72);
  BlockReport r;
  FILE *f = std::fopen(image.c_str(), "rb");
  if (f == nullptr) {
    r.problem = image + ": " + std::strerror(errno);
    return r;
  }
  std::fseek(f, 0, SEEK_END);
  uint64_t size = static_cast<uint64_t>(std::ftell(f));
  std::rewind(f);
  r.blocks = size / blockSize + (size % blockSize != 0);
  if (r.blocks != hashCount) {
    r.problem = "the image has " + std::to_string(r.blocks) + " blocks, the hash data " +
                std::to_string(hashCount);
  }
  Progress bar("verifying", size, quiet);
  std::vector<uint8_t> chunk(static_cast<size_t>(blockSize) * (1048576 / blockSize));
  uint64_t offset = 0;
  size_t n;
  while (offset / blockSize < hashCount && (n = std::fread(chunk.data(), 1, chunk.size(), f)) > 0) {
    size_t usable = n;
    uint64_t left = (hashCount - offset / blockSize) * blockSize;
    if (usable > left) usable = static_cast<size_t>(left);
    if (!ToolsISO_VerifyHashes(info, offset, chunk.data(), usable, FALSE)) {
      for (size_t at = 0; at < usable; at += blockSize) {
        size_t part = usable - at < blockSize ? usable - at : blockSize;
        if (!ToolsISO_VerifyHashes(info, offset + at, chunk.data() + at, part, FALSE)) {
          if (r.firstBad < 0) r.firstBad = static_cast<int64_t>((offset + at) / blockSize);
          r.bad++;
        }
      }
    }
    offset += n;
    bar.Update(offset);
  }
  std::fclose(f);
  return r;
}

int Check(const std::vector<std::string> &args) {
  bool json = false, quiet = false;
  std::string cert, sigPath;
  std::vector<std::string> files;
  int parsed = ArgParser(kCheck, [] { PrintCheckHelp(stdout); })
                   .Flag("--json", &json)
                   .Flag("--quiet", &quiet)
                   .Value("--cert", &cert)
                   .Value("--sig", &sigPath)
                   .Parse(args, &files);
  if (parsed >= 0) return parsed;
  if (files.size() != 2) return UsageError(kCheck, "HASHDATA and IMAGE are needed");
  if (sigPath.empty()) sigPath = CompanionSig(files[0]);

  LogLines log;
  const std::vector<std::string> &lines = log.lines;
  std::string bytes, error;
  ToolsIsoHashInfo *info = nullptr;
  if (ReadWhole(files[0], kMaxHashData, &bytes, &error)) {
    auto *copy = static_cast<uint8_t *>(std::malloc(bytes.size() + 1));
    if (copy != nullptr) std::memcpy(copy, bytes.data(), bytes.size());
    info = ToolsISO_ParseHashData(copy, bytes.size());
    if (info == nullptr) std::free(copy);
  }
  if (info == nullptr) {
    std::string reason = !error.empty() ? error : lines.empty() ? "refused" : lines[0];
    if (!reason.empty() && reason.back() == '\n') reason.pop_back();
    if (json) {
      std::printf("%s\n", JsonObject().Bool("hashData", false).Str("error", reason).Text().c_str());
    } else {
      std::fprintf(stderr, "tvxguest %s: %s\n", kCheck, reason.c_str());
    }
    return 2;
  }
  const auto *h = static_cast<const uint8_t *>(info->header);
  uint64_t sigOffset = tvx::LoadLe64(h + 80), sigSize = tvx::LoadLe64(h + 88);
  std::string sig;
  bool sigRead = true;
  if (sigOffset != 0) {
    sig.assign(reinterpret_cast<const char *>(info->data) + sigOffset, sigSize);
  } else {
    sigRead = ReadWhole(sigPath, kMaxHashData, &sig, &error);
  }
  size_t logged = lines.size();
  bool sigOk =
      sigRead && ToolsISO_VerifySignature(cert.empty() ? nullptr : cert.c_str(), sig.data(),
                                          sig.size(), info->data, info->dataSize - sigSize);
  std::string sigError = !sigRead ? error : lines.size() > logged ? lines[logged] : "";
  if (!sigError.empty() && sigError.back() == '\n') sigError.pop_back();
  BlockReport r = CheckBlocks(info, files[1], quiet);
  uint32_t blockSize = tvx::LoadLe32(h + 44);
  ToolsISO_FreeHashInfo(info);

  bool good = sigOk && r.bad == 0 && r.problem.empty();
  if (json) {
    JsonObject o;
    o.Bool("hashData", true)
        .Num("blockSize", blockSize)
        .Str("signature", sigOffset != 0 ? "embedded" : "detached")
        .Bool("signatureValid", sigOk)
        .StrOrNull("signatureError", sigOk ? nullptr : sigError.c_str())
        .Num("blocks", static_cast<int64_t>(r.blocks))
        .Num("badBlocks", static_cast<int64_t>(r.bad));
    if (r.firstBad >= 0) {
      o.Num("firstBadBlock", r.firstBad).Num("firstBadOffset", r.firstBad * blockSize);
    } else {
      o.Raw("firstBadBlock", "null").Raw("firstBadOffset", "null");
    }
    o.StrOrNull("problem", r.problem.empty() ? nullptr : r.problem.c_str()).Bool("ok", good);
    std::printf("%s\n", o.Text().c_str());
  } else {
    std::printf("signature: %s (%s)\n", sigOk ? "valid" : "INVALID",
                sigOffset != 0 ? "embedded" : sigPath.c_str());
    if (!sigOk) std::printf("  %s\n", sigError.c_str());
    if (r.bad == 0) {
      std::printf("blocks: all %llu good (%u bytes each)\n",
                  static_cast<unsigned long long>(r.blocks), blockSize);
    } else {
      std::printf("blocks: %llu of %llu BAD, first bad block %lld at offset 0x%llx\n",
                  static_cast<unsigned long long>(r.bad), static_cast<unsigned long long>(r.blocks),
                  static_cast<long long>(r.firstBad),
                  static_cast<unsigned long long>(r.firstBad) * blockSize);
    }
    if (!r.problem.empty()) std::printf("problem: %s\n", r.problem.c_str());
  }
  return good ? 0 : 1;
}

int RunHashData(const std::vector<std::string> &args) {
  return RunGroup("hashdata", "Write and check signed hash data of tools images.", args);
}

CommandRegistration reg({"hashdata", "write and check signed hash data of tools images",
                         RunHashData});
SubcommandRegistration create("hashdata", {"create", "hash and sign an image", Create});
SubcommandRegistration check("hashdata", {"check", "check an image against its hash data", Check});

}  // namespace
}  // namespace tvxcli
