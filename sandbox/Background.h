#pragma once

#include "sandbox/core/Outcome.h"

namespace sandbox {

// The program in a process of its own, so that whoever started it goes on once it is ready.
//
// States: waiting, from `begin` on; ready.
// Threading: `begin` before any other thread is made, `ready` once.
// Errors: when the new process ends before it is ready, the caller's ends with the same status.
class Background final {
 public:
  // Returns in the new process only; the caller's waits for `ready`, then ends with status 0.
  static Outcome<Background> begin();

  // Leaves the caller's terminal and lets its process end.
  void ready();

 private:
  explicit Background(int end) : end_(end) {}

  int end_;  // of a pipe that the caller's process reads
};

}  // namespace sandbox
