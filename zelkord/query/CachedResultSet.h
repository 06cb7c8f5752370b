#pragma once

#include <boost/smart_ptr/intrusive_ptr.hpp>
#include <boost/smart_ptr/intrusive_ref_counter.hpp>
#include <cstdint>
#include <memory>
#include <string>

#include "base/Data.h"
#include "base/Json.h"
#include "base/Time.h"
#include "base/UUID.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

// What the result sets of one response share. Immutable.
struct FetchedResponse {
  // `typed` is the text typed when the response was fetched, `request` the one that fetched it,
  // `uuid` the query's identifier, `body` the whole response's, `now` when it arrived, `userGuid`
  // the user identifier of the request.
  FetchedResponse(std::string_view typed, const URLRequest& request, std::string uuid, Data body,
                  SteadyTime now, const UUID& userGuid = {});

  const std::string input;          // lower-cased
  const std::uint32_t inputLength;  // UTF-16 units
  const double uiScale;             // of the request; 0 when it named none
  const std::string uuid;
  const Data data;
  const SteadyTime arrival;
  const UUID userGuid;
};

// One result set of a search response, as the query cache keeps it. Immutable; reference-counted by
// itself, because the cache's tree holds bare pointers.
class CachedResultSet final : public boost::intrusive_ref_counter<CachedResultSet> {
 public:
  using Pointer = boost::intrusive_ptr<const CachedResultSet>;

  // `resultSet` is an entry of the response.
  CachedResultSet(std::shared_ptr<const FetchedResponse> response, const json::object& resultSet);

  float completionScore() const { return completionScore_; }     // 0 when the service gave none
  const std::string& input() const { return response_->input; }  // lower-cased
  std::size_t inputLength() const { return inputLength_; }       // UTF-16 units
  // The completed query, lower-cased; the cache's key.
  const std::string& query() const { return query_; }
  std::size_t queryLength() const { return queryLength_; }  // UTF-16 units
  bool hasExpired(SteadyTime now) const { return expireTime_ <= now; }
  const std::string& uuid() const { return response_->uuid; }
  double uiScale() const { return uiScale_; }  // of the request; 0 when it named none
  const UUID& userGuid() const { return response_->userGuid; }
  const Data& data() const { return response_->data; }
  std::uint64_t cost() const { return data().size(); }  // bytes

 private:
  static constexpr SteadyTime kNever = SteadyTime::max();

  static SteadyTime _expiryOf(const json::object& resultSet, SteadyTime now);

  // What a look-up reads of every entry that begins with its text, side by side.
  float completionScore_;
  std::uint32_t inputLength_;
  std::uint32_t queryLength_;
  SteadyTime expireTime_;
  double uiScale_;

  const std::shared_ptr<const FetchedResponse> response_;
  const std::string query_;
};

}  // namespace zelkord
