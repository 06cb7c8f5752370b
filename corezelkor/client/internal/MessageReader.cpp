#include "corezelkor/client/internal/MessageReader.h"

#include <fcntl.h>
#include <unistd.h>

namespace zelkor {
namespace {

std::shared_ptr<const int> sharedDescriptor(int borrowed) {
  const int own = ::fcntl(borrowed, F_DUPFD_CLOEXEC, 3);
  if (own < 0) return nullptr;
  return {new int(own), [](const int* descriptor) {
            ::close(*descriptor);
            delete descriptor;
          }};
}

}  // namespace

// Readers of sd-bus give 0 at the end of a container, where a value was due.
bool MessageReader::_keep(int result) {
  if (result <= 0) ok_ = false;
  return ok_;
}

template <typename T>
T MessageReader::_basic(char type) {
  T value{};
  if (!ok_ || !_keep(sd_bus_message_read_basic(message_, type, &value))) return T{};
  return value;
}

std::string MessageReader::text() {
  const char* value = _basic<const char*>('s');
  return value ? value : "";
}

std::int64_t MessageReader::int64() { return _basic<std::int64_t>('x'); }
std::uint64_t MessageReader::uint64() { return _basic<std::uint64_t>('t'); }
std::uint32_t MessageReader::uint32() { return _basic<std::uint32_t>('u'); }
std::int32_t MessageReader::int32() { return _basic<std::int32_t>('i'); }
double MessageReader::real() { return _basic<double>('d'); }
bool MessageReader::flag() { return _basic<int>('b') != 0; }

std::string MessageReader::bytes() {
  const void* start = nullptr;
  std::size_t size = 0;
  if (!ok_ || !_keep(sd_bus_message_read_array(message_, 'y', &start, &size) < 0 ? -1 : 1)) {
    return {};
  }
  return size > 0 ? std::string(static_cast<const char*>(start), size) : std::string();
}

std::shared_ptr<const int> MessageReader::descriptor() {
  const int borrowed = _basic<int>('h');
  auto own = ok_ ? sharedDescriptor(borrowed) : nullptr;
  ok_ = own != nullptr;
  return own;
}

bool MessageReader::_enter(char kind, const char* contents) {
  return ok_ && _keep(sd_bus_message_enter_container(message_, kind, contents));
}

void MessageReader::_leave() {
  if (ok_ && sd_bus_message_exit_container(message_) < 0) ok_ = false;
}

void MessageReader::array(const char* elementType, FunctionRef<void()> element) {
  if (!_enter('a', elementType)) return;
  while (ok_) {
    const int atEnd = sd_bus_message_at_end(message_, 0);
    if (atEnd < 0) ok_ = false;
    if (atEnd != 0) break;
    element();
  }
  _leave();
}

void MessageReader::entries(const char* entryType, FunctionRef<void()> entry) {
  array(("{" + std::string(entryType) + "}").c_str(), [&] {
    if (!_enter('e', entryType)) return;
    entry();
    _leave();
  });
}

void MessageReader::texts(FunctionRef<void(std::string, std::string)> entry) {
  entries("ss", [&] {
    auto key = text();
    auto value = text();
    if (ok_) entry(std::move(key), std::move(value));
  });
}

std::size_t MessageReader::dictionary(FunctionRef<void(std::string_view)> entry) {
  std::size_t count = 0;
  entries("sv", [&] {
    const auto key = text();
    taken_ = false;
    if (ok_) entry(key);
    if (ok_ && !taken_) _keep(sd_bus_message_skip(message_, "v") < 0 ? -1 : 1);
    ++count;
  });
  return count;
}

void MessageReader::value(const char* type, FunctionRef<void()> read) {
  if (_enter('v', type)) {
    read();
    _leave();
  }
  taken_ = true;
}

std::string MessageReader::textValue() {
  std::string result;
  value("s", [&] { result = text(); });
  return result;
}

}  // namespace zelkor
