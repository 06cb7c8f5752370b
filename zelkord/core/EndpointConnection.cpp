#include "zelkord/core/EndpointConnection.h"

#include "zelkord/assembly/Assembly.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/core/Wire.h"

namespace zelkord {

EndpointConnection::EndpointConnection(Assembly& assembly,
                                       std::weak_ptr<ClientStateManager> manager)
    : assembly_(assembly), manager_(std::move(manager)) {}

void EndpointConnection::start(const std::weak_ptr<ipc::Connection>& connection) {
  timer_ = IdleTimer::make(assembly_.platform().queues, [connection] {
    if (const auto open = connection.lock()) open->invalidate();
  });
}

void EndpointConnection::invalidated() { timer_->cancel(); }

void EndpointConnection::handle(ipc::Call call) {
  timer_->rearm();
  if (call.member == "Request") _request(call);
}

void EndpointConnection::_request(const ipc::Call& call) {
  const auto manager = manager_.lock();
  if (!manager) return;
  auto request = decodeRequest(*call.arguments.at(0).get<std::string>(),
                               *call.arguments.at(1).get<ipc::Dictionary>());
  auto configuration = decodeConfiguration(*call.arguments.at(2).get<ipc::Dictionary>());
  for (const auto* fault :
       {std::get_if<WireFault>(&request), std::get_if<WireFault>(&configuration)}) {
    if (!fault) continue;
    assembly_.log(Category::Connection).error("endpoint {} refused: {}", call.member, fault->text);
    return call.reply->fail(fault->errorName, fault->text);
  }
  manager->request(std::get<MutableRequest>(request),
                   std::get<ZLKSessionConfiguration>(configuration),
                   [reply = call.reply, mark = timer_->callBegan()](
                       std::int64_t queryId, const auto& answer, const auto& error) {
                     reply->send({queryId, encodeReply(answer), encodeError(error)});
                   });
}

}  // namespace zelkord
