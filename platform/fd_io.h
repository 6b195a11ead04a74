// Whole-buffer reads and writes on POSIX descriptors, retrying on EINTR and
// short transfers.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace tvx {

// WriteAll writes every byte of `data`; false (errno set) on any failure.
bool WriteAll(int fd, std::string_view data);
bool WriteAll(int fd, const void *data, size_t len);
// PwriteAll writes every byte at `offset`.
bool PwriteAll(int fd, const void *data, size_t len, uint64_t offset);
// PreadAll reads up to `len` bytes at `offset` into `buf`; stores how many
// arrived (fewer only at end of file) and returns false on an I/O error.
bool PreadAll(int fd, void *buf, size_t len, uint64_t offset, size_t *out_count);
// ReadAllLimited appends the rest of the descriptor's data to `out`; false
// when reading fails or more than `limit` bytes would arrive (errno EFBIG).
bool ReadAllLimited(int fd, size_t limit, std::string *out);

}  // namespace tvx
