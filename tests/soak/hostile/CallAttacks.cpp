// What uses up transfers, image places, workers and the log.

#include <fmt/core.h>
#include <unistd.h>

#include "corezelkor/client/internal/Wire.h"
#include "tests/soak/hostile/Attack.h"
#include "tests/soak/hostile/Caller.h"

namespace zelkord::soak {
namespace {

using namespace std::chrono_literals;

class StalledCards final : public Attack {
 public:
  explicit StalledCards(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "cards of a service that stalls"; }
  std::chrono::milliseconds rest() const override { return 1s; }
  std::uint64_t round() override {
    std::uint64_t sent = 0;
    std::vector<Caller> callers;
    for (int i = 0; i < 4; ++i) {
      Caller caller(addressOfSocket(aim_.socket));
      if (caller.configure(kHostileIdentifier, kHostileAgent).empty()) continue;
      sent += _ask(caller);
      caller.process(500ms, ~0ull);
      callers.push_back(std::move(caller));
    }
    for (auto& caller : callers) caller.process(2s, ~0ull);
    return sent;
  }

 private:
  std::uint64_t _ask(Caller& caller) const {
    std::uint64_t sent = 0;
    zelkor::ZLKCardRequest request;
    for (int i = 1; i <= 255; ++i) {
      request.queryId = i;
      request.cardURL = fmt::format("{}/card?id={}", aim_.stalledURL, i);
      if (caller.request(request)) ++sent;
    }
    return sent;
  }
  const Aim aim_;
};

class StalledImages final : public Attack {
 public:
  explicit StalledImages(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "images of a host that stalls"; }
  std::chrono::milliseconds rest() const override { return 500ms; }
  std::uint64_t round() override {
    Caller caller(addressOfSocket(aim_.socket));
    const auto endpoint = caller.configure(kHostileIdentifier, kHostileAgent);
    Caller images(endpoint.empty() ? "unix:path=/nonexistent" : endpoint);
    std::uint64_t sent = 0;
    for (int call = 0; call < 4; ++call) {
      const bool asked =
          images.call("com.quenta.zelkord.Endpoint1", "LoadImages", [&](auto& writer) {
            zelkor::writeDescriptors(writer, _descriptors());
            writer.uint64(2'000);
          });
      if (asked) sent += 1'000;
    }
    images.process(3s, 4);
    return sent;
  }

 private:
  std::vector<zelkor::ImageDescriptor> _descriptors() {
    std::vector<zelkor::ImageDescriptor> descriptors(1'000);
    for (auto& descriptor : descriptors) {
      descriptor.url = fmt::format("{}/image/{}.png", aim_.stalledURL, ++number_);
    }
    return descriptors;
  }
  const Aim aim_;
  std::uint64_t number_ = 0;
};

class LongTexts final : public Attack {
 public:
  explicit LongTexts(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "configurations of 64 KiB"; }
  std::chrono::milliseconds rest() const override { return 500ms; }
  std::uint64_t round() override {
    const std::string text(65'000, 'a');
    std::uint64_t sent = 0;
    for (int i = 0; i < 20; ++i) {
      Caller caller(addressOfSocket(aim_.socket));
      if (caller.isOpen()) ++sent;
      caller.configure(kHostileIdentifier, text + std::to_string(i));
    }
    return sent;
  }

 private:
  const Aim aim_;
};

class NewIdentifiers final : public Attack {
 public:
  explicit NewIdentifiers(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "an identifier a connection"; }
  std::chrono::milliseconds rest() const override { return 500ms; }
  std::uint64_t round() override {
    std::uint64_t sent = 0;
    for (int i = 0; i < 50; ++i) {
      Caller caller(addressOfSocket(aim_.socket));
      if (caller.isOpen()) ++sent;
      caller.configure(fmt::format("{}.{}.{}", kHostileIdentifier, ::getpid(), ++number_),
                       kHostileAgent);
    }
    return sent;
  }

 private:
  const Aim aim_;
  std::uint64_t number_ = 0;
};

// Large answers that are kept on the disk, and asked for again.
class KeptAnswers final : public Attack {
 public:
  explicit KeptAnswers(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "large answers that are kept"; }
  std::chrono::milliseconds rest() const override { return 300ms; }
  std::uint64_t round() override {
    Caller caller(addressOfSocket(aim_.socket));
    if (caller.configure(kHostileIdentifier, kHostileAgent).empty()) return 0;
    zelkor::ZLKMoreResultsRequest request;
    for (int i = 1; i <= 20; ++i) {
      request.queryId = i;
      request.moreResultsURL = fmt::format("{}{}", aim_.keptURL, i);
      caller.request(request);
    }
    caller.process(2s, 20);
    return caller.answered();
  }

 private:
  const Aim aim_;
};

class NoisyAnswers final : public Attack {
 public:
  explicit NoisyAnswers(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "answers that the daemon complains about"; }
  std::chrono::milliseconds rest() const override { return 1s; }
  std::uint64_t round() override {
    Caller caller(addressOfSocket(aim_.socket));
    if (caller.configure(kHostileIdentifier, kHostileAgent).empty()) return 0;
    zelkor::ZLKMoreResultsRequest request;
    request.queryId = 1;
    request.moreResultsURL = aim_.hostileURL;
    caller.request(request);
    caller.process(2s, 1);
    return caller.answered();
  }

 private:
  const Aim aim_;
};

}  // namespace

std::vector<std::unique_ptr<Attack>> callAttacks(const Aim& aim) {
  std::vector<std::unique_ptr<Attack>> attacks;
  attacks.push_back(std::make_unique<StalledCards>(aim));
  attacks.push_back(std::make_unique<StalledImages>(aim));
  attacks.push_back(std::make_unique<LongTexts>(aim));
  attacks.push_back(std::make_unique<NewIdentifiers>(aim));
  attacks.push_back(std::make_unique<KeptAnswers>(aim));
  attacks.push_back(std::make_unique<NoisyAnswers>(aim));
  return attacks;
}

}  // namespace zelkord::soak
