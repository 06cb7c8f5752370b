#pragma once

#include <filesystem>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "sandbox/core/Outcome.h"
#include "sandbox/core/Sqlite.h"
#include "sandbox/search/Match.h"

namespace sandbox {

// The index file, opened for reading with its statements prepared.
//
// Threading: one thread at a time; see SuggestionIndexPool. Errors: a damaged file gives no
// matches.
class SuggestionIndex final {
 public:
  static Outcome<std::unique_ptr<SuggestionIndex>> open(const std::filesystem::path& path);

  // Entries with a text that begins with `prefix` (folded), among them all whose text is exactly
  // it. In no order; an entry may appear more than once.
  std::vector<Match> startingWith(std::string_view prefix);

  // Entries with exactly this text (folded).
  std::vector<Match> named(std::string_view text);

  // Entries whose title or description has all these words, the last one perhaps unfinished. At
  // most `limit` of them.
  std::vector<Match> mentioning(std::string_view words, std::size_t limit);

  std::optional<Entry> entry(std::int64_t id);

 private:
  explicit SuggestionIndex(Database database);

  Database database_;
  Statement head_;
  Statement range_;
  Statement named_;
  Statement mentioning_;
  Statement entry_;
};

// Hands out index connections, one to each caller at a time, and keeps them for the next.
//
// Threading: any thread. Ownership: outlives what it lends.
class SuggestionIndexPool final {
 public:
  explicit SuggestionIndexPool(std::filesystem::path path) : path_(std::move(path)) {}

  // A borrowed connection goes back when the loan ends.
  class Loan final {
   public:
    Loan(SuggestionIndexPool& pool, std::unique_ptr<SuggestionIndex> index)
        : pool_(pool), index_(std::move(index)) {}
    Loan(const Loan&) = delete;
    Loan& operator=(const Loan&) = delete;
    ~Loan() { pool_._giveBack(std::move(index_)); }
    SuggestionIndex* operator->() const { return index_.get(); }
    SuggestionIndex& operator*() const { return *index_; }

   private:
    SuggestionIndexPool& pool_;
    std::unique_ptr<SuggestionIndex> index_;
  };

  // Requires that the file could be opened once.
  Loan borrow();

  // Opens a first connection.
  std::optional<Failure> open();

 private:
  void _giveBack(std::unique_ptr<SuggestionIndex> index);

  const std::filesystem::path path_;
  std::mutex mutex_;
  std::vector<std::unique_ptr<SuggestionIndex>> idle_;
};

}  // namespace sandbox
