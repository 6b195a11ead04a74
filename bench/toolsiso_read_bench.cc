// Verified sequential reading of a 1 GiB tools image in 1 MiB requests
// through ToolsISO_LocalFileReadCB, from the page cache and from lighttpd on
// 127.0.0.1, against the yardstick of reading the same file and taking one
// SHA-256 over it (what `openssl dgst -sha256` does). The image, its hash
// data (2048-byte blocks) and a detached signature by a throw-away PKI are
// made once under $TVX_BENCH_MEDIA (or /tmp). scripts/run-bench also times
// the whole `tvxguest tools verify` process against `openssl dgst`.
#include <benchmark/benchmark.h>

#include <fcntl.h>
#include <openssl/evp.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "support/hashdata_builder.h"
#include "support/http_server.h"
#include "support/log_capture.h"
#include "support/test_pki.h"
#include "tvx_toolsiso_image.h"

namespace {

constexpr size_t kImageSize = size_t{1} << 30;
constexpr size_t kRequest = size_t{1} << 20;

struct Fixture {
  std::string dir, image, cert;
  bool ok = false;

  Fixture() {
    const char *media = std::getenv("TVX_BENCH_MEDIA");
    dir = std::string(media != nullptr ? media : "/tmp") + "/tools-read";
    std::filesystem::create_directories(dir);
    image = dir + "/linux.iso";
    std::string pki = dir + "/pki";
    cert = pki + "/tarvex.cert";
    if (tvxtest::RunArgv({tvxtest::SourceDir() + "/scripts/make-test-pki", pki}) != 0) return;
    if (std::filesystem::exists(image + ".sig")) {
      ok = true;
      return;
    }
    std::string bytes(kImageSize, '\0');
    uint64_t x = 0x9e3779b97f4a7c15u;
    for (size_t i = 0; i < kImageSize; i += 8) {
      x ^= x << 13, x ^= x >> 7, x ^= x << 17;
      std::memcpy(bytes.data() + i, &x, 8);
    }
    tvxtest::HashDataLayout layout;
    layout.blockSize = 2048;
    std::string hd = tvxtest::BuildHashData(bytes, layout);
    tvxtest::WriteFileOrDie(image, bytes);
    tvxtest::WriteFileOrDie(image + ".sha", hd);
    std::string sig = tvxtest::Sign(pki, "maker", hd, false);
    if (sig.empty()) return;
    tvxtest::WriteFileOrDie(image + ".sig", sig);
    ok = true;
  }
};

Fixture &Get() {
  static Fixture f;
  return f;
}

// ReadImage times reading the whole image through a verified handle that
// `open` makes, 1 MiB per read.
void ReadImage(benchmark::State &state, const std::function<void *(const Fixture &)> &open,
               Bool (*read)(void *, void *, size_t, uint64_t, size_t *), Bool (*close)(void *)) {
  Fixture &f = Get();
  if (!f.ok) return state.SkipWithError("fixture failed");
  void *h = open(f);
  if (h == nullptr) return state.SkipWithError("open failed");
  std::vector<char> buf(kRequest);
  for (auto _ : state) {
    for (uint64_t off = 0; off < kImageSize; off += kRequest) {
      size_t got = 0;
      if (!read(h, buf.data(), kRequest, off, &got) || got != kRequest) {
        close(h);
        return state.SkipWithError("read failed");
      }
    }
  }
  close(h);
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * kImageSize));
}

void BM_VerifiedReadLocal(benchmark::State &state) {
  auto open = [](const Fixture &f) -> void * {
    ToolsIsoLocalFile *h = nullptr;
    return ToolsISO_LocalFileOpenEx(f.image.c_str(), TRUE, f.cert.c_str(), &h) == TOOLSISO_OPEN_OK ? h : nullptr;
  };
  ReadImage(state, open, ToolsISO_LocalFileReadCB, ToolsISO_LocalFileCloseCB);
}

void BM_VerifiedReadHttp(benchmark::State &state) {
  tvxtest::WebServer web(Get().dir);
  if (!web.Ok()) return state.SkipWithError("lighttpd did not start");
  auto open = [&web](const Fixture &f) -> void * {
    ToolsIsoRemoteFile *h = nullptr;
    std::string url = web.Url("/linux.iso");
    return ToolsISO_RemoteFileOpenEx(url.c_str(), TRUE, f.cert.c_str(), &h) == TOOLSISO_OPEN_OK ? h : nullptr;
  };
  ReadImage(state, open, ToolsISO_RemoteFileReadCB, ToolsISO_RemoteFileCloseCB);
}

// The yardstick: read the file in 1 MiB pieces into one SHA-256.
void BM_ReadAndSha256(benchmark::State &state) {
  Fixture &f = Get();
  if (!f.ok) return state.SkipWithError("fixture failed");
  std::vector<char> buf(kRequest);
  unsigned char md[EVP_MAX_MD_SIZE];
  unsigned int n = 0;
  for (auto _ : state) {
    int fd = open(f.image.c_str(), O_RDONLY | O_CLOEXEC);
    EVP_MD_CTX *ctx = EVP_MD_CTX_new();
    EVP_DigestInit_ex(ctx, EVP_sha256(), nullptr);
    ssize_t got;
    while ((got = read(fd, buf.data(), buf.size())) > 0) {
      EVP_DigestUpdate(ctx, buf.data(), static_cast<size_t>(got));
    }
    EVP_DigestFinal_ex(ctx, md, &n);
    EVP_MD_CTX_free(ctx);
    close(fd);
    benchmark::DoNotOptimize(md);
  }
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * kImageSize));
}

BENCHMARK(BM_ReadAndSha256)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(BM_VerifiedReadLocal)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(BM_VerifiedReadHttp)->Unit(benchmark::kMillisecond)->UseRealTime();

}  // namespace

BENCHMARK_MAIN();
