#include "zelkorctl/ImageFiles.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <filesystem>

namespace zelkorctl {
namespace {

using namespace zelkor;

constexpr std::size_t kLongestName = 100;

bool looksLikeSvg(std::string_view bytes) {
  constexpr std::size_t kHead = 1024;
  const auto head = bytes.substr(0, kHead);
  return head.starts_with('<') && head.find("<svg") != std::string_view::npos;
}

// The last part of a URL's path; an identifier is one part.
std::string_view lastPart(std::string_view key) {
  key = key.substr(0, key.find_first_of("?#"));
  while (key.ends_with('/')) key.remove_suffix(1);
  const auto slash = key.rfind('/');
  return slash == std::string_view::npos ? key : key.substr(slash + 1);
}

std::string plain(std::string_view part) {
  std::string name;
  for (const char c : part.substr(0, kLongestName)) {
    const bool fine = std::isalnum(static_cast<unsigned char>(c)) != 0 || c == '.' || c == '-';
    name.push_back(fine ? c : '_');
  }
  name.erase(0, name.find_first_not_of(".-"));
  return name.empty() ? "image" : name;
}

std::optional<Error> write(int file, std::string_view bytes) {
  while (!bytes.empty()) {
    const auto written = ::write(file, bytes.data(), bytes.size());
    if (written < 0 && errno == EINTR) continue;
    if (written < 0) return posixError(errno);
    bytes.remove_prefix(static_cast<std::size_t>(written));
  }
  return std::nullopt;
}

// A link in the way is not followed.
std::optional<Error> writeFile(const std::string& path, std::string_view bytes) {
  const int file = ::open(path.c_str(),
                          O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, 0644);
  if (file < 0) return posixError(errno);
  auto error = write(file, bytes);
  if (::close(file) != 0 && !error) error = posixError(errno);
  return error;
}

}  // namespace

ImageType imageType(std::string_view bytes) {
  if (bytes.starts_with("\x89PNG\r\n\x1a\n")) return {"image/png", ".png"};
  if (bytes.starts_with("\xff\xd8\xff")) return {"image/jpeg", ".jpg"};
  if (bytes.starts_with("GIF87a") || bytes.starts_with("GIF89a")) return {"image/gif", ".gif"};
  if (bytes.starts_with("RIFF") && bytes.substr(0, 12).ends_with("WEBP"))
    return {"image/webp", ".webp"};
  if (looksLikeSvg(bytes)) return {"image/svg+xml", ".svg"};
  return {"application/octet-stream", ".bin"};
}

std::string ImageFiles::_newName(std::string_view key, std::string_view extension) {
  auto stem = plain(lastPart(key));
  if (stem.size() > extension.size() && stem.ends_with(extension)) {
    stem.resize(stem.size() - extension.size());
  }
  auto name = stem + std::string(extension);
  for (int number = 2; !taken_.insert(name).second; ++number) {
    name = stem + "-" + std::to_string(number) + std::string(extension);
  }
  return name;
}

ImageFiles::Saved ImageFiles::save(std::string_view key, std::string_view bytes) {
  std::error_code problem;
  std::filesystem::create_directories(folder_, problem);
  const auto path = folder_ + "/" + _newName(key, imageType(bytes).extension);
  return {path, problem ? posixError(problem.value()) : writeFile(path, bytes)};
}

}  // namespace zelkorctl
