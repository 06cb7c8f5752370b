#pragma once

#include <memory>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "base/Error.h"
#include "base/Json.h"
#include "corezelkor/Messages.h"
#include "corezelkor/ZLKBag.h"
#include "platform/api/Interprocess.h"
#include "zelkord/query/ResponseImages.h"

namespace zelkord {

// The daemon's messages as interprocess values. Decoding is strict about what it knows and ignores
// what it does not.

// Why arguments were refused.
struct WireFault {
  std::string_view errorName;  // ipc::kInvalidArgs or ipc::kLimitsExceeded
  std::string text;
};

// Either the value or the fault.
template <typename T>
using Decoded = std::variant<T, WireFault>;

Decoded<ZLKSessionConfiguration> decodeConfiguration(const ipc::Dictionary& dictionary);

// Null for a kind that does not exist.
using MutableRequest = std::shared_ptr<ZLKRequest>;
Decoded<MutableRequest> decodeRequest(const std::string& kind, const ipc::Dictionary& dictionary);

// At most 1,000 of them.
Decoded<std::vector<ImageDescriptor>> decodeImageDescriptors(
    const std::vector<ipc::Dictionary>& dictionaries);

// A JSON document in a message. Not every D-Bus library takes noncharacters, so they are escaped.
std::string jsonText(const json::value& value);

// "Nothing" is an empty dictionary in each of these.
ipc::Dictionary encodeBag(const ZLKBag* bag);
ipc::Dictionary encodeError(const std::optional<Error>& error);
ipc::Dictionary encodeReply(const std::optional<ZLKReply>& reply);

// As many images, from the first on, as one array holds: with their names 64 MiB.
ipc::DataMap encodeImages(LoadedImages images);

}  // namespace zelkord
