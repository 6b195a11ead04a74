#include "platform/http.h"

#include <gtest/gtest.h>

#include <string>

#include "support/http_server.h"

namespace {

using tvxtest::HttpServer;

std::string Pattern(size_t n) {
  std::string s(n, '\0');
  for (size_t i = 0; i < n; i++) s[i] = static_cast<char>('a' + (i * 7 + i / 26) % 26);
  return s;
}

struct Client {
  HttpConnection *conn = nullptr;
  explicit Client(const std::string &url, unsigned attempts = 4, unsigned timeoutMs = 15000) {
    EXPECT_EQ(Http_Connect(url.c_str(), attempts, timeoutMs, 0, nullptr, nullptr, &conn), HTTP_OK);
  }
  ~Client() { Http_Close(conn); }
};

TEST(Http, SizeAndRangesFromAServerThatHonoursRanges) {
  std::string image = Pattern(100000);
  HttpServer server({{"/tools/linux.iso", image}});
  std::string url = server.Url("/tools/linux.iso");
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
}

TEST(Http, WholeFileAnswersAreReadThroughToTheRange) {
  std::string image = Pattern(50000);
  HttpServer server({{"/f", image}}, HttpServer::Mode::kIgnoreRanges);
  std::string url = server.Url("/f");
  Client c(url);
  std::string buf(1000, '\0');
  ASSERT_EQ(Http_Read(c.conn, url.c_str(), 30000, buf.data(), buf.size(), nullptr, nullptr), HTTP_OK);
  EXPECT_EQ(buf, image.substr(30000, 1000));
}

TEST(Http, MisbehavingServersAreReported) {
  std::string image = Pattern(8192);
  struct Case {
    HttpServer::Mode mode;
    const char *path;
    HttpError want;
  } cases[] = {
      {HttpServer::Mode::kNormal, "/missing", HTTP_ERR_NOT_FOUND},
      {HttpServer::Mode::kWrongRange, "/f", HTTP_ERR_PROTOCOL},
      {HttpServer::Mode::kShortBody, "/f", HTTP_ERR_SHORT},
      {HttpServer::Mode::kError500, "/f", HTTP_ERR_STATUS},
  };
  for (const auto &k : cases) {
    HttpServer server({{"/f", image}}, k.mode);
    std::string url = server.Url(k.path);
    Client c(url);
    std::string buf(1024, '\0');
    EXPECT_EQ(Http_Read(c.conn, url.c_str(), 100, buf.data(), buf.size(), nullptr, nullptr), k.want)
        << k.path << " mode " << static_cast<int>(k.mode);
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

TEST(Http, RefusesWhatIsNotAnHttpUrl) {
  HttpConnection *conn = nullptr;
  EXPECT_EQ(Http_Connect("file:///etc/passwd", 4, 15000, 0, nullptr, nullptr, &conn), HTTP_ERR_ARGS);
  EXPECT_EQ(conn, nullptr);
  EXPECT_EQ(Http_Connect(nullptr, 4, 15000, 0, nullptr, nullptr, &conn), HTTP_ERR_ARGS);
  // Nothing listens on port 1 of the loopback address.
  ASSERT_EQ(Http_Connect("http://127.0.0.1:1/", 1, 2000, 0, nullptr, nullptr, &conn), HTTP_OK);
  uint64_t size = 0;
  EXPECT_EQ(Http_GetFileSize(conn, "http://127.0.0.1:1/x", &size), HTTP_ERR_CONNECT);
  EXPECT_EQ(Http_GetFileSize(conn, "ftp://127.0.0.1/x", &size), HTTP_ERR_ARGS);
  Http_Close(conn);
}

}  // namespace
