#pragma once

#include <memory>
#include <string>

#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/core/Daemon.h"

namespace zelkord {

// The whole daemon on fakes, started; tests are its clients, its service and its host.
class DaemonBed {
 public:
  using Client = std::shared_ptr<ipc::FakeClient>;
  using Answer = std::shared_ptr<ipc::FakeAnswer>;

  // With these settings of the user.
  explicit DaemonBed(const json::object& settings = {});
  ~DaemonBed();

  Client connect(pid_t pid = 100);
  // Calls of the daemon's interface; what is due has run when they return.
  Answer call(const Client& client, const std::string& member, ipc::Values values = {});
  Answer configure(const Client& client, const std::string& identifier = "lanthe",
                   const std::string& userAgent = "Lanthe/9");
  Answer search(const Client& client, std::int64_t queryId, const std::string& text = "snow",
                ipc::Dictionary more = {});
  // A client that is configured.
  Client connectAndConfigure(const std::string& identifier = "lanthe", pid_t pid = 100);

  void installBag(const std::string& text);
  FakeURLSession& urlSession() { return *fakes.urlSessions.find("urlSession"); }
  void run() { fakes.timeline.runUntilIdle(); }

  FakePlatform fakes;
  Daemon daemon{fakes.platform()};
};

// A bag under which searches go out.
inline constexpr const char* kServedBag = R"({"version":"4","search_url":"https://s.example/s"})";

// The error that a reply carries at that place; empty reason: none.
std::string reasonIn(const ipc::FakeAnswer& answer, std::size_t place);
bool isNothing(const ipc::FakeAnswer& answer, std::size_t place);

}  // namespace zelkord
