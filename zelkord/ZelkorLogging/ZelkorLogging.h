#pragma once

#include <array>
#include <cstddef>

#include "platform/api/Log.h"

namespace zelkord {

// The log's categories; the number is the category's index.
enum class Category : unsigned {
  Zelkor,
  Feedback,
  Session,
  Request,
  Flusher,
  Search,
  ZeroKeyword,
  MoreResults,
  Card,
  LookUp,
  Flight,
  Images,
  Connection,
  DownloadManager,
  Bag,
  Subscription,
  Caching,
  FeedbackErrors,
  FeedbackStorage,
};
inline constexpr std::size_t ZelkorLoggingCategoryCount = 19;

inline constexpr const char* kLogSubsystem = "com.quenta.zelkord";

// The daemon's log handles, all made together, and the default log beside them.
// Threading: immutable, any thread. Ownership: the sink outlives it.
class ZelkorLogging final {
 public:
  explicit ZelkorLogging(LogSink& sink);

  const Logger& operator[](Category category) const {
    return handles_[static_cast<std::size_t>(category)];
  }
  const Logger& defaultLog() const { return defaultLog_; }
  LogSink& sink() const { return sink_; }

 private:
  LogSink& sink_;
  std::array<Logger, ZelkorLoggingCategoryCount> handles_;
  Logger defaultLog_;
};

// The handle of the category with that index. An index outside the table stops the process.
const Logger& ZelkorLogForCategory(const ZelkorLogging& logging, unsigned category);

}  // namespace zelkord
