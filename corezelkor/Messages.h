#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "base/Data.h"
#include "base/Export.h"
#include "base/Namespace.h"

namespace zelkor {

// What a client says of itself.
struct ZK_EXPORT ZLKSessionConfiguration {
  std::string identifier;  // such as "lanthe"
  std::string userAgent;

  // Compact JSON.
  std::string description() const;
};

using QueryItem = std::pair<std::string, std::string>;

// One query. The classes below say which; immutable once it is shared.
struct ZK_EXPORT ZLKRequest {
  ZLKRequest() = default;
  ZLKRequest(const ZLKRequest&) = default;
  virtual ~ZLKRequest() = default;

  std::int64_t queryId = 0;         // grows with every keystroke of one client
  std::uint64_t clientQueryId = 0;  // the client's own number for the query
  std::string queryString;          // UTF-8
  std::uint32_t triggerEvent = 0;   // 0 to 19
  std::vector<QueryItem> queryItems;
  std::string keyboardInputMode;
  double scale = 0;    // of the display; 0: not given
  std::string topics;  // JSON text; empty: none
  std::string uuid;
  bool verboseReply = false;
};

struct ZK_EXPORT ZLKSearchRequest final : ZLKRequest {};
struct ZK_EXPORT ZLKMoreResultsRequest final : ZLKRequest {
  std::string moreResultsURL;  // empty: the bag's
};
struct ZK_EXPORT ZLKCardRequest final : ZLKRequest {
  std::string cardURL;  // empty: the bag's
};
struct ZK_EXPORT ZLKZeroKeywordRequest final : ZLKRequest {};
struct ZK_EXPORT ZLKLookupRequest final : ZLKRequest {
  std::string appBundleId;
  std::string domain;
  std::uint32_t lookupSelectionType = 0;  // 1 explicit, 2 hint
  std::string queryContext;
};
struct ZK_EXPORT ZLKFlightLookupRequest final : ZLKRequest {};
struct ZK_EXPORT ZLKFlightSearchRequest final : ZLKRequest {};

using HeaderFields = std::vector<std::pair<std::string, std::string>>;

// The request as it was built, and the final response, for clients that asked for a verbose reply.
struct ZK_EXPORT ZLKHTTPRequest {
  std::string url;
  HeaderFields headers;
};
struct ZK_EXPORT ZLKHTTPResponse {
  std::string url;
  std::int32_t status = 0;
  HeaderFields headers;  // repeated ones joined by ", "
};

struct ZK_EXPORT ZLKReply {
  double scale = 0;
  Data data;  // the service's JSON, byte for byte unless results of a lookup were dropped
  std::optional<std::string> geoSessionEntityString;
  std::optional<ZLKHTTPRequest> httpRequest;
  std::optional<ZLKHTTPResponse> httpResponse;
};

}  // namespace zelkor
