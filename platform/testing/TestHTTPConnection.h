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
  TestHTTPConnection(int socket, SSL_CTX* tls, int number);
  ~TestHTTPConnection();
  TestHTTPConnection(const TestHTTPConnection&) = delete;
  TestHTTPConnection& operator=(const TestHTTPConnection&) = delete;

  // Before any connection: lets tickets say which connection gave them out.
  static void markTickets(SSL_CTX* tls);

  bool handshake();
  // The connection whose TLS session this one resumed; 0: none.
  int resumedFrom() const { return resumedFrom_; }
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

  static int _onTicket(SSL* ssl, void*);
  static SSL_TICKET_RETURN _onResumption(SSL* ssl, SSL_SESSION* session, const unsigned char*,
                                         std::size_t, SSL_TICKET_STATUS status, void*);

  const int socket_;
  const int number_;
  int resumedFrom_ = 0;
  std::unique_ptr<SSL, decltype(&SSL_free)> ssl_{nullptr, &SSL_free};
  std::string input_;
};

}  // namespace zelkord
