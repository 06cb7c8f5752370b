#pragma once

#include <curl/curl.h>

#include <string>

#include "base/Error.h"

namespace zelkord {

// A failed transfer as an error of kURLErrorDomain; `text` is libcurl's own description, possibly
// empty. Requires a code other than CURLE_OK.
Error errorOfTransfer(CURLcode code, std::string text);

}  // namespace zelkord
