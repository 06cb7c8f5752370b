#include "zelkord/network/exchange/ErrorFeedback.h"

#include "halvane/ModelFeedback.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/encoding/ErrorEncoding.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/feedback/UserGUIDSource.h"

namespace zelkord {

void reportErrorAsZelkordFeedback(const Error& error, Assembly& assembly) {
  auto* manager = assembly.clientSessionManager();
  auto* guid = assembly.guidController();
  if (!manager || !guid) return;
  manager->addZelkorFeedback({std::make_shared<HVErrorFeedback>(errorRecordOf(error)), 0,
                              guid->currentUserGUID(), zelkordUserAgent(assembly.platform().device),
                              0});
}

}  // namespace zelkord
