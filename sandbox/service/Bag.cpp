#include "sandbox/service/Bag.h"

#include <algorithm>
#include <boost/json/array.hpp>
#include <boost/json/serialize.hpp>
#include <cctype>

#include "sandbox/core/Text.h"
#include "sandbox/service/Resources.h"

namespace sandbox {

namespace json = boost::json;

namespace {

constexpr const char* kStandardVersion = "12";

json::array locationSources(const std::string& country) {
  if (country == "cn") return {"wifi", "cell"};
  return {"gps", "wifi", "cell"};
}

std::string textOfVersion(const json::value& version) {
  if (version.is_string()) return std::string(version.get_string());
  return version.is_number() ? json::serialize(version) : std::string();
}

bool isNumber(const std::string& text) {
  return !text.empty() && text.size() < 10 &&
         std::all_of(text.begin(), text.end(),
                     [](unsigned char c) { return std::isdigit(c) != 0; });
}

}  // namespace

void mergePatch(json::value& target, const json::value& patch) {
  if (!patch.is_object()) {
    target = patch;
    return;
  }
  if (!target.is_object()) target = json::object{};
  for (const auto& [key, value] : patch.get_object()) {
    if (value.is_null())
      target.get_object().stable_erase(key);
    else
      mergePatch(target.get_object()[key], value);
  }
}

json::object Bag::_standard(const std::string& country) const {
  json::object bag = {
      {"version", kStandardVersion},
      {"enabled", true},
      {"client_name", "sandbox"},
      {"search_url", baseUrl_ + "/search"},
      {"more_results_url", baseUrl_ + "/more"},
      {"card_url", baseUrl_ + "/card"},
      {"warm_url", baseUrl_ + "/warm"},
      {"feedback_url", baseUrl_ + "/feedback"},
      {"crowdsourcing_url", baseUrl_ + "/crowdsourcing"},
      {"item_related_content_url", baseUrl_ + "/related"},
      {"feedback_enabled", true},
      {"lookup_enabled", true},
      {"minimum_query_length", 1},
      {"search_render_timeout", 2000},
      {"timeout_interval_for_request", 10},
      {"send_geo_environment_header", true},
      {"supported_geo_location_sources", locationSources(country)},
      {"subscription_ttl", 3600},
      {"resources", json::object{{"images", baseUrl_ + "/image/"}}},
      {"agents", json::object{{"news", json::object{{"enabled", true}}},
                              {"messages", json::object{{"enabled", true}}}}},
  };
  json::object images;
  for (const char* name :
       {"word", "country", "region", "currency", "language", "character", "fact"}) {
    images[name] = baseUrl_ + "/image/glyph/" + name + ".png";
  }
  bag["image_identifiers"] = std::move(images);
  json::array list;
  for (const auto name : resourceNames()) {
    list.push_back(json::string(name));
    bag[name] =
        baseUrl_ + "/resource/" + std::string(name) + "?version=" + std::string(resourceVersion());
  }
  bag["download_resources_list"] = std::move(list);
  return bag;
}

json::value Bag::_document(const std::string& country) const {
  json::value bag = _standard(country);
  const std::lock_guard lock(mutex_);
  for (const auto& patch : patches_) mergePatch(bag, patch);
  return bag;
}

Reply Bag::answer(const Request& request) const {
  json::value bag = _document(lowerCased(request.itemOr("cc")));
  if (bag.is_object()) {
    auto& version = bag.get_object()["version"];
    if (textOfVersion(version) == "echo")
      version = validUtf8(request.itemOr("version", kStandardVersion));
    bag.get_object()["served_for"] =
        json::object{{"cc", validUtf8(request.itemOr("cc"))},
                     {"locale", validUtf8(request.itemOr("locale"))},
                     {"version", validUtf8(request.itemOr("version"))}};
  }
  Reply reply = Reply::json(200, json::serialize(bag));
  reply.headers.emplace_back("Cache-Control", "no-cache");
  return reply;
}

void Bag::patch(const json::value& patch) {
  const auto* version = patch.is_object() ? patch.get_object().if_contains("version") : nullptr;
  const std::lock_guard lock(mutex_);
  patches_.push_back(patch);
  if (version != nullptr) version_ = textOfVersion(*version);
}

void Bag::reset() {
  const std::lock_guard lock(mutex_);
  patches_.clear();
  version_ = kStandardVersion;
}

std::optional<std::string> Bag::announcement() const {
  const std::lock_guard lock(mutex_);
  if (!isNumber(version_)) return std::nullopt;
  return "{\"bag\": " + version_ + "}";
}

}  // namespace sandbox
