#include "corezelkor/client/internal/RequestCall.h"

#include <utility>

#include "corezelkor/client/internal/Wire.h"

namespace zelkor {

ZLKFuture<ClientAnswer> callWithRequest(ClientCore& core, const ClientCore::Target& target,
                                        std::shared_ptr<const ZLKRequest> request,
                                        ClientCore::Encode encodeRest) {
  ClientAnswer unanswered;
  if (!request || requestKind(*request).empty()) {
    unanswered.error = clientError(ClientErrorCode::Refused, "a request of no known kind");
    return ZLKFuture<ClientAnswer>(std::move(unanswered));
  }
  unanswered.queryId = request->queryId;
  return core.call<ClientAnswer>(
      target,
      [request = std::move(request), encodeRest = std::move(encodeRest)](MessageWriter& writer) {
        writer.text(requestKind(*request));
        writeRequest(writer, *request);
        encodeRest(writer);
      },
      [](MessageReader& reader, ClientAnswer& answer) { answer = readAnswer(reader); },
      std::move(unanswered));
}

}  // namespace zelkor
