#include "platform/fd_io.h"

#include <unistd.h>

#include <cerrno>

namespace tvx {

namespace {

// WriteLoop calls `write_some(bytes, count, done)` until every byte is out.
// A write that makes no progress is an I/O error, not a reason to spin.
template <typename WriteSome>
bool WriteLoop(const void *data, size_t len, WriteSome write_some) {
  const char *p = static_cast<const char *>(data);
  for (size_t done = 0; done < len;) {
    ssize_t n = write_some(p + done, len - done, done);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return false;
    if (n == 0) {
      errno = EIO;
      return false;
    }
    done += static_cast<size_t>(n);
  }
  return true;
}

}  // namespace

bool WriteAll(int fd, const void *data, size_t len) {
  return WriteLoop(data, len, [fd](const char *p, size_t n, size_t) { return ::write(fd, p, n); });
}

bool WriteAll(int fd, std::string_view data) { return WriteAll(fd, data.data(), data.size()); }

bool PwriteAll(int fd, const void *data, size_t len, uint64_t offset) {
  return WriteLoop(data, len, [fd, offset](const char *p, size_t n, size_t done) {
    return ::pwrite(fd, p, n, static_cast<off_t>(offset + done));
  });
}

bool PreadAll(int fd, void *buf, size_t len, uint64_t offset, size_t *out_count) {
  char *p = static_cast<char *>(buf);
  size_t done = 0;
  while (done < len) {
    ssize_t n = ::pread(fd, p + done, len - done, static_cast<off_t>(offset + done));
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) {
      *out_count = done;
      return false;
    }
    if (n == 0) break;
    done += static_cast<size_t>(n);
  }
  *out_count = done;
  return true;
}

bool ReadAllLimited(int fd, size_t limit, std::string *out) {
  char buf[65536];
  size_t total = 0;
  for (;;) {
    ssize_t n = ::read(fd, buf, sizeof buf);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return false;
    if (n == 0) return true;
    if (static_cast<size_t>(n) > limit - total) {
      errno = EFBIG;
      return false;
    }
    total += static_cast<size_t>(n);
    out->append(buf, static_cast<size_t>(n));
  }
}

}  // namespace tvx
