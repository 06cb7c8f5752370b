#include "zelkord/core/EndpointConnection.h"

#include <algorithm>
#include <chrono>

#include "corezelkor/Constants.h"
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
                                       std::weak_ptr<ClientStateManager> manager,
                                       std::shared_ptr<Budget> imageCalls)
    : assembly_(assembly),
      manager_(std::move(manager)),
      imageCalls_(std::move(imageCalls)),
      imagesQueue_(
          assembly.platform().queues.makeSerialQueue("com.quenta.zelkord.endpoint.images")) {}

void EndpointConnection::start(const std::shared_ptr<ipc::Connection>& connection) {
  holder_ = processHolder(connection->peer().pid);
  timer_ = IdleTimer::make(assembly_.platform().queues, [weak = std::weak_ptr(connection)] {
    if (const auto open = weak.lock()) open->invalidate();
  });
}

void EndpointConnection::invalidated() {
  timer_->cancel();
  std::vector<std::weak_ptr<ImageCall>> calls;
  {
    const MutexLock lock(mutex_);
    ended_ = true;
    calls = std::move(calls_);
  }
  for (const auto& call : calls) {
    if (const auto underWay = call.lock()) underWay->giveUp();
  }
}

const ServedInterface<EndpointConnection>& EndpointConnection::interface() {
  static const ServedInterface<EndpointConnection> kInterface = {
      kEndpointInterface,
      {
          {{"Request", "s kind, a{sv} request, a{sv} configuration",
            "x queryId, a{sv} reply, a{sv} error"},
           &EndpointConnection::_request},
          {{"LoadImages", "aa{sv} descriptors, t timeoutMilliseconds", "a{say} images"},
           &EndpointConnection::_loadImages},
      }};
  return kInterface;
}

void EndpointConnection::handle(ipc::Call call) {
  timer_->rearm();
  if (const auto* member = interface().find(call)) (this->*member->handle)(call);
}

void EndpointConnection::_request(const ipc::Call& call) {
  const auto manager = manager_.lock();
  if (!manager) return;
  auto request = decodeRequest(call.argument<std::string>(0), call.argument<ipc::Dictionary>(1));
  auto configuration = decodeConfiguration(call.argument<ipc::Dictionary>(2));
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
  auto descriptors = decodeImageDescriptors(call.argument<std::vector<ipc::Dictionary>>(0));
  if (const auto* fault = std::get_if<WireFault>(&descriptors)) {
    assembly_.log(Category::Connection).error("endpoint {} refused: {}", call.member, fault->text);
    return call.reply->fail(fault->errorName, fault->text);
  }
  auto share = imageCalls_->take(holder_);
  if (!share) return call.reply->fail(ipc::kLimitsExceeded, "too many calls for images");
  const auto timeout = durationOfMilliseconds(call.argument<std::uint64_t>(1));
  _beginImages({.descriptors = std::get<std::vector<ImageDescriptor>>(std::move(descriptors)),
                .deadline = deadlineAfter(received, timeout),
                .holder = holder_},
               _imageAnswer(call, *std::move(share)));
}

ImageCall::Completion EndpointConnection::_imageAnswer(const ipc::Call& call, Budget::Share share) {
  return [reply = call.reply, mark = timer_->callBegan(),
          held = std::make_shared<Budget::Share>(std::move(share))](LoadedImages images) {
    reply->send({encodeImages(std::move(images))});
  };
}

void EndpointConnection::_beginImages(ImageOrder order, ImageCall::Completion completion) {
  const auto manager = manager_.lock();
  if (!manager) return;
  const auto call = manager->loadImages(std::move(order), std::move(completion));
  if (!call) return;
  if (_remember(call)) return _askForImages(call);
  call->giveUp();
}

void EndpointConnection::_askForImages(const std::shared_ptr<ImageCall>& call) {
  imagesQueue_->async([self = shared_from_this(), call] {
    if (call->ask()) self->_askForImages(call);
  });
}

bool EndpointConnection::_remember(const std::shared_ptr<ImageCall>& call) {
  const MutexLock lock(mutex_);
  if (ended_) return false;
  std::erase_if(calls_, [](const auto& other) { return other.expired(); });
  calls_.push_back(call);
  return true;
}

}  // namespace zelkord
