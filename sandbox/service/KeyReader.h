#pragma once

#include <boost/json/object.hpp>
#include <cstdint>
#include <functional>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "sandbox/http/Message.h"

namespace sandbox {

// Reads the keys of a control request's object; the first wrong one is remembered. One that nobody
// asks for is wrong too, so that a slip of the pen does not pass for a request.
//
// Threading: one thread. Ownership: borrows the object.
class KeyReader final {
 public:
  explicit KeyReader(const boost::json::object& object) : object_(object) {}

  // A value above `most` is wrong.
  std::uint64_t number(std::string_view key, std::uint64_t otherwise, std::uint64_t most);
  std::optional<std::string> text(std::string_view key);
  // An array of texts; empty when there is none.
  std::vector<std::string> texts(std::string_view key);
  // An object of texts.
  Headers headers(std::string_view key);

  bool has(std::string_view key) const { return object_.contains(key); }
  void fail(std::string_view key);
  // After all reading: the key that is wrong, empty when there is none.
  const std::string& finish();

 private:
  const boost::json::value* _value(std::string_view key);

  const boost::json::object& object_;
  std::set<std::string, std::less<>> asked_;
  std::string wrong_;
};

}  // namespace sandbox
