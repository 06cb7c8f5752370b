#pragma once

#include "platform/api/Interprocess.h"

namespace zelkord {

// What the daemon serves, as the transport needs it: methods with their signatures. The meaning of
// each is in corezelkor/dbus/com.quenta.zelkord.xml.
ipc::Interface daemonInterface();
ipc::Interface diagnosticsInterface();
ipc::Interface endpointInterface();

}  // namespace zelkord
