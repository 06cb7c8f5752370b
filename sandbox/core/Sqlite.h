#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>

#include "sandbox/core/Outcome.h"

struct sqlite3;
struct sqlite3_stmt;

namespace sandbox {

// A prepared statement. A default-made or moved-from one does nothing and yields no row.
//
// Threading: one thread at a time, the one that uses the database. Ownership: the database outlives
// it.
class Statement final {
 public:
  Statement() = default;
  explicit Statement(sqlite3_stmt* statement) : statement_(statement) {}
  Statement(Statement&& other) noexcept;
  Statement& operator=(Statement&& other) noexcept;
  ~Statement();

  // Parameters count from 1. Texts are copied.
  Statement& bind(int parameter, std::string_view text);
  Statement& bind(int parameter, std::int64_t number);
  Statement& bind(int parameter, double number);
  Statement& bindBlob(int parameter, std::string_view bytes);
  Statement& bindNull(int parameter);

  // True when a row is there to read; otherwise the statement is reset and can be bound again.
  bool step();
  // Runs a statement that gives no rows.
  bool run();
  void reset();

  // Columns count from 0. A text is valid until the next step.
  std::string_view text(int column) const;
  std::int64_t integer(int column) const;
  double real(int column) const;
  bool isNull(int column) const;

 private:
  sqlite3_stmt* statement_ = nullptr;
};

// One connection to a SQLite file.
//
// Threading: one thread at a time. Errors: a failed statement is reported by its result; `error()`
// says why.
class Database final {
 public:
  enum class Mode { Read, Write };

  static Outcome<Database> open(const std::filesystem::path& path, Mode mode);

  Database() = default;
  Database(Database&& other) noexcept;
  Database& operator=(Database&& other) noexcept;
  ~Database();

  // Runs one or several statements that give no rows.
  bool run(const std::string& sql);
  Statement prepare(std::string_view sql);
  std::string error() const;
  std::int64_t lastInsertedId() const;

 private:
  explicit Database(sqlite3* handle) : handle_(handle) {}

  sqlite3* handle_ = nullptr;
};

}  // namespace sandbox
