#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "base/Subscription.h"
#include "base/UUID.h"
#include "corezelkor/Messages.h"
#include "corezelkor/ZLKBag.h"
#include "platform/api/URLRequest.h"
#include "zelkord/network/bag/BagRequests.h"
#include "zelkord/network/context/FieldMask.h"
#include "zelkord/network/context/MapsUserSession.h"
#include "zelkord/network/context/SubscriptionDelegate.h"

namespace zelkord {

class AppSignatureSource;
class Assembly;
class BagFollower;
class ContextUpdater;
class LocationController;
class RequestContextStore;
class ZelkorURLRequestBuilder;
struct RequestInputs;
struct RequestRecipe;

// Makes every request to the service out of a query, the bag, the user identifier and the device's
// context, which it keeps current (RequestContextStore).
//
// A request is built against one consistent state of the context. Requests about queries wait for
// nothing but a context update in progress; those with a location ask for a fix that later
// requests may use.
//
// Threading: every operation on any thread but a task of the context's own queue.
// Ownership: the assembly outlives it; `start` comes once, right after construction.
// Errors: a value that is missing or empty is left out. A query without a usable URL gives no
// request.
class ZLKNetworkRequestFactory final : public BagRequests, public SubscriptionDelegate {
 public:
  explicit ZLKNetworkRequestFactory(Assembly& assembly);
  ~ZLKNetworkRequestFactory() override;

  // Reads the whole context and begins to follow its changes.
  void start();

  // Queries. Without a bag: no user agent, the default time-out. More results and cards go to the
  // query's own URL when it has one, everything else to the bag's.
  std::optional<URLRequest> searchRequest(const ZLKRequest& query, const ZLKBag* bag,
                                          const std::optional<UUID>& userGuid,
                                          FieldMask fieldMask = kFieldMaskNone);
  std::optional<URLRequest> zeroKeywordRequest(const ZLKRequest& query, const ZLKBag* bag,
                                               const std::optional<UUID>& userGuid,
                                               FieldMask fieldMask = kFieldMaskNone);
  std::optional<URLRequest> moreResultsRequest(const ZLKMoreResultsRequest& query,
                                               const ZLKBag* bag,
                                               const std::optional<UUID>& userGuid,
                                               FieldMask fieldMask = kFieldMaskNone);
  std::optional<URLRequest> lookupRequest(const ZLKLookupRequest& query, const ZLKBag* bag,
                                          const std::optional<UUID>& userGuid);
  std::optional<URLRequest> cardRequest(const ZLKCardRequest& query, const ZLKBag* bag,
                                        const std::optional<UUID>& userGuid);

  // Opens a connection early.
  std::optional<URLRequest> warmRequest(const std::string& url) const;
  // `version` is the one that is at hand; empty: none.
  std::optional<URLRequest> fileDownloadRequest(const std::string& url, const std::string& version,
                                                bool includeLatLong) const;
  std::optional<URLRequest> flusherUploadRequest(const std::string& url, Duration timeout,
                                                 const std::string& digest) const;

  URLRequest bagFetchRequest(const ZelkorBagController& controller,
                             const std::optional<std::string>& userAgent,
                             const std::optional<std::string>& version) override;
  URLRequest bagCacheRequest(const ZelkorBagController& controller,
                             const std::optional<std::string>& userAgent,
                             const std::optional<std::string>& version) override;
  std::uint64_t contextGeneration() const override;

  void didUpdateSubscriptionDictionaries(json::array subscriptions) override;
  void didUpdateStorefrontIdentifier(std::optional<std::string> identifier) override;

  // The session shared with maps, a new one after a reset; none when maps has no session. With an
  // identifier and no reset, the one that its requests carry.
  std::optional<MapsUserSession> getMapsUserSessionEntityAndReset(
      bool reset, const std::optional<UUID>& userGuid = std::nullopt) const;
  // The user has searched: downloads tell the precise location from now on.
  void setPerformedSearch();

  // Null takes it away. It outlives the factory, or is taken away before it ends.
  void setAppSignatureSource(const AppSignatureSource* source);

 private:
  std::optional<URLRequest> _queryRequest(const RequestRecipe& recipe, RequestInputs& inputs,
                                          const std::optional<std::string>& url);
  void _addItems(const RequestRecipe& recipe, const RequestInputs& inputs,
                 ZelkorURLRequestBuilder& builder, bool refreshLocation);
  URLRequest _bagRequest(const RequestRecipe& recipe, const ZelkorBagController& controller,
                         const std::optional<std::string>& userAgent,
                         const std::optional<std::string>& version) const;
  std::optional<URLRequest> _plainRequest(const RequestRecipe& recipe, const RequestInputs& inputs,
                                          const std::string& url) const;
  std::optional<std::string> _languageOf(const std::string& text) const;
  bool _routingIsOn() const;

  // Fixed after construction; the observer after start.
  Assembly& assembly_;
  const std::optional<std::string> zelkordUserAgent_;  // of uploads
  const std::optional<std::string> downloadUserAgent_;
  const std::shared_ptr<RequestContextStore> context_;
  const std::shared_ptr<LocationController> location_;
  const std::shared_ptr<ContextUpdater> updater_;
  const std::shared_ptr<BagFollower> bagFollower_;
  Subscription guidObserver_;

  // Own synchronisation.
  std::atomic<const AppSignatureSource*> appSignature_ = nullptr;
};

}  // namespace zelkord
