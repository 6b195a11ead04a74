// Whole files between the host and a FAT floppy image, one 512-byte sector
// at a time through a stack buffer, so a file of any size is copied without
// heap allocation.
#include "platform/fileio.h"
#include "platform/log.h"
#include "tvx_floppy.h"

namespace {

constexpr size_t kBlock = 512;

}  // namespace

Bool AddFileToFloppyImg(FATDirectory *dir, const char *hostPath, const char *imageName) {
  static const char kFn[] = "AddFileToFloppyImg";
  unsigned char buf[kBlock];
  FileIODescriptor fd;
  FileIO_Invalidate(&fd);
  FileIOResult io = FileIO_Open(&fd, hostPath, FILEIO_OPEN_ACCESS_READ, FILEIO_OPEN);
  if (io != FILEIO_SUCCESS) {
    Log("%s: FileIO_Open failed, error: %d\n", kFn, io);
    return FALSE;
  }
  Bool ok = FALSE;
  FATFile *file = nullptr;
  // An existing file is cut and rewritten in place rather than deleted and
  // created again.
  unsigned long err = FAT_OpenFile(dir, imageName, &file);
  if (err == FAT_OK) {
    err = FAT_SetFileSize(file, 0);
    if (err != FAT_OK) Log("%s: FAT_SetFileSize failed, error: %lu\n", kFn, err);
  } else {
    err = FAT_CreateFile(dir, imageName, &file);
    if (err != FAT_OK) Log("%s: FAT_CreateFile failed, error: %lu\n", kFn, err);
  }
  for (uint64_t offset = 0; err == FAT_OK;) {
    size_t count = 0;
    io = FileIO_Read(&fd, buf, sizeof buf, &count);
    if (io != FILEIO_SUCCESS && io != FILEIO_READ_ERROR_EOF) {
      Log("%s: FileIO_Read failed, error: %d\n", kFn, io);
      break;
    }
    size_t written = 0;
    err = FAT_WriteFile(file, offset, buf, count, &written);
    if (err != FAT_OK) {
      Log("%s: FAT_WriteFile failed, error: %lu\n", kFn, err);
      break;
    }
    offset += written;
    if (io == FILEIO_READ_ERROR_EOF) {
      ok = TRUE;
      break;
    }
  }
  // The volume is written back when the file closes: a failure there is a
  // failed write.
  if (file != nullptr && (err = FAT_CloseFile(file)) != FAT_OK && ok) {
    Log("%s: FAT_WriteFile failed, error: %lu\n", kFn, err);
    ok = FALSE;
  }
  FileIO_Close(&fd);
  return ok;
}

Bool GetFileFromFloppyImg(FATDirectory *dir, const char *imageName, const char *hostPath) {
  static const char kFn[] = "GetFileFromFloppyImg";
  unsigned char buf[kBlock];
  FATFile *file = nullptr;
  unsigned long err = FAT_OpenFile(dir, imageName, &file);
  if (err != FAT_OK) {
    Log("%s: FAT_OpenFile failed, error: %lu\n", kFn, err);
    return FALSE;
  }
  Bool ok = FALSE;
  FileIODescriptor fd;
  FileIO_Invalidate(&fd);
  FileIOResult io =
      FileIO_Open(&fd, hostPath, FILEIO_OPEN_ACCESS_WRITE, FILEIO_OPEN_CREATE_EMPTY);
  if (io != FILEIO_SUCCESS) {
    Log("%s: FileIO_Open failed, error: %d\n", kFn, io);
  } else {
    for (uint64_t offset = 0;;) {
      size_t count = 0;
      err = FAT_ReadFile(file, offset, buf, sizeof buf, &count);
      if (err != FAT_OK) {
        Log("%s: FAT_ReadFile failed, error: %lu\n", kFn, err);
        break;
      }
      if (count == 0) {
        ok = TRUE;
        break;
      }
      io = FileIO_Write(&fd, buf, count, nullptr);
      if (io != FILEIO_SUCCESS) {
        Log("%s: FileIO_Write failed, error: %d\n", kFn, io);
        break;
      }
      offset += count;
    }
    FileIO_Close(&fd);
  }
  FAT_CloseFile(file);
  return ok;
}
