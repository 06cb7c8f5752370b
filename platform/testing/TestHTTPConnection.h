#pragma once

#include <openssl/ssl.h>

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/testing/TestHTTPServer.h"

namespace zelkord {

// The server's end of one connection: blocking reads and writes, plain or TLS.
//
// Threading: its own thread; shutting the socket down from elsewhere ends every wait.
// Ownership: closes the socket. Errors: false and none mean that the connection is over.
class TestHTTPConnection final {
 public:
  // `tls` null: plain.
  TestHTTPConnection(int socket, SSL_CTX* tls);
  ~TestHTTPConnection();
  TestHTTPConnection(const TestHTTPConnection&) = delete;
  TestHTTPConnection& operator=(const TestHTTPConnection&) = delete;

  bool handshake();
  bool resumedTLS() const { return ssl_ && SSL_session_reused(ssl_.get()) == 1; }
  std::optional<TestHTTPRequest> readRequest();
  bool write(std::string_view bytes);
  void waitForClose();
  // Passes bytes between the client and a port of this machine until one of them closes.
  void tunnelTo(int port);

 private:
  // Reads what there is, at least a byte.
  bool _readMore();
  static TestHTTPRequest _parseHead(std::string_view head);

  const int socket_;
  std::unique_ptr<SSL, decltype(&SSL_free)> ssl_{nullptr, &SSL_free};
  std::string input_;
};

}  // namespace zelkord
