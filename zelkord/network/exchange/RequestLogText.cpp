#include "zelkord/network/exchange/RequestLogText.h"

namespace zelkord {
namespace {

constexpr std::string_view kPrivate = "<private>";
constexpr std::string_view kBundleIdentifiers = "subscription_provider_bundle_identifier_whitelist";

void hidePrivateParts(json::value& value) {
  if (auto* text = value.if_string()) {
    const std::string_view whole(text->data(), text->size());
    if (whole.find("://") != std::string_view::npos) *text = urlForLog(whole, false);
  } else if (auto* array = value.if_array()) {
    for (auto& element : *array) hidePrivateParts(element);
  } else if (auto* object = value.if_object()) {
    for (auto& member : *object) {
      if (member.key() == kBundleIdentifiers) {
        member.value() = kPrivate;
      } else {
        hidePrivateParts(member.value());
      }
    }
  }
}

}  // namespace

std::string headersForLog(const HTTPHeaders& headers) {
  json::object object;
  for (const auto& [name, value] : headers) object[name] = value;
  return json::serialize(object);
}

std::string responseForLog(const std::optional<URLResponse>& response, bool showsPrivateData) {
  if (!response) return "(null)";
  json::object object{{"url", urlForLog(response->url, showsPrivateData)}};
  if (response->status) object["status"] = *response->status;
  return json::serialize(object);
}

std::string bagForLog(const json::object& bag, bool showsPrivateData) {
  if (showsPrivateData) return json::serialize(bag);
  json::value shown = bag;
  hidePrivateParts(shown);
  return json::serialize(shown);
}

}  // namespace zelkord
