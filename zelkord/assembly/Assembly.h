#pragma once

#include <atomic>
#include <memory>

#include "platform/api/Budget.h"
#include "platform/api/Platform.h"
#include "zelkord/ZelkorLogging/Tracing.h"
#include "zelkord/ZelkorLogging/ZelkorLogging.h"
#include "zelkord/assembly/InstalledBag.h"
#include "zelkord/assembly/MapsSessions.h"
#include "zelkord/assembly/ServiceSessions.h"
#include "zelkord/assembly/ZelkorDiagnosticDataReporter.h"

namespace zelkord {

class ClientStateManager;
class CrowdsourcingFlusher;
class FeedbackGate;
class FeedbackSessions;
class FeedbackStreams;
class FlushActivities;
class ImageFetcher;
class LookupFilter;
class ResourceVersions;
class ResponseImages;
class SessionManager;
class SessionStorage;
class UserGUIDSource;
class ZLKNetworkRequestFactory;
class ZelkorBagController;

// The daemon's object graph: every long-lived service, and the way in which they find each other.
// Built once, in the order that `Daemon` gives; an accessor answers null before its service has
// been made.
//
// Threading: setters on the thread that builds the graph; everything else on any thread.
// Ownership: owns every service for its own life. The platform outlives it.
class Assembly final {
 public:
  explicit Assembly(Platform& platform)
      : platform_(platform),
        logging_(platform.log),
        tracing_(ZLKTracingSetup(platform.settings, platform.trace, logging_.defaultLog())),
        reporter_(platform.counters),
        limits_(platform.clock, platform.counters, logging_[Category::Zelkor]),
        sessions_(platform.urlSessions, platform.settings),
        mapsSessions_(platform.maps),
        installedBag_(platform.queues, platform.notificationCenter) {}

  Platform& platform() const { return platform_; }
  SettingsStore& userDefaults() const { return platform_.settings; }
  FileManager& fileManager() const { return platform_.files; }
  NotificationCenter& notificationCenter() const { return platform_.notificationCenter; }
  const Logger& log(Category category) const { return logging_[category]; }
  const Logger& defaultLog() const { return logging_.defaultLog(); }
  const Tracing& tracing() const { return tracing_; }
  LimitReports& limits() { return limits_; }
  const ZelkorDiagnosticDataReporter& reporter() const { return reporter_; }

  URLSession& urlSession() { return sessions_.urlSession(); }
  URLSession& bagSession() { return sessions_.bagSession(); }
  MapsSessions& mapsSessions() const { return mapsSessions_; }
  InstalledBag& installedBag() { return installedBag_; }
  // Nothing that the service saw under a user identifier is used any more.
  void endIdentity(const UUID& identifier) {
    mapsSessions_.endIdentity(identifier);
    sessions_.endIdentity(identifier.string());
  }

  ZLKNetworkRequestFactory* requestFactory() const { return requestFactory_.get(); }
  ImageFetcher* imageFetcher() const { return imageFetcher_.get(); }
  // Drops what does not fit of the answers to lookups.
  LookupFilter* lookup() const { return lookup_.get(); }
  ZelkorBagController* bagController() const { return bagController_.get(); }
  ResponseImages* responseImages() const { return responseImages_.get(); }
  ClientStateManager* clientStateManager() const { return clientStateManager_.get(); }
  UserGUIDSource* guidController() const { return guidController_.get(); }
  SessionManager* clientSessionManager() const { return clientSessionManager_.get(); }
  FeedbackSessions* feedbackSessions() const { return feedbackSessions_.get(); }
  SessionStorage* persistentStorage() const { return persistentStorage_.get(); }
  FeedbackStreams* flusherXPCListener() const { return flusherXPCListener_.get(); }
  FeedbackGate* feedbackGate() const { return feedbackGate_.get(); }
  FlushActivities* backgroundFlusher() const { return backgroundFlusher_.get(); }
  CrowdsourcingFlusher* crowdsourcingFeedbackFlusher() const {
    return crowdsourcingFeedbackFlusher_.get();
  }
  ResourceVersions* downloadManager() const { return downloadManager_.get(); }

