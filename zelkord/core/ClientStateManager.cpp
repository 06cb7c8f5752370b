#include "zelkord/core/ClientStateManager.h"

#include "platform/api/RandomUUID.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/core/EndpointConnection.h"
#include "zelkord/core/EndpointListener.h"
#include "zelkord/query/ErrorCodes.h"

namespace zelkord {
namespace {

constexpr std::string_view kSessionsKey = "sessions";
constexpr const char* kOwnHolder = "zelkord";  // who has the states that an earlier process saved

constexpr std::uint64_t kMostStates = 4096;
constexpr std::uint64_t kMostStateBytes = 128u << 20;
constexpr std::uint64_t kMostCacheBytes = 64u << 20;
// As many threads as may wait; one process never leaves the others without any.
constexpr Budget::Size kBagWaits = {1024, 256, 960};

std::shared_ptr<ClientBudgets> makeClientBudgets(LimitReports& reports) {
  return std::make_shared<ClientBudgets>(
      ClientBudgets{Budget("query_cache_bytes", Budget::quartered(kMostCacheBytes), reports),
                    Budget("bag_waits", kBagWaits, reports)});
}

// A state with its queues and observers; its texts, each kept in several places.
std::uint64_t costOf(const std::string& identifier, std::size_t userAgentSize) {
  constexpr std::uint64_t kFixed = 16u << 10;
  constexpr std::uint64_t kBytesOfAByte = 4;
  return kFixed + kBytesOfAByte * (identifier.size() + userAgentSize);
}

}  // namespace

ClientStateManager::ClientStateManager(Assembly& assembly)
    : assembly_(assembly),
      stateCacheQueue_(assembly.platform().queues.makeSerialQueue("com.quenta.zelkord.stateCache")),
      persistSessions_(boolSetting(assembly.userDefaults(), "ZLKPersistSessions")),
      counts_("client_states", Budget::quartered(kMostStates), assembly.limits()),
      bytes_("client_state_bytes", Budget::quartered(kMostStateBytes), assembly.limits()),
      clientBudgets_(makeClientBudgets(assembly.limits())) {}

ClientStateManager::~ClientStateManager() = default;

void ClientStateManager::start() {
  endpointListener_ = std::make_shared<EndpointListener>(assembly_, weak_from_this());
  ipc::ListenerConfiguration configuration;
  configuration.interfaces = {EndpointConnection::interface().description()};
  configuration.connectionInterface = configuration.interfaces.front().name;
  configuration.delegateBoundsConnections = true;
  listener_ = assembly_.platform().interprocess.makeAnonymousListener(std::move(configuration),
                                                                      endpointListener_);
  stateCacheQueue_->sync([this] { _loadState(); });
}

const std::string& ClientStateManager::endpoint() const {
  static const std::string kNone;
  return listener_ ? listener_->address() : kNone;
}

std::shared_ptr<ClientState> ClientStateManager::stateForClientIdentifier(
    const std::string& identifier) {
  if (!_isUsable(identifier)) return nullptr;
  std::shared_ptr<ClientState> state;
  stateCacheQueue_->sync([&] {
    stateCacheQueue_->assertCurrent();
    state = _place(identifier, 0, kOwnHolder);
  });
  if (state) assembly_.log(Category::Session).info("using client state: {}", identifier);
  return state;
}

bool ClientStateManager::admit(const std::string& identifier, const std::string& userAgent,
                               std::int64_t process) {
  bool fits = false;
  stateCacheQueue_->sync([&] {
    stateCacheQueue_->assertCurrent();
    fits = _place(identifier, userAgent.size(), processHolder(process)) != nullptr;
  });
  return fits;
}

std::shared_ptr<ClientState> ClientStateManager::_place(const std::string& identifier,
                                                        std::size_t userAgentSize,
                                                        const std::string& holder) {
  stateCacheQueue_->assertCurrent();
  const auto found = stateCache_.find(identifier);
  const auto cost = costOf(identifier, userAgentSize);
  if (found != stateCache_.end() && found->second.bytes.amount() >= cost) {
    return found->second.state;
  }
  auto bytes = bytes_.take(holder, cost);
  if (!bytes) return nullptr;
  if (found != stateCache_.end()) {
    found->second.bytes = *std::move(bytes);
    return found->second.state;
  }
  auto count = counts_.take(holder);
  if (!count) return nullptr;
  auto state = std::make_shared<ClientState>(identifier, assembly_, clientBudgets_);
  stateCache_.emplace(identifier, Place{state, *std::move(count), *std::move(bytes)});
  return state;
}

bool ClientStateManager::_isUsable(const std::string& identifier) const {
  if (!identifier.empty()) return true;
  assembly_.log(Category::Session).fault("client session identifier cannot be nil or empty");
  return false;
}

std::shared_ptr<ClientState> ClientStateManager::configuredState(const std::string& identifier) {
  if (!_isUsable(identifier)) return nullptr;
  std::shared_ptr<ClientState> state;
  stateCacheQueue_->sync([&] {
    stateCacheQueue_->assertCurrent();
    const auto found = stateCache_.find(identifier);
    if (found != stateCache_.end() && found->second.state->configuration()) {
      state = found->second.state;
    }
  });
  if (state) assembly_.log(Category::Session).info("using client state: {}", identifier);
  return state;
}

void ClientStateManager::_loadState() {
  stateCacheQueue_->assertCurrent();
  if (!persistSessions_) return;
  for (const auto& entry : listSetting(assembly_.userDefaults(), kSessionsKey)) {
    const auto* fields = entry.if_object();
    const auto identifier = fields ? stringIn(*fields, "identifier") : std::nullopt;
    if (!identifier || identifier->empty()) continue;
    auto userAgent = stringIn(*fields, "agent");
    const auto state = _place(*identifier, userAgent ? userAgent->size() : 0, kOwnHolder);
    if (state) state->setUserAgent(std::move(userAgent));
  }
}

void ClientStateManager::saveState() {
  if (!persistSessions_ || saveIsDue_.exchange(true)) return;
  stateCacheQueue_->async([weak = weak_from_this()] {
    if (const auto self = weak.lock()) self->_save();
  });
}

void ClientStateManager::_save() {
  stateCacheQueue_->assertCurrent();
  saveIsDue_ = false;
  json::array entries;
  for (const auto& session : _sessions()) {
    json::object entry;
    for (const auto& [key, value] : session) entry[key] = value;
    entries.push_back(std::move(entry));
  }
  assembly_.userDefaults().set(kSessionsKey, std::move(entries));
  // Elsewhere: it may wait for the disk, and every new client waits for this queue.
  auto& elsewhere = assembly_.platform().queues.global(QualityOfService::Default);
  elsewhere.async([weak = weak_from_this()] {
    if (const auto self = weak.lock()) self->assembly_.userDefaults().flush();
  });
}

std::vector<ipc::StringMap> ClientStateManager::sessions() {
  std::vector<ipc::StringMap> sessions;
  stateCacheQueue_->sync([&] {
    stateCacheQueue_->assertCurrent();
    sessions = _sessions();
  });
  return sessions;
}

std::vector<ipc::StringMap> ClientStateManager::_sessions() const {
  stateCacheQueue_->assertCurrent();
  std::vector<ipc::StringMap> sessions;
  for (const auto& [identifier, place] : stateCache_) {
    const auto agent = place.state->userAgent();
    if (agent) sessions.push_back({{"identifier", identifier}, {"agent", *agent}});
  }
  return sessions;
}

std::vector<std::shared_ptr<ClientState>> ClientStateManager::states() {
  std::vector<std::shared_ptr<ClientState>> states;
  stateCacheQueue_->sync([&] {
    stateCacheQueue_->assertCurrent();
    for (const auto& [identifier, place] : stateCache_) states.push_back(place.state);
  });
  return states;
}

void ClientStateManager::processImagesFromResponse(const json::value& response, const ZLKBag* bag) {
  if (auto* images = assembly_.responseImages()) images->processImagesFromResponse(response, bag);
}

std::shared_ptr<ImageCall> ClientStateManager::loadImages(ImageOrder order,
                                                          ImageCall::Completion completion) {
  if (auto* images = assembly_.responseImages()) {
    return images->loadImages(std::move(order), std::move(completion));
  }
  completion({});
  return nullptr;
}

void ClientStateManager::request(const std::shared_ptr<ZLKRequest>& request,
                                 const ZLKSessionConfiguration& configuration,
                                 const ReplyCallback& reply) {
  if (!request) return;
  if (request->uuid.empty()) request->uuid = randomUUID(assembly_.platform().random).string();
  const auto state = configuredState(configuration.identifier);
  if (!state) {
    reply(request->queryId, std::nullopt,
          zelkorError(kConnectionFault, "invalid configuration " + configuration.description()));
  } else if (const auto& kind = queryKindOf(*request); kind.isAtEndpoint) {
    kind.start(kind, state, request, reply);
  }
}

}  // namespace zelkord
