// Where the hash data of an image comes from: IMAGE.sha (and IMAGE.sig)
// beside a local image, or the companion URLs of an image on a server. Once
// hash data exists, its signature must be present and valid whatever the
// caller's `requireHash` says; only the absence of hash data is negotiable.
#include <cstdlib>
#include <cstring>
#include <string>

#include "lib/toolsImage/toolsiso_image_internal.h"
#include "platform/http.h"
#include "platform/log.h"
#include "platform/str.h"
#include "platform/unique.h"
#include "platform/util.h"

namespace tvx {
TVX_MAKE_DELETER(ToolsIsoHashInfo, ToolsISO_FreeHashInfo);
}  // namespace tvx

namespace tvx::toolsiso {
namespace {

// See decision e of the public header.
constexpr uint64_t kMinSignatureCeiling = 64 * 1024;

// CheckSignature verifies the embedded signature of `info`, or the detached
// one when there is none.
bool CheckSignature(const ToolsIsoHashInfo &info, const void *detached, size_t detachedLen,
                    const char *certFile) {
  HashDataHeader h = HeaderOf(info);
  uint64_t signedSize = SignedSize(info);
  if (h.signatureOffset != 0) {
    return ToolsISO_VerifySignature(certFile, info.data + h.signatureOffset,
                                    static_cast<size_t>(h.signatureSize), info.data,
                                    static_cast<size_t>(signedSize));
  }
  return ToolsISO_VerifySignature(certFile, detached, detachedLen, info.data,
                                  static_cast<size_t>(signedSize));
}

bool HasEmbeddedSignature(const ToolsIsoHashInfo &info) {
  return HeaderOf(info).signatureOffset != 0;
}

// Parse hands `buf` to the parser; on failure it is freed here.
ToolsIsoHashInfo *Parse(char *buf, uint64_t size, const char *what) {
  ToolsIsoHashInfo *info = ToolsISO_ParseHashData(reinterpret_cast<uint8_t *>(buf), size);
  if (info == nullptr) {
    free(buf);
    Log("ToolsISO: Unable to parse the hash '%s'.\n", what);
  }
  return info;
}

}  // namespace

Bool LocalHashInfo(const char *imagePath, uint64_t imageSize, Bool requireHash,
                   const char *certFile, ToolsIsoHashInfo **out_info) {
  CharPtr real(ToolsISO_GetRealPath(imagePath));
  CharPtr hashPath(Str_SafeAsprintf(nullptr, "%s.sha", real.get()));
  char *buf = nullptr;
  size_t size = 0;
  if (!ToolsISO_ReadFile(hashPath.get(), &buf, &size)) {
    if (requireHash) {
      Log("ToolsISO: Unable to read hash file %s.\n", hashPath.get());
      return FALSE;
    }
    Log("ToolsISO: Unable to read hash file %s, ignoring.\n", hashPath.get());
    return TRUE;
  }
  if (size >= imageSize) {
    free(buf);
    Log("ToolsISO: Hash file '%s' too big (%zu bytes).\n", hashPath.get(), size);
    return FALSE;
  }
  UniquePtr<ToolsIsoHashInfo> info(Parse(buf, size, hashPath.get()));
  if (!info) return FALSE;

  CharPtr sig;
  size_t sigSize = 0;
  if (!HasEmbeddedSignature(*info)) {
    CharPtr sigPath(Str_SafeAsprintf(nullptr, "%s.sig", real.get()));
    char *sigBuf = nullptr;
    if (!ToolsISO_ReadFile(sigPath.get(), &sigBuf, &sigSize)) {
      Log("ToolsISO: Unable to read signature file '%s'.\n", sigPath.get());
      return FALSE;
    }
    sig.reset(sigBuf);
    if (sigSize >= MaxDetachedSignature(SignedSize(*info))) {
      Log("ToolsISO: Signature file '%s' too big (%zu bytes).\n", sigPath.get(), sigSize);
      return FALSE;
    }
  }
  if (!CheckSignature(*info, sig.get(), sigSize, certFile)) {
    Log("ToolsISO: Signature verification failed for '%s'.\n", real.get());
    return FALSE;
  }
  *out_info = info.release();
  return TRUE;
}

namespace {

// Fetch reads a whole companion file of `size` bytes into a zeroed buffer.
HttpError Fetch(HttpConnection *conn, const std::string &url, uint64_t size, CharPtr *out) {
  out->reset(static_cast<char *>(UtilSafeCalloc0(1, static_cast<size_t>(size) + 1)));
  return Http_Read(conn, url.c_str(), 0, out->get(), static_cast<size_t>(size), nullptr, nullptr);
}

}  // namespace

Bool HttpHashInfo(HttpConnection *conn, const char *imageUrl, uint64_t imageSize,
                  Bool requireHash, const char *certFile, ToolsIsoHashInfo **out_info) {
  std::string hashUrl = MakeCompanionUrl(imageUrl, "sha");
  const char *hashArg = hashUrl.empty() ? nullptr : hashUrl.c_str();
  uint64_t size = 0;
  HttpError e = Http_GetFileSize(conn, hashArg, &size);
  if (e != HTTP_OK) {
    // Only a definite "there is none" may be tolerated: an unreachable or
    // failing server must not switch verification off.
    bool absent = e == HTTP_ERR_NOT_FOUND || hashArg == nullptr;
    if (requireHash || !absent) {
      Log("ToolsISO: Unable to get the size for hash '%s' (error=%d).\n", hashUrl.c_str(), e);
      return FALSE;
    }
    Log("ToolsISO: Unable to get the size for hash '%s' (error=%d), ignoring.\n",
        hashUrl.c_str(), e);
    return TRUE;
  }
  if (size >= imageSize) {
    Log("ToolsISO: Hash file '%s' too big (%lu bytes).\n", hashUrl.c_str(),
        static_cast<unsigned long>(size));
    return FALSE;
  }
  CharPtr buf;
  if ((e = Fetch(conn, hashUrl, size, &buf)) != HTTP_OK) {
    Log("ToolsISO: Unable to fetch hash '%s' (error=%d).\n", hashUrl.c_str(), e);
    return FALSE;
  }
  UniquePtr<ToolsIsoHashInfo> info(Parse(buf.release(), size, hashUrl.c_str()));
  if (!info) return FALSE;

  CharPtr sig;
  uint64_t sigSize = 0;
  if (!HasEmbeddedSignature(*info)) {
    std::string sigUrl = MakeCompanionUrl(imageUrl, "sig");
    if ((e = Http_GetFileSize(conn, sigUrl.c_str(), &sigSize)) != HTTP_OK) {
      Log("ToolsISO: Unable to get the size for signature '%s' (error=%d).\n", sigUrl.c_str(), e);
      return FALSE;
    }
    if (sigSize >= MaxDetachedSignature(SignedSize(*info))) {
      Log("ToolsISO: Signature file '%s' is too big (%lu bytes).\n", sigUrl.c_str(),
          static_cast<unsigned long>(sigSize));
      return FALSE;
    }
    if ((e = Fetch(conn, sigUrl, sigSize, &sig)) != HTTP_OK) {
      Log("ToolsISO: Unable to fetch signature '%s' (error=%d).\n", sigUrl.c_str(), e);
      return FALSE;
    }
  }
  if (!CheckSignature(*info, sig.get(), static_cast<size_t>(sigSize), certFile)) {
    Log("ToolsISO: Signature verification failed for '%s'.\n", imageUrl);
    return FALSE;
  }
  *out_info = info.release();
  return TRUE;
}

uint64_t MaxDetachedSignature(uint64_t signedSize) {
  return signedSize > kMinSignatureCeiling ? signedSize : kMinSignatureCeiling;
}

std::string MakeCompanionUrl(const std::string &url, const char *suffix) {
  size_t at = url.find(".iso");
  if (at == std::string::npos) {
    Log("ToolsISO: Tools ISO URL '%s' does not have '.iso' extension?\n", url.c_str());
    return "";
  }
  at += 4;
  return url.substr(0, at) + "." + suffix + url.substr(at);
}

}  // namespace tvx::toolsiso

