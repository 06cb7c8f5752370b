#include "zelkorctl/ImageDescriptors.h"

#include <algorithm>
#include <array>
#include <set>
#include <string>
#include <utility>

#include "base/Json.h"

namespace zelkorctl {
namespace {

constexpr std::array<std::string_view, 19> kImageKeys = {
    "thumbnail",    "image",           "image_overlay",     "value_image", "secondary_image",
    "icon",         "completion_icon", "more_icons",        "base_icon",   "glyph",
    "rt_glyph",     "title_glyph",     "attribution_glyph", "more_glyphs", "more_glyphs1",
    "more_glyphs2", "play_button",     "posters",           "badge_image"};

// One walk through a response. Its depth is bounded by what the parser accepts.
class Walk {
 public:
  void visit(const json::value& value) {
    if (const auto* object = value.if_object()) {
      for (const auto& [key, member] : *object) _visitMember(key, member);
    } else if (const auto* array = value.if_array()) {
      for (const auto& element : *array) visit(element);
    }
  }

  std::vector<ImageDescriptor> take() { return std::move(found_); }

 private:
  void _visitMember(std::string_view key, const json::value& member) {
    if (std::find(kImageKeys.begin(), kImageKeys.end(), key) == kImageKeys.end()) {
      visit(member);
    } else if (const auto* list = member.if_array()) {
      for (const auto& element : *list) _add(element);
    } else {
      _add(member);
    }
  }

  void _add(const json::value& value) {
    const auto* object = value.if_object();
    if (!object) return;
    auto url = stringIn(*object, "url").value_or("");
    auto id = stringIn(*object, "id").value_or("");
    if (url.empty() && id.empty()) return;
    if (!seen_.emplace(url, id).second) return;
    found_.push_back({std::move(url), std::move(id), {}});
  }

  std::vector<ImageDescriptor> found_;
  std::set<std::pair<std::string, std::string>> seen_;
};

}  // namespace

std::vector<ImageDescriptor> imagesIn(std::string_view data) {
  Walk walk;
  if (const auto parsed = parseJson(data)) walk.visit(*parsed);
  return walk.take();
}

}  // namespace zelkorctl
