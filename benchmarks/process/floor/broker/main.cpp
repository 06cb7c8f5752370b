// usage: zelkord_floor_broker SOCKET URL [HEADER...]
//
// Serves on the socket; searches go to the URL with these headers. The service's certificate is in
// the file that SSL_CERT_FILE names.

#include <curl/curl.h>

#include <csignal>

#include "benchmarks/process/floor/broker/FloorBroker.h"

int main(int count, char** arguments) {
  if (count < 3) return 2;
  std::signal(SIGPIPE, SIG_IGN);
  curl_global_init(CURL_GLOBAL_DEFAULT);
  zelkord::bench::FloorBroker(arguments[1], arguments[2], {arguments + 3, arguments + count}).run();
}
