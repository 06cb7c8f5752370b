#include "sandbox/service/Resources.h"

#include <boost/json/array.hpp>
#include <boost/json/object.hpp>
#include <boost/json/serialize.hpp>
#include <cmath>
#include <cstdio>

#include "sandbox/core/Text.h"
#include "sandbox/http/Conditional.h"

namespace sandbox {

namespace json = boost::json;

namespace {

constexpr std::time_t kResourceTime = 1'668'000'000;
constexpr std::string_view kHintsPrefix = "lookup_hints_";

constexpr std::array<std::string_view, 5> kResourceNames = {
    "lookup_hints_weekly", "lookup_hints_monthly", "installed_app_whitelist",
    "crowdsourcing_whitelist", "crowdsourcing_blacklist"};

// Applications that are common on Linux desktops and phones; the code is the place in the list,
// from 1.
constexpr std::array<std::string_view, 32> kListedApps = {"org.gnome.Terminal",
                                                          "org.gnome.Nautilus",
                                                          "org.gnome.Calendar",
                                                          "org.gnome.Contacts",
                                                          "org.gnome.Maps",
                                                          "org.gnome.Weather",
                                                          "org.gnome.Music",
                                                          "org.gnome.Photos",
                                                          "org.gnome.TextEditor",
                                                          "org.gnome.Calculator",
                                                          "org.gnome.clocks",
                                                          "org.gnome.Epiphany",
                                                          "org.gnome.Geary",
                                                          "org.gnome.Evince",
                                                          "org.gnome.Boxes",
                                                          "org.mozilla.firefox",
                                                          "org.mozilla.Thunderbird",
                                                          "org.libreoffice.writer",
                                                          "org.libreoffice.calc",
                                                          "org.libreoffice.impress",
                                                          "org.kde.dolphin",
                                                          "org.kde.konsole",
                                                          "org.kde.kate",
                                                          "org.kde.okular",
                                                          "org.kde.gwenview",
                                                          "org.kde.elisa",
                                                          "org.gimp.GIMP",
                                                          "org.inkscape.Inkscape",
                                                          "org.videolan.vlc",
                                                          "org.chromium.Chromium",
                                                          "com.transmissionbt.Transmission",
                                                          "im.dino.Dino"};

std::string installedAppWhitelist() {
  json::object apps;
  std::int64_t code = 0;
  for (const auto app : kListedApps) apps[app] = json::array{json::object{{"encoding_id", ++code}}};
  const json::object inner = {{"version", "00000012"}, {"apps", std::move(apps)}};
  return json::serialize(json::object{
      {"apps", json::serialize(inner)}, {"compression", "RLE"}, {"encoding", "bitmap"}});
}

std::string crowdsourcingWhitelist() {
  json::array apps;
  for (const auto app : kListedApps) apps.push_back(json::string(lowerCased(app)));
  return json::serialize(json::object{{"static_apps_whitelist", std::move(apps)}});
}

std::string crowdsourcingBlacklist() {
  return json::serialize(json::object{
      {"static_deeplinks_blacklist",
       json::array{"https://localhost/private", "org.gnome.contacts", "im.dino.dino"}}});
}

std::string hintsFile(const std::string& signature) {
  json::array hints;
  for (const char* word :
       {"snow", "river", "mountain", "museum", "station", "bridge", "castle", "harbor"}) {
    hints.push_back(json::object{{"text", word}, {"domain", "dictionary"}});
  }
  return json::serialize(json::object{{"signature", signature}, {"hints", std::move(hints)}});
}

Reply resourceFile(const Request& request, std::string text, const std::string& tag) {
  Reply reply = Reply::json(200, std::move(text));
  reply.headers.emplace_back("Cache-Control", "no-cache");
  return withValidators(request, std::move(reply), tag, kResourceTime);
}

// "/resource/weekly/2/world" taken apart after the first name.
Reply hintsAt(const Request& request, const std::vector<std::string_view>& parts) {
  const std::string signature =
      std::string(parts[3]) + "-" + std::string(parts[4]) + "-" + std::string(parts[2]);
  return resourceFile(request, hintsFile(signature), "\"" + signature + "\"");
}

}  // namespace

std::span<const std::string_view> resourceNames() { return kResourceNames; }

std::string_view resourceVersion() { return "2"; }

std::string placeOf(std::string_view latitudeAndLongitude) {
  double latitude = 0;
  double longitude = 0;
  const std::string text(latitudeAndLongitude);
  const bool isPlace = std::sscanf(text.c_str(), "%lf,%lf", &latitude, &longitude) == 2 &&
                       std::abs(latitude) <= 90 && std::abs(longitude) <= 180;
  if (!isPlace) return "world";
  char place[32];
  std::snprintf(place, sizeof place, "%c%02d%c%03d", latitude < 0 ? 's' : 'n',
                std::abs(static_cast<int>(latitude)), longitude < 0 ? 'w' : 'e',
                std::abs(static_cast<int>(longitude)));
  return place;
}

Reply Resources::_redirectToHints(const Request& request, std::string_view period) const {
  const std::string place = placeOf(request.header("X-Quenta-FuzzedLatLong").value_or(""));
  Reply reply = Reply::empty(302);
  reply.headers.emplace_back("Location", baseUrl_ + "/resource/" + std::string(period) + "/" +
                                             std::string(resourceVersion()) + "/" + place +
                                             "?key=" + percentEncoded(request.itemOr("key")));
  return reply;
}

Reply Resources::answer(const Request& request) const {
  const auto parts = split(request.path, '/');
  if (parts.size() == 5 && (parts[2] == "weekly" || parts[2] == "monthly"))
    return hintsAt(request, parts);
  if (parts.size() != 3) return Reply::error(404, "no such resource");
  const std::string_view name = parts[2];
  const std::string tag = "\"" + std::string(resourceVersion()) + "\"";
  if (name.starts_with(kHintsPrefix) && (name.ends_with("_weekly") || name.ends_with("_monthly"))) {
    return _redirectToHints(request, name.substr(kHintsPrefix.size()));
  }
  if (name == "installed_app_whitelist") return resourceFile(request, installedAppWhitelist(), tag);
  if (name == "crowdsourcing_whitelist")
    return resourceFile(request, crowdsourcingWhitelist(), tag);
  if (name == "crowdsourcing_blacklist")
    return resourceFile(request, crowdsourcingBlacklist(), tag);
  return Reply::error(404, "no such resource");
}

}  // namespace sandbox
