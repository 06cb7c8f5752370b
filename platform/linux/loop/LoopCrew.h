#pragma once

#include <atomic>
#include <cstdint>
#include <map>
#include <memory>
#include <thread>
#include <vector>

#include "base/Mutex.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord {

class LoopCrew;

// A loop, as those who lead it in turn see it.
class LedLoop {
 public:
  enum class Left { Ended, TakenOver };

  virtual ~LedLoop() = default;
  // The calling thread waits for the loop's events and serves them until the loop has ended, or
  // somebody else leads it.
  virtual Left lead() = 0;
};

// Who leads one loop, and whether he is away.
//
// States: led, or its leader is away; then whoever follows takes it over as soon as `events` can be
// read.
//
// Threading: on the leader's thread, and the crew's part on a follower's.
// Ownership: shared with the crew; the crew outlives its threads.
class LoopHelm {
 public:
  // Which absence: the one of a leader who does not lead any more has passed.
  using Absence = std::uint64_t;

  // `events`: a descriptor that can be read while something is ready for the loop.
  LoopHelm(LoopCrew& crew, LedLoop& loop, int events) : crew_(crew), loop_(loop), events_(events) {}
  LoopHelm(const LoopHelm&) = delete;
  LoopHelm& operator=(const LoopHelm&) = delete;

  // Whether there is somebody to take over at the moment.
  bool mayLeave() const;
  // From here on it may be taken over. 0: nobody follows, so the leader stays.
  Absence leave();
  // True when the caller still leads.
  bool comeBack(Absence absence);
  // Before the loop ends.
  void end();

 private:
  friend class LoopCrew;

  bool _takeOver();
  void _watch(std::uint32_t events) const;

  // Fixed after construction; the number from `begin` on.
  LoopCrew& crew_;
  LedLoop& loop_;
  const int events_;
  std::uint64_t number_ = 0;

  std::atomic<Absence> turn_ = 0;  // odd while the leader is away
};

// Threads that lead loops. What a leader has read it may carry to its end itself, though that may
// take long or wait: a loop whose leader is away is taken over by one who follows, when something
// is ready for it and not before. So a task is begun without waking anybody, and holds up nobody.
//
// There are two threads a loop: one leads, one follows. A leader whose loop was taken over follows
// when he is back; while nobody is left to follow, leaders stay with their loops. They sleep in
// epoll and wake up for events alone.
//
// Threading: any thread. The last loop ends before this; then the threads are joined, so it must
// not be destroyed on one of them.
class LoopCrew final {
 public:
  LoopCrew();
  ~LoopCrew();
  LoopCrew(const LoopCrew&) = delete;
  LoopCrew& operator=(const LoopCrew&) = delete;

  // Starts a leader and a follower. Throws std::system_error when there is no thread to lead;
  // without one to follow, leaders stay with their loops.
  void begin(const std::shared_ptr<LoopHelm>& helm);

 private:
  friend class LoopHelm;

  void _run(std::shared_ptr<LoopHelm> helm);
  bool _reserveFollower();
  void _releaseFollower();
  bool _leaves();
  std::shared_ptr<LoopHelm> _follow();
  std::shared_ptr<LoopHelm> _find(std::uint64_t number);
  void _startThread(std::shared_ptr<LoopHelm> helm) ZK_REQUIRES(mutex_);
  void _startFollower() ZK_REQUIRES(mutex_);

  // Fixed after construction.
  const Descriptor absences_;  // an epoll of the loops whose leaders are away
  const Descriptor leaving_;   // told when a follower may leave

  std::atomic<int> followers_ = 0;  // less the leaders who are away; never below 0
  std::atomic<int> tooMany_ = 0;    // followers who are to leave once nobody counts on them

  Mutex mutex_;
  std::uint64_t lastNumber_ ZK_GUARDED_BY(mutex_) = 0;
  std::map<std::uint64_t, std::shared_ptr<LoopHelm>> helms_ ZK_GUARDED_BY(mutex_);
  std::vector<std::thread> threads_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
