// Searches once and prints what came: example_search TEXT
//
// It connects to the daemon of the session, which is started when it does not run.

#include <cstdio>
#include <string>

#include "corezelkor/client/Client.h"
#include "corezelkor/client/Results.h"

int main(int count, char** words) {
  if (count != 2) {
    std::fprintf(stderr, "usage: example_search TEXT\n");
    return 2;
  }

  // Who we are. The identifier names the search surface, the user agent the program.
  zelkor::ClientOptions options;
  options.configuration = {.identifier = "lanthe", .userAgent = "example/1.0"};
  options.timeout = std::chrono::seconds(10);
  // Told on the client's own thread, now and whenever the service's configuration changes.
  options.bagDidLoad = [](const auto& bag, const auto& error) {
    if (bag) std::fprintf(stderr, "bag version %s\n", bag->version.value_or("none").c_str());
    if (error) std::fprintf(stderr, "no bag: %s\n", error->description().c_str());
  };
  zelkor::Client client(options);

  // Query ids grow with every keystroke, so that answers to older ones are not waited for.
  zelkor::ZLKSearchRequest request;
  request.queryId = 1;
  request.queryString = words[1];
  // A program with a loop of its own calls then() instead, and hands the answer to its thread.
  const auto future = client.request(request);
  const zelkor::ClientAnswer& answer = future.get();

  if (answer.error) {
    std::fprintf(stderr, "failed: %s\n", answer.error->description().c_str());
    return 1;
  }
  // Nothing at all is an answer too: the text is too short, or the service is switched off.
  // An answer out of the daemon's cache also holds results for other texts, which are left out
  // here.
  const auto sets = zelkor::resultsFor(words[1], answer);
  if (sets) std::printf("%s\n", zelkor::json::serialize(*sets).c_str());
  return 0;
}
