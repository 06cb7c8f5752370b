#include "zelkord/network/context/VisibilityRestrictions.h"

#include <utility>

#include "corezelkor/Constants.h"
#include "zelkord/assembly/Assembly.h"

namespace zelkord {
namespace {

bool isEnabledFor(const ZLKBag& bag, std::string userAgent) {
  return ZLKBag(bag.rawBag(), std::move(userAgent)).isEnabled();
}

}  // namespace

std::vector<VisibilityRestriction> visibilityRestrictionsOf(const ZLKBag& bag) {
  json::array blocked;
  if (!isEnabledFor(bag, "messages")) blocked.emplace_back(kHashtagImagesExtensionIdentifier);
  return {{std::string(kNewsAppIdentifier), {{"allow_news_results", isEnabledFor(bag, "news")}}},
          {std::string(kHashtagImagesExtensionIdentifier),
           {{"blocked_app_bundle_identifiers", std::move(blocked)}}}};
}

void VisibilityRestrictions::update(std::shared_ptr<const ZLKBag> bag) {
  {
    const MutexLock lock(mutex_);
    latest_ = std::move(bag);
  }
  auto& platform = assembly_.platform();
  auto transaction = std::make_shared<Transaction>(platform.transactions.open("updateMC"));
  platform.queues.global(QualityOfService::Background)
      .async([weak = weak_from_this(), transaction = std::move(transaction)] {
        if (const auto self = weak.lock()) self->_applyLatest();
        transaction->reset();
      });
}

void VisibilityRestrictions::_applyLatest() {
  const MutexLock applying(applying_);
  std::shared_ptr<const ZLKBag> bag;
  {
    const MutexLock lock(mutex_);
    bag = latest_;
  }
  for (const auto& restriction : visibilityRestrictionsOf(*bag)) _apply(restriction);
}

void VisibilityRestrictions::_apply(const VisibilityRestriction& restriction) {
  const auto& log = assembly_.log(Category::Request);
  const auto error = assembly_.platform().management.setVisibilityRestrictions(
      restriction.clientType, restriction.settings);
  if (error) {
    log.error("error setting MC restrictions: {}", error->description());
    return;
  }
  const auto settings = json::serialize(restriction.settings);
  log.notice("set effective visibility restriction for {} to {}", priv(restriction.clientType),
             priv(settings));
}

}  // namespace zelkord
