#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "base/FunctionRef.h"
#include "base/Time.h"

struct sqlite3;
struct sqlite3_stmt;

namespace zelkord::sqlite {

// Why an operation failed: SQLite's extended result code and text.
struct Failure {
  int code = 0;
  std::string text;

  bool isDamage() const;  // the file is not a database, or a broken one
  bool isMisfit() const;  // the statement does not fit the tables
  bool isBusy() const;    // somebody else held the lock for the whole busy time-out
};

// A prepared statement. Parameters count from 1, columns from 0.
//
// Threading: one thread at a time. Ownership: must not outlive its database.
// Errors: a statement that could not be prepared, bound or stepped ends; `failure` says why.
class Statement final {
 public:
  Statement(Statement&&) noexcept = default;
  Statement& operator=(Statement&&) noexcept = default;
  ~Statement() = default;

  Statement& bind(int parameter, std::int64_t value);
  Statement& bind(int parameter, double value);
  Statement& bind(int parameter, std::string_view text);
  Statement& bindBytes(int parameter, std::string_view bytes);
  Statement& bindNull(int parameter);

  // True when there is a row; false at the end and after a failure.
  bool step();
  // Runs to the end, ready to be bound and run again.
  std::optional<Failure> run();
  void reset();
  const std::optional<Failure>& failure() const { return failure_; }

  bool isNull(int column) const;
  std::int64_t integer(int column) const;
  double real(int column) const;
  // Valid until the next step.
  std::string_view text(int column) const;
  std::string_view bytes(int column) const;

 private:
  friend class Database;
  struct Closer {
    void operator()(sqlite3_stmt* statement) const;
  };

  Statement(sqlite3* database, std::string_view sql);
  void _check(int code);

  sqlite3* database_;
  std::unique_ptr<sqlite3_stmt, Closer> statement_;
  std::optional<Failure> failure_;
};

struct DatabaseOptions {
  Duration busyTimeout = 1s;   // real time
  bool writeAheadLog = false;  // else a rollback journal: one file, but a write syncs twice
  bool isShared = false;       // with other programs: the journal stays as they want it
};

// How a database waits for a lock that somebody else holds: in short sleeps, as a worker that is
// blocked. Threading: the database's thread.
class BusyWait final {
 public:
  explicit BusyWait(Duration limit) : limit_(limit) {}
  // SQLite's busy handler. `attempt` counts from 0; zero when the time is over.
  static int sleep(void* self, int attempt);

 private:
  const Duration limit_;  // real time
  std::chrono::steady_clock::time_point began_;
};

// A SQLite database in a file of mode 0600, made when missing. Opening it and its transactions
// count as blocking, and so does every wait for somebody else's lock.
//
// Threading: one thread at a time.
// Errors: as values; nothing throws.
class Database final {
 public:
  // None on failure, `failure` then set.
  static std::optional<Database> open(const std::string& path, Failure* failure,
                                      const DatabaseOptions& options = {});

  // One or more statements without parameters.
  std::optional<Failure> execute(const char* sql);
  Statement prepare(std::string_view sql) const { return Statement(database_.get(), sql); }
  // All or nothing: rolled back when `work` gives a failure or the commit fails.
  std::optional<Failure> transaction(FunctionRef<std::optional<Failure>()> work);
  // Rows that the last statement changed.
  std::int64_t changes() const;
  std::int64_t lastInsertId() const;

 private:
  struct Closer {
    void operator()(sqlite3* database) const;
  };

  Database(sqlite3* database, std::unique_ptr<BusyWait> busyWait)
      : busyWait_(std::move(busyWait)), database_(database) {}

  std::unique_ptr<BusyWait> busyWait_;  // SQLite refers to it
  std::unique_ptr<sqlite3, Closer> database_;
};

// Renames a damaged database and its side files so that a new one can take the name; gives the name
// that the file has now, or none when it could not be renamed.
std::optional<std::string> setAside(const std::string& path);

}  // namespace zelkord::sqlite
