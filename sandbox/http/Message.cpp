#include "sandbox/http/Message.h"

#include <strings.h>

#include <algorithm>
#include <boost/json/object.hpp>
#include <boost/json/serialize.hpp>
#include <ctime>

namespace sandbox {

namespace {

bool sameHeaderName(std::string_view a, std::string_view b) {
  return a.size() == b.size() && ::strncasecmp(a.data(), b.data(), a.size()) == 0;
}

std::string_view reasonPhrase(unsigned status) {
  switch (status) {
    case 200:
      return "OK";
    case 204:
      return "No Content";
    case 302:
      return "Found";
    case 304:
      return "Not Modified";
    case 400:
      return "Bad Request";
    case 403:
      return "Forbidden";
    case 404:
      return "Not Found";
    case 405:
      return "Method Not Allowed";
    case 413:
      return "Content Too Large";
    case 500:
      return "Internal Server Error";
    case 503:
      return "Service Unavailable";
    default:
      return "Status";
  }
}

void appendHeader(std::string& head, std::string_view name, std::string_view value) {
  head.append(name).append(": ").append(value).append("\r\n");
}

bool hasNoBody(unsigned status) { return status == 204 || status == 304; }

}  // namespace

std::optional<std::string_view> findHeader(const Headers& headers, std::string_view name) {
  for (const auto& [key, value] : headers) {
    if (sameHeaderName(key, name)) return value;
  }
  return std::nullopt;
}

void setHeader(Headers& headers, std::string name, std::string value) {
  std::erase_if(headers, [&](const auto& header) { return sameHeaderName(header.first, name); });
  headers.emplace_back(std::move(name), std::move(value));
}

std::optional<std::string_view> Request::item(std::string_view name) const {
  for (const auto& item : items) {
    if (item.name == name && item.value) return *item.value;
  }
  return std::nullopt;
}

std::string Request::itemOr(std::string_view name, std::string_view otherwise) const {
  return std::string(item(name).value_or(otherwise));
}

const std::string& Reply::bodyText() const {
  static const std::string kNone;
  return body ? *body : kNone;
}

Reply Reply::json(unsigned status, std::string text) {
  Reply reply{.status = status};
  reply.headers.emplace_back("Content-Type", "application/json");
  reply.body = std::make_shared<const std::string>(std::move(text));
  return reply;
}

Reply Reply::error(unsigned status, std::string_view reason) {
  return json(status, boost::json::serialize(boost::json::object{{"error", reason}}));
}

Reply Reply::empty(unsigned status) { return Reply{.status = status}; }

std::string responseHead(const Reply& reply, std::optional<std::size_t> contentLength,
                         bool keepAlive) {
  std::string head = "HTTP/1.1 " + std::to_string(reply.status) + " ";
  head.append(reasonPhrase(reply.status)).append("\r\n");
  for (const auto& [name, value] : reply.headers) appendHeader(head, name, value);
  if (!contentLength)
    appendHeader(head, "Transfer-Encoding", "chunked");
  else if (!hasNoBody(reply.status))
    appendHeader(head, "Content-Length", std::to_string(*contentLength));
  if (!keepAlive) appendHeader(head, "Connection", "close");
  return head.append("\r\n");
}

}  // namespace sandbox
