#include "zelkorctl/AnswerText.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <utility>

#include "corezelkor/client/Results.h"
#include "zelkorctl/BagFetch.h"
#include "zelkorctl/Printable.h"
#include "zelkorctl/ResponseSets.h"

namespace zelkorctl {
namespace {

constexpr std::size_t kLongestTitle = 40;
constexpr std::size_t kLongestType = 16;

struct Row {
  std::string title;
  std::string type;
  std::string description;
};

std::string memberText(const json::object& object, std::string_view key) {
  return printable(stringIn(object, key).value_or(""));
}

void appendRows(const json::object& set, std::size_t limit, std::vector<Row>& rows) {
  for (const auto* result : objectsIn(set, "results")) {
    if (rows.size() >= limit) return;
    rows.push_back({memberText(*result, "title"), memberText(*result, "type"),
                    memberText(*result, "description")});
  }
}

// The width of the longest text in a column, up to `most`.
std::size_t columnWidth(const std::vector<Row>& rows, std::string Row::*column, std::size_t most) {
  std::size_t width = 0;
  for (const auto& row : rows) width = std::max(width, displayWidth(row.*column));
  return std::min(width, most);
}

std::string trimmed(std::string line) {
  line.erase(line.find_last_not_of(' ') + 1);
  return line;
}

std::vector<std::string> rowLines(const std::vector<Row>& rows, std::size_t width) {
  const auto titles = columnWidth(rows, &Row::title, std::min(kLongestTitle, width / 2));
  const auto types = columnWidth(rows, &Row::type, kLongestType);
  std::vector<std::string> lines;
  for (const auto& row : rows) {
    const auto line =
        "  " + padded(row.title, titles) + "  " + padded(row.type, types) + "  " + row.description;
    lines.push_back(fitted(trimmed(line), width));
  }
  return lines;
}

std::string notAList(std::string_view data, std::string_view ofWhat) {
  return fmt::format("  ({} bytes that are no list of {})", data.size(), ofWhat);
}

void appendFacts(const json::object& section, std::vector<std::string>& lines) {
  const auto rows = objectsIn(section, "rows");
  std::size_t widest = 0;
  for (const auto* row : rows) widest = std::max(widest, displayWidth(memberText(*row, "label")));
  const auto labels = std::min(widest, kLongestTitle);
  for (const auto* row : rows) {
    lines.push_back("    " + padded(memberText(*row, "label"), labels) + "  " +
                    memberText(*row, "value"));
  }
}

void appendCard(const json::object& card, std::vector<std::string>& lines) {
  lines.push_back("  " + memberText(card, "title"));
  for (const auto* section : objectsIn(card, "sections")) {
    const auto subtitle = memberText(*section, "subtitle");
    if (!subtitle.empty()) lines.push_back("  " + subtitle);
    appendFacts(*section, lines);
  }
}

json::value headersJson(const HeaderFields& headers) {
  json::object object;
  for (const auto& [name, value] : headers) object[name] = value;
  return object;
}

void addExchange(const ZLKReply& reply, json::object& object) {
  if (const auto& request = reply.httpRequest) {
    object["httpRequest"] = {{"url", request->url}, {"headers", headersJson(request->headers)}};
  }
  if (const auto& response = reply.httpResponse) {
    object["httpResponse"] = {{"url", response->url},
                              {"status", response->status},
                              {"headers", headersJson(response->headers)}};
  }
}

json::object replyJson(const ZLKReply& reply, Exchange exchange) {
  json::object object{{"scale", reply.scale}};
  if (auto data = parseJson(reply.data.view())) {
    object["data"] = std::move(*data);
  } else {
    object["text"] = printable(reply.data.view());  // not JSON
  }
  if (reply.geoSessionEntityString)
    object["geoSessionEntityString"] = *reply.geoSessionEntityString;
  if (exchange == Exchange::Told) addExchange(reply, object);
  return object;
}

void appendHeaders(const HeaderFields& headers, std::vector<std::string>& lines) {
  for (const auto& [name, value] : headers) {
    lines.push_back("  " + printable(name) + ": " + printable(value));
  }
}

}  // namespace

std::vector<std::string> resultLines(const ClientAnswer& answer, const Shown& shown) {
  const auto sets = resultsFor(shown.typed, answer);
  if (!sets) return {notAList(answer.reply ? answer.reply->data.view() : "", "result sets")};
  std::vector<Row> rows;
  for (const auto* set : objectsOf(*sets)) appendRows(*set, shown.limit, rows);
  return rowLines(rows, shown.width);
}

std::vector<std::string> cardLines(std::string_view data, std::size_t width) {
  const auto parsed = parseJson(data);
  const auto* cards = parsed ? parsed->if_array() : nullptr;
  if (!cards) return {notAList(data, "cards")};
  std::vector<std::string> lines;
  for (const auto* card : objectsOf(*cards)) appendCard(*card, lines);
  for (auto& line : lines) line = fitted(trimmed(line), width);
  return lines;
}

std::vector<std::string> outcomeLines(const Outcome& outcome, std::size_t width) {
  constexpr std::size_t kTextColumn = 24;
  auto line = padded("\"" + printable(outcome.text) + "\"", std::min(kTextColumn, width / 3)) +
              "  " + padded(nameOf(outcome.kind), 8) + " " + padded(sourceOf(outcome), 7) +
              fmt::format(" {:9.1f} ms", outcome.milliseconds);
  if (outcome.answer.reply) line += fmt::format(" {:8} bytes", outcome.answer.reply->data.size());
  if (outcome.answer.error) line += "  " + errorText(*outcome.answer.error);
  std::vector<std::string> lines = {fitted(line, width)};
  if (outcome.bag) lines.push_back(fitted("  no bag: " + bagFetchText(*outcome.bag), width));
  return lines;
}

std::vector<std::string> exchangeLines(const ZLKReply& reply) {
  std::vector<std::string> lines;
  if (const auto& request = reply.httpRequest) {
    lines.push_back("request " + printable(request->url));
    appendHeaders(request->headers, lines);
  }
  if (const auto& response = reply.httpResponse) {
    lines.push_back(fmt::format("response {} {}", response->status, printable(response->url)));
    appendHeaders(response->headers, lines);
  }
  return lines;
}

json::object outcomeJson(const Outcome& outcome, Exchange exchange) {
  const auto& answer = outcome.answer;
  json::object object{{"queryId", answer.queryId},
                      {"query", outcome.text},
                      {"outcome", nameOf(outcome.kind)},
                      {"milliseconds", outcome.milliseconds}};
  if (answer.reply) {
    object["source"] = sourceOf(outcome);
    object["reply"] = replyJson(*answer.reply, exchange);
  }
  if (outcome.asked == QueryKind::Search) {
    if (auto sets = resultsFor(outcome.text, answer)) object["sets"] = *std::move(sets);
  }
  if (answer.error) object["error"] = errorJson(*answer.error);
  if (outcome.bag) object["bag"] = *outcome.bag;
  return object;
}

json::value errorJson(const Error& error) {
  json::object object{{"domain", error.domain}, {"code", error.code}};
  if (const auto reason = error.reason()) object["reason"] = *reason;
  return object;
}

std::string errorText(const Error& error) {
  const auto origin = fmt::format("{} {}", printable(error.domain), error.code);
  const auto reason = error.reason();
  return reason ? printable(*reason) + " (" + origin + ")" : origin;
}

}  // namespace zelkorctl
