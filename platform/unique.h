// Owners for the generic handles: malloc'd memory, stdio streams and POSIX
// file descriptors. This header includes no third-party library; the owners of
// a library's objects sit beside that library's adapter (xml_unique.h,
// openssl_unique.h, the curl handle inside http.cc) and specialise Deleter
// with TVX_MAKE_DELETER, so one spelling serves every handle:
//
//   tvx::UniquePtr<FILE> f(std::fopen(path, "r"));
//   tvx::UniqueFd fd(::open(path, O_RDONLY | O_CLOEXEC));
//   tvx::CharPtr text(Str_Asprintf(nullptr, "%s", name));
#pragma once

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <utility>

#include <unistd.h>

namespace tvx {

// Deleter<T> releases a T; specialised once per handle type. A null handle is
// never passed to the release function (std::unique_ptr guarantees it).
template <typename T>
struct Deleter;

#define TVX_MAKE_DELETER(type, release)                     \
  template <>                                               \
  struct Deleter<type> {                                    \
    void operator()(type *p) const noexcept { release(p); } \
  }

TVX_MAKE_DELETER(FILE, std::fclose);

template <typename T>
using UniquePtr = std::unique_ptr<T, Deleter<T>>;

// MallocDeleter releases what malloc, strdup, realpath and the platform's
// Util*/Str_* allocators return.
struct MallocDeleter {
  void operator()(void *p) const noexcept { std::free(p); }
};
template <typename T>
using MallocPtr = std::unique_ptr<T, MallocDeleter>;
using CharPtr = MallocPtr<char>;

// UniqueFd owns a POSIX file descriptor (-1 for none).
class UniqueFd {
 public:
  UniqueFd() noexcept = default;
  explicit UniqueFd(int fd) noexcept : fd_(fd) {}
  ~UniqueFd() { reset(); }
  UniqueFd(UniqueFd &&other) noexcept : fd_(other.release()) {}
  UniqueFd &operator=(UniqueFd &&other) noexcept {
    if (this != &other) reset(other.release());
    return *this;
  }
  UniqueFd(const UniqueFd &) = delete;
  UniqueFd &operator=(const UniqueFd &) = delete;

  int get() const noexcept { return fd_; }
  explicit operator bool() const noexcept { return fd_ >= 0; }
  int release() noexcept { return std::exchange(fd_, -1); }
  void reset(int fd = -1) noexcept {
    if (fd_ >= 0) ::close(fd_);
    fd_ = fd;
  }
  // Close closes now and reports close(2)'s verdict: on some file systems a
  // failed write-back only shows there, so writers must look at it.
  bool Close() noexcept {
    int fd = release();
    return fd < 0 || ::close(fd) == 0;
  }

 private:
  int fd_ = -1;
};

}  // namespace tvx
