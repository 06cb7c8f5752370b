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
  const std::shared_ptr<ServedConnection>& served() const { return connection_; }

  // Outlet
  sd_bus* bus() override { return ended_ ? nullptr : bus_.get(); }
  const std::string& destination() const override { return destination_; }
  void send(MessagePtr message, std::size_t bytes) override;
  void invalidate() override { end(); }

  // Caller
  Outlet& outlet() override { return *this; }
  Receiver receiver(const std::string&) override { return {connection_, {}}; }
  FileHandle openPrivateConnection() override;
  void cutOff(const std::string& reason) override;
  bool isPrivate() const override { return true; }
  ServedConnection* connection() override { return connection_.get(); }

  // ClientMemory::Holder
  const std::shared_ptr<CallFlow>& calls() const override { return connection_->flow(); }
  std::size_t messageBytes() const override { return queuedBytes_ + unfinishedBytes_; }
  std::size_t largestMessage() const override;
  void cutOffForMemory() override { cutOff("too much memory is held for its process"); }

 private:
  enum class Progress { Message, Nothing, Some };

  static int _onMessage(sd_bus_message* message, void* self, sd_bus_error* error);
  void _pump();
  void _pumpInTurn();
  // False when there is more to read.
  bool _readMessages();
  bool _isInLongMessage() const;
  bool _mayRead();
  Progress _process();
  std::size_t _queuedMessages() const;
  void _accountWrites(std::size_t newestBytes);
  void _accountMemory(std::size_t queuedBytes, std::size_t unfinishedBytes);
  std::size_t _piledUpBytes() const;

  // Fixed after construction.
  PrivateListener& listener_;
  IpcContext& context_;
  const Peer peer_;
  const std::string destination_;

  // Loop state.
  BusPtr bus_;
  SlotPtr filter_;
  std::shared_ptr<ServedConnection> connection_;
  Admission admission_;
  Subscription holding_;
  Subscription open_;
  Subscription watch_;
  MessageGate gate_;
  bool ended_ = false;
  bool hungUp_ = false;
  bool arrived_ = false;  // a message came during this round
  bool waitsForWriting_ = false;
  bool waitsForTurn_ = false;
  std::deque<std::size_t> queued_;  // sizes of the messages that wait, oldest first
  std::size_t queuedBytes_ = 0;
  std::size_t unfinishedBytes_ = 0;
};

}  // namespace zelkord::ipc
