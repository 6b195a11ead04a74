#include "platform/fileio.h"

#include <cerrno>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

FileIOResult FromErrno(int err) {
  switch (err) {
    case ENOENT:
    case ENOTDIR:
      return FILEIO_FILE_NOT_FOUND;
    case EACCES:
    case EPERM:
    case EROFS:
      return FILEIO_NO_PERMISSION;
    case EEXIST:
      return FILEIO_OPEN_ERROR_EXIST;
    case ENAMETOOLONG:
      return FILEIO_FILE_NAME_TOO_LONG;
    case EFBIG:
      return FILEIO_WRITE_ERROR_FBIG;
    case ENOSPC:
    case EDQUOT:
      return FILEIO_WRITE_ERROR_NOSPC;
    case EWOULDBLOCK:
      return FILEIO_LOCK_FAILED;
    default:
      return FILEIO_ERROR;
  }
}

}  // namespace

void FileIO_Invalidate(FileIODescriptor *fd) { fd->fd = -1; }

Bool FileIO_IsValid(const FileIODescriptor *fd) { return fd->fd >= 0; }

FileIOResult FileIO_Open(FileIODescriptor *fd, const char *path, unsigned access, int action) {
  FileIO_Invalidate(fd);
  bool rd = (access & FILEIO_OPEN_ACCESS_READ) != 0;
  bool wr = (access & FILEIO_OPEN_ACCESS_WRITE) != 0;
  if (!rd && !wr) return FILEIO_ERROR;
  int flags = (rd && wr ? O_RDWR : wr ? O_WRONLY : O_RDONLY) | O_CLOEXEC;
  if ((access & FILEIO_OPEN_SYNC) != 0) flags |= O_SYNC;
  switch (action) {
    case FILEIO_OPEN: break;
    case FILEIO_OPEN_EMPTY: flags |= O_TRUNC; break;
    case FILEIO_OPEN_CREATE: flags |= O_CREAT; break;
    case FILEIO_OPEN_CREATE_SAFE: flags |= O_CREAT | O_EXCL; break;
    case FILEIO_OPEN_CREATE_EMPTY: flags |= O_CREAT | O_TRUNC; break;
    default: return FILEIO_ERROR;
  }
  // Emptying a file is a write; refuse it rather than let O_TRUNC act on a
  // descriptor opened for reading only.
  if ((flags & O_TRUNC) != 0 && !wr) return FILEIO_ERROR;
  int f;
  do {
    f = ::open(path, flags, 0666);
  } while (f < 0 && errno == EINTR);
  if (f < 0) return FromErrno(errno);
  // A directory opens fine for reading but every read then fails; say so now.
  struct stat st;
  if (fstat(f, &st) != 0 || S_ISDIR(st.st_mode)) {
    ::close(f);
    return FILEIO_ERROR;
  }
  if ((access & FILEIO_OPEN_EXCLUSIVE_READ) != 0 && flock(f, LOCK_EX | LOCK_NB) != 0) {
    int err = errno;
    ::close(f);
    return err == EWOULDBLOCK ? FILEIO_LOCK_FAILED : FromErrno(err);
  }
  fd->fd = f;
  return FILEIO_SUCCESS;
}

FileIOResult FileIO_Read(FileIODescriptor *fd, void *buf, size_t len, size_t *out_count) {
  size_t done = 0;
  FileIOResult result = FILEIO_SUCCESS;
  if (fd->fd < 0) {
    result = FILEIO_ERROR;
  }
  while (result == FILEIO_SUCCESS && done < len) {
    ssize_t n = ::read(fd->fd, static_cast<char *>(buf) + done, len - done);
    if (n < 0) {
      if (errno == EINTR) continue;
      result = FromErrno(errno);
    } else if (n == 0) {
      result = FILEIO_READ_ERROR_EOF;
    } else {
      done += static_cast<size_t>(n);
    }
  }
  if (out_count != nullptr) *out_count = done;
  return result;
}

FileIOResult FileIO_Write(FileIODescriptor *fd, const void *buf, size_t len, size_t *out_count) {
  size_t done = 0;
  FileIOResult result = FILEIO_SUCCESS;
  if (fd->fd < 0) {
    result = FILEIO_ERROR;
  }
  while (result == FILEIO_SUCCESS && done < len) {
    ssize_t n = ::write(fd->fd, static_cast<const char *>(buf) + done, len - done);
    if (n < 0) {
      if (errno == EINTR) continue;
      result = FromErrno(errno);
    } else {
      done += static_cast<size_t>(n);
    }
  }
  if (out_count != nullptr) *out_count = done;
  return result;
}

FileIOResult FileIO_Pread(FileIODescriptor *fd, void *buf, size_t len, uint64_t offset) {
  if (fd->fd < 0 || offset > static_cast<uint64_t>(INT64_MAX)) return FILEIO_ERROR;
  size_t done = 0;
  while (done < len) {
    ssize_t n = ::pread(fd->fd, static_cast<char *>(buf) + done, len - done,
                        static_cast<off_t>(offset + done));
    if (n < 0) {
      if (errno == EINTR) continue;
      return FILEIO_ERROR;
    }
    if (n == 0) return FILEIO_READ_ERROR_EOF;
    done += static_cast<size_t>(n);
  }
  return FILEIO_SUCCESS;
}

uint64_t FileIO_GetSize(const FileIODescriptor *fd) {
  struct stat st;
  if (fd->fd < 0 || fstat(fd->fd, &st) != 0) return UINT64_MAX;
  return static_cast<uint64_t>(st.st_size);
}

FileIOResult FileIO_Close(FileIODescriptor *fd) {
  if (fd->fd < 0) return FILEIO_SUCCESS;
  // The descriptor is gone after close() even when it reports an error, so
  // it is never retried (a retry could close a descriptor reused meanwhile).
  int rc = ::close(fd->fd);
  int err = errno;
  FileIO_Invalidate(fd);
  if (rc != 0 && err != EINTR) return FromErrno(err);
  return FILEIO_SUCCESS;
}

const char *FileIO_ErrorEnglish(FileIOResult result) {
  switch (result) {
    case FILEIO_SUCCESS: return "Success";
    case FILEIO_CANCELLED: return "The operation was cancelled by the user";
    case FILEIO_ERROR: return "Error";
    case FILEIO_OPEN_ERROR_EXIST: return "The file already exists";
    case FILEIO_LOCK_FAILED: return "Failed to lock the file";
    case FILEIO_READ_ERROR_EOF: return "Tried to read beyond the end of the file";
    case FILEIO_FILE_NOT_FOUND: return "Could not find the file";
    case FILEIO_NO_PERMISSION: return "Insufficient permission to access the file";
    case FILEIO_FILE_NAME_TOO_LONG: return "The file name is too long";
    case FILEIO_WRITE_ERROR_FBIG: return "The file is too large";
    case FILEIO_WRITE_ERROR_NOSPC: return "There is no space left on the device";
    case FILEIO_ERROR_LAST: break;
  }
  return "Unknown error";
}
