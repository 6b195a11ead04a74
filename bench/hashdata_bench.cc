// ToolsISO_VerifyHashes over a 1 GiB image of 4096-byte blocks, against
// OpenSSL's SHA-256 of the same bytes in one piece (what `openssl dgst
// -sha256` computes). The per-block hashes cost a little more than one long
// digest; the ratio of the two throughputs is the figure to watch.
// scripts/run-bench also times whole processes against `openssl dgst`.
#include <benchmark/benchmark.h>
#include <openssl/evp.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "support/hashdata_builder.h"
#include "tvx_toolsiso.h"

namespace {

constexpr size_t kImageSize = size_t{1} << 30;
constexpr uint32_t kBlock = 4096;

struct Fixture {
  std::string image;
  ToolsIsoHashInfo *info = nullptr;
  Fixture() {
    image.resize(kImageSize);
    uint64_t x = 0x9e3779b97f4a7c15u;
    for (size_t i = 0; i < kImageSize; i += 8) {
      x ^= x << 13, x ^= x >> 7, x ^= x << 17;
      std::memcpy(image.data() + i, &x, 8);
    }
    std::string hd = tvxtest::BuildHashData(image);
    auto *buf = static_cast<uint8_t *>(std::malloc(hd.size()));
    std::memcpy(buf, hd.data(), hd.size());
    info = ToolsISO_ParseHashData(buf, hd.size());
  }
};

Fixture &Get() {
  static Fixture f;
  return f;
}

const uint8_t *Bytes(const Fixture &f) { return reinterpret_cast<const uint8_t *>(f.image.data()); }

// The whole image in one call, as a caller with the image mapped would.
void BM_VerifyHashesWhole(benchmark::State &state) {
  Fixture &f = Get();
  for (auto _ : state) {
    if (!ToolsISO_VerifyHashes(f.info, 0, Bytes(f), f.image.size(), FALSE)) {
      state.SkipWithError("verification failed");
      return;
    }
  }
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * f.image.size()));
}

// 1 MiB per call, as a reader that verifies what it reads.
void BM_VerifyHashesPerMiB(benchmark::State &state) {
  Fixture &f = Get();
  constexpr size_t kChunk = 1 << 20;
  for (auto _ : state) {
    for (size_t at = 0; at < f.image.size(); at += kChunk) {
      if (!ToolsISO_VerifyHashes(f.info, at, Bytes(f) + at, kChunk, FALSE)) {
        state.SkipWithError("verification failed");
        return;
      }
    }
  }
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * f.image.size()));
}

// The yardstick: one SHA-256 over the whole image.
void BM_OpensslSha256Whole(benchmark::State &state) {
  Fixture &f = Get();
  unsigned char md[EVP_MAX_MD_SIZE];
  unsigned int n = 0;
  for (auto _ : state) {
    EVP_Digest(f.image.data(), f.image.size(), md, &n, EVP_sha256(), nullptr);
    benchmark::DoNotOptimize(md);
  }
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * f.image.size()));
}

BENCHMARK(BM_VerifyHashesWhole)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(BM_VerifyHashesPerMiB)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(BM_OpensslSha256Whole)->Unit(benchmark::kMillisecond)->UseRealTime();

}  // namespace

BENCHMARK_MAIN();
