#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <random>
#include <set>

#include "zelkord/feedback/ClientSessionManager.h"
#include "zelkord/feedback/SessionsTestSupport.h"

// A year of days with bursts of typing, views, engagements, idle nights and a clock that is set now
// and then; what the sessions were is held against a model that knows none of the code.

namespace zelkord {
namespace {

// An identifier that is replaced at its first use after 900 s, or at once.
struct AgingGUIDs final : UserGUIDSource {
  explicit AgingGUIDs(const Clock& time) : clock(time), born(time.now()) {}

  UUID currentUserGUID() override {
    if (clock.now() - born >= 900s) reset();
    return UUID{{static_cast<std::uint8_t>(number >> 16), static_cast<std::uint8_t>(number >> 8),
                 static_cast<std::uint8_t>(number)}};
  }
  void reset() override {
    ++number;
    born = clock.now();
  }

  const Clock& clock;
  SteadyTime born;
  std::uint32_t number = 1;
};

struct Use {
  double at = 0;  // seconds since the beginning
  bool isEngagement = false;
  bool isBrowser = false;
};

// What one container must say.
struct Expected {
  std::string agent;
  std::string end;
  std::string previous;
  bool firstUse = false;
  std::size_t records = 0;  // without the end's

  friend bool operator==(const Expected&, const Expected&) = default;
  friend std::ostream& operator<<(std::ostream& out, const Expected& session) {
    return out << session.agent << ", " << session.end << ", after " << session.previous << ", "
               << session.firstUse << ", " << session.records;
  }
};

class Model {
 public:
  std::vector<Expected> sessions;
  std::map<std::string, int> activeDays;

  // `dayOfMonth` is the one of the wall clock.
  void use(const Use& use, unsigned dayOfMonth) {
    if (isOpen_ && use.at >= openedAt_ + 900) _close("max session time passed");
    if (use.at - identifierAt_ >= 900) _renew(use.at);
    if (isOpen_ && sessionIdentifier_ != identifier_) {
      _close("guid changed");
    } else if (isOpen_ && use.at >= openedAt_ + 600) {
      if (use.isEngagement) {
        _add(use, dayOfMonth);
        _close("engagement received");
        _renew(use.at);
        lastAt_ = use.at;
        return;
      }
      if (use.at - lastAt_ >= 180) {
        _close("session idle");
        _renew(use.at);
      }
    }
    if (!isOpen_) _open(use.at);
    _add(use, dayOfMonth);
    lastAt_ = use.at;
  }
  void finish() {
    if (isOpen_) _close("max session time passed");
  }

 private:
  void _renew(double now) {
    ++identifier_;
    identifierAt_ = now;
  }
  void _open(double now) {
    isOpen_ = true;
    openedAt_ = now;
    sessionIdentifier_ = identifier_;
    members_.clear();
  }
  void _add(const Use& use, unsigned dayOfMonth) {
    const std::string agent = use.isBrowser ? "Brelin/1" : "Lanthe/9";
    const auto [member, isNew] = members_.try_emplace(agent, sessions.size());
    if (isNew) sessions.push_back({agent, "", previous_, _isFirstUse(agent, dayOfMonth), 0});
    ++sessions[member->second].records;
  }
  bool _isFirstUse(const std::string& agent, unsigned dayOfMonth) {
    const auto [day, isNew] = days_.try_emplace(agent, dayOfMonth);
    if (!isNew && day->second == dayOfMonth) return false;
    day->second = dayOfMonth;
    ++activeDays[agent];
    return true;
  }
  void _close(const std::string& reason) {
    for (const auto& member : members_) sessions[member.second].end = reason;
    previous_ = reason;
    isOpen_ = false;
  }

  bool isOpen_ = false;
  double openedAt_ = 0;
  double lastAt_ = 0;
  double identifierAt_ = 0;
  int identifier_ = 0;
  int sessionIdentifier_ = 0;
  std::string previous_ = "no previous session";
  std::map<std::string, std::size_t> members_;
  std::map<std::string, unsigned> days_;
};

// One day's uses. Times have odd fractions, so that none falls on a timer.
std::vector<Use> usesOfDay(int day, std::mt19937& random) {
  const auto number = [&](int least, int most) {
    return std::uniform_int_distribution<int>(least, most)(random);
  };
  std::vector<Use> uses;
  double at = day * 86'400.0 + number(6 * 3600, 9 * 3600) + 0.0137;
  for (int burst = number(0, 6); burst > 0; --burst) {
    const int pace = number(1, 4);  // typing quickly, or coming back now and then
    for (int i = number(3, 50); i > 0; --i) {
      at += pace == 4 ? number(20, 260) : number(1, 3 * pace * pace);
      at += 0.001 * number(1, 900);
      uses.push_back({at, number(0, 11) == 0, number(0, 3) == 0});
    }
    at += number(60, 3 * 3600);
  }
  return uses;
}

unsigned dayOfMonth(WallTime time) {
  return static_cast<unsigned>(
      std::chrono::year_month_day(std::chrono::floor<std::chrono::days>(time)).day());
}

TEST(YearOfUseTest, SessionsAreThoseOfAnIndependentModel) {
  SessionsBed bed(true);
  bed.fakes.locale.zone = "UTC";
  auto& timeline = bed.fakes.timeline;
  const auto guids = std::make_shared<AgingGUIDs>(timeline);
  const auto manager =
      std::make_shared<ClientSessionManager>(bed.assembly, guids, "zelkor", bed.room);
  const auto beginning = timeline.now();
  std::mt19937 random(20261123);
  Model model;
  for (int day = 0; day < 365; ++day) {
    for (const auto& use : usesOfDay(day, random)) {
      timeline.advance(beginning + durationOfSeconds(use.at) - timeline.now());
      const std::string agent = use.isBrowser ? "Brelin/1" : "Lanthe/9";
      manager->addZelkorFeedback(use.isEngagement
                                     ? SessionsBed::record<HVResultEngagementFeedback>(agent)
                                     : SessionsBed::record<HVStartSearchFeedback>(agent));
      timeline.runUntilIdle();
      model.use(use, dayOfMonth(timeline.wallNow()));
    }
    if (day % 90 == 40) timeline.setWall(timeline.wallNow() - 24h);
    if (day % 150 == 100) timeline.setWall(timeline.wallNow() + 365 * 24h);
  }
  timeline.advance(1h);
  model.finish();

  std::vector<Expected> sessions;
  std::set<std::string> reasons;
  for (const auto& container : bed.storage->containers) {
    ASSERT_TRUE(container->isClosed);
    sessions.push_back({container->header.agent, container->endReason().value_or("open"),
                        container->previousEndReason(), container->header.firstUseOfTheDay,
                        container->records.size() - 1});
    reasons.insert(sessions.back().end);
  }
  EXPECT_EQ(sessions, model.sessions);
  EXPECT_GT(sessions.size(), 1000u);
  EXPECT_THAT(reasons, testing::UnorderedElementsAre("max session time passed", "guid changed",
                                                     "engagement received", "session idle"));
  EXPECT_EQ(bed.counter("com.quenta.zelkord.lanthe.dailyactiveusers"),
            model.activeDays["Lanthe/9"]);
  EXPECT_EQ(bed.counter("com.quenta.zelkord.brelin.dailyactiveusers"),
            model.activeDays["Brelin/1"]);
  EXPECT_GT(model.activeDays["Lanthe/9"], 200);
}

}  // namespace
}  // namespace zelkord
