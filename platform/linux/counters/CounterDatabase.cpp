#include "platform/linux/counters/CounterDatabase.h"

namespace zelkord {

std::optional<sqlite::Failure> CounterDatabase::open() {
  if (database_) return std::nullopt;
  sqlite::Failure failure;
  auto database = sqlite::Database::open(path_, &failure);
  if (!database) return failure;
  auto problem = database->execute(
      "CREATE TABLE IF NOT EXISTS counters(key TEXT PRIMARY KEY, value INTEGER NOT NULL) WITHOUT "
      "ROWID");
  if (problem) return problem;
  database_ = std::move(database);
  return std::nullopt;
}

std::optional<sqlite::Failure> CounterDatabase::readInto(Values& values) {
  auto rows = database_->prepare("SELECT key, value FROM counters");
  while (rows.step()) values[std::string(rows.text(0))] = rows.integer(1);
  return rows.failure();
}

CounterDatabase::Values CounterDatabase::load() {
  Values values;
  auto failure = open();
  if (!failure) failure = readInto(values);
  if (!failure) return values;
  if (!replaceDamaged(*failure)) log_.error("cannot read {}: {}", path_, failure->text);
  return {};
}

bool CounterDatabase::replaceDamaged(const sqlite::Failure& failure) {
  if (!failure.isDamage() && !(database_ && failure.isMisfit())) return false;
  database_.reset();
  const auto aside = sqlite::setAside(path_);
  log_.error("{} is damaged ({}); it is now {}, and a new one begins", path_, failure.text,
             orNull(aside));
  return aside.has_value();
}

std::optional<sqlite::Failure> CounterDatabase::write(const Values& values) {
  if (auto failure = open()) return failure;
  return database_->transaction([&]() -> std::optional<sqlite::Failure> {
    auto put = database_->prepare("INSERT OR REPLACE INTO counters VALUES(?1, ?2)");
    for (const auto& [key, value] : values) {
      if (auto failure = put.bind(1, std::string_view(key)).bind(2, value).run()) return failure;
    }
    return std::nullopt;
  });
}

std::optional<sqlite::Failure> CounterDatabase::store(const Values& values) {
  auto failure = write(values);
  if (failure && replaceDamaged(*failure)) failure = write(values);
  if (failure) database_.reset();
  return failure;
}

}  // namespace zelkord
