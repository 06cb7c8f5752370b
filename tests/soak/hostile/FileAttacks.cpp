// What other programs of the same user do to the daemon's files.

#include <sqlite3.h>

#include <filesystem>
#include <memory>
#include <thread>

#include "tests/soak/hostile/Attack.h"

namespace zelkord::soak {
namespace {

using namespace std::chrono_literals;

class LockedSettings final : public Attack {
 public:
  explicit LockedSettings(const Aim& aim) : path_(aim.stateFolder + "/defaults.db") {}
  const char* name() const override { return "settings that another program has locked"; }
  std::chrono::milliseconds rest() const override { return 2s; }
  std::uint64_t round() override {
    if (!std::filesystem::exists(path_)) return 1;  // nothing written yet, nothing to lock
    sqlite3* opened = nullptr;
    const int result = sqlite3_open_v2(path_.c_str(), &opened, SQLITE_OPEN_READWRITE, nullptr);
    const std::unique_ptr<sqlite3, int (*)(sqlite3*)> database(opened, sqlite3_close);
    if (result != SQLITE_OK) return 0;
    if (sqlite3_exec(opened, "BEGIN EXCLUSIVE", nullptr, nullptr, nullptr) != SQLITE_OK) return 0;
    std::this_thread::sleep_for(1s);
    sqlite3_exec(opened, "ROLLBACK", nullptr, nullptr, nullptr);
    return 1;
  }

 private:
  const std::string path_;
};

class CutCacheFiles final : public Attack {
 public:
  explicit CutCacheFiles(const Aim& aim) : folder_(aim.stateFolder + "/urlcache") {}
  const char* name() const override { return "cached bodies that are cut"; }
  std::chrono::milliseconds rest() const override { return 500ms; }
  std::uint64_t round() override {
    std::uint64_t looked = 1;
    std::error_code error;
    for (auto entry = std::filesystem::recursive_directory_iterator(folder_, error);
         !error && entry != std::filesystem::recursive_directory_iterator();
         entry.increment(error)) {
      ++looked;
      if (entry->path().extension() == ".db" ||
          entry->path().string().find(".db-") != std::string::npos)
        continue;
      std::error_code ignored;
      if (looked % 3 == 0 && entry->is_regular_file(ignored)) {
        std::filesystem::resize_file(entry->path(), entry->file_size(ignored) / 2, ignored);
      }
    }
    return looked;
  }

 private:
  const std::string folder_;
};

}  // namespace

std::vector<std::unique_ptr<Attack>> fileAttacks(const Aim& aim) {
  std::vector<std::unique_ptr<Attack>> attacks;
  if (aim.stateFolder.empty()) return attacks;
  attacks.push_back(std::make_unique<LockedSettings>(aim));
  attacks.push_back(std::make_unique<CutCacheFiles>(aim));
  return attacks;
}

}  // namespace zelkord::soak
