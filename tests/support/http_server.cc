#include "support/http_server.h"

#include <arpa/inet.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <netinet/in.h>
#include <poll.h>
#include <stdexcept>
#include <strings.h>
#include <sys/socket.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>

extern char **environ;

namespace tvxtest {

namespace {

sockaddr_in Loopback(int port) {
  sockaddr_in addr{};
  addr.sin_family = AF_INET;
  addr.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  addr.sin_port = htons(static_cast<uint16_t>(port));
  return addr;
}

// Bind binds `fd` to a free loopback port and returns it (0 on failure).
int Bind(int fd) {
  sockaddr_in addr = Loopback(0);
  socklen_t len = sizeof addr;
  if (fd < 0 || bind(fd, reinterpret_cast<sockaddr *>(&addr), sizeof addr) != 0 ||
      getsockname(fd, reinterpret_cast<sockaddr *>(&addr), &len) != 0) {
    return 0;
  }
  return ntohs(addr.sin_port);
}

int FreePort() {
  int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  int port = Bind(fd);
  if (fd >= 0) close(fd);
  return port;
}

bool Accepts(int port) {
  int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_in addr = Loopback(port);
  bool ok = fd >= 0 && connect(fd, reinterpret_cast<sockaddr *>(&addr), sizeof addr) == 0;
  if (fd >= 0) close(fd);
  return ok;
}

}  // namespace

HttpServer::HttpServer(std::map<std::string, std::string> files, Mode mode)
    : files_(std::move(files)), mode_(mode) {
  listenFd_ = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  port_ = Bind(listenFd_);
  if (port_ == 0 || listen(listenFd_, 8) != 0) {
    throw std::runtime_error("test HTTP server cannot listen");
  }
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
  size_t promised = 0;  // Content-Length when it differs from the body sent
  auto file = files_.find(path);
  if (mode_ == Mode::kError500) {
    status = "500 Internal Server Error";
    body = "broken";
  } else if (mode_ == Mode::kRedirectLoop) {
    status = "302 Found";
    extra = std::string("Location: ") + path + "\r\n";
  } else if (file == files_.end()) {
    status = "404 Not Found";
    body = "no such file";
  } else if (ranged) {
    const std::string &all = file->second;
    if (mode_ == Mode::kWrongRange) first++;
    if (first >= all.size()) {
      status = "416 Range Not Satisfiable";
    } else {
      if (mode_ == Mode::kLongRange) last += 4096;
      if (last >= all.size()) last = all.size() - 1;
      body = all.substr(first, last - first + 1);
      extra = "Content-Range: bytes " + std::to_string(first) + "-" +
              std::to_string(first + body.size() - 1) + "/" + std::to_string(all.size()) + "\r\n";
      status = "206 Partial Content";
    }
  } else {
    body = file->second;
  }
  if (mode_ == Mode::kShortBody && status[0] == '2') {
    promised = body.size();
    body.resize(body.size() / 2);
  }
  size_t length = promised != 0 ? promised : body.size();
  std::string out = "HTTP/1.1 " + status + "\r\nContent-Length: " + std::to_string(length) +
                    "\r\nConnection: close\r\n" + extra + "\r\n";
  if (!head) out += body;
  size_t sent = 0;
  while (sent < out.size()) {
    ssize_t n = send(fd, out.data() + sent, out.size() - sent, MSG_NOSIGNAL);
    if (n <= 0) return;
    sent += static_cast<size_t>(n);
  }
}

WebServer::WebServer(const std::string &docRoot) {
  std::string tmpl = (std::filesystem::temp_directory_path() / "tvxweb-XXXXXX").string();
  if (mkdtemp(tmpl.data()) == nullptr) return;
  confDir_ = tmpl;
  // The port is free when asked for; another process could take it before
  // the server binds, in which case the server fails to start and Ok() says so.
  port_ = FreePort();
  std::string conf = confDir_ + "/lighttpd.conf";
  std::ofstream(conf) << "server.document-root = \"" << docRoot << "\"\n"
                      << "server.bind = \"127.0.0.1\"\n"
                      << "server.port = " << port_ << "\n"
                      << "server.errorlog = \"" << confDir_ << "/error.log\"\n"
                      << "mimetype.assign = (\"\" => \"application/octet-stream\")\n";
  const char *argv[] = {"lighttpd", "-D", "-f", conf.c_str(), nullptr};
  pid_t pid = -1;
  if (posix_spawnp(&pid, "lighttpd", nullptr, nullptr, const_cast<char **>(argv), environ) != 0) return;
  pid_ = pid;
  for (int i = 0; i < 100; i++) {
    if (Accepts(port_)) return;
    if (waitpid(pid_, nullptr, WNOHANG) == pid_) break;
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
  }
  kill(pid_, SIGKILL);
  waitpid(pid_, nullptr, 0);
  pid_ = -1;
}

WebServer::~WebServer() {
  if (pid_ > 0) {
    kill(pid_, SIGTERM);
    waitpid(pid_, nullptr, 0);
  }
  std::error_code ec;
  if (!confDir_.empty()) std::filesystem::remove_all(confDir_, ec);
}

std::string WebServer::Url(const std::string &path) const {
  return "http://127.0.0.1:" + std::to_string(port_) + path;
}

}  // namespace tvxtest
