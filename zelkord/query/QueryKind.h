#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string_view>

#include "base/Error.h"
#include "base/UUID.h"
#include "corezelkor/ZLKBag.h"
#include "corezelkor/internal/RequestKinds.h"
#include "platform/api/URLRequest.h"
#include "zelkord/ZelkorLogging/Tracing.h"
#include "zelkord/ZelkorLogging/ZelkorLogging.h"
#include "zelkord/network/context/FieldMask.h"

namespace zelkord {

class ClientState;
class ZLKNetworkRequestFactory;

using ReplyCallback = std::function<void(std::int64_t queryId, std::optional<ZLKReply> reply,
                                         std::optional<Error> error)>;

// How the requests of a kind of query travel.
enum class QueryTransport {
  Plain,      // one task
  Retryable,  // repeated up to three times before the flow's deadline, if it has one
};

enum class QueryRouting { Direct, ThroughProxy };

enum class ExchangeLog { Silent, RequestAndResponse };

struct TracePair {
  TraceCode start;
  TraceCode end;
};

// What a request to the service is made from.
struct RequestParts {
  ZLKNetworkRequestFactory& factory;
  const ZLKRequest& query;  // of the kind's class
  const ZLKBag* bag;
  const std::optional<UUID>& userGuid;
  FieldMask fieldMask;
};

// What differs between the kinds of query as a value. What differs in behaviour are the steps of
// its flow.
struct QueryKind {
  const RequestKind& message;  // its name and its fields
  // Begins a query, which is answered once.
  void (*start)(const QueryKind& kind, std::shared_ptr<ClientState> state,
                std::shared_ptr<const ZLKRequest> request, ReplyCallback reply);
  bool goesStale = false;     // of no use once the client has sent a newer one
  bool isAtEndpoint = false;  // asked through the endpoint, too
  std::optional<TracePair> trace;

  // Of a kind that asks the service. Without a URL to ask there is no request.
  std::optional<URLRequest> (*makeRequest)(const RequestParts& parts);
  std::string_view logName;  // in log lines
  Category category;         // of log lines
  // Of the line about a bag that is disabled, where that differs.
  std::optional<Category> disabledCategory;
  std::int32_t endpoint = 6;  // as recorded
  QueryTransport transport = QueryTransport::Plain;
  QueryRouting routing = QueryRouting::ThroughProxy;
  ExchangeLog exchangeLog = ExchangeLog::RequestAndResponse;
};

// The kind of a request, whose class is one of those that messages have.
const QueryKind& queryKindOf(const ZLKRequest& request);

}  // namespace zelkord
