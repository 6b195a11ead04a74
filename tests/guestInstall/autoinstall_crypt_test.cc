// SHA-256 crypt against a published vector and the system's
// crypt(3) (the CLI test adds openssl for clamped rounds); the buffer
// contract at every length; salt and rounds parsing.
#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

#include "lib/guestInstall/autoinstall_linux_internal.h"
#include "support/log_capture.h"
#include "support/system_crypt.h"
#include "tvx_autoinstall_linux.h"

namespace {

using tvx::autoinstall::ParseCryptSalt;

std::string Crypt(const std::string &key, const std::string &salt) {
  char buf[128];
  const char *r = SHA256_crypt(key.c_str(), salt.c_str(), buf, sizeof buf);
  return r != nullptr ? r : "(null)";
}

// The published vector with a rounds field under the minimum, which the
// random comparison below never draws.
TEST(Sha256Crypt, PublishedVector) {
  EXPECT_EQ(Crypt("the minimum number is still observed", "$5$rounds=10$roundstoolow"),
            "$5$rounds=1000$roundstoolow$yfvwcWrQ8l/K0DAWyuPMDNHpIVlTQebY9l/gL972bIC");
}

// Random keys of every length the answer files allow and more (arbitrary
// non-NUL bytes) and random salts of 0 to 20 characters, checked against
// libxcrypt, which reads the same setting text.
TEST(Sha256Crypt, AgreesWithSystemCrypt) {
  ASSERT_NE(tvxtest::SystemCrypt("x", "$5$ab"), "") << "libcrypt.so.1 not usable";
  std::mt19937 rng(20261123);
  const std::string alphabet = "./0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";
  for (int i = 0; i < 300; ++i) {
    std::string key(rng() % 257, '\0');
    for (char &c : key) c = static_cast<char>(1 + rng() % 255);
    std::string salt(rng() % 21, '\0');
    for (char &c : salt) c = alphabet[rng() % alphabet.size()];
    // Few rounds keep the loop short; every tenth case uses the default.
    std::string setting =
        i % 10 == 0 ? "$5$" + salt : "$5$rounds=" + std::to_string(1000 + rng() % 100) + "$" + salt;
    ASSERT_EQ(Crypt(key, setting), tvxtest::SystemCrypt(key, setting))
        << "case " << i << " key length " << key.size() << " setting " << setting;
  }
}

// Every buffer length around the result, for a result with and without a
// rounds field: nothing at or past buffer[buflen], the prefix that fits, and
// a terminated result only with room for the NUL.
TEST(Sha256Crypt, BufferLengthContract) {
  for (const char *salt : {"$5$rounds=1234$saltsalt", "$5$saltsalt"}) {
    const std::string full = Crypt("secret", salt);
    const int len = static_cast<int>(full.size());
    for (int buflen = -1; buflen <= len + 2; ++buflen) {
      std::vector<char> buf(len + 8, '#');
      char *r = SHA256_crypt("secret", salt, buf.data(), buflen);
      int room = buflen < 0 ? 0 : buflen;
      if (buflen > len) {
        ASSERT_EQ(r, buf.data()) << buflen;
        EXPECT_EQ(std::string(buf.data()), full);
        room = len + 1;
      } else {
        ASSERT_EQ(r, nullptr) << buflen;
        EXPECT_EQ(std::string(buf.data(), room), full.substr(0, room)) << buflen;
      }
      for (size_t i = room; i < buf.size(); ++i) ASSERT_EQ(buf[i], '#') << buflen << " at " << i;
    }
  }
}

TEST(Sha256Crypt, SaltAndRoundsParsing) {
  const struct {
    const char *setting;
    const char *salt;
    size_t rounds;
    bool custom;
  } kCases[] = {
      {"$5$rounds=10$x", "x", 1000, true},
      {"rounds=99999999999999999999999999$x", "x", 999999999, true},
      {"rounds=1000$", "", 1000, true},
      {"rounds=$abc", "rounds=", 5000, false},      // no digits: salt text
      {"rounds=+5$abc", "rounds=+5", 5000, false},  // no sign
      {"rounds=5000", "rounds=5000", 5000, false},  // no '$' after the number
      {"$5$abcdefghijklmnopqrstu", "abcdefghijklmnop", 5000, false},
      {"$5$rounds=2000$rounds=3000$x", "rounds=3000", 2000, true},
  };
  for (const auto &c : kCases) {
    auto s = ParseCryptSalt(c.setting);
    EXPECT_EQ(s.salt, c.salt) << c.setting;
    EXPECT_EQ(s.rounds, c.rounds) << c.setting;
    EXPECT_EQ(s.customRounds, c.custom) << c.setting;
  }
  EXPECT_EQ(Crypt("k", "rounds=$ab").rfind("$5$rounds=$", 0), 0u);
}

TEST(Sha256Crypt, LongKeysAreRefused) {
  tvxtest::LogCapture log;
  std::string key256(256, 'k');
  EXPECT_EQ(Crypt(key256, "$5$s"), tvxtest::SystemCrypt(key256, "$5$s"));
  char buf[128] = "stale";
  EXPECT_EQ(SHA256_crypt(std::string(257, 'k').c_str(), "$5$s", buf, sizeof buf), nullptr);
  EXPECT_EQ(buf[0], '\0');
  EXPECT_EQ(log.All(), "SHA256_crypt: keys longer than 256 bytes are refused (this one has 257)\n");
}

}  // namespace
