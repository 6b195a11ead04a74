// The signer check: each signer of a PKCS#7 object against the maker's store,
// then the partner store, then on its own (a sound signature by a certificate
// that neither store trusts).
#include <openssl/err.h>

#include <climits>

#include "lib/signature/zelsign_internal.h"

namespace tvx::signature {

namespace {

// X509Refs holds certificates that p7 owns: the stack goes, they stay.
struct X509RefsDeleter {
  void operator()(STACK_OF(X509) * s) const noexcept { sk_X509_free(s); }
};
using X509Refs = std::unique_ptr<STACK_OF(X509), X509RefsDeleter>;

bool Attempt(PKCS7 *p7, STACK_OF(X509) * certs, X509_STORE *store, BIO *data, BIO *out, int flags) {
  // Every attempt reads the detached content from its start.
  if (data != nullptr) (void)BIO_reset(data);
  return PKCS7_verify(p7, certs, store, data, out, flags) > 0;
}

// The verification callback overwrites the chain error it is shown (with
// "ok" below depth 5), so the reason a chain was refused is lost by the time
// PKCS7_verify reports it. The maker's store therefore carries a note, in
// its ex_data slot, of the first chain error that the callback rejected.
struct ChainRefusal {
  int code = X509_V_OK;
};

int RefusalIndex() {
  static const int index = X509_STORE_get_ex_new_index(0, nullptr, nullptr, nullptr, nullptr);
  return index;
}

int NotingCallback(int ok, X509_STORE_CTX *ctx) {
  int code = X509_STORE_CTX_get_error(ctx);
  int verdict = VerifyCallback(ok, ctx);
  auto *note = static_cast<ChainRefusal *>(
      X509_STORE_get_ex_data(X509_STORE_CTX_get0_store(ctx), RefusalIndex()));
  if (verdict == 0 && note != nullptr && note->code == X509_V_OK) note->code = code;
  return verdict;
}

// NoteOn attaches a note to a store for one check and takes it off again,
// so a caller's store never keeps a pointer into a finished call.
class NoteOn {
 public:
  NoteOn(X509_STORE *store, ChainRefusal *note) : store_(store) {
    if (RefusalIndex() >= 0) X509_STORE_set_ex_data(store_, RefusalIndex(), note);
  }
  ~NoteOn() {
    if (RefusalIndex() >= 0) X509_STORE_set_ex_data(store_, RefusalIndex(), nullptr);
  }
  NoteOn(const NoteOn &) = delete;
  NoteOn &operator=(const NoteOn &) = delete;

