#pragma once

#include <atomic>
#include <cstddef>
#include <memory>
#include <unordered_map>
#include <utility>
#include <vector>

#include "base/Subscription.h"
#include "platform/api/Budget.h"

namespace zelkord::ipc {

class CallFlow;

// The memory that clients make the transport hold: replies that they have not read, messages of
// which they have sent a part, calls that are not answered yet. Bounded for one process and in all.
//
// A call that does not fit is refused. Replies and parts of messages cannot be: when they are too
// much for one process, its largest connection is cut off; when they are too much in all, the
// largest connection of the largest process. A process's largest message does not count for its
// own limit: an answer may be larger than that.
//
// The calls of a connection that was cut off hold their memory until their handlers let go. Nobody
// else is cut off for that, unless it comes to more than a quarter beyond the limit: then those
// with the largest messages are.
//
// Threading: `held` and what is said of a process on any thread, the rest on the loop.
// Ownership: shared with everything that counts; the reports outlive it.
class ClientMemory final {
 public:
  struct Size {
    std::size_t inAll = 0;
    std::size_t ofOneProcess = 0;
    std::size_t callsOfOneProcess = 0;
  };

  // What one process's connections hold together. Changed on any thread.
  class Process {
   public:
    Process(pid_t pid, std::shared_ptr<std::atomic<std::size_t>> inAll)
        : pid_(pid), inAll_(std::move(inAll)) {}
    void add(std::size_t bytes) {
      bytes_ += bytes;
      *inAll_ += bytes;
    }
    void remove(std::size_t bytes) {
      bytes_ -= bytes;
      *inAll_ -= bytes;
    }
    pid_t pid() const { return pid_; }
    std::size_t bytes() const { return bytes_; }
    std::atomic<std::size_t> calls = 0;

   private:
    const pid_t pid_;
    const std::shared_ptr<std::atomic<std::size_t>> inAll_;
    std::atomic<std::size_t> bytes_ = 0;
  };

  // One connection that can be cut off.
  class Holder {
   public:
    virtual ~Holder() = default;
    // Its calls; what they hold is given back when their handlers have let go of them.
    virtual const std::shared_ptr<CallFlow>& calls() const = 0;
    // The rest, which goes with the connection at once.
    virtual std::size_t messageBytes() const = 0;
    virtual std::size_t largestMessage() const = 0;
    virtual void cutOffForMemory() = 0;
  };

  ClientMemory(Size size, LimitReports& reports) : size_(size), reports_(reports) {}

  // Kept as long as anybody uses it.
  std::shared_ptr<Process> process(pid_t pid);
  Subscription add(Holder& holder);
  // Whether the process may have one more call. Others may be cut off for it.
  bool hasRoomForCall(const Process& process, std::size_t bytes);
  void callRefused(const Process& process);
  // Replies or parts of messages have grown: holds the limits. Holders may be cut off.
  void grew(const Process& process);
  std::size_t held() const { return *held_; }

 private:
  // Whether it may hold so much.
  bool _mayHold(const Process& process, std::size_t bytes) const;
  std::size_t _largestMessageOf(const Process& process) const;
  // Cuts off until `bytes` more fit, or nobody is left.
  void _makeRoom(std::size_t bytes);
  // What the calls of connections that were cut off still hold, of that process or of all.
  std::size_t _remains(const Process* process) const;
  const Process* _largestProcess() const;
  // False: it has no connection.
  bool _cutOffLargestOf(const Process& process);
  // False: nobody holds any.
  bool _cutOffMostMessages();
  void _cutOff(Holder& holder);
  std::size_t _mostWithRemains() const { return size_.inAll + size_.inAll / 4; }

  const Size size_;
  LimitReports& reports_;
  const std::shared_ptr<std::atomic<std::size_t>> held_ =
      std::make_shared<std::atomic<std::size_t>>(0);

  // Loop state.
  std::unordered_map<pid_t, std::weak_ptr<Process>> processes_;
  std::vector<Holder*> holders_;
  std::vector<std::weak_ptr<CallFlow>> cutOff_;
};

}  // namespace zelkord::ipc
