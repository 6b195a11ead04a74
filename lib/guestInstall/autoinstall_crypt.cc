// SHA-256 crypt, the "$5$" password form that shadow files, kickstart,
// preseed and AutoYaST accept, as published by its author in "Unix crypt
// using SHA-256 and SHA-512": salt and optional rounds parameter, the
// alternate digest B, the start digest A, the key- and salt-derived byte
// sequences P and S, the rounds that stretch A, and the custom base-64
// digest encoding.
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <string_view>

#include "lib/guestInstall/autoinstall_linux_internal.h"
#include "lib/guestInstall/autoinstall_sha256.h"
#include "platform/log.h"

namespace tvx::autoinstall {
namespace {

constexpr char kSaltPrefix[] = "$5$";
constexpr char kRoundsPrefix[] = "rounds=";
constexpr size_t kRoundsMin = 1000;
constexpr size_t kRoundsMax = 999999999;
constexpr size_t kSaltMax = 16;
constexpr size_t kKeyMax = 256;
constexpr size_t kDigest = 32;
// "$5$rounds=999999999$" + 16 salt + "$" + 43 digest characters.
constexpr size_t kResultMax = 3 + 7 + 9 + 1 + kSaltMax + 1 + 43;

constexpr char kB64[] = "./0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";
constexpr char kSaltAlphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789./";

}  // namespace

// ParseCryptSalt reads the optional "$5$" and "rounds=N$" in front of the salt.
// Only plain digits count as N (no sign, no blanks, at least one digit), so
// "rounds=$" stays salt text rather than meaning zero rounds.
CryptSalt ParseCryptSalt(const char *salt) {
  CryptSalt parsed;
  if (std::strncmp(salt, kSaltPrefix, sizeof kSaltPrefix - 1) == 0) salt += sizeof kSaltPrefix - 1;
  if (std::strncmp(salt, kRoundsPrefix, sizeof kRoundsPrefix - 1) == 0) {
    const char *num = salt + sizeof kRoundsPrefix - 1;
    const char *p = num;
    size_t n = 0;
    for (; *p >= '0' && *p <= '9'; ++p) {
      n = n > kRoundsMax ? n : n * 10 + static_cast<size_t>(*p - '0');  // saturates above max
    }
    if (p != num && *p == '$') {
      parsed.rounds = n < kRoundsMin ? kRoundsMin : n > kRoundsMax ? kRoundsMax : n;
      parsed.customRounds = true;
      salt = p + 1;
    }
  }
  size_t len = std::strcspn(salt, "$");
  parsed.salt = std::string_view(salt, len < kSaltMax ? len : kSaltMax);
  return parsed;
}

namespace {

// Wipe keeps key-derived bytes from outliving the call; the compiler may not
// drop it as a dead store.
void Wipe(void *p, size_t n) { explicit_bzero(p, n); }

// Encode appends the 43 digest characters in the scheme's byte order.
void Encode(const uint8_t d[kDigest], int *buflen, char **cp) {
  static constexpr uint8_t kOrder[10][3] = {{0, 10, 20}, {21, 1, 11}, {12, 22, 2}, {3, 13, 23},
                                            {24, 4, 14}, {15, 25, 5}, {6, 16, 26}, {27, 7, 17},
                                            {18, 28, 8}, {9, 19, 29}};
  for (const auto &t : kOrder) b64_from_24bit(d[t[0]], d[t[1]], d[t[2]], 4, buflen, cp);
  b64_from_24bit(0, d[31], d[30], 3, buflen, cp);
}

// Work holds everything derived from the key; its destructor wipes it on
// every path out of Crypt.
struct Work {
  uint8_t a[kDigest];
  uint8_t b[kDigest];
  uint8_t p[kKeyMax];
  uint8_t s[kSaltMax];
  Sha256 ctx;
  ~Work() {
    Wipe(a, sizeof a);
    Wipe(b, sizeof b);
    Wipe(p, sizeof p);
    Wipe(s, sizeof s);
  }
};

// Crypt writes the full result (at most kResultMax characters, no NUL) into
// `out` and returns its length.
size_t Crypt(std::string_view key, const CryptSalt &parsed, char out[kResultMax]) {
  Work w;
  const std::string_view salt = parsed.salt;
  const size_t klen = key.size();

  // B = H(key salt key).
  w.ctx.Init();
  w.ctx.Update(key.data(), klen);
  w.ctx.Update(salt.data(), salt.size());
  w.ctx.Update(key.data(), klen);
  w.ctx.Final(w.b);

  // A = H(key salt, B for each full and the last partial 32 bytes of the
  // key, then B or the key for each bit of the key length).
  w.ctx.Init();
  w.ctx.Update(key.data(), klen);
  w.ctx.Update(salt.data(), salt.size());
  size_t cnt = klen;
  for (; cnt > kDigest; cnt -= kDigest) w.ctx.Update(w.b, kDigest);
  w.ctx.Update(w.b, cnt);
  for (cnt = klen; cnt > 0; cnt >>= 1) {
    if ((cnt & 1) != 0) {
      w.ctx.Update(w.b, kDigest);
    } else {
      w.ctx.Update(key.data(), klen);
    }
  }
  w.ctx.Final(w.a);

  // P: H(key repeated key-length times), repeated to the key's length.
  w.ctx.Init();
  for (cnt = 0; cnt < klen; ++cnt) w.ctx.Update(key.data(), klen);
  w.ctx.Final(w.b);
  for (cnt = 0; cnt < klen; cnt += kDigest) {
    std::memcpy(w.p + cnt, w.b, klen - cnt < kDigest ? klen - cnt : kDigest);
  }

  // S: H(salt repeated 16 + A[0] times), cut to the salt's length.
  w.ctx.Init();
  for (cnt = 0; cnt < 16u + w.a[0]; ++cnt) w.ctx.Update(salt.data(), salt.size());
  w.ctx.Final(w.b);
  std::memcpy(w.s, w.b, salt.size());

  for (size_t i = 0; i < parsed.rounds; ++i) {
    w.ctx.Init();
    if ((i & 1) != 0) {
      w.ctx.Update(w.p, klen);
    } else {
      w.ctx.Update(w.a, kDigest);
    }
    if (i % 3 != 0) w.ctx.Update(w.s, salt.size());
    if (i % 7 != 0) w.ctx.Update(w.p, klen);
    if ((i & 1) != 0) {
      w.ctx.Update(w.a, kDigest);
    } else {
      w.ctx.Update(w.p, klen);
    }
    w.ctx.Final(w.a);
  }

  size_t len = 0;
  auto put = [&](std::string_view text) {
    std::memcpy(out + len, text.data(), text.size());
    len += text.size();
  };
  put(kSaltPrefix);
  if (parsed.customRounds) {
    char digits[24];
    int n = std::snprintf(digits, sizeof digits, "%s%zu$", kRoundsPrefix, parsed.rounds);
    put(std::string_view(digits, static_cast<size_t>(n)));
  }
  put(salt);
  put("$");
  int room = 43;
  char *cp = out + len;
  Encode(w.a, &room, &cp);
  return len + 43;
}

}  // namespace

const char *AutoInstallCryptLinuxPassword(const char *password) {
  static char result[120];
  if (password == nullptr) return nullptr;
  std::srand(static_cast<unsigned>(std::time(nullptr)));
  char salt[kSaltMax + 1];
  for (size_t i = 0; i < kSaltMax; ++i) salt[i] = kSaltAlphabet[std::rand() % 64];
  salt[kSaltMax] = '\0';
  return SHA256_crypt(password, salt, result, sizeof result);
}

}  // namespace tvx::autoinstall

