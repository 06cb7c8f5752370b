#include "zelkord/network/exchange/NetworkTiming.h"

namespace zelkord {

json::object networkTimingData(const TimingData& timing) {
  json::object data;
  const auto put = [&data](std::string_view key, double milliseconds) {
    data[key] = milliseconds >= 0 ? json::value(milliseconds) : nullptr;
  };
  put("domain_lookup", timing.domainLookup);
  put("connect", timing.connect);
  put("tls", timing.tls);
  put("request_start", timing.requestStart);
  put("response_start", timing.responseStart);
  put("response_end", timing.responseEnd);
  data["protocol"] = timing.protocol;
  data["bytes_sent"] = timing.bytesSent;
  data["bytes_received"] = timing.bytesReceived;
  data["retries"] = timing.retries;
  data["reused"] = timing.reused;
  return data;
}

}  // namespace zelkord
