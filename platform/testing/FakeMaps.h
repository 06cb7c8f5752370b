#pragma once

#include "platform/api/MapsService.h"

namespace zelkord {

// Maps services that a test sets. A reset gives the next of "session-1", "session-2", ...
//
// Threading: set it on the thread that drives the timeline.
class FakeMaps final : public MapsService {
 public:
  std::string country = "US";
  std::optional<std::string> metadata;
  std::optional<std::string> environment;
  std::optional<std::optional<std::string>> session = std::optional<std::string>("session-0");
  int resets = 0;

  std::string countryCode() const override { return country; }
  std::optional<std::string> clientMetadata() const override { return metadata; }
  std::optional<std::string> environmentName() const override { return environment; }
  std::optional<std::optional<std::string>> userSession(bool reset) override {
    if (reset) {
      ++resets;
      if (session && *session) *session = "session-" + std::to_string(resets);
    }
    return session;
  }
};

}  // namespace zelkord
