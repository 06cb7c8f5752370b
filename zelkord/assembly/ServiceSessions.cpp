#include "zelkord/assembly/ServiceSessions.h"

namespace zelkord {
namespace {

URLSessionConfiguration configurationOfQueries(const SettingsStore& settings) {
  URLSessionConfiguration configuration;
  configuration.name = "urlSession";
  configuration.identityHeader = kUserGuidHeader;
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
  configuration.identityHeader = kUserGuidHeader;
  return configuration;
}

}  // namespace

URLSession& ServiceSessions::urlSession() {
  std::call_once(urlOnce_, [this] {
    url_ = sessions_.make(configurationOfQueries(settings_));
    madeURL_ = url_.get();
  });
  return *url_;
}

URLSession& ServiceSessions::bagSession() {
  std::call_once(bagOnce_, [this] {
    bag_ = sessions_.make(configurationOfTheBag());
    madeBag_ = bag_.get();
  });
  return *bag_;
}

void ServiceSessions::endIdentity(const std::string& identity) {
  for (URLSession* session : {madeURL_.load(), madeBag_.load()}) {
    if (session) session->endIdentity(identity);
  }
}

}  // namespace zelkord
