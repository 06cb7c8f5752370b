#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "platform/api/URLRequest.h"

namespace zelkord {

// Puts a response together from the pieces in which it arrives, within limits: interim responses
// and trailers are left out, the body is what remains after decoding.
//
// Threading: none of its own. Errors: false from a feed means that the response is too large, and
// stays so until the next `begin`.
class ResponseCollector {
 public:
  static constexpr std::size_t kMaximumHeaderBytes = 256 * 1024;

  void begin(std::uint64_t maximumBody);
  // One line with its end; the status line begins a new response, an empty line ends its headers.
  bool addHeaderLine(std::string_view line);
  bool addBody(std::string_view bytes);

  bool isTooLarge() const { return tooLarge_; }
  // None before a status line has come.
  std::optional<URLResponse> takeResponse(std::string url);
  std::string takeBody();

 private:
  void _beginResponse(std::string_view statusLine);
  bool _endHeaders();

  std::uint64_t maximumBody_ = 0;
  std::optional<int> status_;
  HTTPHeaders headers_;
  std::size_t headerBytes_ = 0;
  bool headersEnded_ = false;
  bool tooLarge_ = false;
  std::string body_;
};

}  // namespace zelkord
