#include "corezelkor/client/internal/BagListener.h"

#include <string>

#include "corezelkor/Constants.h"
#include "corezelkor/client/internal/Wire.h"

namespace zelkor {

void BagListener::listenOn(BusConnection& connection) {
  sd_bus_slot* slot = nullptr;
  sd_bus_add_object(
      connection.bus(), &slot, std::string(kClientObjectPath).c_str(),
      [](sd_bus_message* call, void* self, sd_bus_error*) {
        return static_cast<const BagListener*>(self)->_handle(call);
      },
      this);
  slot_.reset(slot);
}

int BagListener::_handle(sd_bus_message* call) const {
  const std::string interface(kClientInterface);
  if (!sd_bus_message_is_method_call(call, interface.c_str(), "BagDidLoad")) return 0;
  MessageReader reader(call);
  const auto bag = readBag(reader);
  const auto error = readError(reader);
  if (!reader.ok()) {
    return sd_bus_reply_method_errorf(call, SD_BUS_ERROR_INVALID_ARGS, "BagDidLoad: a{sv}a{sv}");
  }
  if (didLoad_) didLoad_(bag, error);
  return sd_bus_reply_method_return(call, nullptr);
}

}  // namespace zelkor
