#include "sandbox/search/ResultSet.h"

#include <cstdint>
#include <cstdio>

namespace sandbox {

namespace json = boost::json;

namespace {

// A short token that stands for the query when feedback refers to it: FNV-1a of its bytes.
std::string feedbackToken(std::string_view query) {
  std::uint64_t hash = 0xcbf29ce484222325;
  for (const char c : query) hash = (hash ^ static_cast<unsigned char>(c)) * 0x100000001b3;
  char text[24];
  std::snprintf(text, sizeof text, "fb-%016llx", static_cast<unsigned long long>(hash));
  return text;
}

}  // namespace

json::object resultSet(const ResultSetHead& head, json::array results) {
  json::object set;
  set["status"] = "OK";
  set["query"] = head.query;
  set["completion_score"] = head.completionScore;
  set["max_age"] = head.maxAge.count();
  set["fbq"] = feedbackToken(head.query);
  set["partial_client_ip"] = "127.0.0.0";
  set["results"] = std::move(results);
  return set;
}

json::array resultsOf(SuggestionIndex& index, const ResultWriter& writer,
                      const std::vector<Match>& matches) {
  json::array results;
  for (const Match& match : matches) {
    const auto entry = index.entry(match.entry);
    if (!entry) continue;
    json::object result = writer.result(*entry, scoreOfWeight(match.weight));
    if (results.empty()) result["inline_card"] = writer.card(*entry);
    results.push_back(std::move(result));
  }
  return results;
}

void stampDuration(json::array& sets, std::chrono::steady_clock::time_point start) {
  const std::chrono::duration<double, std::milli> elapsed =
      std::chrono::steady_clock::now() - start;
  for (auto& set : sets) set.get_object()["duration"] = elapsed.count();
}

}  // namespace sandbox
