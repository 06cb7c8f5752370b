#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/api/Interprocess.h"
#include "platform/api/WorkQueues.h"
#include "platform/testing/FakeClient.h"
#include "platform/testing/FakeConnection.h"

namespace zelkord::ipc {

// The doors of the process, in memory: tests connect fake clients to them.
//
//   FakeInterprocess interprocess(timeline);
//   ... listen ...
//   auto client = interprocess.connect({.pid = 7});
//   auto answer = client->call("com.quenta.zelkord.Daemon1", "Bag", {});
//   timeline.run…
//   EXPECT_TRUE(answer->succeeded());
//
// Threading: the timeline's thread. Ownership: the queues outlive it.
// Errors: connecting to an address where nobody listens gives a refused client.
class FakeInterprocess final : public Interprocess {
 public:
  explicit FakeInterprocess(WorkQueues& queues) : queues_(queues) {}
  ~FakeInterprocess() override;

  std::optional<Error> listen(const std::string& name, ListenerConfiguration configuration,
                              std::shared_ptr<ListenerDelegate> delegate) override;
  std::unique_ptr<AnonymousListener> makeAnonymousListener(
      ListenerConfiguration configuration, std::shared_ptr<ListenerDelegate> delegate) override;
  std::variant<std::string, Error> executableName(pid_t pid) const override;
  Statistics statistics() const override { return statistics_; }

  // A client of the service.
  std::shared_ptr<FakeClient> connect(Peer peer = {.pid = 4711});
  // A client of an anonymous listener.
  std::shared_ptr<FakeClient> connect(const std::string& address, Peer peer = {.pid = 4711});
  // A bus caller without a connection calls the shared handler.
  std::shared_ptr<FakeAnswer> callShared(std::string interface, std::string member, Values values);
  void disconnectAll();

  void setListenError(std::optional<Error> error) { listenError_ = std::move(error); }
  // What `executableName` answers; a pid that was not set gives ENOENT.
  void setExecutableName(pid_t pid, std::string name) { executables_[pid] = std::move(name); }
  const std::string& name() const { return name_; }
  bool isListening() const { return doors_.contains(""); }

 private:
  class Listener;

  std::shared_ptr<FakeDoor> _makeDoor(ListenerConfiguration configuration,
                                      std::shared_ptr<ListenerDelegate> delegate);
  void _close(const std::string& address);

  WorkQueues& queues_;
  std::string name_;
  std::optional<Error> listenError_;
  std::map<pid_t, std::string> executables_;
  Statistics statistics_;
  int listeners_ = 0;
  struct Held {
    std::string address;
    std::shared_ptr<FakeConnection> connection;
  };
  std::map<std::string, std::shared_ptr<FakeDoor>> doors_;  // by address; "" is the service
  std::vector<Held> connections_;
};

}  // namespace zelkord::ipc
