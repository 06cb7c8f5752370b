#include "platform/linux/counters/CounterDatabase.h"

namespace zelkord {

std::optional<sqlite::Failure> CounterDatabase::_open() {
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

// Keys that are too long stay in the file: their text may be of any size.
std::optional<sqlite::Failure> CounterDatabase::_readInto(BoundedCounters& counters) {
  auto rows = database_->prepare(
      "SELECT iif(length(CAST(key AS BLOB)) <= ?1, key, ?2), value FROM counters");
  rows.bind(1, static_cast<std::int64_t>(BoundedCounters::kMaximumKeySize))
      .bind(2, BoundedCounters::kOthers);
  for (rows_ = 0; rows.step(); ++rows_) counters.add(rows.text(0), rows.integer(1));
  return rows.failure();
}

std::optional<sqlite::Failure> CounterDatabase::_cutDownTo(const BoundedCounters& counters) {
  if (rows_ == static_cast<std::int64_t>(counters.values().size())) return std::nullopt;
  log_.error("{} has {} counters; it is cut down to {}", path_, rows_, counters.values().size());
  auto failure = database_->transaction([&] {
    auto problem = database_->execute("DELETE FROM counters");
    return problem ? problem : _put(counters.values());
  });
  return failure ? failure : database_->execute("VACUUM");
}

BoundedCounters CounterDatabase::load() {
  BoundedCounters counters;
  auto failure = _open();
  if (!failure) failure = _readInto(counters);
  if (!failure) {
    if (const auto problem = _cutDownTo(counters)) {
      log_.error("cannot cut {} down: {}", path_, problem->text);
    }
    return counters;
  }
  if (!_replaceDamaged(*failure)) log_.error("cannot read {}: {}", path_, failure->text);
  return {};
}

bool CounterDatabase::_replaceDamaged(const sqlite::Failure& failure) {
  if (!failure.isDamage() && !(database_ && failure.isMisfit())) return false;
  database_.reset();
  const auto aside = sqlite::setAside(path_);
  log_.error("{} is damaged ({}); it is now {}, and a new one begins", path_, failure.text,
             orNull(aside));
  return aside.has_value();
}

template <typename AnyValues>
std::optional<sqlite::Failure> CounterDatabase::_put(const AnyValues& values) {
  auto put = database_->prepare("INSERT OR REPLACE INTO counters VALUES(?1, ?2)");
  for (const auto& [key, value] : values) {
    if (auto failure = put.bind(1, std::string_view(key)).bind(2, value).run()) return failure;
  }
  return std::nullopt;
}

std::optional<sqlite::Failure> CounterDatabase::_write(const Values& values) {
  if (auto failure = _open()) return failure;
  return database_->transaction([&] { return _put(values); });
}

std::optional<sqlite::Failure> CounterDatabase::store(const Values& values) {
  auto failure = _write(values);
  if (failure && _replaceDamaged(*failure)) failure = _write(values);
  if (failure) database_.reset();
  return failure;
}

}  // namespace zelkord
