#pragma once

#include <functional>
#include <optional>

#include "corezelkor/client/ClientTypes.h"
#include "corezelkor/client/internal/BusConnection.h"

namespace zelkor {

// Serves the object that the daemon tells about the bag.
//
// Threading: the client's thread. Ownership: `didLoad` outlives it.
// Errors: a call that is not as the interface says is answered with a D-Bus error and not passed
// on.
class BagListener {
 public:
  using DidLoad = std::function<void(const std::optional<ClientBag>&, const std::optional<Error>&)>;

  explicit BagListener(const DidLoad& didLoad) : didLoad_(didLoad) {}

  // From now on serves on this connection instead of the one before.
  void listenOn(BusConnection& connection);
  void stop() { slot_.reset(); }

 private:
  int _handle(sd_bus_message* call) const;

  const DidLoad& didLoad_;
  SlotPointer slot_;
};

}  // namespace zelkor
