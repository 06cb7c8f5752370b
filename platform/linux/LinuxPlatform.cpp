#include "platform/linux/LinuxPlatform.h"

#include <signal.h>

#include <atomic>

#include "base/SettingsLayout.h"
#include "platform/api/Budget.h"
#include "platform/api/CountedTransactions.h"
#include "platform/api/LaunchEventStreams.h"
#include "platform/linux/account/LinuxAccounts.h"
#include "platform/linux/bus/SystemBus.h"
#include "platform/linux/counters/LinuxCounters.h"
#include "platform/linux/device/LinuxDevice.h"
#include "platform/linux/device_profile/DeviceProfileLoader.h"
#include "platform/linux/files/LinuxContainerFiles.h"
#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/files/OwnDirectory.h"
#include "platform/linux/files/StateLock.h"
#include "platform/linux/ipc/SdBusInterprocess.h"
#include "platform/linux/knowledge/LinuxKnowledgeStore.h"
#include "platform/linux/locale/HostLocaleWatcher.h"
#include "platform/linux/locale/LinuxLocale.h"
#include "platform/linux/location/GeoClueSource.h"
#include "platform/linux/location/LinuxLocation.h"
#include "platform/linux/log/FileLog.h"
#include "platform/linux/log/LinuxLog.h"
#include "platform/linux/loop/Loop.h"
#include "platform/linux/management/LinuxManagement.h"
#include "platform/linux/maps/LinuxMaps.h"
#include "platform/linux/memory_pressure/LinuxMemoryPressure.h"
#include "platform/linux/metered_network/MeteredNetwork.h"
#include "platform/linux/notifications/BusNotifications.h"
#include "platform/linux/process/ExitWhenIdle.h"
#include "platform/linux/process/LinuxProcess.h"
#include "platform/linux/process/LinuxSignals.h"
#include "platform/linux/process/SystemRandom.h"
#include "platform/linux/process/TraceMarker.h"
#include "platform/linux/property_list/BinaryPropertyLists.h"
#include "platform/linux/proxy/LinuxNetworkProxy.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/settings/LinuxSettings.h"
#include "platform/linux/tagger/LinuxTagger.h"
#include "platform/linux/text_input/LinuxTextInput.h"
#include "platform/linux/url_sessions/CurlURLSessions.h"

