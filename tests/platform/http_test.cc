#include "platform/http.h"

#include <gtest/gtest.h>

#include <string>

#include "support/http_server.h"
#include "support/log_capture.h"

namespace {

using tvxtest::HttpServer;

struct Client {
  HttpConnection *conn = nullptr;
  explicit Client(const std::string &url, unsigned attempts = 4, unsigned timeoutMs = 15000) {
    EXPECT_EQ(Http_Connect(url.c_str(), attempts, timeoutMs, 0, nullptr, nullptr, &conn), HTTP_OK);
  }
  ~Client() { Http_Close(conn); }
};

// A real web server decides how ranges are answered; the client must get
// exactly the asked bytes, and a range past the end must not pass as data.
TEST(Http, RangesFromARealWebServer) {
  tvxtest::TempDir root;
  std::string image = tvxtest::Bytes(100000);
  tvxtest::WriteFileOrDie(root.Join("linux.iso"), image);
  tvxtest::WebServer server(root.Path());
  ASSERT_TRUE(server.Ok()) << "lighttpd did not start";
  std::string url = server.Url("/linux.iso");
  Client c(url);
  uint64_t size = 0;
  ASSERT_EQ(Http_GetFileSize(c.conn, url.c_str(), &size), HTTP_OK);
  EXPECT_EQ(size, image.size());
  struct Case {
    uint64_t offset;
    size_t len;
  } cases[] = {{0, 1}, {0, 4096}, {4096, 32768}, {99999, 1}, {12345, 100000 - 12345}};
  for (const auto &k : cases) {
    std::string buf(k.len, '\0');
    ASSERT_EQ(Http_Read(c.conn, url.c_str(), k.offset, buf.data(), k.len, nullptr, nullptr), HTTP_OK)
        << k.offset;
    EXPECT_EQ(buf, image.substr(k.offset, k.len)) << k.offset;
  }
  std::string past(10, '\0');
  EXPECT_EQ(Http_Read(c.conn, url.c_str(), 99995, past.data(), 10, nullptr, nullptr), HTTP_ERR_SHORT);
  EXPECT_NE(Http_Read(c.conn, url.c_str(), 200000, past.data(), 10, nullptr, nullptr), HTTP_OK);
  std::string missing = server.Url("/missing.iso");
  EXPECT_EQ(Http_GetFileSize(c.conn, missing.c_str(), &size), HTTP_ERR_NOT_FOUND);
}

// Faults a real server does not produce: each must end in its own error,
// never in a buffer silently filled with the wrong bytes.
TEST(Http, MisbehavingServersAreReported) {
  std::string image = tvxtest::Bytes(16384);
  struct Case {
    HttpServer::Mode mode;
    uint64_t offset;
    HttpError wantRead;
    HttpError wantSize;
  } cases[] = {
      {HttpServer::Mode::kIgnoreRanges, 100, HTTP_ERR_NO_RANGE, HTTP_OK},
      // A whole-file answer still serves a read from the start (a small
      // companion file); the rest of it is not taken.
      {HttpServer::Mode::kIgnoreRanges, 0, HTTP_OK, HTTP_OK},
      {HttpServer::Mode::kWrongRange, 100, HTTP_ERR_PROTOCOL, HTTP_OK},
      {HttpServer::Mode::kShortBody, 100, HTTP_ERR_SHORT, HTTP_OK},
      {HttpServer::Mode::kLongRange, 100, HTTP_ERR_PROTOCOL, HTTP_OK},
      {HttpServer::Mode::kError500, 100, HTTP_ERR_STATUS, HTTP_ERR_STATUS},
      {HttpServer::Mode::kRedirectLoop, 100, HTTP_ERR_REDIRECTS, HTTP_ERR_REDIRECTS},
  };
  for (const auto &k : cases) {
    SCOPED_TRACE(testing::Message() << "mode " << static_cast<int>(k.mode));
    HttpServer server({{"/f", image}}, k.mode);
    std::string url = server.Url("/f");
    Client c(url);
    std::string buf(1024, '\0');
    EXPECT_EQ(Http_Read(c.conn, url.c_str(), k.offset, buf.data(), buf.size(), nullptr, nullptr),
              k.wantRead);
    if (k.wantRead == HTTP_OK) {
      EXPECT_EQ(buf, image.substr(k.offset, buf.size()));
    }
    uint64_t size = 0;
    EXPECT_EQ(Http_GetFileSize(c.conn, url.c_str(), &size), k.wantSize);
  }
}

TEST(Http, SilentServerTimesOutAfterEveryAttempt) {
  HttpServer server({{"/f", "x"}}, HttpServer::Mode::kNoAnswer);
  std::string url = server.Url("/f");
  Client c(url, 2, 300);
  uint64_t size = 0;
  EXPECT_EQ(Http_GetFileSize(c.conn, url.c_str(), &size), HTTP_ERR_TIMEOUT);
  EXPECT_EQ(server.Requests(), 2);
}

TEST(Http, RefusedConnectionsAndNonHttpUrls) {
  HttpConnection *conn = nullptr;
  EXPECT_EQ(Http_Connect("file:///etc/passwd", 4, 15000, 0, nullptr, nullptr, &conn), HTTP_ERR_ARGS);
  EXPECT_EQ(conn, nullptr);
  EXPECT_EQ(Http_Connect(nullptr, 4, 15000, 0, nullptr, nullptr, &conn), HTTP_ERR_ARGS);
  ASSERT_EQ(Http_Connect("http://127.0.0.1:1/", 4, 2000, 0, nullptr, nullptr, &conn), HTTP_OK);
  uint64_t size = 0;
  EXPECT_EQ(Http_GetFileSize(conn, "ftp://127.0.0.1/x", &size), HTTP_ERR_ARGS);
  EXPECT_EQ(Http_GetFileSize(conn, nullptr, &size), HTTP_ERR_ARGS);
  Http_Close(conn);
}

}  // namespace
