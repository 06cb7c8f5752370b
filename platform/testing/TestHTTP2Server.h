#pragma once

#include <openssl/ssl.h>

#include <atomic>
#include <cstdint>
#include <deque>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "base/Mutex.h"
#include "platform/testing/TestCertificate.h"

namespace zelkord {

// A server that speaks just enough HTTP/2 to misbehave on purpose: it serves one connection after
// the other and answers request after request as its script says; "hello" when that is empty.
//
// Threading: any thread; one thread of its own. Ownership: its end closes the connection.
class TestHTTP2Server final {
 public:
  enum class Action {
    Answer,
    Reset,            // the stream ends with INTERNAL_ERROR
    ResetHalfWay,     // after the headers and a part of the body
    AnswerAndGoAway,  // the last request that this connection takes
    GoAwayAndClose,   // and the request has not been looked at
  };

  TestHTTP2Server(const TestCertificate& certificate, std::deque<Action> script);
  ~TestHTTP2Server();
  TestHTTP2Server(const TestHTTP2Server&) = delete;
  TestHTTP2Server& operator=(const TestHTTP2Server&) = delete;

  std::string url() const { return "https://127.0.0.1:" + std::to_string(port_) + "/"; }
  int connections() const { return connections_; }
  int requests() const { return requests_; }

 private:
  struct Frame {
    std::uint8_t type = 0;
    std::uint8_t flags = 0;
    std::uint32_t stream = 0;
    std::string payload;
  };

  void _run();
  void _serve(SSL* connection);
  bool _take(SSL* connection, const Frame& frame);
  bool _act(SSL* connection, std::uint32_t stream);
  Action _next();
  static bool _read(SSL* connection, std::string& bytes, std::size_t count);
  static bool _readFrame(SSL* connection, Frame& frame);
  static bool _write(SSL* connection, const Frame& frame);

  // Fixed after construction.
  const std::shared_ptr<SSL_CTX> tls_;
  const int listener_;
  int port_ = 0;

  std::atomic<int> connections_ = 0;
  std::atomic<int> requests_ = 0;
  std::atomic<int> open_ = -1;
  std::atomic<bool> ending_ = false;
  Mutex mutex_;
  std::deque<Action> script_ ZK_GUARDED_BY(mutex_);
  std::thread thread_;
};

}  // namespace zelkord
