// Signature validation against a real PKI made by the openssl CLI
// (scripts/make-test-pki): the status of every kind of signer, with the
// maker's revocation list present, missing or corrupt.
#include <gtest/gtest.h>

#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/pkcs7.h>
#include <openssl/x509_vfy.h>

#include <cstdlib>
#include <filesystem>
#include <map>
#include <memory>

#include "lib/signature/zelsign_internal.h"
#include "support/log_capture.h"
#include "support/test_pki.h"
#include "tvx_signature.h"

namespace {

namespace fs = std::filesystem;
namespace sig = tvx::signature;
using tvx::UniquePtr;

const std::string kData = "tools image map\nwindows9-64 = \"windows.iso\"\n";

struct Text {
  char *p = nullptr;
  ~Text() { std::free(p); }
  std::string str() const { return p != nullptr ? p : "(null)"; }
};

UniquePtr<PKCS7> Load(const std::string &pem) {
  return UniquePtr<PKCS7>(
      ZelSign_GetPKCS7FromRawBuffer(pem.data(), static_cast<uint32_t>(pem.size()), nullptr));
}

class ZelSignTest : public testing::Test {
 protected:
  static void SetUpTestSuite() {
    certDir_ = tvxtest::TestCertDir();
    if (certDir_.empty()) return;
    variants_ = new tvxtest::TempDir();
    // Variants of the trusted directory: the maker's CRL missing, or followed
    // by a PEM block that breaks off (garbage, not a clean end of file); the
    // partner's CRL broken the same way.
    std::string crl = tvxtest::ReadFileOrDie(certDir_ + "tarvex.crl");
    std::string broken = "-----BEGIN X509 CRL-----\nMIIBszCBnAIBATANBgkqhkiG9w0BAQsFADAa\n";
    for (const char *v : {"nocrl", "garbage", "partnergarbage"}) {
      fs::create_directory(variants_->Join(v));
      for (const char *f : {"tarvex.cert", "tarvex.crl", "tvxpartner.cert", "tvxpartner.crl"}) {
        fs::copy_file(certDir_ + f, variants_->Join(v) + "/" + f);
      }
    }
    fs::remove(variants_->Join("nocrl/tarvex.crl"));
    tvxtest::WriteFileOrDie(variants_->Join("garbage/tarvex.crl"), crl + broken);
    tvxtest::WriteFileOrDie(variants_->Join("partnergarbage/tvxpartner.crl"),
                            tvxtest::ReadFileOrDie(certDir_ + "tvxpartner.crl") + broken);
    for (const char *s : tvxtest::kPkiSigners) {
      for (bool embed : {false, true}) {
        (*Sigs())[std::string(s) + (embed ? "+" : "")] = tvxtest::Sign(certDir_, s, kData, embed);
      }
    }
  }
  static void TearDownTestSuite() {
    delete variants_;
    variants_ = nullptr;
  }
  void SetUp() override {
    if (certDir_.empty()) GTEST_SKIP() << "the build trusts a directory outside its tree";
  }
  static std::map<std::string, std::string> *Sigs() {
    static std::map<std::string, std::string> sigs;
    return &sigs;
  }
  static sig::TrustFiles Files(const std::string &variant) {
    return sig::TrustFilesIn(variant.empty() ? certDir_ : variants_->Join(variant) + "/");
  }

