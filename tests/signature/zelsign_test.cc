// Signature validation against a real PKI made by the openssl CLI
// (scripts/make-test-pki): the status of every kind of signer, with the
// maker's revocation list present, missing or corrupt.
#include <gtest/gtest.h>
#include <openssl/err.h>
#include <openssl/pkcs7.h>
#include <openssl/x509_vfy.h>

#include <algorithm>
#include <cstdlib>
#include <map>

#include "lib/signature/zelsign_internal.h"
#include "support/log_capture.h"
#include "support/test_pki.h"
#include "tvx_signature.h"

namespace {

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
  // One signature per signer, detached ("maker") and embedded ("maker+"),
  // and a CRL file that breaks off after a good CRL: garbage, not a clean end.
  static void SetUpTestSuite() {
    certDir_ = tvxtest::TestCertDir();
    if (certDir_.empty()) return;
    tmp_ = new tvxtest::TempDir();
    tvxtest::WriteFileOrDie(tmp_->Join("garbage.crl"),
                            tvxtest::ReadFileOrDie(certDir_ + "tarvex.crl") +
                                "-----BEGIN X509 CRL-----\nMIIBszCBnAIBATANBgkqhkiG9w0BAQsFADAa\n");
    for (const char *s :
         {"maker", "partner", "stranger", "expired", "revoked", "deep", "deepstranger"}) {
      sigs_[s] = tvxtest::Sign(certDir_, s, kData, false);
      sigs_[std::string(s) + "+"] = tvxtest::Sign(certDir_, s, kData, true);
    }
    // Two digest algorithms put two digest BIOs in front of the content
    // (where a leak once hid).
    sigs_["two digests"] = tvxtest::Sign(certDir_, "maker+partner", kData, false);
  }
  static void TearDownTestSuite() { delete tmp_; }
  void SetUp() override {
    if (certDir_.empty()) GTEST_SKIP() << "the build trusts a directory outside its tree";
  }

  static inline std::string certDir_;
  static inline tvxtest::TempDir *tmp_ = nullptr;
  static inline std::map<std::string, std::string> sigs_;
};

