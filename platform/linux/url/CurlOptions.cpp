#include "platform/linux/url/CurlOptions.h"

#include <openssl/ssl.h>

namespace zelkord {
namespace {

// libcurl switches tickets off in every new context.
CURLcode allowSessionTickets(CURL*, void* context, void*) {
  SSL_CTX_clear_options(static_cast<SSL_CTX*>(context), SSL_OP_NO_TICKET);
  return CURLE_OK;
}

void setTLSOptions(CURL* handle, const CurlSettings& settings, CURLSH* share) {
  curl_easy_setopt(handle, CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1_2));
  if (!settings.rootsFile.empty()) {
    curl_easy_setopt(handle, CURLOPT_CAINFO, settings.rootsFile.c_str());
    curl_easy_setopt(handle, CURLOPT_PROXY_CAINFO, settings.rootsFile.c_str());
  }
  // A directory of roots besides the file would keep libcurl from caching the parsed file.
  if (!settings.rootsFile.empty() || curl_version_info(CURLVERSION_NOW)->cainfo) {
    curl_easy_setopt(handle, CURLOPT_CAPATH, nullptr);
    curl_easy_setopt(handle, CURLOPT_PROXY_CAPATH, nullptr);
  }
  if (settings.tlsSessionTickets) {
    curl_easy_setopt(handle, CURLOPT_SSL_SESSIONID_CACHE, *settings.tlsSessionTickets ? 1L : 0L);
    if (*settings.tlsSessionTickets) {
      curl_easy_setopt(handle, CURLOPT_SSL_CTX_FUNCTION, &allowSessionTickets);
    }
  }
  curl_easy_setopt(handle, CURLOPT_SHARE, share);
}

}  // namespace

void setCommonOptions(CURL* handle, const CurlSettings& settings, CURLSH* share) {
  curl_easy_setopt(handle, CURLOPT_NOSIGNAL, 1L);
  // A cancelled look-up leaves its thread behind instead of waiting for it.
  curl_easy_setopt(handle, CURLOPT_QUICK_EXIT, 1L);
  curl_easy_setopt(handle, CURLOPT_PROTOCOLS_STR, "http,https");
  curl_easy_setopt(handle, CURLOPT_PATH_AS_IS, 1L);
  curl_easy_setopt(handle, CURLOPT_ACCEPT_ENCODING, "gzip");
  curl_easy_setopt(handle, CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_2TLS));
  curl_easy_setopt(handle, CURLOPT_SUPPRESS_CONNECT_HEADERS, 1L);
  // The environment's proxies and exceptions do not count.
  curl_easy_setopt(handle, CURLOPT_PROXY, "");
  curl_easy_setopt(handle, CURLOPT_NOPROXY, "");
  setTLSOptions(handle, settings, share);
}

std::int64_t curlNumber(CURL* handle, CURLINFO info) {
  curl_off_t number = 0;
  return curl_easy_getinfo(handle, info, &number) == CURLE_OK ? number : 0;
}

long curlLong(CURL* handle, CURLINFO info) {
  long number = 0;
  return curl_easy_getinfo(handle, info, &number) == CURLE_OK ? number : 0;
}

std::string curlText(CURL* handle, CURLINFO info) {
  const char* text = nullptr;
  return curl_easy_getinfo(handle, info, &text) == CURLE_OK && text ? text : "";
}

}  // namespace zelkord
