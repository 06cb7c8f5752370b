#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/api/URLSession.h"
#include "zelkord/network/exchange/NetworkSearchRecords.h"
#include "zelkord/query/ClientState.h"
#include "zelkord/query/QueryKind.h"

namespace zelkord {

// One query, from its first log line to the reply.
//
//   gates -> request -> start record -> task -> checks of the answer -> end record -> reply
//
// Each step either replies and ends the flow or goes on to the next one; the client is answered
// exactly once. A kind of query is its row (QueryKind) and the steps that its subclass overrides.
//
// Threading: `start` on the client connection's queue, which it may hold for the second that a bag
// may take; the rest on the URL session's delegate queue. Ownership: kept alive by the task under
// way; keeps the state alive. Errors: to the client, as of ClientState.
class QueryFlow : public std::enable_shared_from_this<QueryFlow> {
 public:
  QueryFlow(const QueryKind& kind, std::shared_ptr<ClientState> state,
            std::shared_ptr<const ZLKRequest> request, ReplyCallback reply);
  virtual ~QueryFlow() = default;
  QueryFlow(const QueryFlow&) = delete;
  QueryFlow& operator=(const QueryFlow&) = delete;

  void start();

 protected:
  // Why an answer is of no use. Without an error the client gets neither reply nor error.
  struct Refusal {
    std::optional<Error> error;
  };
  // A body that came, and what it parsed to.
  struct Body {
    Data data;
    std::optional<json::value> parsed;  // none: not JSON
    std::string problem;                // why not; one line
  };

  // Steps, in their order.

  // Whether to send the query; otherwise it has replied.
  virtual bool _passesGates() { return true; }
  virtual void _logDispatch() const {}
  // The text that the records show as the query's.
  virtual std::string _input() const { return {}; }
  virtual std::shared_ptr<const HVFeedback> _makeStart(const URLRequest& request) const;
  // No attempt begins after it.
  virtual std::optional<SteadyTime> _deadline(const ZLKBag*) const { return std::nullopt; }
  virtual void _didSend() {}
  virtual void _logAnswer() const {}
  // Both log the refusal.
  virtual std::optional<Refusal> _refusalOfAnswer(const URLResult& result) const = 0;
  virtual std::optional<Refusal> _refusalOfBody(const Body&) const { return std::nullopt; }
  // Before anything is made of the body: what is changed here, the client gets changed.
  virtual void _filter(Body&) const {}
  virtual void _didParse(const json::value&, const Data&) {}
  virtual void _willReply(const URLResponse&) {}

  // The request as its own class, which is the kind's.
  template <typename Request>
  const Request& _as() const {
    return static_cast<const Request&>(*request_);
  }
  NetworkSearchOrigin _origin(std::uint32_t triggerEvent) const;
  void _reply(std::optional<ZLKReply> reply, std::optional<Error> error);
  ZLKReply _makeReply(Data data) const;
  const Logger& _log() const;
  std::string _responseForLog(const URLResult& result) const;

  // Fixed after construction.
  const QueryKind& kind_;
  const std::shared_ptr<ClientState> state_;
  const std::shared_ptr<const ZLKRequest> request_;
  Assembly& assembly_;

  // Set before the task begins, read by its completion.
  std::optional<UUID> userGuid_;  // under which it asks
  URLRequest httpRequest_;

 private:
  void _send();
  void _logRequest() const;
  std::shared_ptr<URLTask> _makeTask(const ZLKBag* bag);
  void _finish(const std::shared_ptr<URLTask>& task, const URLResult& result);
  void _accept(const std::shared_ptr<URLTask>& task, const URLResult& result);
  void _use(const json::value& rawResponse, const Data& data);
  void _fail(const URLTask& task, const URLResult& result, const Refusal& refusal);

  // Fixed after construction.
  const ReplyCallback reply_;
};

}  // namespace zelkord
