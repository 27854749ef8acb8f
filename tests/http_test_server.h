// A small HTTP/1.1 server on 127.0.0.1 for transfer tests and benchmarks:
// each request path has a scripted reply (status, headers, body), which can
// be cut short, sent slowly, stalled or never sent.  One connection per
// request; every connection runs on a thread of its own and every wait is
// bounded by the server's life, so a test never hangs on it.
#pragma once

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <map>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace testing_support {

struct HttpReply {
  int status = 200;
  std::string reason = "OK";
  std::vector<std::pair<std::string, std::string>> headers;  // e.g. {"Location", "/b"}
  std::string body;
  bool sendLength = true;          // a Content-Length header (not with chunked)
  long long announcedLength = -1;  // announce this length instead of the body's
  long long cutAfter = -1;         // close after this many bytes of the (encoded) body
  bool chunked = false;
  std::size_t chunkSize = 1000;
  std::string trailer;             // header lines after the last chunk, each ending in CRLF
  std::size_t pieceSize = 0;       // with pieceDelayMs: body sent in pieces of this size
  int pieceDelayMs = 0;
  bool stallAfterHeaders = false;  // headers, then silence until the server stops
  bool neverAnswer = false;        // read the request, then silence
  std::string raw;                 // when not empty: the whole response, byte for byte
};

class HttpTestServer {
 public:
  HttpTestServer() {
    listener_ = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    int one = 1;
    setsockopt(listener_, SOL_SOCKET, SO_REUSEADDR, &one, sizeof one);
    sockaddr_in addr{};
    addr.sin_family = AF_INET;
    addr.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    addr.sin_port = 0;
    if (bind(listener_, reinterpret_cast<sockaddr*>(&addr), sizeof addr) != 0 ||
        listen(listener_, 64) != 0)
      std::abort();
    socklen_t len = sizeof addr;
    getsockname(listener_, reinterpret_cast<sockaddr*>(&addr), &len);
    port_ = ntohs(addr.sin_port);
    acceptor_ = std::thread([this] { AcceptLoop(); });
  }

  ~HttpTestServer() {
    stop_ = true;
    acceptor_.join();
    close(listener_);
    std::vector<std::thread> workers;
    {
      std::lock_guard<std::mutex> lock(mutex_);
      workers.swap(workers_);
    }
    for (auto& w : workers) w.join();
  }

  HttpTestServer(const HttpTestServer&) = delete;
  HttpTestServer& operator=(const HttpTestServer&) = delete;

  void Route(const std::string& target, HttpReply reply) {
    std::lock_guard<std::mutex> lock(mutex_);
    routes_[target] = std::move(reply);
  }

  int port() const { return port_; }
  std::string Base() const { return "http://127.0.0.1:" + std::to_string(port_); }
  std::string Url(const std::string& target) const { return Base() + target; }

  // Request targets in the order they arrived.
  std::vector<std::string> Requests() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return requests_;
  }
  int Hits(const std::string& target) const {
    auto all = Requests();
    return static_cast<int>(std::count(all.begin(), all.end(), target));
  }

 private:
  void AcceptLoop() {
    while (!stop_) {
      pollfd p{listener_, POLLIN, 0};
      if (poll(&p, 1, 50) <= 0) continue;
      int fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
      if (fd < 0) continue;
      std::lock_guard<std::mutex> lock(mutex_);
      workers_.emplace_back([this, fd] {
        Serve(fd);
        close(fd);
      });
    }
  }

  // Sleeps in small steps so that the server's end cuts every wait short.
  bool Wait(int ms) {
    auto until = std::chrono::steady_clock::now() + std::chrono::milliseconds(ms);
    while (!stop_ && std::chrono::steady_clock::now() < until)
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
    return !stop_;
  }

  bool SendAll(int fd, const char* data, std::size_t size) {
    while (size > 0) {
      if (stop_) return false;
      ssize_t sent = send(fd, data, std::min<std::size_t>(size, 1 << 20), MSG_NOSIGNAL);
      if (sent <= 0) return false;
      data += sent;
      size -= static_cast<std::size_t>(sent);
    }
    return true;
  }

  bool ReadRequest(int fd, std::string& target) {
    std::string request;
    char buffer[4096];
    while (request.find("\r\n\r\n") == std::string::npos) {
      if (stop_ || request.size() > 65536) return false;
      pollfd p{fd, POLLIN, 0};
      if (poll(&p, 1, 50) <= 0) continue;
      ssize_t got = recv(fd, buffer, sizeof buffer, 0);
      if (got <= 0) return false;
      request.append(buffer, static_cast<std::size_t>(got));
    }
    std::size_t first = request.find(' ');
    std::size_t second = request.find(' ', first + 1);
    if (first == std::string::npos || second == std::string::npos) return false;
    target = request.substr(first + 1, second - first - 1);
    return true;
  }

  void Serve(int fd) {
    std::string target;
    if (!ReadRequest(fd, target)) return;
    HttpReply reply;
    {
      std::lock_guard<std::mutex> lock(mutex_);
      requests_.push_back(target);
      auto it = routes_.find(target);
      if (it != routes_.end()) {
        reply = it->second;
      } else {
        reply.status = 404;
        reply.reason = "Not Found";
        reply.body = "<html><body>no such document</body></html>";
      }
    }
    if (reply.neverAnswer) {
      Wait(1 << 30);
      return;
    }
    if (!reply.raw.empty()) {
      SendAll(fd, reply.raw.data(), reply.raw.size());
      return;
    }

    std::string body = reply.body;
    if (reply.chunked) {
      std::string encoded;
      for (std::size_t at = 0; at < body.size(); at += reply.chunkSize) {
        std::size_t n = std::min(reply.chunkSize, body.size() - at);
        char size[32];
        std::snprintf(size, sizeof size, "%zx\r\n", n);
        encoded += size;
        encoded.append(body, at, n);
        encoded += "\r\n";
      }
      encoded += "0\r\n" + reply.trailer + "\r\n";
      body = std::move(encoded);
    }

    std::string head = "HTTP/1.1 " + std::to_string(reply.status) + " " + reply.reason + "\r\n";
    for (const auto& [name, value] : reply.headers) head += name + ": " + value + "\r\n";
    if (reply.chunked) {
      head += "Transfer-Encoding: chunked\r\n";
    } else if (reply.sendLength) {
      long long length = reply.announcedLength >= 0 ? reply.announcedLength
                                                    : static_cast<long long>(reply.body.size());
      head += "Content-Length: " + std::to_string(length) + "\r\n";
    }
    head += "Connection: close\r\n\r\n";
    if (!SendAll(fd, head.data(), head.size())) return;
    if (reply.stallAfterHeaders) {
      Wait(1 << 30);
      return;
    }

    std::size_t limit = body.size();
    if (reply.cutAfter >= 0) limit = std::min(limit, static_cast<std::size_t>(reply.cutAfter));
    if (reply.pieceDelayMs > 0 && reply.pieceSize > 0) {
      for (std::size_t at = 0; at < limit; at += reply.pieceSize) {
        if (!SendAll(fd, body.data() + at, std::min(reply.pieceSize, limit - at))) return;
        if (!Wait(reply.pieceDelayMs)) return;
      }
    } else {
      SendAll(fd, body.data(), limit);
    }
    shutdown(fd, SHUT_WR);
    // Let the client read to the end before the socket goes.
    char sink[256];
    for (int i = 0; i < 100 && !stop_; ++i) {
      pollfd p{fd, POLLIN, 0};
      if (poll(&p, 1, 20) > 0 && recv(fd, sink, sizeof sink, 0) <= 0) break;
    }
  }

  int listener_ = -1;
  int port_ = 0;
  std::atomic<bool> stop_{false};
  std::thread acceptor_;
  mutable std::mutex mutex_;
  std::map<std::string, HttpReply> routes_;
  std::vector<std::string> requests_;
  std::vector<std::thread> workers_;
};

}  // namespace testing_support
