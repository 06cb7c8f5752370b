#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/api/Interprocess.h"
#include "platform/api/WorkQueue.h"

namespace zelkord::ipc {

// What became of one call.
struct FakeAnswer {
  bool answered = false;
  Values values;          // of a reply
  std::string errorName;  // empty: a reply
  std::string errorText;

  bool succeeded() const { return answered && errorName.empty(); }
};

// One call into the client.
struct FakeCallback {
  std::string path;
  std::string interface;
  std::string member;
  Values values;
};

// The client's end of a connection in memory, for tests on the manual timeline; `FakeInterprocess`
// makes it.
//
// States: Deciding (the delegate has not admitted it yet; calls wait), Open, Refused, Ended (by
// either side). Threading: the timeline's thread. Ownership: the test and the transport share it.
// Errors: a call that the interface description forbids is answered like on a real door; a reply of
// another type than described fails the test.
class FakeClient {
 public:
  enum class State { Deciding, Open, Refused, Ended };

  virtual ~FakeClient() = default;
  virtual State state() const = 0;
  // Queues the call; run the timeline to have it handled. Stays unanswered after the end.
  virtual std::shared_ptr<FakeAnswer> call(std::string interface, std::string member,
                                           Values values) = 0;
  // The client goes away.
  virtual void disconnect() = 0;
  // What the daemon called, oldest first; `takeCallbacks` empties it.
  virtual const std::vector<FakeCallback>& callbacks() const = 0;
  virtual std::vector<FakeCallback> takeCallbacks() = 0;
  // From now on calls into the client fail with this; none: they arrive again.
  virtual void failCallbacks(std::optional<Error> error) = 0;
  // The daemon's end, as the delegate got it.
  virtual std::shared_ptr<Connection> connection() = 0;
};

}  // namespace zelkord::ipc
