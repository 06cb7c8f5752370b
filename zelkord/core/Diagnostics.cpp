#include "zelkord/core/Diagnostics.h"

#include <unistd.h>

#include "corezelkor/Constants.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/core/ClientConnection.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/core/Wire.h"
#include "zelkord/network/bag/BagRefreshRule.h"
#include "zelkord/network/bag/ZelkorBagController.h"

namespace zelkord {
namespace {

json::value textOrNull(const std::optional<std::string>& text) {
  if (!text) return nullptr;
  return json::string(*text);
}

json::array transactionsOf(const ProcessTransactions& transactions) {
  json::array names;
  for (const auto& name : transactions.openNames()) names.emplace_back(name);
  return names;
}

json::array connectionsOf(const std::vector<std::shared_ptr<ClientConnection>>& connections) {
  json::array list;
  for (const auto& connection : connections) {
    const auto configuration = connection->configuration();
    list.push_back(
        {{"pid", connection->peer().pid},
         {"identifier", configuration ? json::value(configuration->identifier) : nullptr},
         {"current_query_id", connection->currentQueryId()}});
  }
  return list;
}

json::array statesOf(ClientStateManager& manager) {
  json::array list;
  for (const auto& state : manager.states()) {
    list.push_back({{"identifier", state->identifier()},
                    {"agent", textOrNull(state->userAgent())},
                    {"short_name", textOrNull(state->clientShortName())},
                    {"has_bag", state->currentBag() != nullptr}});
  }
  return list;
}

json::value timeOrNull(const std::optional<WallTime>& time) {
  if (!time) return nullptr;
  return secondsSince1970(*time);
}

json::object bagOf(ZelkorBagController& controller) {
  json::object object;
  if (const auto bag = controller.inMemoryBag()) {
    const auto expiration = numberIn(*bag->rawBag(), kBagExpirationKey);
    object["version"] = textOrNull(bag->version());
    object["enabled"] = bag->isEnabled();
    object["expiration"] = expiration ? json::value(*expiration) : nullptr;
  }
  const auto fetches = controller.fetchStatus();
  object["url"] = fetches.url;
  object["last_failure"] = nullptr;
  if (const auto& failure = fetches.lastFailure) {
    object["last_failure"] = {{"time", timeOrNull(failure->time)}, {"reason", failure->reason}};
  }
  object["next_attempt"] = timeOrNull(fetches.nextAttempt);
  return object;
}

json::object transportOf(const ipc::Statistics& statistics) {
  return {{"connections", statistics.connections},
          {"calls", statistics.calls},
          {"refused", statistics.refused},
          {"queued_bytes", statistics.queuedBytes},
          {"held_bytes", statistics.heldBytes}};
}

}  // namespace

Diagnostics::Diagnostics(Assembly& assembly, Connections connections)
    : assembly_(assembly), connections_(std::move(connections)) {}

const ServedInterface<Diagnostics>& Diagnostics::interface() {
  static const ServedInterface<Diagnostics> kInterface = {
      kDiagnosticsInterface,
      {
          {{"Status", "", "s json"}, &Diagnostics::_status},
          {{"Metrics", "", "a{sx} counters"}, &Diagnostics::_metrics},
          {{"ReadDefault", "s domain, s key", "s json"}, &Diagnostics::_readDefault},
          {{"WriteDefault", "s domain, s key, s json", ""}, &Diagnostics::_writeDefault},
      }};
  return kInterface;
}

void Diagnostics::handle(ipc::Call call) {
  if (const auto* member = interface().find(call)) (this->*member->handle)(call);
}

void Diagnostics::_status(const ipc::Call& call) { call.reply->send({status()}); }

void Diagnostics::_metrics(const ipc::Call& call) {
  const auto counters = assembly_.platform().counters.all();
  call.reply->send({ipc::IntegerMap(counters.begin(), counters.end())});
}

std::string Diagnostics::status() const {
  const auto& platform = assembly_.platform();
  json::object status;
  status["pid"] = ::getpid();
  status["version"] = std::string(kZLKZelkordNameVersion);
  status["transactions"] = transactionsOf(platform.transactions);
  status["connections"] = connectionsOf(connections_());
  status["states"] = statesOf(*assembly_.clientStateManager());
  status["bag"] = bagOf(*assembly_.bagController());
  status["interprocess"] = transportOf(platform.interprocess.statistics());
  return jsonText(status);
}

void Diagnostics::_readDefault(const ipc::Call& call) {
  const auto& domain = call.argument<std::string>(0);
  const auto& key = call.argument<std::string>(1);
  if (key.empty()) {
    return call.reply->send({jsonText(assembly_.userDefaults().all(domain))});
  }
  const auto value = assembly_.userDefaults().value(key, domain);
  call.reply->send({value ? jsonText(*value) : std::string()});
}

void Diagnostics::_writeDefault(const ipc::Call& call) {
  const auto& domain = call.argument<std::string>(0);
  const auto& key = call.argument<std::string>(1);
  const auto& text = call.argument<std::string>(2);
  auto& settings = assembly_.userDefaults();
  if (key.empty()) return call.reply->fail(ipc::kInvalidArgs, "a setting needs a key");
  auto value = parseJson(text);
  if (!value && !text.empty()) return call.reply->fail(ipc::kInvalidArgs, "the value is not JSON");
  const bool isOwn = domain.empty() || domain == kSettingsDomain;
  const auto refusal = isOwn ? settingRefusal(key, value ? &*value : nullptr) : std::nullopt;
  if (refusal) return call.reply->fail(ipc::kInvalidArgs, *refusal);
  if (value) {
    settings.set(key, *std::move(value), domain);
  } else {
    settings.remove(key, domain);
  }
  settings.flush();
  call.reply->send({});
}

}  // namespace zelkord
