// What uses up connections, descriptors and the memory of messages.

#include <algorithm>
#include <thread>

#include "tests/soak/hostile/Attack.h"
#include "tests/soak/hostile/Caller.h"
#include "tests/soak/hostile/RawConnection.h"

namespace zelkord::soak {
namespace {

using namespace std::chrono_literals;

class Unauthenticated final : public Attack {
 public:
  explicit Unauthenticated(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "connections that never authenticate"; }
  std::chrono::milliseconds rest() const override { return 500ms; }
  std::uint64_t round() override {
    std::vector<RawConnection> held;
    for (int i = 0; i < 3'000; ++i) {
      held.emplace_back(aim_.socket);
      if (i % 100 == 99) std::this_thread::sleep_for(10ms);
    }
    std::this_thread::sleep_for(1s);
    return static_cast<std::uint64_t>(std::ranges::count_if(held, &RawConnection::isOpen));
  }

 private:
  const Aim aim_;
};

class HeldDescriptors final : public Attack {
 public:
  explicit HeldDescriptors(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "descriptors of messages that never end"; }
  std::chrono::milliseconds rest() const override { return 500ms; }
  std::uint64_t round() override {
    constexpr int kAtOnce = 50;
    std::uint64_t descriptors = 0;
    std::vector<RawConnection> held;
    for (int i = 0; i < 20; ++i) {
      RawConnection connection(aim_.socket);
      if (!connection.authenticate()) continue;
      connection.send(headOfLongCall(1024));
      for (int piece = 0; piece < 5 && connection.sendDescriptors(kAtOnce); ++piece)
        descriptors += kAtOnce;
      held.push_back(std::move(connection));
    }
    std::this_thread::sleep_for(2s);
    return descriptors;
  }

 private:
  const Aim aim_;
};

class UnfinishedMessages final : public Attack {
 public:
  explicit UnfinishedMessages(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "long messages that never end"; }
  std::chrono::milliseconds rest() const override { return 1s; }
  std::uint64_t round() override {
    constexpr std::uint32_t kBody = 3'900'000;
    const auto bytes = headOfLongCall(kBody) + std::string(kBody - 1, 'x');
    std::uint64_t begun = 0;
    std::vector<RawConnection> held;
    for (int i = 0; i < 150; ++i) {
      RawConnection connection(aim_.socket);
      if (!connection.authenticate()) continue;
      ++begun;
      connection.send(bytes);
      held.push_back(std::move(connection));
    }
    std::this_thread::sleep_for(1s);
    return begun;
  }

 private:
  const Aim aim_;
};

class UnreadAnswers final : public Attack {
 public:
  explicit UnreadAnswers(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "answers that nobody reads"; }
  std::chrono::milliseconds rest() const override { return 1s; }
  std::uint64_t round() override {
    std::uint64_t sent = 0;
    std::vector<Caller> held;
    for (int i = 0; i < 40; ++i) {
      Caller caller(addressOfSocket(aim_.socket));
      if (!caller.configure("com.quenta.hostile", "Hostile/1.0").empty()) sent += _askMuch(caller);
      held.push_back(std::move(caller));
    }
    std::this_thread::sleep_for(2s);
    return sent;
  }

 private:
  static std::uint64_t _askMuch(Caller& caller) {
    std::uint64_t sent = 0;
    while (sent < 2'000 && caller.call("com.quenta.zelkord.Daemon1", "Bag", [](auto&) {})) ++sent;
    return sent;
  }
  const Aim aim_;
};

}  // namespace

std::vector<std::unique_ptr<Attack>> connectionAttacks(const Aim& aim) {
  std::vector<std::unique_ptr<Attack>> attacks;
  attacks.push_back(std::make_unique<Unauthenticated>(aim));
  attacks.push_back(std::make_unique<HeldDescriptors>(aim));
  attacks.push_back(std::make_unique<UnfinishedMessages>(aim));
  attacks.push_back(std::make_unique<UnreadAnswers>(aim));
  return attacks;
}

}  // namespace zelkord::soak
