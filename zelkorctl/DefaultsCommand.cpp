#include <algorithm>

#include "corezelkor/Constants.h"
#include "corezelkor/client/ClientError.h"
#include "corezelkor/client/DiagnosticsClient.h"
#include "zelkorctl/AnswerText.h"
#include "zelkorctl/Commands.h"
#include "zelkorctl/Printable.h"
#include "zelkorctl/SettingsFile.h"

namespace zelkorctl {
namespace {

using Settings = std::vector<std::pair<std::string, std::string>>;
using Outcomes = ClientResult<Settings>;

// Reads and writes through the daemon, or the file; both speak JSON texts.
class SettingsAccess {
 public:
  virtual ~SettingsAccess() = default;
  virtual ClientResult<std::string> read(const std::string& key) = 0;  // empty: none
  virtual std::optional<Error> write(const std::string& key, const std::string& json) = 0;
  virtual Outcomes list() = 0;
};

class DaemonSettings final : public SettingsAccess {
 public:
  DaemonSettings(Client& client, std::string domain)
      : diagnostics_(client), domain_(std::move(domain)) {}

  ClientResult<std::string> read(const std::string& key) override {
    return diagnostics_.readDefault(domain_, key).get();
  }
  std::optional<Error> write(const std::string& key, const std::string& json) override {
    return diagnostics_.writeDefault(domain_, key, json).get().error;
  }
  Outcomes list() override {
    auto result = read("");  // the whole domain
    if (result.error) return {std::nullopt, std::move(result.error)};
    const auto parsed = parseJson(result.value.value_or(""));
    if (!parsed || !parsed->is_object()) {
      return {std::nullopt, clientError(ClientErrorCode::BadReply, "no JSON object")};
    }
    Settings settings;
    for (const auto& entry : parsed->get_object()) {
      settings.emplace_back(entry.key(), json::serialize(entry.value()));
    }
    return {std::move(settings), std::nullopt};
  }

 private:
  const DiagnosticsClient diagnostics_;
  const std::string domain_;
};

class StoredSettings final : public SettingsAccess {
 public:
  explicit StoredSettings(const std::string& domain)
      : file_(settingsFilePath()), domain_(domain.empty() ? std::string(kServiceName) : domain) {}

  ClientResult<std::string> read(const std::string& key) override {
    auto value = file_.read(domain_, key).value_or("");
    if (file_.error()) return {std::nullopt, file_.error()};
    return {std::move(value), std::nullopt};
  }
  std::optional<Error> write(const std::string& key, const std::string& json) override {
    if (json.empty()) {
      file_.remove(domain_, key);
    } else {
      file_.write(domain_, key, json);
    }
    return file_.error();
  }
  Outcomes list() override {
    auto settings = file_.list(domain_);
    if (file_.error()) return {std::nullopt, file_.error()};
    return {std::move(settings), std::nullopt};
  }

 private:
  SettingsFile file_;
  const std::string domain_;
};

int reportRead(const Invocation& invocation, const std::string& key,
               const ClientResult<std::string>& result) {
  if (result.error) return reportError(invocation, *result.error);
  if (!result.value || result.value->empty()) {
    return reportError(invocation, zelkorError(404, "no setting " + key));
  }
  auto& out = invocation.surroundings.out;
  out << (invocation.options.json ? *result.value : printable(*result.value)) << '\n';
  return kAnswered;
}

int reportList(const Invocation& invocation, const Outcomes& result) {
  if (result.error) return reportError(invocation, *result.error);
  json::object object;
  std::size_t columns = 0;
  for (const auto& [key, text] : *result.value) {
    object[key] = parseJson(text).value_or(json::value());
    columns = std::max(columns, displayWidth(printable(key)));
  }
  if (invocation.options.json) {
    invocation.surroundings.out << json::serialize(object) << '\n';
    return kAnswered;
  }
  for (const auto& [key, text] : *result.value) printPair(invocation, key, text, columns);
  return kAnswered;
}

int reportWrite(const Invocation& invocation, const std::optional<Error>& error) {
  return error ? reportError(invocation, *error) : kAnswered;
}

int perform(const Invocation& invocation, SettingsAccess& settings) {
  const auto& words = invocation.options.arguments;
  const auto& action = words.front();
  if (action == "read") return reportRead(invocation, words[1], settings.read(words[1]));
  if (action == "write") return reportWrite(invocation, settings.write(words[1], words[2]));
  if (action == "delete") return reportWrite(invocation, settings.write(words[1], ""));
  return reportList(invocation, settings.list());
}

// Whether the file may be used: nobody named a daemon, and there is none.
bool shouldUseFile(const Invocation& invocation, Client& client) {
  if (!invocation.options.address.empty() || !invocation.options.socket.empty()) return false;
  const auto future = client.listSessions();
  const auto& error = future.get().error;
  return error && isClientError(*error, ClientErrorCode::NotReachable);
}

}  // namespace

int runDefaults(const Invocation& invocation) {
  const auto& words = invocation.options.arguments;
  if (words.front() == "write" && !parseJson(words[2])) {
    invocation.surroundings.err << "zelkorctl: the value is not JSON; a text has quotes: '\""
                                << printable(words[2]) << "\"'\n";
    return kWrongUsage;
  }
  Client client(unconfigured(invocation.options));
  if (shouldUseFile(invocation, client)) {
    if (invocation.options.verbose) {
      invocation.surroundings.err << "no daemon runs: opening " << printable(settingsFilePath())
                                  << '\n';
    }
    StoredSettings stored(invocation.options.domain);
    return perform(invocation, stored);
  }
  DaemonSettings daemon(client, invocation.options.domain);
  return perform(invocation, daemon);
}

}  // namespace zelkorctl
