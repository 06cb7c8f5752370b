#include "sandbox/data/IsoReader.h"

#include <array>
#include <boost/json/array.hpp>
#include <boost/json/object.hpp>
#include <boost/json/parse.hpp>
#include <boost/json/serialize.hpp>
#include <map>
#include <string>
#include <utility>

#include "sandbox/core/Files.h"
#include "sandbox/core/Text.h"

namespace sandbox {

namespace {

namespace json = boost::json;

constexpr int kCountryWeight = 8000;
constexpr int kRegionWeight = 1500;
constexpr int kCurrencyWeight = 2500;
constexpr int kLanguageWeight = 3000;
constexpr int kRareLanguageWeight = 500;
constexpr int kCodePenalty = 5000;
// "Korea, Republic of"
constexpr int kInvertedNamePenalty = 2000;

// How people write them, by country code.
constexpr std::array<std::pair<std::string_view, std::string_view>, 14> kEverydayNames = {{
    {"AE", "emirates"},
    {"CD", "democratic republic of the congo"},
    {"CI", "ivory coast"},
    {"CZ", "czech republic"},
    {"GB", "uk"},
    {"GB", "great britain"},
    {"MM", "burma"},
    {"NL", "holland"},
    {"RU", "russia"},
    {"SZ", "swaziland"},
    {"TR", "turkey"},
    {"US", "america"},
    {"VA", "vatican"},
    {"VG", "british virgin islands"},
}};

std::string field(const json::object& record, std::string_view name) {
  const auto* value = record.if_contains(name);
  return value != nullptr && value->is_string() ? std::string(value->get_string()) : std::string();
}

void addFact(json::array& facts, std::string_view label, const std::string& value) {
  if (!value.empty()) facts.push_back(json::object{{"label", label}, {"value", value}});
}

void addAlias(SourceEntry& source, const std::string& text, int penalty) {
  if (!text.empty()) source.aliases.push_back({text, penalty});
}

// Country names and flags, which the other lists refer to.
class IsoTables final {
 public:
  IsoTables(std::filesystem::path folder, std::filesystem::path flags)
      : folder_(std::move(folder)), flags_(std::move(flags)) {}

  void read(const std::function<void(SourceEntry)>& yield) {
    _forEach("3166-1", [&](const auto& record) { yield(_country(record)); });
    _forEach("3166-2", [&](const auto& record) { yield(_region(record)); });
    _forEach("4217", [&](const auto& record) { yield(_currency(record)); });
    _forEach("639-2", [&](const auto& record) { yield(_language(record)); });
  }

 private:
  void _forEach(const std::string& list,
                const std::function<void(const json::object&)>& visit) const {
    const auto text = readFile(folder_ / ("iso_" + list + ".json"));
    boost::system::error_code error;
    const json::value document = text ? json::parse(*text, error) : json::value();
    if (error || !document.is_object()) return;
    const auto* records = document.get_object().if_contains(list);
    if (records == nullptr || !records->is_array()) return;
    for (const auto& record : records->get_array()) {
      if (record.is_object() && !field(record.get_object(), "name").empty())
        visit(record.get_object());
    }
  }

  std::string _flagFor(const std::string& country) const {
    const std::string name = lowerCased(country);
    std::error_code error;
    return !name.empty() && std::filesystem::exists(flags_ / (name + ".png"), error)
               ? name
               : std::string();
  }

  SourceEntry _country(const json::object& record) {
    const std::string name = field(record, "name");
    const std::string common = field(record, "common_name");
    const std::string code = field(record, "alpha_2");
    SourceEntry source;
    source.entry = {.kind = Kind::Country,
                    .title = common.empty() ? name : common,
                    .code = code,
                    .glyph = field(record, "flag"),
                    .flag = _flagFor(code),
                    .weight = kCountryWeight};
    source.entry.description = "Country · " + code + " · " + field(record, "alpha_3");
    addAlias(source, name, common.empty() ? 0 : kInvertedNamePenalty);
    addAlias(source, field(record, "official_name"), 1000);
    addAlias(source, code, kCodePenalty);
    addAlias(source, field(record, "alpha_3"), kCodePenalty);
    for (const auto& [country, everyday] : kEverydayNames) {
      if (country == code) addAlias(source, std::string(everyday), 0);
    }
    json::array facts;
    addFact(facts, "Official name", field(record, "official_name"));
    addFact(facts, "Two-letter code", code);
    addFact(facts, "Three-letter code", field(record, "alpha_3"));
    addFact(facts, "Numeric code", field(record, "numeric"));
    source.entry.facts = json::serialize(facts);
    countries_[code] = source.entry.title;
    return source;
  }

  SourceEntry _region(const json::object& record) const {
    const std::string code = field(record, "code");
    const std::string country = code.substr(0, code.find('-'));
    const auto found = countries_.find(country);
    const std::string within = found == countries_.end() ? country : found->second;
    SourceEntry source;
    source.entry = {.kind = Kind::Region,
                    .title = field(record, "name"),
                    .code = code,
                    .flag = _flagFor(country),
                    .weight = kRegionWeight};
    source.entry.description = field(record, "type") + " · " + within;
    json::array facts;
    addFact(facts, "Kind", field(record, "type"));
    addFact(facts, "Country", within);
    addFact(facts, "Code", code);
    source.entry.facts = json::serialize(facts);
    return source;
  }

  SourceEntry _currency(const json::object& record) const {
    const std::string code = field(record, "alpha_3");
    SourceEntry source;
    // The first two letters of most currency codes are the country.
    source.entry = {.kind = Kind::Currency,
                    .title = field(record, "name"),
                    .code = code,
                    .flag = _flagFor(code.substr(0, 2)),
                    .weight = kCurrencyWeight};
    source.entry.description = "Currency · " + code;
    addAlias(source, code, kCodePenalty);
    json::array facts;
    addFact(facts, "Code", code);
    addFact(facts, "Numeric code", field(record, "numeric"));
    source.entry.facts = json::serialize(facts);
    return source;
  }

  SourceEntry _language(const json::object& record) const {
    const std::string code = field(record, "alpha_3");
    const bool common = !field(record, "alpha_2").empty();
    SourceEntry source;
    source.entry = {.kind = Kind::Language,
                    .title = field(record, "name"),
                    .code = code,
                    .weight = common ? kLanguageWeight : kRareLanguageWeight};
    source.entry.description = "Language · " + code;
    json::array facts;
    addFact(facts, "Three-letter code", code);
    addFact(facts, "Two-letter code", field(record, "alpha_2"));
    source.entry.facts = json::serialize(facts);
    return source;
  }

  const std::filesystem::path folder_;
  const std::filesystem::path flags_;
  std::map<std::string, std::string> countries_;
};

}  // namespace

void readIsoCodes(const std::filesystem::path& folder, const std::filesystem::path& flags,
                  const std::function<void(SourceEntry)>& yield) {
  IsoTables(folder, flags).read(yield);
}

}  // namespace sandbox
