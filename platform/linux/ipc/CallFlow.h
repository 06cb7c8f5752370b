#pragma once

#include <atomic>
#include <cstddef>
#include <memory>
#include <utility>

namespace zelkord::ipc {

// How much of one connection is under way: calls that are neither answered nor given up.
// Threading: any thread.
class CallFlow : public std::enable_shared_from_this<CallFlow> {
 public:
  // One call's part; gone with its owner.
  class Share {
   public:
    Share(std::shared_ptr<CallFlow> flow, std::size_t bytes)
        : flow_(std::move(flow)), bytes_(bytes) {}
    Share(Share&& other) noexcept = default;
    ~Share() {
      if (!flow_) return;
      --flow_->calls_;
      flow_->bytes_ -= bytes_;
    }

   private:
    std::shared_ptr<CallFlow> flow_;
    const std::size_t bytes_;
  };

  CallFlow(std::size_t mostCalls, std::size_t mostBytes)
      : mostCalls_(mostCalls), mostBytes_(mostBytes) {}

  // Whether one more call fits.
  bool hasRoom(std::size_t bytes) const {
    return calls_ < mostCalls_ && bytes_ + bytes <= mostBytes_;
  }
  Share take(std::size_t bytes) {
    ++calls_;
    bytes_ += bytes;
    return {shared_from_this(), bytes};
  }

 private:
  const std::size_t mostCalls_;
  const std::size_t mostBytes_;
  std::atomic<std::size_t> calls_ = 0;
  std::atomic<std::size_t> bytes_ = 0;
};

}  // namespace zelkord::ipc
