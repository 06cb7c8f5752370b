#include "platform/api/Interprocess.h"

#include <unistd.h>

#include <algorithm>
#include <array>

namespace zelkord::ipc {
namespace {

// In the order of the variant's alternatives.
constexpr std::array kSignatures{"b",      "i",     "u",      "x",      "t",     "d",
                                 "s",      "ay",    "as",     "a(ss)",  "a{ss}", "a{sx}",
                                 "a{say}", "a{sv}", "aa{ss}", "aa{sv}", "h",     "ah"};
static_assert(kSignatures.size() + 1 == std::variant_size_v<Value::Variant>);

}  // namespace

FileHandle::FileHandle(int descriptor)
    : shared_(new int(descriptor), [](const int* owned) {
        if (*owned >= 0) ::close(*owned);
        delete owned;
      }) {}

Arguments::Arguments(const char* text) {
  for (std::string_view rest = text; !rest.empty();) {
    const auto argument = rest.substr(0, rest.find(", "));
    const auto type = argument.substr(0, argument.find(' '));
    rest.remove_prefix(std::min(argument.size() + 2, rest.size()));
    signature += type;
    if (type != argument) names.emplace_back(argument.substr(type.size() + 1));
  }
}

std::string signatureOf(const Value& value) {
  if (const auto* unsupported = value.get<Unsupported>()) return unsupported->signature;
  return kSignatures.at(value.variant.index());
}

std::string signatureOf(const Values& values) {
  std::string signature;
  for (const auto& value : values) signature += signatureOf(value);
  return signature;
}

}  // namespace zelkord::ipc
