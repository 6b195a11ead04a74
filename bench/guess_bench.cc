// Guess_Guest on large sparse images whose setup files lie near the end:
// recognition must cost a few directory and file reads, whatever the size
// of the image. Reports time per call and the bytes read from the image.
//
// Images come from scripts/run-bench (env TVX_BENCH_MEDIA).
#include <benchmark/benchmark.h>

#include <cstdlib>
#include <string>
#include <sys/stat.h>

#include "platform/blocksource.h"
#include "tvx_guess.h"

namespace {

std::string MediaPath(const char *name) {
  const char *dir = std::getenv("TVX_BENCH_MEDIA");
  return std::string(dir != nullptr ? dir : "bench-media") + "/" + name;
}

void BM_GuessGuest(benchmark::State &state, const char *image, int expected) {
  std::string path = MediaPath(image);
  struct stat st;
  if (stat(path.c_str(), &st) != 0) {
    state.SkipWithError(("missing " + path).c_str());
    return;
  }
  uint64_t before = tvx::g_sourceBytesRead.load();
  GuessResult result;
  for (auto _ : state) {
    int rc = Guess_Guest(path.c_str(), nullptr, &result);
    if (rc != expected) {
      state.SkipWithError("unexpected Guess_Guest result");
      return;
    }
    benchmark::DoNotOptimize(result);
  }
  double calls = static_cast<double>(state.iterations());
  state.counters["image_GiB"] = static_cast<double>(st.st_size) / (1u << 30);
  state.counters["bytes_read_per_call"] =
      static_cast<double>(tvx::g_sourceBytesRead.load() - before) / calls;
}

// Recognised by the first recogniser of the sequence.
BENCHMARK_CAPTURE(BM_GuessGuest, winxppro_4GiB, "winxppro-4g.iso", 0)
    ->Unit(benchmark::kMicrosecond);
// Recognised by the second.
BENCHMARK_CAPTURE(BM_GuessGuest, win98_4GiB, "win98-4g.iso", 0)->Unit(benchmark::kMicrosecond);
// A UDF bridge medium, recognised by the third recogniser from its UDF tree.
BENCHMARK_CAPTURE(BM_GuessGuest, win10_udf_4GiB, "win10-4g.iso", 0)
    ->Unit(benchmark::kMicrosecond);
// Recognised sixth, after every Windows and Red Hat probe has missed.
BENCHMARK_CAPTURE(BM_GuessGuest, ubuntu_4GiB, "ubuntu-4g.iso", 0)
    ->Unit(benchmark::kMicrosecond);
// Known to no recogniser: the whole sequence runs.
BENCHMARK_CAPTURE(BM_GuessGuest, unknown_4GiB, "unknown-4g.iso", 1)
    ->Unit(benchmark::kMicrosecond);

}  // namespace

BENCHMARK_MAIN();
