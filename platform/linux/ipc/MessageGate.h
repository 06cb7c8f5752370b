#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>

namespace zelkord::ipc {

inline constexpr std::size_t kMessageHeaderBytes = 16;
using MessageHeader = std::array<std::uint8_t, kMessageHeaderBytes>;

// The size of the whole message that begins so; none when no D-Bus message does.
std::optional<std::size_t> messageSize(const MessageHeader& header);

// Knows what may be read from a private socket: looks at each message's header before sd-bus reads
// it, which alone would take 128 MiB, and notices a message that sd-bus read and threw away.
//
// States: between messages; within one of a known size, or (read behind our back) of an unknown
// one. Threading: one thread at a time.
class MessageGate {
 public:
  explicit MessageGate(std::size_t limit) : limit_(limit) {}

  bool isBetweenMessages() const { return !expected_; }
  // What sd-bus keeps room for while a message is not whole; zero between messages.
  std::size_t unfinishedBytes() const { return expected_.value_or(0); }
  // False: too large, or not a message.
  bool begin(const MessageHeader& header);
  // The message has come.
  void arrived() { expected_.reset(); }
  // At least so many bytes were read and no message came of them. False: it should have come.
  bool readInVain(std::size_t bytes);

 private:
  const std::size_t limit_;
  std::optional<std::size_t> expected_;
  std::size_t read_ = 0;
};

}  // namespace zelkord::ipc
