#include "zelkorctl/SettingsFile.h"

#include <sqlite3.h>
#include <sys/stat.h>

#include <cstdlib>
#include <filesystem>

#include "base/SettingsLayout.h"
#include "corezelkor/Constants.h"

namespace zelkorctl {
namespace {

constexpr int kBusyMilliseconds = 2000;

struct StatementCloser {
  void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
};

std::string columnText(sqlite3_stmt* statement, int column) {
  const auto* text = reinterpret_cast<const char*>(sqlite3_column_text(statement, column));
  return text ? std::string(text, static_cast<std::size_t>(sqlite3_column_bytes(statement, column)))
              : std::string();
}

// The folder is the user's own, like the file.
void makePrivateFolder(const std::filesystem::path& path) {
  std::error_code ignored;  // opening says what is wrong
  std::filesystem::create_directories(path.parent_path(), ignored);
  ::mkdir(path.c_str(), 0700);
}

}  // namespace

void SettingsFile::Closer::operator()(sqlite3* database) const { sqlite3_close(database); }

SettingsFile::SettingsFile(const std::string& path) {
  makePrivateFolder(std::filesystem::path(path).parent_path());
  const auto before = ::umask(0077);
  sqlite3* raw = nullptr;
  const int result =
      sqlite3_open_v2(path.c_str(), &raw, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE, nullptr);
  ::umask(before);
  database_.reset(raw);
  if (result != SQLITE_OK) {
    error_ = zelkor::zelkorError(result, path + ": " + sqlite3_errstr(result));
    return;
  }
  sqlite3_busy_timeout(raw, kBusyMilliseconds);
  _run(zelkor::kSettingsSchema, {});
}

std::vector<SettingsFile::Row> SettingsFile::_run(const char* sql,
                                                  const std::vector<std::string>& values) {
  if (error_) return {};
  sqlite3_stmt* raw = nullptr;
  int result = sqlite3_prepare_v2(database_.get(), sql, -1, &raw, nullptr);
  const std::unique_ptr<sqlite3_stmt, StatementCloser> statement(raw);
  for (std::size_t i = 0; result == SQLITE_OK && i < values.size(); ++i) {
    result = sqlite3_bind_text(raw, static_cast<int>(i + 1), values[i].data(),
                               static_cast<int>(values[i].size()), SQLITE_TRANSIENT);
  }
  std::vector<Row> rows;
  while (result == SQLITE_OK || result == SQLITE_ROW) {
    result = sqlite3_step(raw);
    if (result != SQLITE_ROW) break;
    Row row;
    for (int i = 0; i < sqlite3_column_count(raw); ++i) row.push_back(columnText(raw, i));
    rows.push_back(std::move(row));
  }
  if (result == SQLITE_DONE) return rows;
  error_ = zelkor::zelkorError(result, sqlite3_errmsg(database_.get()));
  return {};
}

std::optional<std::string> SettingsFile::read(const std::string& domain, const std::string& key) {
  const auto rows =
      _run("SELECT value FROM defaults WHERE domain = ?1 AND key = ?2", {domain, key});
  return rows.empty() ? std::nullopt : std::optional(rows.front().front());
}

void SettingsFile::write(const std::string& domain, const std::string& key,
                         const std::string& json) {
  _run("INSERT OR REPLACE INTO defaults VALUES(?1, ?2, ?3)", {domain, key, json});
}

void SettingsFile::remove(const std::string& domain, const std::string& key) {
  _run("DELETE FROM defaults WHERE domain = ?1 AND key = ?2", {domain, key});
}

std::vector<std::pair<std::string, std::string>> SettingsFile::list(const std::string& domain) {
  std::vector<std::pair<std::string, std::string>> settings;
  for (const auto& row :
       _run("SELECT key, value FROM defaults WHERE domain = ?1 ORDER BY key", {domain})) {
    settings.emplace_back(row[0], row[1]);
  }
  return settings;
}

std::string settingsFilePath() {
  const char* state = std::getenv("XDG_STATE_HOME");
  const char* home = std::getenv("HOME");
  const auto base = state && state[0] == '/'
                        ? std::string(state)
                        : std::string(home && home[0] == '/' ? home : "") + "/.local/state";
  return base + "/" + std::string(zelkor::kServiceName) + "/" + zelkor::kSettingsFileName;
}

}  // namespace zelkorctl
