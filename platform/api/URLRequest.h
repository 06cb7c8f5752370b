#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "base/Data.h"
#include "base/Error.h"
#include "base/Time.h"

namespace zelkord {

using HTTPHeaders = std::vector<std::pair<std::string, std::string>>;

enum class CachePolicy { UseProtocol, ReloadIgnoringLocalCache };
// When there are too many transfers, those of low priority leave room for the others.
enum class TransferPriority { Normal, Low };

struct URLRequest {
  std::string url;  // absolute
  std::string method = "GET";
  HTTPHeaders headers;
  Data body;
  Duration timeout = 60s;  // without progress, real time; the whole task may take ten times that
  CachePolicy cachePolicy = CachePolicy::UseProtocol;
  TransferPriority priority = TransferPriority::Normal;
  // Asks for the network proxy service; counts once the proxy is enabled for the task.
  bool routed = false;
  // Asked on any thread for every URL that a redirect leads to; the task fails with -1002 when one
  // is not accepted. Empty: any.
  std::function<bool(const std::string& url)> acceptsRedirect;

  std::optional<std::string> header(std::string_view name) const;  // ASCII case-insensitive
};

// The routed form of a request.
URLRequest routedForm(URLRequest request);

struct URLResponse {
  std::string url;            // after redirects
  std::optional<int> status;  // none: not an HTTP response
  HTTPHeaders headers;        // as received, in order

  std::optional<std::string> header(
      std::string_view name) const;  // ASCII case-insensitive; repeated ones joined by ", "
};

// When a task's steps happened, in milliseconds from its start; negative: did not happen.
struct TimingData {
  double domainLookup = -1;
  double connect = -1;
  double tls = -1;
  double requestStart = -1;
  double responseStart = -1;
  double responseEnd = -1;
  std::string protocol;  // "http/1.1", "h2"
  std::int64_t bytesSent = 0;
  std::int64_t bytesReceived = 0;
  int retries = 0;
  bool reused = false;
  std::string interface;    // name of the network interface: "eth0"; "" when unknown
  std::string peerAddress;  // "ADDRESS:PORT"
};

// What a task ended with. A transport error and data may come together (a body that was cut off).
struct URLResult {
  struct File {
    std::string path;  // exists until the completion returns
    std::uint64_t size = 0;
  };

  std::optional<Data> data;
  std::optional<File> file;  // a download's body, in place of `data`
  std::optional<URLResponse> response;
  std::optional<Error> error;

  int status() const { return response ? response->status.value_or(0) : 0; }
  // Of the body, wherever it is.
  std::size_t dataLength() const { return data ? data->size() : file ? file->size : 0; }
};

// The URL as logs show it: a query is "?<private>" unless `showsPrivateData`.
std::string urlForLog(std::string_view url, bool showsPrivateData);

}  // namespace zelkord
