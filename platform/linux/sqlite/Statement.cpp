#include <sqlite3.h>

#include "platform/linux/sqlite/Database.h"

namespace zelkord::sqlite {

void Statement::Closer::operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }

Statement::Statement(sqlite3* database, std::string_view sql) : database_(database) {
  sqlite3_stmt* raw = nullptr;
  _check(sqlite3_prepare_v2(database, sql.data(), static_cast<int>(sql.size()), &raw, nullptr));
  statement_.reset(raw);
}

void Statement::_check(int code) {
  if (code == SQLITE_OK || failure_) return;
  failure_ = Failure{code, sqlite3_errmsg(database_)};
}

Statement& Statement::bind(int parameter, std::int64_t value) {
  if (!failure_) _check(sqlite3_bind_int64(statement_.get(), parameter, value));
  return *this;
}

Statement& Statement::bind(int parameter, double value) {
  if (!failure_) _check(sqlite3_bind_double(statement_.get(), parameter, value));
  return *this;
}

Statement& Statement::bind(int parameter, std::string_view text) {
  if (failure_) return *this;
  _check(sqlite3_bind_text64(statement_.get(), parameter, text.data() ? text.data() : "",
                             text.size(), SQLITE_TRANSIENT, SQLITE_UTF8));
  return *this;
}

Statement& Statement::bindBytes(int parameter, std::string_view bytes) {
  if (failure_) return *this;
  _check(sqlite3_bind_blob64(statement_.get(), parameter, bytes.data() ? bytes.data() : "",
                             bytes.size(), SQLITE_TRANSIENT));
  return *this;
}

Statement& Statement::bindNull(int parameter) {
  if (!failure_) _check(sqlite3_bind_null(statement_.get(), parameter));
  return *this;
}

bool Statement::step() {
  if (failure_) return false;
  const int code = sqlite3_step(statement_.get());
  if (code == SQLITE_ROW) return true;
  if (code != SQLITE_DONE) _check(code);
  return false;
}

std::optional<Failure> Statement::run() {
  while (step()) {
  }
  if (failure_) return failure_;
  reset();
  return std::nullopt;
}

void Statement::reset() {
  if (statement_) sqlite3_reset(statement_.get());
}

bool Statement::isNull(int column) const {
  return sqlite3_column_type(statement_.get(), column) == SQLITE_NULL;
}

std::int64_t Statement::integer(int column) const {
  return sqlite3_column_int64(statement_.get(), column);
}

double Statement::real(int column) const { return sqlite3_column_double(statement_.get(), column); }

std::string_view Statement::text(int column) const {
  const auto* text = sqlite3_column_text(statement_.get(), column);
  return {text ? reinterpret_cast<const char*>(text) : "",
          static_cast<std::size_t>(sqlite3_column_bytes(statement_.get(), column))};
}

std::string_view Statement::bytes(int column) const {
  const void* bytes = sqlite3_column_blob(statement_.get(), column);
  return {bytes ? static_cast<const char*>(bytes) : "",
          static_cast<std::size_t>(sqlite3_column_bytes(statement_.get(), column))};
}

}  // namespace zelkord::sqlite
