#include "sandbox/search/ResultWriter.h"

#include <boost/json/parse.hpp>

#include "sandbox/http/Target.h"

namespace sandbox {

namespace {

namespace json = boost::json;

std::string longText(const Entry& entry) {
  return entry.glyph.empty() ? entry.title + " — " + entry.description
                             : entry.glyph + " " + entry.title;
}

}  // namespace

json::object ResultWriter::icon(const Entry& entry) const {
  if (!entry.flag.empty()) return {{"url", baseUrl_ + "/image/flags/" + entry.flag + ".png"}};
  return {{"id", nameOfKind(entry.kind)}};
}

json::object ResultWriter::result(const Entry& entry, double score) const {
  const std::string id = std::to_string(entry.id);
  return {{"id", std::string(nameOfKind(entry.kind)) + ":" + id},
          {"type", nameOfKind(entry.kind)},
          {"title", entry.title},
          {"description", entry.description},
          {"text", longText(entry)},
          {"score", score},
          {"icon", icon(entry)},
          {"card_url", baseUrl_ + "/card?id=" + id}};
}

json::array ResultWriter::_factRows(const Entry& entry) const {
  boost::system::error_code error;
  json::value facts = json::parse(entry.facts, error);
  if (error || !facts.is_array()) return {};
  for (auto& fact : facts.get_array()) {
    if (fact.is_object()) fact.get_object().emplace("value_image", json::object{{"id", "fact"}});
  }
  return std::move(facts.get_array());
}

json::object ResultWriter::card(const Entry& entry) const {
  json::object header = {
      {"type", "header"},
      {"title", entry.title},
      {"subtitle", entry.description},
      {"glyph_text", entry.glyph},
      {"thumbnail", icon(entry)},
      {"more_glyphs", json::array{json::object{{"id", nameOfKind(entry.kind)}}}}};
  json::object facts = {{"type", "facts"}, {"rows", _factRows(entry)}};
  return {{"type", "card"},
          {"id", std::string(nameOfKind(entry.kind)) + ":" + std::to_string(entry.id)},
          {"title", entry.title},
          {"sections", json::array{std::move(header), std::move(facts)}}};
}

std::string ResultWriter::moreUrl(std::string_view query, std::size_t offset) const {
  return baseUrl_ + "/more?q=" + percentEncoded(query) + "&offset=" + std::to_string(offset);
}

}  // namespace sandbox
