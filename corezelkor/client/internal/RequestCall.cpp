#include "corezelkor/client/internal/RequestCall.h"

#include <utility>

#include "corezelkor/client/internal/Wire.h"
#include "corezelkor/internal/RequestKinds.h"

namespace zelkor {

ZLKFuture<ClientAnswer> callWithRequest(ClientCore& core, const ClientCore::Target& target,
                                        std::shared_ptr<const ZLKRequest> request,
                                        ClientCore::Encode encodeRest) {
  ClientAnswer unanswered;
  if (!request || !requestKindOf(*request)) {
    unanswered.error = clientError(ClientErrorCode::Refused, "a request of no known kind");
    return ZLKFuture<ClientAnswer>(std::move(unanswered));
  }
  unanswered.queryId = request->queryId;
  return core.call<ClientAnswer>(
      target,
      [request = std::move(request), encodeRest = std::move(encodeRest)](MessageWriter& writer) {
        writeRequest(writer, *request);
        encodeRest(writer);
      },
      [](MessageReader& reader, ClientAnswer& answer) { answer = readAnswer(reader); },
      std::move(unanswered));
}

}  // namespace zelkor
