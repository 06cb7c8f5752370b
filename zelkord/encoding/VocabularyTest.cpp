#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

#include "halvane/FeedbackClasses.h"
#include "platform/testing/RecordingLog.h"
#include "zelkord/encoding/FeedbackEncoding.h"

// What every value of every enumeration in a message is called in what is sent. The service knows
// these names by heart; so they stand here once more, whole.

namespace zelkord {
namespace {

using namespace std::string_literals;

constexpr const char* kEngagementTriggers =
    "unknown,enter,tap,click,double_click,peek,pop,reveal,arrow_up,"
    "arrow_down,three_fingers_tap,swipe,forced_after_list_update,"
    "shortcut";
constexpr const char* kDestinations =
    "unknown,card,punchout,none,insert,find_on_page,last_search,"
    "maps_card,tunevo_sheet,hosted_html_page,more_locations_in_maps";
constexpr const char* kActionTargets = "unknown,directions,call,message,play,view,open";
constexpr const char* kResultTypes =
    "unknown,zelkor,local,core_lanthe,ns_user_activity,brelin_tophit,"
    "calculator,conversion,dictionary_definition,google,yahoo,bing,"
    "duckduckgo,yandex,baidu";
constexpr const char* kTopHits = "tophit_no,tophit_should_be,tophit_must_be";
constexpr const char* kAppearTriggers =
    "unknown,swipe_down,today_view,lock_screen,breadcrumb,"
    "keyboard_shortcut,mouse_click_on_menu,app_launch,new_tab,"
    "tap_to_input,new_window,click,tab_switch,orb,contextual_menu,"
    "lookup_hint_tap,lookup_tap,swipe_up,swipe_left,swipe_right,"
    "start_composing,find_popular_items,pull_down_home_screen,"
    "notification_center,partial_pull_down,unlock_device,"
    "did_enter_foreground";
constexpr const char* kDisappearTriggers =
    "unknown,killed,home_button,task_switcher,cancel,escape,"
    "close_window_by_keyboard,close_window_by_mouse,"
    "minimize_window_by_keyboard,minimize_window_by_mouse,"
    "switched_to_other_app,quit_app,lock_button,"
    "click_notification_banner,phone_call,lost_focus,done,swipe_down,"
    "swipe_up,swipe_left,swipe_right,share_button,device_idle,"
    "did_enter_background,go_to_site";
constexpr const char* kCardDisappearTriggers = "unknown,back,swipe,pop,done,replaced,unknown";
constexpr const char* kRequestTriggers =
    "unknown,new_character,ime_commit,backspace,voice_search,"
    "dictation,copy_and_paste,drag_and_drop,suggestion,prefetch,"
    "partial_suggestion,lookup,cross_button,show_more,card,image_load,"
    "bag,unlock_device,correction,warm";
constexpr const char* kEndpoints =
    "unknown,zelkor,google,yahoo,bing,duckduckgo,zelkor_search,"
    "zelkor_image,yandex,baidu,zelkor_bag,zelkor_card,zelkor_warm";
constexpr const char* kSelections = "lookup_default,lookup_explicit,lookup_hint_tap";
constexpr const char* kIndexes =
    "unknown,lanthe,calculator,core_kinlo,brelin_bookmarks,"
    "brelin_history,lookup_dictionary";
constexpr const char* kVisibleTriggers =
    "unknown,result_list_updated,scroll,show_more,peek,pop,show_less,"
    "card_swipe,click,view_resized,scroll_up,scroll_down,"
    "resume_search,arrow_up,arrow_down";
constexpr const char* kCardTriggers =
    "unknown,enter,tap,click,double_click,peek,pop,reveal,arrow_up,"
    "arrow_down";
constexpr const char* kCardTypes = "unknown,normal,maps,tunevo_sheet,hosted_html_page";
constexpr const char* kCardTargets =
    "unknown,body,phone,home_page,address,directions_to_here,"
    "directions_from_here,business_photo,business_review,write_a_review,"
    "more_info,report_a_problem,preview,details,play,buy,rent,"
    "artist,reviews,related,more,trailer,season,episode";
constexpr const char* kProductPages =
    "canceled_product_page,closed_product_page,"
    "product_page_download_finished,user_hit_goto_store_button,"
    "user_purchased_item,user_hit_custom_right_bar_button";
constexpr const char* kSuggestionTypes = "unknown,zelkor,proactive,recents";
constexpr const char* kClearTriggers = "unknown,cross_button,cut,backspace";
constexpr const char* kSectionTriggers = "unknown,search_in_app,show_more,show_less";
constexpr const char* kHeaders = "unknown,search_in_app,show_more,normal";
constexpr const char* kSkipReasons =
    "unknown,less_than_minimum_query_length,bag_disabled,"
    "bag_fetch_failed,cache_hit,empty_query_input,"
    "query_input_with_uri_scheme_prefix";
constexpr const char* kGrades = "unknown,disastrous,bad,ok,good,excellent";
constexpr const char* kEndReasons =
    "no previous session,external request,session idle,"
    "max session time passed,guid changed,critical memory,"
    "engagement received";

const std::map<int, std::string> kMapsNames = {
    {0, "unknown"},
    {2, "phone_number"},
    {3, "website"},
    {5, "add_contact"},
    {6, "share"},
    {12, "directions_to_here"},
    {13, "directions_from_here"},
    {14, "dismissed"},
    {62, "report_a_problem"},
    {124, "edit_contact"},
    {125, "delete_contact"},
    {127, "flyover_tour"},
    {172, "all_photos"},
    {173, "photo"},
    {174, "add_photo"},
    {175, "all_reviews"},
    {176, "review"},
    {177, "write_review"},
    {178, "deal"},
    {179, "checkin"},
    {180, "more_info"},
    {201, "postal_address"},
};

std::vector<std::string> splitNames(const std::string& list) {
  std::vector<std::string> names(1);
  for (const char character : list) {
    if (character == ',') {
      names.emplace_back();
    } else {
      names.back() += character;
    }
  }
  return names;
}

std::vector<std::string> mapsNames() {
  std::vector<std::string> names(223, "(null)");
  for (const auto& [index, name] : kMapsNames) names.at(static_cast<std::size_t>(index)) = name;
  return names;
}

struct VocabularyRow {
  std::string className;
  std::string before;       // what the message holds besides
  std::vector<int> fields;  // the number of the value's field, after those that it is in
  std::string pointer;      // to what is sent of it
  std::vector<std::string> names;
};

std::string messageWithValue(const VocabularyRow& row, std::size_t value) {
  std::string bytes(1, static_cast<char>(row.fields.back() << 3));
  if (value > 127) bytes += static_cast<char>(value | 0x80);
  bytes += static_cast<char>(value > 127 ? value >> 7 : value);
  for (auto field = row.fields.rbegin() + 1; field != row.fields.rend(); ++field) {
    bytes =
        std::string{static_cast<char>(*field << 3 | 2), static_cast<char>(bytes.size())} + bytes;
  }
  return row.before + bytes;
}

std::string sentName(const VocabularyRow& row, std::size_t value) {
  RecordingLog log;
  auto fault = RecordFault::None;
  const auto record =
      readFeedback(*feedbackClassNamed(row.className), messageWithValue(row, value), fault);
  if (!record) return "refused";
  const json::value dictionary = dictionaryOf(*record, Logger(log, ""));
  const auto& name = dictionary.at_pointer(row.pointer);
  return name.is_null() ? "(null)" : std::string(name.as_string());
}

TEST(VocabularyTest, EveryValueHasTheNameThatTheServiceKnows) {
  const std::vector<VocabularyRow> rows = {
      {"HVResultEngagementFeedback", ""s, {2}, "/trigger_event", splitNames(kEngagementTriggers)},
      {"HVResultEngagementFeedback", ""s, {3}, "/destination", splitNames(kDestinations)},
      {"HVResultEngagementFeedback",
       "\x22\x00\x28\x01"s,
       {6},
       "/action_target",
       splitNames(kActionTargets)},
      {"HVVisibleResultsFeedback", ""s, {2}, "/trigger_event", splitNames(kVisibleTriggers)},
      {"HVVisibleResultsFeedback", ""s, {3, 3}, "/results/0/result_type", splitNames(kResultTypes)},
      {"HVVisibleResultsFeedback", ""s, {3, 5}, "/results/0/top_hit", splitNames(kTopHits)},
      {"HVSearchViewAppearFeedback", ""s, {2}, "/trigger_event", splitNames(kAppearTriggers)},
      {"HVSearchViewDisappearFeedback", ""s, {2}, "/trigger_event", splitNames(kDisappearTriggers)},
      {"HVCardViewDisappearFeedback",
       ""s,
       {2},
       "/trigger_event",
       splitNames(kCardDisappearTriggers)},
      {"HVStartSearchFeedback", ""s, {2}, "/trigger_event", splitNames(kRequestTriggers)},
      {"HVStartLocalSearchFeedback", ""s, {2}, "/trigger_event", splitNames(kRequestTriggers)},
      {"HVStartLocalSearchFeedback", ""s, {5}, "/index_type", splitNames(kIndexes)},
      {"HVStartNetworkSearchFeedback", ""s, {2}, "/trigger_event", splitNames(kRequestTriggers)},
      {"HVStartNetworkSearchFeedback", ""s, {7}, "/endpoint_type", splitNames(kEndpoints)},
      {"ZLKLookupStartNetworkSearchFeedback", ""s, {8}, "/trigger_event", splitNames(kSelections)},
      {"ZLKLookupStartNetworkSearchFeedback", ""s, {7}, "/endpoint_type", splitNames(kEndpoints)},
      {"HVDidGoToSearchFeedback", ""s, {3}, "/endpoint_type", splitNames(kEndpoints)},
      {"HVCardSectionEngagementFeedback", ""s, {2}, "/trigger_event", splitNames(kCardTriggers)},
      {"HVCardSectionEngagementFeedback", ""s, {3}, "/card_type", splitNames(kCardTypes)},
      {"HVCardSectionEngagementFeedback", ""s, {4}, "/action_target", splitNames(kCardTargets)},
      {"HVStoreCardSectionEngagementFeedback",
       ""s,
       {2},
       "/action_target",
       splitNames(kProductPages)},
      {"HVVisibleSuggestionsFeedback",
       ""s,
       {2, 4},
       "/suggestions/0/suggestion_type",
       splitNames(kSuggestionTypes)},
      {"HVClearInputFeedback", ""s, {2}, "/trigger_event", splitNames(kClearTriggers)},
      {"HVSectionEngagementFeedback", ""s, {3}, "/trigger_event", splitNames(kSectionTriggers)},
      {"HVVisibleSectionHeaderFeedback", ""s, {3}, "/section_header_type", splitNames(kHeaders)},
      {"ZLKSkipSearchFeedback", ""s, {2}, "/trigger_event", splitNames(kSkipReasons)},
      {"ZLKCacheHitFeedback", ""s, {2}, "/trigger_event", splitNames(kSkipReasons)},
      {"HVResultGradingFeedback", ""s, {2}, "/grade", splitNames(kGrades)},
      {"ZelkorSessionEndFeedback", ""s, {2}, "/reason", splitNames(kEndReasons)},
      {"HVMapsCardSectionEngagementFeedback", ""s, {2}, "/action_target", mapsNames()},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.className + row.pointer);
    for (std::size_t value = 0; value < row.names.size(); ++value) {
      EXPECT_EQ(sentName(row, value), row.names[value]) << value;
    }
    EXPECT_EQ(sentName(row, row.names.size()), "refused");
  }
}

// By the custom type that a client says.
TEST(VocabularyTest, CustomFeedbackHasTheTypesThatTheServiceKnows) {
  const std::vector<std::uint32_t> types = {17, 19, 18, 20};
  for (std::size_t custom = 0; custom < types.size(); ++custom) {
    auto fault = RecordFault::None;
    const VocabularyRow row{"HVCustomFeedback", ""s, {2}, "", {}};
    const auto record =
        readFeedback(*feedbackClassNamed(row.className), messageWithValue(row, custom), fault);
    ASSERT_TRUE(record);
    EXPECT_EQ(record->type(), types[custom]) << custom;
  }
}

}  // namespace
}  // namespace zelkord
