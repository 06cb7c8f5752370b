#pragma once

#include <optional>
#include <string>

#include "base/Namespace.h"

namespace zelkord {

// Maps services: country configuration, client metadata, the user session.
// Answers from memory, on any thread; a change is announced in the notification centre.
class MapsService {
 public:
  virtual ~MapsService() = default;
  virtual std::string countryCode() const = 0;  // "DE"; changes: kCountryCodeChanged
  virtual std::optional<std::string> clientMetadata()
      const = 0;  // base64; changes: kMapsClientMetadataInvalidated
  virtual std::optional<std::string> environmentName() const = 0;
  // The session entity's identifier, shared with maps; a reset replaces it first. The outer
  // optional: there is an entity; the inner one: it carries a session identifier.
  virtual std::optional<std::optional<std::string>> userSession(bool reset) = 0;
};

}  // namespace zelkord
