#pragma once

#include <cstdint>
#include <functional>
#include <memory>

#include "halvane/Feedback.h"

namespace zelkor {
struct HVCustomFeedback;
struct HVResultEngagementFeedback;
}  // namespace zelkor

namespace zelkord {

class Assembly;
class ClientState;
struct ZelkorFeedback;

// What becomes of feedback that a client reports: a record of its session. Besides, a search view
// that appears warms the connection to the service, and engagements are counted and donated to the
// host's knowledge. Custom feedback goes ways of its own.
//
// Threading: any thread; nothing waits. Ownership: the assembly outlives it.
// Errors: feedback of a client without a state is recorded as an error of the daemon's own.
class FeedbackReports final {
 public:
  explicit FeedbackReports(Assembly& assembly) : assembly_(assembly) {}

  // Whoever reports: a process, and what is let go of once the feedback is written, or dropped.
  struct Reporter {
    std::int64_t pid = 0;
    std::shared_ptr<const void> call;
  };

  // `state` is null for a client that is not configured. Feedback without a timestamp gets one.
  // False when there is no room for the record.
  bool reportPayload(std::shared_ptr<HVFeedback> feedback, std::int64_t queryId,
                     const std::shared_ptr<ClientState>& state, const Reporter& reporter) const;
  // Autofill and result features become sessions of their own, crowdsourcing goes to its flusher;
  // then `callback`, if there is one, runs. Crowdsourcing that is not a JSON object is dropped
  // and counted as not sent. Anything else is ignored. `callback` does not run for either.
  bool handleCustomFeedback(std::shared_ptr<const HVCustomFeedback> feedback, std::int64_t queryId,
                            const ClientState& state, const Reporter& reporter,
                            std::function<void()> callback) const;

 private:
  bool _recordError(const char* reason, const Reporter& reporter) const;
  void _flush(std::shared_ptr<const HVCustomFeedback> crowdsourcing,
              std::function<void()> callback) const;
  // A session of that record alone.
  bool _makeSession(ZelkorFeedback record) const;
  bool _report(std::shared_ptr<const HVFeedback> feedback, std::int64_t queryId, ClientState& state,
               const Reporter& reporter) const;
  void _noteEngagement(const HVResultEngagementFeedback& engagement,
                       const ClientState& state) const;
  void _donate(const HVResultEngagementFeedback& engagement, const ClientState& state) const;

  Assembly& assembly_;
};

}  // namespace zelkord