// The whole status matrix. Embedded signatures ("+") are checked as
// ZelSign_IsSignatureValid does, detached ones as ZelSign_IsTrxSignatureValid
// (the maker's only). Rows with the build's own files also go through
// ZelSign_VerifyStatus, which stands for the exported wrappers.
TEST_F(ZelSignTest, StatusMatrix) {
  enum Files { kOwn, kNoMakerCrl, kBadMakerCrl };
  enum Trust { kDefault, kPartnerCertFile, kPartnerStore };  // the maker's store
  const char *kCorrupt = "CRL appears to be corrupted\n";
  struct Case {
    const char *name, *sig;
    Files files;
    Trust trust;
    bool tamper;  // detached data changed after signing
    uint32_t status;
    const char *error;  // null: valid; else the exact text, or a prefix ending in '*'
  } cases[] = {
      {"maker", "maker", kOwn, kDefault, false, ZELSIGN_TRX_SIGNED, nullptr},
      {"maker embedded", "maker+", kOwn, kDefault, false, ZELSIGN_TRX_SIGNED, nullptr},
      {"partner embedded", "partner+", kOwn, kDefault, false, ZELSIGN_PARTNER_SIGNED, nullptr},
      {"partner where the maker's is needed", "partner", kOwn, kDefault, false,
       ZELSIGN_PARTNER_SIGNED, "certificate verify error (unable to get local issuer certificate)"},
      {"stranger", "stranger", kOwn, kDefault, false, ZELSIGN_INVALID_CERT,
       "certificate verify error (self-signed certificate)"},
      {"expired signer", "expired", kOwn, kDefault, false, ZELSIGN_TRX_SIGNED, nullptr},
      {"revoked signer", "revoked", kOwn, kDefault, false, ZELSIGN_INVALID_CERT,
       "certificate verify error (certificate revoked)"},
      {"chain of depth 5", "deep", kOwn, kDefault, false, ZELSIGN_TRX_SIGNED, nullptr},
      {"untrusted chain of depth 5", "deepstranger", kOwn, kDefault, false, ZELSIGN_INVALID_CERT,
       "certificate verify error (self-signed certificate in certificate chain)"},
      {"two signers, one untrusted", "two digests", kOwn, kDefault, false, ZELSIGN_INVALID_CERT,
       "certificate verify error (unable to get local issuer certificate)"},
      {"tampered data", "maker", kOwn, kDefault, true, ZELSIGN_INVALID_CERT, "signature failure*"},
      {"maker CRL missing: revocation unchecked", "revoked", kNoMakerCrl, kDefault, false,
       ZELSIGN_TRX_SIGNED, nullptr},
      {"maker CRL and garbage", "maker", kBadMakerCrl, kDefault, false, ZELSIGN_ERROR, kCorrupt},
      {"partner file named as the maker's", "partner", kOwn, kPartnerCertFile, false,
       ZELSIGN_TRX_SIGNED, nullptr},
      {"caller store of the partner", "partner", kOwn, kPartnerStore, false, ZELSIGN_TRX_SIGNED,
       nullptr},
      {"maker under a caller store of the partner", "maker", kOwn, kPartnerStore, false,
       ZELSIGN_INVALID_CERT, "certificate verify error (unable to get local issuer certificate)"},
  };
  std::string partnerCert = certDir_ + "tvxpartner.cert";
  for (const auto &c : cases) {
    SCOPED_TRACE(c.name);
    UniquePtr<PKCS7> p7 = Load(sigs_[c.sig]);
    ASSERT_NE(p7, nullptr);
    bool embedded = std::string(c.sig).back() == '+';
    std::string data = c.tamper ? kData + "!" : kData;
    const void *bytes = embedded ? nullptr : data.data();
    size_t len = embedded ? 0 : data.size();
    sig::TrustFiles files = sig::TrustFilesIn(certDir_);
    if (c.files == kNoMakerCrl) files.makerCrl = tmp_->Join("none.crl");
    if (c.files == kBadMakerCrl) files.makerCrl = tmp_->Join("garbage.crl");
    const char *certFile = c.trust == kPartnerCertFile ? partnerCert.c_str() : nullptr;
    if (certFile != nullptr) files.makerCert = certFile;
    // A caller's store stays the caller's: used by every call below, freed here.
    UniquePtr<X509_STORE> store;
    if (c.trust == kPartnerStore) store = sig::LoadStore(partnerCert.c_str());

    Text err, why;
    EXPECT_EQ(sig::VerifyStatus(p7.get(), bytes, len, store.get(), files, &err.p, nullptr),
              c.status)
        << err.str();
    EXPECT_EQ(sig::CheckValidity(p7.get(), bytes, len, store.get(), files, !embedded, &why.p),
              c.error == nullptr);
    std::string want = c.error != nullptr ? c.error : "(null)", got = why.str();
    if (want.back() == '*') want.pop_back(), got.resize(std::min(got.size(), want.size()));
    EXPECT_EQ(got, want);
    if (c.files == kOwn) {
      Text statusErr;
      EXPECT_EQ(ZelSign_VerifyStatus(p7.get(), bytes, len, certFile, store.get(), &statusErr.p),
                c.status);
    }
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
      {0, X509_V_ERR_CERT_HAS_EXPIRED, 1, 1, X509_V_OK},
      {0, X509_V_ERR_CERT_HAS_EXPIRED, 5, 1, X509_V_ERR_CERT_CHAIN_TOO_LONG},
      {0, 24, 0, 1, X509_V_OK},
      {0, X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT, 0, 0, X509_V_OK},
      {0, 29, 0, 1, X509_V_OK},
      {0, X509_V_ERR_INVALID_CA, 0, 0, X509_V_OK},
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

TEST_F(ZelSignTest, LoadersContentAndErrorSlots) {
  // A whole PEM loads and leaves the slot empty; cut short, it is refused
  // with OpenSSL's reason.
  const std::string &embedded = sigs_["maker+"];
  for (size_t size : {embedded.size(), embedded.size() / 2}) {
    Text err;
    UniquePtr<PKCS7> p7(ZelSign_GetPKCS7FromRawBuffer(embedded.data(), size, &err.p));
    EXPECT_EQ(p7 == nullptr, size < embedded.size());
    EXPECT_EQ(err.str(), size < embedded.size() ? "bad end line" : "(null)");
  }
  Text missing;
  EXPECT_EQ(ZelSign_GetPKCS7FromFile((certDir_ + "none.p7").c_str(), &missing.p), nullptr);
  EXPECT_NE(missing.p, nullptr);
  EXPECT_EQ(ZelSign_GetPKCS7FromRawBuffer("x", 1, nullptr), nullptr);  // the slot is optional
  ERR_clear_error();

  // The content comes out of an embedded signature, NUL-terminated, with no
  // certificate check (a stranger's too); a detached one has none to give.
  for (const char *s : {"maker+", "stranger+", "maker"}) {
    UniquePtr<PKCS7> p7 = Load(sigs_[s]);
    char *content = reinterpret_cast<char *>(1);
    size_t len = 99;
    Text err;
    ZelSign_GetDigestFromPKCS7(p7.get(), &content, &len, &err.p);
    bool inside = std::string(s).back() == '+';
    EXPECT_EQ(content != nullptr ? std::string(content, len + 1) : "", inside ? kData + '\0' : "");
    EXPECT_EQ(err.p == nullptr, inside) << s;
    std::free(content);
    ERR_clear_error();
  }

  UniquePtr<PKCS7> p7 = Load(sigs_["maker"]);
  Text tooSmall, noData;
  // Length 0 is refused before p7 is looked at.
  EXPECT_FALSE(ZelSign_IsTrxSignatureValid(nullptr, "x", 0, nullptr, nullptr, &tooSmall.p));
  EXPECT_EQ(tooSmall.str(), "Data buffer too small.");
  // A text already in the slot fails the check and stays as it was.
  char keep[] = "earlier";
  char *slot = keep;
  EXPECT_FALSE(
      ZelSign_IsTrxSignatureValid(p7.get(), kData.data(), kData.size(), nullptr, nullptr, &slot));
  EXPECT_EQ(slot, keep);
  // A detached signature checked without its data fails with a text.
  EXPECT_FALSE(ZelSign_IsSignatureValid(p7.get(), &noData.p));
  EXPECT_NE(noData.p, nullptr);
  ERR_clear_error();
}

}  // namespace
