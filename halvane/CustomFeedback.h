#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>

#include "halvane/FeedbackRecord.h"
#include "halvane/Vocabulary.h"

namespace zelkor {

// Feedback whose form is the client's own.
struct HVCustomFeedback final : FeedbackRecord<HVCustomFeedback> {
  // Its type and its rule are those of its custom type.
  static constexpr FeedbackDescription kDescription = {"HVCustomFeedback", kGenericFeedbackType};
  static constexpr std::int32_t kBrelinAutofill = 1;
  static constexpr std::int32_t kCrowdsourcing = 2;
  static constexpr std::int32_t kLantheResultFeatures = 3;

  std::uint32_t type() const override {
    ZK_CHECK(feedbackType.isKnown(), "custom type out of range");
    return kTypes[static_cast<std::size_t>(feedbackType.value)];
  }
  bool requiresQueryId() const override { return feedbackType.value != kLantheResultFeatures; }

  Term<vocabulary::kCustomTypes> feedbackType;
  std::string jsonFeedback;  // a JSON object, sent as it is

  static constexpr auto fields() {
    using T = HVCustomFeedback;
    return std::tuple{stored(2, "feedback_type", &T::feedbackType),
                      stored(3, "json_feedback", &T::jsonFeedback)};
  }

 private:
  static constexpr std::array<std::uint32_t, 4> kTypes = {17, 19, 18, 20};  // by custom type
};

}  // namespace zelkor
