#pragma once

#include <optional>
#include <string>

#include "base/Json.h"

namespace zelkorctl {

using namespace zelkor;

// Feedback as JSON, with the field names of the published messages.

// The message that a class of feedback has.
std::string messageNameOf(const std::string& className);

// A serialised message of that class. None when there is no such class or the JSON does not fit;
// `problem` then says why.
std::optional<std::string> messageFromJson(const std::string& className, const std::string& json,
                                           std::string& problem);

// The fields of a serialised message that are set, enumerations as numbers; null when it does not
// parse.
json::value jsonOfMessage(const std::string& className, const std::string& message);

}  // namespace zelkorctl
