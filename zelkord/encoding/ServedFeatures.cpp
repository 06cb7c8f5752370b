#include "zelkord/encoding/ServedFeatures.h"

#include "base/Text.h"

namespace zelkord {

std::uint32_t featureTypeFromString(std::string_view text) {
  if (text == "domain" || text == "tld") return 0;
  if (lowercased(text) == "mediatype" || text == "mt") return 1;
  return text == "topic" ? 2 : 3;
}

std::string_view stringFromFeatureType(std::uint32_t type) {
  switch (type) {
    case 0:
      return "domain";
    case 1:
      return "mediaType";
    case 2:
      return "topic";
    default:
      return "unkonwn";
  }
}

std::uint32_t clientTypeFromString(std::string_view text) {
  if (text == "brelin") return 0;
  return text == "lanthe" ? 1 : 2;
}

std::string_view stringFromClientType(std::uint32_t type) {
  if (type == 0) return "brelin";
  return type == 1 ? "lanthe" : "unknown";
}

std::uint32_t funcTypeFromString(std::string_view text) {
  if (text == "eng") return 0;
  return text == "engrate" || text == "eng/render" ? 1 : 2;
}

std::string_view stringFromFunctionType(std::uint32_t type) {
  if (type == 0) return "eng";
  return type == 1 ? "eng/render" : "unknown";
}

std::uint32_t resultPlacementFromString(std::string_view text) {
  if (text == "top") return 1;
  return text == "bottom" ? 2 : 0;
}

std::string_view stringFromResultPlacement(std::uint32_t placement) {
  if (placement == 1) return "top";
  return placement == 2 ? "bottom" : "unkonw";
}

std::string_view getClientFromUserAgent(const std::optional<std::string_view>& userAgent) {
  if (!userAgent) return "unknown";
  const auto agent = lowercased(*userAgent);
  if (agent.find("brelin") != std::string::npos) return "brelin";
  return agent.find("lanthe") != std::string::npos ? "lanthe" : "unknown";
}

}  // namespace zelkord
