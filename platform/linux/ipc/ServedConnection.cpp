#include "platform/linux/ipc/ServedConnection.h"

#include <cerrno>
#include <utility>

namespace zelkord::ipc {
namespace {

// What a process has under way when it asks for more than a person can.
constexpr std::size_t kManyCalls = 64;
constexpr std::size_t kManyBytes = 1u << 20;

// The calls of a process that asks for much wait behind everybody else's.
QualityOfService qualityFor(const ClientMemory::Process& process) {
  const bool asksMuch = process.calls > kManyCalls || process.bytes() > kManyBytes;
  return asksMuch ? QualityOfService::Utility : QualityOfService::Default;
}

}  // namespace

ServedConnection::ServedConnection(IpcContext& context, Peer peer, std::weak_ptr<Outlet> outlet)
    : peer_(peer),
      outlet_(std::move(outlet)),
      inbox_(context.loop.inbox()),
      log_(context.log),
      flow_(std::make_shared<CallFlow>(context.options.callsUnderWay,
                                       context.options.callBytesUnderWay, context.memory,
                                       peer.pid)),
      cleaning_(context.cleaning),
      queue_(context.queues.makeSerialQueue("com.quenta.zelkord.connection")) {}

void ServedConnection::setHandler(std::shared_ptr<CallHandler> handler) {
  const MutexLock lock(mutex_);
  if (state_ != State::Ended) handler_ = std::move(handler);
}

void ServedConnection::setInvalidationHandler(std::function<void()> handler) {
  const MutexLock lock(mutex_);
  invalidationHandler_ = std::move(handler);
  if (state_ == State::Ended) {
    _queueInvalidation();
  }
}

void ServedConnection::invalidate() {
  inbox_->post([outlet = outlet_] {
    if (const auto open = outlet.lock()) open->invalidate();
  });
}

void ServedConnection::callClient(std::string_view path, std::string_view interface,
                                  std::string_view member, std::string_view signature,
                                  Values values, std::function<void(const Error&)> failure) {
  inbox_->post([self = shared_from_this(), path = std::string(path),
                interface = std::string(interface), member = std::string(member),
                signature = std::string(signature), values = std::move(values),
                failure = std::move(failure)] {
    const auto open = self->outlet_.lock();
    const int r = open ? sendCall(*open, path, interface, member, signature, values) : -ENOTCONN;
    if (r < 0) self->_fail(failure, -r);
  });
}

void ServedConnection::_fail(std::function<void(const Error&)> failure, int number) {
  if (!failure) return;
  queue_->async([self = shared_from_this(), failure = std::move(failure), number] {
    failure(posixError(number));
  });
}

void ServedConnection::deliver(Call call) {
  {
    const MutexLock lock(mutex_);
    if (state_ == State::Ended) return;
    if (state_ == State::Beginning) {
      waiting_.push_back(std::move(call));
      return;
    }
  }
  queue_->setQuality(qualityFor(flow_->process()));
  queue_->async([self = shared_from_this(), call = std::move(call)]() mutable {
    self->_handle(std::move(call));
  });
}

void ServedConnection::messageArrived() {
  std::shared_ptr<CallHandler> handler;
  {
    const MutexLock lock(mutex_);
    handler = handler_;
  }
  if (handler) handler->messageArrived();
}

void ServedConnection::open() {
  const MutexLock lock(mutex_);
  if (state_ != State::Beginning) return;
  state_ = State::Open;
  for (auto& call : std::exchange(waiting_, {})) {
    queue_->async([self = shared_from_this(), waited = std::move(call)]() mutable {
      self->_handle(std::move(waited));
    });
  }
}

void ServedConnection::_handle(Call call) {
  std::shared_ptr<CallHandler> handler;
  {
    const MutexLock lock(mutex_);
    if (state_ == State::Open) handler = handler_;
  }
  if (handler) handler->handle(std::move(call));
}

void ServedConnection::end() {
  std::vector<Call> dropped;  // after the lock
  {
    const MutexLock lock(mutex_);
    if (std::exchange(state_, State::Ended) == State::Ended) return;
    dropped = std::exchange(waiting_, {});
  }
  _queueInvalidation();
}

void ServedConnection::_queueInvalidation() {
  cleaning_->enter();
  queue_->async([self = shared_from_this()] {
    self->_runInvalidationHandler();
    self->cleaning_->leave();
  });
}

void ServedConnection::_runInvalidationHandler() {
  std::function<void()> invalidationHandler;
  std::shared_ptr<CallHandler> handler;
  {
    const MutexLock lock(mutex_);
    invalidationHandler = std::exchange(invalidationHandler_, nullptr);
    handler = std::exchange(handler_, nullptr);
  }
  if (invalidationHandler) invalidationHandler();
}

}  // namespace zelkord::ipc
