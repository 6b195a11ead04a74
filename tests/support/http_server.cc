#include "support/http_server.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <stdexcept>
#include <strings.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>

namespace tvxtest {

HttpServer::HttpServer(std::map<std::string, std::string> files, Mode mode)
    : files_(std::move(files)), mode_(mode) {
  listenFd_ = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_in addr{};
  addr.sin_family = AF_INET;
  addr.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  socklen_t len = sizeof addr;
  if (listenFd_ < 0 || bind(listenFd_, reinterpret_cast<sockaddr *>(&addr), sizeof addr) != 0 ||
      listen(listenFd_, 8) != 0 ||
      getsockname(listenFd_, reinterpret_cast<sockaddr *>(&addr), &len) != 0) {
    throw std::runtime_error("test HTTP server cannot listen");
  }
  port_ = ntohs(addr.sin_port);
  thread_ = std::thread([this] { Run(); });
}

HttpServer::~HttpServer() {
  stop_ = true;
  thread_.join();
  close(listenFd_);
}

std::string HttpServer::Url(const std::string &path) const {
  return "http://127.0.0.1:" + std::to_string(port_) + path;
}

void HttpServer::Run() {
  while (!stop_) {
    pollfd p{listenFd_, POLLIN, 0};
    if (poll(&p, 1, 50) <= 0) continue;
    int fd = accept4(listenFd_, nullptr, nullptr, SOCK_CLOEXEC);
    if (fd < 0) continue;
    timeval tv{2, 0};
    setsockopt(fd, SOL_SOCKET, SO_RCVTIMEO, &tv, sizeof tv);
    Serve(fd);
    close(fd);
  }
}

void HttpServer::Serve(int fd) {
  std::string req;
  char chunk[4096];
  while (req.find("\r\n\r\n") == std::string::npos && req.size() < 65536) {
    ssize_t n = recv(fd, chunk, sizeof chunk, 0);
    if (n <= 0) return;
    req.append(chunk, static_cast<size_t>(n));
  }
  requests_++;
  if (mode_ == Mode::kNoAnswer) {
    // Hold the connection until the client gives up or the server stops.
    for (int i = 0; i < 100 && !stop_; i++) {
      pollfd p{fd, POLLIN, 0};
      if (poll(&p, 1, 50) > 0 && recv(fd, chunk, sizeof chunk, 0) <= 0) return;
    }
    return;
  }
  char method[16] = {}, path[1024] = {};
  std::sscanf(req.c_str(), "%15s %1023s", method, path);
  bool head = std::strcmp(method, "HEAD") == 0;
  unsigned long long first = 0, last = 0;
  bool ranged = false;
  size_t r = req.find("\r\nRange: bytes=");
  if (r != std::string::npos &&
      std::sscanf(req.c_str() + r + 15, "%llu-%llu", &first, &last) == 2) {
    ranged = mode_ != Mode::kIgnoreRanges;
  }
  std::string status = "200 OK", body, extra;
  auto file = files_.find(path);
  if (mode_ == Mode::kError500) {
    status = "500 Internal Server Error";
    body = "broken";
  } else if (file == files_.end()) {
    status = "404 Not Found";
    body = "no such file";
  } else if (ranged) {
    const std::string &all = file->second;
    if (mode_ == Mode::kWrongRange) first++;
    if (first >= all.size()) {
      status = "416 Range Not Satisfiable";
    } else {
      if (last >= all.size()) last = all.size() - 1;
      body = all.substr(first, last - first + 1);
      extra = "Content-Range: bytes " + std::to_string(first) + "-" +
              std::to_string(first + body.size() - 1) + "/" + std::to_string(all.size()) + "\r\n";
      if (mode_ == Mode::kShortBody) body.resize(body.size() / 2);
      status = "206 Partial Content";
    }
  } else {
    body = file->second;
  }
  std::string out = "HTTP/1.1 " + status + "\r\nContent-Length: " + std::to_string(body.size()) +
                    "\r\nConnection: close\r\n" + extra + "\r\n";
  if (!head) out += body;
  size_t sent = 0;
  while (sent < out.size()) {
    ssize_t n = send(fd, out.data() + sent, out.size() - sent, MSG_NOSIGNAL);
    if (n <= 0) return;
    sent += static_cast<size_t>(n);
  }
}

}  // namespace tvxtest
