#include "platform/file.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <string>
#include <sys/stat.h>
#include <unistd.h>
#include <vector>

#include "platform/fd_io.h"
#include "platform/unique.h"
#include "platform/util.h"

namespace {

char *Dup(const std::string &s) { return UtilSafeStrndup0(s.data(), s.size()); }

void StoreOptional(char **out, const std::string &s) {
  if (out != nullptr) *out = Dup(s);
}

bool IsMissing(const char *path) {
  struct stat st;
  return lstat(path, &st) != 0 && errno == ENOENT;
}

}  // namespace

void File_GetPathName(const char *path, char **out_dir, char **out_base) {
  std::string p(path);
  size_t slash = p.rfind('/');
  if (slash == std::string::npos) {
    StoreOptional(out_dir, "");
    StoreOptional(out_base, p);
    return;
  }
  std::string dir = p.substr(0, slash);
  while (!dir.empty() && dir.back() == '/') dir.pop_back();
  // The root keeps its slash so that "/x" is not mistaken for a bare name.
  if (dir.empty()) dir = "/";
  StoreOptional(out_dir, dir);
  StoreOptional(out_base, p.substr(slash + 1));
}

void File_SplitName(const char *path, char **out_volume, char **out_dir, char **out_base) {
  std::string p(path);
  size_t cut = p.rfind('/');
  cut = cut == std::string::npos ? 0 : cut + 1;
  StoreOptional(out_volume, "");
  StoreOptional(out_dir, p.substr(0, cut));
  StoreOptional(out_base, p.substr(cut));
}

char *File_PathJoin(const char *dir, const char *name) {
  std::string d(dir);
  const char *n = name;
  while (*n == '/') n++;
  if (d.empty()) return Dup(n);
  while (d.size() > 1 && d.back() == '/') d.pop_back();
  if (d.back() != '/') d += '/';
  return Dup(d + n);
}

Bool File_Exists(const char *path) {
  struct stat st;
  return stat(path, &st) == 0;
}

Bool File_IsDirectory(const char *path) {
  struct stat st;
  return stat(path, &st) == 0 && S_ISDIR(st.st_mode);
}

Bool File_IsFile(const char *path) {
  struct stat st;
  return stat(path, &st) == 0 && S_ISREG(st.st_mode);
}

Bool File_Copy(const char *src, const char *dst, Bool overwrite) {
  tvx::UniqueFd in(::open(src, O_RDONLY | O_CLOEXEC));
  struct stat sst;
  if (!in || fstat(in.get(), &sst) != 0 || !S_ISREG(sst.st_mode)) return FALSE;
  bool created = IsMissing(dst);
  // No O_TRUNC yet: the target may be the source itself under another name,
  // and emptying it would lose the data being copied.
  tvx::UniqueFd out(::open(dst, O_WRONLY | O_CREAT | O_CLOEXEC | (overwrite ? 0 : O_EXCL),
                  sst.st_mode & 07777));
  struct stat dstSt;
  if (!out || fstat(out.get(), &dstSt) != 0) return FALSE;
  if (dstSt.st_dev == sst.st_dev && dstSt.st_ino == sst.st_ino) return FALSE;
  bool ok = ftruncate(out.get(), 0) == 0;
  std::vector<char> buf(1 << 16);
  while (ok) {
    ssize_t n = ::read(in.get(), buf.data(), buf.size());
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) {
      ok = n == 0;
      break;
    }
    ok = tvx::WriteAll(out.get(), buf.data(), static_cast<size_t>(n));
  }
  ok = ok && fchmod(out.get(), sst.st_mode & 07777) == 0;
  ok = out.Close() && ok;
  // A half-written new file is worse than none.
  if (!ok && created) ::unlink(dst);
  return ok ? TRUE : FALSE;
}

Bool File_CreateDirectory(const char *path) {
  if (::mkdir(path, 0777) == 0) return TRUE;
  return errno == EEXIST && File_IsDirectory(path);
}

