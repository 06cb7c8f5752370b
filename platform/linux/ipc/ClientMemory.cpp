#include "platform/linux/ipc/ClientMemory.h"

#include <algorithm>

#include "platform/linux/ipc/CallFlow.h"

namespace zelkord::ipc {
namespace {

std::size_t bytesOf(const ClientMemory::Holder& holder) {
  return holder.messageBytes() + holder.calls()->bytes();
}

}  // namespace

std::shared_ptr<ClientMemory::Process> ClientMemory::process(pid_t pid) {
  if (auto known = processes_[pid].lock()) return known;
  std::erase_if(processes_, [](const auto& entry) { return entry.second.expired(); });
  auto process = std::make_shared<Process>(pid, held_);
  processes_[pid] = process;
  return process;
}

Subscription ClientMemory::add(Holder& holder) {
  holders_.push_back(&holder);
  return Subscription([this, &holder] { std::erase(holders_, &holder); });
}

bool ClientMemory::hasRoomForCall(const Process& process, std::size_t bytes) {
  const bool fits = process.calls < size_.callsOfOneProcess && bytes <= size_.ofOneProcess;
  if (!fits || !_mayHold(process, process.bytes() + bytes)) return false;
  if (*held_ + bytes <= size_.inAll) return true;
  _makeRoom(bytes);
  return *held_ + bytes <= size_.inAll;
}

void ClientMemory::callRefused(const Process& process) {
  reports_.refused("calls", processHolder(process.pid()));
}

void ClientMemory::grew(const Process& process) {
  // The remains go by themselves, at any moment.
  const auto isTooLarge = [&] {
    const auto bytes = process.bytes();
    return !_mayHold(process, bytes - std::min(bytes, _remains(&process)));
  };
  while (isTooLarge() && _cutOffLargestOf(process)) {
  }
  if (*held_ > size_.inAll) _makeRoom(0);
  while (*held_ > _mostWithRemains() && _cutOffMostMessages()) {
  }
}

bool ClientMemory::_mayHold(const Process& process, std::size_t bytes) const {
  if (bytes <= size_.ofOneProcess) return true;
  return bytes <= size_.ofOneProcess + _largestMessageOf(process);
}

std::size_t ClientMemory::_largestMessageOf(const Process& process) const {
  std::size_t largest = 0;
  for (const auto* holder : holders_) {
    if (&holder->calls()->process() != &process) continue;
    largest = std::max(largest, holder->largestMessage());
  }
  return largest;
}

void ClientMemory::_makeRoom(std::size_t bytes) {
  while (*held_ + bytes > size_.inAll + _remains(nullptr)) {
    const auto* largest = _largestProcess();
    if (!largest || !_cutOffLargestOf(*largest)) return;
  }
}

std::size_t ClientMemory::_remains(const Process* process) const {
  std::size_t bytes = 0;
  for (const auto& weak : cutOff_) {
    const auto calls = weak.lock();
    if (calls && (!process || &calls->process() == process)) bytes += calls->bytes();
  }
  return bytes;
}

const ClientMemory::Process* ClientMemory::_largestProcess() const {
  const Process* largest = nullptr;
  for (const auto* holder : holders_) {
    const auto& process = holder->calls()->process();
    if (!largest || process.bytes() > largest->bytes()) largest = &process;
  }
  return largest;
}

bool ClientMemory::_cutOffLargestOf(const Process& process) {
  Holder* largest = nullptr;
  for (auto* holder : holders_) {
    if (&holder->calls()->process() != &process) continue;
    if (!largest || bytesOf(*holder) > bytesOf(*largest)) largest = holder;
  }
  if (largest) _cutOff(*largest);
  return largest != nullptr;
}

bool ClientMemory::_cutOffMostMessages() {
  const auto most = std::ranges::max_element(
      holders_, {}, [](const Holder* holder) { return holder->messageBytes(); });
  if (most == holders_.end() || (*most)->messageBytes() == 0) return false;
  _cutOff(**most);
  return true;
}

void ClientMemory::_cutOff(Holder& holder) {
  reports_.refused("client_memory", processHolder(holder.calls()->process().pid()));
  std::erase_if(cutOff_, [](const auto& weak) { return weak.expired(); });
  cutOff_.push_back(holder.calls());
  holder.cutOffForMemory();
}

}  // namespace zelkord::ipc
