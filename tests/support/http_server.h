// A small HTTP/1.1 server for tests, on 127.0.0.1 at a free port: it serves
// files from memory, answers HEAD and GET (with a byte Range: 206), and can
// misbehave on purpose. One connection at a time; it stops with the object.
#pragma once

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
    kShortBody,     // 206 with half the asked bytes
    kError500,      // every request answered 500
    kNoAnswer,      // accepts, then says nothing until the client gives up
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

}  // namespace tvxtest
