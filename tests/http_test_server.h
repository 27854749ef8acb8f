// A small HTTP/1.1 server on 127.0.0.1 for transfer tests and benchmarks:
// each request target has a scripted reply, whose body can be cut short and
// whose connection can end cleanly, with a reset or in silence.  It serves
// one connection after the other, each until the client lets it go.
#pragma once

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

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
  enum End { kClose, kReset, kSilence };
  HttpReply(int status = 200, std::string body = "", Headers headers = {})
      : status(status), body(std::move(body)), headers(std::move(headers)) {}
  int status;
  std::string body;
  Headers headers;
  long long cutAfter = -1;    // send only this many bytes of the body
  End end = kClose;           // what follows the body
  bool noLength = false;      // no Content-Length: the end of the connection ends the body
  std::size_t pieceSize = 0;  // with pieceDelayMs: the body sent in pieces of this size
  int pieceDelayMs = 0;
};

class HttpTestServer {
 public:
  HttpTestServer() {
    sockaddr_in addr{};
    addr.sin_family = AF_INET;
    addr.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t len = sizeof addr;
    if (bind(listener_, reinterpret_cast<sockaddr*>(&addr), len) != 0 || listen(listener_, 64) != 0)
      std::abort();
    getsockname(listener_, reinterpret_cast<sockaddr*>(&addr), &len);
    port_ = ntohs(addr.sin_port);
    thread_ = std::thread([this] {
      for (int fd; (fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC)) >= 0; close(fd))
        Serve(fd);
    });
  }
  ~HttpTestServer() {
    shutdown(listener_, SHUT_RDWR);  // ends the accept
    thread_.join();
    close(listener_);
  }

  void Route(const std::string& target, HttpReply reply) {
    std::lock_guard<std::mutex> lock(mutex_);
    routes_[target] = std::move(reply);
  }
  int Requests() const { return requests_.load(); }  // received so far
  std::string Url(const std::string& target) const {
    return "http://127.0.0.1:" + std::to_string(port_) + target;
  }

 private:
  void Serve(int fd) {
    std::string request;
    char buffer[4096];
    while (request.find("\r\n\r\n") == std::string::npos) {
      ssize_t got = recv(fd, buffer, sizeof buffer, 0);
      if (got <= 0 || request.size() > 65536) return;
      request.append(buffer, static_cast<std::size_t>(got));
    }
    std::size_t first = request.find(' ');
    std::string target = request.substr(first + 1, request.find(' ', first + 1) - first - 1);
    HttpReply reply{404, "<html><body>no such document</body></html>"};
    ++requests_;
    {
      std::lock_guard<std::mutex> lock(mutex_);
      if (routes_.count(target)) reply = routes_[target];
    }
    std::string out = "HTTP/1.1 " + std::to_string(reply.status) + " Scripted\r\n";
    for (const auto& [name, value] : reply.headers) out += name + ": " + value + "\r\n";
    if (!reply.noLength) out += "Content-Length: " + std::to_string(reply.body.size()) + "\r\n";
    out += "Connection: close\r\n\r\n" +
           reply.body.substr(0, reply.cutAfter < 0 ? std::string::npos : reply.cutAfter);
    const std::size_t head = out.size() - std::min(out.size(), reply.body.size());
    const std::size_t piece = reply.pieceSize ? reply.pieceSize : out.size();
    for (ssize_t sent = 0, at = 0, end = 0; at < ssize_t(out.size()); at += sent) {
      if (at >= end) {  // the next piece, after its pause
        if (end > 0) std::this_thread::sleep_for(std::chrono::milliseconds(reply.pieceDelayMs));
        end = at == 0 ? ssize_t(std::min(out.size(), head + piece)) : at + ssize_t(piece);
      }
      if ((sent = send(fd, out.data() + at, std::min<ssize_t>(end, out.size()) - at,
                       MSG_NOSIGNAL)) <= 0)
        return;
    }
    if (reply.end == HttpReply::kReset) {  // the close that follows sends a reset
      linger abort{1, 0};
      setsockopt(fd, SOL_SOCKET, SO_LINGER, &abort, sizeof abort);
      return;
    }
    if (reply.end == HttpReply::kClose) shutdown(fd, SHUT_WR);
    while (recv(fd, buffer, sizeof buffer, 0) > 0) {  // until the client lets go
    }
  }

  int listener_ = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0), port_ = 0;
  std::mutex mutex_;
  std::atomic<int> requests_{0};
  std::map<std::string, HttpReply> routes_;
  std::thread thread_;
};

}  // namespace testing_support
