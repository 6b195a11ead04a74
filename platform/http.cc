#include "platform/http.h"

#include <cinttypes>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <string>
#include <strings.h>

#include <curl/curl.h>

#include "platform/unique.h"

namespace tvx {
TVX_MAKE_DELETER(CURL, curl_easy_cleanup);
}  // namespace tvx

struct HttpConnection {
  tvx::UniquePtr<CURL> curl;
  unsigned attempts = 1;
  long timeoutMs = 30000;
  std::string user, password;
};

namespace {

void GlobalInit() {
  static std::once_flag once;
  std::call_once(once, [] { curl_global_init(CURL_GLOBAL_DEFAULT); });
}

bool IsHttpUrl(const char *url) {
  return url != nullptr && (strncasecmp(url, "http://", 7) == 0 || strncasecmp(url, "https://", 8) == 0);
}

HttpError FromCurl(CURLcode rc) {
  switch (rc) {
    case CURLE_OK: return HTTP_OK;
    case CURLE_OPERATION_TIMEDOUT: return HTTP_ERR_TIMEOUT;
    case CURLE_COULDNT_RESOLVE_HOST:
    case CURLE_COULDNT_RESOLVE_PROXY:
    case CURLE_COULDNT_CONNECT:
    case CURLE_SSL_CONNECT_ERROR:
    case CURLE_PEER_FAILED_VERIFICATION:
    case CURLE_RECV_ERROR:
    case CURLE_SEND_ERROR:
    case CURLE_GOT_NOTHING:
      return HTTP_ERR_CONNECT;
    case CURLE_URL_MALFORMAT:
    case CURLE_UNSUPPORTED_PROTOCOL:
      return HTTP_ERR_ARGS;
    case CURLE_PARTIAL_FILE:
      return HTTP_ERR_SHORT;
    default:
      return HTTP_ERR_PROTOCOL;
  }
}

// One request's state, seen by the header and body callbacks.
struct Transfer {
  char *buf = nullptr;
  size_t len = 0;
  uint64_t offset = 0;
  Http_ProgressFn progress = nullptr;
  void *ctx = nullptr;

  long status = 0;          // of the last status line seen
  bool rangeAnswer = false;  // a Content-Range header came
  bool rangeMismatch = false;
  bool bodyStarted = false;
  uint64_t skip = 0;         // bytes of a whole-file answer before the range
  size_t got = 0;
  bool cancelled = false;

  void Reset() {
    status = 0;
    rangeAnswer = rangeMismatch = bodyStarted = cancelled = false;
    skip = 0;
    got = 0;
  }
};

size_t OnHeader(char *data, size_t size, size_t n, void *user) {
  auto *t = static_cast<Transfer *>(user);
  size_t total = size * n;
  std::string line(data, total);
  if (strncasecmp(line.c_str(), "HTTP/", 5) == 0) {
    // A new status line (after a redirect or "100 Continue"): start over.
    long status = 0;
    size_t sp = line.find(' ');
    if (sp != std::string::npos) status = std::strtol(line.c_str() + sp + 1, nullptr, 10);
    t->status = status;
    t->rangeAnswer = false;
    t->rangeMismatch = false;
  } else if (strncasecmp(line.c_str(), "Content-Range:", 14) == 0) {
    uint64_t first = 0;
    t->rangeAnswer = true;
    if (std::sscanf(line.c_str() + 14, " bytes %" SCNu64 "-", &first) != 1 || first != t->offset) {
      t->rangeMismatch = true;
    }
  }
  return total;
}

size_t OnBody(char *data, size_t size, size_t n, void *user) {
  auto *t = static_cast<Transfer *>(user);
  size_t total = size * n;
  if (!t->bodyStarted) {
    t->bodyStarted = true;
    // A server that ignores Range sends the whole file: skip to the range.
    if (t->status == 200) t->skip = t->offset;
  }
  // Error pages and answers for another range are not data.
  if ((t->status != 200 && t->status != 206) || t->rangeMismatch) return total;
  size_t i = 0;
  if (t->skip > 0) {
    size_t s = t->skip < total ? static_cast<size_t>(t->skip) : total;
    t->skip -= s;
    i = s;
  }
  size_t room = t->len - t->got;
  size_t take = total - i < room ? total - i : room;
  std::memcpy(t->buf + t->got, data + i, take);
  t->got += take;
  if (take > 0 && t->progress != nullptr && t->progress(t->got, t->len, t->ctx) != 0) {
    t->cancelled = true;
    return 0;
  }
  // Once the range is complete the rest of a whole-file answer is not
  // wanted: stop the transfer (reported as a write error, ignored below).
  if (t->got == t->len && i + take < total) return 0;
  return total;
}

size_t Discard(char *, size_t size, size_t n, void *) { return size * n; }

void Prepare(HttpConnection *conn, const char *url) {
  CURL *c = conn->curl.get();
  curl_easy_reset(c);
  curl_easy_setopt(c, CURLOPT_URL, url);
  curl_easy_setopt(c, CURLOPT_PROTOCOLS_STR, "http,https");
  curl_easy_setopt(c, CURLOPT_REDIR_PROTOCOLS_STR, "http,https");
  curl_easy_setopt(c, CURLOPT_FOLLOWLOCATION, 1L);
  curl_easy_setopt(c, CURLOPT_MAXREDIRS, 5L);
  curl_easy_setopt(c, CURLOPT_TIMEOUT_MS, conn->timeoutMs);
  curl_easy_setopt(c, CURLOPT_CONNECTTIMEOUT_MS, conn->timeoutMs);
  curl_easy_setopt(c, CURLOPT_NOSIGNAL, 1L);  // a library must not touch signal handlers
  if (!conn->user.empty()) {
    curl_easy_setopt(c, CURLOPT_USERNAME, conn->user.c_str());
    curl_easy_setopt(c, CURLOPT_PASSWORD, conn->password.c_str());
  }
}

// Perform runs the prepared request, trying again while the connection
// itself fails; *out_status receives the final HTTP status.
CURLcode Perform(HttpConnection *conn, long *out_status, Transfer *t) {
  CURLcode rc = CURLE_OK;
  for (unsigned attempt = 0; attempt < conn->attempts; attempt++) {
    if (t != nullptr) t->Reset();
    rc = curl_easy_perform(conn->curl.get());
    HttpError e = FromCurl(rc);
    if (e != HTTP_ERR_CONNECT && e != HTTP_ERR_TIMEOUT) break;
  }
  *out_status = 0;
  curl_easy_getinfo(conn->curl.get(), CURLINFO_RESPONSE_CODE, out_status);
  return rc;
}

HttpError FromStatus(long status, long wanted) {
  if (status == wanted) return HTTP_OK;
  if (status == 404 || status == 410) return HTTP_ERR_NOT_FOUND;
  return HTTP_ERR_STATUS;
}

}  // namespace

