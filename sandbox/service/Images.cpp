#include "sandbox/service/Images.h"

#include <sys/stat.h>

#include <array>
#include <utility>

#include "sandbox/core/Files.h"
#include "sandbox/http/Conditional.h"
#include "sandbox/service/Png.h"

namespace sandbox {

namespace {

constexpr unsigned kGlyphSize = 32;
constexpr std::time_t kGlyphTime = 1'600'000'000;

constexpr std::array<std::pair<const char*, std::uint32_t>, 7> kGlyphColours = {{
    {"word", 0x2A5DB0},
    {"country", 0x2E7D32},
    {"region", 0x558B2F},
    {"currency", 0xB28704},
    {"language", 0x6A1B9A},
    {"character", 0xC62828},
    {"fact", 0x546E7A},
}};

}  // namespace

Images::Images(const std::filesystem::path& flags) {
  _addFlags(flags);
  for (const auto& [name, colour] : kGlyphColours) {
    _add("/image/glyph/" + std::string(name) + ".png", pngOfColour(colour, kGlyphSize), kGlyphTime);
  }
}

void Images::_addFlags(const std::filesystem::path& folder) {
  std::error_code error;
  for (const auto& file : std::filesystem::directory_iterator(folder, error)) {
    struct stat status {};
    auto bytes = readFile(file.path());
    if (file.path().extension() != ".png" || !bytes || ::stat(file.path().c_str(), &status) != 0)
      continue;
    _add("/image/flags/" + file.path().filename().string(), std::move(*bytes), status.st_mtime);
  }
}

void Images::_add(const std::string& path, std::string bytes, std::time_t modified) {
  const std::string tag = entityTagOf(bytes);
  pictures_[path] = {std::make_shared<const std::string>(std::move(bytes)), tag, modified};
}

Reply Images::answer(const Request& request) const {
  const auto found = pictures_.find(request.path);
  if (found == pictures_.end()) return Reply::error(404, "no such image");
  Reply reply;
  reply.mayPack = false;
  reply.body = found->second.bytes;
  reply.headers.emplace_back("Content-Type", "image/png");
  reply.headers.emplace_back("Cache-Control", "public, max-age=86400");
  return withValidators(request, std::move(reply), found->second.tag, found->second.modified);
}

}  // namespace sandbox
