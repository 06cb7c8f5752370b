#include "benchmarks/process/SearchCall.h"

#include <functional>

#include "benchmarks/process/BusConnecting.h"

namespace zelkord::bench {
namespace {

using Entry = std::function<bool(const std::string& key)>;

zelkor::MessagePointer newCall(sd_bus* bus, const std::string& destination, const char* member) {
  sd_bus_message* call = nullptr;
  check(sd_bus_message_new_method_call(bus, &call,
                                       destination.empty() ? nullptr : destination.c_str(),
                                       "/com/quenta/zelkord", "com.quenta.zelkord.Daemon1", member),
        "making a call");
  return zelkor::MessagePointer(call);
}

void appendItems(sd_bus_message* call, const Search& search) {
  check(sd_bus_message_open_container(call, 'e', "sv"), "writing");
  check(sd_bus_message_append(call, "s", "queryItems"), "writing");
  check(sd_bus_message_open_container(call, 'v', "a(ss)"), "writing");
  check(sd_bus_message_open_container(call, 'a', "(ss)"), "writing");
  for (const auto& [name, value] : search.queryItems) {
    check(sd_bus_message_append(call, "(ss)", name.c_str(), value.c_str()), "writing");
  }
  for (int i = 0; i < 3; ++i) check(sd_bus_message_close_container(call), "writing");
}

// Walks over the a{sv} that comes next. `entry` reads the variant and says so, or lets it be.
int forEachEntry(sd_bus_message* message, const Entry& entry) {
  int count = 0;
  check(sd_bus_message_enter_container(message, 'a', "{sv}"), "reading a dictionary");
  while (sd_bus_message_enter_container(message, 'e', "sv") > 0) {
    const char* key = "";
    check(sd_bus_message_read(message, "s", &key), "reading a key");
    if (!entry(key)) check(sd_bus_message_skip(message, "v"), "skipping a value");
    check(sd_bus_message_exit_container(message), "leaving an entry");
    ++count;
  }
  check(sd_bus_message_exit_container(message), "leaving a dictionary");
  return count;
}

bool readText(sd_bus_message* message, std::string& text) {
  const char* read = "";
  check(sd_bus_message_read(message, "v", "s", &read), "reading a text");
  text = read;
  return true;
}

bool readItems(sd_bus_message* message, Search& search) {
  check(sd_bus_message_enter_container(message, 'v', "a(ss)"), "reading items");
  check(sd_bus_message_enter_container(message, 'a', "(ss)"), "reading items");
  const char* name = "";
  const char* value = "";
  while (sd_bus_message_read(message, "(ss)", &name, &value) > 0) {
    search.queryItems.emplace_back(name, value);
  }
  check(sd_bus_message_exit_container(message), "reading items");
  check(sd_bus_message_exit_container(message), "reading items");
  return true;
}

bool readSize(sd_bus_message* message, SearchAnswer& answer) {
  const void* bytes = nullptr;
  check(sd_bus_message_enter_container(message, 'v', "ay"), "reading data");
  check(sd_bus_message_read_array(message, 'y', &bytes, &answer.dataSize), "reading data");
  check(sd_bus_message_exit_container(message), "reading data");
  return true;
}

bool readHeaders(sd_bus_message* message, SearchAnswer& answer) {
  check(sd_bus_message_enter_container(message, 'v', "a{ss}"), "reading headers");
  check(sd_bus_message_enter_container(message, 'a', "{ss}"), "reading headers");
  const char* name = "";
  const char* value = "";
  while (sd_bus_message_read(message, "{ss}", &name, &value) > 0) {
    answer.headers.emplace_back(name, value);
  }
  check(sd_bus_message_exit_container(message), "reading headers");
  check(sd_bus_message_exit_container(message), "reading headers");
  return true;
}

bool readRequest(sd_bus_message* message, SearchAnswer& answer) {
  check(sd_bus_message_enter_container(message, 'v', "a{sv}"), "reading the request");
  forEachEntry(message, [&](const std::string& key) {
    if (key == "headers") return readHeaders(message, answer);
    return key == "url" && readText(message, answer.url);
  });
  check(sd_bus_message_exit_container(message), "reading the request");
  return true;
}

}  // namespace

zelkor::MessagePointer configureCall(sd_bus* bus, const std::string& destination,
                                     const std::string& identifier) {
  auto call = newCall(bus, destination, "Configure");
  check(sd_bus_message_append(call.get(), "a{sv}", 2, "identifier", "s", identifier.c_str(),
                              "userAgent", "s", "Benchmark/1.0"),
        "writing");
  return call;
}

zelkor::MessagePointer searchCall(sd_bus* bus, const std::string& destination,
                                  const Search& search) {
  auto call = newCall(bus, destination, "Request");
  auto* message = call.get();
  check(sd_bus_message_append(message, "s", "search"), "writing");
  check(sd_bus_message_open_container(message, 'a', "{sv}"), "writing");
  check(sd_bus_message_append(message, "{sv}", "queryId", "x", search.queryId), "writing");
  check(sd_bus_message_append(message, "{sv}", "queryString", "s", search.queryString.c_str()),
        "writing");
  if (search.verbose)
    check(sd_bus_message_append(message, "{sv}", "verboseReply", "b", 1), "writing");
  if (!search.queryItems.empty()) appendItems(message, search);
  check(sd_bus_message_close_container(message), "writing");
  return call;
}

Search searchIn(sd_bus_message* call) {
  Search search;
  check(sd_bus_message_skip(call, "s"), "reading the kind");
  forEachEntry(call, [&](const std::string& key) {
    if (key == "queryItems") return readItems(call, search);
    if (key == "queryString") return readText(call, search.queryString);
    if (key != "queryId") return false;
    check(sd_bus_message_read(call, "v", "x", &search.queryId), "reading the query's number");
    return true;
  });
  return search;
}

SearchAnswer searchAnswer(sd_bus_message* reply) {
  SearchAnswer answer;
  if (sd_bus_message_is_method_error(reply, nullptr) > 0) {
    answer.failed = true;
    return answer;
  }
  check(sd_bus_message_skip(reply, "x"), "reading the query's number");
  forEachEntry(reply, [&](const std::string& key) {
    if (key == "data") return readSize(reply, answer);
    return key == "httpRequest" && readRequest(reply, answer);
  });
  answer.failed = forEachEntry(reply, [](const std::string&) { return false; }) > 0;
  return answer;
}

}  // namespace zelkord::bench
