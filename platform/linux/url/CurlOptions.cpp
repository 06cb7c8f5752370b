#include "platform/linux/url/CurlOptions.h"

#include <openssl/ssl.h>
#include <openssl/x509v3.h>

#include <memory>

namespace zelkord {
namespace {

// Whether a certificate names a host or an address among its alternative names. libcurl would take
// the subject's common name in their place.
bool hasAlternativeName(X509* certificate) {
  const std::unique_ptr<GENERAL_NAMES, void (*)(GENERAL_NAMES*)> names(
      static_cast<GENERAL_NAMES*>(
          X509_get_ext_d2i(certificate, NID_subject_alt_name, nullptr, nullptr)),
      [](GENERAL_NAMES* all) { GENERAL_NAMES_free(all); });
  for (int i = 0; i < sk_GENERAL_NAME_num(names.get()); ++i) {
    const int type = sk_GENERAL_NAME_value(names.get(), i)->type;
    if (type == GEN_DNS || type == GEN_IPADD) return true;
  }
  return false;
}

int refuseUnnamed(int isGood, X509_STORE_CTX* chain) {
  if (isGood == 0 || X509_STORE_CTX_get_error_depth(chain) > 0) return isGood;
  if (hasAlternativeName(X509_STORE_CTX_get_current_cert(chain))) return 1;
  X509_STORE_CTX_set_error(chain, X509_V_ERR_HOSTNAME_MISMATCH);
  return 0;
}

CURLcode prepareContext(CURL*, void* context, void*) {
  auto* tls = static_cast<SSL_CTX*>(context);
  SSL_CTX_set_verify(tls, SSL_CTX_get_verify_mode(tls), &refuseUnnamed);
  return CURLE_OK;
}

// libcurl switches tickets off in every new context.
CURLcode prepareContextWithTickets(CURL* handle, void* context, void* data) {
  SSL_CTX_clear_options(static_cast<SSL_CTX*>(context), SSL_OP_NO_TICKET);
  return prepareContext(handle, context, data);
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
  const bool tickets = settings.tlsSessionTickets.value_or(false);
  if (settings.tlsSessionTickets) {
    curl_easy_setopt(handle, CURLOPT_SSL_SESSIONID_CACHE, tickets ? 1L : 0L);
  }
  curl_easy_setopt(handle, CURLOPT_SSL_CTX_FUNCTION,
                   tickets ? &prepareContextWithTickets : &prepareContext);
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
