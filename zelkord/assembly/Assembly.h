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

// A place of the object graph for a service, which answers null until the service has been made.
template <typename T>
class ServiceSlot final {
 public:
  T* operator()() const { return published_.load(std::memory_order_acquire); }
  void set(std::shared_ptr<T> service) {
    owner_ = std::move(service);
    published_.store(owner_.get(), std::memory_order_release);
  }

 private:
  std::shared_ptr<T> owner_;
  std::atomic<T*> published_ = nullptr;
};

// The daemon's object graph: every long-lived service, and the way in which they find each other.
// Built once, in the order that `Daemon` gives.
//
// Threading: services are set on the thread that builds the graph; everything else on any thread.
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
  Platform& platform_;
  const ZelkorLogging logging_;
  const Tracing tracing_;
  const ZelkorDiagnosticDataReporter reporter_;
  LimitReports limits_;
  ServiceSessions sessions_;
  mutable MapsSessions mapsSessions_;
  InstalledBag installedBag_;
  std::atomic<bool> sharedSession_ = true;
  std::atomic<bool> testFeedbacks_ = false;
  std::atomic<bool> diskBagCacheEnabled_ = true;

 public:
  // The services, released in the reverse of this order.
  ServiceSlot<class SessionStorage> persistentStorage;
  ServiceSlot<class FeedbackStreams> flusherXPCListener;
  ServiceSlot<class FeedbackGate> feedbackGate;
  ServiceSlot<class FlushActivities> backgroundFlusher;
  ServiceSlot<class CrowdsourcingFlusher> crowdsourcingFeedbackFlusher;
  ServiceSlot<class ResourceVersions> downloadManager;
  ServiceSlot<class FeedbackSessions> feedbackSessions;
  ServiceSlot<class ZLKNetworkRequestFactory> requestFactory;
  ServiceSlot<class ImageFetcher> imageFetcher;
  ServiceSlot<class LookupFilter> lookup;  // of the answers to lookups
  ServiceSlot<class ZelkorBagController> bagController;
  ServiceSlot<class ResponseImages> responseImages;
  ServiceSlot<class ClientStateManager> clientStateManager;
  ServiceSlot<class UserGUIDSource> guidController;
  ServiceSlot<class SessionManager> clientSessionManager;
};

}  // namespace zelkord
