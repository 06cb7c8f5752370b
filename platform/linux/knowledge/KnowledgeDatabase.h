#pragma once

#include <optional>
#include <string>
#include <vector>

#include "platform/api/KnowledgeStore.h"
#include "platform/linux/sqlite/Database.h"

namespace zelkord {

// The file of the knowledge store, shared with other programs of the user: opened for each batch,
// its tables made when they are missing, and otherwise taken as it is.
//
// Threading: one thread at a time. Errors: given back; the file then has none of the batch.
class KnowledgeDatabase final {
 public:
  static constexpr Duration kInteractionAge = 28 * 24h;
  static constexpr std::int64_t kInteractionsOfDomain = 10'000;

  explicit KnowledgeDatabase(std::string path) : path_(std::move(path)) {}

  const std::string& path() const { return path_; }
  // Adds the interactions. Of their domains, what is beyond the newest 10,000 or was older than 28
  // days at `now` goes.
  std::optional<sqlite::Failure> add(const std::vector<DonatedInteraction>& interactions,
                                     WallTime now) const;

 private:
  const std::string path_;
};

}  // namespace zelkord
