#include "zelkord/network/exchange/URLComponents.h"

#include <algorithm>
#include <array>
#include <utility>

namespace zelkord {
namespace {

using CharacterSet = std::array<bool, 256>;

constexpr CharacterSet alphanumericsAnd(std::string_view others) {
  CharacterSet set{};
  for (unsigned c = 0; c < 128; ++c) {
    set[c] = (c >= '0' && c <= '9') || (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z');
  }
  for (const char c : others) set[static_cast<unsigned char>(c)] = true;
  return set;
}

constexpr CharacterSet printable() {
  CharacterSet set{};
  for (unsigned c = 0x21; c < 0x7F; ++c) set[c] = true;
  return set;
}

constexpr CharacterSet kInScheme = alphanumericsAnd("+-.");
constexpr CharacterSet kInURL = alphanumericsAnd("-._~!$&'()*+,;=:@/?[]%");
constexpr CharacterSet kInQuery = printable();
constexpr CharacterSet kUnescapedInQuery = alphanumericsAnd("-._~!$'()*,:@/?");

bool isAmong(const CharacterSet& set, char c) { return set[static_cast<unsigned char>(c)]; }

int hexValue(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  return -1;
}

bool isEscape(std::string_view text, std::size_t at) {
  return at + 2 < text.size() && hexValue(text[at + 1]) >= 0 && hexValue(text[at + 2]) >= 0;
}

bool consistsOf(const CharacterSet& set, std::string_view text) {
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (!isAmong(set, text[i]) || (text[i] == '%' && !isEscape(text, i))) return false;
  }
  return true;
}

bool isAsciiLetter(char c) { return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z'); }

// What follows the host: nothing, or a colon and, perhaps, a number.
bool isColonAndPort(std::string_view text) {
  constexpr std::size_t kLongestPort = 5;
  if (text.empty()) return true;
  return text.front() == ':' && text.size() <= 1 + kLongestPort &&
         text.find_first_not_of("0123456789", 1) == std::string_view::npos;
}

// "host[:port]", the host a name, or an address in brackets.
bool isHostAndPort(std::string_view text) {
  if (!text.starts_with('[')) {
    const auto end = std::min(text.find(':'), text.size());
    return end > 0 && text.find_first_of("[]") == std::string_view::npos &&
           isColonAndPort(text.substr(end));
  }
  const auto close = text.find(']');
  return close != std::string_view::npos && close > 1 && isColonAndPort(text.substr(close + 1));
}

// "scheme://[user@]host[:port][/path]"
bool isURLBase(std::string_view base) {
  const auto scheme = base.find("://");
  if (scheme == std::string_view::npos || !consistsOf(kInURL, base)) return false;
  if (scheme == 0 || !isAsciiLetter(base[0])) return false;
  if (!consistsOf(kInScheme, base.substr(0, scheme))) return false;
  auto authority = base.substr(scheme + 3);
  authority = authority.substr(0, authority.find('/'));
  if (const auto user = authority.rfind('@'); user != std::string_view::npos) {
    authority.remove_prefix(user + 1);
  }
  return isHostAndPort(authority);
}

std::string decoded(std::string_view text) {
  std::string result;
  result.reserve(text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] != '%') {
      result += text[i];
      continue;
    }
    result += static_cast<char>(hexValue(text[i + 1]) * 16 + hexValue(text[i + 2]));
    i += 2;
  }
  return result;
}

void appendEncoded(std::string& to, std::string_view text) {
  constexpr std::string_view kDigits = "0123456789ABCDEF";
  for (const char c : text) {
    if (isAmong(kUnescapedInQuery, c)) {
      to += c;
      continue;
    }
    const auto byte = static_cast<unsigned char>(c);
    const char escape[] = {'%', kDigits[byte >> 4], kDigits[byte & 0x0F]};
    to.append(escape, sizeof escape);
  }
}

// An empty piece ("a=1&&b=2") is no item.
std::vector<URLQueryItem> itemsOf(std::string_view query) {
  std::vector<URLQueryItem> items;
  while (!query.empty()) {
    const auto piece = query.substr(0, query.find('&'));
    query.remove_prefix(std::min(piece.size() + 1, query.size()));
    if (piece.empty()) continue;
    const auto equals = piece.find('=');
    auto& item = items.emplace_back();
    item.name = decoded(piece.substr(0, equals));
    if (equals != std::string_view::npos) item.value = decoded(piece.substr(equals + 1));
  }
  return items;
}

}  // namespace

std::optional<URLComponents> URLComponents::parse(std::string_view url) {
  if (url.size() > kMaximumURLLength) return std::nullopt;
  const auto hash = std::min(url.find('#'), url.size());
  const auto fragment = url.substr(hash);
  url = url.substr(0, hash);
  const auto mark = url.find('?');
  const auto base = url.substr(0, mark);
  const auto query = mark == std::string_view::npos ? std::string_view() : url.substr(mark + 1);
  if (!isURLBase(base) || !consistsOf(kInQuery, query)) return std::nullopt;
  if (!fragment.empty() && !consistsOf(kInURL, fragment.substr(1))) return std::nullopt;
  return URLComponents{std::string(base), itemsOf(query), std::string(fragment)};
}

std::string URLComponents::string() const {
  std::size_t size = base.size() + fragment.size();
  for (const auto& item : queryItems) {
    size += item.name.size() + 2 + (item.value ? item.value->size() : 0);
  }
  std::string url;
  url.reserve(size + size / 4);
  url += base;
  char separator = '?';
  for (const auto& item : queryItems) {
    url += std::exchange(separator, '&');
    appendEncoded(url, item.name);
    if (!item.value) continue;
    url += '=';
    appendEncoded(url, *item.value);
  }
  url += fragment;
  return url;
}

}  // namespace zelkord
