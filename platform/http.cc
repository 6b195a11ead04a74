// libcurl is opened on first use (see dynlib.h): linking it costs every
// process about 10 ms of start-up (its TLS, LDAP and Kerberos dependencies),
// and most processes never speak HTTP. curl's headers are used for types and
// option numbers only; every call goes through the table filled by LoadCurl().
#include "platform/http.h"

#define CURL_DISABLE_TYPECHECK 1  // the calls go through pointers, not the macros
#include <curl/curl.h>

#include <cinttypes>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

#include "platform/ascii.h"
#include "platform/dynlib.h"

namespace {

struct CurlApi {
  decltype(&curl_global_init) global_init;
  decltype(&curl_easy_init) easy_init;
  decltype(&curl_easy_cleanup) easy_cleanup;
  decltype(&curl_easy_reset) easy_reset;
  decltype(&curl_easy_perform) easy_perform;
  CURLcode (*easy_setopt)(CURL *, CURLoption, ...);
  CURLcode (*easy_getinfo)(CURL *, CURLINFO, ...);
};

// LoadCurl returns the loaded library's entry points, or null when it is
// missing.
const CurlApi *LoadCurl() {
  return tvx::LoadOnce<CurlApi>([](CurlApi *api) {
    tvx::DynLib lib("libcurl.so.4");
    return lib.Resolve("curl_global_init", &api->global_init) &&
           lib.Resolve("curl_easy_init", &api->easy_init) &&
           lib.Resolve("curl_easy_cleanup", &api->easy_cleanup) &&
           lib.Resolve("curl_easy_reset", &api->easy_reset) &&
           lib.Resolve("curl_easy_perform", &api->easy_perform) &&
           lib.Resolve("curl_easy_setopt", &api->easy_setopt) &&
           lib.Resolve("curl_easy_getinfo", &api->easy_getinfo) &&
           api->global_init(CURL_GLOBAL_DEFAULT) == CURLE_OK;
  });
}

// An error page is read (and dropped) up to this size; a larger one ends the
// transfer.
constexpr size_t kMaxErrorBody = 64 * 1024;
constexpr long kMaxRedirects = 3;
constexpr long kReceiveBuffer = 512 * 1024;

bool IsHttpUrl(const char *url) {
  return url != nullptr &&
         (tvx::ascii::StartsWith(url, "http://") || tvx::ascii::StartsWith(url, "https://"));
}

HttpError FromCurl(CURLcode rc) {
  switch (rc) {
    case CURLE_OK: return HTTP_OK;
    case CURLE_OPERATION_TIMEDOUT: return HTTP_ERR_TIMEOUT;
    case CURLE_COULDNT_CONNECT: return HTTP_ERR_REFUSED;
    case CURLE_COULDNT_RESOLVE_HOST:
    case CURLE_COULDNT_RESOLVE_PROXY:
    case CURLE_SSL_CONNECT_ERROR:
    case CURLE_PEER_FAILED_VERIFICATION:
    case CURLE_RECV_ERROR:
    case CURLE_SEND_ERROR:
    case CURLE_GOT_NOTHING:
      return HTTP_ERR_CONNECT;
    case CURLE_URL_MALFORMAT:
    case CURLE_UNSUPPORTED_PROTOCOL:
      return HTTP_ERR_ARGS;
    case CURLE_TOO_MANY_REDIRECTS: return HTTP_ERR_REDIRECTS;
    case CURLE_PARTIAL_FILE: return HTTP_ERR_SHORT;
    default: return HTTP_ERR_PROTOCOL;
  }
}

bool Transient(HttpError e) { return e == HTTP_ERR_CONNECT || e == HTTP_ERR_TIMEOUT; }

}  // namespace

struct HttpConnection {
  const CurlApi *api = nullptr;
  CURL *curl = nullptr;
  unsigned attempts = 1;
  long timeoutMs = 30000;
  std::string user, password;
  ~HttpConnection() {
    if (curl != nullptr) api->easy_cleanup(curl);
  }
};

namespace {

// One request's state, seen by the header and body callbacks.
struct Transfer {
  char *buf = nullptr;
  size_t len = 0;
  uint64_t offset = 0;
  Http_ProgressFn progress = nullptr;
  void *ctx = nullptr;

  long status = 0;           // of the last status line seen
  bool rangeAnswer = false;  // a Content-Range header came
  bool rangeMismatch = false;
  bool noRange = false;      // a whole-file answer to a read past offset 0
  bool overflow = false;     // more range bytes than asked for
  bool cancelled = false;
  size_t got = 0;
  size_t dropped = 0;        // bytes of an error page

