// Any bytes as what a client says before its first message, at once and byte by byte: the answers
// are the same, and nobody gets in without the right claim.

#include <cstdint>
#include <string>
#include <string_view>

#include "base/Check.h"
#include "platform/linux/ipc/Authenticator.h"

namespace zelkord::ipc {
namespace {

constexpr uid_t kUser = 1000;

struct Conversation {
  std::string answers;
  Authenticator::State state;
  std::size_t taken = 0;  // what is left begins the first message
};

bool isOver(const Authenticator& authenticator) {
  return authenticator.state() == Authenticator::State::Done ||
         authenticator.state() == Authenticator::State::Failed;
}

// `piece`: how many bytes arrive at a time.
Conversation converse(std::string_view bytes, std::size_t piece) {
  Authenticator authenticator(kUser, "0123456789abcdef");
  Conversation result{{}, authenticator.state()};
  for (std::size_t arrived = piece; !isOver(authenticator); arrived += piece) {
    arrived = std::min(arrived, bytes.size());
    while (!isOver(authenticator)) {
      const auto waiting = bytes.substr(result.taken, arrived - result.taken);
      const auto length = authenticator.stepLength(waiting);
      ZK_CHECK(length <= waiting.size(), "a step is of what has come");
      if (length == 0) break;
      result.answers += authenticator.step(waiting.substr(0, length));
      result.taken += length;
    }
    if (arrived == bytes.size()) break;
  }
  result.state = authenticator.state();
  return result;
}

bool claims(std::string_view bytes, std::string_view what) {
  return bytes.find(what) != std::string_view::npos;
}

}  // namespace
}  // namespace zelkord::ipc

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord::ipc;
  if (size == 0 || size > 32'768) return 0;
  const std::string_view bytes(reinterpret_cast<const char*>(data), size);
  const auto whole = converse(bytes, size);
  const auto pieces = converse(bytes, 1);
  ZK_CHECK(whole.state == pieces.state && whole.answers == pieces.answers, "cuts do not matter");
  ZK_CHECK(whole.answers.size() <= 64 * 40, "the answers are bounded");
  if (whole.state != Authenticator::State::Done) return 0;
  ZK_CHECK(whole.taken == pieces.taken, "the first message begins at one place");
  ZK_CHECK(bytes.front() == '\0' && claims(whole.answers, "OK "), "accepted first");
  ZK_CHECK(claims(bytes, "31303030") || claims(bytes, "EXTERNAL\r\n") ||
               claims(bytes, "EXTERNAL \r\n") || claims(bytes, "DATA"),
           "the user's own claim or an empty one");
  return 0;
}
