// What uses up records, containers, counters and members of sessions.

#include <fmt/core.h>

#include "corezelkor/proto/Feedback.pb.h"
#include "tests/soak/hostile/Attack.h"
#include "tests/soak/hostile/Caller.h"

namespace zelkord::soak {
namespace {

using namespace std::chrono_literals;

class ManyUserAgents final : public Attack {
 public:
  explicit ManyUserAgents(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "a user agent a call"; }
  std::chrono::milliseconds rest() const override { return 500ms; }
  std::uint64_t round() override {
    std::uint64_t sent = 0;
    for (int i = 0; i < 50; ++i) {
      Caller caller(addressOfSocket(aim_.socket));
      if (caller.configure(kHostileIdentifier, fmt::format("Hostile/{}", ++number_)).empty())
        continue;
      if (caller.report("HVRankingFeedback", "")) ++sent;
      caller.process(100ms, 1);
    }
    return sent;
  }

 private:
  const Aim aim_;
  std::uint64_t number_ = 0;
};

class EmptyResults final : public Attack {
 public:
  explicit EmptyResults(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "records of 65,536 empty results"; }
  std::chrono::milliseconds rest() const override { return 500ms; }
  std::uint64_t round() override {
    corezelkor::CZResultsReceivedAfterTimeoutFeedback message;
    for (int i = 0; i < 65'536; ++i) message.add_results();
    return reportMany(aim_, "HVResultsReceivedAfterTimeoutFeedback", message.SerializeAsString(),
                      20);
  }
  static std::uint64_t reportMany(const Aim& aim, const char* feedbackClass,
                                  const std::string& message, int times) {
    Caller caller(addressOfSocket(aim.socket));
    if (caller.configure(kHostileIdentifier, kHostileAgent).empty()) return 0;
    std::uint64_t sent = 0;
    for (int i = 0; i < times; ++i) {
      if (caller.report(feedbackClass, message)) ++sent;
    }
    caller.process(1s, sent);
    return sent;
  }

 private:
  const Aim aim_;
};

class LargeCustomFeedback final : public Attack {
 public:
  explicit LargeCustomFeedback(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "custom feedback of half a MiB"; }
  std::chrono::milliseconds rest() const override { return 500ms; }
  std::uint64_t round() override {
    corezelkor::CZCustomFeedback message;
    message.set_feedback_type(1);
    message.set_json_feedback("{\"x\":\"" + std::string(500'000, 'x') + "\"}");
    return EmptyResults::reportMany(aim_, "HVCustomFeedback", message.SerializeAsString(), 20);
  }

 private:
  const Aim aim_;
};

class UnboundReports final : public Attack {
 public:
  explicit UnboundReports(const Aim& aim) : aim_(aim) {}
  const char* name() const override { return "reports without a configuration"; }
  std::chrono::milliseconds rest() const override { return 500ms; }
  std::uint64_t round() override {
    Caller caller(addressOfSocket(aim_.socket));
    std::uint64_t sent = 0;
    for (int i = 0; i < 500; ++i) {
      if (caller.report("HVRankingFeedback", "")) ++sent;
    }
    caller.process(500ms, sent);
    return sent;
  }

 private:
  const Aim aim_;
};

}  // namespace

std::vector<std::unique_ptr<Attack>> feedbackAttacks(const Aim& aim) {
  std::vector<std::unique_ptr<Attack>> attacks;
  attacks.push_back(std::make_unique<ManyUserAgents>(aim));
  attacks.push_back(std::make_unique<EmptyResults>(aim));
  attacks.push_back(std::make_unique<LargeCustomFeedback>(aim));
  attacks.push_back(std::make_unique<UnboundReports>(aim));
  return attacks;
}

}  // namespace zelkord::soak
