// What other programs of the same user do to the daemon's files.

#include <sqlite3.h>

#include <filesystem>
#include <memory>
#include <thread>

#include "tests/soak/hostile/Attack.h"

namespace zelkord::soak {
namespace {

using namespace std::chrono_literals;

class LockedDatabase final : public Attack {
 public:
  LockedDatabase(const Aim& aim, const std::string& file, const char* name)
      : path_(aim.stateFolder + "/" + file), name_(name) {}
  const char* name() const override { return name_; }
  std::chrono::milliseconds rest() const override { return 2s; }
  std::uint64_t round() override {
    sqlite3* opened = nullptr;
    const int result = sqlite3_open_v2(path_.c_str(), &opened, SQLITE_OPEN_READWRITE, nullptr);
    const std::unique_ptr<sqlite3, int (*)(sqlite3*)> database(opened, sqlite3_close);
    if (result != SQLITE_OK) return 0;
    sqlite3_busy_timeout(opened, 5000);
    if (sqlite3_exec(opened, "BEGIN EXCLUSIVE", nullptr, nullptr, nullptr) != SQLITE_OK) return 0;
    std::this_thread::sleep_for(1s);
    sqlite3_exec(opened, "ROLLBACK", nullptr, nullptr, nullptr);
    return 1;
  }

 private:
  const std::string path_;
  const char* const name_;
};

class CutCacheFiles final : public Attack {
 public:
  explicit CutCacheFiles(const Aim& aim) : folder_(aim.stateFolder + "/urlcache") {}
  const char* name() const override { return "cached bodies that are cut"; }
  std::chrono::milliseconds rest() const override { return 100ms; }
  std::uint64_t round() override {
    using Entries = std::filesystem::recursive_directory_iterator;
    std::uint64_t cut = 0;
    std::error_code error;
    for (Entries entry(folder_, error); !error && entry != Entries(); entry.increment(error)) {
      std::error_code gone;
      const auto size = entry->is_regular_file(gone) ? entry->file_size(gone) : 0;
      if (gone || size == 0 || entry->path().filename().string().find(".db") != std::string::npos) {
        continue;
      }
      std::filesystem::resize_file(entry->path(), size / 2, gone);
      if (!gone) ++cut;
    }
    return cut;
  }

 private:
  const std::string folder_;
};

}  // namespace

std::vector<std::unique_ptr<Attack>> fileAttacks(const Aim& aim) {
  std::vector<std::unique_ptr<Attack>> attacks;
  if (aim.stateFolder.empty()) return attacks;
  attacks.push_back(
      std::make_unique<LockedDatabase>(aim, "defaults.db", "settings that are locked"));
  attacks.push_back(
      std::make_unique<LockedDatabase>(aim, "counters.db", "counters that are locked"));
  attacks.push_back(std::make_unique<CutCacheFiles>(aim));
  return attacks;
}

}  // namespace zelkord::soak
