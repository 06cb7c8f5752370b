#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "halvane/StoredFeedback.h"
#include "zelkord/feedback/StoredSession.h"
#include "zelkord/feedback/ZelkorFeedback.h"

namespace zelkord {

// Where one session writes itself as it happens, and is read from once it has ended.
//
// Threading: any thread; writing waits for nothing, and what one thread hands over is written in
// that order. Errors: what cannot be written or read is logged and counted by the container.
class SessionContainer {
 public:
  virtual ~SessionContainer() = default;
  // First, once.
  virtual void writeSessionHeader(const CZClientSession& header) = 0;
  // `done`, when given, runs after the attempt, on the storage's queue; never for a closed
  // container.
  virtual void writeFeedback(const ZelkorFeedback& feedback, std::function<void()> done) = 0;
  // The session that it holds, none when it is damaged; ends writing. Waits for the storage's
  // queue, so not from there.
  virtual std::optional<StoredSession> read() = 0;
};

// Of a session manager, or made for one occasion.
enum class SessionKind : std::uint8_t { Managed, OneOff };

// Hands out containers, collects those of sessions that ended, and lists them for the upload, which
// deletes what it has read. Threading: any thread.
class SessionStorage {
 public:
  virtual ~SessionStorage() = default;
  // Open for writing; null when there can be none. `holder` is the first record's, of budgets.
  virtual std::shared_ptr<SessionContainer> createFileContainerForWriting(
      SessionKind kind, const std::string& holder) = 0;
  // No record follows; the container may be read and uploaded.
  virtual void closeSession(std::shared_ptr<SessionContainer> container) = 0;
  // Those of sessions that ended, those of an earlier process too, in the order in which they did.
  // Waits for the storage's queue, so not from there.
  virtual std::vector<std::shared_ptr<SessionContainer>> getAvailableSessionHandles() = 0;
  // Its file goes; no later list has it.
  virtual void deleteSessionWithFileContainer(std::shared_ptr<SessionContainer> container) = 0;
  // Returns when everything handed over so far has been written, or could not be.
  virtual void waitForPendingWrites() = 0;
};

}  // namespace zelkord
