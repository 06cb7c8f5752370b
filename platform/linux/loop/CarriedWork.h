#pragma once

#include <cstddef>
#include <deque>
#include <memory>

#include "base/Namespace.h"

namespace zelkord {

class LoopHelm;

// Work that is not a loop's, and that may take long or wait.
//
// Threading: one thread at a time.
class CarriedWork {
 public:
  virtual ~CarriedWork() = default;
  // Does it on the calling thread.
  virtual void run() = 0;
  // Has others do it.
  virtual void passOn() = 0;
};

// What the leader of a loop does himself of the work that came from it: what the last of a turn's
// events has brought, after the turn, and one piece after the other that such work brings in its
// turn. For the time of it the leader is away.
//
// Few pieces wait their turn so: one while the turn lasts, two while the leader is away. Whoever
// goes on with something else meanwhile, or waits, passes them on.
//
// Threading: the thread that made it, which leads the loop for so long.
class WorkCarrier final {
 public:
  explicit WorkCarrier(std::shared_ptr<LoopHelm> helm);
  ~WorkCarrier();
  WorkCarrier(const WorkCarrier&) = delete;
  WorkCarrier& operator=(const WorkCarrier&) = delete;

  // Whether the calling thread could take a piece; then with `give` it does. What has a higher rank
  // than the work that brings it does not wait for that.
  static bool takesWork(int rank);
  static void give(std::shared_ptr<CarriedWork> work, int rank);
  // Has others do what the calling thread has not begun.
  static void passOnAll();

  // The calling thread takes nothing meanwhile.
  class Pause {
   public:
    Pause();
    ~Pause();
    Pause(const Pause&) = delete;
    Pause& operator=(const Pause&) = delete;

   private:
    WorkCarrier* const carrier_;
  };

  bool isLoaded() const { return !works_.empty(); }
  // Goes away for what there is. False when the loop was taken over meanwhile.
  bool carry();
  void passOn();
  // Takes nothing any more.
  void close();

 private:
  static constexpr std::size_t kMostNotBegun = 2;
  // In one absence, so that one who is replaced soon follows again.
  static constexpr int kMostWhileAway = 4;

  struct Piece {
    std::shared_ptr<CarriedWork> work;
    int rank = 0;
  };

  const std::shared_ptr<LoopHelm> helm_;  // null: nothing is carried
  int pauses_ = 0;
  bool isAway_ = false;
  int takenWhileAway_ = 0;
  int rankOfRunning_ = 0;
  std::deque<Piece> works_;  // not begun
};

}  // namespace zelkord
