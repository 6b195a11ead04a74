// One read interface under both media readers: a host file read with pread,
// a caller's callbacks, or bytes in memory (tests and fuzzing).
#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <memory>

namespace tvx {

class BlockSource {
 public:
  virtual ~BlockSource() = default;
  // ReadAt reads exactly `len` bytes at `offset`; false when not all of them
  // could be read (past the end included).
  virtual bool ReadAt(uint64_t offset, void *buf, size_t len) = 0;
  // Size returns the byte size, or 0 when the source cannot tell.
  virtual uint64_t Size() const = 0;
};

using BlockSourcePtr = std::unique_ptr<BlockSource>;

// OpenFileSource opens a host file read-only; null (errno set) when it
// cannot, or when it is neither a regular file nor a block device (a FIFO or
// a directory, which could block the caller or hold no image).
BlockSourcePtr OpenFileSource(const char *path);

using SourceReadFn = unsigned char (*)(void *handle, void *buf, size_t len, uint64_t offset);
using SourceCloseFn = unsigned char (*)(void *handle);
// CallbackSource reads through the caller's callbacks; `close` runs once, when
// the source is destroyed.
BlockSourcePtr CallbackSource(SourceReadFn read, SourceCloseFn close, void *handle);

// MemorySource reads from bytes the caller keeps alive.
BlockSourcePtr MemorySource(const uint8_t *data, size_t size);

// Bytes read by all sources of the process (benchmarks look at it).
extern std::atomic<uint64_t> g_sourceBytesRead;

}  // namespace tvx
