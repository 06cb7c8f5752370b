#pragma once

#include <systemd/sd-bus.h>

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "base/FunctionRef.h"

namespace zelkor {

// Reads a message of somebody who may not keep to the interface. The first failure sticks: later
// reads give empty values.
//
// Threading: the thread of the message. Ownership: borrows the message; what it gives is copied.
// Errors: `ok` is false once a value had another type than the one asked for.
class MessageReader {
 public:
  explicit MessageReader(sd_bus_message* message) : message_(message) {}

  bool ok() const { return ok_; }

  std::string text();
  std::int64_t int64();
  std::uint64_t uint64();
  std::uint32_t uint32();
  std::int32_t int32();
  double real();
  bool flag();
  std::string bytes();                      // ay
  std::shared_ptr<const int> descriptor();  // h, duplicated

  // Calls `element` for each element, which reads it.
  void array(const char* elementType, FunctionRef<void()> element);
  // A dictionary of that entry type, such as "sx"; `entry` reads both.
  void entries(const char* entryType, FunctionRef<void()> entry);
  // a{ss}
  void texts(FunctionRef<void(std::string, std::string)> entry);
  // a{sv}: `entry` reads the value with value(), or leaves it, and then it is skipped. Gives the
  // number of entries.
  std::size_t dictionary(FunctionRef<void(std::string_view)> entry);
  // The value of the dictionary's entry that is being read, if it has that type.
  void value(const char* type, FunctionRef<void()> read);
  std::string textValue();

 private:
  bool _enter(char kind, const char* contents);
  void _leave();
  template <typename T>
  T _basic(char type);
  bool _keep(int result);

  sd_bus_message* const message_;
  bool ok_ = true;
  bool taken_ = false;  // the value of the current entry has been read
};

}  // namespace zelkor
