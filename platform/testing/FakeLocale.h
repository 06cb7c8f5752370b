#pragma once

#include "platform/api/LocaleService.h"

namespace zelkord {

// A locale that a test sets. It announces nothing by itself: the test posts the change.
//
// Threading: set it on the thread that drives the timeline.
class FakeLocale final : public LocaleService {
 public:
  LocaleSnapshot snapshot = {"en_US",      "gregorian", "U.S.",    "h a",
                             "Fahrenheit", "",          {"en-US"}, "en"};
  std::string zone = "America/New_York";

  LocaleSnapshot current() const override { return snapshot; }
  std::string timeZoneName() const override { return zone; }
};

}  // namespace zelkord
