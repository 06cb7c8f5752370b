#include "platform/testing/TestHTTPServer.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <openssl/ssl.h>
#include <pthread.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <utility>

#include "base/Check.h"
#include "platform/testing/TestHTTPConnection.h"

namespace zelkord {
namespace {

constexpr int kMaximumTestConnections = 256;
constexpr Duration kTestPatience = 10s;

// Writes to closed connections are answered with an error, not a signal.
void blockTestSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGPIPE);
  pthread_sigmask(SIG_BLOCK, &signals, nullptr);
}

}  // namespace

std::optional<std::string> TestHTTPRequest::header(std::string_view name) const {
  return URLResponse{.headers = headers}.header(name);
}

TestHTTPServer::TestHTTPServer(const std::optional<TestCertificate>& certificate)
    : tls_(certificate ? certificate->serverContext() : nullptr),
      listener_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
  if (tls_) TestHTTPConnection::markTickets(tls_.get());
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  socklen_t size = sizeof address;
  auto* generic = reinterpret_cast<sockaddr*>(&address);
  const bool listens = bind(listener_, generic, size) == 0 && listen(listener_, 128) == 0 &&
                       getsockname(listener_, generic, &size) == 0;
  ZK_CHECK(listens, "the test server listens");
  port_ = ntohs(address.sin_port);
  acceptor_ = std::thread([this] { _accept(); });
}

TestHTTPServer::~TestHTTPServer() {
  {
    const MutexLock lock(mutex_);
    ending_ = true;
    changed_.notify_all();
    shutdown(listener_, SHUT_RDWR);
    for (const int open : sockets_) shutdown(open, SHUT_RDWR);
  }
  acceptor_.join();
  std::vector<std::thread> threads;
  {
    const MutexLock lock(mutex_);
    threads.swap(threads_);
  }
  for (auto& thread : threads) thread.join();
  close(listener_);
}

void TestHTTPServer::answerWith(Handler handler) {
  const MutexLock lock(mutex_);
  handler_ = std::move(handler);
}

void TestHTTPServer::reply(const std::string& path, TestHTTPReply reply) {
  const MutexLock lock(mutex_);
  script_[path].push_back(std::move(reply));
}

std::string TestHTTPServer::url(const std::string& path, const std::string& host) const {
  return (tls_ ? "https://" : "http://") + host + ":" + std::to_string(port_) + path;
}

std::vector<TestHTTPRequest> TestHTTPServer::requests() const {
  const MutexLock lock(mutex_);
  return requests_;
}

bool TestHTTPServer::waitForRequests(std::size_t count) const {
  const auto limit = std::chrono::steady_clock::now() + kTestPatience;
  const MutexLock lock(mutex_);
  while (requests_.size() < count) {
    if (changed_.wait_until(mutex_, limit) == std::cv_status::timeout) return false;
  }
  return true;
}

bool TestHTTPServer::waitForCloses(int count) const {
  const auto limit = std::chrono::steady_clock::now() + kTestPatience;
  const MutexLock lock(mutex_);
  while (closes_ < count) {
    if (changed_.wait_until(mutex_, limit) == std::cv_status::timeout) return false;
  }
  return true;
}

int TestHTTPServer::resumedSessions() const {
  const MutexLock lock(mutex_);
  return resumedSessions_;
}

int TestHTTPServer::connections() const {
  const MutexLock lock(mutex_);
  return connections_;
}

void TestHTTPServer::_accept() {
  while (true) {
    const int accepted = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
    const MutexLock lock(mutex_);
    if (ending_ || accepted < 0 || connections_ >= kMaximumTestConnections) {
      if (accepted >= 0) close(accepted);
      if (ending_ || accepted < 0) return;
      continue;
    }
    sockets_.push_back(accepted);
    threads_.emplace_back([this, accepted, number = ++connections_] { _serve(accepted, number); });
  }
}

void TestHTTPServer::_closed(int socket, bool resumedTLS) {
  const MutexLock lock(mutex_);
  std::erase(sockets_, socket);
  ++closes_;
  resumedSessions_ += resumedTLS;
  changed_.notify_all();
}

void TestHTTPServer::_serve(int socket, int number) {
  blockTestSignals();
  TestHTTPConnection connection(socket, tls_.get(), number);
  auto request = connection.handshake() ? connection.readRequest() : std::nullopt;
  while (request) {
    request->connection = number;
    request->resumedFrom = connection.resumedFrom();
    const bool isTunnel = request->method == "CONNECT";
    const std::string target = request->target;
    const TestHTTPReply reply = _answer(*std::move(request));
    request.reset();
    if (isTunnel) {
      if (connection.write(reply.bytes)) {
        connection.tunnelTo(std::atoi(target.substr(target.rfind(':') + 1).c_str()));
      }
      break;
    }
    if (_send(connection, reply)) request = connection.readRequest();
  }
  _closed(socket, connection.resumedTLS());
}

// Whether the connection can take another request.
bool TestHTTPServer::_send(TestHTTPConnection& connection, const TestHTTPReply& reply) {
  const std::size_t piece = reply.pieceSize > 0 ? reply.pieceSize : reply.bytes.size();
  for (std::size_t sent = 0; sent < reply.bytes.size(); sent += piece) {
    if (reply.pause > Duration{} && !_pause(reply.pause)) return false;
    if (!connection.write(std::string_view(reply.bytes).substr(sent, piece))) return false;
  }
  switch (reply.ending) {
    case TestHTTPReply::Ending::KeepOpen:
      return true;
    case TestHTTPReply::Ending::Close:
      return false;
    case TestHTTPReply::Ending::Hang:
      connection.waitForClose();
      return false;
    case TestHTTPReply::Ending::Repeat:
      while (connection.write(reply.repeated)) {
      }
      return false;
  }
  return false;
}

TestHTTPReply TestHTTPServer::_answer(TestHTTPRequest request) {
  const MutexLock lock(mutex_);
  const std::string path = request.target.substr(0, request.target.find('?'));
  const bool isTunnel = request.method == "CONNECT";
  requests_.push_back(std::move(request));
  changed_.notify_all();
  if (isTunnel) return {.bytes = "HTTP/1.1 200 Connected\r\n\r\n"};
  if (handler_) return handler_(requests_.back());
  const auto found = script_.find(path);
  if (found == script_.end()) return TestHTTPReply::make(404);
  auto& replies = found->second;
  TestHTTPReply reply = replies.front();
  if (replies.size() > 1) replies.pop_front();
  return reply;
}

bool TestHTTPServer::_pause(Duration duration) const {
  const auto limit = std::chrono::steady_clock::now() + duration;
  const MutexLock lock(mutex_);
  while (!ending_) {
    if (changed_.wait_until(mutex_, limit) == std::cv_status::timeout) return !ending_;
  }
  return false;
}

}  // namespace zelkord
