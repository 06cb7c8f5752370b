#pragma once

#include <boost/smart_ptr/intrusive_ptr.hpp>
#include <boost/smart_ptr/intrusive_ref_counter.hpp>
#include <cstdint>
#include <string>

#include "base/Data.h"
#include "base/Json.h"
#include "base/Time.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

// One result set of a search response, as the query cache keeps it. Immutable; reference-counted by
// itself, because the cache's tree holds bare pointers.
class CachedResultSet final : public boost::intrusive_ref_counter<CachedResultSet> {
 public:
  using Pointer = boost::intrusive_ptr<const CachedResultSet>;

  // `input` is the text typed when the response was fetched, `request` the one that fetched it,
  // `resultSet` the entry of the response, `uuid` the query's identifier and `data` the whole
  // response's body. `now` is when it arrived.
  CachedResultSet(std::string_view input, const URLRequest& request, const json::object& resultSet,
                  std::string uuid, Data data, SteadyTime now);

  float completionScore() const { return completionScore_; }  // 0 when the service gave none
  const std::string& input() const { return input_; }         // lower-cased
  std::size_t inputLength() const { return inputLength_; }    // UTF-16 units
  // The completed query, lower-cased; the cache's key.
  const std::string& query() const { return query_; }
  std::size_t queryLength() const { return queryLength_; }  // UTF-16 units
  bool hasExpired(SteadyTime now) const { return expireTime_ <= now; }
  const std::string& uuid() const { return uuid_; }
  double uiScale() const { return uiScale_; }  // of the request; 0 when it named none
  const Data& data() const { return data_; }
  std::uint64_t cost() const { return data_.size(); }  // bytes

 private:
  static constexpr SteadyTime kNever = SteadyTime::max();

  static SteadyTime _expiryOf(const json::object& resultSet, SteadyTime now);

  // What a look-up reads of every entry that begins with its text, side by side.
  float completionScore_;
  std::uint32_t inputLength_;
  std::uint32_t queryLength_;
  SteadyTime expireTime_;
  double uiScale_;

  std::string input_;
  std::string query_;
  std::string uuid_;
  Data data_;
};

}  // namespace zelkord
