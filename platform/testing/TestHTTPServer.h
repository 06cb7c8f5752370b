#pragma once

#include <condition_variable>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/URLRequest.h"
#include "platform/testing/TestCertificate.h"
#include "platform/testing/TestHTTPReply.h"

struct ssl_ctx_st;

namespace zelkord {

class TestHTTPConnection;

// A request as it came.
struct TestHTTPRequest {
  std::string method;
  std::string target;   // with the query
  HTTPHeaders headers;  // in order
  std::string body;
  int connection = 0;   // which connection brought it, from 1
  int resumedFrom = 0;  // whose TLS session that one resumed; 0: nobody's

  std::optional<std::string> header(std::string_view name) const;
};

// A small HTTP/1.1 server on a loopback port of its own, with TLS when it has a certificate. It
// answers from its script: by path, one reply after the other, the last one again and again; 404
// where it has none. It also answers CONNECT, by connecting the client with 127.0.0.1 and the asked
// port, whatever the host.
//
// Threading: any thread; one thread a connection, at most 256 connections.
// Ownership: its end closes all connections and waits for their threads.
class TestHTTPServer final {
 public:
  explicit TestHTTPServer(const std::optional<TestCertificate>& certificate = {});
  ~TestHTTPServer();
  TestHTTPServer(const TestHTTPServer&) = delete;
  TestHTTPServer& operator=(const TestHTTPServer&) = delete;

  // Asked instead of the script from now on.
  using Handler = std::function<TestHTTPReply(const TestHTTPRequest& request)>;
  void answerWith(Handler handler);
  // Adds to the script of a path (without its query).
  void reply(const std::string& path, TestHTTPReply reply);

  int port() const { return port_; }
  // "http(s)://HOST:PORT" and the path.
  std::string url(const std::string& path, const std::string& host = "127.0.0.1") const;

  std::vector<TestHTTPRequest> requests() const;
  // Waits until that many requests have come; false after ten seconds.
  bool waitForRequests(std::size_t count) const;
  // Waits until the clients have closed that many connections; false after ten seconds.
  bool waitForCloses(int count) const;
  int connections() const;
  // How many connections resumed a TLS session.
  int resumedSessions() const;

 private:
  void _accept();
  void _serve(int socket, int number);
  bool _send(TestHTTPConnection& connection, const TestHTTPReply& reply);
  // Records the request and picks its reply.
  TestHTTPReply _answer(TestHTTPRequest request);
  // Waits, unless the server ends first (false).
  bool _pause(Duration duration) const;
  void _closed(int socket, bool resumedTLS);

  // Fixed after construction.
  const std::shared_ptr<ssl_ctx_st> tls_;  // null: plain
  const int listener_;
  int port_ = 0;

  mutable Mutex mutex_;
  mutable std::condition_variable_any changed_;
  bool ending_ ZK_GUARDED_BY(mutex_) = false;
  Handler handler_ ZK_GUARDED_BY(mutex_);
  std::map<std::string, std::deque<TestHTTPReply>> script_ ZK_GUARDED_BY(mutex_);
  std::vector<TestHTTPRequest> requests_ ZK_GUARDED_BY(mutex_);
  int connections_ ZK_GUARDED_BY(mutex_) = 0;
  int closes_ ZK_GUARDED_BY(mutex_) = 0;
  int resumedSessions_ ZK_GUARDED_BY(mutex_) = 0;
  std::vector<int> sockets_ ZK_GUARDED_BY(mutex_);
  std::vector<std::thread> threads_ ZK_GUARDED_BY(mutex_);
  std::thread acceptor_;
};

}  // namespace zelkord
