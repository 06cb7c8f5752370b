#include "benchmarks/process/floor/echo/FloorEcho.h"

#include <sys/epoll.h>

#include <array>

#include "benchmarks/process/floor/FloorAnswers.h"

namespace zelkord::bench {

FloorEcho::FloorEcho(const std::string& socketPath, sd_bus* bus, std::size_t bodySize)
    : epoll_(::epoll_create1(EPOLL_CLOEXEC)),
      body_(bodySize, 'p'),
      door_(epoll_, socketPath,
            [this](zelkor::MessagePointer call) { worker_.give(std::move(call)); }) {
  watchInput(epoll_, worker_.wakeUp());
  if (bus) door_.serve(bus);
}

void FloorEcho::run() {
  std::array<epoll_event, 64> events{};
  while (true) {
    const int count = ::epoll_wait(epoll_, events.data(), events.size(), -1);
    for (int i = 0; i < count; ++i) {
      const int descriptor = events[static_cast<std::size_t>(i)].data.fd;
      if (!door_.ready(descriptor)) _sendReplies();
    }
  }
}

void FloorEcho::_sendReplies() {
  for (const auto& call : worker_.take()) {
    door_.send(asksForConfiguration(call.get()) ? configuration(call.get())
                                                : answerWith(body_, 1, call.get()));
  }
}

}  // namespace zelkord::bench
