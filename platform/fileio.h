// Host file I/O over POSIX descriptors, with the result codes the services
// expect. 0 is success and 5 is end of file on reads.
#pragma once

#include "tvx_base.h"

#include <cstddef>
#include <cstdint>

enum FileIOResult {
  FILEIO_SUCCESS = 0,
  FILEIO_CANCELLED = 1,
  FILEIO_ERROR = 2,
  FILEIO_OPEN_ERROR_EXIST = 3,
  FILEIO_LOCK_FAILED = 4,
  FILEIO_READ_ERROR_EOF = 5,
  FILEIO_FILE_NOT_FOUND = 6,
  FILEIO_NO_PERMISSION = 7,
  FILEIO_FILE_NAME_TOO_LONG = 8,
  FILEIO_WRITE_ERROR_FBIG = 9,
  FILEIO_WRITE_ERROR_NOSPC = 10,
  FILEIO_ERROR_LAST
};

// Access bits.
enum : unsigned {
  FILEIO_OPEN_ACCESS_READ = 0x0001,
  FILEIO_OPEN_ACCESS_WRITE = 0x0002,
  FILEIO_OPEN_SYNC = 0x0004,
  FILEIO_OPEN_EXCLUSIVE_READ = 0x0800,
  FILEIO_OPEN_LARGEFILE = 0x2000,  // accepted and ignored: every file is large
};

// Actions: what to do when the file exists or not.
enum FileIOOpenAction {
  FILEIO_OPEN = 0,              // open an existing file; fail if absent
  FILEIO_OPEN_EMPTY = 1,        // open an existing file and empty it
  FILEIO_OPEN_CREATE = 2,       // open, creating it when absent
  FILEIO_OPEN_CREATE_SAFE = 3,  // create; fail if it exists
  FILEIO_OPEN_CREATE_EMPTY = 4, // create, or empty an existing file
};

struct FileIODescriptor {
  int fd;  // -1 when invalid
};

void FileIO_Invalidate(FileIODescriptor *fd);
Bool FileIO_IsValid(const FileIODescriptor *fd);
// FileIO_Open opens with the access bits (read, write or both; 0x2001 is read
// of a large file) and an action. Results: SUCCESS; FILE_NOT_FOUND,
// NO_PERMISSION, OPEN_ERROR_EXIST (CREATE_SAFE on an existing file),
// FILE_NAME_TOO_LONG, LOCK_FAILED; ERROR for a directory, for no access bit,
// an unknown action, or emptying without write access. `fd` is invalid on
// failure.
FileIOResult FileIO_Open(FileIODescriptor *fd, const char *path, unsigned access, int action);
// FileIO_Read reads up to `len` bytes; FILEIO_SUCCESS when all were read,
// FILEIO_READ_ERROR_EOF when end of file came first (*out_count tells how
// many arrived, possibly 0). `out_count` is optional.
FileIOResult FileIO_Read(FileIODescriptor *fd, void *buf, size_t len, size_t *out_count);
FileIOResult FileIO_Write(FileIODescriptor *fd, const void *buf, size_t len, size_t *out_count);
// FileIO_Pread reads exactly `len` bytes at `offset`: SUCCESS, or
// READ_ERROR_EOF when the file ends before, or ERROR.
FileIOResult FileIO_Pread(FileIODescriptor *fd, void *buf, size_t len, uint64_t offset);
// FileIO_GetSize returns the size in bytes, or all bits set on failure.
uint64_t FileIO_GetSize(const FileIODescriptor *fd);
// FileIO_Close closes and invalidates `fd`; closing an invalid descriptor is
// a harmless SUCCESS.
FileIOResult FileIO_Close(FileIODescriptor *fd);
// FileIO_ErrorEnglish describes a result code (constant text).
const char *FileIO_ErrorEnglish(FileIOResult result);
