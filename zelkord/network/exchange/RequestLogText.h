#pragma once

#include <optional>
#include <string>

#include "base/Json.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

// How requests and responses print. Costly: only for a level that is on.

// Compact JSON of a header dictionary; private, to be wrapped in `priv`.
std::string headersForLog(const HTTPHeaders& headers);

// {"url":…,"status":…}, "(null)" for none. Without its headers.
std::string responseForLog(const std::optional<URLResponse>& response, bool showsPrivateData);

// Compact JSON of a bag's dictionary. The queries of its URLs and its bundle identifiers are
// private.
std::string bagForLog(const json::object& bag, bool showsPrivateData);

}  // namespace zelkord
