#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>

#include "platform/api/Log.h"
#include "platform/linux/sqlite/Database.h"

namespace zelkord {

// The counters on disk: table counters(key, value). A damaged file is renamed and a new one takes
// its place.
//
// Threading: one thread at a time. Errors: logged by `load`, given back by `store`.
class CounterDatabase final {
 public:
  using Values = std::map<std::string, std::int64_t>;

  CounterDatabase(std::string path, Logger log) : path_(std::move(path)), log_(std::move(log)) {}

  Values load();
  // Stores these values, all or none; others stay.
  std::optional<sqlite::Failure> store(const Values& values);

 private:
  std::optional<sqlite::Failure> open();
  std::optional<sqlite::Failure> readInto(Values& values);
  std::optional<sqlite::Failure> write(const Values& values);
  bool replaceDamaged(const sqlite::Failure& failure);

  const std::string path_;
  const Logger log_;
  std::optional<sqlite::Database> database_;
};

}  // namespace zelkord
