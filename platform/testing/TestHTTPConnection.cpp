#include "platform/testing/TestHTTPConnection.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cstdlib>
#include <cstring>
#include <sstream>
#include <utility>

namespace zelkord {
namespace {

constexpr std::size_t kMaximumTestRequest = 64u * 1024 * 1024;

bool passTestBytes(int from, int to) {
  std::array<char, 16384> buffer;
  const ssize_t count = recv(from, buffer.data(), buffer.size(), 0);
  return count > 0 && send(to, buffer.data(), static_cast<std::size_t>(count), MSG_NOSIGNAL) > 0;
}

}  // namespace

TestHTTPConnection::TestHTTPConnection(int socket, SSL_CTX* tls, int number)
    : socket_(socket), number_(number) {
  const int on = 1;
  setsockopt(socket_, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
  if (!tls) return;
  ssl_.reset(SSL_new(tls));
  SSL_set_fd(ssl_.get(), socket_);
  SSL_set_app_data(ssl_.get(), this);
}

void TestHTTPConnection::markTickets(SSL_CTX* tls) {
  SSL_CTX_set_session_ticket_cb(tls, &TestHTTPConnection::_onTicket,
                                &TestHTTPConnection::_onResumption, nullptr);
}

int TestHTTPConnection::_onTicket(SSL* ssl, void*) {
  const int number = static_cast<TestHTTPConnection*>(SSL_get_app_data(ssl))->number_;
  return SSL_SESSION_set1_ticket_appdata(SSL_get_session(ssl), &number, sizeof number);
}

SSL_TICKET_RETURN TestHTTPConnection::_onResumption(SSL* ssl, SSL_SESSION* session,
                                                    const unsigned char*, std::size_t,
                                                    SSL_TICKET_STATUS status, void*) {
  if (status != SSL_TICKET_SUCCESS && status != SSL_TICKET_SUCCESS_RENEW) {
    return SSL_TICKET_RETURN_IGNORE_RENEW;
  }
  void* bytes = nullptr;
  std::size_t size = 0;
  auto& connection = *static_cast<TestHTTPConnection*>(SSL_get_app_data(ssl));
  if (SSL_SESSION_get0_ticket_appdata(session, &bytes, &size) == 1 && size == sizeof(int)) {
    std::memcpy(&connection.resumedFrom_, bytes, size);
  }
  return SSL_TICKET_RETURN_USE_RENEW;
}

TestHTTPConnection::~TestHTTPConnection() { close(socket_); }

bool TestHTTPConnection::handshake() { return !ssl_ || SSL_accept(ssl_.get()) == 1; }

bool TestHTTPConnection::_readMore() {
  std::array<char, 16384> buffer;
  const int size = static_cast<int>(buffer.size());
  const ssize_t count = ssl_ ? SSL_read(ssl_.get(), buffer.data(), size)
                             : recv(socket_, buffer.data(), buffer.size(), 0);
  if (count <= 0 || input_.size() > kMaximumTestRequest) return false;
  input_.append(buffer.data(), static_cast<std::size_t>(count));
  return true;
}

bool TestHTTPConnection::write(std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t count = ssl_ ? SSL_write(ssl_.get(), bytes.data(), static_cast<int>(bytes.size()))
                               : send(socket_, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (count <= 0) return false;
    bytes.remove_prefix(static_cast<std::size_t>(count));
  }
  return true;
}

void TestHTTPConnection::waitForClose() {
  while (_readMore()) input_.clear();
}

void TestHTTPConnection::tunnelTo(int port) {
  const int other = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<std::uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  bool open = connect(other, reinterpret_cast<sockaddr*>(&address), sizeof address) == 0;
  while (open) {
    std::array<pollfd, 2> ends{{{socket_, POLLIN, 0}, {other, POLLIN, 0}}};
    open = poll(ends.data(), ends.size(), -1) > 0;
    if (open && ends[0].revents) open = passTestBytes(socket_, other);
    if (open && ends[1].revents) open = passTestBytes(other, socket_);
  }
  close(other);
}

TestHTTPRequest TestHTTPConnection::_parseHead(std::string_view head) {
  std::istringstream lines{std::string(head)};
  TestHTTPRequest request;
  lines >> request.method >> request.target;
  std::string line;
  std::getline(lines, line);
  while (std::getline(lines, line)) {
    if (line.ends_with('\r')) line.pop_back();
    const auto colon = line.find(':');
    if (colon == std::string::npos) continue;
    const auto value = line.find_first_not_of(' ', colon + 1);
    request.headers.emplace_back(line.substr(0, colon),
                                 value == std::string::npos ? "" : line.substr(value));
  }
  return request;
}

std::optional<TestHTTPRequest> TestHTTPConnection::readRequest() {
  std::size_t end = 0;
  while ((end = input_.find("\r\n\r\n")) == std::string::npos) {
    if (!_readMore()) return std::nullopt;
  }
  TestHTTPRequest request = _parseHead(std::string_view(input_).substr(0, end + 2));
  input_.erase(0, end + 4);
  const auto length = std::strtoull(request.header("Content-Length").value_or("0").c_str(), {}, 10);
  while (input_.size() < length) {
    if (!_readMore()) return std::nullopt;
  }
  request.body = input_.substr(0, length);
  input_.erase(0, length);
  return request;
}

}  // namespace zelkord
