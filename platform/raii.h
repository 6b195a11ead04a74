// Owning handles for the C libraries the library uses: one deleter per handle
// type, so every libxml2, OpenSSL, curl and stdio object lives in a
// UniquePtr<T> and is released on every path. A null handle is never passed
// to a release function.
//
//   tvx::UniquePtr<xmlDoc> doc(xmlReadFile(path, nullptr, XML_PARSE_NONET));
//   tvx::UniqueFd fd(open(path, O_RDONLY));
#pragma once

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <utility>

#include <unistd.h>

#include <curl/curl.h>
#include <libxml/tree.h>
#include <libxml/xpath.h>
#include <openssl/bio.h>
#include <openssl/pkcs7.h>
#include <openssl/x509.h>
#include <openssl/x509_vfy.h>

namespace tvx {

template <typename T>
struct Deleter;

#define TVX_MAKE_DELETER(type, release)                      \
  template <>                                                \
  struct Deleter<type> {                                     \
    void operator()(type *p) const noexcept { release(p); }  \
  }

TVX_MAKE_DELETER(xmlDoc, xmlFreeDoc);
TVX_MAKE_DELETER(xmlXPathContext, xmlXPathFreeContext);
TVX_MAKE_DELETER(xmlXPathObject, xmlXPathFreeObject);
TVX_MAKE_DELETER(BIO, BIO_free_all);
TVX_MAKE_DELETER(X509, X509_free);
TVX_MAKE_DELETER(X509_STORE, X509_STORE_free);
TVX_MAKE_DELETER(X509_CRL, X509_CRL_free);
TVX_MAKE_DELETER(PKCS7, PKCS7_free);
TVX_MAKE_DELETER(CURL, curl_easy_cleanup);
TVX_MAKE_DELETER(FILE, std::fclose);

#undef TVX_MAKE_DELETER

template <typename T>
using UniquePtr = std::unique_ptr<T, Deleter<T>>;

// XmlChars owns a string that libxml2 allocated (xmlFree).
struct XmlCharsDeleter {
  void operator()(xmlChar *p) const noexcept { xmlFree(p); }
};
using XmlChars = std::unique_ptr<xmlChar, XmlCharsDeleter>;

// MallocDeleter releases what malloc, strdup and the platform's Util*/Str_*
// allocators return.
struct MallocDeleter {
  void operator()(void *p) const noexcept { std::free(p); }
};
using CharPtr = std::unique_ptr<char, MallocDeleter>;

// UniqueFd owns a POSIX file descriptor (-1 for none).
class UniqueFd {
 public:
  UniqueFd() noexcept = default;
  explicit UniqueFd(int fd) noexcept : fd_(fd) {}
  ~UniqueFd() { reset(); }
  UniqueFd(UniqueFd &&other) noexcept : fd_(other.release()) {}
  UniqueFd &operator=(UniqueFd &&other) noexcept {
    if (this != &other) reset(other.release());
    return *this;
  }
  UniqueFd(const UniqueFd &) = delete;
  UniqueFd &operator=(const UniqueFd &) = delete;

  int get() const noexcept { return fd_; }
  explicit operator bool() const noexcept { return fd_ >= 0; }
  int release() noexcept { return std::exchange(fd_, -1); }
  void reset(int fd = -1) noexcept {
    if (fd_ >= 0) ::close(fd_);
    fd_ = fd;
  }

 private:
  int fd_ = -1;
};

}  // namespace tvx
