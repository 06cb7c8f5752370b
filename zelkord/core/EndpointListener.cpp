#include "zelkord/core/EndpointListener.h"

#include "zelkord/assembly/Assembly.h"
#include "zelkord/core/EndpointConnection.h"

namespace zelkord {
namespace {

constexpr std::size_t kEndpointPlaces = 10;
constexpr std::uint64_t kImageCalls = 1024;

}  // namespace

EndpointListener::EndpointListener(Assembly& assembly, std::weak_ptr<ClientStateManager> manager)
    : assembly_(assembly),
      manager_(std::move(manager)),
      places_(std::make_shared<ConnectionPlaces>(assembly.platform().queues, kEndpointPlaces)),
      imageCalls_(std::make_shared<Budget>("image_calls", Budget::quartered(kImageCalls),
                                           assembly.limits())) {}

void EndpointListener::admit(const ipc::Peer&,
                             std::function<void(std::optional<Subscription>)> decide) {
  const auto& log = assembly_.log(Category::Connection);
  log.debug("new endpoint connection");
  places_->take([&log, decide = std::move(decide)](std::optional<Subscription> place) {
    if (!place) {
      log.error("endpoint semaphore timeout");
      return decide(std::nullopt);
    }
    auto held = std::make_shared<Subscription>(*std::move(place));
    decide(Subscription([&log, held] {
      log.debug("endpoint connection invalidated");
      held->reset();
    }));
  });
}

void EndpointListener::connectionBegan(const std::shared_ptr<ipc::Connection>& connection) {
  const auto handler = std::make_shared<EndpointConnection>(assembly_, manager_, imageCalls_);
  handler->start(connection);
  connection->setHandler(handler);
  connection->setInvalidationHandler([handler] { handler->invalidated(); });
}

}  // namespace zelkord
