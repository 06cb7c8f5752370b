#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/feedback/RecordingSessions.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"
#include "zelkord/query/ClientState.h"
#include "zelkord/query/QueryKind.h"

namespace zelkord {

// The query side of the daemon on fakes: an assembly with everything below the connections.
class QueryBed {
 public:
  QueryBed();

  // One reply that a flow gave.
  struct Answer {
    int count = 0;
    std::int64_t queryId = 0;
    std::optional<ZLKReply> reply;
    std::optional<Error> error;
  };

  // Installs a bag of the given JSON text.
  void installBag(const std::string& text);
  std::shared_ptr<ClientState> makeState(const std::string& identifier = "lanthe",
                                         const std::string& userAgent = "Lanthe/9");
  // Asks and runs what is due; the answer fills itself when it comes.
  std::shared_ptr<Answer> search(ClientState& state, const std::string& text,
                                 std::int64_t queryId = 1);
  std::shared_ptr<Answer> search(ClientState& state, ZLKSearchRequest request);
  // The same for any kind of query.
  template <typename Request>
  std::shared_ptr<Answer> ask(ClientState& state, Request request) {
    return _ask(state, std::make_shared<const Request>(std::move(request)));
  }

  FakeURLSession& urlSession() { return *fakes.urlSessions.find("urlSession"); }
  // Class names of what was recorded for all clients, oldest first.
  std::vector<std::string> recordedClasses() const;
  std::vector<ZelkorFeedback> records() const;
  std::int64_t counter(const std::string& key) { return fakes.counters.all()[key]; }

  FakePlatform fakes;
  Assembly assembly;
  std::shared_ptr<RecordingSessionManager> sessions;

 private:
  std::shared_ptr<Answer> _ask(ClientState& state, std::shared_ptr<const ZLKRequest> request);
};

// A bag under which searches go out.
inline constexpr const char* kTestBag =
    R"({"version":"1","search_url":"https://search.example/s","warm_url":"https://search.example/w"})";

}  // namespace zelkord
