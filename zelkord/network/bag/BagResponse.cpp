#include "zelkord/network/bag/BagResponse.h"

#include <fmt/core.h>

#include "zelkord/network/exchange/RequestLogText.h"

namespace zelkord {
namespace {

constexpr std::int64_t kBagFetchErrorCode = 2;
constexpr int kStatusOK = 200;

BagResponse refused(Error error) { return {std::nullopt, std::move(error)}; }

BagResponse refused(std::string reason) {
  return refused(zelkorError(kBagFetchErrorCode, std::move(reason)));
}

std::optional<Error> transportError(const URLResult& result, std::uint64_t maximumSize) {
  if (result.error) return result.error;
  if (result.dataLength() > maximumSize) return urlError(URLErrorCode::TooLarge);
  return std::nullopt;
}

BagResponse readBagBody(std::string_view body, const Logger& log, bool showsPrivateData) {
  std::string problem;
  auto value = parseJson(body, &problem);
  if (!value) log.error("error parsing bag json {}", problem);
  auto* dictionary = value ? value->if_object() : nullptr;
  if (!dictionary) {
    log.error("Error fetching bag: returned data was not of the expected type.");
    return refused("not JSON object");
  }
  if (log.isEnabled(LogLevel::Debug)) {
    log.debug("Got bag: {}", bagForLog(*dictionary, showsPrivateData));
  }
  return {std::move(*dictionary), std::nullopt};
}

}  // namespace

std::uint64_t maximumBagSize(const SettingsStore& settings) {
  return bytesSetting(settings, kMaximumBagSizeSetting);
}

BagResponse readBagResponse(const URLResult& result, std::uint64_t maximumSize, const Logger& log,
                            bool showsPrivateData) {
  if (auto error = transportError(result, maximumSize)) {
    log.error("Error fetching bag: {}", error->description());
    return refused(std::move(*error));
  }
  const int status = result.status();
  // An HTTP answer of another status may well come without a body: then the status says more.
  if (!result.data && (status == 0 || status == kStatusOK)) {
    log.error("Error fetching bag: returned data was not of the expected type.");
    return refused("no data");
  }
  if (status != kStatusOK) {
    log.error("Error fetching bag status code: {}", status);
    return refused(fmt::format("statusCode {}", status));
  }
  return readBagBody(result.data->view(), log, showsPrivateData);
}

}  // namespace zelkord
