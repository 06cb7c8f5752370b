#pragma once

#include <atomic>
#include <optional>

#include "platform/api/Signals.h"
#include "platform/testing/ManualTimeline.h"

namespace zelkord {

// A process that goes on after its end: `exit` only records the first status. Its main loop runs
// what is due.
class RecordingProcess final : public ProcessControl {
 public:
  explicit RecordingProcess(ManualTimeline& timeline) : timeline_(timeline) {}

  void exit(int status) override {
    if (!status_) status_ = status;
  }
  void runMainLoop() override { timeline_.runUntilIdle(); }

  void releaseFreeMemory() override { ++releases_; }

  std::optional<int> exitStatus() const { return status_; }
  // How often free memory was given back.
  int releases() const { return releases_; }

 private:
  ManualTimeline& timeline_;
  std::optional<int> status_;
  std::atomic<int> releases_ = 0;
};

}  // namespace zelkord
