#pragma once

#include <deque>
#include <memory>
#include <string>

#include "base/Subscription.h"
#include "platform/linux/ipc/BusPointers.h"
#include "platform/linux/ipc/Dispatcher.h"
#include "platform/linux/ipc/MessageGate.h"
#include "platform/linux/ipc/Outlet.h"
#include "platform/linux/ipc/ServedConnection.h"

namespace zelkord::ipc {

class PrivateListener;

// One authenticated private socket: reads and checks its messages, writes what goes to its client.
//
// States: open; ended by the peer, by a fault, by a client that does not read, or by us. Then
// nothing more is read or written, and the socket closes in the same turn of the loop. Threading:
// the loop. Ownership: its listener, until the end.
//
// A few short messages are read as they come. What comes in a row after them, and the pieces of
// long ones, wait their turn among all links' (Loop::inSpareTime), so that they keep nobody
// from asking.
class PrivateLink final : public Outlet,
                          public Caller,
                          public ClientMemory::Holder,
                          public std::enable_shared_from_this<PrivateLink> {
 public:
  // What is given back at its end: the delegate's place, and the part of the budget.
  struct Admission {
    Subscription place;
    Budget::Share share;
  };

  PrivateLink(PrivateListener& listener, IpcContext& context, BusPtr bus, Peer peer,
              Admission admission);

  void start();
  void end();
  const std::shared_ptr<ServedConnection>& served() const;

  // Outlet
  sd_bus* bus() override;
  const std::string& destination() const override { return destination_; }
  void send(MessagePtr message, std::size_t bytes) override;
  void invalidate() override { end(); }

  // Caller
  Outlet& outlet() override { return *this; }
  Receiver receiver(const std::string&) override { return {served(), {}}; }
  FileHandle openPrivateConnection() override;
  void cutOff(const std::string& reason) override;
  bool isPrivate() const override { return true; }
  ServedConnection* connection() override { return served().get(); }

  // ClientMemory::Holder
  const std::shared_ptr<CallFlow>& calls() const override { return served()->flow(); }
  std::size_t messageBytes() const override;
  std::size_t largestMessage() const override;
  void cutOffForMemory() override { cutOff("too much memory is held for its process"); }

 private:
  enum class Progress { Message, LastMessage, Nothing, Some };

  static int _onMessage(sd_bus_message* message, void* self, sd_bus_error* error);
  void _pump() ZK_REQUIRES(context_.loop);
  void _pumpInTurn() ZK_REQUIRES(context_.loop);
  // False when there is more to read.
  bool _readMessages() ZK_REQUIRES(context_.loop);
  bool _isInLongMessage() const ZK_REQUIRES(context_.loop);
  bool _mayRead() ZK_REQUIRES(context_.loop);
  // `begins`: nothing of the next message has been read yet.
  Progress _process(bool begins) ZK_REQUIRES(context_.loop);
  std::size_t _queuedMessages() const ZK_REQUIRES(context_.loop);
  void _accountWrites(std::size_t newestBytes) ZK_REQUIRES(context_.loop);
  void _accountMemory(std::size_t queuedBytes, std::size_t unfinishedBytes)
      ZK_REQUIRES(context_.loop);
  std::size_t _piledUpBytes() const ZK_REQUIRES(context_.loop);

  // Fixed after construction.
  PrivateListener& listener_;
  IpcContext& context_;
  const Peer peer_;
  const std::string destination_;

  // Loop state.
  BusPtr bus_ ZK_ON(context_.loop);
  SlotPtr filter_ ZK_ON(context_.loop);
  std::shared_ptr<ServedConnection> connection_ ZK_ON(context_.loop);
  Admission admission_ ZK_ON(context_.loop);
  Subscription holding_ ZK_ON(context_.loop);
  Subscription open_ ZK_ON(context_.loop);
  Subscription watch_ ZK_ON(context_.loop);
  MessageGate gate_ ZK_ON(context_.loop);
  bool ended_ ZK_ON(context_.loop) = false;
  bool hungUp_ ZK_ON(context_.loop) = false;
  bool arrived_ ZK_ON(context_.loop) = false;  // a message came during this round
  bool waitsForWriting_ ZK_ON(context_.loop) = false;
  bool waitsForTurn_ ZK_ON(context_.loop) = false;
  std::deque<std::size_t> queued_
      ZK_ON(context_.loop);  // sizes of the messages that wait, oldest first
  std::size_t queuedBytes_ ZK_ON(context_.loop) = 0;
  std::size_t unfinishedBytes_ ZK_ON(context_.loop) = 0;
};

}  // namespace zelkord::ipc
