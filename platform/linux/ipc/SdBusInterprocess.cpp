#include "platform/linux/ipc/SdBusInterprocess.h"

#include <fmt/format.h>
#include <sys/resource.h>
#include <systemd/sd-id128.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <utility>
#include <vector>

#include "platform/linux/ipc/BusPresence.h"
#include "platform/linux/ipc/ListeningSocket.h"
#include "platform/linux/ipc/PrivateListener.h"

namespace zelkord::ipc {
namespace {

// A handler may be blocked for longer; it is then left behind.
constexpr auto kLongestCleaning = 1s;
// For a few clients and the moment in which each becomes a connection.
constexpr std::size_t kReservedDescriptors = 8;

std::string randomSocketName() {
  sd_id128_t id{};
  char text[SD_ID128_STRING_MAX];
  sd_id128_randomize(&id);
  return sd_id128_to_string(id, text);
}

Error transportError(int number, std::string reason) {
  auto error = posixError(number);
  error.userInfo["reason"] = std::move(reason);
  return error;
}

std::string notificationInterface(const std::string& name) { return name + ".Notification1"; }

// As many descriptors as this process may open by now.
std::uint64_t descriptorLimit() {
  rlimit limit{};
  ::getrlimit(RLIMIT_NOFILE, &limit);
  return limit.rlim_cur;
}

IpcContext makeContext(Loop& loop, WorkQueues& queues, LogSink& log, LimitReports& limits,
                       SdBusOptions options) {
  const auto descriptors = options.descriptors > 0 ? options.descriptors : descriptorLimit();
  const ClientMemory::Size memory{options.clientMemory, options.clientMemory / 4,
                                  options.processCallsUnderWay};
  return {.loop = loop,
          .queues = queues,
          .log = Logger(log, "Zelkor_Connection"),
          .limits = limits,
          .options = std::move(options),
          .cleaning = queues.makeGroup(),
          .connections =
              std::make_shared<ConnectionBudgets>(ConnectionBudgets::sizeFor(descriptors), limits),
          .memory = std::make_shared<ClientMemory>(memory, limits),
          .reserve = std::make_shared<DescriptorReserve>(kReservedDescriptors)};
}

// The daemon's interfaces and the transport's own.
ListenerConfiguration withNotifications(ListenerConfiguration configuration,
                                        const std::string& name) {
  auto& all = configuration.interfaces;
  const auto wanted = notificationInterface(name);
  const bool described =
      std::any_of(all.begin(), all.end(), [&](const auto& i) { return i.name == wanted; });
  if (!described) all.push_back({wanted, {}, {{"Posted", "s name"}}});
  return configuration;
}

// Closes its listener from any thread, on the loop's.
class PrivateAnonymousListener final : public AnonymousListener {
 public:
  PrivateAnonymousListener(std::shared_ptr<LoopInbox> inbox,
                           std::shared_ptr<PrivateListener> listener, std::string path)
      : inbox_(std::move(inbox)),
        listener_(std::move(listener)),
        path_(std::move(path)),
        address_(ListeningSocket::address(path_)) {}
  ~PrivateAnonymousListener() override {
    ::unlink(path_.c_str());
    inbox_->post([listener = std::move(listener_)] { listener->close(); });
  }
  const std::string& address() const override { return address_; }

 private:
  const std::shared_ptr<LoopInbox> inbox_;
  std::shared_ptr<PrivateListener> listener_;
  const std::string path_;
  const std::string address_;
};

// When no socket can be made.
class DeafListener final : public AnonymousListener {
 public:
  const std::string& address() const override { return address_; }

