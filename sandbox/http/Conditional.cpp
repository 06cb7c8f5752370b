#include "sandbox/http/Conditional.h"

#include <cstdint>
#include <cstdio>

#include "sandbox/core/Text.h"

namespace sandbox {

namespace {

std::string_view bareTag(std::string_view tag) {
  while (tag.starts_with(' ')) tag.remove_prefix(1);
  while (tag.ends_with(' ')) tag.remove_suffix(1);
  if (tag.starts_with("W/")) tag.remove_prefix(2);
  if (tag.size() >= 2 && tag.starts_with('"') && tag.ends_with('"'))
    tag = tag.substr(1, tag.size() - 2);
  return tag;
}

bool listHasTag(std::string_view list, std::string_view tag) {
  for (const auto item : split(list, ',')) {
    if (bareTag(item) == bareTag(tag) || bareTag(item) == "*") return true;
  }
  return false;
}

bool isUnchanged(const Request& request, const std::string& tag, std::time_t modified) {
  if (const auto tags = request.header("If-None-Match")) return listHasTag(*tags, tag);
  const auto since = request.header("If-Modified-Since");
  std::tm parts{};
  if (!since ||
      ::strptime(std::string(*since).c_str(), "%a, %d %b %Y %H:%M:%S GMT", &parts) == nullptr)
    return false;
  return modified <= ::timegm(&parts);
}

}  // namespace

std::string entityTagOf(std::string_view bytes) {
  std::uint64_t hash = 0xcbf29ce484222325;
  for (const char c : bytes) hash = (hash ^ static_cast<unsigned char>(c)) * 0x100000001b3;
  char text[32];
  std::snprintf(text, sizeof text, "\"%016llx\"", static_cast<unsigned long long>(hash));
  return text;
}

std::string httpDate(std::time_t time) {
  std::tm parts{};
  ::gmtime_r(&time, &parts);
  char text[40];
  return {text, std::strftime(text, sizeof text, "%a, %d %b %Y %H:%M:%S GMT", &parts)};
}

Reply withValidators(const Request& request, Reply reply, const std::string& tag,
                     std::time_t modified) {
  reply.headers.emplace_back("ETag", tag);
  reply.headers.emplace_back("Last-Modified", httpDate(modified));
  if (!isUnchanged(request, tag, modified)) return reply;
  reply.status = 304;
  reply.body = nullptr;
  reply.gzipBody = nullptr;
  return reply;
}

}  // namespace sandbox
