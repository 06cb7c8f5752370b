#pragma once

#include <memory>
#include <optional>

#include "platform/api/Log.h"
#include "platform/api/URLSession.h"
#include "zelkord/query/ClientState.h"

namespace zelkord {

// One search, from the gates to the reply.
//
//   gates (bag, enabled, length) -> cache -> request -> answer -> reply
//
// Each step either replies and ends the flow or goes on to the next one; the client is answered
// exactly once.
//
// Threading: `start` on the client connection's queue, which it may hold for the second that a bag
// may take; the rest on the URL session's delegate queue. Ownership: kept alive by the task under
// way; keeps the state alive.
class SearchFlow final : public std::enable_shared_from_this<SearchFlow> {
 public:
  SearchFlow(std::shared_ptr<ClientState> state, std::shared_ptr<const ZLKSearchRequest> request,
             ReplyCallback reply);

  void start();

 private:
  // Why a query is not sent; the numbers are recorded.
  enum class SkipReason : std::uint32_t { TooShort = 1, BagDisabled = 2, NoBag = 3 };

  bool _passesGates();
  bool _answersFromCache();
  void _send();
  void _sendRequest(const URLRequest& request);
  void _finish(const std::shared_ptr<URLTask>& task, const URLResult& result);
  void _fail(const URLTask& task, const URLResult& result, Error error);
  void _accept(const std::shared_ptr<URLTask>& task, const URLResult& result);
  void _cacheResponse(const json::value& rawResponse, const Data& data);
  void _forceFetchBag(const URLResponse& response);
  void _skip(SkipReason reason);
  ZLKReply _makeReply(Data data) const;
  void _reply(std::optional<ZLKReply> reply, std::optional<Error> error);
  const Logger& _log() const;

  // Fixed after construction.
  Assembly& assembly_;
  const std::shared_ptr<ClientState> state_;
  const std::shared_ptr<const ZLKSearchRequest> request_;
  const ReplyCallback reply_;

  // Set before the task begins, read by its completion.
  URLRequest httpRequest_;
  std::shared_ptr<const HVStartNetworkSearchFeedback> start_;
};

}  // namespace zelkord