  static std::string certDir_;
  static tvxtest::TempDir *variants_;
};
std::string ZelSignTest::certDir_;
tvxtest::TempDir *ZelSignTest::variants_ = nullptr;

// The whole status matrix. `embedded` rows check ZelSign_IsSignatureValid
// (content inside the signature), the others ZelSign_IsTrxSignatureValid
// (detached content). Rows on the build's own directory (variant "") go
// through the exported functions as well.
TEST_F(ZelSignTest, StatusMatrix) {
  enum Trust { kDefault, kPartnerCertFile, kPartnerStore };
  struct Case {
    const char *name;
    const char *signer;
    bool embedded;
    const char *variant;  // "" the build's directory, else a variant of it
    Trust trust;          // what the maker's store trusts
    bool tamper;          // detached data changed after signing
    uint32_t status;
    bool valid;
    const char *error;  // exact text of a FALSE result, or a prefix ending in '*'
  } cases[] = {
      {"maker", "maker", false, "", kDefault, false, ZELSIGN_TRX_SIGNED, true, nullptr},
      {"maker embedded", "maker", true, "", kDefault, false, ZELSIGN_TRX_SIGNED, true, nullptr},
      {"partner embedded: any trusted signer", "partner", true, "", kDefault, false,
       ZELSIGN_PARTNER_SIGNED, true, nullptr},
      {"partner detached: the maker's only", "partner", false, "", kDefault, false,
       ZELSIGN_PARTNER_SIGNED, false,
       "certificate verify error (unable to get local issuer certificate)"},
      {"stranger", "stranger", false, "", kDefault, false, ZELSIGN_INVALID_CERT, false,
       "certificate verify error (self-signed certificate)"},
      {"stranger embedded", "stranger", true, "", kDefault, false, ZELSIGN_INVALID_CERT, false,
       "certificate verify error*"},
      {"expired signer continues", "expired", false, "", kDefault, false, ZELSIGN_TRX_SIGNED,
       true, nullptr},
      {"revoked signer", "revoked", false, "", kDefault, false, ZELSIGN_INVALID_CERT, false,
       "certificate verify error (certificate revoked)"},
      {"chain of depth 5", "deep", false, "", kDefault, false, ZELSIGN_TRX_SIGNED, true, nullptr},
      {"untrusted chain of depth 5", "deepstranger", false, "", kDefault, false,
       ZELSIGN_INVALID_CERT, false, "certificate verify error (self-signed certificate in certificate chain)"},
      {"tampered data", "maker", false, "", kDefault, true, ZELSIGN_INVALID_CERT, false,
       "signature failure*"},
      {"maker CRL missing", "maker", false, "nocrl", kDefault, false, ZELSIGN_TRX_SIGNED, true,
       nullptr},
      {"maker CRL missing: revocation unchecked", "revoked", false, "nocrl", kDefault, false,
       ZELSIGN_TRX_SIGNED, true, nullptr},
      {"maker CRL followed by garbage", "maker", false, "garbage", kDefault, false,
       ZELSIGN_ERROR, false, "CRL appears to be corrupted\n"},
      {"maker CRL garbage, embedded", "maker", true, "garbage", kDefault, false, ZELSIGN_ERROR,
       false, "CRL appears to be corrupted\n"},
      {"partner CRL garbage", "maker", false, "partnergarbage", kDefault, false, ZELSIGN_ERROR,
       false, "CRL appears to be corrupted\n"},
      {"partner certificate file as the maker's", "partner", false, "", kPartnerCertFile, false,
       ZELSIGN_TRX_SIGNED, true, nullptr},
      {"maker refused by a caller store of the partner", "maker", false, "", kPartnerStore, false,
       ZELSIGN_INVALID_CERT, false, "certificate verify error*"},
      {"caller store of the partner", "partner", false, "", kPartnerStore, false,
       ZELSIGN_TRX_SIGNED, true, nullptr},
  };
  for (const auto &c : cases) {
    SCOPED_TRACE(c.name);
    const std::string &pem = (*Sigs())[std::string(c.signer) + (c.embedded ? "+" : "")];
    ASSERT_FALSE(pem.empty());
    UniquePtr<PKCS7> p7 = Load(pem);
    ASSERT_NE(p7, nullptr);
    std::string data = c.tamper ? kData + "!" : kData;
    const void *bytes = c.embedded ? nullptr : data.data();
    size_t len = c.embedded ? 0 : data.size();

    sig::TrustFiles files = Files(c.variant);
    std::string partnerCert = certDir_ + "tvxpartner.cert";
    if (c.trust == kPartnerCertFile) files.makerCert = partnerCert;
    // A caller's store stays the caller's: used twice, freed here.
    UniquePtr<X509_STORE> store;
    if (c.trust == kPartnerStore) store = sig::LoadStore(partnerCert.c_str());

    Text err;
    EXPECT_EQ(sig::VerifyStatus(p7.get(), bytes, len, store.get(), files, &err.p, nullptr),
              c.status)
        << err.str();
    Text why;
    bool valid = sig::CheckValidity(p7.get(), bytes, len, store.get(), files, !c.embedded, &why.p);
    EXPECT_EQ(valid, c.valid);
    if (c.valid) {
      EXPECT_EQ(why.p, nullptr) << why.str();
    } else if (std::string want = c.error; !want.empty() && want.back() == '*') {
      EXPECT_EQ(why.str().substr(0, want.size() - 1), want.substr(0, want.size() - 1));
    } else {
      EXPECT_EQ(why.str(), want);
    }
    if (*c.variant != '\0') continue;

    Text api;
    const char *certFile = c.trust == kPartnerCertFile ? partnerCert.c_str() : nullptr;
    Bool apiValid = c.embedded ? ZelSign_IsSignatureValid(p7.get(), &api.p)
                               : ZelSign_IsTrxSignatureValid(p7.get(), data.data(), data.size(),
                                                             certFile, store.get(), &api.p);
    EXPECT_EQ(apiValid != FALSE, c.valid);
    EXPECT_EQ(api.str(), why.str());
    Text statusErr;
    EXPECT_EQ(ZelSign_VerifyStatus(p7.get(), bytes, len, certFile, store.get(), &statusErr.p),
              c.status);
    ERR_clear_error();
  }
}

// Chain errors that continue or reject, and what the callback leaves in the
// store context: chain-too-long from depth 5 on, else no error.
TEST(ZelSignCallback, ContinueOrRejectTable) {
  struct Case {
    int ok, code, depth;
    int result, errorAfter;
  } cases[] = {
      {1, X509_V_OK, 0, 1, X509_V_OK},
      {0, X509_V_ERR_UNABLE_TO_GET_CRL, 0, 1, X509_V_OK},
      {0, X509_V_ERR_CERT_HAS_EXPIRED, 1, 1, X509_V_OK},
      {0, X509_V_ERR_CERT_NOT_YET_VALID, 4, 1, X509_V_OK},
      {0, X509_V_ERR_CERT_HAS_EXPIRED, 5, 1, X509_V_ERR_CERT_CHAIN_TOO_LONG},
      {0, X509_V_ERR_INVALID_PURPOSE, 0, 1, X509_V_OK},
      {0, 24, 0, 1, X509_V_OK},
      {0, X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT, 0, 0, X509_V_OK},
      {0, X509_V_ERR_CERT_SIGNATURE_FAILURE, 0, 0, X509_V_OK},
      {0, X509_V_ERR_DEPTH_ZERO_SELF_SIGNED_CERT, 0, 0, X509_V_OK},
      {0, X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT_LOCALLY, 6, 0, X509_V_ERR_CERT_CHAIN_TOO_LONG},
      {0, X509_V_ERR_CERT_REVOKED, 0, 0, X509_V_OK},
      {0, X509_V_ERR_CERT_REJECTED, 0, 0, X509_V_OK},
      {0, 29, 0, 1, X509_V_OK},
      {0, X509_V_ERR_INVALID_CA, 0, 0, X509_V_OK},
      {0, 80, 2, 1, X509_V_OK},
      // A rejecting code keeps rejecting even when OpenSSL passes ok = 1.
      {1, X509_V_ERR_CERT_REVOKED, 0, 0, X509_V_ERR_CERT_REVOKED},
  };
  UniquePtr<X509_STORE_CTX> ctx(X509_STORE_CTX_new());
  ASSERT_NE(ctx, nullptr);
  for (const auto &c : cases) {
    X509_STORE_CTX_set_error(ctx.get(), c.code);
    X509_STORE_CTX_set_error_depth(ctx.get(), c.depth);
    EXPECT_EQ(sig::VerifyCallback(c.ok, ctx.get()), c.result) << c.code << " at " << c.depth;
    EXPECT_EQ(X509_STORE_CTX_get_error(ctx.get()), c.errorAfter) << c.code << " at " << c.depth;
  }
}

TEST_F(ZelSignTest, LoadersAndContent) {
  const std::string &embedded = (*Sigs())["maker+"];
  struct Case {
    const char *name;
    std::string pem;
    const char *error;  // null: loads
  } cases[] = {
      {"embedded", embedded, nullptr},
      {"detached", (*Sigs())["maker"], nullptr},
      {"empty", "", "no start line"},
      {"not PEM", "hello", "no start line"},
      {"cut short", embedded.substr(0, embedded.size() / 2), "bad end line"},
  };
  tvxtest::TempDir tmp;
  for (const auto &c : cases) {
    SCOPED_TRACE(c.name);
    for (bool fromFile : {false, true}) {
      Text err;
      UniquePtr<PKCS7> p7;
      if (fromFile) {
        tvxtest::WriteFileOrDie(tmp.Join("sig"), c.pem);
        p7.reset(ZelSign_GetPKCS7FromFile(tmp.Join("sig").c_str(), &err.p));
      } else {
        p7.reset(ZelSign_GetPKCS7FromRawBuffer(c.pem.data(), static_cast<uint32_t>(c.pem.size()),
                                               &err.p));
      }
      EXPECT_EQ(p7 == nullptr, c.error != nullptr);
      EXPECT_EQ(err.str(), c.error != nullptr ? c.error : "(null)");
      ERR_clear_error();
    }
  }
  // The error slot is optional; a missing file reports the system's reason.
  EXPECT_EQ(ZelSign_GetPKCS7FromRawBuffer("x", 1, nullptr), nullptr);
  Text missing;
  EXPECT_EQ(ZelSign_GetPKCS7FromFile(tmp.Join("none").c_str(), &missing.p), nullptr);
  EXPECT_NE(missing.p, nullptr);
  ERR_clear_error();

  // The content comes out of an embedded signature, NUL-terminated, without
  // any certificate check; a detached one has none to give.
  for (const char *s : {"maker+", "stranger+", "maker"}) {
    SCOPED_TRACE(s);
    UniquePtr<PKCS7> p7 = Load((*Sigs())[s]);
    ASSERT_NE(p7, nullptr);
    char *content = reinterpret_cast<char *>(1);
    size_t len = 99;
    Text err;
    ZelSign_GetDigestFromPKCS7(p7.get(), &content, &len, &err.p);
    if (std::string(s).back() == '+') {
      ASSERT_NE(content, nullptr);
      EXPECT_EQ(std::string(content, len), kData);
      EXPECT_EQ(content[len], '\0');
      EXPECT_EQ(err.p, nullptr);
    } else {
      EXPECT_EQ(content, nullptr);
      EXPECT_EQ(len, 0u);
      EXPECT_NE(err.p, nullptr);
    }
    std::free(content);
    ERR_clear_error();
  }
}

TEST_F(ZelSignTest, ErrorSlotRules) {
  UniquePtr<PKCS7> p7 = Load((*Sigs())["maker"]);
  // Length 0 is refused before p7 is looked at.
  Text tooSmall;
  EXPECT_FALSE(ZelSign_IsTrxSignatureValid(nullptr, kData.data(), 0, nullptr, nullptr,
                                           &tooSmall.p));
  EXPECT_EQ(tooSmall.str(), "Data buffer too small.");
  // A text already in the slot fails the check and stays as it was.
  char keep[] = "earlier";
  char *slot = keep;
  EXPECT_FALSE(ZelSign_IsTrxSignatureValid(p7.get(), kData.data(), kData.size(), nullptr,
                                           nullptr, &slot));
  EXPECT_EQ(slot, keep);
  EXPECT_FALSE(ZelSign_IsSignatureValid(p7.get(), nullptr));
  // Detached content without its data fails with a text.
  Text noData;
  EXPECT_FALSE(ZelSign_IsSignatureValid(p7.get(), &noData.p));
  EXPECT_NE(noData.p, nullptr);
  ERR_clear_error();
}

TEST(ZelSignStatus, Texts) {
  const char *want[] = {"Error",          "Tarvex Signed",      "Partner Signed", "Unsigned",
                        "Invalid Digest", "Invalid Certificate", "Error",         "Error"};
  for (uint32_t s = 0; s < 8; s++) EXPECT_STREQ(ZelSign_StatusToString(s), want[s]) << s;
  EXPECT_STREQ(ZelSign_StatusToString(UINT32_MAX), "Error");
}

}  // namespace
