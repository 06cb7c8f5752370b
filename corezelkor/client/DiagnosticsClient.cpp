#include "corezelkor/client/DiagnosticsClient.h"

#include <utility>

#include "corezelkor/Constants.h"
#include "corezelkor/client/internal/ClientCore.h"
#include "corezelkor/client/internal/Wire.h"

namespace zelkor {
namespace {

ClientCore::Target diagnosticsCall(std::string_view member) {
  return {ClientCore::Place::Main, kDiagnosticsInterface, member};
}

ClientCore::Encode textArguments(std::vector<std::string> arguments) {
  return [arguments = std::move(arguments)](MessageWriter& writer) {
    for (const auto& argument : arguments) writer.text(argument);
  };
}

}  // namespace

ZLKFuture<ClientResult<std::string>> DiagnosticsClient::_text(
    std::string_view member, std::vector<std::string> arguments) const {
  return core_.call<ClientResult<std::string>>(
      diagnosticsCall(member), textArguments(std::move(arguments)),
      [](MessageReader& reader, auto& result) { result.value = reader.text(); });
}

ZLKFuture<ClientResult<Nothing>> DiagnosticsClient::_order(
    std::string_view member, std::vector<std::string> arguments) const {
  return core_.call<ClientResult<Nothing>>(
      diagnosticsCall(member), textArguments(std::move(arguments)),
      [](MessageReader&, auto& result) { result.value.emplace(); });
}

ZLKFuture<ClientResult<std::string>> DiagnosticsClient::status() const {
  return _text("Status", {});
}

ZLKFuture<ClientResult<std::string>> DiagnosticsClient::transfers() const {
  return _text("Transfers", {});
}

ZLKFuture<ClientResult<std::string>> DiagnosticsClient::resources() const {
  return _text("Resources", {});
}

ZLKFuture<ClientResult<std::map<std::string, std::int64_t>>> DiagnosticsClient::metrics() const {
  return core_.call<ClientResult<std::map<std::string, std::int64_t>>>(
      diagnosticsCall("Metrics"), textArguments({}),
      [](MessageReader& reader, auto& result) { result.value = readMetrics(reader); });
}

ZLKFuture<ClientResult<Nothing>> DiagnosticsClient::fetchResource(std::string identifier) const {
  return _order("FetchResource", {std::move(identifier)});
}

ZLKFuture<ClientResult<std::string>> DiagnosticsClient::readDefault(std::string domain,
                                                                    std::string key) const {
  return _text("ReadDefault", {std::move(domain), std::move(key)});
}

ZLKFuture<ClientResult<Nothing>> DiagnosticsClient::writeDefault(std::string domain,
                                                                 std::string key,
                                                                 std::string json) const {
  return _order("WriteDefault", {std::move(domain), std::move(key), std::move(json)});
}

}  // namespace zelkor
