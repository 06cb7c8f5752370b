#include "platform/linux/settings/SettingsDatabase.h"

#include "base/SettingsLayout.h"

namespace zelkord {
SettingsDatabase::SettingsDatabase(std::string path, Logger log, Duration busyTimeout)
    : path_(std::move(path)), log_(std::move(log)), busyTimeout_(busyTimeout) {}

void SettingsDatabase::_complain(const char* what, const sqlite::Failure& failure) {
  auto text = fmt::format("{} {}: {}", what, path_, failure.text);
  if (text == lastComplaint_) return;
  log_.error("{}", text);
  lastComplaint_ = std::move(text);
}

std::optional<sqlite::Failure> SettingsDatabase::_open() {
  if (database_) return std::nullopt;
  sqlite::Failure failure;
  auto database = sqlite::Database::open(path_, &failure, {.busyTimeout = busyTimeout_});
  if (!database) return failure;
  if (auto problem = database->execute(kSettingsSchema)) return problem;
  database_ = std::move(database);
  return std::nullopt;
}

std::optional<sqlite::Failure> SettingsDatabase::_readInto(SettingsByDomain& settings) {
  auto rows = database_->prepare("SELECT domain, key, value FROM defaults");
  while (rows.step()) {
    auto value = parseJson(rows.text(2));
    if (!value) {
      log_.error("setting {} of {} does not parse and is ignored", rows.text(1), rows.text(0));
      continue;
    }
    settings[std::string(rows.text(0))].insert_or_assign(rows.text(1), std::move(*value));
  }
  return rows.failure();
}

SettingsByDomain SettingsDatabase::load() {
  SettingsByDomain settings;
  auto failure = _open();
  if (!failure) failure = _readInto(settings);
  if (!failure) return settings;
  // A table of another shape is as useless as a broken page.
  if (failure->isDamage() || (database_ && failure->isMisfit())) {
    _replaceDamaged(*failure);
  } else {
    _complain("cannot read", *failure);
  }
  return {};
}

void SettingsDatabase::_replaceDamaged(const sqlite::Failure& failure) {
  database_.reset();
  if (const auto aside = sqlite::setAside(path_)) {
    log_.error("{} is damaged ({}); it is now {}, and a new one begins", path_, failure.text,
               *aside);
  } else {
    _complain("cannot set aside the damaged", failure);
  }
  if (const auto problem = _open()) _complain("cannot make", *problem);
}

std::optional<sqlite::Failure> SettingsDatabase::_write(const std::vector<Change>& changes) {
  if (auto failure = _open()) return failure;
  return database_->transaction([&]() -> std::optional<sqlite::Failure> {
    auto put = database_->prepare("INSERT OR REPLACE INTO defaults VALUES(?1, ?2, ?3)");
    auto drop = database_->prepare("DELETE FROM defaults WHERE domain = ?1 AND key = ?2");
    for (const auto& change : changes) {
      auto& statement = change.json ? put : drop;
      statement.bind(1, std::string_view(change.domain)).bind(2, std::string_view(change.key));
      if (change.json) statement.bind(3, std::string_view(*change.json));
      if (auto failure = statement.run()) return failure;
    }
    return std::nullopt;
  });
}

bool SettingsDatabase::store(const std::vector<Change>& changes,
                             FunctionRef<std::vector<Change>()> everything) {
  auto failure = _write(changes);
  if (failure && failure->isDamage()) {
    _replaceDamaged(*failure);
    failure = _write(everything());
  }
  if (!failure) {
    lastComplaint_.clear();
    return true;
  }
  // Opened again next time: the file may have been replaced meanwhile.
  database_.reset();
  _complain(failure->isBusy() ? "somebody else holds" : "cannot write", *failure);
  return false;
}

}  // namespace zelkord
