#pragma once

#include <boost/smart_ptr/intrusive_ptr.hpp>
#include <boost/smart_ptr/intrusive_ref_counter.hpp>
#include <cstdint>
#include <optional>
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
  const std::string& query() const {
    return query_;
  }  // completed query, lower-cased; the cache's key
  std::size_t queryLength() const { return queryLength_; }              // UTF-16 units
  std::optional<SteadyTime> expireTime() const { return expireTime_; }  // none: never
  const std::string& uuid() const { return uuid_; }
  double uiScale() const { return uiScale_; }  // of the request; 0 when it named none
  const Data& data() const { return data_; }
  std::uint64_t cost() const { return data_.size(); }  // bytes

 private:
  float completionScore_;
  std::string input_;
  std::size_t inputLength_;
  std::string query_;
  std::size_t queryLength_;
  std::optional<SteadyTime> expireTime_;
  std::string uuid_;
  double uiScale_ = 0;
  Data data_;
};

}  // namespace zelkord
