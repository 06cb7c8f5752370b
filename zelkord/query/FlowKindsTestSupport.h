#pragma once

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "zelkord/query/QueryTestSupport.h"

namespace zelkord {

using Answered = std::shared_ptr<QueryBed::Answer>;
using LogLines = std::vector<std::string>;  // "level category text"

// One kind of query: how it is asked, and everything in which the kinds differ.
struct FlowKind {
  std::string_view name;
  std::function<Answered(QueryBed& bed, ClientState& state, bool verbose)> ask;
  const char* category;  // of its log lines

  const char* startClass = "HVStartNetworkSearchFeedback";
  const char* input = "";
  std::uint32_t trigger = 5;
  std::int32_t endpoint = 6;

  bool gated = false;           // by the bag; else it goes out without one
  const char* strict = "";      // takes a list with status 200 only; its name in the log
  bool masked = false;          // for user agents that want no location sent
  bool routed = true;           // through the proxy
  bool performsSearch = false;  // tells that the user has searched
  int requests = 1;             // while the network fails

  LogLines sent = {};      // logged until the request is out; "*" stands for the category
  LogLines answered = {};  // logged when an answer comes
  const char* noBag = "";
  const char* disabled = "";

  bool isStrict() const { return *strict != '\0'; }
  bool isSearch() const { return name == "search"; }
};

// All of them; each asks for "snow", query 7 of the daemon and 70 of the client, trigger event 5,
// scale 2.
const std::vector<FlowKind>& flowKinds();

// A bag under which all kinds go out.
inline constexpr const char* kFlowBag = R"({"version":"1","search_url":"https://s.example/s",
    "more_results_url":"https://m.example/bag","card_url":"https://c.example/card",
    "warm_url":"https://s.example/w","search_render_timeout":2000})";

// One query of a kind, asked of a bed of its own.
class AskedQuery {
 public:
  explicit AskedQuery(const FlowKind& kind, const char* bag = kFlowBag);

  AskedQuery& ask(bool verbose = false);
  FakeURLTask& task() { return *bed.urlSession().tasks().back(); }
  void finish(URLResult result);
  void succeed(int status, std::string body, HTTPHeaders headers = {});

  // What the flows have logged since the last call.
  LogLines takeLog();
  // Lines of the kind's category.
  LogLines own(LogLines lines) const;
  std::string error(const std::string& text) const;
  std::int64_t clientCounter(const std::string& suffix);
  // The record at that place.
  template <typename Feedback>
  const Feedback& record(std::size_t index) {
    return dynamic_cast<const Feedback&>(*bed.records().at(index).feedback);
  }

  QueryBed bed;
  std::shared_ptr<ClientState> state;
  Answered answer;

 private:
  const FlowKind& kind_;
};

}  // namespace zelkord
