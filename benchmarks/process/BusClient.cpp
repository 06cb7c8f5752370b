#include "benchmarks/process/BusClient.h"

#include <stdexcept>
#include <utility>

#include "benchmarks/process/BusConnecting.h"

namespace zelkord::bench {

BusClient BusClient::ofPeer(const std::string& address, const std::string& identifier) {
  return {connectToPeer(address), "", identifier};
}

BusClient BusClient::onBus(const std::string& address, const std::string& service) {
  return {connectToBus(address), service, "com.quenta.benchmark"};
}

BusClient::BusClient(zelkor::BusPointer bus, std::string service, const std::string& identifier)
    : bus_(std::move(bus)), service_(std::move(service)) {
  const auto reply = _call(configureCall(bus_.get(), service_, identifier).get());
  const char* endpoint = "";
  check(sd_bus_message_read(reply.get(), "s", &endpoint), "reading the endpoint's address");
  endpoint_ = endpoint;
}

SearchAnswer BusClient::search(Search query) {
  query.queryId = ++queryId_;
  return searchAnswer(_call(searchCall(bus_.get(), service_, query).get()).get());
}

SearchAnswer BusClient::firstSearch(const Search& query) {
  for (int attempt = 0; attempt < 5; ++attempt) {
    auto answer = search(query);
    if (!answer.failed) return answer;
  }
  throw std::runtime_error("a search is answered with an error");
}

zelkor::MessagePointer BusClient::_call(sd_bus_message* call) {
  // Calls from the other side (the bag has come) are only thrown away.
  while (sd_bus_process(bus_.get(), nullptr) > 0) {
  }
  sd_bus_error error{};
  sd_bus_message* reply = nullptr;
  const int result = sd_bus_call(bus_.get(), call, 0, &error, &reply);
  const std::string text = error.message ? error.message : "a call";
  sd_bus_error_free(&error);
  check(result, text);
  return zelkor::MessagePointer(reply);
}

}  // namespace zelkord::bench
