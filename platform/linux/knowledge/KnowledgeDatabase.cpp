#include "platform/linux/knowledge/KnowledgeDatabase.h"

#include <set>

namespace zelkord {
namespace {

constexpr const char* kKnowledgeTables =
    "CREATE TABLE IF NOT EXISTS app_activity(\"start\" REAL, \"end\" REAL, bundle_id TEXT, "
    "unique_identifier TEXT, content_url TEXT, publicly_indexable INTEGER);"
    "CREATE TABLE IF NOT EXISTS interaction(time REAL, domain TEXT, verb TEXT, parameters TEXT)";

std::optional<sqlite::Failure> insertInteraction(sqlite::Statement& insert,
                                                 const DonatedInteraction& interaction) {
  return insert.bind(1, secondsSince1970(interaction.time))
      .bind(2, std::string_view(interaction.domain))
      .bind(3, std::string_view(interaction.verb))
      .bind(4, std::string_view(interaction.parameters))
      .run();
}

std::optional<sqlite::Failure> trimDomain(const sqlite::Database& database,
                                          const std::string& domain, double oldest) {
  auto aged = database.prepare("DELETE FROM interaction WHERE domain = ?1 AND time < ?2");
  if (auto failure = aged.bind(1, std::string_view(domain)).bind(2, oldest).run()) return failure;
  auto surplus = database.prepare(
      "DELETE FROM interaction WHERE domain = ?1 AND rowid <= (SELECT rowid FROM interaction "
      "WHERE domain = ?1 ORDER BY rowid DESC LIMIT 1 OFFSET ?2)");
  return surplus.bind(1, std::string_view(domain))
      .bind(2, KnowledgeDatabase::kInteractionsOfDomain)
      .run();
}

}  // namespace

std::optional<sqlite::Failure> KnowledgeDatabase::add(
    const std::vector<DonatedInteraction>& interactions, WallTime now) const {
  sqlite::Failure failure;
  auto database = sqlite::Database::open(path_, &failure, {.isShared = true});
  if (!database) return failure;
  return database->transaction([&]() -> std::optional<sqlite::Failure> {
    if (auto problem = database->execute(kKnowledgeTables)) return problem;
    auto insert = database->prepare("INSERT INTO interaction VALUES(?1, ?2, ?3, ?4)");
    std::set<std::string> domains;
    for (const auto& interaction : interactions) {
      if (auto problem = insertInteraction(insert, interaction)) return problem;
      domains.insert(interaction.domain);
    }
    for (const auto& domain : domains) {
      if (auto problem = trimDomain(*database, domain, secondsSince1970(now - kInteractionAge))) {
        return problem;
      }
    }
    return std::nullopt;
  });
}

}  // namespace zelkord
