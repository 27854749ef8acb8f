// A small HTTP/1.1 server on 127.0.0.1 for transfer tests and benchmarks:
// each request target has a scripted reply, which can be cut short, sent
// slowly or stalled.  One thread per connection; every wait ends when the
// server does, so a test never hangs on it.
#pragma once

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdlib>
#include <map>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace testing_support {

struct HttpReply {
  using Headers = std::vector<std::pair<std::string, std::string>>;  // e.g. {"Location", "/b"}
  HttpReply(int status = 200, std::string body = "", Headers headers = {})
      : status(status), body(std::move(body)), headers(std::move(headers)) {}
  int status;
  std::string body;
  Headers headers;
  std::string raw;            // when not empty: the whole response, byte for byte
  long long cutAfter = -1;    // close after this many bytes of the body
  long long stallAfter = -1;  // go silent after this many bytes of the body
  bool neverAnswer = false;   // read the request, then silence
  std::size_t pieceSize = 0;  // with pieceDelayMs: the body in pieces of this size
  int pieceDelayMs = 0;
};

class HttpTestServer {
 public:
  HttpTestServer() {
    listener_ = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in addr{};
    addr.sin_family = AF_INET;
    addr.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t len = sizeof addr;
    if (bind(listener_, reinterpret_cast<sockaddr*>(&addr), len) != 0 || listen(listener_, 64) != 0)
      std::abort();
    getsockname(listener_, reinterpret_cast<sockaddr*>(&addr), &len);
    port_ = ntohs(addr.sin_port);
    acceptor_ = std::thread([this] {
      while (WaitReadable(listener_)) {
        int fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
        std::lock_guard<std::mutex> lock(mutex_);
        if (fd >= 0)
          workers_.emplace_back([this, fd] {
            Serve(fd);
            close(fd);
          });
      }
    });
  }
  ~HttpTestServer() {
    stop_ = true;
    acceptor_.join();
    close(listener_);
    for (auto& w : workers_) w.join();
  }
  HttpTestServer(const HttpTestServer&) = delete;
  HttpTestServer& operator=(const HttpTestServer&) = delete;

  void Route(const std::string& target, HttpReply reply) {
    std::lock_guard<std::mutex> lock(mutex_);
    routes_[target] = std::move(reply);
  }
  std::string Url(const std::string& target) const {
    return "http://127.0.0.1:" + std::to_string(port_) + target;
  }
  int Requests() const { return requests_; }  // so far

 private:
  bool WaitReadable(int fd) {
    pollfd p{fd, POLLIN, 0};
    while (!stop_)
      if (poll(&p, 1, 50) > 0) return true;
    return false;
  }
  bool Wait(int ms) {  // in small steps, so that the server's end cuts it short
    auto until = std::chrono::steady_clock::now() + std::chrono::milliseconds(ms);
    while (!stop_ && std::chrono::steady_clock::now() < until)
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
    return !stop_;
  }
  bool SendAll(int fd, const char* data, std::size_t size) {
    for (ssize_t sent = 0; size > 0; data += sent, size -= static_cast<std::size_t>(sent))
      if (stop_ || (sent = send(fd, data, std::min<std::size_t>(size, 1 << 20), MSG_NOSIGNAL)) <= 0)
        return false;
    return true;
  }

  void Serve(int fd) {
    std::string request;
    char buffer[4096];
    while (request.find("\r\n\r\n") == std::string::npos) {
      ssize_t got = WaitReadable(fd) ? recv(fd, buffer, sizeof buffer, 0) : 0;
      if (got <= 0 || request.size() > 65536) return;
      request.append(buffer, static_cast<std::size_t>(got));
    }
    std::size_t first = request.find(' ');
    std::string target = request.substr(first + 1, request.find(' ', first + 1) - first - 1);
    ++requests_;
    HttpReply reply{404, "<html><body>no such document</body></html>"};
    {
      std::lock_guard<std::mutex> lock(mutex_);
      if (routes_.count(target)) reply = routes_[target];
    }
    if (reply.neverAnswer) return void(Wait(1 << 30));

    std::string head = reply.raw, body = reply.raw.empty() ? reply.body : "";
    if (head.empty()) {
      head = "HTTP/1.1 " + std::to_string(reply.status) + " Scripted\r\n";
      for (const auto& [name, value] : reply.headers) head += name + ": " + value + "\r\n";
      head += "Content-Length: " + std::to_string(body.size()) + "\r\nConnection: close\r\n\r\n";
    }
    if (!SendAll(fd, head.data(), head.size())) return;
    std::size_t limit = body.size();
    for (long long cut : {reply.cutAfter, reply.stallAfter})
      if (cut >= 0) limit = std::min(limit, static_cast<std::size_t>(cut));
    std::size_t piece = reply.pieceSize ? reply.pieceSize : std::max<std::size_t>(limit, 1);
    for (std::size_t at = 0; at < limit; at += piece)
      if (!SendAll(fd, body.data() + at, std::min(piece, limit - at)) || !Wait(reply.pieceDelayMs))
        return;
    if (reply.stallAfter >= 0) return void(Wait(1 << 30));
    shutdown(fd, SHUT_WR);
    while (WaitReadable(fd) && recv(fd, buffer, sizeof buffer, 0) > 0) {
    }  // the client reads to the end before the socket goes
  }

  int listener_ = -1, port_ = 0;
  std::atomic<bool> stop_{false};
  std::atomic<int> requests_{0};
  std::thread acceptor_;
  std::mutex mutex_;
  std::map<std::string, HttpReply> routes_;
  std::vector<std::thread> workers_;
};

}  // namespace testing_support
