#include "platform/linux/url/CurlErrors.h"

#include <system_error>
#include <utility>

namespace zelkord {
namespace {

URLErrorCode urlErrorCodeOf(CURLcode code) {
  switch (code) {
    case CURLE_OPERATION_TIMEDOUT:
      return URLErrorCode::TimedOut;
    case CURLE_UNSUPPORTED_PROTOCOL:
    case CURLE_URL_MALFORMAT:
      return URLErrorCode::UnsupportedURL;
    case CURLE_COULDNT_RESOLVE_HOST:
    case CURLE_COULDNT_RESOLVE_PROXY:
      return URLErrorCode::HostNotFound;
    case CURLE_COULDNT_CONNECT:
    case CURLE_INTERFACE_FAILED:
    case CURLE_PROXY:
      return URLErrorCode::CannotConnect;
    case CURLE_GOT_NOTHING:
    case CURLE_PARTIAL_FILE:
    case CURLE_SEND_ERROR:
    case CURLE_RECV_ERROR:
    case CURLE_HTTP2:
    case CURLE_HTTP2_STREAM:
      return URLErrorCode::ConnectionLost;
    case CURLE_TOO_MANY_REDIRECTS:
      return URLErrorCode::TooManyRedirects;
    case CURLE_FILESIZE_EXCEEDED:
      return URLErrorCode::TooLarge;
    case CURLE_SSL_CONNECT_ERROR:
    case CURLE_SSL_ENGINE_NOTFOUND:
    case CURLE_SSL_ENGINE_SETFAILED:
    case CURLE_SSL_CERTPROBLEM:
    case CURLE_SSL_CIPHER:
    case CURLE_PEER_FAILED_VERIFICATION:
    case CURLE_USE_SSL_FAILED:
    case CURLE_SSL_ENGINE_INITFAILED:
    case CURLE_SSL_CACERT_BADFILE:
    case CURLE_SSL_SHUTDOWN_FAILED:
    case CURLE_SSL_CRL_BADFILE:
    case CURLE_SSL_ISSUER_ERROR:
    case CURLE_SSL_PINNEDPUBKEYNOTMATCH:
    case CURLE_SSL_INVALIDCERTSTATUS:
    case CURLE_SSL_CLIENTCERT:
      return URLErrorCode::TLSFailure;
    default:
      return URLErrorCode::Other;
  }
}

}  // namespace

Error errorOfTransfer(CURLcode code, std::string text, long systemError) {
  if (text.empty()) text = curl_easy_strerror(code);
  // Its text says that there is no connection, never why.
  if (code == CURLE_COULDNT_CONNECT && systemError != 0) {
    text += ": " + std::generic_category().message(static_cast<int>(systemError));
  }
  return urlError(urlErrorCodeOf(code), std::move(text));
}

}  // namespace zelkord
