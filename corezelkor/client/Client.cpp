#include "corezelkor/client/Client.h"

#include "corezelkor/Constants.h"
#include "corezelkor/client/internal/ClientCore.h"
#include "corezelkor/client/internal/RequestCall.h"
#include "corezelkor/client/internal/Wire.h"

namespace zelkor {
namespace {

ClientCore::Target daemonCall(std::string_view member) {
  return {ClientCore::Place::Main, kDaemonInterface, member};
}

void withoutArguments(MessageWriter&) {}

void readNothing(MessageReader&, ClientResult<Nothing>& result) { result.value.emplace(); }

}  // namespace

Client::Client(ClientOptions options) : core_(std::make_unique<ClientCore>(std::move(options))) {}

Client::~Client() = default;

ZLKFuture<ClientAnswer> Client::request(std::shared_ptr<const ZLKRequest> request) {
  return callWithRequest(*core_, daemonCall("Request"), std::move(request), [](MessageWriter&) {});
}

ZLKFuture<ClientResult<ClientBag>> Client::bag() {
  return core_->call<ClientResult<ClientBag>>(daemonCall("Bag"), withoutArguments,
                                              [](MessageReader& reader, auto& result) {
                                                result.value = readBag(reader);
                                                result.error = readError(reader);
                                              });
}

ZLKFuture<ClientResult<std::vector<ClientSessionEntry>>> Client::listSessions() {
  return core_->call<ClientResult<std::vector<ClientSessionEntry>>>(
      daemonCall("ListSessions"), withoutArguments,
      [](MessageReader& reader, auto& result) { result.value = readSessions(reader); });
}

ZLKFuture<ClientResult<ResourceFile>> Client::fileHandleForResource(std::string identifier) {
  return core_->call<ClientResult<ResourceFile>>(
      daemonCall("FileHandleAndAttributesForResource"),
      [identifier = std::move(identifier)](MessageWriter& writer) { writer.text(identifier); },
      [](MessageReader& reader, auto& result) {
        result.value = readResource(reader);
        result.error = readError(reader);
      });
}

ZLKFuture<ClientResult<Nothing>> Client::reportEvent(std::string event, std::int64_t queryId,
                                                     std::string feedbackClass,
                                                     std::string feedback) {
  return core_->call<ClientResult<Nothing>>(
      daemonCall("ReportEvent"),
      [event = std::move(event), queryId, feedbackClass = std::move(feedbackClass),
       feedback = std::move(feedback)](MessageWriter& writer) {
        writer.text(event);
        writer.int64(queryId);
        writer.text(feedbackClass);
        writer.bytes(feedback);
      },
      readNothing);
}

ZLKFuture<ClientResult<Nothing>> Client::reportEvent(std::string event, std::int64_t queryId,
                                                     std::string payload) {
  return core_->call<ClientResult<Nothing>>(
      daemonCall("ReportEventData"),
      [event = std::move(event), queryId, payload = std::move(payload)](MessageWriter& writer) {
        writer.text(event);
        writer.int64(queryId);
        writer.bytes(payload);
      },
      readNothing);
}

ZLKFuture<ClientResult<std::vector<std::string>>> Client::feedback(std::string name) {
  return core_->call<ClientResult<std::vector<std::string>>>(
      daemonCall("Feedback"),
      [name = std::move(name)](MessageWriter& writer) { writer.text(name); },
      [](MessageReader& reader, auto& result) {
        result.value = readTexts(reader);
        result.error = readError(reader);
      });
}

}  // namespace zelkor
