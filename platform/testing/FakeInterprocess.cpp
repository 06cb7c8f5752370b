#include "platform/testing/FakeInterprocess.h"

#include <cerrno>
#include <utility>

namespace zelkord::ipc {

class FakeInterprocess::Listener final : public AnonymousListener {
 public:
  Listener(FakeInterprocess& transport, std::string address)
      : transport_(transport), address_(std::move(address)) {}
  ~Listener() override { transport_._close(address_); }
  const std::string& address() const override { return address_; }

 private:
  FakeInterprocess& transport_;
  const std::string address_;
};

FakeInterprocess::~FakeInterprocess() { disconnectAll(); }

std::optional<Error> FakeInterprocess::listen(const std::string& name,
                                              ListenerConfiguration configuration,
                                              std::shared_ptr<ListenerDelegate> delegate) {
  if (listenError_) return listenError_;
  name_ = name;
  doors_[""] = _makeDoor(std::move(configuration), std::move(delegate));
  return std::nullopt;
}

std::unique_ptr<AnonymousListener> FakeInterprocess::makeAnonymousListener(
    ListenerConfiguration configuration, std::shared_ptr<ListenerDelegate> delegate) {
  auto address = "fake:listener=" + std::to_string(++listeners_);
  doors_[address] = _makeDoor(std::move(configuration), std::move(delegate));
  return std::make_unique<Listener>(*this, std::move(address));
}

std::variant<std::string, Error> FakeInterprocess::executableName(pid_t pid) const {
  const auto found = executables_.find(pid);
  if (found == executables_.end()) return posixError(ENOENT);
  return found->second;
}

std::shared_ptr<FakeClient> FakeInterprocess::connect(Peer peer) { return connect("", peer); }

std::shared_ptr<FakeClient> FakeInterprocess::connect(const std::string& address, Peer peer) {
  const auto door = doors_.find(address);
  if (door == doors_.end()) {
    const auto nowhere =
        std::make_shared<FakeConnection>(peer, _makeDoor({}, nullptr), queues_, [] {});
    nowhere->disconnect();
    return nowhere;
  }
  // The transport forgets the connection at its end.
  const auto slot = std::make_shared<FakeConnection*>(nullptr);
  auto connection = std::make_shared<FakeConnection>(peer, door->second, queues_, [this, slot] {
    std::erase_if(connections_, [&](const Held& held) { return held.connection.get() == *slot; });
  });
  *slot = connection.get();
  connections_.push_back({address, connection});
  connection->start();
  return connection;
}

std::shared_ptr<FakeAnswer> FakeInterprocess::callShared(std::string interface, std::string member,
                                                         Values values) {
  auto answer = std::make_shared<FakeAnswer>();
  const auto door = doors_.find("");
  if (door == doors_.end()) return answer;
  const Method* method = door->second->check(interface, member, values, *answer);
  if (!method) return answer;
  Call call{std::move(interface), std::move(member), std::move(values),
            makeFakeReply(*method, answer)};
  door->second->queue->async(
      [handler = door->second->configuration.sharedHandler, call = std::move(call)] {
        if (handler) handler->handle(call);
      });
  return answer;
}

void FakeInterprocess::disconnectAll() {
  for (const auto& held : std::exchange(connections_, {})) held.connection->disconnect();
}

std::shared_ptr<FakeDoor> FakeInterprocess::_makeDoor(ListenerConfiguration configuration,
                                                      std::shared_ptr<ListenerDelegate> delegate) {
  auto door = std::make_shared<FakeDoor>();
  door->configuration = std::move(configuration);
  door->delegate = std::move(delegate);
  door->queue = queues_.makeSerialQueue("fake listener");
  door->statistics = &statistics_;
  return door;
}

void FakeInterprocess::_close(const std::string& address) {
  doors_.erase(address);
  const auto held = connections_;
  for (const auto& [at, connection] : held) {
    if (at == address) connection->disconnect();
  }
}

}  // namespace zelkord::ipc
