// HTTP servers for tests, on 127.0.0.1 at a free port.
//
// HttpServer is the project's own tiny HTTP/1.1 server: it serves files from
// memory, answers HEAD and GET (with a byte Range: 206) and misbehaves on
// purpose in the ways a real server will not. One connection at a time; it
// stops with the object.
//
// WebServer runs a real web server (lighttpd) over a directory, with its own
// configuration in a temporary directory; it stops with the object.
#pragma once

#include <sys/types.h>

#include <atomic>
#include <map>
#include <string>
#include <thread>

namespace tvxtest {

class HttpServer {
 public:
  enum class Mode {
    kNormal,        // ranges answered with 206
    kIgnoreRanges,  // every GET answered 200 with the whole file
    kWrongRange,    // 206 for a range that starts one byte later
    kShortBody,     // promises the asked bytes, sends half, closes
    kLongRange,     // 206 with the range and a block more than asked
    kError500,      // every request answered 500
    kNoAnswer,      // accepts, then says nothing until the client gives up
    kRedirectLoop,  // every request redirected to itself
  };

  explicit HttpServer(std::map<std::string, std::string> files, Mode mode = Mode::kNormal);
  ~HttpServer();
  HttpServer(const HttpServer &) = delete;
  HttpServer &operator=(const HttpServer &) = delete;

  std::string Url(const std::string &path) const;
  int Requests() const { return requests_.load(); }

 private:
  void Run();
  void Serve(int fd);

  std::map<std::string, std::string> files_;
  Mode mode_;
  int listenFd_ = -1;
  int port_ = 0;
  std::atomic<bool> stop_{false};
  std::atomic<int> requests_{0};
  std::thread thread_;
};

class WebServer {
 public:
  // Serves `docRoot`; Ok() is false when the server could not start.
  explicit WebServer(const std::string &docRoot);
  ~WebServer();
  WebServer(const WebServer &) = delete;
  WebServer &operator=(const WebServer &) = delete;

  bool Ok() const { return pid_ > 0; }
  std::string Url(const std::string &path) const;

 private:
  std::string confDir_;
  int port_ = 0;
  pid_t pid_ = -1;
};

}  // namespace tvxtest
