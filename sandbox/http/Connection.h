#pragma once

#include <array>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/core/tcp_stream.hpp>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>
#include <boost/beast/ssl/ssl_stream.hpp>
#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "sandbox/http/Server.h"

namespace sandbox {

// One client connection: handshake, then request after request until either side ends it.
//
// States: handshaking, reading a request, handling (perhaps delayed), sending; then reading again
// or closing. Threading: all its work is on the strand of its socket. Ownership: pending operations
// keep it alive. Errors: any of them ends the connection; a request that is no HTTP is answered
// with a 400 first.
class Connection final : public std::enable_shared_from_this<Connection> {
 public:
  Connection(boost::asio::ip::tcp::socket socket, boost::asio::ssl::context& context,
             const Server::Handler& handler, std::uint64_t number);

  void start();

 private:
  using ErrorCode = boost::beast::error_code;
  using Parser = boost::beast::http::request_parser<boost::beast::http::string_body>;

  void _read();
  void _didRead(ErrorCode error);
  void _refuse(ErrorCode error);
  Request _takeRequest();
  void _send(Reply reply);
  void _deliver();
  void _sendOrdinary();
  void _sendHeadThenClose(std::size_t bodyBytes);
  void _sendGarbage();
  void _sendMisannounced();
  void _stayStill();
  void _sendNextByte();
  void _sendChunk();
  void _waitAndDrip();
  // Writes `head_` and the first `bodyBytes` of the body, then calls the operation if all went
  // well.
  void _write(std::size_t bodyBytes, void (Connection::*next)());
  void _writeBytes(boost::asio::const_buffer bytes, std::function<void()> next);
  void _didSend();
  void _shutdown();
  void _abandon();

  boost::beast::ssl_stream<boost::beast::tcp_stream> stream_;
  boost::asio::steady_timer timer_;
  const Server::Handler& handler_;
  const std::uint64_t number_;

  boost::beast::flat_buffer buffer_;
  std::optional<Parser> parser_;
  bool keepAlive_ = false;
  bool headOnly_ = false;

  // Of the answer under way.
  Reply reply_;
  std::string head_;
  std::size_t sent_ = 0;
  std::chrono::steady_clock::time_point begun_;
};

}  // namespace sandbox
