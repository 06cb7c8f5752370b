#include <charconv>
#include <filesystem>

#include "zelkorctl/Commands.h"
#include "zelkorctl/ContainerFile.h"
#include "zelkorctl/FeedbackMessages.h"
#include "zelkorctl/Printable.h"

namespace zelkorctl {
namespace {

json::object headerJson(const CZClientSession& header) {
  json::object versions;
  for (const auto& entry : header.cpResourceVersions) versions[entry.identifier] = entry.version;
  json::object object{
      {"agent", header.agent},
      {"user_guid", header.userGuidString},
      {"previous_session_end_reason", std::string(header.previousSessionEndReason.text())},
      {"remove_timestamps", header.removeTimestamps},
      {"first_use_of_the_day", header.firstUseOfTheDay},
      {"resource_versions", std::move(versions)}};
  const auto& start = header.sessionStartSince1970;
  object["session_start"] = start ? json::value(*start) : nullptr;
  return object;
}

json::object recordJson(const ContainerFile::Record& record) {
  return {{"class", record.className},
          {"query_id", record.feedback.queryId},
          {"client_query_id", record.feedback.clientQueryId},
          {"feedback", jsonOfMessage(record.className, record.message)}};
}

// Why the session ended; empty while it is open, or when nobody wrote an end.
std::string endOf(const ContainerFile& file) {
  if (file.records.empty()) return {};
  const auto& last = file.records.back();
  if (last.className != "ZelkorSessionEndFeedback") return {};
  const auto fields = jsonOfMessage(last.className, last.message);
  const auto* reason = fields.is_object() ? fields.get_object().if_contains("reason") : nullptr;
  const auto number = reason && reason->is_string() ? std::atoi(reason->get_string().c_str()) : 0;
  return std::string(entryOf(vocabulary::kSessionEndReasons, number));
}

json::object summaryJson(std::uint32_t number) {
  json::object entry{{"number", number}};
  const auto read = readContainer(containerPath(number));
  if (const auto* fault = std::get_if<ContainerFault>(&read)) {
    entry["damaged"] = fault->text;
    return entry;
  }
  const auto& file = std::get<ContainerFile>(read);
  entry["size"] = file.size;
  entry["agent"] = file.header.agent;
  entry["records"] = file.records.size();
  const auto end = endOf(file);
  entry["end"] = end.empty() ? json::value() : json::value(end);
  return entry;
}

void printSummary(const Invocation& invocation, const json::object& entry) {
  const auto name = "session." + json::serialize(entry.at("number"));
  if (const auto damage = stringIn(entry, "damaged")) {
    return printPair(invocation, name, "damaged: " + *damage, 12);
  }
  printPair(invocation, name,
            json::serialize(entry.at("records")) + " records, " +
                json::serialize(entry.at("size")) + " bytes, " +
                stringIn(entry, "agent").value_or("") + ", " +
                stringIn(entry, "end").value_or("not ended"),
            12);
}

int listContainers(const Invocation& invocation) {
  json::array list;
  for (const auto number : containerNumbers(cachesFolder())) list.push_back(summaryJson(number));
  if (invocation.options.json) {
    invocation.surroundings.out << json::serialize(list) << '\n';
    return kAnswered;
  }
  for (const auto& entry : list) printSummary(invocation, entry.get_object());
  return kAnswered;
}

void printContainer(const Invocation& invocation, const ContainerFile& file) {
  auto& out = invocation.surroundings.out;
  if (!invocation.options.json) {
    out << "version  " << printable(file.version) << '\n';
    out << "header   " << printable(json::serialize(headerJson(file.header))) << '\n';
    for (const auto& record : file.records) {
      out << printable(json::serialize(recordJson(record))) << '\n';
    }
    return;
  }
  json::array records;
  for (const auto& record : file.records) records.push_back(recordJson(record));
  out << json::serialize(json::object{{"version", file.version},
                                      {"header", headerJson(file.header)},
                                      {"records", std::move(records)}})
      << '\n';
}

}  // namespace

int runContainers(const Invocation& invocation) {
  if (invocation.options.arguments.empty()) return listContainers(invocation);
  const auto& text = invocation.options.arguments.front();
  std::uint32_t number = 0;
  const auto [stop, code] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (code != std::errc() || stop != text.data() + text.size()) {
    invocation.surroundings.err << "zelkorctl: containers takes the number of a session file\n";
    return kWrongUsage;
  }
  const auto read = readContainer(containerPath(number));
  if (const auto* fault = std::get_if<ContainerFault>(&read)) {
    return reportError(invocation,
                       zelkorError(1, "session." + std::to_string(number) + ": " + fault->text));
  }
  printContainer(invocation, std::get<ContainerFile>(read));
  return kAnswered;
}

}  // namespace zelkorctl
