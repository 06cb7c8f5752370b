#include "zelkord/ZelkorLogging/ZelkorLogging.h"

#include <utility>

#include "base/Check.h"

namespace zelkord {
namespace {

constexpr std::array<const char*, ZelkorLoggingCategoryCount> kCategoryNames = {
    "Zelkor",
    "Zelkor_Feedback",
    "Zelkor_Session",
    "Zelkor_Request",
    "Zelkor_Flusher",
    "Zelkor_Search",
    "Zelkor_ZeroKeyword",
    "Zelkor_MoreResults",
    "Zelkor_Card",
    "Zelkor_LookUp",
    "Zelkor_Flight",
    "Zelkor_Images",
    "Zelkor_Connection",
    "Zelkor_DownloadManager",
    "Zelkor_Bag",
    "Zelkor_Subscription",
    "Zelkor_Caching",
    "Zelkor_Feedback_Errors",
    "Zelkor_Feedback_Storage"};

template <std::size_t... I>
std::array<Logger, ZelkorLoggingCategoryCount> makeHandles(LogSink& sink,
                                                           std::index_sequence<I...>) {
  return {Logger(sink, kCategoryNames[I])...};
}

}  // namespace

ZelkorLogging::ZelkorLogging(LogSink& sink)
    : sink_(sink),
      handles_(makeHandles(sink, std::make_index_sequence<ZelkorLoggingCategoryCount>())),
      defaultLog_(sink, "default") {}

const Logger& ZelkorLogForCategory(const ZelkorLogging& logging, unsigned category) {
  ZK_CHECK(category < ZelkorLoggingCategoryCount, "category < ZelkorLoggingCategoryCount");
  return logging[static_cast<Category>(category)];
}

}  // namespace zelkord
