#include "benchmarks/process/floor/broker/FloorBroker.h"

#include <sys/epoll.h>

#include <array>
#include <memory>
#include <utility>

#include "benchmarks/process/SearchCall.h"
#include "benchmarks/process/floor/FloorAnswers.h"

namespace zelkord::bench {

FloorBroker::FloorBroker(const std::string& socketPath, std::string url,
                         const std::vector<std::string>& headers)
    : epoll_(::epoll_create1(EPOLL_CLOEXEC)),
      url_(std::move(url)),
      fetches_(epoll_, headers),
      door_(epoll_, socketPath, [this](zelkor::MessagePointer call) { _handle(std::move(call)); }) {
}

void FloorBroker::run() {
  std::array<epoll_event, 64> events{};
  while (true) {
    const int count = ::epoll_wait(epoll_, events.data(), events.size(), fetches_.timeUntilDue());
    for (int i = 0; i < count; ++i) {
      const auto& event = events[static_cast<std::size_t>(i)];
      if (!door_.ready(event.data.fd)) fetches_.ready(event.data.fd, event.events);
    }
    fetches_.runDue();
  }
}

void FloorBroker::_handle(zelkor::MessagePointer call) {
  if (asksForConfiguration(call.get())) return door_.send(configuration(call.get()));
  const auto search = searchIn(call.get());
  std::string url = url_ + "&q=" + fetches_.escaped(search.queryString);
  for (const auto& [name, value] : search.queryItems) {
    url += '&' + fetches_.escaped(name) + '=' + fetches_.escaped(value);
  }
  const std::shared_ptr<sd_bus_message> kept(std::move(call));
  fetches_.begin(url, [this, kept, number = search.queryId](const std::string* body) {
    door_.send(body ? answerWith(*body, number, kept.get()) : failure(kept.get()));
  });
}

}  // namespace zelkord::bench
