// The rename trick: a reader of the file sees either the old or the new text,
// never a truncated one, even when the process dies or the disk fills up half
// way through the write.
#include "lib/ini/ini_replace.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>

namespace tvx::ini {
namespace {

struct FreeDeleter {
  void operator()(char *p) const { std::free(p); }
};

class Fd {
 public:
  explicit Fd(int fd) : fd_(fd) {}
  ~Fd() {
    if (fd_ >= 0) ::close(fd_);
  }
  Fd(const Fd &) = delete;
  Fd &operator=(const Fd &) = delete;
  int get() const { return fd_; }
  // Close reports the error of close(2): on some file systems a failed
  // write-back only shows there.
  bool Close() {
    int fd = fd_;
    fd_ = -1;
    return ::close(fd) == 0;
  }

 private:
  int fd_;
};

bool WriteAll(int fd, std::string_view text) {
  while (!text.empty()) {
    ssize_t n = ::write(fd, text.data(), text.size());
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) return false;
    text.remove_prefix(static_cast<size_t>(n));
  }
  return true;
}

// Makes the rename itself durable; failure here cannot be undone and the new
// file is already in place, so it is not reported.
void SyncDirectory(const std::string &dir) {
  Fd d(::open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (d.get() >= 0) ::fsync(d.get());
}

}  // namespace

bool ReplaceFileContents(const char *path, std::string_view text) {
  std::unique_ptr<char, FreeDeleter> real(::realpath(path, nullptr));
  if (!real) return false;
  struct stat st;
  if (::stat(real.get(), &st) != 0 || !S_ISREG(st.st_mode)) return false;

  std::string target(real.get());
  size_t slash = target.rfind('/');
  std::string dir = slash == 0 ? "/" : target.substr(0, slash);
  std::string tmpl = target.substr(0, slash + 1) + "." + target.substr(slash + 1) + ".XXXXXX";
  Fd fd(::mkostemp(tmpl.data(), O_CLOEXEC));
  if (fd.get() < 0) return false;

  bool ok = WriteAll(fd.get(), text);
  // Ownership can only be kept by a privileged caller; an unprivileged one
  // owns the file it writes anyway.
  if (ok) (void)::fchown(fd.get(), st.st_uid, st.st_gid);
  ok = ok && ::fchmod(fd.get(), st.st_mode & 07777) == 0;
  ok = ok && ::fsync(fd.get()) == 0;
  ok = fd.Close() && ok;
  ok = ok && ::rename(tmpl.c_str(), target.c_str()) == 0;
  if (!ok) {
    ::unlink(tmpl.c_str());
    return false;
  }
  SyncDirectory(dir);
  return true;
}

}  // namespace tvx::ini
