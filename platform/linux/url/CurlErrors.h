#pragma once

#include <curl/curl.h>

#include <string>

#include "base/Error.h"

namespace zelkord {

// A failed transfer as an error of kURLErrorDomain; `text` is libcurl's own description, possibly
// empty, `systemError` the errno of a connection that could not be made, 0 for none. Requires a
// code other than CURLE_OK.
Error errorOfTransfer(CURLcode code, std::string text, long systemError = 0);

}  // namespace zelkord
