#include "sandbox/search/SuggestionIndex.h"

#include <cstdio>
#include <cstdlib>

#include "sandbox/core/Text.h"

namespace sandbox {

namespace {

// What was typed in full is probably meant.
constexpr int kWholeTextBonus = 3000;

Match matchOf(const Statement& row) {
  return {std::string(row.text(0)), row.integer(1), static_cast<int>(row.integer(2)),
          static_cast<Kind>(row.integer(3))};
}

std::vector<Match> allMatches(Statement& statement) {
  std::vector<Match> matches;
  while (statement.step()) matches.push_back(matchOf(statement));
  return matches;
}

// The texts that begin with `prefix` are those from it up to, not including, this one: no text has
// the byte FF.
std::string endOfRange(std::string_view prefix) { return std::string(prefix) + "\xFF"; }

// Each word quoted, so that nothing typed is an operator; the last one is a prefix.
std::string fullTextQuery(std::string_view words) {
  std::string query;
  for (const auto word : split(words, ' ')) {
    if (word.empty()) continue;
    if (!query.empty()) query += ' ';
    query += '"';
    for (const char c : word) query += c == '"' ? std::string("\"\"") : std::string(1, c);
    query += '"';
  }
  return query.empty() ? query : query + "*";
}

}  // namespace

Outcome<std::unique_ptr<SuggestionIndex>> SuggestionIndex::open(const std::filesystem::path& path) {
  auto database = Database::open(path, Database::Mode::Read);
  if (!database) return database.failure();
  database->run("PRAGMA mmap_size = 268435456; PRAGMA cache_size = -16384");
  std::unique_ptr<SuggestionIndex> index(new SuggestionIndex(std::move(*database)));
  return index;
}

SuggestionIndex::SuggestionIndex(Database database) : database_(std::move(database)) {
  head_ = database_.prepare("SELECT text, entry, weight, kind FROM head WHERE prefix = ?");
  range_ = database_.prepare(
      "SELECT text, entry, weight, kind FROM term WHERE text >= ? AND text < ? LIMIT 256");
  named_ = database_.prepare("SELECT text, entry, weight, kind FROM term WHERE text = ?");
  mentioning_ = database_.prepare(
      "SELECT lower(title), id, weight, kind FROM entry WHERE id IN "
      "(SELECT rowid FROM search WHERE search MATCH ? LIMIT ?)");
  entry_ = database_.prepare(
      "SELECT id, kind, title, description, code, glyph, flag, weight, facts FROM entry WHERE id = "
      "?");
}

std::vector<Match> SuggestionIndex::startingWith(std::string_view prefix) {
  if (prefix.empty()) return {};
  head_.bind(1, prefix);
  auto matches = allMatches(head_);
  if (matches.empty()) {
    range_.bind(1, prefix).bind(2, endOfRange(prefix));
    matches = allMatches(range_);
  } else {
    for (auto& match : named(prefix)) matches.push_back(std::move(match));
  }
  for (Match& match : matches) {
    if (match.text == prefix) match.weight += kWholeTextBonus;
  }
  return matches;
}

std::vector<Match> SuggestionIndex::named(std::string_view text) {
  named_.bind(1, text);
  return allMatches(named_);
}

std::vector<Match> SuggestionIndex::mentioning(std::string_view words, std::size_t limit) {
  const std::string query = fullTextQuery(words);
  if (query.empty()) return {};
  mentioning_.bind(1, query).bind(2, static_cast<std::int64_t>(limit));
  return allMatches(mentioning_);
}

std::optional<Entry> SuggestionIndex::entry(std::int64_t id) {
  entry_.bind(1, id);
  if (!entry_.step()) return std::nullopt;
  Entry entry;
  entry.id = entry_.integer(0);
  entry.kind = static_cast<Kind>(entry_.integer(1));
  entry.title = entry_.text(2);
  entry.description = entry_.text(3);
  entry.code = entry_.text(4);
  entry.glyph = entry_.text(5);
  entry.flag = entry_.text(6);
  entry.weight = static_cast<int>(entry_.integer(7));
  entry.facts = entry_.text(8);
  entry_.reset();
  return entry;
}

std::optional<Failure> SuggestionIndexPool::open() {
  auto index = SuggestionIndex::open(path_);
  if (!index) return index.failure();
  _giveBack(std::move(*index));
  return std::nullopt;
}

SuggestionIndexPool::Loan SuggestionIndexPool::borrow() {
  {
    const std::lock_guard lock(mutex_);
    if (!idle_.empty()) {
      auto index = std::move(idle_.back());
      idle_.pop_back();
      return Loan(*this, std::move(index));
    }
  }
  auto index = SuggestionIndex::open(path_);
  if (!index) {
    std::fprintf(stderr, "zelkor-sandbox: the index has gone: %s\n", index.reason().c_str());
    std::abort();
  }
  return Loan(*this, std::move(*index));
}

void SuggestionIndexPool::_giveBack(std::unique_ptr<SuggestionIndex> index) {
  const std::lock_guard lock(mutex_);
  idle_.push_back(std::move(index));
}

}  // namespace sandbox
