#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/context/AppSignatureSource.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"

namespace zelkord {

// A request factory on a device of which everything is known and allowed. A test changes what it
// is about, then starts it.
class FactoryWorld final {
 public:
  FactoryWorld();
  ~FactoryWorld();

  // Makes the factory, gives it the bag, and a fix of `fixType` if any.
  void start();
  // Makes the factory, which has heard of nothing yet.
  void startWithoutBag();
  void postBag();
  void deliverFix(int type);
  void notify(std::string_view name);
  ZLKNetworkRequestFactory& factory() { return *assembly.requestFactory(); }
  // Null when the world has none.
  const ZLKBag* currentBag() const { return bag.get(); }
  void setBag(const std::string& key, json::value value);
  // The request of a kind, by name: "search", "zeroKeyword", "moreResults", "lookup", "card",
  // "warm", "bagFetch", "bagCache", "fileDownload", "flusherUpload".
  std::optional<URLRequest> request(std::string_view kind);
  static const std::vector<std::string_view>& kinds();

  FakePlatform fake;
  Assembly assembly;
  std::shared_ptr<const ZLKBag> bag;
  std::optional<int> fixType = 1;

  // What is asked.
  ZLKSearchRequest search;
  ZLKZeroKeywordRequest zeroKeyword;
  ZLKMoreResultsRequest moreResults;
  ZLKLookupRequest lookup;
  ZLKCardRequest card;
  // Changes all of them.
  void eachQuery(const std::function<void(ZLKRequest&)>& change);
  std::optional<UUID> userGuid = UUID{{0xAB, 0xCD, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14}};
  FieldMask fieldMask = kFieldMaskNone;
  bool includeLatLong = true;
  std::optional<std::string> signature = "sig0";
  json::array subscriptions;
  std::optional<std::string> storefront = "143441-1,29";

 private:
  class Signature;
  const std::unique_ptr<Signature> signatureSource_;
};

}  // namespace zelkord