  void setRequestFactory(std::shared_ptr<ZLKNetworkRequestFactory> factory) {
    requestFactory_.set(std::move(factory));
  }
  void setImageFetcher(std::shared_ptr<ImageFetcher> fetcher) {
    imageFetcher_.set(std::move(fetcher));
  }
  void setLookup(std::shared_ptr<LookupFilter> lookup) { lookup_.set(std::move(lookup)); }
  void setBagController(std::shared_ptr<ZelkorBagController> controller) {
    bagController_.set(std::move(controller));
  }
  void setResponseImages(std::shared_ptr<ResponseImages> images) {
    responseImages_.set(std::move(images));
  }
  void setClientStateManager(std::shared_ptr<ClientStateManager> manager) {
    clientStateManager_.set(std::move(manager));
  }
  void setGuidController(std::shared_ptr<UserGUIDSource> controller) {
    guidController_.set(std::move(controller));
  }
  void setClientSessionManager(std::shared_ptr<SessionManager> manager) {
    clientSessionManager_.set(std::move(manager));
  }
  void setFeedbackSessions(std::shared_ptr<FeedbackSessions> sessions) {
    feedbackSessions_.set(std::move(sessions));
  }
  void setPersistentStorage(std::shared_ptr<SessionStorage> storage) {
    persistentStorage_.set(std::move(storage));
  }
  void setFlusherXPCListener(std::shared_ptr<FeedbackStreams> streams) {
    flusherXPCListener_.set(std::move(streams));
  }
  void setFeedbackGate(std::shared_ptr<FeedbackGate> gate) { feedbackGate_.set(std::move(gate)); }
  void setBackgroundFlusher(std::shared_ptr<FlushActivities> activities) {
    backgroundFlusher_.set(std::move(activities));
  }
  void setCrowdsourcingFeedbackFlusher(std::shared_ptr<CrowdsourcingFlusher> flusher) {
    crowdsourcingFeedbackFlusher_.set(std::move(flusher));
  }
  void setDownloadManager(std::shared_ptr<ResourceVersions> manager) {
    downloadManager_.set(std::move(manager));
  }

  // One feedback session shared by all clients; "ZLKSharedSession" as it was when the service
  // began.
  bool sharedSession() const { return sharedSession_; }
  void setSharedSession(bool shared) { sharedSession_ = shared; }
  // Sessions keep their records in memory too. For tests; never in the daemon.
  bool testFeedbacks() const { return testFeedbacks_; }
  void enableTestFeedbacks() { testFeedbacks_ = true; }
  bool diskBagCacheEnabled() const { return diskBagCacheEnabled_; }
  // For tests; always on in the daemon.
  void disableDiskBagCache() { diskBagCacheEnabled_ = false; }
  // The setting "ZLKUseMorvane", read on every call.
  bool useMorvane() const { return boolSetting(platform_.settings, "ZLKUseMorvane"); }

 private:
  template <typename Service>
  class Slot {
   public:
    Service* get() const { return published_.load(std::memory_order_acquire); }
    void set(std::shared_ptr<Service> service) {
      owner_ = std::move(service);
      published_.store(owner_.get(), std::memory_order_release);
    }

   private:
    std::shared_ptr<Service> owner_;
    std::atomic<Service*> published_ = nullptr;
  };

  Platform& platform_;
  const ZelkorLogging logging_;
  const Tracing tracing_;
  const ZelkorDiagnosticDataReporter reporter_;
  LimitReports limits_;
  ServiceSessions sessions_;
  mutable MapsSessions mapsSessions_;
  InstalledBag installedBag_;
  // In the order in which they are made; released in the reverse one.
  Slot<SessionStorage> persistentStorage_;
  Slot<FeedbackStreams> flusherXPCListener_;
  Slot<FeedbackGate> feedbackGate_;
  Slot<FlushActivities> backgroundFlusher_;
  Slot<CrowdsourcingFlusher> crowdsourcingFeedbackFlusher_;
  Slot<ResourceVersions> downloadManager_;
  Slot<FeedbackSessions> feedbackSessions_;
  Slot<ZLKNetworkRequestFactory> requestFactory_;
  Slot<ImageFetcher> imageFetcher_;
  Slot<LookupFilter> lookup_;
  Slot<ZelkorBagController> bagController_;
  Slot<ResponseImages> responseImages_;
  Slot<ClientStateManager> clientStateManager_;
  Slot<UserGUIDSource> guidController_;
  Slot<SessionManager> clientSessionManager_;
  std::atomic<bool> sharedSession_ = true;
  std::atomic<bool> testFeedbacks_ = false;
  std::atomic<bool> diskBagCacheEnabled_ = true;
};

}  // namespace zelkord
