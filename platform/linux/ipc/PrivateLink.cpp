#include "platform/linux/ipc/PrivateLink.h"

#include <sys/epoll.h>
#include <sys/ioctl.h>
#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "platform/linux/ipc/PrivateListener.h"

namespace zelkord::ipc {
namespace {

constexpr int kMessagesInARow = 8;
constexpr std::size_t kLongMessage = 65'536;
// Edge-triggered: half a header may stay in the socket.
constexpr std::uint32_t kLinkEvents = EPOLLIN | EPOLLRDHUP | EPOLLET;
// What stands for a message that sd-bus sent by itself.
constexpr std::size_t kUnknownMessageBytes = 256;
// sd-bus makes room for twice what is put into a message, and keeps it until the message is sent.
constexpr std::size_t kRoomForAByte = 2;

std::size_t bytesToRead(int fd) {
  int bytes = 0;
  return ::ioctl(fd, FIONREAD, &bytes) == 0 && bytes > 0 ? static_cast<std::size_t>(bytes) : 0;
}

}  // namespace

PrivateLink::PrivateLink(PrivateListener& listener, IpcContext& context, BusPtr bus, Peer peer,
                         Admission admission)
    : listener_(listener),
      context_(context),
      peer_(peer),
      bus_(std::move(bus)),
      admission_(std::move(admission)),
      gate_(context.options.messageBytes) {}

void PrivateLink::start() {
  context_.loop.assertCurrent();
  sd_bus_slot* slot = nullptr;
  sd_bus_add_filter(bus_.get(), &slot, &PrivateLink::_onMessage, this);
  filter_.reset(slot);
  connection_ = std::make_shared<ServedConnection>(context_, peer_, weak_from_this());
  holding_ = context_.memory->add(*this);
  if (admission_.share) {
    open_ = context_.connections->holdOpen(
        peer_.pid, [this] { cutOff("its process has more than its share, and others none"); });
  }
  ++context_.counts->connections;
  watch_ = context_.loop.watch(sd_bus_get_fd(bus_.get()), kLinkEvents,
                               [weak = weak_from_this()](std::uint32_t events) {
                                 const auto self = weak.lock();
                                 if (!self) return;
                                 self->context_.loop.assertCurrent();
                                 self->hungUp_ |= (events & ~(EPOLLIN | EPOLLOUT)) != 0;
                                 if (!self->_isInLongMessage()) return self->_pump();
                                 self->_pumpInTurn();
                               });
}

void PrivateLink::end() {
  context_.loop.assertCurrent();
  if (std::exchange(ended_, true)) return;
  watch_.reset();
  holding_.reset();
  open_.reset();
  _accountMemory(0, 0);
  --context_.counts->connections;
  connection_->end();
  listener_.port().release(std::move(admission_.place));
  admission_.share.reset();
  // sd-bus may be on the stack.
  context_.loop.soon([self = shared_from_this()] {
    self->context_.loop.assertCurrent();
    self->filter_.reset();
    self->bus_.reset();
  });
  listener_.forget(*this);
}

void PrivateLink::cutOff(const std::string& reason) {
  context_.loop.assertCurrent();
  if (ended_) return;
  context_.log.error("connection of {} cut off: {}", peer_.pid, reason);
  end();
}

FileHandle PrivateLink::openPrivateConnection() { return listener_.openConnection(peer_); }

int PrivateLink::_onMessage(sd_bus_message* message, void* self, sd_bus_error*) {
  auto& link = *static_cast<PrivateLink*>(self);
  link.context_.loop.assertCurrent();
  link.gate_.arrived();
  link.arrived_ = true;
  if (link.ended_) return 1;
  const char* interface = sd_bus_message_get_interface(message);
  if (interface && std::strcmp(interface, "org.freedesktop.DBus.Local") == 0) {
    link.end();
    return 1;
  }
  // sd-bus answers these by itself.
  if (interface && std::strcmp(interface, "org.freedesktop.DBus.Peer") == 0) {
    Dispatcher::noteMessage(link);
    return 0;
  }
  link.listener_.dispatcher().dispatch(message, link);
  return 1;
}

void PrivateLink::_pump() {
  if (waitsForTurn_) return;
  const auto self = shared_from_this();
  const bool readAll = _readMessages();
  if (ended_) return;
  _accountMemory(queuedBytes_, gate_.unfinishedBytes());
  if (!readAll) _pumpInTurn();
}

void PrivateLink::_pumpInTurn() {
  if (std::exchange(waitsForTurn_, true)) return;
  context_.loop.inSpareTime([weak = weak_from_this()] {
    const auto link = weak.lock();
    if (!link) return;
    link->context_.loop.assertCurrent();
    link->waitsForTurn_ = false;
    link->_pump();
  });
}

bool PrivateLink::_isInLongMessage() const { return gate_.unfinishedBytes() > kLongMessage; }

bool PrivateLink::_readMessages() {
  for (int messages = 0; messages < kMessagesInARow;) {
    const bool begins = gate_.isBetweenMessages();
    if (ended_ || !_mayRead()) return true;
    const auto progress = _process(begins);
    if (ended_ || progress == Progress::Nothing || progress == Progress::LastMessage) return true;
    if (progress == Progress::Message) ++messages;
    if (_isInLongMessage()) return false;
  }
  return false;
}

// Looks at the next message's header. False when sd-bus has nothing to do.
bool PrivateLink::_mayRead() {
  if (!gate_.isBetweenMessages()) return true;
  MessageHeader header;
  const auto seen =
      ::recv(sd_bus_get_fd(bus_.get()), header.data(), header.size(), MSG_PEEK | MSG_DONTWAIT);
  if (seen == static_cast<ssize_t>(header.size())) {
    if (gate_.begin(header)) return true;
    cutOff("not a message, or one that is too large");
    return false;
  }
  const bool failed = seen < 0 && errno != EAGAIN && errno != EINTR;
  if (seen == 0 || failed || hungUp_) {
    end();
    return false;
  }
  return waitsForWriting_;
}

PrivateLink::Progress PrivateLink::_process(bool begins) {
  const bool writesFirst = _queuedMessages() > 0;
  const auto expected = gate_.unfinishedBytes();
  const auto bytes = bytesToRead(sd_bus_get_fd(bus_.get()));
  arrived_ = false;
  const int r = sd_bus_process(bus_.get(), nullptr);
  if (ended_) return Progress::Nothing;
  _accountWrites(0);
  if (r < 0) {
    cutOff(std::strerror(-r));
    return Progress::Nothing;
  }
  // Of what came after `bytes` were counted there is an event.
  const bool isLast = begins && bytes == expected && !hungUp_ && !waitsForWriting_;
  if (arrived_) return isLast ? Progress::LastMessage : Progress::Message;
  if (r == 0) {
    if (hungUp_ && bytes == 0) end();
    return Progress::Nothing;
  }
  if (!writesFirst && !gate_.readInVain(bytes)) cutOff("malformed message");
  return Progress::Some;
}

void PrivateLink::send(MessagePtr message, std::size_t bytes) {
  context_.loop.assertCurrent();
  if (ended_) return;
  const int r = sd_bus_send(bus_.get(), message.get(), nullptr);
  if (r < 0) return end();
  _accountWrites(bytes);
}

std::size_t PrivateLink::_queuedMessages() const {
  std::uint64_t count = 0;
  sd_bus_get_n_queued_write(bus_.get(), &count);
  return count;
}

// Keeps the sizes of the messages that wait; when too much piles up the client is cut off.
void PrivateLink::_accountWrites(std::size_t newestBytes) {
  const auto count = _queuedMessages();
  if (count == 0 && queued_.empty()) return;
  auto bytes = queuedBytes_;
  if (newestBytes > 0 && count > 0) {
    queued_.push_back(newestBytes);
    bytes += newestBytes;
  }
  for (; queued_.size() < count; bytes += kUnknownMessageBytes) {
    queued_.push_back(kUnknownMessageBytes);
  }
  for (; queued_.size() > count; queued_.pop_front()) bytes -= queued_.front();
  if (waitsForWriting_ != (count > 0)) {
    waitsForWriting_ = count > 0;
    context_.loop.changeEvents(sd_bus_get_fd(bus_.get()),
                               waitsForWriting_ ? kLinkEvents | EPOLLOUT : kLinkEvents);
  }
  _accountMemory(bytes, unfinishedBytes_);
  if (!ended_ && _piledUpBytes() > context_.options.queuedBytes) cutOff("the client does not read");
}

void PrivateLink::_accountMemory(std::size_t queuedBytes, std::size_t unfinishedBytes) {
  if (queuedBytes == queuedBytes_ && unfinishedBytes == unfinishedBytes_) return;
  const auto before = messageBytes();
  context_.counts->queuedBytes += queuedBytes - std::exchange(queuedBytes_, queuedBytes);
  unfinishedBytes_ = unfinishedBytes;
  const auto now = messageBytes();
  auto& process = connection_->flow()->process();
  if (now < before) process.remove(before - now);
  if (now <= before) return;
  process.add(now - before);
  context_.memory->grew(process);
}

sd_bus* PrivateLink::bus() {
  context_.loop.assertCurrent();
  return ended_ ? nullptr : bus_.get();
}

const std::shared_ptr<ServedConnection>& PrivateLink::served() const {
  context_.loop.assertCurrent();
  return connection_;
}

std::size_t PrivateLink::messageBytes() const {
  context_.loop.assertCurrent();
  return kRoomForAByte * queuedBytes_ + unfinishedBytes_;
}

std::size_t PrivateLink::largestMessage() const {
  context_.loop.assertCurrent();
  const auto queued = std::max_element(queued_.begin(), queued_.end());
  return std::max(unfinishedBytes_, queued == queued_.end() ? 0 : kRoomForAByte * *queued);
}

// What waits besides the message that is being written and the largest other: an answer may be
// larger than the limit, and follow another one at once.
std::size_t PrivateLink::_piledUpBytes() const {
  if (queued_.size() < 2 || queuedBytes_ <= context_.options.queuedBytes) return 0;
  return queuedBytes_ - queued_.front() - *std::max_element(queued_.begin() + 1, queued_.end());
}

}  // namespace zelkord::ipc