using namespace tvx::toolsiso;

extern "C" {

Bool ToolsISO_GetLocalFileHashInfo(const char *imagePath, uint64_t imageSize, Bool requireHash,
                                   ToolsIsoHashInfo **out_info) {
  if (out_info != nullptr) *out_info = nullptr;
  if (imagePath == nullptr || out_info == nullptr) return FALSE;
  try {
    return LocalHashInfo(imagePath, imageSize, requireHash, nullptr, out_info);
  } catch (...) {
    return FALSE;
  }
}

Bool ToolsISO_GetHttpHashInfo(void *connection, const char *imageUrl, uint64_t imageSize,
                              Bool requireHash, ToolsIsoHashInfo **out_info) {
  if (out_info != nullptr) *out_info = nullptr;
  if (imageUrl == nullptr || out_info == nullptr) return FALSE;
  try {
    auto *conn = static_cast<HttpConnection *>(connection);
    tvx::UniquePtr<HttpConnection> own;
    if (conn == nullptr) {
      HttpError e = Http_Connect(imageUrl, 4, 15000, 0, nullptr, nullptr, &conn);
      if (e != HTTP_OK) {
        Log("ToolsISO: Unable to connect to the server containing URL '%s' (error=%d).\n",
            imageUrl, e);
        return FALSE;
      }
      own.reset(conn);
    }
    Bool ok = HttpHashInfo(conn, imageUrl, imageSize, requireHash, nullptr, out_info);
    if (own) {
      HttpError e = Http_Close(own.release());
      if (e != HTTP_OK) {
        Log("ToolsISO: Unable to close HTTP connection for '%s' (error=%d).\n", imageUrl, e);
      }
    }
    return ok;
  } catch (...) {
    return FALSE;
  }
}

}  // extern "C"
