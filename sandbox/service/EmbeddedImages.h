#pragma once

#include <boost/json/value.hpp>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "sandbox/core/Outcome.h"
#include "sandbox/http/Message.h"

namespace sandbox {

// Image descriptors that control adds to the answers, any number of them, anywhere in their depth.
//
// Threading: any thread. Errors: what is no list of objects is left as it is.
class EmbeddedImages final {
 public:
  // From the object of a control request; the failure says which key is wrong.
  std::optional<Failure> set(const boost::json::value& value);
  void clear();

  // Puts them under "embedded_images" into the first object of the answer's list, and keeps caches
  // from holding it.
  void addTo(Reply& reply) const;

 private:
  mutable std::mutex mutex_;
  std::shared_ptr<const std::string>
      member_;  // `"embedded_images":VALUE,`; none when not asked for
};

}  // namespace sandbox
