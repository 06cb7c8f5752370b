#include "zelkord/core/ZelkorService.h"

#include <algorithm>
#include <cstring>

#include "zelkord/assembly/Assembly.h"
#include "zelkord/core/ClientConnection.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/network/context/ZelkorUserGUIDController.h"

namespace zelkord {
namespace {

constexpr std::size_t kTooManyConnections = 2;
// What was under way for clients that have left goes on for a while, and then frees its memory.
constexpr Duration kWorkEnds = 1s;
constexpr Duration kLastWorkEnds = 5s;

}  // namespace

ZelkorService::ZelkorService(Assembly& assembly, std::shared_ptr<ipc::CallHandler> otherCalls)
    : assembly_(assembly),
      otherCalls_(std::move(otherCalls)),
      queue_(assembly.platform().queues.makeSerialQueue("com.quenta.zelkor.serviceQueue")) {
  assembly.setSharedSession(boolSetting(assembly.userDefaults(), "ZLKSharedSession"));
  const auto guidController = std::make_shared<ZelkorUserGUIDController>(assembly);
  assembly.guidController.set(guidController);
  assembly.clientSessionManager.set(
      assembly.feedbackSessions()->makeManager("zelkor", guidController));
}

ZelkorService::~ZelkorService() = default;

void ZelkorService::admit(const ipc::Peer&,
                          std::function<void(std::optional<Subscription>)> decide) {
  decide(Subscription([] {}));
}

std::optional<std::string> ZelkorService::clientIDForConnection(const Assembly& assembly,
                                                                const ipc::Peer& peer) {
  auto name = assembly.platform().interprocess.executableName(peer.pid);
  if (auto* text = std::get_if<std::string>(&name)) return std::move(*text);
  const auto code = static_cast<int>(std::get<Error>(name).code);
  assembly.log(Category::Connection)
      .error("error getting path for pid [{}] {}", peer.pid, std::strerror(code));
  return std::nullopt;
}

void ZelkorService::connectionBegan(const std::shared_ptr<ipc::Connection>& connection) {
  const auto peer = connection->peer();
  const auto name = orNull(clientIDForConnection(assembly_, peer));
  assembly_.log(Category::Connection).notice("new connection from {} ({})", name, peer.pid);
  const auto client = std::make_shared<ClientConnection>(assembly_, connection, otherCalls_);
  client->start();
  connection->setHandler(client);
  queue_->async([self = shared_from_this(), client] { self->_append(client); });
  connection->setInvalidationHandler([weak = weak_from_this(), client, name] {
    if (const auto self = weak.lock()) self->_invalidated(client, name);
  });
  assembly_.reporter().addValue(1, "com.quenta.zelkord.clientconnection");
}

void ZelkorService::_append(const std::shared_ptr<ClientConnection>& client) {
  queue_->assertCurrent();
  connections_.push_back(client);
  const auto pid = client->peer().pid;
  const auto count = static_cast<std::size_t>(
      std::count_if(connections_.begin(), connections_.end(),
                    [pid](const auto& other) { return other->peer().pid == pid; }));
  if (count < kTooManyConnections) return;
  assembly_.log(Category::Connection).error("too many connections {} from pid {}", count, pid);
}

void ZelkorService::_invalidated(const std::shared_ptr<ClientConnection>& client,
                                 const std::string& name) {
  assembly_.log(Category::Connection)
      .notice("connection from {} ({}) invalidated", name, client->peer().pid);
  client->invalidated();
  queue_->async([self = shared_from_this(), client] { self->_end(client); });
}

void ZelkorService::_end(const std::shared_ptr<ClientConnection>& client) {
  const auto state = client->state();
  client->flushSessionInvalidation([&assembly = assembly_](bool flushed) {
    assembly.log(Category::Session)
        .debug("session {} on invalidation", flushed ? "flushed" : "not flushed");
  });
  _remove(client);
  if (state) state->count("xcpinvalidation");
}

void ZelkorService::_remove(const std::shared_ptr<ClientConnection>& client) {
  queue_->assertCurrent();
  std::erase(connections_, client);
  if (!connections_.empty()) {
    // One for all that leave meanwhile.
    if (!release_) release_ = _releaseAfter(kWorkEnds);
    return;
  }
  assembly_.log(Category::Caching).debug("purging url cache");
  assembly_.urlSession().purgeMemoryCache();
  assembly_.platform().process.releaseFreeMemory();
  release_ = _releaseAfter(kLastWorkEnds);
}

Subscription ZelkorService::_releaseAfter(Duration delay) {
  return queue_->after(delay, [weak = weak_from_this()] {
    const auto self = weak.lock();
    if (!self) return;
    self->queue_->assertCurrent();
    self->release_.reset();
    self->assembly_.platform().process.releaseFreeMemory();
  });
}

std::vector<std::shared_ptr<ClientConnection>> ZelkorService::getClientConnections() {
  std::vector<std::shared_ptr<ClientConnection>> copy;
  queue_->sync([&] {
    queue_->assertCurrent();
    copy = connections_;
  });
  return copy;
}

}  // namespace zelkord
