#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/api/Interprocess.h"
#include "platform/api/WorkQueues.h"
#include "platform/testing/FakeClient.h"

namespace zelkord::ipc {

// The description that a call is checked against, and what is counted.
struct FakeDoor {
  ListenerConfiguration configuration;
  std::shared_ptr<ListenerDelegate> delegate;
  std::unique_ptr<SerialQueue> queue;
  Statistics* statistics = nullptr;

  // Answers the call itself when the description forbids it; null: deliver it.
  const Method* check(const std::string& interface, const std::string& member, const Values& values,
                      FakeAnswer& answer) const;
};

// Makes the way back to one fake caller.
std::shared_ptr<Reply> makeFakeReply(const Method& method, std::shared_ptr<FakeAnswer> answer);

// Both ends of one connection in memory.
//
// Threading: the timeline's thread. Ownership: the transport holds it until its end.
class FakeConnection final : public Connection,
                             public FakeClient,
                             public std::enable_shared_from_this<FakeConnection> {
 public:
  FakeConnection(Peer peer, std::shared_ptr<FakeDoor> door, WorkQueues& queues,
                 std::function<void()> ended);
  // Asks the delegate for admission.
  void start();

  // Connection
  Peer peer() const override { return peer_; }
  void setHandler(std::shared_ptr<CallHandler> handler) override { handler_ = std::move(handler); }
  void setInvalidationHandler(std::function<void()> handler) override;
  void invalidate() override { _end(State::Ended); }
  void callClient(std::string_view path, std::string_view interface, std::string_view member,
                  std::string_view signature, Values values,
                  std::function<void(const Error&)> failure) override;

  // FakeClient
  State state() const override { return state_; }
  std::shared_ptr<FakeAnswer> call(std::string interface, std::string member,
                                   Values values) override;
  void disconnect() override { _end(State::Ended); }
  const std::vector<FakeCallback>& callbacks() const override { return callbacks_; }
  std::vector<FakeCallback> takeCallbacks() override { return std::exchange(callbacks_, {}); }
  void failCallbacks(std::optional<Error> error) override { failure_ = std::move(error); }
  std::shared_ptr<Connection> connection() override { return shared_from_this(); }

 private:
  void _decided(std::optional<Subscription> place);
  void _begin();
  void _deliver(Call call);
  void _end(State state);
  void _runInvalidationHandler();

  // Fixed after construction.
  const Peer peer_;
  const std::shared_ptr<FakeDoor> door_;
  const std::unique_ptr<SerialQueue> queue_;
  const std::function<void()> ended_;

  State state_ = State::Deciding;
  bool invalidated_ = false;
  std::optional<Subscription> place_;
  std::shared_ptr<CallHandler> handler_;
  std::function<void()> invalidationHandler_;
  std::vector<std::function<void()>> waiting_;  // calls made while the delegate decides
  std::vector<FakeCallback> callbacks_;
  std::optional<Error> failure_;
};

}  // namespace zelkord::ipc
