#include "zelkord/assembly/ServiceSessions.h"

namespace zelkord {
namespace {

URLSessionConfiguration configurationOfQueries(const SettingsStore& settings) {
  URLSessionConfiguration configuration;
  configuration.name = "urlSession";
  configuration.cache = URLSessionConfiguration::Cache{4'194'304, 104'857'600, 16'384};
  configuration.pipelining = true;
  if (!boolSetting(settings, "ZLKNoParallax")) {
    configuration.tcpFastOpen = true;
    configuration.tlsSessionTickets = true;
  }
  return configuration;
}

URLSessionConfiguration configurationOfTheBag() {
  URLSessionConfiguration configuration;
  configuration.name = "bagSession";
  return configuration;
}

}  // namespace

URLSession& ServiceSessions::urlSession() {
  std::call_once(urlOnce_, [this] { url_ = sessions_.make(configurationOfQueries(settings_)); });
  return *url_;
}

URLSession& ServiceSessions::bagSession() {
  std::call_once(bagOnce_, [this] { bag_ = sessions_.make(configurationOfTheBag()); });
  return *bag_;
}

}  // namespace zelkord