  void Reset() {
    status = 0;
    rangeAnswer = rangeMismatch = noRange = overflow = cancelled = false;
    got = dropped = 0;
  }
};

size_t OnHeader(char *data, size_t size, size_t n, void *user) {
  auto *t = static_cast<Transfer *>(user);
  size_t total = size * n;
  std::string line(data, total);
  if (tvx::ascii::StartsWith(line, "HTTP/")) {
    // A new status line (after a redirect or "100 Continue"): start over.
    size_t sp = line.find(' ');
    t->status = sp == std::string::npos ? 0 : std::strtol(line.c_str() + sp + 1, nullptr, 10);
    t->rangeAnswer = t->rangeMismatch = false;
  } else if (tvx::ascii::StartsWith(line, "Content-Range:")) {
    uint64_t first = 0, last = 0;
    t->rangeAnswer = true;
    if (std::sscanf(line.c_str() + 14, " bytes %" SCNu64 "-%" SCNu64, &first, &last) != 2 ||
        first != t->offset || last < first) {
      t->rangeMismatch = true;
    }
  }
  return total;
}

size_t OnBody(char *data, size_t size, size_t n, void *user) {
  auto *t = static_cast<Transfer *>(user);
  size_t total = size * n;
  if (t->status != 200 && t->status != 206) {
    t->dropped += total;
    return t->dropped <= kMaxErrorBody ? total : 0;
  }
  if (t->rangeMismatch) return 0;
  if (t->status == 200 && t->offset != 0) {
    // The whole file would have to be read through to reach the range.
    t->noRange = true;
    return 0;
  }
  size_t room = t->len - t->got;
  size_t take = total < room ? total : room;
  std::memcpy(t->buf + t->got, data, take);
  t->got += take;
  if (take > 0 && t->progress != nullptr && t->progress(t->got, t->len, t->ctx) != 0) {
    t->cancelled = true;
    return 0;
  }
  if (take < total) {
    // A whole-file answer at offset 0 has what was asked: stop it there. A
    // range answer longer than the range is broken.
    if (t->status == 206) t->overflow = true;
    return 0;
  }
  return total;
}

size_t Discard(char *, size_t size, size_t n, void *) { return size * n; }

void Prepare(HttpConnection *conn, const char *url, long totalMs) {
  const CurlApi &a = *conn->api;
  CURL *c = conn->curl;
  a.easy_reset(c);
  a.easy_setopt(c, CURLOPT_URL, url);
  a.easy_setopt(c, CURLOPT_PROTOCOLS_STR, "http,https");
  a.easy_setopt(c, CURLOPT_REDIR_PROTOCOLS_STR, "http,https");
  a.easy_setopt(c, CURLOPT_FOLLOWLOCATION, 1L);
  a.easy_setopt(c, CURLOPT_MAXREDIRS, kMaxRedirects);
  a.easy_setopt(c, CURLOPT_CONNECTTIMEOUT_MS, conn->timeoutMs);
  a.easy_setopt(c, CURLOPT_TIMEOUT_MS, totalMs);
  // A transfer that stalls for the timeout ends even when the total budget
  // of a large read is far away.
  a.easy_setopt(c, CURLOPT_LOW_SPEED_LIMIT, 1L);
  a.easy_setopt(c, CURLOPT_LOW_SPEED_TIME, conn->timeoutMs < 1000 ? 1L : conn->timeoutMs / 1000);
  a.easy_setopt(c, CURLOPT_NOSIGNAL, 1L);  // a library must not touch signal handlers
  // Image reads are large: fewer, larger hand-overs from the receive buffer.
  a.easy_setopt(c, CURLOPT_BUFFERSIZE, kReceiveBuffer);
  if (!conn->user.empty()) {
    a.easy_setopt(c, CURLOPT_USERNAME, conn->user.c_str());
    a.easy_setopt(c, CURLOPT_PASSWORD, conn->password.c_str());
  }
}

// Perform runs the prepared request, trying again while it times out or the
// connection drops; *out_status receives the final HTTP status.
CURLcode Perform(HttpConnection *conn, long *out_status, Transfer *t) {
  CURLcode rc = CURLE_OK;
  for (unsigned attempt = 0; attempt < conn->attempts; attempt++) {
    if (t != nullptr) t->Reset();
    rc = conn->api->easy_perform(conn->curl);
    if (!Transient(FromCurl(rc))) break;
  }
  *out_status = 0;
  conn->api->easy_getinfo(conn->curl, CURLINFO_RESPONSE_CODE, out_status);
  return rc;
}

HttpError FromStatus(long status, long wanted) {
  if (status == wanted) return HTTP_OK;
  if (status == 404 || status == 410) return HTTP_ERR_NOT_FOUND;
  if (status >= 300 && status < 400) return HTTP_ERR_REDIRECTS;  // a redirect not followed
  return HTTP_ERR_STATUS;
}

}  // namespace

HttpError Http_Connect(const char *url, unsigned attempts, unsigned timeoutMs, unsigned flags,
                       const char *user, const char *password, HttpConnection **out_conn) {
  *out_conn = nullptr;
  if (!IsHttpUrl(url)) return HTTP_ERR_ARGS;
  const CurlApi *api = LoadCurl();
  if (api == nullptr) return HTTP_ERR_NO_CLIENT;
  auto conn = std::make_unique<HttpConnection>();
  conn->api = api;
  conn->curl = api->easy_init();
  if (conn->curl == nullptr) return HTTP_ERR_NO_CLIENT;
  conn->attempts = attempts == 0 ? 1 : attempts;
  conn->timeoutMs = timeoutMs == 0 ? 30000 : static_cast<long>(timeoutMs);
  if (user != nullptr) conn->user = user;
  if (password != nullptr) conn->password = password;
  *out_conn = conn.release();
  return HTTP_OK;
}

