// The one crash-safe way the library writes a whole file: the new contents go
// to a temporary file in the same directory, are flushed to disk and renamed
// over the target. A reader (or a crash, or a full disk half way through)
// sees the old file or the new one, never a mix or a truncated file; on any
// failure the old file is untouched and no temporary file stays behind.
#pragma once

#include <sys/types.h>

#include <functional>
#include <string_view>

#include "tvx_base.h"

// What to do when the target's name is a symbolic link.
enum class FileLinkPolicy {
  // Replace the link itself with a regular file: the link's target is never
  // written. The right policy for anything the library creates (answer
  // files, images, files holding passwords), where a planted link must not
  // redirect the write.
  kReplaceLink,
  // Rewrite the file the link leads to and keep the link: editing a
  // caller's existing file (the INI utility, the extended config file).
  kFollowLink,
};

struct FileReplaceOptions {
  FileLinkPolicy links = FileLinkPolicy::kReplaceLink;
  // Fail (ENOENT) when the target does not exist yet, instead of creating it.
  bool mustExist = false;
  // Permission bits of a newly created file (the umask is not applied). An
  // existing file keeps its bits and, where the caller may, its owner.
  mode_t newMode = 0644;
  // The file holds a secret (a password): it is 0600 whatever it was before.
  bool secret = false;
};

// File_ReplaceContents makes `path` hold exactly `data`. Only a regular file
// (or, by policy, a link) is ever replaced: a directory, FIFO or device at
// `path` is refused. Hard links are never written through: the rename gives
// the name a new file, and other names of the old file keep the old
// contents. TRUE on success; on failure FALSE with the errno value in
// `out_errno` (optional).
Bool File_ReplaceContents(const char *path, std::string_view data,
                          const FileReplaceOptions &options = {}, int *out_errno = nullptr);

// File_ReplaceWith is File_ReplaceContents for contents produced by a writer:
// `fill` receives the temporary file's descriptor (opened read-write, empty)
// and its path, writes the contents and returns true; false (or an I/O
// failure) abandons the replacement. Used where the contents are built in
// place, as a FAT image is.
Bool File_ReplaceWith(const char *path, const FileReplaceOptions &options,
                      const std::function<bool(int fd, const char *tmpPath)> &fill,
                      int *out_errno = nullptr);