namespace zelkord {
namespace {

// From SIGINT or SIGTERM to the process's end, whatever is still to be written then.
constexpr Duration kLongestLeaving = 1700ms;

LinuxSettings::Options settingsOptions(const LinuxFileManager& files,
                                       const ConfigurationDirectories& configuration) {
  LinuxSettings::Options options;
  options.databasePath = files.directories().state + "/" + kSettingsFileName;
  options.systemFolders = configuration.system;
  return options;
}

std::vector<std::string> profileCandidates(const ConfigurationDirectories& configuration) {
  std::vector<std::string> candidates = {configuration.user + "/device.json"};
  for (const auto& folder : configuration.system) candidates.push_back(folder + "/device.json");
  return candidates;
}

ipc::SdBusOptions busOptions(const LinuxPlatformOptions& options, const LinuxFileManager& files,
                             PathWatcher& watcher, LoopCrew& crew) {
  ipc::SdBusOptions bus;
  bus.crew = &crew;
  bus.watcher = &watcher;
  bus.runtimeDirectory = files.directories().runtime;
  bus.usesSessionBus = options.usesSessionBus;
  return bus;
}

CurlURLSessions::Services urlServices(const std::shared_ptr<LinuxSettings>& settings,
                                      std::shared_ptr<const ProxyConfigurationSource> proxies,
                                      const MeteredNetwork& network, LoopCrew& crew,
                                      CurlURLSessions::Services::CacheHost cache,
                                      LimitReports& limits) {
  CurlURLSessions::Services services;
  services.crew = &crew;
  services.isMetered = [&network] { return network.isMetered(); };
  services.maximumResponseSize = [settings] {
    return bytesSetting(*settings, "ZLKMaximumResponseSize");
  };
  services.proxies = std::move(proxies);
  services.rootsFile = CurlURLSessions::rootsFileOfEnvironment();
  services.cache.emplace(std::move(cache));
  services.reports = &limits;
  return services;
}

LinuxDevice::Host hostDevice() {
  LinuxDevice::Host host;
  host.hardwareModel = [] {
    const auto bus = openSystemBus(nullptr);
    return bus ? readBusProperty(bus.get(), "org.freedesktop.hostname1",
                                 "/org/freedesktop/hostname1", "org.freedesktop.hostname1",
                                 "HardwareModel")
               : std::string();
  };
  return host;
}

// GeoClue, whose absence is logged once.
LocationSourceFactory geoClueFactory(const Clock& clock, LogSink& log) {
  auto complained = std::make_shared<std::atomic_flag>();
  return [&clock, &log, complained](const LocationOptions& options, LocationSourceEvents events) {
    return GeoClueSource::make(options, std::move(events), clock,
                               [&log, complained](const std::string& problem) {
                                 if (complained->test_and_set()) return;
                                 Logger(log, "").notice("no location service: {}", problem);
                               });
  };
}

std::optional<Error> makeStateDirectory(LinuxFileManager& files) {
  const auto& path = files.directories().state;
  auto error = files.createDirectory(path);
  if (!error) return foreignDirectory(path);
  error->userInfo["reason"] = path + ": " + error->reason().value_or("");
  return error;
}

// Those beside the state directory. Without them there is still something to serve, but nothing of
// ours goes into what belongs to somebody else.
std::optional<Error> makeOtherDirectories(LinuxFileManager& files) {
  for (const auto& path : {files.directories().runtime, files.directories().caches}) {
    files.createDirectory(path);
    if (auto error = foreignDirectory(path)) return error;
  }
  return std::nullopt;
}

// For the holder of the lock: closes the directories and removes what a crash left. Gives what is
// worth a line.
std::vector<std::string> tidyDirectories(const Directories& directories) {
  std::vector<std::string> remarks;
  for (const auto& path : {directories.runtime, directories.caches, directories.state}) {
    if (auto remark = closeToOthers(path)) remarks.push_back(std::move(*remark));
    LinuxFileManager::removeLeftovers(path);
  }
  return remarks;
}

}  // namespace

// In the order in which they need each other; destroyed the other way round.
struct LinuxPlatform::Services {
  Services(const LinuxPlatformOptions& options, StateLock stateLock, LinuxFileManager fileManager)
      : lock(std::move(stateLock)),
        files(std::move(fileManager)),
        configuration(hostConfigurationDirectories(options.environment)),
        clock(options.clockRate),
        log(LinuxLog::makeOutput(options.logFile, files.directories().state + "/zelkord.log"),
            clock, options.logLevel),
        queues(clock),
        settings(std::make_shared<LinuxSettings>(settingsOptions(files, configuration), files,
                                                 queues, log)),
        knowledge(hostDataHome(options.environment), files, queues, clock, log),
        interprocess(queues, log, limits, busOptions(options, files, watcher, queues.crew())),
        urlSessions(queues,
                    urlServices(settings, networkProxy, meteredNetwork, queues.crew(),
                                {clock, log, files.directories().state + "/urlcache"}, limits)) {
    log.showPrivateDataWhen([weak = std::weak_ptr(settings)] {
      const auto alive = weak.lock();
      return alive && boolSetting(*alive, "ZLKLogPrivateData");
    });
    queues.onRefusedWait([this] { limits.refused("waits", "workers"); });
    signals.endProcessAfter(kLongestLeaving, {SIGINT, SIGTERM});
    // What is ours first: others may hold the knowledge store for as long as they like.
    process.atExit([this] { counters.save(); });
    process.atExit([this] { settings->flush(); });
    process.atExit([this] { knowledge.flush(); });
    process.atExit([this] { log.flush(); });
    if (options.exitWhenIdle) {
      exitWhenIdle.emplace(queues, clock, transactions, *options.exitWhenIdle,
                           [this] { process.exit(0); });
    }
  }

  // No change is announced any more while the services that hear of it go.
  ~Services() {
    queues.onRefusedWait(nullptr);
    localeWatcher.reset();
    profileLoader.reset();
  }

  const StateLock lock;
  LinuxFileManager files;
  LinuxContainerFiles containerFiles;
  const ConfigurationDirectories configuration;
  LinuxClock clock;
  LinuxLog log;
  LinuxWorkQueues queues;
  const std::shared_ptr<LinuxSettings> settings;
  NotificationCenter notificationCenter;
  CountedTransactions transactions{clock};
  LinuxCounters counters{files, queues, log};
  LimitReports limits{clock, counters, Logger(log, "Zelkor")};
  TraceMarker trace{Logger(log, "")};
  LinuxSignals signals;
  LinuxProcess process{queues};
  LaunchEventStreams launchEvents;
  BinaryPropertyLists propertyLists;
  SystemRandom random;
  LinuxTagger tagger;
  Loop host{"zelkord-host"};  // what the services below wait for
  LinuxMemoryPressure memoryPressure{host, log};
  PathWatcher watcher{host, log};

