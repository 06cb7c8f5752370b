#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>

#include "platform/api/BoundedCounters.h"
#include "platform/api/Log.h"
#include "platform/linux/sqlite/Database.h"

namespace zelkord {

// The counters on disk: table counters(key, value). A damaged file is renamed and a new one takes
// its place. A file with more or longer keys than counters have, which an earlier version may have
// left, is cut down when it is read.
//
// Threading: one thread at a time. Errors: logged by `load`, given back by `store`.
class CounterDatabase final {
 public:
  using Values = std::map<std::string, std::int64_t>;

  CounterDatabase(std::string path, Logger log) : path_(std::move(path)), log_(std::move(log)) {}

  BoundedCounters load();
  // Stores these values, all or none; others stay.
  std::optional<sqlite::Failure> store(const Values& values);

 private:
  std::optional<sqlite::Failure> _open();
  std::optional<sqlite::Failure> _readInto(BoundedCounters& counters);
  std::optional<sqlite::Failure> _cutDownTo(const BoundedCounters& counters);
  std::optional<sqlite::Failure> _write(const Values& values);
  template <typename AnyValues>
  std::optional<sqlite::Failure> _put(const AnyValues& values);
  bool _replaceDamaged(const sqlite::Failure& failure);

  const std::string path_;
  const Logger log_;
  std::optional<sqlite::Database> database_;
  std::int64_t rows_ = 0;  // that were read
};

}  // namespace zelkord
