// Fixed-width integers in on-disk byte order, and a bounds-checked cursor
// over untrusted bytes.
//
// The Load*/Store* functions do no bounds checking: the caller has checked
// that the bytes are there (or reads through ByteCursor, which does). Every
// byte goes through an unsigned temporary before it is shifted, so that
// promotion to int can never shift into the sign bit.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string_view>

namespace tvx {

inline uint16_t LoadLe16(const uint8_t *p) {
  return static_cast<uint16_t>(static_cast<unsigned>(p[0]) | static_cast<unsigned>(p[1]) << 8);
}
inline uint32_t LoadLe32(const uint8_t *p) {
  return static_cast<uint32_t>(p[0]) | static_cast<uint32_t>(p[1]) << 8 |
         static_cast<uint32_t>(p[2]) << 16 | static_cast<uint32_t>(p[3]) << 24;
}
inline uint64_t LoadLe64(const uint8_t *p) {
  return static_cast<uint64_t>(LoadLe32(p)) | static_cast<uint64_t>(LoadLe32(p + 4)) << 32;
}
inline uint16_t LoadBe16(const uint8_t *p) {
  return static_cast<uint16_t>(static_cast<unsigned>(p[1]) | static_cast<unsigned>(p[0]) << 8);
}
inline uint32_t LoadBe32(const uint8_t *p) {
  return static_cast<uint32_t>(p[3]) | static_cast<uint32_t>(p[2]) << 8 |
         static_cast<uint32_t>(p[1]) << 16 | static_cast<uint32_t>(p[0]) << 24;
}
inline uint64_t LoadBe64(const uint8_t *p) {
  return static_cast<uint64_t>(LoadBe32(p)) << 32 | static_cast<uint64_t>(LoadBe32(p + 4));
}

inline void StoreLe16(uint8_t *p, uint16_t v) {
  p[0] = static_cast<uint8_t>(v);
  p[1] = static_cast<uint8_t>(v >> 8);
}
inline void StoreLe32(uint8_t *p, uint32_t v) {
  StoreLe16(p, static_cast<uint16_t>(v));
  StoreLe16(p + 2, static_cast<uint16_t>(v >> 16));
}
inline void StoreLe64(uint8_t *p, uint64_t v) {
  StoreLe32(p, static_cast<uint32_t>(v));
  StoreLe32(p + 4, static_cast<uint32_t>(v >> 32));
}
inline void StoreBe16(uint8_t *p, uint16_t v) {
  p[0] = static_cast<uint8_t>(v >> 8);
  p[1] = static_cast<uint8_t>(v);
}
inline void StoreBe32(uint8_t *p, uint32_t v) {
  StoreBe16(p, static_cast<uint16_t>(v >> 16));
  StoreBe16(p + 2, static_cast<uint16_t>(v));
}
inline void StoreBe64(uint8_t *p, uint64_t v) {
  StoreBe32(p, static_cast<uint32_t>(v >> 32));
  StoreBe32(p + 4, static_cast<uint32_t>(v));
}

// ByteCursor reads forward through a byte range it does not own. Every
// getter checks the remaining length first and, on short input, returns
// false and leaves both the cursor and its output untouched; a length read
// from the data is therefore never trusted further than the bytes at hand.
//
//   ByteCursor c(buf, len);
//   uint32_t magic, count;
//   if (!c.GetLe32(&magic) || !c.GetLe32(&count)) return Corrupt();
class ByteCursor {
 public:
  constexpr ByteCursor() = default;
  constexpr ByteCursor(const uint8_t *data, size_t len) : data_(data), len_(len) {}
  ByteCursor(const void *data, size_t len)
      : data_(static_cast<const uint8_t *>(data)), len_(len) {}

  const uint8_t *data() const { return data_; }
  size_t remaining() const { return len_; }
  bool empty() const { return len_ == 0; }

  bool Skip(size_t n) {
    if (len_ < n) return false;
    data_ += n;
    len_ -= n;
    return true;
  }
  // GetBytes hands out a pointer to the next `n` bytes and steps past them.
  bool GetBytes(size_t n, const uint8_t **out) {
    if (len_ < n) return false;
    *out = data_;
    return Skip(n);
  }
  bool CopyBytes(void *out, size_t n) {
    if (len_ < n) return false;
    if (n != 0) std::memcpy(out, data_, n);
    return Skip(n);
  }
  // GetSub splits off the next `n` bytes as a cursor of their own.
  bool GetSub(size_t n, ByteCursor *out) {
    if (len_ < n) return false;
    *out = ByteCursor(data_, n);
    return Skip(n);
  }
  // Peek inspects the next `n` bytes without moving.
  bool Peek(size_t n, const uint8_t **out) const {
    if (len_ < n) return false;
    *out = data_;
    return true;
  }
  // SubAt gives the `n` bytes at `offset` from the cursor's position, with
  // the sum checked for overflow; the cursor does not move.
  bool SubAt(uint64_t offset, uint64_t n, ByteCursor *out) const {
    if (offset > len_ || n > len_ - offset) return false;
    *out = ByteCursor(data_ + offset, static_cast<size_t>(n));
    return true;
  }

  bool GetU8(uint8_t *out) { return Get<uint8_t, 1>(out, [](const uint8_t *p) { return *p; }); }
  bool GetLe16(uint16_t *out) { return Get<uint16_t, 2>(out, LoadLe16); }
  bool GetLe32(uint32_t *out) { return Get<uint32_t, 4>(out, LoadLe32); }
  bool GetLe64(uint64_t *out) { return Get<uint64_t, 8>(out, LoadLe64); }
  bool GetBe16(uint16_t *out) { return Get<uint16_t, 2>(out, LoadBe16); }
  bool GetBe32(uint32_t *out) { return Get<uint32_t, 4>(out, LoadBe32); }
  bool GetBe64(uint64_t *out) { return Get<uint64_t, 8>(out, LoadBe64); }

  // GetText takes the next `n` bytes as text (not terminated, may hold NULs).
  bool GetText(size_t n, std::string_view *out) {
    const uint8_t *p;
    if (!GetBytes(n, &p)) return false;
    *out = std::string_view(reinterpret_cast<const char *>(p), n);
    return true;
  }

 private:
  template <typename T, size_t N, typename Load>
  bool Get(T *out, Load load) {
    if (len_ < N) return false;
    *out = load(data_);
    data_ += N;
    len_ -= N;
    return true;
  }

  const uint8_t *data_ = nullptr;
  size_t len_ = 0;
};

}  // namespace tvx
