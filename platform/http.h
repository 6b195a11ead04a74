// A small HTTP client for reading byte ranges of a remote file: HEAD for its
// size, GET with a Range header for a block. libcurl is loaded on the first
// connection (dlopen of "libcurl.so.4"), so a process that never speaks HTTP
// never pays for loading it and its dependencies.
#pragma once

#include <cstddef>
#include <cstdint>

#include "platform/unique.h"

struct HttpConnection;

enum HttpError {
  HTTP_OK = 0,
  HTTP_ERR_ARGS = 1,        // bad URL (not http or https) or arguments
  HTTP_ERR_CONNECT = 2,     // name not resolved, TLS failure, connection dropped
  HTTP_ERR_TIMEOUT = 3,     // no answer, or the transfer stalled
  HTTP_ERR_NOT_FOUND = 4,   // status 404 or 410
  HTTP_ERR_STATUS = 5,      // any other unexpected status, or cancelled
  HTTP_ERR_SHORT = 6,       // fewer bytes than asked for or promised, or no size given
  HTTP_ERR_PROTOCOL = 7,    // a range answer for another range, more bytes than asked
  HTTP_ERR_REFUSED = 8,     // nobody accepts connections at that address
  HTTP_ERR_NO_RANGE = 9,    // the server ignores Range and would send the whole file
  HTTP_ERR_REDIRECTS = 10,  // more than three redirects, or to another scheme
  HTTP_ERR_NO_CLIENT = 11,  // libcurl cannot be loaded
};

// Http_ProgressFn is told the bytes received so far of a read; returning
// non-zero cancels it (HTTP_ERR_STATUS).
typedef int (*Http_ProgressFn)(uint64_t received, uint64_t total, void *ctx);

// Http_Connect prepares a connection to the server of `url`. `attempts` is
// how many times a request is tried when it times out or the connection
// drops (at least once; a refused connection is not retried); `timeoutMs`
// bounds connecting, each HEAD, and any stall of a transfer (0: 30 s).
// `flags` is unused; `user` and `password` (optional) are sent with basic
// authentication. Nothing is requested yet.
HttpError Http_Connect(const char *url, unsigned attempts, unsigned timeoutMs, unsigned flags,
                       const char *user, const char *password, HttpConnection **out_conn);
// Http_GetFileSize asks for the size of the file at `url` (HEAD).
HttpError Http_GetFileSize(HttpConnection *conn, const char *url, uint64_t *out_size);
// Http_Read reads exactly `len` bytes at `offset` of the file at `url` into
// `buf`; it never accepts more bytes than that (plus a bounded error page).
// A server that ignores Range is accepted only for a read at offset 0 (the
// first `len` bytes of its whole-file answer); otherwise HTTP_ERR_NO_RANGE.
// `progress` is optional.
HttpError Http_Read(HttpConnection *conn, const char *url, uint64_t offset, void *buf,
                    size_t len, Http_ProgressFn progress, void *ctx);
// Http_Close ends the connection; null is harmless.
HttpError Http_Close(HttpConnection *conn);
// Http_ErrorString describes a result (constant text).
const char *Http_ErrorString(HttpError error);

namespace tvx {
TVX_MAKE_DELETER(HttpConnection, Http_Close);
}  // namespace tvx
