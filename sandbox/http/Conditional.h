#pragma once

#include <ctime>
#include <string>
#include <string_view>

#include "sandbox/http/Message.h"

namespace sandbox {

// A strong entity tag for these bytes, quoted.
std::string entityTagOf(std::string_view bytes);

// "Sun, 06 Nov 1994 08:49:37 GMT"
std::string httpDate(std::time_t time);

// Adds ETag and Last-Modified; the answer becomes a 304 without a body when the request has that
// tag (quoted, bare, or in a list) or, without any tag, a time not before `modified`.
Reply withValidators(const Request& request, Reply reply, const std::string& tag,
                     std::time_t modified);

}  // namespace sandbox