using namespace tvx::autoinstall;

extern "C" TVX_EXPORT void b64_from_24bit(unsigned char B2, unsigned char B1, unsigned char B0,
                                          int n, int *buflen, char **cp) {
  unsigned int w = (static_cast<unsigned>(B2) << 16) | (static_cast<unsigned>(B1) << 8) | B0;
  while (n-- > 0 && *buflen > 0) {
    *(*cp)++ = kB64[w & 0x3f];
    --*buflen;
    w >>= 6;
  }
}

extern "C" TVX_EXPORT char *SHA256_crypt(const char *key, const char *salt, char *buffer,
                                         int buflen) {
  try {
    if (key == nullptr || salt == nullptr || buffer == nullptr) return nullptr;
    size_t room = buflen > 0 ? static_cast<size_t>(buflen) : 0;
    size_t klen = std::strlen(key);
    if (klen > kKeyMax) {
      if (room > 0) buffer[0] = '\0';
      Log("SHA256_crypt: keys longer than %zu bytes are refused (this one has %zu)\n", kKeyMax,
          klen);
      return nullptr;
    }
    char out[kResultMax];
    size_t len = Crypt(std::string_view(key, klen), ParseCryptSalt(salt), out);
    // Whatever fits is written, the terminator only with the whole result.
    std::memcpy(buffer, out, len < room ? len : room);
    if (room <= len) return nullptr;
    buffer[len] = '\0';
    return buffer;
  } catch (...) {
    return nullptr;
  }
}
