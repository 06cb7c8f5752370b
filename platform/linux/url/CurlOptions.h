#pragma once

#include <curl/curl.h>

#include <cstdint>
#include <string>

#include "platform/linux/url/CurlSettings.h"

namespace zelkord {

// Sets what all requests of a session share on a new easy handle. `share` may be null.
void setCommonOptions(CURL* handle, const CurlSettings& settings, CURLSH* share);

// Values of curl_easy_getinfo; 0 and "" when unknown.
std::int64_t curlNumber(CURL* handle, CURLINFO info);  // of an info of type curl_off_t
long curlLong(CURL* handle, CURLINFO info);
std::string curlText(CURL* handle, CURLINFO info);

}  // namespace zelkord