Bool File_CreateDirectoryHierarchy(const char *path, char **out_top) {
  if (out_top != nullptr) *out_top = nullptr;
  std::string p(path);
  if (p.empty()) return FALSE;
  size_t pos = 0;
  while (pos != std::string::npos) {
    pos = p.find('/', pos + 1);
    std::string prefix = p.substr(0, pos);
    if (prefix.empty() || prefix.back() == '/') continue;
    if (File_IsDirectory(prefix.c_str())) continue;
    if (::mkdir(prefix.c_str(), 0777) != 0) {
      if (errno != EEXIST || !File_IsDirectory(prefix.c_str())) return FALSE;
      continue;
    }
    if (out_top != nullptr && *out_top == nullptr) *out_top = Dup(prefix);
  }
  return TRUE;
}

namespace {

// Removes the entries below an open directory without following symbolic
// links, so a link inside the tree never takes anything outside it along.
bool RemoveContents(int dirFd) {
  DIR *d = fdopendir(dirFd);
  if (d == nullptr) {
    ::close(dirFd);
    return false;
  }
  bool ok = true;
  std::vector<std::string> names;
  while (struct dirent *e = readdir(d)) {
    if (std::strcmp(e->d_name, ".") != 0 && std::strcmp(e->d_name, "..") != 0) {
      names.emplace_back(e->d_name);
    }
  }
  int fd = dirfd(d);
  for (const auto &n : names) {
    struct stat st;
    if (fstatat(fd, n.c_str(), &st, AT_SYMLINK_NOFOLLOW) != 0) {
      ok = false;
      continue;
    }
    if (S_ISDIR(st.st_mode)) {
      int sub = openat(fd, n.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
      if (sub < 0 || !RemoveContents(sub)) ok = false;
      if (unlinkat(fd, n.c_str(), AT_REMOVEDIR) != 0) ok = false;
    } else if (unlinkat(fd, n.c_str(), 0) != 0) {
      ok = false;
    }
  }
  closedir(d);
  return ok;
}

}  // namespace

Bool File_DeleteDirectoryTree(const char *path) {
  int fd = ::open(path, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
  if (fd < 0) return FALSE;
  bool ok = RemoveContents(fd);
  return ::rmdir(path) == 0 && ok;
}

Bool File_DeleteEmptyDirectory(const char *path) { return ::rmdir(path) == 0; }

int File_ListDirectory(const char *path, char ***out_names) {
  if (out_names != nullptr) *out_names = nullptr;
  DIR *d = opendir(path);
  if (d == nullptr) return -1;
  std::vector<std::string> names;
  while (struct dirent *e = readdir(d)) {
    if (std::strcmp(e->d_name, ".") != 0 && std::strcmp(e->d_name, "..") != 0) {
      names.emplace_back(e->d_name);
    }
  }
  closedir(d);
  std::sort(names.begin(), names.end());
  if (out_names != nullptr) {
    char **list = static_cast<char **>(UtilSafeCalloc0(names.size() + 1, sizeof(char *)));
    for (size_t i = 0; i < names.size(); i++) list[i] = Dup(names[i]);
    *out_names = list;
  }
  return static_cast<int>(names.size());
}

int File_UnlinkIfExists(const char *path) {
  if (::unlink(path) == 0 || errno == ENOENT) return 0;
  return errno;
}

char *File_GetSafeTmpDir(Bool create) {
  const char *base = std::getenv("TMPDIR");
  if (base == nullptr || base[0] != '/') base = "/tmp";
  std::string dir = std::string(base) + "/tvxguest-" + std::to_string(geteuid());
  if (create && ::mkdir(dir.c_str(), 0700) != 0 && errno != EEXIST) return nullptr;
  // Only a real directory of ours that nobody else can write is private; a
  // planted link or a directory of another user is refused.
  struct stat st;
  if (lstat(dir.c_str(), &st) != 0 || !S_ISDIR(st.st_mode) || st.st_uid != geteuid() ||
      (st.st_mode & 077) != 0) {
    return nullptr;
  }
  return Dup(dir);
}
