#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "base/FunctionRef.h"
#include "platform/linux/sqlite/Database.h"
#include "platform/linux/url_cache/CacheEntry.h"
#include "platform/linux/url_cache/CacheIndex.h"

namespace zelkord {

// The cache's index on disk: "index.db", one row an entry, with small bodies in it. No URL is in
// it, only digests.
//
// States: closed, open. A file of another version or another program is `isForeign`.
//
// Threading: one thread at a time. Errors: SQLite's, as values.
class CacheDatabase final {
 public:
  // A row as it is stored; the views are valid during the call that gives it.
  struct Row {
    std::string_view head;  // encodeStoredHead
    std::string_view digest;
    std::uint64_t bodySize = 0;
    std::optional<std::string_view> body;  // none: in a file
  };

  explicit CacheDatabase(std::string path) : path_(std::move(path)) {}

  bool exists() const;
  bool isOpen() const { return database_.has_value(); }
  // Makes the file when it is missing.
  std::optional<sqlite::Failure> open();
  void close();
  // Closes, and removes the file with what belongs to it.
  void remove();
  static bool isForeign(const sqlite::Failure& failure);

  // The rest requires an open database.
  // Rows that make no sense are left out and removed.
  std::optional<sqlite::Failure> load(std::vector<CacheEntry>& entries);
  // Whether the row is there; `use` sees it.
  bool read(std::int64_t id, FunctionRef<void(const Row&)> use,
            std::optional<sqlite::Failure>& failure);

  struct Changes {
    std::vector<std::pair<const CacheEntry*, Row>> added;
    const CacheIndex::Ids* removed = nullptr;
    const CacheIndex::Uses* used = nullptr;
  };
  // All or nothing. What is removed is overwritten.
  std::optional<sqlite::Failure> write(const Changes& changes);
  // Overwrites what else is left of removed rows, in the log.
  std::optional<sqlite::Failure> emptyLog();

 private:
  std::optional<sqlite::Failure> _prepareTables();
  std::optional<sqlite::Failure> _checkTables();
  std::optional<sqlite::Failure> _add(const Changes& changes);
  std::optional<sqlite::Failure> _remove(const CacheIndex::Ids& ids);
  std::optional<sqlite::Failure> _use(const CacheIndex::Uses& uses);

  const std::string path_;
  std::optional<sqlite::Database> database_;
  std::optional<sqlite::Statement> read_;
};

}  // namespace zelkord
