#include "platform/fd_io.h"

#include <unistd.h>

#include <cerrno>

namespace tvx {

bool WriteAll(int fd, const void *data, size_t len) {
  const char *p = static_cast<const char *>(data);
  while (len > 0) {
    ssize_t n = ::write(fd, p, len);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return false;
    if (n == 0) {
      errno = EIO;
      return false;
    }
    p += n;
    len -= static_cast<size_t>(n);
  }
  return true;
}

bool WriteAll(int fd, std::string_view data) { return WriteAll(fd, data.data(), data.size()); }

bool PwriteAll(int fd, const void *data, size_t len, uint64_t offset) {
  const char *p = static_cast<const char *>(data);
  while (len > 0) {
    ssize_t n = ::pwrite(fd, p, len, static_cast<off_t>(offset));
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return false;
    if (n == 0) {
      errno = EIO;
      return false;
    }
    p += n;
    len -= static_cast<size_t>(n);
    offset += static_cast<uint64_t>(n);
  }
  return true;
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