HttpError Http_GetFileSize(HttpConnection *conn, const char *url, uint64_t *out_size) {
  *out_size = 0;
  if (conn == nullptr || !IsHttpUrl(url)) return HTTP_ERR_ARGS;
  Prepare(conn, url, conn->timeoutMs);
  const CurlApi &a = *conn->api;
  a.easy_setopt(conn->curl, CURLOPT_NOBODY, 1L);
  a.easy_setopt(conn->curl, CURLOPT_WRITEFUNCTION, Discard);
  long status = 0;
  CURLcode rc = Perform(conn, &status, nullptr);
  if (rc != CURLE_OK) return FromCurl(rc);
  HttpError e = FromStatus(status, 200);
  if (e != HTTP_OK) return e;
  curl_off_t length = -1;
  if (a.easy_getinfo(conn->curl, CURLINFO_CONTENT_LENGTH_DOWNLOAD_T, &length) != CURLE_OK ||
      length < 0) {
    return HTTP_ERR_SHORT;
  }
  *out_size = static_cast<uint64_t>(length);
  return HTTP_OK;
}

HttpError Http_Read(HttpConnection *conn, const char *url, uint64_t offset, void *buf,
                    size_t len, Http_ProgressFn progress, void *ctx) {
  if (conn == nullptr || !IsHttpUrl(url) || (buf == nullptr && len > 0)) return HTTP_ERR_ARGS;
  if (len == 0) return HTTP_OK;
  if (offset > UINT64_MAX - len) return HTTP_ERR_ARGS;
  Transfer t;
  t.buf = static_cast<char *>(buf);
  t.len = len;
  t.offset = offset;
  t.progress = progress;
  t.ctx = ctx;
  // The total budget grows with the size asked for (at least 256 KiB/s);
  // stalls are caught sooner by the low-speed limit.
  uint64_t budget = static_cast<uint64_t>(conn->timeoutMs) + len / 256;
  Prepare(conn, url, budget > LONG_MAX ? LONG_MAX : static_cast<long>(budget));
  char range[64];
  std::snprintf(range, sizeof range, "%" PRIu64 "-%" PRIu64, offset, offset + len - 1);
  const CurlApi &a = *conn->api;
  a.easy_setopt(conn->curl, CURLOPT_RANGE, range);
  a.easy_setopt(conn->curl, CURLOPT_HEADERFUNCTION, OnHeader);
  a.easy_setopt(conn->curl, CURLOPT_HEADERDATA, &t);
  a.easy_setopt(conn->curl, CURLOPT_WRITEFUNCTION, OnBody);
  a.easy_setopt(conn->curl, CURLOPT_WRITEDATA, &t);
  long status = 0;
  CURLcode rc = Perform(conn, &status, &t);
  if (t.cancelled) return HTTP_ERR_STATUS;
  if (t.noRange) return HTTP_ERR_NO_RANGE;
  if (t.overflow || (status == 206 && (!t.rangeAnswer || t.rangeMismatch))) return HTTP_ERR_PROTOCOL;
  if (status != 200 && status != 206 && status != 0) return FromStatus(status, 206);
  bool filled = t.got == t.len;
  // A whole-file answer stopped once the range was filled ends in a write
  // error; that is success.
  if (rc != CURLE_OK && !(rc == CURLE_WRITE_ERROR && filled)) return FromCurl(rc);
  return filled ? HTTP_OK : HTTP_ERR_SHORT;
}

HttpError Http_Close(HttpConnection *conn) {
  delete conn;
  return HTTP_OK;
}

const char *Http_ErrorString(HttpError error) {
  switch (error) {
    case HTTP_OK: return "success";
    case HTTP_ERR_ARGS: return "invalid URL or arguments";
    case HTTP_ERR_CONNECT: return "cannot reach the server";
    case HTTP_ERR_TIMEOUT: return "the server did not answer in time";
    case HTTP_ERR_NOT_FOUND: return "the file was not found on the server";
    case HTTP_ERR_STATUS: return "unexpected answer from the server";
    case HTTP_ERR_SHORT: return "the server sent less data than promised";
    case HTTP_ERR_PROTOCOL: return "malformed answer from the server";
    case HTTP_ERR_REFUSED: return "connection refused";
    case HTTP_ERR_NO_RANGE: return "the server does not serve byte ranges";
    case HTTP_ERR_REDIRECTS: return "too many redirects";
    case HTTP_ERR_NO_CLIENT: return "the HTTP client library (libcurl.so.4) cannot be loaded";
  }
  return "unknown error";
}
