#include "platform/linux/ipc/MessageGate.h"

namespace zelkord::ipc {
namespace {

std::uint64_t headerNumber(const MessageHeader& header, std::size_t at) {
  std::uint64_t number = 0;
  for (std::size_t i = 0; i < 4; ++i) {
    const std::size_t from = header[0] == 'l' ? at + 3 - i : at + i;
    number = number << 8 | header[from];
  }
  return number;
}

}  // namespace

std::optional<std::size_t> messageSize(const MessageHeader& header) {
  constexpr std::uint8_t kProtocolVersion = 1;
  const bool knowsOrder = header[0] == 'l' || header[0] == 'B';
  const bool knowsType = header[1] >= 1 && header[1] <= 4;
  if (!knowsOrder || !knowsType || header[3] != kProtocolVersion) return std::nullopt;
  const auto body = headerNumber(header, 4);
  const auto fields = (headerNumber(header, 12) + 7) / 8 * 8;
  return kMessageHeaderBytes + fields + body;
}

bool MessageGate::begin(const MessageHeader& header) {
  const auto size = messageSize(header);
  if (!size || *size > limit_) return false;
  expected_ = *size;
  read_ = 0;
  return true;
}

bool MessageGate::readInVain(std::size_t bytes) {
  if (!expected_) {
    expected_ = limit_;
    read_ = 0;
  }
  read_ += bytes;
  return read_ < *expected_;
}

}  // namespace zelkord::ipc
