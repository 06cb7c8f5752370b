#include "platform/linux/sqlite/Database.h"

#include <fcntl.h>
#include <sqlite3.h>
#include <unistd.h>

#include <algorithm>
#include <thread>

#include "platform/linux/queues/BlockingScope.h"

namespace zelkord::sqlite {
namespace {

constexpr auto kLongestBusySleep = 25ms;

Failure failureOf(sqlite3* database, int code) {
  return {code, database ? sqlite3_errmsg(database) : sqlite3_errstr(code)};
}

// SQLite makes a missing file readable for everybody; its side files take over the mode of the
// file.
void makePrivateFile(const std::string& path) {
  const int file = ::open(path.c_str(), O_CREAT | O_EXCL | O_WRONLY | O_CLOEXEC, 0600);
  if (file >= 0) ::close(file);
}

// A file's tables are all that is wanted of it: its views and triggers could run for ever.
void trustOnlyTables(sqlite3* database) {
  sqlite3_db_config(database, SQLITE_DBCONFIG_ENABLE_VIEW, 0, nullptr);
  sqlite3_db_config(database, SQLITE_DBCONFIG_ENABLE_TRIGGER, 0, nullptr);
  sqlite3_db_config(database, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
}

const char* journalOf(const DatabaseOptions& options) {
  if (options.isShared) return "PRAGMA synchronous=FULL";
  return options.writeAheadLog ? "PRAGMA journal_mode=WAL; PRAGMA synchronous=NORMAL"
                               : "PRAGMA journal_mode=DELETE; PRAGMA synchronous=FULL";
}

}  // namespace

bool Failure::isDamage() const {
  const int primary = code & 0xFF;
  return primary == SQLITE_CORRUPT || primary == SQLITE_NOTADB;
}

bool Failure::isMisfit() const { return (code & 0xFF) == SQLITE_ERROR; }

bool Failure::isBusy() const {
  const int primary = code & 0xFF;
  return primary == SQLITE_BUSY || primary == SQLITE_LOCKED;
}

int BusyWait::sleep(void* self, int attempt) {
  auto& wait = *static_cast<BusyWait*>(self);
  const auto now = std::chrono::steady_clock::now();
  if (attempt == 0) wait.began_ = now;
  const Duration left = wait.limit_ - (now - wait.began_);
  if (left <= Duration::zero()) return 0;
  const BlockingScope blocking;
  std::this_thread::sleep_for(
      std::min<Duration>({left, kLongestBusySleep, std::chrono::milliseconds(attempt + 1)}));
  return 1;
}

void Database::Closer::operator()(sqlite3* database) const { sqlite3_close_v2(database); }

std::optional<Database> Database::open(const std::string& path, Failure* failure,
                                       const DatabaseOptions& options) {
  const BlockingScope blocking;
  makePrivateFile(path);
  sqlite3* raw = nullptr;
  constexpr int kFlags =
      SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_FULLMUTEX | SQLITE_OPEN_NOFOLLOW;
  const int code = sqlite3_open_v2(path.c_str(), &raw, kFlags, nullptr);
  Database database(raw, std::make_unique<BusyWait>(options.busyTimeout));
  if (code != SQLITE_OK) {
    if (failure) *failure = failureOf(raw, code);
    return std::nullopt;
  }
  sqlite3_extended_result_codes(raw, 1);
  // In a file that belongs to others too their triggers keep their tables in order.
  if (!options.isShared) trustOnlyTables(raw);
  sqlite3_busy_handler(raw, &BusyWait::sleep, database.busyWait_.get());
  auto problem = database.execute(journalOf(options));
  if (!problem) return database;
  if (failure) *failure = std::move(*problem);
  return std::nullopt;
}

std::optional<Failure> Database::execute(const char* sql) {
  const int code = sqlite3_exec(database_.get(), sql, nullptr, nullptr, nullptr);
  return code == SQLITE_OK ? std::nullopt : std::optional(failureOf(database_.get(), code));
}

std::optional<Failure> Database::transaction(FunctionRef<std::optional<Failure>()> work) {
  const BlockingScope blocking;
  if (auto failure = execute("BEGIN IMMEDIATE")) return failure;
  auto failure = work();
  if (!failure) failure = execute("COMMIT");
  if (failure) execute("ROLLBACK");
  return failure;
}

std::int64_t Database::changes() const { return sqlite3_changes64(database_.get()); }

std::int64_t Database::lastInsertId() const { return sqlite3_last_insert_rowid(database_.get()); }

std::optional<std::string> setAside(const std::string& path) {
  std::string aside;
  for (int number = 1; number < 1000; ++number) {
    aside = path + ".damaged-" + std::to_string(number);
    if (::access(aside.c_str(), F_OK) != 0) break;
  }
  if (::rename(path.c_str(), aside.c_str()) != 0) return std::nullopt;
  for (const char* side : {"-wal", "-journal"}) {
    ::rename((path + side).c_str(), (aside + side).c_str());
  }
  ::unlink((path + "-shm").c_str());
  return aside;
}

}  // namespace zelkord::sqlite
