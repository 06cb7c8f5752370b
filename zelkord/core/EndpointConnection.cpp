#include "zelkord/core/EndpointConnection.h"

#include <algorithm>
#include <chrono>

#include "zelkord/assembly/Assembly.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/core/Wire.h"

namespace zelkord {
namespace {

Duration durationOfMilliseconds(std::uint64_t count) {
  constexpr auto kLongest = std::chrono::duration_cast<std::chrono::milliseconds>(Duration::max());
  const auto longest = static_cast<std::uint64_t>(kLongest.count());
  return std::chrono::milliseconds(std::min(count, longest));
}

}  // namespace

EndpointConnection::EndpointConnection(Assembly& assembly,
                                       std::weak_ptr<ClientStateManager> manager)
    : assembly_(assembly),
      manager_(std::move(manager)),
      imagesQueue_(
          assembly.platform().queues.makeSerialQueue("com.quenta.zelkord.endpoint.images")) {}

void EndpointConnection::start(const std::weak_ptr<ipc::Connection>& connection) {
  timer_ = IdleTimer::make(assembly_.platform().queues, [connection] {
    if (const auto open = connection.lock()) open->invalidate();
  });
}

void EndpointConnection::invalidated() {
  timer_->cancel();
  const MutexLock lock(mutex_);
  ended_ = true;
  if (wait_) wait_->giveUp();
}

void EndpointConnection::handle(ipc::Call call) {
  timer_->rearm();
  if (call.member == "Request") _request(call);
  if (call.member == "LoadImages") _loadImages(call);
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

void EndpointConnection::_loadImages(const ipc::Call& call) {
  const auto received = assembly_.platform().clock.realNow();
  auto descriptors =
      decodeImageDescriptors(*call.arguments.at(0).get<std::vector<ipc::Dictionary>>());
  if (const auto* fault = std::get_if<WireFault>(&descriptors)) {
    assembly_.log(Category::Connection).error("endpoint {} refused: {}", call.member, fault->text);
    return call.reply->fail(fault->errorName, fault->text);
  }
  const auto timeout = durationOfMilliseconds(*call.arguments.at(1).get<std::uint64_t>());
  imagesQueue_->async([self = shared_from_this(), reply = call.reply, mark = timer_->callBegan(),
                       images = std::get<std::vector<ImageDescriptor>>(std::move(descriptors)),
                       deadline = deadlineAfter(received, timeout)] {
    self->_answerImages(images, deadline, *reply);
  });
}

void EndpointConnection::_answerImages(const std::vector<ImageDescriptor>& descriptors,
                                       SteadyTime deadline, ipc::Reply& reply) {
  const auto manager = manager_.lock();
  auto wait = _nextWait();
  if (!manager || !wait) return;
  manager->loadImages(
      descriptors, deadline,
      [&reply](LoadedImages images) { reply.send({encodeImages(std::move(images))}); },
      std::move(wait));
}

std::shared_ptr<ImageWait> EndpointConnection::_nextWait() {
  const MutexLock lock(mutex_);
  if (ended_) return nullptr;
  wait_ = std::make_shared<ImageWait>(assembly_.platform().queues);
  return wait_;
}

}  // namespace zelkord
