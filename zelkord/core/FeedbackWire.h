#pragma once

#include <memory>
#include <string_view>

#include "halvane/Feedback.h"
#include "zelkord/core/Wire.h"

namespace zelkord {

// Feedback as clients report it. Only classes that are the clients' own are taken.
using MutableFeedback = std::shared_ptr<HVFeedback>;

// The message of a class by its name, such as "HVErrorFeedback" or "CZErrorFeedback".
Decoded<MutableFeedback> decodeFeedback(std::string_view feedbackClass, std::string_view message);

// A serialised CZFeedbackPayload, which names the class itself.
Decoded<MutableFeedback> decodeFeedbackPayload(std::string_view payload);

}  // namespace zelkord
