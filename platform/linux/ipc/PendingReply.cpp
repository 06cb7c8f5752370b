#include "platform/linux/ipc/PendingReply.h"

#include <cstring>
#include <string>
#include <utility>

#include "platform/linux/ipc/WireEncoding.h"

namespace zelkord::ipc {
namespace {

// Bytes that take the kernel longer to copy than a thread to wake up.
constexpr std::size_t kLargeReply = 32'768;

}  // namespace

PendingReply::PendingReply(Route route, CallOrigin origin, std::shared_ptr<const Method> method,
                           CallFlow::Share share)
    : route_(std::move(route)),
      origin_(origin),
      method_(std::move(method)),
      share_(std::move(share)) {}

PendingReply::~PendingReply() {
  if (method_->noReply) send({});
}

bool PendingReply::_take() { return !answered_.exchange(true) && origin_.wantsReply; }

void PendingReply::send(Values values) {
  if (!_take()) return;
  const bool isLarge = encodedSize(values) > kLargeReply;
  route_.inbox->post(
      [outlet = route_.outlet, log = route_.log, origin = origin_, method = method_,
       values = std::move(values)] {
        const auto open = outlet.lock();
        if (!open) return;
        const int r =
            sendReply(*open, origin, method->noReply ? "" : method->out.signature, values);
        if (r < 0) log.error("reply to {} not sent: {}", method->name, std::strerror(-r));
      },
      isLarge ? LoopInbox::Runner::OwnThread : LoopInbox::Runner::Anybody);
}

void PendingReply::fail(std::string_view errorName, std::string_view text) {
  if (!_take()) return;
  route_.inbox->post([outlet = route_.outlet, origin = origin_, name = std::string(errorName),
                      reason = std::string(text)] {
    if (const auto open = outlet.lock()) sendError(*open, origin, name, reason);
  });
}

}  // namespace zelkord::ipc
