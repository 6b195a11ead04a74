#include "hashdata_writer.h"

#include <fcntl.h>
#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/pkcs7.h>
#include <openssl/x509.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "platform/endian.h"
#include "progress.h"

namespace tvxcli {

namespace {

template <typename T, void (*F)(T *)>
struct Free {
  void operator()(T *p) const { F(p); }
};
using BioPtr = std::unique_ptr<BIO, Free<BIO, BIO_free_all>>;
using KeyPtr = std::unique_ptr<EVP_PKEY, Free<EVP_PKEY, EVP_PKEY_free>>;
using CertPtr = std::unique_ptr<X509, Free<X509, X509_free>>;
using P7Ptr = std::unique_ptr<PKCS7, Free<PKCS7, PKCS7_free>>;
using MdPtr = std::unique_ptr<EVP_MD, Free<EVP_MD, EVP_MD_free>>;
using MdCtxPtr = std::unique_ptr<EVP_MD_CTX, Free<EVP_MD_CTX, EVP_MD_CTX_free>>;
void FreeCerts(STACK_OF(X509) * s) { sk_X509_pop_free(s, X509_free); }
using CertsPtr = std::unique_ptr<STACK_OF(X509), Free<STACK_OF(X509), FreeCerts>>;
using FilePtr = std::unique_ptr<FILE, Free<FILE, [](FILE *f) { std::fclose(f); }>>;

constexpr char kMagic[] = "A Tarvex External Hashdata File";
constexpr uint32_t kMetadataLength = 512;
constexpr uint32_t kHashSize = 32;

std::string OpensslError(const std::string &what) {
  unsigned long code = ERR_get_error();
  const char *reason = code != 0 ? ERR_reason_error_string(code) : nullptr;
  ERR_clear_error();
  return what + (reason != nullptr ? std::string(": ") + reason : std::string());
}

void Le32(std::string *b, size_t at, uint32_t v) {
  tvx::StoreLe32(reinterpret_cast<uint8_t *>(b->data() + at), v);
}
void Le64(std::string *b, size_t at, uint64_t v) {
  tvx::StoreLe64(reinterpret_cast<uint8_t *>(b->data() + at), v);
}

// Header lays out the fixed fields (tvx_toolsiso.h); the bytes it does not
// name stay zero.
std::string Header(uint32_t blockSize, uint64_t hashCount, uint32_t hashFileBlockSize,
                   uint64_t signatureOffset, uint64_t signatureSize) {
  std::string h(kMetadataLength, '\0');
  std::memcpy(h.data(), kMagic, sizeof kMagic);
  Le32(&h, 32, kMetadataLength);
  Le32(&h, 44, blockSize);
  Le32(&h, 48, kHashSize);
  Le32(&h, 52, hashFileBlockSize);
  Le64(&h, 64, kMetadataLength);
  Le64(&h, 72, hashCount);
  Le64(&h, 80, signatureOffset);
  Le64(&h, 88, signatureSize);
  std::memcpy(h.data() + 96, "SHA-256", 8);
  return h;
}

// BlockHashes reads the image once and hashes it block by block.
bool BlockHashes(const std::string &path, uint32_t blockSize, bool quiet, std::string *out,
                 std::string *error) {
  FilePtr f(std::fopen(path.c_str(), "rb"));
  if (f == nullptr) {
    *error = path + ": " + std::strerror(errno);
    return false;
  }
  std::fseek(f.get(), 0, SEEK_END);
  long size = std::ftell(f.get());
  std::rewind(f.get());
  MdPtr md(EVP_MD_fetch(nullptr, "SHA2-256", nullptr));
  MdCtxPtr ctx(EVP_MD_CTX_new());
  if (md == nullptr || ctx == nullptr) {
    *error = OpensslError("SHA-256 unavailable");
    return false;
  }
  Progress bar("hashing", size > 0 ? static_cast<uint64_t>(size) : 0, quiet);
  std::vector<unsigned char> chunk(static_cast<size_t>(blockSize) * (1048576 / blockSize));
  uint64_t done = 0;
  size_t n;
  while ((n = std::fread(chunk.data(), 1, chunk.size(), f.get())) > 0) {
    for (size_t at = 0; at < n; at += blockSize) {
      unsigned char digest[EVP_MAX_MD_SIZE];
      unsigned int len = 0;
      size_t part = n - at < blockSize ? n - at : blockSize;
      if (EVP_DigestInit_ex2(ctx.get(), md.get(), nullptr) != 1 ||
          EVP_DigestUpdate(ctx.get(), chunk.data() + at, part) != 1 ||
          EVP_DigestFinal_ex(ctx.get(), digest, &len) != 1) {
        *error = OpensslError("hashing failed");
        return false;
      }
      out->append(reinterpret_cast<char *>(digest), len);
    }
    done += n;
    bar.Update(done);
    if (n < chunk.size()) break;
  }
  if (std::ferror(f.get())) {
    *error = path + ": read error";
    return false;
  }
  if (out->empty()) {
    *error = path + ": the image is empty";
    return false;
  }
  return true;
}

}  // namespace

struct Signer::State {
  KeyPtr key;
  CertPtr cert;
  CertsPtr chain;
};

Signer::~Signer() = default;

std::unique_ptr<Signer> Signer::Load(const std::string &keyFile, const std::string &certFile,
                                     std::string *error) {
  std::unique_ptr<Signer> s(new Signer());
  s->state_ = std::make_unique<State>();
  BioPtr kb(BIO_new_file(keyFile.c_str(), "r"));
  if (kb != nullptr)
    s->state_->key.reset(PEM_read_bio_PrivateKey(kb.get(), nullptr, nullptr, nullptr));
  if (s->state_->key == nullptr) {
    *error = OpensslError("cannot read the key " + keyFile);
    return nullptr;
  }
  BioPtr cb(BIO_new_file(certFile.c_str(), "r"));
  if (cb != nullptr) s->state_->cert.reset(PEM_read_bio_X509(cb.get(), nullptr, nullptr, nullptr));
  if (s->state_->cert == nullptr) {
    *error = OpensslError("cannot read the certificate " + certFile);
    return nullptr;
  }
  s->state_->chain.reset(sk_X509_new_null());
  while (X509 *more = PEM_read_bio_X509(cb.get(), nullptr, nullptr, nullptr)) {
    if (sk_X509_push(s->state_->chain.get(), more) <= 0) {
      X509_free(more);
      *error = "out of memory";
      return nullptr;
    }
  }
  ERR_clear_error();  // the end of the file
  if (X509_check_private_key(s->state_->cert.get(), s->state_->key.get()) != 1) {
    *error = OpensslError("the key does not belong to the certificate");
    return nullptr;
  }
  return s;
}

std::string Signer::Sign(const std::string &data, std::string *error) const {
  BioPtr in(BIO_new_mem_buf(data.data(), static_cast<int>(data.size())));
  P7Ptr p7(in == nullptr ? nullptr
                         : PKCS7_sign(state_->cert.get(), state_->key.get(), state_->chain.get(),
                                      in.get(), PKCS7_BINARY | PKCS7_DETACHED));
  BioPtr out(BIO_new(BIO_s_mem()));
  if (p7 == nullptr || out == nullptr || PEM_write_bio_PKCS7(out.get(), p7.get()) != 1) {
    *error = OpensslError("signing failed");
    return std::string();
  }
  char *bytes = nullptr;
  long n = BIO_get_mem_data(out.get(), &bytes);
  return std::string(bytes, static_cast<size_t>(n));
}

std::string CreateHashData(const std::string &imagePath, const HashDataOptions &options,
                           const Signer &signer, std::string *detached, std::string *error) {
  std::string hashes;
  if (!BlockHashes(imagePath, options.blockSize, options.quiet, &hashes, error)) return "";
  uint64_t count = hashes.size() / kHashSize;
  if (!options.embedSignature) {
    std::string file = Header(options.blockSize, count, 0, 0, 0) + hashes;
    *detached = signer.Sign(file, error);
    return detached->empty() ? "" : file;
  }
  // The signature covers the header, which names the signature's size: sign
  // once to learn the size, reserve room, then sign the real bytes. PEM
  // readers skip the newlines that pad the room.
  uint64_t offset = kMetadataLength + hashes.size();
  std::string probe = signer.Sign(Header(options.blockSize, count, options.blockSize, 0, 0), error);
  if (probe.empty()) return "";
  uint64_t room = probe.size() + 256;
  std::string covered = Header(options.blockSize, count, options.blockSize, offset, room) + hashes;
  std::string sig = signer.Sign(covered, error);
  if (sig.empty()) return "";
  if (sig.size() > room) {
    *error = "the signature outgrew its room";
    return "";
  }
  sig.resize(room, '\n');
  return covered + sig;
}

bool WriteWhole(const std::string &path, const std::string &data, std::string *error) {
  std::string tmp = path + ".tmp-XXXXXX";
  int fd = mkstemp(tmp.data());
  if (fd < 0) {
    *error = path + ": " + std::strerror(errno);
    return false;
  }
  bool ok = true;
  for (size_t at = 0; ok && at < data.size();) {
    ssize_t n = write(fd, data.data() + at, data.size() - at);
    if (n < 0 && errno == EINTR) continue;
    ok = n > 0;
    if (ok) at += static_cast<size_t>(n);
  }
  ok = ok && fchmod(fd, 0644) == 0 && fsync(fd) == 0;
  ok = (close(fd) == 0) && ok;
  ok = ok && std::rename(tmp.c_str(), path.c_str()) == 0;
  if (!ok) {
    *error = path + ": " + std::strerror(errno);
    unlink(tmp.c_str());
  }
  return ok;
}

bool ReadWhole(const std::string &path, uint64_t limit, std::string *out, std::string *error) {
  FilePtr f(std::fopen(path.c_str(), "rb"));
  if (f == nullptr) {
    *error = path + ": " + std::strerror(errno);
    return false;
  }
  char buf[65536];
  size_t n;
  out->clear();
  while ((n = std::fread(buf, 1, sizeof buf, f.get())) > 0) {
    if (out->size() + n > limit) {
      *error = path + ": too big";
      return false;
    }
    out->append(buf, n);
  }
  if (std::ferror(f.get())) {
    *error = path + ": read error";
    return false;
  }
  return true;
}

}  // namespace tvxcli