HttpError Http_Connect(const char *url, unsigned attempts, unsigned timeoutMs, unsigned flags,
                       const char *user, const char *password, HttpConnection **out_conn) {
  *out_conn = nullptr;
  if (!IsHttpUrl(url)) return HTTP_ERR_ARGS;
  GlobalInit();
  auto conn = std::make_unique<HttpConnection>();
  conn->curl.reset(curl_easy_init());
  if (!conn->curl) return HTTP_ERR_CONNECT;
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
  Prepare(conn, url);
  curl_easy_setopt(conn->curl.get(), CURLOPT_NOBODY, 1L);
  curl_easy_setopt(conn->curl.get(), CURLOPT_WRITEFUNCTION, Discard);
  long status = 0;
  CURLcode rc = Perform(conn, &status, nullptr);
  if (rc != CURLE_OK) return FromCurl(rc);
  HttpError e = FromStatus(status, 200);
  if (e != HTTP_OK) return e;
  curl_off_t length = -1;
  if (curl_easy_getinfo(conn->curl.get(), CURLINFO_CONTENT_LENGTH_DOWNLOAD_T, &length) != CURLE_OK ||
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
  Prepare(conn, url);
  char range[64];
  std::snprintf(range, sizeof range, "%" PRIu64 "-%" PRIu64, offset, offset + len - 1);
  CURL *c = conn->curl.get();
  curl_easy_setopt(c, CURLOPT_RANGE, range);
  curl_easy_setopt(c, CURLOPT_HEADERFUNCTION, OnHeader);
  curl_easy_setopt(c, CURLOPT_HEADERDATA, &t);
  curl_easy_setopt(c, CURLOPT_WRITEFUNCTION, OnBody);
  curl_easy_setopt(c, CURLOPT_WRITEDATA, &t);
  long status = 0;
  CURLcode rc = Perform(conn, &status, &t);
  if (t.cancelled) return HTTP_ERR_STATUS;
  bool filled = t.got == t.len;
  if (rc != CURLE_OK && !(rc == CURLE_WRITE_ERROR && filled)) return FromCurl(rc);
  if (status == 206) {
    if (!t.rangeAnswer || t.rangeMismatch) return HTTP_ERR_PROTOCOL;
  } else if (status != 200) {
    return FromStatus(status, 206);
  }
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
    case HTTP_ERR_CONNECT: return "cannot connect to the server";
    case HTTP_ERR_TIMEOUT: return "the server did not answer in time";
    case HTTP_ERR_NOT_FOUND: return "the file was not found on the server";
    case HTTP_ERR_STATUS: return "unexpected answer from the server";
    case HTTP_ERR_SHORT: return "the server sent less data than asked for";
    case HTTP_ERR_PROTOCOL: return "malformed answer from the server";
  }
  return "unknown error";
}
