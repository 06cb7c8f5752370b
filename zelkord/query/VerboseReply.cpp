#include "zelkord/query/VerboseReply.h"

#include <map>

#include "base/Text.h"

namespace zelkord {
namespace {

// Each name once, as it came first, with all its values.
HTTPHeaders joined(const HTTPHeaders& headers) {
  HTTPHeaders result;
  std::map<std::string, std::size_t> places;  // by lower-case name
  for (const auto& [name, value] : headers) {
    const auto [place, isNew] = places.try_emplace(lowercased(name), result.size());
    if (isNew) {
      result.emplace_back(name, value);
    } else {
      result[place->second].second.append(", ").append(value);
    }
  }
  return result;
}

}  // namespace

void addHTTPExchange(ZLKReply& reply, const URLRequest& request, const URLResponse& response) {
  reply.httpRequest = ZLKHTTPRequest{request.url, request.headers};
  reply.httpResponse =
      ZLKHTTPResponse{response.url, response.status.value_or(0), joined(response.headers)};
}

}  // namespace zelkord
