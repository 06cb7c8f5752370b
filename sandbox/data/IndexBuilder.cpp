#include "sandbox/data/IndexBuilder.h"

#include <algorithm>
#include <array>

#include "sandbox/core/Text.h"
#include "sandbox/data/IsoReader.h"
#include "sandbox/data/UnicodeReader.h"
#include "sandbox/data/WordNetReader.h"

namespace sandbox {

namespace {

// Raised whenever the tables or the weights change.
constexpr const char* kIndexFormat = "4";
constexpr int kInnerWordPenalty = 1500;
constexpr int kLengthPenalty = 40;
constexpr std::size_t kMostInnerWords = 6;
constexpr std::size_t kLongestTerm = 120;

constexpr const char* kIndexTables = R"(
  PRAGMA journal_mode = OFF; PRAGMA synchronous = OFF; PRAGMA cache_size = -65536;
  CREATE TABLE meta(name TEXT PRIMARY KEY, value TEXT);
  CREATE TABLE entry(id INTEGER PRIMARY KEY, kind INTEGER, title TEXT, description TEXT, code TEXT, glyph TEXT,
                     flag TEXT, weight INTEGER, facts TEXT);
  CREATE TABLE term(text TEXT, entry INTEGER, weight INTEGER, kind INTEGER, PRIMARY KEY(text, entry)) WITHOUT ROWID;
  CREATE TABLE head(prefix TEXT, number INTEGER, text TEXT, entry INTEGER, weight INTEGER, kind INTEGER,
                    PRIMARY KEY(prefix, number)) WITHOUT ROWID;
  CREATE VIRTUAL TABLE search USING fts5(title, description, content='', detail=none,
                                         tokenize="unicode61 remove_diacritics 2");
  BEGIN;
)";

bool isCurrent(const std::filesystem::path& path, const std::string& signature) {
  std::error_code error;
  if (!std::filesystem::exists(path, error)) return false;
  auto database = Database::open(path, Database::Mode::Read);
  if (!database) return false;
  auto select = database->prepare("SELECT value FROM meta WHERE name = 'signature'");
  return select.step() && select.text(0) == signature;
}

// Words that nobody types to find what follows before them.
bool isFiller(std::string_view word) {
  static constexpr std::array<std::string_view, 9> kFillers = {"a",  "an", "and", "for", "in",
                                                               "of", "on", "the", "with"};
  return std::find(kFillers.begin(), kFillers.end(), word) != kFillers.end();
}

}  // namespace

Outcome<bool> IndexBuilder::ensure(const DataSources& sources, const std::filesystem::path& path) {
  const std::string signature = std::string(kIndexFormat) + ";" + sources.signature();
  if (isCurrent(path, signature)) return false;
  const std::filesystem::path temporary = path.string() + ".new";
  std::error_code error;
  std::filesystem::remove(temporary, error);
  auto database = Database::open(temporary, Database::Mode::Write);
  if (!database) return database.failure();
  IndexBuilder builder(std::move(*database));
  const bool built = builder._begin() && builder._fill(sources) && builder._finish(signature);
  if (!built) return Failure{"building " + path.string() + ": " + builder.database_.error()};
  std::filesystem::rename(temporary, path, error);
  if (error) return Failure{path.string() + ": " + error.message()};
  return true;
}

bool IndexBuilder::_begin() {
  if (!database_.run(kIndexTables)) return false;
  insertEntry_ = database_.prepare("INSERT INTO entry VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?)");
  insertSearch_ =
      database_.prepare("INSERT INTO search(rowid, title, description) VALUES(?, ?, ?)");
  return true;
}

bool IndexBuilder::_fill(const DataSources& sources) {
  const auto yield = [this](SourceEntry source) { _add(std::move(source)); };
  readIsoCodes(sources.isoCodes(), sources.flags(), yield);
  readWordNet(sources.wordnet(), yield);
  readCharacters(sources.unicode(), yield);
  _writeTerms();
  return !failed_;
}

bool IndexBuilder::_finish(const std::string& signature) {
  auto meta = database_.prepare("INSERT INTO meta VALUES('signature', ?)");
  return meta.bind(1, signature).run() &&
         database_.run("COMMIT; ANALYZE; PRAGMA journal_mode = DELETE");
}

void IndexBuilder::_add(SourceEntry source) {
  Entry& entry = source.entry;
  entry.id = ++lastId_;
  insertEntry_.bind(1, entry.id)
      .bind(2, static_cast<std::int64_t>(entry.kind))
      .bind(3, entry.title);
  insertEntry_.bind(4, entry.description)
      .bind(5, entry.code)
      .bind(6, entry.glyph)
      .bind(7, entry.flag);
  insertEntry_.bind(8, static_cast<std::int64_t>(entry.weight)).bind(9, entry.facts);
  insertSearch_.bind(1, entry.id).bind(2, entry.title).bind(3, entry.description);
  if (!insertEntry_.run() || !insertSearch_.run()) failed_ = true;
  _addTerms(entry, {entry.title, 0}, source.findByInnerWords);
  for (const Alias& alias : source.aliases) _addTerms(entry, alias, source.findByInnerWords);
}

void IndexBuilder::_addTerms(const Entry& entry, const Alias& alias, bool innerWords) {
  const std::string folded = foldTerm(alias.text);
  if (folded.empty() || folded.size() > kLongestTerm) return;
  const int weight =
      entry.weight - alias.penalty - kLengthPenalty * static_cast<int>(folded.size());
  terms_.push_back({folded, entry.id, weight, entry.kind});
  std::size_t at = folded.find(' ');
  for (std::size_t words = 0; innerWords && at != std::string::npos && words < kMostInnerWords;
       ++words) {
    const std::string rest = folded.substr(at + 1);
    if (!isFiller(std::string_view(rest).substr(0, rest.find(' ')))) {
      terms_.push_back({rest, entry.id, weight - kInnerWordPenalty, entry.kind});
    }
    at = folded.find(' ', at + 1);
  }
}

void IndexBuilder::_writeTerms() {
  auto insertHead = database_.prepare("INSERT INTO head VALUES(?, ?, ?, ?, ?, ?)");
  std::int64_t number = 0;
  listPrefixHeads(terms_, [&](std::string_view prefix, const Term& term) {
    insertHead.bind(1, prefix).bind(2, ++number).bind(3, term.text).bind(4, term.entry);
    if (!insertHead.bind(5, static_cast<std::int64_t>(term.weight))
             .bind(6, static_cast<std::int64_t>(term.kind))
             .run()) {
      failed_ = true;
    }
  });
  // A text that an entry has twice keeps its better weight.
  auto insertTerm = database_.prepare(
      "INSERT INTO term VALUES(?, ?, ?, ?) ON CONFLICT DO UPDATE SET weight = max(weight, "
      "excluded.weight)");
  for (const Term& term : terms_) {
    insertTerm.bind(1, term.text)
        .bind(2, term.entry)
        .bind(3, static_cast<std::int64_t>(term.weight));
    if (!insertTerm.bind(4, static_cast<std::int64_t>(term.kind)).run()) failed_ = true;
  }
}

}  // namespace sandbox
