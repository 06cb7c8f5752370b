#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <fstream>
#include <sstream>

#include "zelkord/network/request/RequestFactoryTestSupport.h"

namespace zelkord {
namespace {

// Every item and header of every kind of request, as one text that people can read: the whole
// request on a device of which everything is known, then what each change of the world makes of it.
//
// To accept a wanted change: ZK_UPDATE_GOLDEN=1, then read the difference line by line.

using Lines = std::vector<std::string>;

struct Variant {
  std::string_view name;
  std::function<void(FactoryWorld&)> before;  // it starts
  std::function<void(FactoryWorld&)> after = nullptr;
};

const Lines kNoRequest = {"no request"};

Lines linesOf(const std::optional<URLRequest>& request) {
  if (!request) return kNoRequest;
  const auto mark = request->url.find('?');
  Lines lines = {request->method + " " + request->url.substr(0, mark)};
  std::istringstream query(mark == std::string::npos ? "" : request->url.substr(mark + 1));
  for (std::string item; std::getline(query, item, '&');) lines.push_back("item " + item);
  for (const auto& [name, value] : request->headers) {
    lines.push_back("header " + name + ": " + value);
  }
  lines.push_back("time-out " + std::to_string(secondsOf(request->timeout)));
  lines.push_back(request->cachePolicy == CachePolicy::UseProtocol ? "cache by protocol"
                                                                   : "cache ignored");
  lines.push_back(request->routed ? "routed" : "not routed");
  return lines;
}

const std::vector<Variant>& variants() {
  using World = FactoryWorld;
  static const auto country = [](World& w) { w.fake.maps.country = "CN"; };
  static const auto proxy = [](World& w) { w.fake.networkProxy.enabled = true; };
  static const auto noMorvane = [](World& w) { w.fake.settings.set("ZLKUseMorvane", false); };
  static const auto mask = [](World& w) { w.fieldMask = 1; };
  static const auto debug = [](World& w) {
    w.fake.settings.set("ZLKDebugParameters", "locale=xx_DEBUG&extra=1");
  };
  static const auto noFix = [](World& w) { w.fixType.reset(); };
  static const auto unmanaged = [](World& w) { w.fake.accounts.managed = false; };
  static const auto authorization = [](World& w, int status) {
    w.fake.location.setAuthorization("/System/Library/LocationBundles/CoreZelkor.framework",
                                     status);
  };
  static const std::vector<Variant> all = {
      {"mask 1", mask},
      {"mask 2", [](World& w) { w.fieldMask = 2; }},
      {"mask 3", [](World& w) { w.fieldMask = 3; }},
      {"proxy enabled", proxy},
      {"proxy enabled, mask 1", [](World& w) { proxy(w), mask(w); }},
      {"proxy enabled, no morvane", [](World& w) { proxy(w), noMorvane(w); }},
      {"no morvane", noMorvane},
      {"no fix yet", noFix},
      {"no fix yet, mask 1", [](World& w) { noFix(w), mask(w); }},
      {"location service failed", noFix,
       [](World& w) {
         w.fake.location.fail(urlError(URLErrorCode::Other));
         w.fake.timeline.runUntilIdle();
       }},
      {"location denied", [](World& w) { noFix(w), authorization(w, 2); }},
      {"location granted now", [](World& w) { noFix(w), authorization(w, 0); }},
      {"location not wanted by the bag",
       [](World& w) { w.setBag("supported_geo_location_sources", json::array()); }},
      {"location from cells only", [](World& w) { w.fixType = 6; }},
      {"location after a search", [](World&) {},
       [](World& w) {
         w.factory().setPerformedSearch();
         w.fake.timeline.runUntilIdle();
       }},
      {"no location for downloads", [](World& w) { w.includeLatLong = false; }},
      {"debug items", debug},
      {"client items",
       [](World& w) {
         w.eachQuery([](ZLKRequest& query) {
           query.queryItems = {{"q", "mine"}, {"locale", "xx_CLIENT"}, {"key", "k"}, {"e", ""}};
         });
       }},
      {"client items and debug items",
       [](World& w) {
         debug(w);
         w.eachQuery([](ZLKRequest& query) { query.queryItems = {{"locale", "xx_CLIENT"}}; });
       }},
      {"typed, no scale, no topics, no input mode",
       [](World& w) {
         w.eachQuery([](ZLKRequest& query) {
           query = ZLKRequest();
           query.queryString = "x";
         });
       }},
      {"trigger event 10, scale 1.25, broken topics",
       [](World& w) {
         w.eachQuery([](ZLKRequest& query) {
           query.triggerEvent = 10;
           query.scale = 1.25;
           query.topics = "[";
         });
       }},
      {"lookup without words",
       [](World& w) {
         w.lookup.appBundleId = w.lookup.domain = w.lookup.queryContext = "";
         w.lookup.queryString = "qzx";
         w.lookup.lookupSelectionType = 5;
       }},
      {"explicit lookup", [](World& w) { w.lookup.lookupSelectionType = 1; }},
      {"own URLs",
       [](World& w) {
         w.moreResults.moreResultsURL = "https://own.example/more?latlng=1,2&z=%3B";
         w.card.cardURL = "https://own.example/card";
       }},
      {"no bag", [](World& w) { w.bag = std::make_shared<ZLKBag>(w.bag->rawBag(), std::nullopt); },
       [](World& w) { w.bag.reset(); }},
      {"no bag, own URLs", [](World&) {},
       [](World& w) {
         w.bag.reset();
         w.moreResults.moreResultsURL = "https://own.example/more";
         w.card.cardURL = "https://own.example/card";
       }},
      {"bag without maps environment",
       [](World& w) { w.setBag("send_geo_environment_header", false); }},
      {"nothing from maps",
       [](World& w) {
         w.fake.maps.metadata.reset();
         w.fake.maps.environment.reset();
         w.fake.maps.session.reset();
       }},
      {"maps session without identifier",
       [](World& w) { w.fake.maps.session = std::optional<std::string>(); }},
      {"no user identifier", [](World& w) { w.userGuid.reset(); }},
      {"not managed", unmanaged},
      {"restricted",
       [](World& w) {
         unmanaged(w);
         w.fake.management.bookStore = RestrictionValue::No;
       }},
      {"diagnostics unset",
       [](World& w) { w.fake.management.diagnosticsSubmission = RestrictionValue::Unset; }},
      {"diagnostics refused",
       [](World& w) { w.fake.management.diagnosticsSubmission = RestrictionValue::No; }},
      {"no storefront, subscriptions, signature",
       [](World& w) {
         w.storefront.reset();
         w.subscriptions.clear();
         w.signature.reset();
       }},
      {"American locale",
       [](World& w) {
         w.fake.locale.snapshot = {"en_US",      "buddhist", "U.S.",    "h a",
                                   "Fahrenheit", "",         {"en-US"}, "en"};
         w.fake.locale.zone = "America/New_York";
       }},
      {"country CN", country},
      {"nothing known",
       [](World& w) {
         w.fake.locale.snapshot = {};
         w.fake.locale.zone = "";
         w.fake.maps.country = "";
       }},
  };
  return all;
}

Lines requestOf(std::string_view kind, const Variant& variant) {
  FactoryWorld world;
  if (variant.before) variant.before(world);
  world.start();
  if (variant.after) variant.after(world);
  return linesOf(world.request(kind));
}

Lines missingFrom(const Lines& lines, const Lines& others) {
  Lines missing;
  for (const auto& line : lines) {
    if (std::find(others.begin(), others.end(), line) == others.end()) missing.push_back(line);
  }
  return missing;
}

void print(std::ostream& out, std::string_view kind) {
  const auto whole = requestOf(kind, {"", nullptr});
  out << "=== " << kind << "\n";
  for (const auto& line : whole) out << line << "\n";
  Lines same;
  for (const auto& variant : variants()) {
    const auto lines = requestOf(kind, variant);
    if (lines == whole) {
      same.emplace_back(variant.name);
      continue;
    }
    out << "--- " << variant.name << "\n";
    if (lines == kNoRequest) {
      out << kNoRequest.front() << "\n";
      continue;
    }
    for (const auto& line : missingFrom(whole, lines)) out << "- " << line << "\n";
    for (const auto& line : missingFrom(lines, whole)) out << "+ " << line << "\n";
  }
  out << "--- nothing else: ";
  for (const auto& name : same) out << (&name == &same.front() ? "" : "; ") << name;
  out << "\n\n";
}

TEST(RequestGoldenTest, EveryRequestIsAsWrittenDown) {
  std::ostringstream requests;
  for (const auto kind : FactoryWorld::kinds()) print(requests, kind);
  const std::string path = ZK_NETWORK_TESTDATA "/requests.golden.txt";
  if (std::getenv("ZK_UPDATE_GOLDEN")) std::ofstream(path) << requests.str();
  std::stringstream golden;
  golden << std::ifstream(path).rdbuf();
  EXPECT_EQ(requests.str(), golden.str());
}

}  // namespace
}  // namespace zelkord
