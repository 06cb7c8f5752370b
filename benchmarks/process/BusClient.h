#pragma once

#include <string>

#include "benchmarks/process/SearchCall.h"

namespace zelkord::bench {

// The least client: one plain connection on which one call at a time waits for its answer.
//
// Threading: one thread. Errors: throws std::runtime_error when the connection fails.
class BusClient {
 public:
  // Connects and configures itself.
  static BusClient ofPeer(const std::string& address,
                          const std::string& identifier = "com.quenta.benchmark");
  static BusClient onBus(const std::string& address, const std::string& service);

  // Of the second connection, as the configuration told it.
  const std::string& endpointAddress() const { return endpoint_; }

  // The query gets the next number.
  SearchAnswer search(Search query);
  // The same over again, for as long as the answer is an error: the daemon may not know the
  // service yet.
  SearchAnswer firstSearch(const Search& query);

 private:
  BusClient(zelkor::BusPointer bus, std::string service, const std::string& identifier);

  zelkor::MessagePointer _call(sd_bus_message* call);

  zelkor::BusPointer bus_;
  const std::string service_;
  std::string endpoint_;
  std::int64_t queryId_ = 0;
};

}  // namespace zelkord::bench
