#include "zelkord/core/ServiceInterfaces.h"

#include "corezelkor/Constants.h"

namespace zelkord {

ipc::Interface daemonInterface() {
  return {std::string(kDaemonInterface),
          {
              {"Configure", "a{sv}", "s"},
              {"Bag", "", "a{sv}a{sv}"},
              {"Request", "sa{sv}", "xa{sv}a{sv}"},
              {"ReportEvent", "sxsay", "", true},
              {"ReportEventData", "sxay", "", true},
              {"Feedback", "s", "asa{sv}"},
              {"ListSessions", "", "aa{ss}"},
          },
          {{"Invalidated", ""}}};
}

ipc::Interface diagnosticsInterface() {
  return {std::string(kDiagnosticsInterface),
          {
              {"Status", "", "s"},
              {"Metrics", "", "a{sx}"},
              {"ReadDefault", "ss", "s"},
              {"WriteDefault", "sss", ""},
          },
          {}};
}

ipc::Interface endpointInterface() {
  return {std::string(kEndpointInterface),
          {
              {"Request", "sa{sv}a{sv}", "xa{sv}a{sv}"},
              {"LoadImages", "aa{sv}t", "a{say}"},
          },
          {}};
}

}  // namespace zelkord
