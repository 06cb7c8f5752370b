#include "zelkord/core/DaemonTestSupport.h"

#include "corezelkor/Constants.h"
#include "zelkord/network/bag/ZelkorBagController.h"

namespace zelkord {

DaemonBed::DaemonBed(const json::object& settings) {
  for (const auto& entry : settings) fakes.settings.set(entry.key(), entry.value());
  fakes.interprocess.setExecutableName(100, "shell");
  daemon.start();
  daemon.assembly().urlSession();
  run();
}

DaemonBed::~DaemonBed() {
  fakes.interprocess.disconnectAll();
  run();
}

DaemonBed::Client DaemonBed::connect(pid_t pid) {
  auto client = fakes.interprocess.connect({.pid = pid});
  run();
  return client;
}

DaemonBed::Answer DaemonBed::call(const Client& client, const std::string& member,
                                  ipc::Values values) {
  auto answer = client->call(std::string(kDaemonInterface), member, std::move(values));
  run();
  return answer;
}

DaemonBed::Answer DaemonBed::configure(const Client& client, const std::string& identifier,
                                       const std::string& userAgent) {
  return call(client, "Configure",
              {ipc::Dictionary{{"identifier", identifier}, {"userAgent", userAgent}}});
}

DaemonBed::Answer DaemonBed::search(const Client& client, std::int64_t queryId,
                                    const std::string& text, ipc::Dictionary more) {
  more["queryId"] = queryId;
  more["queryString"] = text;
  return call(client, "Request", {"search", std::move(more)});
}

DaemonBed::Client DaemonBed::connectAndConfigure(const std::string& identifier, pid_t pid) {
  auto client = connect(pid);
  configure(client, identifier);
  return client;
}

void DaemonBed::installBag(const std::string& text) {
  auto dictionary = parseJson(text)->as_object();
  dictionary["__refresh_disabled"] = true;
  daemon.assembly().bagController()->cacheBagState(
      std::make_shared<const ZLKBag>(std::make_shared<const json::object>(std::move(dictionary)),
                                     "daemon"),
      BagOrigin::Network);
  run();
}

std::string reasonIn(const ipc::FakeAnswer& answer, std::size_t place) {
  if (answer.values.size() <= place) return "unanswered";
  const auto& error = *answer.values[place].get<ipc::Dictionary>();
  const auto info = error.find("userInfo");
  if (info == error.end()) return {};
  const auto& fields = *info->second.get<ipc::Dictionary>();
  const auto reason = fields.find("reason");
  return reason == fields.end() ? std::string() : *reason->second.get<std::string>();
}

bool isNothing(const ipc::FakeAnswer& answer, std::size_t place) {
  return answer.values.size() > place && answer.values[place].get<ipc::Dictionary>()->empty();
}

}  // namespace zelkord
