#include "platform/linux/ipc/Authenticator.h"

#include <charconv>
#include <optional>

namespace zelkord::ipc {
namespace {

constexpr std::size_t kLongestAuthLine = 512;
constexpr int kMostAuthRejections = 4;
constexpr int kMostAuthLines = 32;

int hexadecimalDigit(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  return -1;
}

// The user that a claim names: hexadecimal digits of a decimal number's characters.
std::optional<uid_t> claimedUser(std::string_view hexadecimal) {
  std::string text;
  if (hexadecimal.size() % 2 != 0) return std::nullopt;
  for (std::size_t at = 0; at < hexadecimal.size(); at += 2) {
    const int high = hexadecimalDigit(hexadecimal[at]);
    const int low = hexadecimalDigit(hexadecimal[at + 1]);
    if (high < 0 || low < 0) return std::nullopt;
    text += static_cast<char>(high * 16 + low);
  }
  uid_t uid = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), uid);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return uid;
}

// Takes the text up to the next blank off the front.
std::string_view takeWord(std::string_view& text) {
  const auto word = text.substr(0, text.find(' '));
  text.remove_prefix(std::min(text.size(), word.size() + 1));
  return word;
}

}  // namespace

std::size_t Authenticator::stepLength(std::string_view bytes) {
  if (bytes.empty()) return 0;
  if (state_ == State::NeedsNul) return 1;
  const auto end = bytes.substr(0, kLongestAuthLine).find("\r\n");
  if (end != std::string_view::npos) return end + 2;
  if (bytes.size() >= kLongestAuthLine) state_ = State::Failed;
  return 0;
}

std::string Authenticator::step(std::string_view bytes) {
  if (state_ == State::NeedsNul) {
    state_ = State::NeedsAuth;
    return bytes == std::string_view("\0", 1) ? std::string() : _fail();
  }
  bytes.remove_suffix(2);
  const bool isText = bytes.find_first_of(std::string_view("\0\r\n", 3)) == std::string_view::npos;
  if (!isText || ++lines_ > kMostAuthLines) return _fail();
  return _line(bytes);
}

std::string Authenticator::_line(std::string_view line) {
  const auto command = takeWord(line);
  if (command == "AUTH" && state_ == State::NeedsAuth) return _auth(line);
  if (command == "DATA" && state_ == State::NeedsData) return _claim(line);
  if (command == "CANCEL" || command == "ERROR") return _reject();
  if (command == "BEGIN") {
    if (state_ != State::NeedsBegin) return _fail();
    state_ = State::Done;
    return {};
  }
  if (command == "NEGOTIATE_UNIX_FD" && state_ == State::NeedsBegin) {
    passesDescriptors_ = true;
    return "AGREE_UNIX_FD\r\n";
  }
  return "ERROR\r\n";
}

std::string Authenticator::_auth(std::string_view mechanism) {
  if (takeWord(mechanism) != "EXTERNAL") return _reject();
  if (!mechanism.empty()) return _claim(mechanism);
  state_ = State::NeedsData;
  return "DATA\r\n";
}

// An empty claim means the user that the connection belongs to.
std::string Authenticator::_claim(std::string_view hexadecimal) {
  if (!hexadecimal.empty() && claimedUser(hexadecimal) != uid_) return _reject();
  state_ = State::NeedsBegin;
  return "OK " + serverId_ + "\r\n";
}

std::string Authenticator::_reject() {
  if (++rejections_ > kMostAuthRejections) return _fail();
  state_ = State::NeedsAuth;
  passesDescriptors_ = false;
  return "REJECTED EXTERNAL\r\n";
}

std::string Authenticator::_fail() {
  state_ = State::Failed;
  return {};
}

}  // namespace zelkord::ipc
