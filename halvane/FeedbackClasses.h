#pragma once

#include <memory>
#include <span>
#include <string_view>

#include "halvane/Feedback.h"
#include "halvane/FeedbackDescription.h"
#include "halvane/RecordReader.h"

namespace zelkor {

// A class of feedback by its name, such as "HVErrorFeedback", "CZErrorFeedback" (its message) or
// "ZLKCacheHitFeedback".
struct FeedbackClass {
  std::string_view name;
  FeedbackFamily family = FeedbackFamily::Model;
  FeedbackOrigin origin = FeedbackOrigin::Client;
  std::unique_ptr<HVFeedback> (*make)() = nullptr;
};

// Every class, by name.
std::span<const FeedbackClass> feedbackClasses();

// Null for a name that no class has. The message of two classes, the ends of network searches, is
// the clients'.
const FeedbackClass* feedbackClassNamed(std::string_view name);

// The record of that class that `message` holds. Null when it is not one; `fault` then says why.
std::unique_ptr<HVFeedback> readFeedback(const FeedbackClass& feedbackClass,
                                         std::string_view message, RecordFault& fault);

}  // namespace zelkor
