#include "sandbox/http/Connection.h"

#include <boost/asio/write.hpp>
#include <boost/beast/http/read.hpp>
#include <utility>

#include "sandbox/http/Target.h"

namespace sandbox {

namespace asio = boost::asio;
namespace beast = boost::beast;
namespace http = boost::beast::http;

namespace {

constexpr std::chrono::seconds kHandshakeTime{30};
constexpr std::chrono::seconds kIdleTime{300};
constexpr std::chrono::seconds kShutdownTime{2};
constexpr std::uint32_t kLargestHead = 4U << 20U;
constexpr std::uint64_t kLargestBody = 64U << 20U;
constexpr std::chrono::seconds kEndlessTime{60};
constexpr std::chrono::seconds kStillTime{60};
constexpr std::size_t kEndlessBytes = 100U << 20U;
constexpr std::size_t kChunkBytes = 16384;
constexpr std::chrono::milliseconds kChunkInterval{10};

constexpr std::size_t kJoinedBody = 16384;

std::string endlessChunk() { return "4000\r\n" + std::string(kChunkBytes, ' ') + "\r\n"; }

}  // namespace

Connection::Connection(asio::ip::tcp::socket socket, asio::ssl::context& context,
                       const Server::Handler& handler, std::uint64_t number)
    : stream_(std::move(socket), context),
      timer_(stream_.get_executor()),
      handler_(handler),
      number_(number) {}

void Connection::start() {
  ErrorCode ignored;
  beast::get_lowest_layer(stream_).socket().set_option(asio::ip::tcp::no_delay(true), ignored);
  beast::get_lowest_layer(stream_).expires_after(kHandshakeTime);
  stream_.async_handshake(asio::ssl::stream_base::server,
                          [self = shared_from_this()](ErrorCode error) {
                            if (!error) self->_read();
                          });
}

void Connection::_read() {
  parser_.emplace();
  parser_->header_limit(kLargestHead);
  parser_->body_limit(kLargestBody);
  beast::get_lowest_layer(stream_).expires_after(kIdleTime);
  http::async_read(
      stream_, buffer_, *parser_,
      [self = shared_from_this()](ErrorCode error, std::size_t) { self->_didRead(error); });
}

void Connection::_didRead(ErrorCode error) {
  if (error) return _refuse(error);
  beast::get_lowest_layer(stream_).expires_never();
  keepAlive_ = parser_->get().keep_alive();
  headOnly_ = parser_->get().method() == http::verb::head;
  const auto target = parseTarget(std::string_view(parser_->get().target()));
  if (!target) return _send(Reply::error(400, "malformed target"));
  Request request = _takeRequest();
  request.path = target->path;
  request.items = target->items;
  _send(handler_(std::move(request)));
}

void Connection::_refuse(ErrorCode error) {
  if (error == http::error::end_of_stream) return _shutdown();
  if (error.category() != http::make_error_code(http::error::bad_target).category()) return;
  keepAlive_ = false;
  headOnly_ = false;
  _send(Reply::error(error == http::error::body_limit ? 413 : 400, error.message()));
}

Request Connection::_takeRequest() {
  auto message = parser_->release();
  Request request;
  request.method = message.method_string();
  request.target = message.target();
  for (const auto& field : message)
    request.headers.emplace_back(field.name_string(), field.value());
  request.body = std::move(message.body());
  request.connection = number_;
  request.tlsReused = SSL_session_reused(stream_.native_handle()) == 1;
  return request;
}

void Connection::_send(Reply reply) {
  reply_ = std::move(reply);
  if (reply_.delay.count() == 0) return _deliver();
  timer_.expires_after(reply_.delay);
  timer_.async_wait([self = shared_from_this()](ErrorCode error) {
    if (!error) self->_deliver();
  });
}

void Connection::_deliver() {
  const bool endless = reply_.delivery == Delivery::Endless;
  const bool ordinary = reply_.delivery == Delivery::Ordinary || reply_.delivery == Delivery::Slow;
  const bool lies = reply_.delivery == Delivery::WrongLength;
  const std::size_t size = reply_.bodyText().size();
  const auto announced = std::optional(lies ? reply_.announcedLength : size);
  head_ = responseHead(reply_, endless ? std::nullopt : announced, keepAlive_ && ordinary);
  sent_ = 0;
  begun_ = std::chrono::steady_clock::now();
  switch (reply_.delivery) {
    case Delivery::Ordinary:
      return _sendOrdinary();
    case Delivery::Close:
      return _abandon();
    case Delivery::CloseAfterHeaders:
      return _sendHeadThenClose(0);
    case Delivery::Truncated:
      return _sendHeadThenClose(size / 2);
    case Delivery::Endless:
      return _write(0, &Connection::_sendChunk);
    case Delivery::Slow:
      return _write(0, &Connection::_waitAndDrip);
    case Delivery::NotHttp:
      return _sendGarbage();
    case Delivery::WrongLength:
      return _sendMisannounced();
  }
}

void Connection::_sendOrdinary() {
  _write(headOnly_ ? 0 : reply_.bodyText().size(), &Connection::_didSend);
}

void Connection::_sendHeadThenClose(std::size_t bodyBytes) {
  _write(bodyBytes, &Connection::_abandon);
}

void Connection::_sendGarbage() {
  head_.clear();
  _write(reply_.bodyText().size(), &Connection::_abandon);
}

void Connection::_sendMisannounced() {
  const std::size_t size = reply_.bodyText().size();
  const bool missing = reply_.announcedLength > size;
  _write(size, missing ? &Connection::_stayStill : &Connection::_abandon);
}

void Connection::_stayStill() {
  timer_.expires_after(kStillTime);
  timer_.async_wait([self = shared_from_this()](ErrorCode) { self->_abandon(); });
}

// A short body goes out with the head in one piece; a longer one follows it without being copied.
void Connection::_write(std::size_t bodyBytes, void (Connection::*next)()) {
  if (bodyBytes <= kJoinedBody) {
    head_.append(reply_.bodyText(), 0, bodyBytes);
    return _writeBytes(asio::buffer(head_), [this, next] { (this->*next)(); });
  }
  _writeBytes(asio::buffer(head_), [this, bodyBytes, next] {
    _writeBytes(asio::buffer(reply_.bodyText().data(), bodyBytes),
                [this, next] { (this->*next)(); });
  });
}

// `next` is called while this object is kept alive.
void Connection::_writeBytes(asio::const_buffer bytes, std::function<void()> next) {
  beast::get_lowest_layer(stream_).expires_after(kIdleTime);
  asio::async_write(
      stream_, bytes,
      [self = shared_from_this(), next = std::move(next)](ErrorCode error, std::size_t) {
        if (!error) next();
      });
}

void Connection::_waitAndDrip() {
  if (headOnly_ || sent_ == reply_.bodyText().size()) return _didSend();
  timer_.expires_after(reply_.interval);
  timer_.async_wait([self = shared_from_this()](ErrorCode error) {
    if (!error) self->_sendNextByte();
  });
}

void Connection::_sendNextByte() {
  _writeBytes(asio::buffer(reply_.bodyText().data() + sent_++, 1), [this] { _waitAndDrip(); });
}

void Connection::_sendChunk() {
  const bool enough =
      sent_ >= kEndlessBytes || std::chrono::steady_clock::now() - begun_ >= kEndlessTime;
  if (enough) return _abandon();
  sent_ += kChunkBytes;
  head_ = endlessChunk();
  timer_.expires_after(kChunkInterval);
  timer_.async_wait([self = shared_from_this()](ErrorCode error) {
    if (!error) self->_write(0, &Connection::_sendChunk);
  });
}

void Connection::_didSend() {
  reply_ = {};
  if (keepAlive_)
    _read();
  else
    _shutdown();
}

void Connection::_shutdown() {
  beast::get_lowest_layer(stream_).expires_after(kShutdownTime);
  stream_.async_shutdown([self = shared_from_this()](ErrorCode) { self->_abandon(); });
}

void Connection::_abandon() {
  ErrorCode ignored;
  beast::get_lowest_layer(stream_).socket().shutdown(asio::ip::tcp::socket::shutdown_both, ignored);
  beast::get_lowest_layer(stream_).close();
}

}  // namespace sandbox
