// Replace-by-rename. The temporary file is created by mkostemp (O_EXCL, mode
// 0600) in the target's own directory, so the rename stays within one file
// system and is atomic, and nobody can open the half-written file through a
// name of their choosing. Its final permission bits are set only after the
// contents are complete.
#include "platform/file_replace.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <string>

#include "platform/fd_io.h"
#include "platform/unique.h"

namespace {

// Makes the rename itself durable. The new file is already in place when this
// fails, so there is nothing to undo and nothing to report.
void SyncDirectory(const std::string &dir) {
  tvx::UniqueFd d(::open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (d) ::fsync(d.get());
}

int Fail(int err, int *out_errno) {
  if (out_errno != nullptr) *out_errno = err;
  return FALSE;
}

// Resolves which name gets replaced and what the old file (if any) was.
int ResolveTarget(const char *path, const FileReplaceOptions &options, std::string *target,
                  struct stat *old, bool *exists) {
  struct stat st;
  *exists = false;
  if (::lstat(path, &st) != 0) {
    if (errno != ENOENT || options.mustExist) return errno;
    *target = path;
    return 0;
  }
  if (S_ISLNK(st.st_mode) && options.links == FileLinkPolicy::kFollowLink) {
    tvx::CharPtr real(::realpath(path, nullptr));
    if (!real) return errno;
    if (::stat(real.get(), &st) != 0) return errno;
    *target = real.get();
  } else {
    *target = path;
  }
  if (S_ISLNK(st.st_mode)) {
    // kReplaceLink: the link is replaced by a new regular file.
    if (options.mustExist) return ENOENT;
    return 0;
  }
  if (S_ISDIR(st.st_mode)) return EISDIR;
  if (!S_ISREG(st.st_mode)) return EINVAL;
  *old = st;
  *exists = true;
  return 0;
}

}  // namespace

Bool File_ReplaceWith(const char *path, const FileReplaceOptions &options,
                      const std::function<bool(int fd, const char *tmpPath)> &fill,
                      int *out_errno) {
  if (path == nullptr || *path == '\0') return Fail(EINVAL, out_errno);
  std::string target;
  struct stat old {};
  bool exists = false;
  if (int err = ResolveTarget(path, options, &target, &old, &exists); err != 0) {
    return Fail(err, out_errno);
  }
  size_t slash = target.rfind('/');
  std::string dir = slash == std::string::npos ? "." : (slash == 0 ? "/" : target.substr(0, slash));
  std::string base = slash == std::string::npos ? target : target.substr(slash + 1);
  if (base.empty()) return Fail(EISDIR, out_errno);
  std::string tmp = (slash == std::string::npos ? std::string() : target.substr(0, slash + 1)) +
                    "." + base + ".XXXXXX";

  tvx::UniqueFd fd(::mkostemp(tmp.data(), O_CLOEXEC));
  if (!fd) return Fail(errno, out_errno);

  mode_t mode = exists ? (old.st_mode & 07777) : (options.newMode & 07777);
  if (options.secret) mode = S_IRUSR | S_IWUSR;
  bool ok = fill(fd.get(), tmp.c_str());
  int err = ok ? 0 : (errno != 0 ? errno : EIO);
  // Ownership can only be kept by a privileged caller; an unprivileged one
  // owns what it writes anyway, so a refusal here is not an error.
  if (ok && exists) (void)::fchown(fd.get(), old.st_uid, old.st_gid);
  if (ok && ::fchmod(fd.get(), mode) != 0) ok = false, err = errno;
  if (ok && ::fsync(fd.get()) != 0) ok = false, err = errno;
  if (!fd.Close() && ok) ok = false, err = errno;
  if (ok && ::rename(tmp.c_str(), target.c_str()) != 0) ok = false, err = errno;
  if (!ok) {
    ::unlink(tmp.c_str());
    return Fail(err == 0 ? EIO : err, out_errno);
  }
  SyncDirectory(dir);
  return TRUE;
}

Bool File_ReplaceContents(const char *path, std::string_view data,
                          const FileReplaceOptions &options, int *out_errno) {
  return File_ReplaceWith(
      path, options, [data](int fd, const char *) { return tvx::WriteAll(fd, data); }, out_errno);
}
