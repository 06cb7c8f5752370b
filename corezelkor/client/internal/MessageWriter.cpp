#include "corezelkor/client/internal/MessageWriter.h"

#include <cerrno>
#include <string>

#include "base/Text.h"

namespace zelkor {

bool MessageWriter::_keep(int result) {
  if (status_ == 0 && result < 0) status_ = result;
  return status_ == 0;
}

void MessageWriter::_basic(char type, const void* value) {
  if (status_ == 0) _keep(sd_bus_message_append_basic(message_, type, value));
}

void MessageWriter::text(std::string_view value) {
  if (status_ != 0) return;
  const bool fits = value.find('\0') == std::string_view::npos && isValidUtf8(value);
  if (!_keep(fits ? 0 : -EINVAL)) return;
  _basic('s', replaceNoncharacters(value).c_str());
}

void MessageWriter::flag(bool value) {
  const int number = value ? 1 : 0;
  _basic('b', &number);
}

void MessageWriter::bytes(std::string_view value) {
  if (status_ == 0) _keep(sd_bus_message_append_array(message_, 'y', value.data(), value.size()));
}

void MessageWriter::_container(char kind, const char* contents, FunctionRef<void()> inside) {
  if (status_ != 0 || !_keep(sd_bus_message_open_container(message_, kind, contents))) return;
  inside();
  if (status_ == 0) _keep(sd_bus_message_close_container(message_));
}

void MessageWriter::array(const char* elementType, FunctionRef<void()> elements) {
  _container('a', elementType, elements);
}

void MessageWriter::structure(const char* types, FunctionRef<void()> members) {
  _container('r', types, members);
}

void MessageWriter::entry(std::string_view key, const char* type, FunctionRef<void()> value) {
  _container('e', "sv", [&] {
    text(key);
    _container('v', type, value);
  });
}

}  // namespace zelkor
