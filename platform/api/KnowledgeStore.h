#pragma once

#include <string>

#include "base/Namespace.h"
#include "base/Time.h"

namespace zelkord {

// Something that a user did with something, for whoever makes suggestions on this host.
struct DonatedInteraction {
  std::string domain;      // who says so, such as "Brelin"
  std::string verb;        // what was done
  std::string parameters;  // a JSON object
  WallTime time;

  friend bool operator==(const DonatedInteraction&, const DonatedInteraction&) = default;
};

// What this host knows of its user's habits; the daemon is one of those who tell.
// Threading: any thread; never waits. Errors: what cannot be kept is dropped.
class KnowledgeStore {
 public:
  virtual ~KnowledgeStore() = default;
  virtual void donate(DonatedInteraction interaction) = 0;
};

}  // namespace zelkord