  const HostLocaleSources localeSources = HostLocaleSources::ofProcess();
  const HostLocale hostLocale = readHostLocale(localeSources);
  DeviceProfileStore profile{notificationCenter, hostLocale.locale};
  std::optional<DeviceProfileLoader> profileLoader{
      std::in_place, profileCandidates(configuration), profile, files, queues, &watcher, log};
  LinuxDevice device{*profile.current(), hostDevice(), files};
  LinuxLocale locale{profile, hostLocale, notificationCenter};
  std::optional<HostLocaleWatcher> localeWatcher{
      std::in_place,
      localeSources,
      [this](HostLocale changed) { locale.hostChanged(std::move(changed)); },
      queues,
      host,
      watcher,
      log};
  LinuxMaps maps{profile, locale, random};
  LinuxAccounts accounts{profile};
  LinuxManagement management{profile, files, log};
  LinuxTextInput textInput{profile, locale};
  LinuxLocation location{profile, *settings, clock, queues, geoClueFactory(clock, log)};
  const std::shared_ptr<LinuxNetworkProxy> networkProxy =
      std::make_shared<LinuxNetworkProxy>(profile, log);

  LinuxKnowledgeStore knowledge;

  ipc::SdBusInterprocess interprocess;
  BusNotifications notifications{[this](const BusSignal& signal) {
                                   interprocess.postNotification(signal.argument);
                                   return true;
                                 },
                                 log};
  MeteredNetwork meteredNetwork{host};
  CurlURLSessions urlSessions;
  std::optional<ExitWhenIdle> exitWhenIdle;

  Platform platform{.clock = clock,
                    .queues = queues,
                    .log = log,
                    .settings = *settings,
                    .files = files,
                    .containerFiles = containerFiles,
                    .notificationCenter = notificationCenter,
                    .systemNotifications = notifications,
                    .transactions = transactions,
                    .counters = counters,
                    .trace = trace,
                    .signals = signals,
                    .process = process,
                    .launchEvents = launchEvents,
                    .propertyLists = propertyLists,
                    .urlSessions = urlSessions,
                    .interprocess = interprocess,
                    .device = device,
                    .locale = locale,
                    .maps = maps,
                    .accounts = accounts,
                    .management = management,
                    .location = location,
                    .networkProxy = *networkProxy,
                    .tagger = tagger,
                    .textInput = textInput,
                    .random = random,
                    .memoryPressure = memoryPressure,
                    .knowledge = knowledge};
};

std::unique_ptr<LinuxPlatform> LinuxPlatform::make(const LinuxPlatformOptions& options,
                                                   Error* error) {
  LinuxFileManager files(hostDirectories(options.environment));
  const auto refused = [error](Error problem) {
    if (error) *error = std::move(problem);
    return nullptr;
  };
  // What exists may be in use, so it stays as it is until the lock is ours.
  if (auto problem = makeStateDirectory(files)) return refused(std::move(*problem));
  Error problem;
  auto lock = StateLock::acquire(files.directories().state, &problem);
  if (!lock) return refused(std::move(problem));
  if (auto foreign = makeOtherDirectories(files)) return refused(std::move(*foreign));
  if (auto unfit = FileLog::refusal(options.logFile)) return refused(std::move(*unfit));
  const auto remarks = tidyDirectories(files.directories());
  auto services = std::make_unique<Services>(options, std::move(*lock), std::move(files));
  for (const auto& remark : remarks) Logger(services->log, "").notice("{}", remark);
  return std::unique_ptr<LinuxPlatform>(new LinuxPlatform(std::move(services)));
}

LinuxPlatform::LinuxPlatform(std::unique_ptr<Services> services) : services_(std::move(services)) {}
LinuxPlatform::~LinuxPlatform() = default;

Platform& LinuxPlatform::platform() { return services_->platform; }
DeviceProfileStore& LinuxPlatform::deviceProfile() { return services_->profile; }
PathWatcher& LinuxPlatform::pathWatcher() { return services_->watcher; }
LaunchEventStreams& LinuxPlatform::launchEvents() { return services_->launchEvents; }
LinuxWorkQueues& LinuxPlatform::queues() { return services_->queues; }

}  // namespace zelkord
