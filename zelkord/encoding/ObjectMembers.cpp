#include "zelkord/encoding/ObjectMembers.h"

#include <algorithm>

#include "base/Json.h"

namespace zelkord {
namespace {

// Where the string that begins at `begin` ends, behind its closing quote.
std::size_t endOfString(std::string_view json, std::size_t begin) {
  auto at = begin + 1;
  while (json[at] != '"') at += json[at] == '\\' ? 2 : 1;
  return at + 1;
}

// The length of the first of the members: up to its comma, or all of them.
std::size_t lengthOfFirst(std::string_view members) {
  std::size_t depth = 0;
  for (std::size_t at = 0; at < members.size();) {
    const char character = members[at];
    if (character == '"') {
      at = endOfString(members, at);
      continue;
    }
    if (character == ',' && depth == 0) return at;
    if (character == '{' || character == '[') ++depth;
    if (character == '}' || character == ']') --depth;
    ++at;
  }
  return members.size();
}

bool isLeftOut(std::string_view member, LeftOut leftOut) {
  const auto quoted = member.substr(0, endOfString(member, 0));
  const auto name = quoted.substr(1, quoted.size() - 2);
  const auto isNamed = [&](std::string_view text) {
    return std::find(leftOut.begin(), leftOut.end(), text) != leftOut.end();
  };
  if (name.find('\\') == std::string_view::npos) return isNamed(name);
  const auto unescaped = parseJson(quoted);
  return unescaped && isNamed(unescaped->get_string());
}

}  // namespace

void appendMembersOfObject(std::string_view object, LeftOut leftOut, std::size_t begin,
                           std::string& text) {
  const auto braced = trimmedJson(object);
  auto members = trimmedJson(braced.substr(1, braced.size() - 2));
  while (!members.empty()) {
    const auto length = leftOut.empty() ? members.size() : lengthOfFirst(members);
    const auto member = members.substr(0, length);
    if (leftOut.empty() || !isLeftOut(member, leftOut)) {
      if (text.size() > begin) text += ',';
      text += trimmedJson(member);
    }
    members = trimmedJson(members.substr(std::min(length + 1, members.size())));
  }
}

}  // namespace zelkord
