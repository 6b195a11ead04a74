// A small HTTP client over libcurl for reading byte ranges of a remote file:
// HEAD for its size, GET with a Range header for a block.
#pragma once

#include <cstddef>
#include <cstdint>

struct HttpConnection;

enum HttpError {
  HTTP_OK = 0,
  HTTP_ERR_ARGS = 1,       // bad URL (not http or https) or arguments
  HTTP_ERR_CONNECT = 2,    // no connection, name not resolved, TLS failure
  HTTP_ERR_TIMEOUT = 3,
  HTTP_ERR_NOT_FOUND = 4,  // status 404 or 410
  HTTP_ERR_STATUS = 5,     // any other unexpected status
  HTTP_ERR_SHORT = 6,      // fewer bytes than asked for, or no size given
  HTTP_ERR_PROTOCOL = 7,   // a range answer for another range, or a malformed answer
};

// Http_ProgressFn is told the bytes received so far of a read; returning
// non-zero cancels it (HTTP_ERR_STATUS).
typedef int (*Http_ProgressFn)(uint64_t received, uint64_t total, void *ctx);

// Http_Connect prepares a connection to the server of `url`. `attempts` is
// how many times a request is tried when the connection fails or times out
// (at least once); `timeoutMs` bounds each attempt (0: 30 s). `flags` is
// unused; `user` and `password` (optional) are sent with basic
// authentication. Nothing is requested yet.
HttpError Http_Connect(const char *url, unsigned attempts, unsigned timeoutMs, unsigned flags,
                       const char *user, const char *password, HttpConnection **out_conn);
// Http_GetFileSize asks for the size of the file at `url` (HEAD).
HttpError Http_GetFileSize(HttpConnection *conn, const char *url, uint64_t *out_size);
// Http_Read reads exactly `len` bytes at `offset` of the file at `url` into
// `buf`. A server that ignores the range and sends the whole file is read
// through to the range. `progress` is optional.
HttpError Http_Read(HttpConnection *conn, const char *url, uint64_t offset, void *buf,
                    size_t len, Http_ProgressFn progress, void *ctx);
// Http_Close ends the connection; null is harmless.
HttpError Http_Close(HttpConnection *conn);
// Http_ErrorString describes a result (constant text).
const char *Http_ErrorString(HttpError error);