 private:
  X509_STORE *store_;
};

// LastErrorText describes the newest error on OpenSSL's queue, with the
// detail text that PKCS7_verify attaches ("Verify error:...").
std::string LastErrorText() {
  const char *data = nullptr;
  int flags = 0;
  unsigned long code = ERR_peek_last_error_all(nullptr, nullptr, nullptr, &data, &flags);
  if (code == 0) return std::string();
  std::string text = ReasonText(code);
  if ((flags & ERR_TXT_STRING) != 0 && data != nullptr && *data != '\0') {
    text += " (";
    text += data;
    text += ")";
  }
  return text;
}

}  // namespace

uint32_t Verify(PKCS7 *p7, BIO *data, X509_STORE *store, const TrustFiles &files, char **err,
                std::string *makerRefusal) {
  UniquePtr<BIO> out(BIO_new(BIO_s_mem()));
  UniquePtr<X509_STORE> ownMaker;
  X509_STORE *maker = store;
  if (maker == nullptr) {
    ownMaker = LoadStore(files.makerCert.c_str());
    maker = ownMaker.get();
  }
  UniquePtr<X509_STORE> partner = LoadStore(files.partnerCert.c_str());
  if (out == nullptr || maker == nullptr || partner == nullptr) {
    SetError(err, "out of memory");
    return ZELSIGN_ERROR;
  }
  if (!LoadCrl(maker, files.makerCrl.c_str(), err) ||
      !LoadCrl(partner.get(), files.partnerCrl.c_str(), err)) {
    return ZELSIGN_ERROR;
  }
  X509_STORE_set_verify_cb(maker, NotingCallback);
  X509_STORE_set_verify_cb(partner.get(), VerifyCallback);
  ChainRefusal note;
  NoteOn noted(maker, &note);

  STACK_OF(PKCS7_SIGNER_INFO) *infos = PKCS7_get_signer_info(p7);
  int count = infos != nullptr ? sk_PKCS7_SIGNER_INFO_num(infos) : 0;
  for (int i = 0; i < count; i++) {
    PKCS7_SIGNER_INFO *si = sk_PKCS7_SIGNER_INFO_value(infos, i);
    X509Refs certs(sk_X509_new_null());
    if (certs == nullptr) {
      SetError(err, "out of memory");
      return ZELSIGN_ERROR;
    }
    // A signer whose certificate is not in p7 gets an empty list: OpenSSL
    // then reports the missing signer instead of comparing against null.
    X509 *cert = PKCS7_cert_from_signer_info(p7, si);
    if (cert != nullptr && sk_X509_push(certs.get(), cert) <= 0) {
      SetError(err, "out of memory");
      return ZELSIGN_ERROR;
    }
    if (Attempt(p7, certs.get(), maker, data, out.get(), PKCS7_BINARY)) return ZELSIGN_TRX_SIGNED;
    if (makerRefusal != nullptr && makerRefusal->empty()) {
      *makerRefusal = note.code == X509_V_OK
                          ? LastErrorText()
                          : std::string(ReasonText(ERR_peek_last_error())) + " (" +
                                X509_verify_cert_error_string(note.code) + ")";
    }
    if (Attempt(p7, certs.get(), partner.get(), data, out.get(), PKCS7_BINARY)) {
      return ZELSIGN_PARTNER_SIGNED;
    }
    if (Attempt(p7, nullptr, nullptr, data, out.get(), PKCS7_BINARY | PKCS7_NOVERIFY)) break;
  }
  return ZELSIGN_INVALID_CERT;
}

uint32_t VerifyStatus(PKCS7 *p7, const void *data, size_t len, X509_STORE *store,
                      const TrustFiles &files, char **err, std::string *makerRefusal) {
  UniquePtr<BIO> bio;
  if (data != nullptr || len != 0) {
    if (len == 0) {
      SetError(err, "Data buffer too small.");
      return ZELSIGN_ERROR;
    }
    // A memory BIO takes an int length.
    if (len > INT_MAX) {
      SetError(err, kNoReason);
      return ZELSIGN_ERROR;
    }
    bio.reset(BIO_new_mem_buf(data, static_cast<int>(len)));
    if (bio == nullptr) {
      SetError(err, ReasonText(ERR_get_error()));
      return ZELSIGN_ERROR;
    }
  }
  return Verify(p7, bio.get(), store, files, err, makerRefusal);
}

bool CheckValidity(PKCS7 *p7, const void *data, size_t len, X509_STORE *store,
                   const TrustFiles &files, bool makerOnly, char **err) {
  if (err == nullptr || *err != nullptr) return false;
  std::string refusal;
  uint32_t status = VerifyStatus(p7, data, len, store, files, err, &refusal);
  if (*err != nullptr) return false;
  if (status == ZELSIGN_TRX_SIGNED || (status == ZELSIGN_PARTNER_SIGNED && !makerOnly)) {
    return true;
  }
  SetError(err, refusal.empty() ? ZelSign_StatusToString(status) : refusal.c_str());
  return false;
}

}  // namespace tvx::signature

namespace sig = tvx::signature;

extern "C" {

TVX_EXPORT Bool ZelSign_IsSignatureValid(PKCS7 *p7, char **err) {
  try {
    return sig::CheckValidity(p7, nullptr, 0, nullptr, sig::TrustFilesIn(sig::CertDir()), false,
                              err);
  } catch (...) {
    return FALSE;
  }
}

TVX_EXPORT Bool ZelSign_IsTrxSignatureValid(PKCS7 *p7, const void *data, size_t len,
                                            const char *certFile, X509_STORE *store, char **err) {
  try {
    if (err != nullptr && *err == nullptr && len == 0) {
      sig::SetError(err, "Data buffer too small.");
      return FALSE;
    }
    sig::TrustFiles files = sig::TrustFilesIn(sig::CertDir());
    if (certFile != nullptr) files.makerCert = certFile;
    // A null `data` with a length is refused by the memory BIO, never taken
    // for "the content inside p7".
    return sig::CheckValidity(p7, data, len, store, files, true, err);
  } catch (...) {
    return FALSE;
  }
}

TVX_EXPORT uint32_t ZelSign_VerifyStatus(PKCS7 *p7, const void *data, size_t len,
                                         const char *certFile, X509_STORE *store, char **err) {
  try {
    if (err == nullptr || *err != nullptr) return ZELSIGN_ERROR;
    sig::TrustFiles files = sig::TrustFilesIn(sig::CertDir());
    if (certFile != nullptr) files.makerCert = certFile;
    return sig::VerifyStatus(p7, data, len, store, files, err, nullptr);
  } catch (...) {
    return ZELSIGN_ERROR;
  }
}

}  // extern "C"
