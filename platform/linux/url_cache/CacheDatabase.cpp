#include "platform/linux/url_cache/CacheDatabase.h"

#include <sqlite3.h>
#include <unistd.h>

#include "platform/linux/url_cache/CacheVary.h"

namespace zelkord {
namespace {

// "zlkc", and the version of the tables and of what is in them.
constexpr std::int64_t kApplicationId = 0x7A6C6B63;
constexpr std::int64_t kVersion = 2;
constexpr int kForeignCode = -1;  // none of SQLite's
constexpr std::int64_t kMaximumCount = std::int64_t{1} << 62;
constexpr std::int64_t kMaximumEntryCost = std::int64_t{1} << 30;
constexpr std::size_t kMaximumRows = 2 * CacheIndex::kMaximumCount;

// Little memory, a short log, and nothing in a foreign file runs. Nobody else opens the file.
constexpr const char* kSettings =
    "PRAGMA locking_mode=EXCLUSIVE; PRAGMA cache_size=-256; PRAGMA trusted_schema=OFF;"
    "PRAGMA cell_size_check=ON; PRAGMA secure_delete=ON; PRAGMA wal_autocheckpoint=256; PRAGMA "
    "journal_size_limit=1048576";

// The size of the file follows what is in it. Only VACUUM changes that once there is a file.
constexpr const char* kNewFile = "PRAGMA auto_vacuum=INCREMENTAL; VACUUM";

// As it stands in the schema, too.
constexpr const char* kEntriesTable =
    "CREATE TABLE entries(id INTEGER PRIMARY KEY, url BLOB NOT NULL, vary TEXT NOT NULL,"
    " variant BLOB NOT NULL, cost INTEGER NOT NULL, used INTEGER NOT NULL, head BLOB NOT NULL,"
    " digest BLOB NOT NULL, size INTEGER NOT NULL, body BLOB, scope INTEGER NOT NULL)";
constexpr const char* kMark = "; PRAGMA application_id=2053925731; PRAGMA user_version=2; COMMIT";
static_assert(kApplicationId == 2053925731 && kVersion == 2);

sqlite::Failure foreignFile() { return {kForeignCode, "it is of another version or program"}; }

// None for a row that cannot be ours.
std::optional<CacheEntry> entryOfRow(const sqlite::Statement& rows) {
  const auto url = digestFromBytes(rows.bytes(1));
  const auto variant = digestFromBytes(rows.bytes(3));
  const auto vary = rows.text(2);
  const auto id = rows.integer(0), cost = rows.integer(4), used = rows.integer(5);
  const auto scope = rows.integer(6);
  // Far from the ends: ids and uses are counted on, costs are added up.
  const bool isSane = id > 0 && id <= kMaximumCount && cost >= 0 && cost <= kMaximumEntryCost &&
                      used >= 0 && used <= kMaximumCount && vary.size() <= kMaximumVaryNames;
  if (!isSane || !url || !variant) return std::nullopt;
  return CacheEntry{.id = id,
                    .url = *url,
                    .vary = std::string(vary),
                    .variant = *variant,
                    .cost = static_cast<std::uint64_t>(cost),
                    .used = static_cast<std::uint64_t>(used),
                    .scope = static_cast<std::uint64_t>(scope)};
}

std::optional<std::int64_t> firstNumber(sqlite::Database& database, const char* sql,
                                        std::optional<sqlite::Failure>& failure) {
  auto rows = database.prepare(sql);
  if (rows.step()) return rows.integer(0);
  if (rows.failure()) failure = rows.failure();
  return std::nullopt;
}

}  // namespace

bool CacheDatabase::exists() const { return ::access(path_.c_str(), F_OK) == 0; }

bool CacheDatabase::isForeign(const sqlite::Failure& failure) {
  return failure.code == kForeignCode;
}

std::optional<sqlite::Failure> CacheDatabase::open() {
  if (database_) return std::nullopt;
  sqlite::Failure failure;
  database_ = sqlite::Database::open(path_, &failure, {.writeAheadLog = true});
  if (!database_) return failure;
  auto problem = database_->execute(kSettings);
  if (!problem) problem = _prepareTables();
  if (problem) close();
  return problem;
}

std::optional<sqlite::Failure> CacheDatabase::_prepareTables() {
  std::optional<sqlite::Failure> failure;
  const auto version = firstNumber(*database_, "PRAGMA user_version", failure);
  const auto application = firstNumber(*database_, "PRAGMA application_id", failure);
  const auto count = firstNumber(*database_, "SELECT count(*) FROM sqlite_schema", failure);
  if (failure) return failure;
  if (version == 0 && application == 0 && count == 0) {
    failure = database_->execute(kNewFile);
    const auto tables = std::string("BEGIN IMMEDIATE; ") + kEntriesTable + kMark;
    return failure ? failure : database_->execute(tables.c_str());
  }
  if (version != kVersion || application != kApplicationId) return foreignFile();
  return _checkTables();
}

// Views, triggers and checks that somebody else has made would run with our statements.
std::optional<sqlite::Failure> CacheDatabase::_checkTables() {
  auto schema = database_->prepare("SELECT count(*), max(sql) FROM sqlite_schema");
  const bool isOurs = schema.step() && schema.integer(0) == 1 && schema.text(1) == kEntriesTable;
  if (schema.failure()) return schema.failure();
  return isOurs ? std::nullopt : std::optional(foreignFile());
}

void CacheDatabase::close() {
  read_.reset();
  database_.reset();
}

void CacheDatabase::remove() {
  close();
  for (const char* side : {"", "-wal", "-shm", "-journal"}) ::unlink((path_ + side).c_str());
}

std::optional<sqlite::Failure> CacheDatabase::load(std::vector<CacheEntry>& entries) {
  auto rows = database_->prepare("SELECT id, url, vary, variant, cost, used, scope FROM entries");
  CacheIndex::Ids senseless;
  while (rows.step()) {
    if (entries.size() + senseless.size() >= kMaximumRows) return foreignFile();
    if (auto entry = entryOfRow(rows)) {
      entries.push_back(*std::move(entry));
    } else {
      senseless.push_back(rows.integer(0));
    }
  }
  if (rows.failure() || senseless.empty()) return rows.failure();
  rows.reset();
  return write({.removed = &senseless});
}

bool CacheDatabase::read(std::int64_t id, FunctionRef<void(const Row&)> use,
                         std::optional<sqlite::Failure>& failure) {
  if (!read_) {
    read_ = database_->prepare("SELECT head, digest, size, body FROM entries WHERE id = ?1");
  }
  read_->bind(1, id);
  const bool found = read_->step();
  if (found) {
    Row row{.head = read_->bytes(0),
            .digest = read_->bytes(1),
            .bodySize = static_cast<std::uint64_t>(read_->integer(2))};
    if (!read_->isNull(3)) row.body = read_->bytes(3);
    use(row);
  }
  failure = read_->failure();
  read_->reset();
  if (failure) read_.reset();
  return found;
}

std::optional<sqlite::Failure> CacheDatabase::write(const Changes& changes) {
  auto failure = database_->transaction([&]() -> std::optional<sqlite::Failure> {
    if (changes.removed) {
      if (auto problem = _remove(*changes.removed)) return problem;
    }
    if (auto problem = _add(changes)) return problem;
    return changes.used ? _use(*changes.used) : std::nullopt;
  });
  if (failure || !changes.removed || changes.removed->empty()) return failure;
  return database_->execute("PRAGMA incremental_vacuum");
}

std::optional<sqlite::Failure> CacheDatabase::emptyLog() {
  return database_->execute("PRAGMA wal_checkpoint(TRUNCATE)");
}

std::optional<sqlite::Failure> CacheDatabase::_add(const Changes& changes) {
  if (changes.added.empty()) return std::nullopt;
  auto put = database_->prepare(
      "INSERT OR REPLACE INTO entries VALUES(?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?10, ?11)");
  for (const auto& [entry, row] : changes.added) {
    put.bind(1, entry->id)
        .bindBytes(2, bytesOf(entry->url))
        .bind(3, std::string_view(entry->vary))
        .bindBytes(4, bytesOf(entry->variant))
        .bind(5, static_cast<std::int64_t>(entry->cost))
        .bind(6, static_cast<std::int64_t>(entry->used))
        .bindBytes(7, row.head)
        .bindBytes(8, row.digest)
        .bind(9, static_cast<std::int64_t>(row.bodySize))
        .bind(11, static_cast<std::int64_t>(entry->scope));
    row.body ? put.bindBytes(10, *row.body) : put.bindNull(10);
    if (auto failure = put.run()) return failure;
  }
  return std::nullopt;
}

std::optional<sqlite::Failure> CacheDatabase::_remove(const CacheIndex::Ids& ids) {
  if (ids.empty()) return std::nullopt;
  auto drop = database_->prepare("DELETE FROM entries WHERE id = ?1");
  for (const auto id : ids) {
    if (auto failure = drop.bind(1, id).run()) return failure;
  }
  return std::nullopt;
}

std::optional<sqlite::Failure> CacheDatabase::_use(const CacheIndex::Uses& uses) {
  if (uses.empty()) return std::nullopt;
  auto note = database_->prepare("UPDATE entries SET used = ?2 WHERE id = ?1");
  for (const auto& [id, used] : uses) {
    note.bind(1, id).bind(2, static_cast<std::int64_t>(used));
    if (auto failure = note.run()) return failure;
  }
  return std::nullopt;
}

}  // namespace zelkord
