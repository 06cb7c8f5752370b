#include "platform/linux/settings/SettingsFiles.h"

#include <filesystem>

namespace zelkord {
namespace {

constexpr std::uint64_t kMaximumSettingsFile = 1 << 20;

std::optional<json::object> readSettingsFile(const std::string& path, FileManager& files,
                                             const Logger& log) {
  Error error;
  const auto text = files.read(path, kMaximumSettingsFile, &error);
  std::string problem = text ? "not a JSON object" : error.reason().value_or("unreadable");
  auto value = text ? parseJson(*text, &problem) : std::nullopt;
  if (value && value->is_object()) return std::move(value->get_object());
  log.error("settings file {} is ignored: {}", path, problem);
  return std::nullopt;
}

void addMissing(json::object& into, const json::object& values) {
  for (const auto& [key, value] : values) into.emplace(key, value);
}

}  // namespace

SettingsByDomain readSystemSettings(const std::vector<std::string>& folders, FileManager& files,
                                    const Logger& log) {
  SettingsByDomain settings;
  for (const auto& folder : folders) {
    std::error_code none;
    for (std::filesystem::directory_iterator entry(folder, none), end; !none && entry != end;
         entry.increment(none)) {
      const auto domain = domainOfSystemFile(entry->path().filename().native());
      if (!domain) continue;
      if (const auto values = readSettingsFile(entry->path().native(), files, log)) {
        addMissing(settings[*domain], *values);
      }
    }
  }
  return settings;
}

}  // namespace zelkord
