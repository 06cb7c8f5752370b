#include "zelkord/network/context/ContextUpdater.h"

#include <utility>

#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/network/context/DebugParameters.h"

namespace zelkord {

ContextUpdater::ContextUpdater(Assembly& assembly, std::shared_ptr<RequestContextStore> context,
                               const void* poster)
    : assembly_(assembly), context_(std::move(context)), poster_(poster) {}

void ContextUpdater::start() {
  _setup({kCountryCodeChanged}, &ContextUpdater::_updateDeviceCountryCode);
  _setup({kMapsClientMetadataInvalidated}, &ContextUpdater::_updateMapsClientMetadata);
  _setup({kCurrentLocaleChanged}, &ContextUpdater::_updateLocaleContexts);
  _setup({kTimeZoneChanged}, &ContextUpdater::_updateTimeZoneName);
  _setup({kAccountStoreChanged, kAccountCredentialsChanged},
         &ContextUpdater::_updateIsManagedAccount);
  _setup({kEffectiveRestrictionsChanged}, &ContextUpdater::_updateDeviceRestrictions);
  _setupDebuggingQueryItems();
}

void ContextUpdater::_setup(std::initializer_list<std::string_view> notifications, Update update) {
  for (const auto name : notifications) {
    observers_.push_back(assembly_.notificationCenter().observe(
        std::string(name), [weak = weak_from_this(), update](const Notification&) {
          if (const auto self = weak.lock()) (*self.*update)(Cause::Notification);
        }));
  }
  (this->*update)(Cause::Start);
}

void ContextUpdater::_updateDeviceCountryCode(Cause cause) {
  _takeOverPlaceAndLocale();
  if (cause == Cause::Notification) _notifyBagRefreshRequired();
}

void ContextUpdater::_updateMapsClientMetadata(Cause) {
  context_->update([metadata = assembly_.platform().maps.clientMetadata()](RequestContext& c) {
    c.mapsClientMetadata = metadata.value_or("");
  });
}

void ContextUpdater::_updateLocaleContexts(Cause cause) {
  if (!_takeOverPlaceAndLocale()) {
    assembly_.log(Category::Request)
        .error("Error encoding preferred languages {}.", "a language is not valid UTF-8");
  }
  if (cause == Cause::Notification) _notifyBagRefreshRequired();
}

void ContextUpdater::_updateTimeZoneName(Cause) { _takeOverPlaceAndLocale(); }

bool ContextUpdater::_takeOverPlaceAndLocale() {
  const auto& platform = assembly_.platform();
  const MutexLock lock(takingOver_);
  const auto locale = platform.locale.current();
  context_->update(
      [code = platform.maps.countryCode(), fields = localeContextOf(locale),
       zone = platform.locale.timeZoneName()](RequestContext& context) {
        context.deviceCountryCode = code;
        context.locale = fields;
        context.localTimeZoneName = zone;
      },
      ContextReach::BagURL);
  return languagesHeader(locale.preferredLanguages).has_value();
}

// The two below ask the service inside the update: of changes that come together the last one asks
// last.

void ContextUpdater::_updateIsManagedAccount(Cause) {
  context_->update([&assembly = assembly_](RequestContext& context) {
    const bool managed = assembly.platform().accounts.primaryAccountIsManaged();
    if (managed == context.isManagedAccount) return;
    assembly.log(Category::Request)
        .notice("updating managed account status to: {}", static_cast<int>(managed));
    context.isManagedAccount = managed;
  });
}

void ContextUpdater::_updateDeviceRestrictions(Cause) {
  context_->update([&assembly = assembly_](RequestContext& context) {
    const auto& log = assembly.log(Category::Request);
    log.info("device restriction have changed, currently restriction status is {}",
             static_cast<int>(context.deviceRestricted));
    const bool restricted = deviceIsRestricted(assembly.platform().management);
    if (restricted == context.deviceRestricted) return;
    log.notice("updating device restriction status to: {}", static_cast<int>(restricted));
    context.deviceRestricted = restricted;
  });
}

void ContextUpdater::_setupDebuggingQueryItems() {
  context_->update(
      [&assembly = assembly_](RequestContext& context) {
        const auto& log = assembly.log(Category::Request);
        const auto text = stringSetting(assembly.userDefaults(), "ZLKDebugParameters");
        if (text.empty()) {
          log.info("processing debug parameters: ({})", "(null)");
          return;
        }
        log.info("processing debug parameters: ({})", priv(text));
        auto parameters = parseDebugParameters(text);
        if (!parameters.valid) {
          log.error("invalid query components: {}", priv(parameters.invalid));
        }
        context.debuggingQueryItems = std::move(parameters.items);
      },
      ContextReach::BagURL);
}

void ContextUpdater::_notifyBagRefreshRequired() {
  // One that has not been posted yet speaks for this change too.
  if (refreshIsOnItsWay_.exchange(true)) return;
  assembly_.platform().queues.main().async([weak = weak_from_this()] {
    if (const auto self = weak.lock()) self->_postBagRefreshRequired();
  });
}

void ContextUpdater::_postBagRefreshRequired() {
  refreshIsOnItsWay_ = false;
  assembly_.notificationCenter().post({std::string(kZLKBagRefreshRequired), poster_, {}});
}

bool deviceIsRestricted(const DeviceManagement& management) {
  if (management.bookStoreAllowed() == RestrictionValue::No) return true;
  return !management.mediaStoreAllowed() || !management.appInstallationAllowed();
}

}  // namespace zelkord
