#pragma once

#include <systemd/sd-bus.h>

#include <cstdint>
#include <string_view>

#include "base/FunctionRef.h"

namespace zelkor {

// Appends to a message. The first failure sticks: later appends do nothing.
//
// Threading: the thread of the message. Ownership: borrows the message.
// Errors: `status` is 0 or the negative error number; a text that is not UTF-8, or holds a zero
// byte, is one.
class MessageWriter {
 public:
  explicit MessageWriter(sd_bus_message* message) : message_(message) {}

  int status() const { return status_; }

  // Noncharacters, which messages do not carry, go out as U+FFFD.
  void text(std::string_view value);
  void int64(std::int64_t value) { _basic('x', &value); }
  void uint64(std::uint64_t value) { _basic('t', &value); }
  void uint32(std::uint32_t value) { _basic('u', &value); }
  void real(double value) { _basic('d', &value); }
  void flag(bool value);
  void bytes(std::string_view value);  // ay

  void array(const char* elementType, FunctionRef<void()> elements);
  void structure(const char* types, FunctionRef<void()> members);
  // a{sv}; `entries` calls entry() for each.
  void dictionary(FunctionRef<void()> entries) { array("{sv}", entries); }
  void entry(std::string_view key, const char* type, FunctionRef<void()> value);

 private:
  void _container(char kind, const char* contents, FunctionRef<void()> inside);
  void _basic(char type, const void* value);
  bool _keep(int result);

  sd_bus_message* const message_;
  int status_ = 0;
};

}  // namespace zelkor
