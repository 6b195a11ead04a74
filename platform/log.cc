#include "platform/log.h"

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <string>

namespace {

struct SinkSlot {
  TvxLogSink sink;
  void *ctx;
  SinkSlot *older;
};

// One pointer swapped atomically, so a host may install a sink while other
// threads are logging. Replaced slots are kept (chained from the newest) since
// another thread may still be using one; sinks change a handful of times per
// process at most.
std::atomic<SinkSlot *> g_slot{nullptr};
std::atomic<SinkSlot *> g_allSlots{nullptr};

std::string FormatV(const char *fmt, va_list args) {
  va_list copy;
  va_copy(copy, args);
  char small[512];
  int n = std::vsnprintf(small, sizeof small, fmt, copy);
  va_end(copy);
  if (n < 0) return std::string(fmt);
  if (static_cast<size_t>(n) < sizeof small) return std::string(small, n);
  std::string out(static_cast<size_t>(n) + 1, '\0');
  std::vsnprintf(out.data(), out.size(), fmt, args);
  out.resize(static_cast<size_t>(n));
  return out;
}

}  // namespace

extern "C" TVX_EXPORT void Tvx_SetLogSink(TvxLogSink sink, void *ctx) {
  SinkSlot *slot = nullptr;
  if (sink != nullptr) {
    slot = new SinkSlot{sink, ctx, g_allSlots.load()};
    while (!g_allSlots.compare_exchange_weak(slot->older, slot)) {
    }
  }
  g_slot.store(slot, std::memory_order_release);
}

void LogV(TvxLogLevel level, const char *fmt, va_list args) {
  SinkSlot *slot = g_slot.load(std::memory_order_acquire);
  if (slot == nullptr && level != TVX_LOG_PANIC) return;
  std::string text = FormatV(fmt, args);
  if (slot != nullptr) {
    slot->sink(level, text.c_str(), slot->ctx);
  } else {
    std::fputs(text.c_str(), stderr);
  }
}

void Log(const char *fmt, ...) {
  va_list args;
  va_start(args, fmt);
  LogV(TVX_LOG_INFO, fmt, args);
  va_end(args);
}

void Warning(const char *fmt, ...) {
  va_list args;
  va_start(args, fmt);
  LogV(TVX_LOG_WARNING, fmt, args);
  va_end(args);
}

void Log_Level(int level, const char *fmt, ...) {
  // Numeric levels count detail: the lower, the more important.
  TvxLogLevel l = level <= 0 ? TVX_LOG_WARNING : level <= 4 ? TVX_LOG_INFO : TVX_LOG_VERBOSE;
  va_list args;
  va_start(args, fmt);
  LogV(l, fmt, args);
  va_end(args);
}

void Panic(const char *fmt, ...) {
  va_list args;
  va_start(args, fmt);
  LogV(TVX_LOG_PANIC, fmt, args);
  va_end(args);
  std::abort();
}
