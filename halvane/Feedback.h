#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "base/Error.h"
#include "base/Json.h"

namespace zelkor {

// A record of something that happened in a search. Immutable once it is shared.
struct HVFeedback {
  HVFeedback() = default;
  HVFeedback(const HVFeedback&) = default;
  virtual ~HVFeedback() = default;
  virtual std::string_view className() const = 0;

  std::uint64_t timestamp = 0;  // boot-time nanoseconds; 0: set when it is recorded
};

// A request to the service went out.
struct HVStartNetworkSearchFeedback : HVFeedback {
  std::string_view className() const override { return "HVStartNetworkSearchFeedback"; }

  std::string input;
  std::string url;
  std::vector<std::pair<std::string, std::string>> headers;
  std::uint32_t triggerEvent = 0;
  std::int32_t endpoint = 0;
};

// ... and its answer came, or none did.
struct HVEndNetworkSearchFeedback : HVFeedback {
  std::string_view className() const override { return "HVEndNetworkSearchFeedback"; }

  std::shared_ptr<const HVStartNetworkSearchFeedback> startSearch;
  std::int64_t responseSize = 0;  // bytes
  std::int32_t statusCode = 0;
  std::optional<json::object> networkTimingData;
};

struct HVErrorFeedback final : HVFeedback {
  explicit HVErrorFeedback(Error failure) : error(std::move(failure)) {}
  std::string_view className() const override { return "HVErrorFeedback"; }

  Error error;
};

}  // namespace zelkor
