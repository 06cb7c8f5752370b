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
                            if (!error) self->read();
                          });
}

void Connection::read() {
  parser_.emplace();
  parser_->header_limit(kLargestHead);
  parser_->body_limit(kLargestBody);
  beast::get_lowest_layer(stream_).expires_after(kIdleTime);
  http::async_read(
      stream_, buffer_, *parser_,
      [self = shared_from_this()](ErrorCode error, std::size_t) { self->didRead(error); });
}

void Connection::didRead(ErrorCode error) {
  if (error) return refuse(error);
  beast::get_lowest_layer(stream_).expires_never();
  keepAlive_ = parser_->get().keep_alive();
  headOnly_ = parser_->get().method() == http::verb::head;
  const auto target = parseTarget(std::string_view(parser_->get().target()));
  if (!target) return send(Reply::error(400, "malformed target"));
  Request request = takeRequest();
  request.path = target->path;
  request.items = target->items;
  send(handler_(std::move(request)));
}

void Connection::refuse(ErrorCode error) {
  if (error == http::error::end_of_stream) return shutdown();
  if (error.category() != http::make_error_code(http::error::bad_target).category()) return;
  keepAlive_ = false;
  headOnly_ = false;
  send(Reply::error(error == http::error::body_limit ? 413 : 400, error.message()));
}

Request Connection::takeRequest() {
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

void Connection::send(Reply reply) {
  reply_ = std::move(reply);
  if (reply_.delay.count() == 0) return deliver();
  timer_.expires_after(reply_.delay);
  timer_.async_wait([self = shared_from_this()](ErrorCode error) {
    if (!error) self->deliver();
  });
}

void Connection::deliver() {
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
      return sendOrdinary();
    case Delivery::Close:
      return abandon();
    case Delivery::CloseAfterHeaders:
      return sendHeadThenClose(0);
    case Delivery::Truncated:
      return sendHeadThenClose(size / 2);
    case Delivery::Endless:
      return write(0, &Connection::sendChunk);
    case Delivery::Slow:
      return write(0, &Connection::waitAndDrip);
    case Delivery::NotHttp:
      return sendGarbage();
    case Delivery::WrongLength:
      return sendMisannounced();
  }
}

void Connection::sendOrdinary() {
  write(headOnly_ ? 0 : reply_.bodyText().size(), &Connection::didSend);
}

void Connection::sendHeadThenClose(std::size_t bodyBytes) {
  write(bodyBytes, &Connection::abandon);
}

void Connection::sendGarbage() {
  head_.clear();
  write(reply_.bodyText().size(), &Connection::abandon);
}

void Connection::sendMisannounced() {
  const std::size_t size = reply_.bodyText().size();
  const bool missing = reply_.announcedLength > size;
  write(size, missing ? &Connection::stayStill : &Connection::abandon);
}

void Connection::stayStill() {
  timer_.expires_after(kStillTime);
  timer_.async_wait([self = shared_from_this()](ErrorCode) { self->abandon(); });
}

// A short body goes out with the head in one piece; a longer one follows it without being copied.
void Connection::write(std::size_t bodyBytes, void (Connection::*next)()) {
  if (bodyBytes <= kJoinedBody) {
    head_.append(reply_.bodyText(), 0, bodyBytes);
    return writeBytes(asio::buffer(head_), [this, next] { (this->*next)(); });
  }
  writeBytes(asio::buffer(head_), [this, bodyBytes, next] {
    writeBytes(asio::buffer(reply_.bodyText().data(), bodyBytes),
               [this, next] { (this->*next)(); });
  });
}

// `next` is called while this object is kept alive.
void Connection::writeBytes(asio::const_buffer bytes, std::function<void()> next) {
  beast::get_lowest_layer(stream_).expires_after(kIdleTime);
  asio::async_write(
      stream_, bytes,
      [self = shared_from_this(), next = std::move(next)](ErrorCode error, std::size_t) {
        if (!error) next();
      });
}

void Connection::waitAndDrip() {
  if (headOnly_ || sent_ == reply_.bodyText().size()) return didSend();
  timer_.expires_after(reply_.interval);
  timer_.async_wait([self = shared_from_this()](ErrorCode error) {
    if (!error) self->sendNextByte();
  });
}

void Connection::sendNextByte() {
  writeBytes(asio::buffer(reply_.bodyText().data() + sent_++, 1), [this] { waitAndDrip(); });
}

void Connection::sendChunk() {
  const bool enough =
      sent_ >= kEndlessBytes || std::chrono::steady_clock::now() - begun_ >= kEndlessTime;
  if (enough) return abandon();
  sent_ += kChunkBytes;
  head_ = endlessChunk();
  timer_.expires_after(kChunkInterval);
  timer_.async_wait([self = shared_from_this()](ErrorCode error) {
    if (!error) self->write(0, &Connection::sendChunk);
  });
}

void Connection::didSend() {
  reply_ = {};
  if (keepAlive_)
    read();
  else
    shutdown();
}

void Connection::shutdown() {
  beast::get_lowest_layer(stream_).expires_after(kShutdownTime);
  stream_.async_shutdown([self = shared_from_this()](ErrorCode) { self->abandon(); });
}

void Connection::abandon() {
  ErrorCode ignored;
  beast::get_lowest_layer(stream_).socket().shutdown(asio::ip::tcp::socket::shutdown_both, ignored);
  beast::get_lowest_layer(stream_).close();
}

}  // namespace sandbox
