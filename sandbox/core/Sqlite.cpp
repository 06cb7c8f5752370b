#include "sandbox/core/Sqlite.h"

#include <sqlite3.h>

#include <utility>

namespace sandbox {

namespace {

constexpr int kBusyMilliseconds = 5000;

// Passed as text: SQLite reads a null pointer as NULL.
const char* pointerOf(std::string_view bytes) {
  return bytes.data() == nullptr ? "" : bytes.data();
}

}  // namespace

Statement::Statement(Statement&& other) noexcept
    : statement_(std::exchange(other.statement_, nullptr)) {}

Statement& Statement::operator=(Statement&& other) noexcept {
  std::swap(statement_, other.statement_);
  return *this;
}

Statement::~Statement() { sqlite3_finalize(statement_); }

Statement& Statement::bind(int parameter, std::string_view text) {
  sqlite3_bind_text64(statement_, parameter, pointerOf(text), text.size(), SQLITE_TRANSIENT,
                      SQLITE_UTF8);
  return *this;
}

Statement& Statement::bind(int parameter, std::int64_t number) {
  sqlite3_bind_int64(statement_, parameter, number);
  return *this;
}

Statement& Statement::bind(int parameter, double number) {
  sqlite3_bind_double(statement_, parameter, number);
  return *this;
}

Statement& Statement::bindBlob(int parameter, std::string_view bytes) {
  sqlite3_bind_blob64(statement_, parameter, pointerOf(bytes), bytes.size(), SQLITE_TRANSIENT);
  return *this;
}

Statement& Statement::bindNull(int parameter) {
  sqlite3_bind_null(statement_, parameter);
  return *this;
}

bool Statement::step() {
  if (statement_ != nullptr && sqlite3_step(statement_) == SQLITE_ROW) return true;
  reset();
  return false;
}

bool Statement::run() {
  if (statement_ == nullptr) return false;
  const bool done = sqlite3_step(statement_) == SQLITE_DONE;
  reset();
  return done;
}

void Statement::reset() {
  if (statement_ != nullptr) sqlite3_reset(statement_);
}

std::string_view Statement::text(int column) const {
  const auto* bytes = static_cast<const char*>(sqlite3_column_blob(statement_, column));
  return {bytes == nullptr ? "" : bytes,
          static_cast<std::size_t>(sqlite3_column_bytes(statement_, column))};
}

std::int64_t Statement::integer(int column) const {
  return sqlite3_column_int64(statement_, column);
}

double Statement::real(int column) const { return sqlite3_column_double(statement_, column); }

bool Statement::isNull(int column) const {
  return sqlite3_column_type(statement_, column) == SQLITE_NULL;
}

Outcome<Database> Database::open(const std::filesystem::path& path, Mode mode) {
  sqlite3* handle = nullptr;
  const int flags =
      mode == Mode::Read ? SQLITE_OPEN_READONLY : SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE;
  const int status = sqlite3_open_v2(path.c_str(), &handle, flags | SQLITE_OPEN_NOMUTEX, nullptr);
  Database database(handle);
  if (status != SQLITE_OK) return Failure{path.string() + ": " + database.error()};
  sqlite3_busy_timeout(handle, kBusyMilliseconds);
  return database;
}

Database::Database(Database&& other) noexcept : handle_(std::exchange(other.handle_, nullptr)) {}

Database& Database::operator=(Database&& other) noexcept {
  std::swap(handle_, other.handle_);
  return *this;
}

// The second form waits for statements that are still alive.
Database::~Database() { sqlite3_close_v2(handle_); }

bool Database::run(const std::string& sql) {
  return sqlite3_exec(handle_, sql.c_str(), nullptr, nullptr, nullptr) == SQLITE_OK;
}

Statement Database::prepare(std::string_view sql) {
  sqlite3_stmt* statement = nullptr;
  sqlite3_prepare_v3(handle_, sql.data(), static_cast<int>(sql.size()), SQLITE_PREPARE_PERSISTENT,
                     &statement, nullptr);
  return Statement(statement);
}

std::string Database::error() const {
  return handle_ == nullptr ? "not open" : sqlite3_errmsg(handle_);
}

std::int64_t Database::lastInsertedId() const { return sqlite3_last_insert_rowid(handle_); }

}  // namespace sandbox
