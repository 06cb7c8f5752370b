#pragma once

#include "halvane/FeedbackRecord.h"
#include "halvane/Vocabulary.h"

namespace zelkor {

// What becomes of the places where people search.

struct HVSearchViewAppearFeedback final : FeedbackRecord<HVSearchViewAppearFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVSearchViewAppearFeedback", 5};

  Term<vocabulary::kViewAppearEvents> triggerEvent;
  bool onLockScreen = false;
  bool isOverApp = false;

  static constexpr auto fields() {
    using T = HVSearchViewAppearFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent),
                      sent(3, "on_lock_screen", &T::onLockScreen),
                      sent(4, "is_over_app", &T::isOverApp)};
  }
};

struct HVSearchViewDisappearFeedback final : FeedbackRecord<HVSearchViewDisappearFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVSearchViewDisappearFeedback", 6};

  Term<vocabulary::kViewDisappearEvents> triggerEvent;

  static constexpr auto fields() {
    return std::tuple{sent(2, "trigger_event", &HVSearchViewDisappearFeedback::triggerEvent)};
  }
};

struct HVCardViewDisappearFeedback final : FeedbackRecord<HVCardViewDisappearFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVCardViewDisappearFeedback", 13};

  Term<vocabulary::kCardViewDisappearEvents> triggerEvent;

  static constexpr auto fields() {
    return std::tuple{sent(2, "trigger_event", &HVCardViewDisappearFeedback::triggerEvent)};
  }
};

struct HVClearInputFeedback final : FeedbackRecord<HVClearInputFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVClearInputFeedback", 24};

  Term<vocabulary::kClearInputEvents> triggerEvent;

  static constexpr auto fields() {
    return std::tuple{sent(2, "trigger_event", &HVClearInputFeedback::triggerEvent)};
  }
};

}  // namespace zelkor
