#include <gmock/gmock.h>
#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>
#include <google/protobuf/util/message_differencer.h>
#include <gtest/gtest.h>

#include "base/Text.h"
#include "corezelkor/proto/Feedback.pb.h"
#include "halvane/DaemonFeedback.h"
#include "halvane/FeedbackClasses.h"
#include "halvane/StoredFeedback.h"

// Our records and the classes that protoc generates from the published messages say the same.

namespace zelkor {
namespace {

using google::protobuf::FieldDescriptor;
using google::protobuf::Message;

enum class Filling { Nothing, Values, SetToDefaults };

// Every class that there is, with its message.
const std::vector<std::pair<std::string, std::string>>& classes() {
  static const auto kClasses = [] {
    std::vector<std::pair<std::string, std::string>> list = {
        {"ZLKLookupStartNetworkSearchFeedback", "CZLookupStartNetworkSearchFeedback"},
        {"ZLKEndNetworkSearchFeedback", "CZEndNetworkSearchFeedback"},
        {"ZLKSkipSearchFeedback", "CZSkipSearchFeedback"},
        {"ZLKCacheHitFeedback", "CZCacheHitFeedback"},
        {"ZelkorSessionEndFeedback", "CZSessionEndFeedback"},
        {"ZelkorSessionMissingResults", "CZSessionMissingResultsFeedback"},
        {"ZelkorSessionMissingSuggestions", "CZSessionMissingSuggestionsFeedback"},
        {"ZelkorConnectionInvalidated", "CZConnectionInvalidatedFeedback"},
        {"CZZLKRankerFeedback", "CZZLKRankerFeedback"}};
    for (const auto* stem : {"VisibleResults",
                             "StartNetworkSearch",
                             "EndNetworkSearch",
                             "StartLocalSearch",
                             "EndLocalSearch",
                             "SearchViewAppear",
                             "SearchViewDisappear",
                             "Ranking",
                             "ResultEngagement",
                             "CardSectionEngagement",
                             "MapsCardSectionEngagement",
                             "StoreCardSectionEngagement",
                             "Error",
                             "SuggestionEngagement",
                             "CardViewDisappear",
                             "StartSearch",
                             "EndSearch",
                             "VisibleSuggestions",
                             "Custom",
                             "ResultsReceivedAfterTimeout",
                             "LateSectionsAppended",
                             "ClearInput",
                             "SectionEngagement",
                             "VisibleSectionHeader",
                             "DidGoToSite",
                             "DidGoToSearch",
                             "ResultGrading"}) {
      const auto message = "CZ" + std::string(stem) + "Feedback";
      list.emplace_back(message, message);
      list.emplace_back("HV" + std::string(stem) + "Feedback", message);
    }
    return list;
  }();
  return kClasses;
}

std::unique_ptr<Message> newMessage(const std::string& name) {
  const auto* type = google::protobuf::DescriptorPool::generated_pool()->FindMessageTypeByName(
      "corezelkor." + name);
  if (!type) return nullptr;
  return std::unique_ptr<Message>(
      google::protobuf::MessageFactory::generated_factory()->GetPrototype(type)->New());
}

void fill(Message& message, Filling filling);

void fillOne(Message& message, const FieldDescriptor& field, Filling filling) {
  const auto& access = *message.GetReflection();
  const bool zero = filling == Filling::SetToDefaults;
  switch (field.cpp_type()) {
    case FieldDescriptor::CPPTYPE_INT32:
      return access.SetInt32(&message, &field, zero ? 0 : 1);
    case FieldDescriptor::CPPTYPE_INT64:
      return access.SetInt64(&message, &field, zero ? 0 : field.name() == "reason" ? 6 : -7);
    case FieldDescriptor::CPPTYPE_UINT64:
      return access.SetUInt64(&message, &field, zero ? 0 : ~std::uint64_t{0});
    case FieldDescriptor::CPPTYPE_DOUBLE:
      return access.SetDouble(&message, &field, zero ? 0 : -0.25);
    case FieldDescriptor::CPPTYPE_BOOL:
      return access.SetBool(&message, &field, !zero);
    case FieldDescriptor::CPPTYPE_STRING:
      return access.SetString(&message, &field, zero ? "" : "té\n" + field.name());
    default:
      return fill(*access.MutableMessage(&message, &field), filling);
  }
}

void fillRepeated(Message& message, const FieldDescriptor& field, Filling filling) {
  const auto& access = *message.GetReflection();
  for (int i = 0; i < 2; ++i) {
    if (field.cpp_type() == FieldDescriptor::CPPTYPE_STRING) {
      access.AddString(&message, &field, "item " + std::to_string(i));
    } else {
      auto& item = *access.AddMessage(&message, &field);
      if (!field.is_map()) fill(item, filling);
      if (!field.is_map() || i == 0) continue;
      item.GetReflection()->SetString(&item, item.GetDescriptor()->field(0), "key");
      item.GetReflection()->SetString(&item, item.GetDescriptor()->field(1), "value");
    }
  }
}

void fill(Message& message, Filling filling) {
  if (filling == Filling::Nothing) return;
  const auto& type = *message.GetDescriptor();
  for (int i = 0; i < type.field_count(); ++i) {
    const auto& field = *type.field(i);
    if (field.is_repeated()) {
      fillRepeated(message, field, filling);
    } else {
      fillOne(message, field, filling);
    }
  }
}

// What only one of the two classes of a message reads.
void clearOthersFields(Message& message, const std::string& className) {
  if (className != "HVEndNetworkSearchFeedback" && className != "CZEndNetworkSearchFeedback")
    return;
  for (int number = 9; number <= 12; ++number) {
    message.GetReflection()->ClearField(&message,
                                        message.GetDescriptor()->FindFieldByNumber(number));
  }
}

std::unique_ptr<HVFeedback> read(std::string_view className, std::string_view message,
                                 RecordFault* fault = nullptr) {
  RecordFault ignored{};
  return readFeedback(*feedbackClassNamed(className), message, fault ? *fault : ignored);
}

std::string written(const HVFeedback& feedback) {
  std::string bytes;
  feedback.appendTo(bytes);
  return bytes;
}

TEST(RecordMessagesTest, EveryClassReadsAndWritesItsMessage) {
  for (const auto& [className, messageName] : classes()) {
    SCOPED_TRACE(className);
    ASSERT_TRUE(feedbackClassNamed(className));
    for (const auto filling : {Filling::Nothing, Filling::Values, Filling::SetToDefaults}) {
      SCOPED_TRACE(static_cast<int>(filling));
      const auto sent = newMessage(messageName);
      ASSERT_TRUE(sent);
      fill(*sent, filling);
      const auto record = read(className, sent->SerializeAsString());
      ASSERT_TRUE(record);
      EXPECT_EQ(record->className(), className);
      const auto back = newMessage(messageName);
      ASSERT_TRUE(back->ParseFromString(written(*record)));
      clearOthersFields(*sent, className);
      std::string difference;
      google::protobuf::util::MessageDifferencer differ;
      differ.ReportDifferencesToString(&difference);
      EXPECT_TRUE(differ.Compare(*sent, *back)) << difference;
      EXPECT_EQ(written(*record->clone()), written(*record));
    }
  }
}

TEST(RecordMessagesTest, EveryMessageHasItsClass) {
  const auto& file = *corezelkor::CZError::descriptor()->file();
  int feedbacks = 0;
  for (int i = 0; i < file.message_type_count(); ++i) {
    const auto& name = file.message_type(i)->name();
    const bool isKind = name.ends_with("Feedback") && name != "CZZelkorFeedback";
    EXPECT_EQ(feedbackClassNamed(name) != nullptr, isKind) << name;
    feedbacks += isKind;
  }
  EXPECT_EQ(feedbacks, 35);  // two kinds share the end of a network search
  for (const auto* unknown : {"", "HVFeedback", "CZFeedback", "hverrorfeedback", "HVRankerFeedback",
                              "HVSkipSearchFeedback", "ZLKErrorFeedback", "HVErrorFeedback "}) {
    EXPECT_EQ(feedbackClassNamed(unknown), nullptr) << unknown;
  }
}

TEST(RecordMessagesTest, OnlyTheDaemonMakesItsOwn) {
  for (const auto& [className, messageName] : classes()) {
    const auto* known = feedbackClassNamed(className);
    const bool isDaemons = className.starts_with("ZLK") || className.starts_with("Zelkor");
    EXPECT_EQ(known->origin == FeedbackOrigin::Daemon, isDaemons) << className;
  }
  for (const auto* message :
       {"CZSkipSearchFeedback", "CZCacheHitFeedback", "CZSessionEndFeedback",
        "CZSessionMissingResultsFeedback", "CZSessionMissingSuggestionsFeedback",
        "CZConnectionInvalidatedFeedback", "CZLookupStartNetworkSearchFeedback"}) {
    EXPECT_EQ(feedbackClassNamed(message)->origin, FeedbackOrigin::Daemon) << message;
  }
}

TEST(RecordMessagesTest, AMessageThatIsCutIsRefusedOrShorter) {
  const auto whole = newMessage("CZRankingFeedback");
  fill(*whole, Filling::Values);
  const auto bytes = whole->SerializeAsString();
  for (std::size_t size = 0; size < bytes.size(); ++size) {
    const auto cut = bytes.substr(0, size);
    const auto record = read("HVRankingFeedback", cut);
    const auto other = newMessage("CZRankingFeedback");
    ASSERT_EQ(record != nullptr, other->ParseFromString(cut)) << size;
    if (record) {
      EXPECT_LT(written(*record).size(), bytes.size());
    }
  }
}

TEST(RecordMessagesTest, FollowsTheFormatWhereItIsLenient) {
  struct Case {
    const char* name;
    std::string bytes;
    std::string expected;  // written again
  };
  using namespace std::string_literals;
  const std::vector<Case> cases = {
      {"an unknown field", "\xA8\x06\x05\x12\x01u"s, "\x12\x01u"s},
      {"a known one of another type", "\x10\x05\x12\x01u"s, "\x12\x01u"s},
      {"a group", "\x2B\x08\x01\x2C\x12\x01u"s, "\x12\x01u"s},
      {"the last of several",
       "\x12\x01"
       "a\x12\x01"
       "b"s,
       "\x12\x01"
       "b"s},
      {"a set empty text", "\x12\x00"s, "\x12\x00"s},
      {"a default that is written", "\x08\x00\x12\x01u"s, "\x12\x01u"s},
  };
  for (const auto& wanted : cases) {
    SCOPED_TRACE(wanted.name);
    const auto record = read("HVEndSearchFeedback", wanted.bytes);
    ASSERT_TRUE(record);
    EXPECT_EQ(written(*record), wanted.expected);
  }
  // Nested records of a field that comes twice merge.
  const auto error = read("HVErrorFeedback",
                          "\x12\x02\x08\x05\x12\x03\x12\x01"
                          "d"s);
  EXPECT_EQ(dynamic_cast<HVErrorFeedback&>(*error).error, (HVError{5, "d", std::nullopt}));
}

TEST(RecordMessagesTest, RefusesWhatIsNoMessage) {
  using namespace std::string_literals;
  const std::vector<std::pair<const char*, std::string>> cases = {
      {"field 0", "\x02\x00"s},
      {"an endless varint", "\x08\xFF\xFF\xFF\xFF\xFF\xFF\xFF\xFF\xFF\xFF\x01"s},
      {"a length beyond the end", "\x12\x05u"s},
      {"a huge length", "\x12\xFF\xFF\xFF\xFF\xFF\xFF\xFF\xFF\x7F"s},
      {"no UTF-8", "\x12\x01\xFF"s},
      {"a group that does not end", "\x2B\x08\x01"s},
      {"an end without a group", "\x2C"s},
  };
  for (const auto& [name, bytes] : cases) {
    RecordFault fault{};
    EXPECT_EQ(read("HVEndSearchFeedback", bytes, &fault), nullptr) << name;
    EXPECT_EQ(fault, RecordFault::Malformed) << name;
  }
}

// A message with one number in field 2, and the size of that field's table.
TEST(RecordMessagesTest, RefusesNumbersThatNameNothing) {
  const std::vector<std::pair<const char*, std::int64_t>> tables = {
      {"HVVisibleResultsFeedback", 15},
      {"HVStartSearchFeedback", 20},
      {"HVSearchViewAppearFeedback", 27},
      {"HVSearchViewDisappearFeedback", 25},
      {"HVResultEngagementFeedback", 14},
      {"HVCardSectionEngagementFeedback", 10},
      {"HVMapsCardSectionEngagementFeedback", 223},
      {"HVStoreCardSectionEngagementFeedback", 6},
      {"HVCardViewDisappearFeedback", 7},
      {"HVCustomFeedback", 4},
      {"HVClearInputFeedback", 4},
      {"ZelkorSessionEndFeedback", 7},
      {"ZLKSkipSearchFeedback", 7},
      {"ZLKCacheHitFeedback", 7},
      {"HVResultGradingFeedback", 6},
  };
  for (const auto& [className, size] : tables) {
    SCOPED_TRACE(className);
    for (const std::int64_t value : {std::int64_t{-1}, std::int64_t{0}, size - 1, size}) {
      std::string bytes = "\x10";
      for (auto rest = static_cast<std::uint64_t>(value);;) {
        bytes += static_cast<char>((rest & 0x7F) | (rest > 0x7F ? 0x80 : 0));
        if ((rest >>= 7) == 0) break;
      }
      RecordFault fault{};
      const bool isKnown = value >= 0 && value < size;
      EXPECT_EQ(read(className, bytes, &fault) != nullptr, isKnown) << value;
      EXPECT_EQ(fault, isKnown ? RecordFault::None : RecordFault::UnknownValue) << value;
    }
  }
}

TEST(RecordMessagesTest, TakesOnlySoManyItems) {
  const auto visible = [](std::size_t results) {
    std::string bytes;
    for (std::size_t i = 0; i < results; ++i) bytes.append("\x1A\x00", 2);
    return bytes;
  };
  EXPECT_TRUE(read("HVVisibleResultsFeedback", visible(RecordReader::kMaximumItems)));
  RecordFault fault{};
  EXPECT_FALSE(read("HVVisibleResultsFeedback", visible(RecordReader::kMaximumItems + 1), &fault));
  EXPECT_EQ(fault, RecordFault::TooManyItems);
}

TEST(StoredFeedbackTest, ARecordKeepsItsClassAndItsNumbers) {
  auto feedback = std::make_shared<ZLKCacheHitFeedback>(4, "snow", "U");
  feedback->timestamp = 9;
  std::string bytes = "before";
  appendStoredFeedback({feedback, -3, 4, 5}, bytes);
  corezelkor::CZZelkorFeedback message;
  ASSERT_TRUE(message.ParseFromString(bytes.substr(6)));
  EXPECT_EQ(message.payload().feedback_class(), "ZLKCacheHitFeedback");
  EXPECT_EQ(message.payload().feedback(), written(*feedback));
  EXPECT_EQ(message.query_id(), -3);
  EXPECT_EQ(message.client_query_id(), 4u);
  EXPECT_EQ(message.rel_timestamp(), 5u);
  RecordFault fault{};
  const auto record = readStoredFeedback(std::string_view(bytes).substr(6), fault);
  ASSERT_TRUE(record);
  EXPECT_EQ(written(*record->feedback), written(*feedback));
  EXPECT_EQ(record->queryId, -3);

  message.mutable_payload()->set_feedback_class("HVStrangeFeedback");
  EXPECT_FALSE(readStoredFeedback(message.SerializeAsString(), fault));
  message.clear_payload();
  EXPECT_FALSE(readStoredFeedback(message.SerializeAsString(), fault));
  EXPECT_EQ(fault, RecordFault::Malformed);
}

TEST(VocabularyTest, TheMapsTableIsSparse) {
  using vocabulary::kMapsFeedbackTypes;
  EXPECT_EQ(std::count_if(kMapsFeedbackTypes.begin(), kMapsFeedbackTypes.end(),
                          [](const auto& name) { return name.data() != nullptr; }),
            22);
  EXPECT_EQ(kMapsFeedbackTypes[127], "flyover_tour");
  EXPECT_EQ(kMapsFeedbackTypes[222].data(), nullptr);
  EXPECT_DEATH((void)Term<vocabulary::kTopHitTypes>(3).text(), "vocabulary index out of range");
}

TEST(PunchoutTest, PrefersTheFirstAbsoluteAddress) {
  const std::vector<std::pair<std::vector<std::string>, std::optional<std::string>>> cases = {
      {{}, std::nullopt},
      {{"", "/path", "page.html", "1a:b", ":x", "https:"}, std::nullopt},
      {{"relative", "maps+x-1.y:here", "https://later.example"}, "maps+x-1.y:here"},
  };
  for (const auto& [urls, expected] : cases) {
    EXPECT_EQ((HVPunchout{{}, {}, urls}.preferredOpenableURL()), expected);
  }
}

}  // namespace
}  // namespace zelkor
