#pragma once

#include <boost/json/array.hpp>
#include <boost/json/object.hpp>
#include <string>
#include <string_view>

#include "sandbox/data/Entry.h"

namespace sandbox {

// Writes entries as the JSON of results and cards.
//
// Threading: any thread; nothing changes after construction.
class ResultWriter final {
 public:
  // `baseUrl` is this server's, without a slash at the end.
  explicit ResultWriter(std::string baseUrl) : baseUrl_(std::move(baseUrl)) {}

  const std::string& baseUrl() const { return baseUrl_; }

  // {"id", "type", "title", "description", "text", "score", "icon", "card_url"}
  boost::json::object result(const Entry& entry, double score) const;

  // {"type": "card", "id", "title", "sections": [header, facts]}, with image descriptors at depth.
  boost::json::object card(const Entry& entry) const;

  // {"url"} of the entry's flag, else {"id"} of its kind's picture.
  boost::json::object icon(const Entry& entry) const;

  std::string moreUrl(std::string_view query, std::size_t offset) const;

 private:
  boost::json::array _factRows(const Entry& entry) const;

  const std::string baseUrl_;
};

}  // namespace sandbox
