#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include "sandbox/core/Outcome.h"
#include "sandbox/core/Sqlite.h"
#include "sandbox/data/DataSources.h"
#include "sandbox/data/PrefixHeads.h"

namespace sandbox {

// Makes the index file from the data sources.
//
// Tables: entry (what is suggested), term (every text an entry is found by: its title, its aliases,
// and what follows each word start within them), head (the best terms of prefixes that many share),
// search (full text of titles and descriptions), meta (format and data signature).
//
// Ownership: one build, then discard. Errors: nothing is left behind at `path` by a failed build.
class IndexBuilder final {
 public:
  // Builds `path` unless it is there, complete, of this format and from the same data. True when it
  // was built.
  static Outcome<bool> ensure(const DataSources& sources, const std::filesystem::path& path);

 private:
  explicit IndexBuilder(Database database) : database_(std::move(database)) {}

  bool _begin();
  bool _fill(const DataSources& sources);
  bool _finish(const std::string& signature);
  void _add(SourceEntry source);
  void _addTerms(const Entry& entry, const Alias& alias, bool innerWords);
  void _writeTerms();

  Database database_;
  Statement insertEntry_;
  Statement insertSearch_;
  std::vector<Term> terms_;
  std::int64_t lastId_ = 0;
  bool failed_ = false;
};

}  // namespace sandbox
