#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>

#include "zelkord/feedback/ZelkorFeedback.h"

namespace zelkord {

// What feedback calls of components above it. The assembly answers null for one that does not
// exist. Threading: any thread; none of them calls back into a session before it returns.

// Live streams of records for diagnostic tools.
class FeedbackStreams {
 public:
  virtual ~FeedbackStreams() = default;
  virtual void sendDataToReceivingStreamListener(const ZelkorFeedback& feedback) = 0;
  // More results of that query are about to be asked for; empty when nobody can tell which.
  virtual void willAskForMoreResults(const std::string& query) = 0;
};

// The background work that uploads finished sessions.
class FlushActivities {
 public:
  virtual ~FlushActivities() = default;
  // Asks for one soon; the call-back, when given, runs after it.
  virtual void insertFlushActivity(std::function<void()> callback) = 0;
};

// Where crowdsourcing feedback goes instead of a session.
class CrowdsourcingFlusher {
 public:
  virtual ~CrowdsourcingFlusher() = default;
  virtual void flush(std::shared_ptr<const HVFeedback> feedback,
                     std::function<void()> callback) = 0;
};

// Whether the service wants feedback.
class FeedbackGate {
 public:
  virtual ~FeedbackGate() = default;
  // Of clients with that user agent; false while nothing is known.
  virtual bool dropsFeedback(const std::optional<std::string>& userAgent) = 0;
};

// The versions of the data files that the daemon has, by identifier.
class ResourceVersions {
 public:
  virtual ~ResourceVersions() = default;
  virtual std::map<std::string, std::string> resourceVersions() = 0;
};

}  // namespace zelkord
