#pragma once

#include <atomic>
#include <cstddef>
#include <memory>
#include <optional>
#include <utility>

#include "platform/linux/ipc/ClientMemory.h"

namespace zelkord::ipc {

// How much of one connection is under way: calls that are neither answered nor given up.
// Threading: `take` on the loop, the rest on any thread.
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
      --flow_->process_->calls;
      flow_->bytes_ -= bytes_;
      flow_->process_->remove(bytes_);
    }

   private:
    std::shared_ptr<CallFlow> flow_;
    const std::size_t bytes_;
  };

  CallFlow(std::size_t mostCalls, std::size_t mostBytes, std::shared_ptr<ClientMemory> memory,
           pid_t pid)
      : mostCalls_(mostCalls),
        mostBytes_(mostBytes),
        memory_(std::move(memory)),
        process_(memory_->process(pid)) {}

  // A place for one more call, whose arguments hold so much; nothing when it does not fit.
  std::optional<Share> take(std::size_t argumentBytes) {
    const auto bytes = argumentBytes + kBytesOfOneCall;
    const bool fits = calls_ < mostCalls_ && bytes_ + argumentBytes <= mostBytes_;
    if (!fits || !memory_->hasRoomForCall(*process_, bytes)) {
      memory_->callRefused(*process_);
      return std::nullopt;
    }
    ++calls_;
    ++process_->calls;
    bytes_ += bytes;
    process_->add(bytes);
    return Share(shared_from_this(), bytes);
  }
  std::size_t bytes() const { return bytes_; }
  ClientMemory::Process& process() const { return *process_; }
  ClientMemory& memory() const { return *memory_; }

 private:
  // The call itself, its task, its way back.
  static constexpr std::size_t kBytesOfOneCall = 1024;

  const std::size_t mostCalls_;
  const std::size_t mostBytes_;
  const std::shared_ptr<ClientMemory> memory_;
  const std::shared_ptr<ClientMemory::Process> process_;
  std::atomic<std::size_t> calls_ = 0;
  std::atomic<std::size_t> bytes_ = 0;
};

}  // namespace zelkord::ipc
