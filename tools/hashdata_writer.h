// Writing signed hash-data files for tools images: block hashes, the header
// of tvx_toolsiso.h, and a PKCS#7 signature made with OpenSSL.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

namespace tvxcli {

// Signer holds a private key and the certificates of a PEM file: the first
// one signs, the others travel in the signature as its chain.
class Signer {
 public:
  ~Signer();
  // Load reads both files; null with *error set when either is unusable.
  static std::unique_ptr<Signer> Load(const std::string &keyFile, const std::string &certFile,
                                      std::string *error);
  // Sign returns a detached PEM PKCS#7 signature of `data`, or "" with
  // *error set.
  std::string Sign(const std::string &data, std::string *error) const;

 private:
  Signer() = default;
  struct State;
  std::unique_ptr<State> state_;
};

struct HashDataOptions {
  uint32_t blockSize = 4096;
  bool embedSignature = false;
  bool quiet = false;  // no progress bar
};

// CreateHashData hashes the image at `imagePath` and returns the hash-data
// file signed by `signer`: with the signature at its end, or without it and
// the detached signature in *detached. "" with *error set on failure.
std::string CreateHashData(const std::string &imagePath, const HashDataOptions &options,
                           const Signer &signer, std::string *detached, std::string *error);

// WriteWhole writes `data` to `path` through a temporary file in the same
// directory and a rename, so a reader never sees half a file.
bool WriteWhole(const std::string &path, const std::string &data, std::string *error);

// ReadWhole reads a file of at most `limit` bytes.
bool ReadWhole(const std::string &path, uint64_t limit, std::string *out, std::string *error);

}  // namespace tvxcli
