#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/api/URLSession.h"
#include "zelkord/ZelkorLogging/ZelkorLogging.h"
#include "zelkord/network/NetworkSearchRecords.h"
#include "zelkord/query/ClientState.h"

namespace zelkord {

// How the requests of a kind of query travel.
enum class QueryTransport {
  Plain,      // one task
  Retryable,  // repeated up to three times before the flow's deadline, if it has one
};

enum class QueryRouting { Direct, ThroughProxy };

enum class ExchangeLog { Silent, RequestAndResponse };

// What differs between the kinds of query as a value; what differs in behaviour are the steps
// below.
struct QueryTraits {
  std::string_view name;  // in log lines
  Category category;      // of log lines
  // Of the line about a bag that is disabled, where that differs.
  std::optional<Category> disabledCategory = std::nullopt;
  std::int32_t endpoint = 6;  // as recorded
  QueryTransport transport = QueryTransport::Plain;
  QueryRouting routing = QueryRouting::ThroughProxy;
  ExchangeLog exchangeLog = ExchangeLog::RequestAndResponse;
};

// One query, from its first log line to the reply.
//
//   gates -> request -> start record -> task -> checks of the answer -> end record -> reply
//
// Each step either replies and ends the flow or goes on to the next one; the client is answered
// exactly once. The kinds of query are the subclasses.
//
// Threading: `start` on the client connection's queue, which it may hold for the second that a bag
// may take; the rest on the URL session's delegate queue. Ownership: kept alive by the task under
// way; keeps the state alive. Errors: to the client, as of ClientState.
class QueryFlow : public std::enable_shared_from_this<QueryFlow> {
 public:
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

  QueryFlow(const QueryTraits& traits, std::shared_ptr<ClientState> state,
            std::shared_ptr<const ZLKRequest> request, ReplyCallback reply);

  // Steps, in their order.

  // Whether to send the query; otherwise it has replied.
  virtual bool _passesGates() { return true; }
  virtual void _logDispatch() const {}
  // None: there is no URL for it.
  virtual std::optional<URLRequest> _makeRequest(const ZLKBag* bag,
                                                 const std::optional<UUID>& userGuid) = 0;
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
  virtual void _didParse(const json::value&, const Data&) {}
  virtual void _willReply(const URLResponse&) {}

  NetworkSearchOrigin _origin(std::uint32_t triggerEvent) const;
  void _reply(std::optional<ZLKReply> reply, std::optional<Error> error);
  ZLKReply _makeReply(Data data) const;
  const Logger& _log() const;
  std::string _responseForLog(const URLResult& result) const;

  // Fixed after construction.
  const QueryTraits& traits_;
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
