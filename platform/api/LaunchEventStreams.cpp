#include "platform/api/LaunchEventStreams.h"

#include <cstdint>
#include <deque>
#include <map>
#include <optional>
#include <utility>

#include "base/Mutex.h"

namespace zelkord {

struct LaunchEventStreams::State : std::enable_shared_from_this<State> {
  using Handler = std::function<void(const std::string&)>;

  struct Stream {
    std::deque<std::string> waiting;
    std::uint64_t id = 0;  // of the handler
    WorkQueue* queue = nullptr;
    std::shared_ptr<const Handler> handler;
  };

  // Asks the handler's queue to look at one event that waits.
  void poke(const std::string& name, Stream& stream) ZK_REQUIRES(mutex) {
    stream.queue->async([self = shared_from_this(), name, id = stream.id] { self->run(name, id); });
  }

  void run(const std::string& name, std::uint64_t id) {
    std::shared_ptr<const Handler> handler;
    std::string event;
    {
      const MutexLock lock(mutex);
      Stream& stream = streams[name];
      if (stream.id != id || !stream.handler || stream.waiting.empty()) return;
      handler = stream.handler;
      event = std::move(stream.waiting.front());
      stream.waiting.pop_front();
    }
    (*handler)(event);
  }

  void cancel(const std::string& name, std::uint64_t id) {
    std::shared_ptr<const Handler> released;
    const MutexLock lock(mutex);
    Stream& stream = streams[name];
    if (stream.id == id) released = std::exchange(stream.handler, nullptr);
  }

  Mutex mutex;
  std::uint64_t lastId ZK_GUARDED_BY(mutex) = 0;
  std::map<std::string, Stream> streams ZK_GUARDED_BY(mutex);
};

LaunchEventStreams::LaunchEventStreams() : state_(std::make_shared<State>()) {}

Subscription LaunchEventStreams::handle(const std::string& stream, WorkQueue& queue,
                                        std::function<void(const std::string& name)> handler) {
  auto shared = std::make_shared<const State::Handler>(std::move(handler));
  const MutexLock lock(state_->mutex);
  State::Stream& place = state_->streams[stream];
  place.id = ++state_->lastId;
  place.queue = &queue;
  place.handler.swap(shared);  // what was replaced goes after the lock
  for (std::size_t i = 0; i < place.waiting.size(); ++i) state_->poke(stream, place);
  return Subscription([state = state_, stream, id = place.id] { state->cancel(stream, id); });
}

void LaunchEventStreams::deliver(const std::string& stream, std::string name) {
  const MutexLock lock(state_->mutex);
  State::Stream& place = state_->streams[stream];
  place.waiting.push_back(std::move(name));
  if (place.handler) state_->poke(stream, place);
}

}  // namespace zelkord
