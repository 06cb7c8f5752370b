#pragma once

#include <cstddef>
#include <string>

namespace zelkord {

// What is sent of some feedback, in one piece.
struct FeedbacksToSend {
  std::string text;         // a JSON object
  std::size_t records = 0;  // how many are in it
};

}  // namespace zelkord
