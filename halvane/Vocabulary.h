#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

#include "base/Check.h"

namespace zelkor {

// The names that enumerations of feedback have in what is sent. A table's index is the value that
// clients send and files hold; the order is part of the wire vocabulary.
namespace vocabulary {

template <typename... Names>
constexpr auto table(Names... names) {
  return std::array<std::string_view, sizeof...(Names)>{std::string_view(names)...};
}

inline constexpr auto kEventTypes =  // what made the user engage with a result
    table("unknown", "enter", "tap", "click", "double_click", "peek", "pop", "reveal", "arrow_up",
          "arrow_down", "three_fingers_tap", "swipe", "forced_after_list_update", "shortcut");
inline constexpr auto kDestinationTypes =
    table("unknown", "card", "punchout", "none", "insert", "find_on_page", "last_search",
          "maps_card", "tunevo_sheet", "hosted_html_page", "more_locations_in_maps");
inline constexpr auto kActionTargetTypes =
    table("unknown", "directions", "call", "message", "play", "view", "open");
inline constexpr auto kResultTypes =
    table("unknown", "zelkor", "local", "core_lanthe", "ns_user_activity", "brelin_tophit",
          "calculator", "conversion", "dictionary_definition", "google", "yahoo", "bing",
          "duckduckgo", "yandex", "baidu");
inline constexpr auto kTopHitTypes = table("tophit_no", "tophit_should_be", "tophit_must_be");
inline constexpr auto kViewAppearEvents = table(
    "unknown", "swipe_down", "today_view", "lock_screen", "breadcrumb", "keyboard_shortcut",
    "mouse_click_on_menu", "app_launch", "new_tab", "tap_to_input", "new_window", "click",
    "tab_switch", "orb", "contextual_menu", "lookup_hint_tap", "lookup_tap", "swipe_up",
    "swipe_left", "swipe_right", "start_composing", "find_popular_items", "pull_down_home_screen",
    "notification_center", "partial_pull_down", "unlock_device", "did_enter_foreground");
inline constexpr auto kViewDisappearEvents =
    table("unknown", "killed", "home_button", "task_switcher", "cancel", "escape",
          "close_window_by_keyboard", "close_window_by_mouse", "minimize_window_by_keyboard",
          "minimize_window_by_mouse", "switched_to_other_app", "quit_app", "lock_button",
          "click_notification_banner", "phone_call", "lost_focus", "done", "swipe_down", "swipe_up",
          "swipe_left", "swipe_right", "share_button", "device_idle", "did_enter_background",
          "go_to_site");
// The last entry repeats the first; so it is sent.
inline constexpr auto kCardViewDisappearEvents =
    table("unknown", "back", "swipe", "pop", "done", "replaced", "unknown");
inline constexpr auto kSearchRequestTriggers =
    table("unknown", "new_character", "ime_commit", "backspace", "voice_search", "dictation",
          "copy_and_paste", "drag_and_drop", "suggestion", "prefetch", "partial_suggestion",
          "lookup", "cross_button", "show_more", "card", "image_load", "bag", "unlock_device",
          "correction", "warm");
inline constexpr auto kEndpointTypes =
    table("unknown", "zelkor", "google", "yahoo", "bing", "duckduckgo", "zelkor_search",
          "zelkor_image", "yandex", "baidu", "zelkor_bag", "zelkor_card", "zelkor_warm");
inline constexpr auto kLookupSelectionTypes =
    table("lookup_default", "lookup_explicit", "lookup_hint_tap");
inline constexpr auto kIndexTypes =
    table("unknown", "lanthe", "calculator", "core_kinlo", "brelin_bookmarks", "brelin_history",
          "lookup_dictionary");
inline constexpr auto kVisibleResultsEvents =
    table("unknown", "result_list_updated", "scroll", "show_more", "peek", "pop", "show_less",
          "card_swipe", "click", "view_resized", "scroll_up", "scroll_down", "resume_search",
          "arrow_up", "arrow_down");
inline constexpr auto kCardSectionEvents = table("unknown", "enter", "tap", "click", "double_click",
                                                 "peek", "pop", "reveal", "arrow_up", "arrow_down");
inline constexpr auto kCardTypes =
    table("unknown", "normal", "maps", "tunevo_sheet", "hosted_html_page");
inline constexpr auto kCardActionTargets =
    table("unknown", "body", "phone", "home_page", "address", "directions_to_here",
          "directions_from_here", "business_photo", "business_review", "write_a_review",
          "more_info", "report_a_problem", "preview", "details", "play", "buy", "rent", "artist",
          "reviews", "related", "more", "trailer", "season", "episode");
inline constexpr auto kProductPageResults =
    table("canceled_product_page", "closed_product_page", "product_page_download_finished",
          "user_hit_goto_store_button", "user_purchased_item", "user_hit_custom_right_bar_button");
inline constexpr auto kSuggestionTypes = table("unknown", "zelkor", "proactive", "recents");
inline constexpr auto kClearInputEvents = table("unknown", "cross_button", "cut", "backspace");
inline constexpr auto kSectionEngagementEvents =
    table("unknown", "search_in_app", "show_more", "show_less");
inline constexpr auto kHeaderTypes = table("unknown", "search_in_app", "show_more", "normal");
inline constexpr auto kSkipSearchReasons =
    table("unknown", "less_than_minimum_query_length", "bag_disabled", "bag_fetch_failed",
          "cache_hit", "empty_query_input", "query_input_with_uri_scheme_prefix");
inline constexpr auto kResultGrades =
    table("unknown", "disastrous", "bad", "ok", "good", "excellent");
inline constexpr auto kSessionEndReasons =
    table("no previous session", "external request", "session idle", "max session time passed",
          "guid changed", "critical memory", "engagement received");
// By the custom type that a client gives; the names are those of the records' types.
inline constexpr auto kCustomTypes = table("custom_unknown", "custom_brelin_autofill",
                                           "custom_crowdsourcing", "custom_lanthe_result_features");

// What a user did in a place card. Sparse: an index without a name is a null text.
inline constexpr auto kMapsFeedbackTypes = [] {
  std::array<std::string_view, 223> names{};
  names[0] = "unknown";
  names[2] = "phone_number";
  names[3] = "website";
  names[5] = "add_contact";
  names[6] = "share";
  names[12] = "directions_to_here";
  names[13] = "directions_from_here";
  names[14] = "dismissed";
  names[62] = "report_a_problem";
  names[124] = "edit_contact";
  names[125] = "delete_contact";
  names[127] = "flyover_tour";
  names[172] = "all_photos";
  names[173] = "photo";
  names[174] = "add_photo";
  names[175] = "all_reviews";
  names[176] = "review";
  names[177] = "write_review";
  names[178] = "deal";
  names[179] = "checkin";
  names[180] = "more_info";
  names[201] = "postal_address";
  return names;
}();

}  // namespace vocabulary

// The entry of a table at `index`. An index outside it stops the process: whatever comes from
// outside is checked at the door.
template <std::size_t Count>
constexpr std::string_view entryOf(const std::array<std::string_view, Count>& table,
                                   std::int64_t index) {
  ZK_CHECK(index >= 0 && index < static_cast<std::int64_t>(Count), "vocabulary index out of range");
  return table[static_cast<std::size_t>(index)];
}

// A value of an enumeration whose names stand in `Table`. `Value` is its type in messages.
template <const auto& Table, typename Value = std::int32_t>
struct Term {
  Value value = 0;

  Term() = default;
  Term(Value index) : value(index) {}  // NOLINT(google-explicit-constructor): a number, named

  bool isKnown() const { return value >= 0 && value < static_cast<Value>(Table.size()); }
  // Null text for an index without a name. Requires isKnown().
  std::string_view text() const { return entryOf(Table, value); }

  friend bool operator==(const Term&, const Term&) = default;
};

}  // namespace zelkor
