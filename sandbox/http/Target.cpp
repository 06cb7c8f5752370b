#include "sandbox/http/Target.h"

#include <cctype>

#include "sandbox/core/Text.h"

namespace sandbox {

namespace {

enum class Plus { Blank, Plus };

int hexDigit(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  return -1;
}

std::optional<std::string> percentDecoded(std::string_view text, Plus plus) {
  std::string decoded;
  decoded.reserve(text.size());
  for (std::size_t at = 0; at < text.size(); ++at) {
    if (text[at] == '+' && plus == Plus::Blank) {
      decoded.push_back(' ');
    } else if (text[at] != '%') {
      decoded.push_back(text[at]);
    } else {
      const int high = at + 2 < text.size() ? hexDigit(text[at + 1]) : -1;
      const int low = at + 2 < text.size() ? hexDigit(text[at + 2]) : -1;
      if (high < 0 || low < 0) return std::nullopt;
      decoded.push_back(static_cast<char>(high * 16 + low));
      at += 2;
    }
  }
  return decoded;
}

std::optional<QueryItem> parseItem(std::string_view text) {
  const std::size_t equals = text.find('=');
  auto name = percentDecoded(text.substr(0, equals), Plus::Blank);
  if (!name) return std::nullopt;
  if (equals == std::string_view::npos) return QueryItem{std::move(*name), std::nullopt};
  auto value = percentDecoded(text.substr(equals + 1), Plus::Blank);
  if (!value) return std::nullopt;
  return QueryItem{std::move(*name), std::move(value)};
}

}  // namespace

std::optional<Target> parseTarget(std::string_view target) {
  if (target.empty() || target.front() != '/') return std::nullopt;
  target = target.substr(0, target.find('#'));
  const std::size_t mark = target.find('?');
  auto path = percentDecoded(target.substr(0, mark), Plus::Plus);
  if (!path) return std::nullopt;
  Target parsed{std::move(*path), {}};
  if (mark == std::string_view::npos) return parsed;
  for (const auto part : split(target.substr(mark + 1), '&')) {
    if (part.empty()) continue;
    auto item = parseItem(part);
    if (!item) return std::nullopt;
    parsed.items.push_back(std::move(*item));
  }
  return parsed;
}

std::string percentEncoded(std::string_view text) {
  static constexpr char kHex[] = "0123456789ABCDEF";
  std::string encoded;
  for (const char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    if (std::isalnum(byte) != 0 || c == '-' || c == '.' || c == '_' || c == '~') {
      encoded.push_back(c);
    } else {
      encoded.append({'%', kHex[byte >> 4], kHex[byte & 15]});
    }
  }
  return encoded;
}

}  // namespace sandbox
