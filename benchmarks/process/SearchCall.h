#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "corezelkor/client/internal/BusPointers.h"

namespace zelkord::bench {

// A search as clients ask for it.
struct Search {
  std::int64_t queryId = 0;
  std::string queryString;
  std::vector<std::pair<std::string, std::string>> queryItems;
  bool verbose = false;
};

// What came back. `url` and `headers` are those of the request to the service, for verbose ones.
struct SearchAnswer {
  bool failed = false;
  std::size_t dataSize = 0;
  std::string url;
  std::vector<std::pair<std::string, std::string>> headers;
};

// `destination` is empty for a peer.
zelkor::MessagePointer configureCall(sd_bus* bus, const std::string& destination,
                                     const std::string& identifier);
zelkor::MessagePointer searchCall(sd_bus* bus, const std::string& destination,
                                  const Search& search);
// Both throw std::runtime_error when the message has another form; a D-Bus error is a failed
// answer. Of a call only what the service is asked for is read.
Search searchIn(sd_bus_message* call);
SearchAnswer searchAnswer(sd_bus_message* reply);

}  // namespace zelkord::bench
