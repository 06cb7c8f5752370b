#pragma once

#include <cstddef>
#include <string>
#include <utility>

#include "base/Time.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

// What a TestHTTPServer answers a request with: bytes, how they are sent, and what comes then.
struct TestHTTPReply {
  enum class Ending {
    KeepOpen,  // wait for the next request
    Close,     // close the connection
    Hang,      // say nothing more until the client closes
    Repeat,    // send `repeated` until the client closes
  };

  std::string bytes;  // the whole message, status line included; empty: not a byte
  Ending ending = Ending::KeepOpen;
  std::string repeated;
  std::size_t pieceSize = 0;  // 0: all at once
  Duration pause{};           // before each piece

  // A message with Content-Length.
  static TestHTTPReply make(int status = 200, std::string body = {}, HTTPHeaders headers = {});
  static TestHTTPReply redirect(int status, std::string location);
  // A body packed with gzip.
  static TestHTTPReply gzip(const std::string& body);
  // Closes after `sent`, although the header announces more.
  static TestHTTPReply truncated(std::string sent, std::size_t announced);
  static TestHTTPReply closed() { return {.ending = Ending::Close}; }
  static TestHTTPReply hanging(std::string bytes = {}) {
    return {.bytes = std::move(bytes), .ending = Ending::Hang};
  }
  // A body without end.
  static TestHTTPReply endless();
  // The message in pieces, a pause before each.
  TestHTTPReply dripping(std::size_t size, Duration pauseBefore) const;
};

}  // namespace zelkord
