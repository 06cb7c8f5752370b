#include "platform/testing/FakeConnection.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <utility>

namespace zelkord::ipc {
namespace {

class FakeReply final : public Reply {
 public:
  FakeReply(const Method& method, std::shared_ptr<FakeAnswer> answer)
      : name_(method.name),
        out_(method.noReply ? "" : method.out.signature),
        noReply_(method.noReply),
        answer_(std::move(answer)) {}

  ~FakeReply() override {
    if (noReply_ && !answer_->answered) answer_->answered = true;
  }

  void send(Values values) override {
    if (std::exchange(answer_->answered, true)) return;
    const auto signature = signatureOf(values);
    if (signature != out_) {
      ADD_FAILURE() << name_ << " replied with \"" << signature << "\" instead of \"" << out_
                    << "\"";
    }
    answer_->values = std::move(values);
  }
  void fail(std::string_view errorName, std::string_view text) override {
    if (std::exchange(answer_->answered, true)) return;
    answer_->errorName = errorName;
    answer_->errorText = text;
  }

 private:
  const std::string name_;
  const std::string out_;
  const bool noReply_;
  const std::shared_ptr<FakeAnswer> answer_;
};

const Method* refuseFakeCall(FakeAnswer& answer, std::string_view errorName) {
  answer.answered = true;
  answer.errorName = errorName;
  return nullptr;
}

const Method* findFakeMethod(const ListenerConfiguration& configuration,
                             const std::string& interface, const std::string& member) {
  for (const auto& candidate : configuration.interfaces) {
    if (candidate.name != interface) continue;
    for (const auto& method : candidate.methods) {
      if (method.name == member) return &method;
    }
  }
  return nullptr;
}

}  // namespace

const Method* FakeDoor::check(const std::string& interface, const std::string& member,
                              const Values& values, FakeAnswer& answer) const {
  ++statistics->calls;
  const Method* method = findFakeMethod(configuration, interface, member);
  if (!method) return refuseFakeCall(answer, "org.freedesktop.DBus.Error.UnknownMethod");
  if (signatureOf(values) != method->in.signature) return refuseFakeCall(answer, kInvalidArgs);
  return method;
}

std::shared_ptr<Reply> makeFakeReply(const Method& method, std::shared_ptr<FakeAnswer> answer) {
  return std::make_shared<FakeReply>(method, std::move(answer));
}

FakeConnection::FakeConnection(Peer peer, std::shared_ptr<FakeDoor> door, WorkQueues& queues,
                               std::function<void()> ended)
    : peer_(peer),
      door_(std::move(door)),
      queue_(queues.makeSerialQueue("fake connection")),
      ended_(std::move(ended)) {}

void FakeConnection::start() {
  door_->queue->async([self = shared_from_this()] {
    if (self->state_ != State::Deciding) return;
    self->door_->delegate->admit(self->peer_, [self](std::optional<Subscription> place) {
      self->_decided(std::move(place));
    });
  });
}

void FakeConnection::_decided(std::optional<Subscription> place) {
  if (state_ != State::Deciding) return;
  if (!place) return _end(State::Refused);
  place_ = std::move(place);
  door_->queue->async([self = shared_from_this()] { self->_begin(); });
}

void FakeConnection::_begin() {
  if (state_ != State::Deciding) return;
  state_ = State::Open;
  ++door_->statistics->connections;
  door_->delegate->connectionBegan(shared_from_this());
  for (auto& task : std::exchange(waiting_, {})) queue_->async(std::move(task));
}

std::shared_ptr<FakeAnswer> FakeConnection::call(std::string interface, std::string member,
                                                 Values values) {
  auto answer = std::make_shared<FakeAnswer>();
  if (state_ == State::Refused || state_ == State::Ended) return answer;
  const Method* method = door_->check(interface, member, values, *answer);
  if (!method) {
    ++door_->statistics->refused;
    if (handler_) handler_->messageArrived();
    return answer;
  }
  Call call{std::move(interface), std::move(member), std::move(values),
            makeFakeReply(*method, answer)};
  auto task = [weak = weak_from_this(), call = std::move(call)]() mutable {
    if (const auto self = weak.lock()) self->_deliver(std::move(call));
  };
  if (state_ == State::Deciding) {
    waiting_.push_back(std::move(task));
  } else {
    queue_->async(std::move(task));
  }
  return answer;
}

void FakeConnection::_deliver(Call call) {
  if (state_ != State::Open) return;
  if (const auto handler = handler_) handler->handle(std::move(call));
}

void FakeConnection::callClient(std::string_view path, std::string_view interface,
                                std::string_view member, std::string_view signature, Values values,
                                std::function<void(const Error&)> failure) {
  EXPECT_EQ(signatureOf(values), signature) << member;
  auto error = failure_;
  if (state_ != State::Open) error = posixError(ENOTCONN);
  if (!error) {
    callbacks_.push_back(
        {std::string(path), std::string(interface), std::string(member), std::move(values)});
  } else if (failure) {
    queue_->async([failure = std::move(failure), failed = *error] { failure(failed); });
  }
}

void FakeConnection::setInvalidationHandler(std::function<void()> handler) {
  if (invalidated_) return;
  invalidationHandler_ = std::move(handler);
  if (state_ == State::Ended) _runInvalidationHandler();
}

void FakeConnection::_end(State state) {
  if (state_ == State::Refused || state_ == State::Ended) return;
  const auto self = shared_from_this();
  const bool wasOpen = std::exchange(state_, state) == State::Open;
  waiting_.clear();
  place_.reset();
  if (wasOpen) {
    --door_->statistics->connections;
    if (invalidationHandler_) _runInvalidationHandler();
  }
  ended_();
}

void FakeConnection::_runInvalidationHandler() {
  queue_->async([self = shared_from_this()] {
    if (std::exchange(self->invalidated_, true)) return;
    const auto handler = std::exchange(self->invalidationHandler_, nullptr);
    if (handler) handler();
    self->handler_.reset();
  });
}

}  // namespace zelkord::ipc
