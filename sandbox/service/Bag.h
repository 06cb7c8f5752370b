#pragma once

#include <boost/json/object.hpp>
#include <boost/json/value.hpp>
#include <cstdint>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "sandbox/http/Message.h"

namespace sandbox {

// Merges `patch` into `target` as RFC 7386 has it: null removes, objects merge, anything else
// replaces.
void mergePatch(boost::json::value& target, const boost::json::value& patch);

// The configuration that clients fetch: this server's addresses, and whatever control patched over
// it.
//
// The version "echo" answers with the version that the request asks for.
// Threading: any thread.
class Bag final {
 public:
  explicit Bag(std::string baseUrl) : baseUrl_(std::move(baseUrl)) {}

  Reply answer(const Request& request) const;

  void patch(const boost::json::value& patch);
  void reset();

  // What a search answer announces, {"bag": 13}; nothing when the version is not a number.
  std::optional<std::string> announcement() const;

 private:
  boost::json::object _standard(const std::string& country) const;
  boost::json::value _document(const std::string& country) const;

  const std::string baseUrl_;
  mutable std::mutex mutex_;
  std::vector<boost::json::value> patches_;  // in the order they came
  std::string version_ = "12";
};

}  // namespace sandbox
