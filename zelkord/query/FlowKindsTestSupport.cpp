#include "zelkord/query/FlowKindsTestSupport.h"

#include <set>
#include <utility>

namespace zelkord {
namespace {

template <typename Request>
auto asking(Request request = {}) {
  request.queryId = 7;
  request.clientQueryId = 70;
  request.queryString = "snow";
  request.uuid = "uuid of snow";
  request.triggerEvent = 5;
  request.scale = 2;
  return [request](QueryBed& bed, ClientState& state, bool verbose) {
    auto asked = request;
    asked.verboseReply = verbose;
    return bed.ask(state, std::move(asked));
  };
}

ZLKMoreResultsRequest moreResultsAt(const char* url) {
  ZLKMoreResultsRequest request;
  request.moreResultsURL = url;
  return request;
}

ZLKCardRequest cardAt(const char* url) {
  ZLKCardRequest request;
  request.cardURL = url;
  return request;
}

constexpr const char* kSearchRequest =
    "debug * request: https://s.example/s?<private> header: <private>";
constexpr const char* kSearchResponse =
    R"(debug * resp: {"url":"https://s.example/s?<private>","status":200})";

}  // namespace

const std::vector<FlowKind>& flowKinds() {
  static const std::vector<FlowKind> kKinds = {
      {.name = "search",
       .ask = asking<ZLKSearchRequest>(),
       .category = "Zelkor_Search",
       .input = "snow",
       .gated = true,
       .masked = true,
       .performsSearch = true,
       .sent = {"default * session lanthe performing query[7] <private>, reply (callback)",
                "debug * Dispatching network request for (id, query): (7, <private>)",
                kSearchRequest},
       .answered = {"default * Got network response for (id, query): (7, <private>)",
                    kSearchResponse},
       .noBag = "error Zelkor_Search Bag fetch failed, can't complete non-cached query <private>.",
       .disabled = "debug Zelkor_Search no search, bag disabled"},
      {.name = "zero keyword",
       .ask = asking<ZLKZeroKeywordRequest>(),
       .category = "Zelkor_ZeroKeyword",
       .gated = true,
       .masked = true,
       .routed = false,
       .sent = {"default * session lanthe performing zkw query, reply (callback)",
                "debug * Dispatching network request for zkw query", kSearchRequest},
       .answered = {"default * Got network response for zkw query", kSearchResponse},
       .noBag = "error Zelkor_ZeroKeyword Bag fetch failed, can't complete non-cached zkw query.",
       .disabled = "debug Zelkor_Search no zkw, bag disabled"},
      {.name = "more results",
       .ask = asking(moreResultsAt("https://m.example/more?page=2&q=snow%20man&q=late")),
       .category = "Zelkor_MoreResults",
       .input = "snow man",
       .strict = "More results",
       .masked = true,
       .sent = {"debug * request: https://m.example/more?<private> header: <private>"},
       .answered = {R"(debug * resp: {"url":"https://m.example/more?<private>","status":200})"}},
      {.name = "card",
       .ask = asking(cardAt("https://c.example/own?q=snow")),
       .category = "Zelkor_Card",
       .endpoint = 11,
       .strict = "Card"},
      {.name = "lookup",
       .ask = asking<ZLKLookupRequest>(),
       .category = "Zelkor_LookUp",
       .startClass = "ZLKLookupStartNetworkSearchFeedback",
       .input = "snow",
       .trigger = 11,
       .gated = true,
       .performsSearch = true,
       .requests = 4,
       .sent = {"default * session lanthe performing lookup query, reply (callback)",
                "debug * Dispatching network request for lookup query", kSearchRequest},
       .answered = {"default * Got network response for lookup query", kSearchResponse},
       .noBag = "error Zelkor_LookUp Bag fetch failed, can't complete non-cached lookup query.",
       .disabled = "debug Zelkor_LookUp no lookup, bag disabled"},
  };
  return kKinds;
}

AskedQuery::AskedQuery(const FlowKind& kind, const char* bag) : kind_(kind) {
  if (bag) bed.installBag(bag);
  state = bed.makeState();
  bed.fakes.log.clear();
}

AskedQuery& AskedQuery::ask(bool verbose) {
  answer = kind_.ask(bed, *state, verbose);
  return *this;
}

void AskedQuery::finish(URLResult result) {
  task().finish(std::move(result));
  bed.fakes.timeline.runUntilIdle();
}

void AskedQuery::succeed(int status, std::string body, HTTPHeaders headers) {
  task().succeed(status, std::move(body), std::move(headers));
  bed.fakes.timeline.runUntilIdle();
}

LogLines AskedQuery::takeLog() {
  constexpr const char* kLevels[] = {"debug ", "info ", "default ", "error ", "fault "};
  const std::set<std::string> categories = {"Zelkor_Search", "Zelkor_ZeroKeyword",
                                            "Zelkor_MoreResults", "Zelkor_Card", "Zelkor_LookUp"};
  LogLines lines;
  for (const auto& [level, category, text] : bed.fakes.log.entries()) {
    if (!categories.count(category)) continue;
    lines.push_back(kLevels[static_cast<int>(level)] + category + " " + text);
  }
  bed.fakes.log.clear();
  return lines;
}

LogLines AskedQuery::own(LogLines lines) const {
  for (auto& line : lines) line.replace(line.find('*'), 1, kind_.category);
  return lines;
}

std::string AskedQuery::error(const std::string& text) const {
  return std::string("error ") + kind_.category + " " + text;
}

std::int64_t AskedQuery::clientCounter(const std::string& suffix) {
  return bed.counter("com.quenta.zelkord.lanthe." + suffix);
}

}  // namespace zelkord
