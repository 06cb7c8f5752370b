#include "platform/linux/url/ResponseCollector.h"

#include <strings.h>

#include <algorithm>
#include <charconv>
#include <utility>

namespace zelkord {
namespace {

// The most that is set aside for a body because its header says so.
constexpr std::uint64_t kMaximumReserve = 1024 * 1024;

std::string_view withoutBlanks(std::string_view text) {
  const auto first = text.find_first_not_of(" \t\r\n");
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(" \t\r\n") - first + 1);
}

template <typename Number>
std::optional<Number> leadingNumber(std::string_view text) {
  Number number{};
  const auto [end, problem] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (problem != std::errc()) return std::nullopt;
  return number;
}

}  // namespace

void ResponseCollector::begin(std::uint64_t maximumBody) {
  maximumBody_ = maximumBody;
  status_.reset();
  headers_.clear();
  headerBytes_ = 0;
  headersEnded_ = tooLarge_ = false;
  body_.clear();
}

bool ResponseCollector::addHeaderLine(std::string_view line) {
  if (line.starts_with("HTTP/") && (!status_ || headersEnded_)) _beginResponse(line);
  headerBytes_ += line.size();
  tooLarge_ = tooLarge_ || headerBytes_ > kMaximumHeaderBytes;
  if (tooLarge_) return false;
  const auto text = withoutBlanks(line);
  if (headersEnded_) return true;  // a trailer
  if (text.empty()) return _endHeaders();
  if (line.front() == ' ' || line.front() == '\t') {  // continues the line before
    if (!headers_.empty()) headers_.back().second.append(" ").append(text);
    return true;
  }
  const auto colon = text.find(':');
  if (colon == std::string_view::npos || line.starts_with("HTTP/")) return true;
  headers_.emplace_back(withoutBlanks(text.substr(0, colon)),
                        withoutBlanks(text.substr(colon + 1)));
  return true;
}

void ResponseCollector::_beginResponse(std::string_view statusLine) {
  const auto blank = statusLine.find(' ');
  status_ = blank == std::string_view::npos
                ? std::nullopt
                : leadingNumber<int>(withoutBlanks(statusLine.substr(blank)));
  headers_.clear();
  headersEnded_ = false;
}

bool ResponseCollector::_endHeaders() {
  headersEnded_ = true;
  std::uint64_t length = 0;
  for (const auto& [name, value] : headers_) {
    if (strcasecmp(name.c_str(), "Content-Encoding") == 0) return true;  // says nothing of the size
    if (strcasecmp(name.c_str(), "Content-Length") == 0) {
      length = leadingNumber<std::uint64_t>(value).value_or(0);
    }
  }
  body_.reserve(std::min({length, maximumBody_, kMaximumReserve}));
  return true;
}

bool ResponseCollector::addBody(std::string_view bytes) {
  tooLarge_ = tooLarge_ || bytes.size() > maximumBody_ - body_.size();
  if (tooLarge_) return false;
  body_.append(bytes);
  return true;
}

std::optional<URLResponse> ResponseCollector::takeResponse(std::string url) {
  if (!status_) return std::nullopt;
  return URLResponse{std::move(url), status_, std::exchange(headers_, {})};
}

std::string ResponseCollector::takeBody() { return std::exchange(body_, {}); }

}  // namespace zelkord
