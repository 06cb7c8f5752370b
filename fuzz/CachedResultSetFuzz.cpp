// Reads a line as the text typed, then any bytes as the response, caches its sets, and holds what
// the cache finds against a plain search through all of them.

#include <cstdint>
#include <map>
#include <string>
#include <string_view>

#include "base/Check.h"
#include "base/Text.h"
#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/query/CachedResultSet.h"
#include "zelkord/query/QueryCache.h"

namespace zelkord {
namespace {

using Model = std::map<std::string, CachedResultSet::Pointer>;  // by query, in the order of bytes

bool isKept(const CachedResultSet& set) {
  return !set.query().empty() && set.query().find('\0') == std::string::npos &&
         utf16Length(set.input()) <= utf16Length(set.query());
}

// The shortest completion; among those of one length the best score, the first one at a tie.
const CachedResultSet* bestFor(const Model& model, const std::string& text, SteadyTime now) {
  const CachedResultSet* best = nullptr;
  for (const auto& [query, set] : model) {
    if (!query.starts_with(text) || set->hasExpired(now)) continue;
    if (utf16Length(text) < utf16Length(set->input())) continue;
    const auto length = utf16Length(query);
    if (!best || length < utf16Length(best->query())) {
      best = set.get();
    } else if (length == utf16Length(best->query()) && set->completionScore() > 0 &&
               set->completionScore() > best->completionScore()) {
      best = set.get();
    }
  }
  return best;
}

void checkCache(const std::string& typed, const json::array& entries, Data body) {
  FakePlatform fakes;
  Assembly assembly(fakes.platform());
  const auto cache = std::make_shared<QueryCache>(assembly);
  cache->start();
  const auto now = fakes.timeline.now();
  const auto response =
      std::make_shared<const FetchedResponse>(typed, URLRequest(), "uuid", std::move(body), now);
  Model model;
  for (const auto& entry : entries) {
    if (!entry.is_object()) continue;
    const CachedResultSet::Pointer set(new CachedResultSet(response, entry.get_object()));
    cache->set(set);
    if (isKept(*set)) model[set->query()] = set;
  }
  fakes.timeline.runUntilIdle();
  ZK_CHECK(cache->count() == model.size(), "what is fit to be cached is, and nothing else");
  ZLKSearchRequest request;
  request.queryString = typed;
  const auto found = cache->getRequest(request);
  ZK_CHECK(found.get() == bestFor(model, lowercased(typed), now), "the best one is found");
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  const std::string_view input(reinterpret_cast<const char*>(data), size);
  const auto end = input.find('\n');
  if (end == std::string_view::npos || size > 4096) return 0;
  const std::string typed(input.substr(0, end));
  const auto body = input.substr(end + 1);
  const auto response = isValidUtf8(typed) ? parseJson(body) : std::nullopt;
  const auto* entries = response ? response->if_array() : nullptr;
  if (entries) checkCache(typed, *entries, Data(std::string(body)));
  return 0;
}
