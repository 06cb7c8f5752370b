#include "platform/testing/TestHTTP2Server.h"

#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <csignal>
#include <cstring>
#include <memory>
#include <utility>

#include "base/Check.h"

namespace zelkord {
namespace {

constexpr std::string_view kPreface = "PRI * HTTP/2.0\r\n\r\nSM\r\n\r\n";
constexpr std::size_t kFrameHead = 9;
constexpr std::uint8_t kData = 0, kHeaders = 1, kReset = 3, kSettings = 4, kPing = 6, kGoAway = 7;
constexpr std::uint8_t kAck = 1, kEndStream = 1, kEndHeaders = 4;
const std::string kStatus200 = "\x88";  // an entry of HPACK's static table

std::string bigEndian(std::uint32_t number) {
  std::string bytes;
  for (const int shift : {24, 16, 8, 0}) bytes.push_back(static_cast<char>(number >> shift & 0xFF));
  return bytes;
}

int selectHTTP2(SSL*, const unsigned char** out, unsigned char* outSize, const unsigned char* in,
                unsigned inSize, void*) {
  static constexpr unsigned char kProtocols[] = {2, 'h', '2'};
  const int found = SSL_select_next_proto(const_cast<unsigned char**>(out), outSize, kProtocols,
                                          sizeof kProtocols, in, inSize);
  return found == OPENSSL_NPN_NEGOTIATED ? SSL_TLSEXT_ERR_OK : SSL_TLSEXT_ERR_ALERT_FATAL;
}

}  // namespace

TestHTTP2Server::TestHTTP2Server(const TestCertificate& certificate, std::deque<Action> script)
    : tls_(certificate.serverContext()),
      listener_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)),
      script_(std::move(script)) {
  SSL_CTX_set_alpn_select_cb(tls_.get(), &selectHTTP2, nullptr);
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  socklen_t size = sizeof address;
  auto* generic = reinterpret_cast<sockaddr*>(&address);
  const bool listens = bind(listener_, generic, size) == 0 && listen(listener_, 16) == 0 &&
                       getsockname(listener_, generic, &size) == 0;
  ZK_CHECK(listens, "the test server listens");
  port_ = ntohs(address.sin_port);
  thread_ = std::thread([this] { _run(); });
}

TestHTTP2Server::~TestHTTP2Server() {
  ending_ = true;
  shutdown(listener_, SHUT_RDWR);
  if (const int open = open_; open >= 0) shutdown(open, SHUT_RDWR);
  thread_.join();
  close(listener_);
}

void TestHTTP2Server::_run() {
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGPIPE);
  pthread_sigmask(SIG_BLOCK, &signals, nullptr);
  while (!ending_) {
    const int accepted = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
    if (accepted < 0) return;
    open_ = accepted;
    ++connections_;
    const std::unique_ptr<SSL, decltype(&SSL_free)> connection(SSL_new(tls_.get()), &SSL_free);
    SSL_set_fd(connection.get(), accepted);
    if (!ending_ && SSL_accept(connection.get()) == 1) _serve(connection.get());
    open_ = -1;
    close(accepted);
  }
}

void TestHTTP2Server::_serve(SSL* connection) {
  std::string preface;
  if (!_read(connection, preface, kPreface.size()) || preface != kPreface) return;
  if (!_write(connection, {.type = kSettings})) return;
  Frame frame;
  while (_readFrame(connection, frame) && _take(connection, frame)) {
  }
}

// Whether the connection goes on.
bool TestHTTP2Server::_take(SSL* connection, const Frame& frame) {
  const bool isAck = (frame.flags & kAck) != 0;
  if (frame.type == kSettings && !isAck) {
    return _write(connection, {.type = kSettings, .flags = kAck});
  }
  if (frame.type == kPing && !isAck) {
    return _write(connection, {.type = kPing, .flags = kAck, .payload = frame.payload});
  }
  return frame.type != kHeaders || _act(connection, frame.stream);
}

bool TestHTTP2Server::_act(SSL* connection, std::uint32_t stream) {
  constexpr std::uint32_t kInternalError = 2;
  const Frame headers{kHeaders, kEndHeaders, stream, kStatus200};
  const Frame reset{kReset, 0, stream, bigEndian(kInternalError)};
  ++requests_;
  switch (_next()) {
    case Action::Answer:
      return _write(connection, headers) &&
             _write(connection, {kData, kEndStream, stream, "hello"});
    case Action::Reset:
      return _write(connection, reset);
    case Action::ResetHalfWay:
      return _write(connection, headers) && _write(connection, {kData, 0, stream, "hel"}) &&
             _write(connection, reset);
    case Action::AnswerAndGoAway:
      return _write(connection, {kGoAway, 0, 0, bigEndian(stream) + bigEndian(0)}) &&
             _write(connection, headers) &&
             _write(connection, {kData, kEndStream, stream, "hello"});
    case Action::GoAwayAndClose:
      _write(connection, {kGoAway, 0, 0, bigEndian(0) + bigEndian(0)});
      return false;
  }
  return false;
}

TestHTTP2Server::Action TestHTTP2Server::_next() {
  const MutexLock lock(mutex_);
  if (script_.empty()) return Action::Answer;
  const auto action = script_.front();
  script_.pop_front();
  return action;
}

bool TestHTTP2Server::_read(SSL* connection, std::string& bytes, std::size_t count) {
  bytes.resize(count);
  for (std::size_t done = 0; done < count;) {
    const int size = SSL_read(connection, bytes.data() + done, static_cast<int>(count - done));
    if (size <= 0) return false;
    done += static_cast<std::size_t>(size);
  }
  return true;
}

bool TestHTTP2Server::_readFrame(SSL* connection, Frame& frame) {
  std::string head;
  if (!_read(connection, head, kFrameHead)) return false;
  const auto byte = [&head](std::size_t place) {
    return static_cast<std::uint32_t>(static_cast<unsigned char>(head[place]));
  };
  frame.type = static_cast<std::uint8_t>(byte(3));
  frame.flags = static_cast<std::uint8_t>(byte(4));
  frame.stream = (byte(5) << 24 | byte(6) << 16 | byte(7) << 8 | byte(8)) & 0x7FFFFFFF;
  return _read(connection, frame.payload, byte(0) << 16 | byte(1) << 8 | byte(2));
}

bool TestHTTP2Server::_write(SSL* connection, const Frame& frame) {
  std::string bytes = bigEndian(static_cast<std::uint32_t>(frame.payload.size())).substr(1);
  bytes.push_back(static_cast<char>(frame.type));
  bytes.push_back(static_cast<char>(frame.flags));
  bytes += bigEndian(frame.stream) + frame.payload;
  return SSL_write(connection, bytes.data(), static_cast<int>(bytes.size())) > 0;
}

}  // namespace zelkord
