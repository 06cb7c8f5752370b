#include "zelkord/core/Daemon.h"

#include <csignal>

#include "corezelkor/Constants.h"
#include "platform/api/KnownSettings.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/core/ClientConnection.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/core/Diagnostics.h"
#include "zelkord/core/ZelkorService.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/feedback/StoredSessions.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/exchange/BagFeedbackGate.h"
#include "zelkord/network/exchange/ImageFetcher.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"
#include "zelkord/query/ClientState.h"
#include "zelkord/query/ResponseImages.h"
#include "zelkord/storage/ZelkorPersistentStorage.h"

namespace zelkord {
namespace {

constexpr Duration kLongestFinish = 700ms;

}  // namespace

Daemon::Daemon(Platform& platform) : platform_(platform) {}
Daemon::~Daemon() = default;

std::optional<Error> Daemon::start() {
  platform_.settings.registerDefaults(registeredSettings());
  assembly_ = std::make_unique<Assembly>(platform_);
  _makeServices();
  if (auto error = _listen()) return error;
  _handleLaunchEvents();
  _warm();
  _handleSignals();
  return std::nullopt;
}

// The order is required: a service finds earlier ones in the assembly.
void Daemon::_makeServices() {
  auto& assembly = *assembly_;
  const auto factory = std::make_shared<ZLKNetworkRequestFactory>(assembly);
  assembly.requestFactory.set(factory);
  factory->start();
  const auto storage = std::make_shared<ZelkorPersistentStorage>(assembly);
  assembly.persistentStorage.set(storage);
  storage->start();
  assembly.feedbackGate.set(std::make_shared<BagFeedbackGate>(assembly));
  assembly.feedbackSessions.set(std::make_shared<StoredSessions>(assembly));
  assembly.reporter().addValue(1, "com.quenta.zelkord.launch");
  assembly.imageFetcher.set(std::make_shared<ImageFetcher>(assembly));
  const auto bagController = std::make_shared<ZelkorBagController>(assembly, *factory);
  assembly.bagController.set(bagController);
  bagController->start();
  assembly.responseImages.set(std::make_shared<ResponseImages>(assembly));
  const auto states = std::make_shared<ClientStateManager>(assembly);
  assembly.clientStateManager.set(states);
  states->start();
}

std::optional<Error> Daemon::_listen() {
  diagnostics_ = std::make_shared<Diagnostics>(*assembly_, [this] {
    return service_ ? service_->getClientConnections()
                    : std::vector<std::shared_ptr<ClientConnection>>();
  });
  service_ = std::make_shared<ZelkorService>(*assembly_, diagnostics_);
  ipc::ListenerConfiguration configuration;
  configuration.interfaces = {ClientConnection::interface().description(),
                              Diagnostics::interface().description()};
  configuration.connectionInterface = std::string(kDaemonInterface);
  configuration.sharedHandler = diagnostics_;
  return platform_.interprocess.listen(std::string(kServiceName), std::move(configuration),
                                       service_);
}

void Daemon::_handleLaunchEvents() {
  eventQueue_ = platform_.queues.makeSerialQueue("com.quenta.zelkord.xpc_event");
  const auto handler = [&log = assembly_->defaultLog()](const std::string& name) {
    log.info("launch event for {}", name);
  };
  launchEvents_ = platform_.launchEvents.handle(kURLSessionLaunchStream, *eventQueue_, handler);
  notifyEvents_ = platform_.launchEvents.handle(kNotifyMatchingStream, *eventQueue_, handler);
}

void Daemon::_warm() {
  platform_.queues.global(QualityOfService::Background).async([&assembly = *assembly_] {
    assembly.bagController()->currentBag();
  });
  platform_.queues.global(QualityOfService::Default).async([&assembly = *assembly_] {
    assembly.notificationCenter().post(std::string(kZLKStartup));
  });
}

// What is recorded is finished as far as that takes no time worth naming: a disk or a queue that
// hangs must not keep the process.
void Daemon::_leave(const char* name) {
  assembly_->defaultLog().debug("{}", name);
  if (leaving_.exchange(true)) return;
  longestFinish_ = platform_.queues.main().after(
      kLongestFinish, [this] { platform_.process.exit(0); }, TimeBase::Real);
  _finishRecording();
  platform_.process.exit(0);
}

// Every record is in its file; the sessions stay as they are, for the next start to find.
void Daemon::_finishRecording() {
  if (auto* shared = assembly_->clientSessionManager()) shared->waitForPendingFeedback();
  for (const auto& state : assembly_->clientStateManager()->states()) {
    state->sessionManager().waitForPendingFeedback();
  }
  assembly_->persistentStorage()->waitForPendingWrites();
}

void Daemon::_handleSignals() {
  auto& queue = platform_.queues.global(QualityOfService::Default);
  const auto leaveOn = [&](int number, const char* name) {
    return platform_.signals.on(number, queue, [this, name] { _leave(name); });
  };
  interrupt_ = leaveOn(SIGINT, "SIGINT");
  terminate_ = leaveOn(SIGTERM, "SIGTERM");
}

}  // namespace zelkord
