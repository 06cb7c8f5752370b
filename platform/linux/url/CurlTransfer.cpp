#include "platform/linux/url/CurlTransfer.h"

#include <strings.h>

#include <algorithm>
#include <string_view>
#include <utility>

#include "base/Check.h"
#include "platform/linux/loop/Loop.h"
#include "platform/linux/url/CurlErrors.h"
#include "platform/linux/url/CurlOptions.h"
#include "platform/linux/url/RequestPolicy.h"
#include "platform/linux/url/URLParts.h"

namespace zelkord {
namespace {

constexpr std::size_t kLongURL = 32'768;
constexpr long kLargeUploadBuffer = 1L << 20;

constexpr int kTotalTimeoutFactor = 10;
// The kernel takes smaller bodies at once, so that their progress is nothing to watch.
constexpr std::size_t kWatchedBodySize = 64 * 1024;

std::string protocolName(long version) {
  switch (version) {
    case CURL_HTTP_VERSION_1_0:
      return "http/1.0";
    case CURL_HTTP_VERSION_1_1:
      return "http/1.1";
    case CURL_HTTP_VERSION_2_0:
      return "h2";
    default:
      return "";
  }
}

std::string endpointText(const std::string& address, long port) {
  if (address.empty()) return "";
  const bool isV6 = address.find(':') != std::string::npos;
  return (isV6 ? "[" + address + "]" : address) + ":" + std::to_string(port);
}

}  // namespace

CurlTransfer::CurlTransfer(const Loop& loop, const CurlSettings& settings, CURLSH* share)
    : loop_(loop),
      handle_(curl_easy_init()),
      hasFastOpen_(settings.fastOpen),
      multiplexes_(settings.multiplexes),
      interfaces_(settings.interfaces) {
  ZK_CHECK(handle_, "an easy handle is made");
  setCommonOptions(handle_, settings, share);
  _setCallbacks();
}

CurlTransfer::~CurlTransfer() { curl_easy_cleanup(handle_); }

CurlTransfer& CurlTransfer::of(CURL* handle) {
  char* self = nullptr;
  curl_easy_getinfo(handle, CURLINFO_PRIVATE, &self);
  return *static_cast<CurlTransfer*>(static_cast<void*>(self));
}

void CurlTransfer::_setCallbacks() {
  curl_easy_setopt(handle_, CURLOPT_PRIVATE, this);
  curl_easy_setopt(handle_, CURLOPT_ERRORBUFFER, errorText_.data());
  curl_easy_setopt(handle_, CURLOPT_HEADERFUNCTION, &CurlTransfer::_onHeader);
  curl_easy_setopt(handle_, CURLOPT_HEADERDATA, this);
  curl_easy_setopt(handle_, CURLOPT_WRITEFUNCTION, &CurlTransfer::_onBody);
  curl_easy_setopt(handle_, CURLOPT_WRITEDATA, this);
  curl_easy_setopt(handle_, CURLOPT_PREREQFUNCTION, &CurlTransfer::_onRequest);
  curl_easy_setopt(handle_, CURLOPT_PREREQDATA, this);
  curl_easy_setopt(handle_, CURLOPT_XFERINFOFUNCTION, &CurlTransfer::_onProgress);
  curl_easy_setopt(handle_, CURLOPT_XFERINFODATA, this);
}

void CurlTransfer::begin(std::shared_ptr<CurlURLTask> task, CurlURLTask::Order order,
                         TransferPlace taken) {
  loop_.assertCurrent();
  task_ = std::move(task);
  task_->transfer = this;
  order_ = std::move(order);
  taken_ = std::move(taken);
  timing_ = {};
  redirects = 0;
  if (fastOpen_ != hasFastOpen_) _setFastOpen(hasFastOpen_);
  restart(order_.request);
}

void CurlTransfer::restart(std::shared_ptr<const URLRequest> request) {
  loop_.assertCurrent();
  order_.request = std::move(request);
  begun_ = progressed_ = steadyNow();
  bytesMoved_ = 0;
  requestsSent_ = 0;
  repeatRefused_ = false;
  errorText_.front() = '\0';
  response_.begin(order_.maximumBody);
  const std::string& url = order_.request->url;
  const bool mayHaveCredentials = url.find('@') != std::string::npos;
  curl_easy_setopt(handle_, CURLOPT_URL,
                   mayHaveCredentials ? withoutCredentials(url).c_str() : url.c_str());
  // libcurl stalls over TLS when a request's head exceeds two of its upload buffers.
  if (url.size() > kLongURL) {
    curl_easy_setopt(handle_, CURLOPT_UPLOAD_BUFFERSIZE, kLargeUploadBuffer);
  }
  // Plain HTTP is 1.1 here: requests would wait for the first answer to learn that.
  const bool mayShareConnection = multiplexes_ && strncasecmp(url.c_str(), "https:", 6) == 0;
  curl_easy_setopt(handle_, CURLOPT_PIPEWAIT, mayShareConnection ? 1L : 0L);
  headerLines_.set(*order_.request);
  curl_easy_setopt(handle_, CURLOPT_HTTPHEADER, headerLines_.list());
  _setMethodAndBody();
  _setProxy();
  _setTimeout();
}

std::shared_ptr<CurlURLTask> CurlTransfer::endTask() {
  loop_.assertCurrent();
  task_->transfer = nullptr;
  curl_easy_setopt(handle_, CURLOPT_POSTFIELDS, nullptr);
  order_ = {};
  response_.begin(0);
  taken_.reset();
  return std::exchange(task_, nullptr);
}

void CurlTransfer::_setMethodAndBody() {
  const URLRequest& request = *order_.request;
  const std::string& method = request.method;
  const bool isPost = method == "POST";
  const bool isHead = method == "HEAD";
  const bool hasBody =
      !isHead && (!request.body.empty() || isPost || method == "PUT" || method == "PATCH");
  curl_easy_setopt(handle_, CURLOPT_POSTFIELDS, nullptr);
  curl_easy_setopt(handle_, CURLOPT_HTTPGET, 1L);
  if (hasBody) {
    curl_easy_setopt(handle_, CURLOPT_POSTFIELDSIZE_LARGE,
                     static_cast<curl_off_t>(request.body.size()));
    curl_easy_setopt(handle_, CURLOPT_POSTFIELDS, request.body.empty() ? "" : request.body.data());
  } else if (isHead) {
    curl_easy_setopt(handle_, CURLOPT_NOBODY, 1L);
  }
  const bool isImplied = hasBody ? isPost : isHead || method == "GET";
  curl_easy_setopt(handle_, CURLOPT_CUSTOMREQUEST, isImplied ? nullptr : method.c_str());
  const bool watchesProgress = request.body.size() > kWatchedBodySize;
  curl_easy_setopt(handle_, CURLOPT_NOPROGRESS, watchesProgress ? 0L : 1L);
}

void CurlTransfer::_setProxy() {
  const bool wasProxied = std::exchange(proxied_, false);
  if (const auto* proxy = order_.proxy.get()) {
    const auto parts = parseURL(order_.request->url);
    proxied_ = parts && std::ranges::any_of(proxy->hosts, [&](const std::string& host) {
                 return strcasecmp(host.c_str(), parts->host.c_str()) == 0;
               });
  }
  if (!proxied_ && !wasProxied) return;
  curl_easy_setopt(handle_, CURLOPT_PROXY, proxied_ ? order_.proxy->proxy.c_str() : "");
  curl_easy_setopt(handle_, CURLOPT_HTTPPROXYTUNNEL, proxied_ ? 1L : 0L);
}

// Lets libcurl divide the time among a host's addresses; the rest of the time-outs is ours.
void CurlTransfer::_setTimeout() {
  const auto timeout =
      std::chrono::ceil<std::chrono::milliseconds>(timeoutOf(*order_.request)).count();
  curl_easy_setopt(handle_, CURLOPT_CONNECTTIMEOUT_MS, static_cast<long>(timeout));
}

void CurlTransfer::setMaximumIdleTime(Duration duration) {
  const auto seconds = std::chrono::ceil<std::chrono::seconds>(duration).count();
  curl_easy_setopt(handle_, CURLOPT_MAXAGE_CONN, static_cast<long>(seconds));
}

void CurlTransfer::_setFastOpen(bool on) {
  fastOpen_ = on;
  curl_easy_setopt(handle_, CURLOPT_TCP_FASTOPEN, on ? 1L : 0L);
}

void CurlTransfer::disableFastOpen() {
  if (fastOpen_) _setFastOpen(false);
}

bool CurlTransfer::givesUpFastOpen(CURLcode code) {
  const bool isConnectionFailure = code == CURLE_COULDNT_CONNECT ||
                                   code == CURLE_SSL_CONNECT_ERROR || code == CURLE_SEND_ERROR ||
                                   code == CURLE_RECV_ERROR;
  if (!fastOpen_ || requestsSent_ > 0 || !isConnectionFailure) return false;
  _setFastOpen(false);
  return true;
}

SteadyTime CurlTransfer::deadline() const {
  SteadyTime progress = progressed_;
  for (const CURLINFO step :
       {CURLINFO_NAMELOOKUP_TIME_T, CURLINFO_CONNECT_TIME_T, CURLINFO_APPCONNECT_TIME_T}) {
    progress = std::max(progress, begun_ + std::chrono::microseconds(curlNumber(handle_, step)));
  }
  const Duration timeout = timeoutOf(*order_.request);
  return std::min(progress + timeout, order_.resumedAt + timeout * kTotalTimeoutFactor);
}

URLResult CurlTransfer::takeResult(CURLcode code) {
  loop_.assertCurrent();
  URLResult result;
  result.response = response_.takeResponse(order_.request->url);
  if (response_.isTooLarge()) {
    result.error = urlError(URLErrorCode::TooLarge, "response too large");
  } else if (repeatRefused_) {
    result.error = urlError(URLErrorCode::ConnectionLost, "connection lost");
  } else if (code == CURLE_UNSUPPORTED_PROTOCOL && requestsSent_ > 0) {  // the answer's, not ours
    result.error = errorOfTransfer(CURLE_WEIRD_SERVER_REPLY, errorText_.data());
  } else if (code != CURLE_OK) {
    long systemError = 0;
    curl_easy_getinfo(handle_, CURLINFO_OS_ERRNO, &systemError);
    result.error = errorOfTransfer(code, errorText_.data(), systemError);
  } else if (!result.response) {
    result.error = urlError(URLErrorCode::Other, "no response");
  }
  if (result.response) result.data = Data(response_.takeBody());
  return result;
}

// Milliseconds from the task's start; negative for what has not happened.
double CurlTransfer::_milliseconds(CURLINFO time) const {
  const auto sinceBegun = curlNumber(handle_, time);
  if (sinceBegun <= 0) return -1;
  const Duration total = begun_ - order_.resumedAt + std::chrono::microseconds(sinceBegun);
  return std::chrono::duration<double, std::milli>(total).count();
}

void CurlTransfer::recordTiming(bool hasResponse) {
  loop_.assertCurrent();
  timing_.reused = requestsSent_ > 0 && curlLong(handle_, CURLINFO_NUM_CONNECTS) == 0;
  const bool connected = !timing_.reused;
  timing_.domainLookup = connected ? _milliseconds(CURLINFO_NAMELOOKUP_TIME_T) : -1;
  timing_.connect = connected ? _milliseconds(CURLINFO_CONNECT_TIME_T) : -1;
  timing_.tls = connected ? _milliseconds(CURLINFO_APPCONNECT_TIME_T) : -1;
  timing_.requestStart = requestsSent_ > 0 ? _milliseconds(CURLINFO_PRETRANSFER_TIME_T) : -1;
  timing_.responseStart = hasResponse ? _milliseconds(CURLINFO_STARTTRANSFER_TIME_T) : -1;
  timing_.responseEnd = hasResponse ? _milliseconds(CURLINFO_TOTAL_TIME_T) : -1;
  timing_.protocol = protocolName(curlLong(handle_, CURLINFO_HTTP_VERSION));
  timing_.bytesSent += curlLong(handle_, CURLINFO_REQUEST_SIZE);
  timing_.bytesSent += curlNumber(handle_, CURLINFO_SIZE_UPLOAD_T);
  timing_.bytesReceived += curlLong(handle_, CURLINFO_HEADER_SIZE);
  timing_.bytesReceived += curlNumber(handle_, CURLINFO_SIZE_DOWNLOAD_T);
  timing_.retries += std::max(0, requestsSent_ - 1);
  timing_.interface = interfaces_->nameOf(curlText(handle_, CURLINFO_LOCAL_IP), steadyNow());
  timing_.peerAddress = endpointText(curlText(handle_, CURLINFO_PRIMARY_IP),
                                     curlLong(handle_, CURLINFO_PRIMARY_PORT));
}

std::optional<json::object> CurlTransfer::connectionInformation() const {
  if (!proxied_) return std::nullopt;
  const auto lookup = curlNumber(handle_, CURLINFO_NAMELOOKUP_TIME_T);
  const auto connect = curlNumber(handle_, CURLINFO_CONNECT_TIME_T);
  const double took =
      timing_.reused ? 0 : static_cast<double>(std::max(connect - lookup, {})) / 1000;
  return json::object{
      {"proxy", order_.proxy->proxy}, {"protocol", timing_.protocol}, {"connect_time", took}};
}

std::size_t CurlTransfer::_onHeader(char* bytes, std::size_t, std::size_t size, void* self) {
  auto& transfer = *static_cast<CurlTransfer*>(self);
  transfer.loop_.assertCurrent();
  transfer.progressed_ = steadyNow();
  return transfer.response_.addHeaderLine({bytes, size}) ? size : 0;
}

std::size_t CurlTransfer::_onBody(char* bytes, std::size_t, std::size_t size, void* self) {
  auto& transfer = *static_cast<CurlTransfer*>(self);
  transfer.loop_.assertCurrent();
  transfer.progressed_ = steadyNow();
  return transfer.response_.addBody({bytes, size}) ? size : CURL_WRITEFUNC_ERROR;
}

// Called before each sending of the request: a second time when libcurl repeats it because the
// connection that it had kept was closed.
int CurlTransfer::_onRequest(void* self, char*, char*, int, int) {
  auto& transfer = *static_cast<CurlTransfer*>(self);
  transfer.loop_.assertCurrent();
  transfer.progressed_ = steadyNow();
  const int allowed = mayBeRepeated(*transfer.order_.request) ? 2 : 1;
  if (transfer.requestsSent_ < allowed) {
    ++transfer.requestsSent_;
    return CURL_PREREQFUNC_OK;
  }
  transfer.repeatRefused_ = true;
  return CURL_PREREQFUNC_ABORT;
}

int CurlTransfer::_onProgress(void* self, curl_off_t, curl_off_t received, curl_off_t,
                              curl_off_t sent) {
  auto& transfer = *static_cast<CurlTransfer*>(self);
  transfer.loop_.assertCurrent();
  if (const auto moved = received + sent; moved != transfer.bytesMoved_) {
    transfer.bytesMoved_ = moved;
    transfer.progressed_ = steadyNow();
  }
  return 0;
}

}  // namespace zelkord