 private:
  const std::string address_;
};

}  // namespace

// What the loop works with; late tasks hold it weakly.
struct SdBusInterprocess::Doors {
  std::string name;
  std::unique_ptr<BusPresence> bus;
  std::shared_ptr<PrivateListener> socket;
  std::vector<std::weak_ptr<PrivateListener>> anonymous;
};

SdBusInterprocess::SdBusInterprocess(WorkQueues& queues, LogSink& log, LimitReports& limits,
                                     SdBusOptions options)
    : loop_("zelkord-ipc", options.crew),
      context_(makeContext(loop_, queues, log, limits, std::move(options))),
      doors_(std::make_shared<Doors>()) {}

SdBusInterprocess::~SdBusInterprocess() {
  loop_.sync([this] {
    if (doors_->bus) doors_->bus->close();
    if (doors_->socket) doors_->socket->close();
    for (const auto& weak : doors_->anonymous) {
      if (const auto listener = weak.lock()) listener->close();
    }
  });
  loop_.stop();
  context_.cleaning->wait(kLongestCleaning);
}

std::optional<Error> SdBusInterprocess::listen(const std::string& name,
                                               ListenerConfiguration configuration,
                                               std::shared_ptr<ListenerDelegate> delegate) {
  ListeningSocket::removeDead(context_.options.runtimeDirectory, context_.options.socketName);
  configuration = withNotifications(std::move(configuration), name);
  const auto& options = context_.options;
  // Whoever sees the name finds the socket, and whom the socket answers finds the name: it listens
  // before the name is asked for, and is served after it is ours.
  auto socket = options.usesHandedOverSocket ? ListeningSocket::handedOver() : std::nullopt;
  if (!socket) {
    const auto path = options.runtimeDirectory + "/" + options.socketName;
    auto made = ListeningSocket::make(path);
    if (const auto* error = std::get_if<Error>(&made)) {
      return transportError(static_cast<int>(error->code),
                            path + ": " + std::strerror(static_cast<int>(error->code)));
    }
    socket.emplace(std::get<ListeningSocket>(std::move(made)));
  }
  BusName onBus;
  if (options.usesSessionBus) {
    onBus = acquireBusName(options.sessionBusAddress, name);
    if (onBus.outcome == BusName::Outcome::Taken) {
      return transportError(EEXIST, "the name " + name + " is taken on the session bus");
    }
    if (onBus.outcome == BusName::Outcome::NoBus) {
      context_.log.error("no session bus, the private socket alone is served: {}",
                         std::strerror(onBus.error));
    }
  }
  loop_.sync([&] {
    const auto service = name + ".Service1";
    doors_->name = name;
    doors_->socket = std::make_shared<PrivateListener>(context_, configuration, delegate, service);
    doors_->socket->serve(std::move(*socket));
    if (!options.usesSessionBus) return;
    doors_->bus = std::make_unique<BusPresence>(
        context_, name,
        [&context = context_, configuration, delegate, service, listener = doors_->socket](
            BusPtr bus, BusDoor::Events events) {
          return std::make_unique<BusDoor>(
              context, std::move(bus), configuration, delegate, service,
              [listener](Peer peer) { return listener->openConnection(peer); }, std::move(events));
        });
    doors_->bus->begin(std::move(onBus.bus));
  });
  return std::nullopt;
}

std::unique_ptr<AnonymousListener> SdBusInterprocess::makeAnonymousListener(
    ListenerConfiguration configuration, std::shared_ptr<ListenerDelegate> delegate) {
  const auto path = context_.options.runtimeDirectory + "/" + randomSocketName();
  auto made = ListeningSocket::make(path);
  if (const auto* error = std::get_if<Error>(&made)) {
    context_.log.error("no private socket at {}: {}", path, error->description());
    return std::make_unique<DeafListener>();
  }
  auto listener = std::make_shared<PrivateListener>(context_, std::move(configuration),
                                                    std::move(delegate), std::string());
  loop_.sync([&] {
    std::erase_if(doors_->anonymous, [](const auto& weak) { return weak.expired(); });
    doors_->anonymous.push_back(listener);
    listener->serve(std::get<ListeningSocket>(std::move(made)));
  });
  return std::make_unique<PrivateAnonymousListener>(loop_.inbox(), std::move(listener), path);
}

std::variant<std::string, Error> SdBusInterprocess::executableName(pid_t pid) const {
  std::array<char, 4096> target;
  const auto link = fmt::format("/proc/{}/exe", pid);
  const auto length = ::readlink(link.c_str(), target.data(), target.size());
  if (length < 0) return posixError(errno);
  std::string_view path(target.data(), static_cast<std::size_t>(length));
  constexpr std::string_view kDeleted = " (deleted)";  // the kernel's mark of an unlinked file
  if (path.ends_with(kDeleted)) path.remove_suffix(kDeleted.size());
  return std::string(path.substr(path.rfind('/') + 1));
}

Statistics SdBusInterprocess::statistics() const {
  auto statistics = context_.counts->snapshot();
  statistics.heldBytes = context_.memory->held();
  return statistics;
}

void SdBusInterprocess::postNotification(std::string_view name) {
  loop_.post([weak = std::weak_ptr(doors_), posted = std::string(name)] {
    const auto doors = weak.lock();
    if (!doors || !doors->socket) return;
    const auto interface = notificationInterface(doors->name);
    if (auto* bus = doors->bus ? doors->bus->door() : nullptr) {
      bus->signal({}, interface, "Posted", posted);
    }
    doors->socket->broadcast(interface, "Posted", posted);
  });
}

}  // namespace zelkord::ipc
