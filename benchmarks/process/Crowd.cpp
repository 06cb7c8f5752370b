#include "benchmarks/process/Crowd.h"

#include <sys/epoll.h>
#include <unistd.h>

#include <algorithm>
#include <array>

#include "benchmarks/process/BusConnecting.h"

namespace zelkord::bench {

struct Crowd::Member {
  zelkor::BusPointer bus;
  std::int64_t queryId = 0;
  std::uint32_t mask = 0;
};

struct Crowd::Question {
  Crowd& crowd;
  Clock::time_point asked;
  bool isSearch;
};

Crowd::Crowd(const std::string& address, std::size_t clients)
    : epoll_(::epoll_create1(EPOLL_CLOEXEC)) {
  for (std::size_t i = 0; i < clients; ++i) {
    auto& member = *members_.emplace_back(std::make_unique<Member>());
    member.bus = connectToPeer(address);
    epoll_event event{};
    event.data.ptr = &member;
    ::epoll_ctl(epoll_, EPOLL_CTL_ADD, sd_bus_get_fd(member.bus.get()), &event);
    _send(member,
          configureCall(member.bus.get(), "", "com.quenta.benchmark" + std::to_string(i % 4)),
          false);
  }
}

Crowd::~Crowd() { ::close(epoll_); }

void Crowd::search(std::size_t client, Search query) {
  auto& member = *members_[client];
  query.queryId = ++member.queryId;
  _send(member, searchCall(member.bus.get(), "", query), true);
}

void Crowd::_send(Member& member, zelkor::MessagePointer call, bool isSearch) {
  auto question = std::make_unique<Question>(Question{*this, Clock::now(), isSearch});
  const auto answered = [](sd_bus_message* reply, void* asked, sd_bus_error*) {
    const std::unique_ptr<Question> owned(static_cast<Question*>(asked));
    owned->crowd._answered(*owned, reply);
    return 1;
  };
  check(sd_bus_call_async(member.bus.get(), nullptr, call.get(), answered, question.get(), 0),
        "asking");
  question.release();
  ++pending_;
  _process(member);
}

void Crowd::_answered(const Question& question, sd_bus_message* reply) {
  --pending_;
  if (question.isSearch) {
    answers_.add(microsecondsSince(question.asked) / 1000);
    if (searchAnswer(reply).failed) ++errors_;
  } else if (sd_bus_message_is_method_error(reply, nullptr) > 0) {
    ++errors_;
  }
}

void Crowd::_process(Member& member) const {
  int result = 1;
  while (result > 0) result = sd_bus_process(member.bus.get(), nullptr);
  check(result, "a connection of the crowd");
  const auto wanted = static_cast<std::uint32_t>(sd_bus_get_events(member.bus.get()));
  if (wanted == member.mask) return;
  epoll_event event{};
  event.events = member.mask = wanted;
  event.data.ptr = &member;
  ::epoll_ctl(epoll_, EPOLL_CTL_MOD, sd_bus_get_fd(member.bus.get()), &event);
}

void Crowd::serveUntil(Clock::time_point end) {
  while (Clock::now() < end) _serveOnce(end);
}

void Crowd::serveUntilAnswered(Clock::time_point end) {
  while (pending_ > 0 && Clock::now() < end) _serveOnce(end);
}

void Crowd::_serveOnce(Clock::time_point end) {
  const auto left = std::chrono::ceil<std::chrono::milliseconds>(end - Clock::now()).count();
  std::array<epoll_event, 64> events{};
  const int count = ::epoll_wait(epoll_, events.data(), events.size(),
                                 static_cast<int>(std::max<std::int64_t>(left, 0)));
  for (int i = 0; i < count; ++i) {
    _process(*static_cast<Member*>(events[static_cast<std::size_t>(i)].data.ptr));
  }
}

}  // namespace zelkord::bench
