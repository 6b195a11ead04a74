#include "platform/crypto.h"

#include <gtest/gtest.h>

#include <string>

namespace {

std::string Hex(const uint8_t *p, size_t n) {
  static const char kHex[] = "0123456789abcdef";
  std::string s;
  for (size_t i = 0; i < n; i++) {
    s += kHex[p[i] >> 4];
    s += kHex[p[i] & 15];
  }
  return s;
}

TEST(CryptoHash, KnownDigestAndBufferSize) {
  const CryptoHash *h = nullptr;
  EXPECT_EQ(CryptoHash_FromString("MD5", &h), CRYPTO_ERROR_UNKNOWN_ALGORITHM);
  EXPECT_EQ(h, nullptr);
  ASSERT_EQ(CryptoHash_FromString("sha-256", &h), CRYPTO_ERROR_SUCCESS);
  ASSERT_EQ(CryptoHash_GetOutputSize(h), 32u);
  uint8_t want[32];
  ASSERT_EQ(CryptoHash_Compute(h, "abc", 3, want, sizeof want), CRYPTO_ERROR_SUCCESS);
  EXPECT_EQ(Hex(want, 32), "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
  EXPECT_EQ(CryptoHash_Compute(h, "abc", 3, want, 31), CRYPTO_ERROR_BAD_BUFFER_SIZE);
}

TEST(Base64, Rfc4648VectorsAndExactBufferSizes) {
  struct Case {
    const char *in, *want;
  } cases[] = {{"", ""},         {"f", "Zg=="},         {"fo", "Zm8="},          {"foo", "Zm9v"},
               {"foob", "Zm9vYg=="}, {"fooba", "Zm9vYmE="}, {"foobar", "Zm9vYmFy"}};
  for (const auto &c : cases) {
    size_t len = std::char_traits<char>::length(c.in);
    size_t need = (len + 2) / 3 * 4 + 1;
    std::string out(need, 'x');
    size_t written = 99;
    ASSERT_TRUE(Base64_Encode(reinterpret_cast<const uint8_t *>(c.in), len, out.data(), need,
                              &written))
        << c.in;
    EXPECT_STREQ(out.c_str(), c.want);
    EXPECT_EQ(written, need - 1);
    EXPECT_FALSE(Base64_Encode(reinterpret_cast<const uint8_t *>(c.in), len, out.data(),
                               need - 1, nullptr))
        << c.in;
  }
}

}  // namespace
