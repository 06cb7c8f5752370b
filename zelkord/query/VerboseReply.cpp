#include "zelkord/query/VerboseReply.h"

#include <algorithm>

#include "base/Text.h"

namespace zelkord {

void addHTTPExchange(ZLKReply& reply, const URLRequest& request, const URLResponse& response) {
  reply.httpRequest = ZLKHTTPRequest{request.url, request.headers};
  ZLKHTTPResponse shown{response.url, response.status.value_or(0), {}};
  for (const auto& [name, value] : response.headers) {
    const auto same = [wanted = lowercased(name)](const auto& header) {
      return lowercased(header.first) == wanted;
    };
    if (std::any_of(shown.headers.begin(), shown.headers.end(), same)) continue;
    shown.headers.emplace_back(name, response.header(name).value_or(value));
  }
  reply.httpResponse = std::move(shown);
}

}  // namespace zelkord
