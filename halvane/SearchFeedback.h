#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>

#include "halvane/FeedbackRecord.h"
#include "halvane/Vocabulary.h"

namespace zelkor {

// How searches begin and end.

using StringMap = std::map<std::string, std::string>;

// What the start of any request to the service has.
struct NetworkSearchStart {
  Term<vocabulary::kSearchRequestTriggers> triggerEvent;
  std::optional<std::string> input;
  std::optional<std::string> uuid;
  StringMap headers;
  std::optional<std::string> url;
  Term<vocabulary::kEndpointTypes> endpointType;

  // All but the trigger event.
  static constexpr auto startFields() {
    using T = NetworkSearchStart;
    return std::tuple{sent(3, "input", &T::input), sent(4, "uuid", &T::uuid),
                      sent(5, "headers", &T::headers), sent(6, "url", &T::url),
                      sent(7, "endpoint_type", &T::endpointType)};
  }
};

// A request to the service went out.
struct HVStartNetworkSearchFeedback final : FeedbackRecord<HVStartNetworkSearchFeedback>,
                                            NetworkSearchStart {
  static constexpr FeedbackDescription kDescription = {"HVStartNetworkSearchFeedback", 1};

  static constexpr auto fields() {
    return std::tuple_cat(std::tuple{sent(2, "trigger_event", &NetworkSearchStart::triggerEvent)},
                          startFields());
  }
};

// What the end of any request to the service has.
struct NetworkSearchEnd {
  std::int64_t responseSize = 0;  // bytes
  std::int32_t statusCode = 0;
  std::optional<JsonObjectText> networkTimingData;
  std::optional<bool> connectionReused;
  std::optional<std::string> interface;
  std::optional<std::string> peerAddress;  // "[ADDRESS]:PORT" or "ADDRESS:PORT"
  std::optional<std::string> uuid;         // the start's

  static constexpr auto endFields() {
    using T = NetworkSearchEnd;
    return std::tuple{sent(2, "response_size", &T::responseSize),
                      sent(3, "status_code", &T::statusCode),
                      sent(4, "network_timing_data", &T::networkTimingData),
                      sent(5, "connection_reused", &T::connectionReused),
                      sent(6, "interface", &T::interface),
                      sent(7, "peer_address", &T::peerAddress),
                      sent(8, "uuid", &T::uuid)};
  }
};

// ... and its answer came, or none did.
struct HVEndNetworkSearchFeedback final : FeedbackRecord<HVEndNetworkSearchFeedback>,
                                          NetworkSearchEnd {
  static constexpr FeedbackDescription kDescription = {"HVEndNetworkSearchFeedback", 2,
                                                       QueryIds::None};

  static constexpr auto fields() { return endFields(); }
};

struct HVStartLocalSearchFeedback final : FeedbackRecord<HVStartLocalSearchFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVStartLocalSearchFeedback", 3};

  Term<vocabulary::kSearchRequestTriggers> triggerEvent;
  std::optional<std::string> input;
  std::optional<std::string> uuid;
  Term<vocabulary::kIndexTypes> indexType;

  static constexpr auto fields() {
    using T = HVStartLocalSearchFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent), sent(3, "input", &T::input),
                      sent(4, "uuid", &T::uuid), sent(5, "index_type", &T::indexType)};
  }
};

struct HVEndLocalSearchFeedback final : FeedbackRecord<HVEndLocalSearchFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVEndLocalSearchFeedback", 4,
                                                       QueryIds::None};

  std::optional<std::string> uuid;

  static constexpr auto fields() {
    return std::tuple{sent(2, "uuid", &HVEndLocalSearchFeedback::uuid)};
  }
};

struct HVStartSearchFeedback final : FeedbackRecord<HVStartSearchFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVStartSearchFeedback", 14};

  Term<vocabulary::kSearchRequestTriggers> triggerEvent;
  std::optional<std::string> input;
  std::optional<std::string> uuid;

  static constexpr auto fields() {
    using T = HVStartSearchFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent), sent(3, "input", &T::input),
                      sent(4, "uuid", &T::uuid)};
  }
};

struct HVEndSearchFeedback final : FeedbackRecord<HVEndSearchFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVEndSearchFeedback", 15};

  std::optional<std::string> uuid;

  static constexpr auto fields() { return std::tuple{sent(2, "uuid", &HVEndSearchFeedback::uuid)}; }
};

}  // namespace zelkor
