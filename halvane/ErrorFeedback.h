#pragma once

#include <optional>
#include <utility>

#include "halvane/FeedbackRecord.h"
#include "halvane/Results.h"

namespace zelkor {

struct HVErrorFeedback final : FeedbackRecord<HVErrorFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVErrorFeedback", 11};

  HVErrorFeedback() = default;
  explicit HVErrorFeedback(HVError failure) : error(std::move(failure)) {}

  std::optional<HVError> error;
  std::optional<HVError> underlyingError;

  static constexpr auto fields() {
    using T = HVErrorFeedback;
    return std::tuple{sent(2, "error", &T::error),
                      sent(3, "underlying_error", &T::underlyingError)};
  }
};

}  // namespace zelkor
