#include "platform/blocksource.h"

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <vector>

namespace tvx {

std::atomic<uint64_t> g_sourceBytesRead{0};

namespace {

class FileSource final : public BlockSource {
 public:
  FileSource(int fd, uint64_t size) : fd_(fd), size_(size) {}
  ~FileSource() override { ::close(fd_); }

  bool ReadAt(uint64_t offset, void *buf, size_t len) override {
    if (offset > size_ || len > size_ - offset) return false;
    auto *p = static_cast<char *>(buf);
    while (len > 0) {
      ssize_t n = ::pread(fd_, p, len, static_cast<off_t>(offset));
      if (n < 0 && errno == EINTR) continue;
      if (n <= 0) return false;
      g_sourceBytesRead.fetch_add(static_cast<uint64_t>(n), std::memory_order_relaxed);
      p += n;
      len -= static_cast<size_t>(n);
      offset += static_cast<uint64_t>(n);
    }
    return true;
  }
  uint64_t Size() const override { return size_; }

 private:
  int fd_;
  uint64_t size_;
};

class CbSource final : public BlockSource {
 public:
  CbSource(SourceReadFn read, SourceCloseFn close, void *handle)
      : read_(read), close_(close), handle_(handle) {}
  ~CbSource() override {
    if (close_ != nullptr) close_(handle_);
  }
  // Callers' readers see whole aligned pieces: a reader that checks each
  // block of the image against a hash (the verified tools image, with
  // blocks of up to 4096 bytes) cannot serve a slice of a block. A read
  // widened to 4096 bytes can fail at the end of an image that is an odd
  // number of 2048-byte sectors long; it is tried again widened to the
  // sector, and last as asked.
  bool ReadAt(uint64_t offset, void *buf, size_t len) override {
    if (len == 0) return true;
    if (len > UINT64_MAX - kWide || offset > UINT64_MAX - kWide - len) return false;
    for (uint64_t unit : {kWide, kSector}) {
      uint64_t first = offset / unit * unit;
      uint64_t end = (offset + len + unit - 1) / unit * unit;
      if (first == offset && end == offset + len) break;
      scratch_.resize(static_cast<size_t>(end - first));
      if (read_(handle_, scratch_.data(), scratch_.size(), first) != 0) {
        std::memcpy(buf, scratch_.data() + (offset - first), len);
        g_sourceBytesRead.fetch_add(scratch_.size(), std::memory_order_relaxed);
        return true;
      }
    }
    if (read_(handle_, buf, len, offset) == 0) return false;
    g_sourceBytesRead.fetch_add(len, std::memory_order_relaxed);
    return true;
  }
  uint64_t Size() const override { return 0; }

 private:
  static constexpr uint64_t kWide = 4096, kSector = 2048;
  SourceReadFn read_;
  SourceCloseFn close_;
  void *handle_;
  std::vector<unsigned char> scratch_;
};

class MemSource final : public BlockSource {
 public:
  MemSource(const uint8_t *data, size_t size) : data_(data), size_(size) {}
  bool ReadAt(uint64_t offset, void *buf, size_t len) override {
    if (offset > size_ || len > size_ - offset) return false;
    if (len != 0) std::memcpy(buf, data_ + offset, len);
    g_sourceBytesRead.fetch_add(len, std::memory_order_relaxed);
    return true;
  }
  uint64_t Size() const override { return size_; }

 private:
  const uint8_t *data_;
  size_t size_;
};

}  // namespace

BlockSourcePtr OpenFileSource(const char *path) {
  if (path == nullptr) return nullptr;
  // Opening a FIFO blocks until a writer comes: open without waiting and
  // take only what can hold an image, then read in the ordinary blocking way.
  int fd = ::open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK);
  if (fd < 0) return nullptr;
  struct stat st {};
  int flags = -1;
  if (::fstat(fd, &st) != 0 || !(S_ISREG(st.st_mode) || S_ISBLK(st.st_mode)) ||
      (flags = ::fcntl(fd, F_GETFL)) < 0 || ::fcntl(fd, F_SETFL, flags & ~O_NONBLOCK) != 0) {
    int err = S_ISREG(st.st_mode) || S_ISBLK(st.st_mode) ? errno : EINVAL;
    ::close(fd);
    errno = err;
    return nullptr;
  }
  uint64_t size = static_cast<uint64_t>(st.st_size);
  if (S_ISBLK(st.st_mode)) {
    off_t end = ::lseek(fd, 0, SEEK_END);
    size = end > 0 ? static_cast<uint64_t>(end) : 0;
  }
  return std::make_unique<FileSource>(fd, size);
}

BlockSourcePtr CallbackSource(SourceReadFn read, SourceCloseFn close, void *handle) {
  if (read == nullptr) return nullptr;
  return std::make_unique<CbSource>(read, close, handle);
}

BlockSourcePtr MemorySource(const uint8_t *data, size_t size) {
  return std::make_unique<MemSource>(data, size);
}

}  // namespace tvx
