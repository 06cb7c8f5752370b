#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <tuple>
#include <vector>

#include "halvane/Field.h"
#include "halvane/JsonText.h"
#include "halvane/Packed.h"
#include "halvane/PackedList.h"
#include "halvane/Vocabulary.h"

namespace zelkor {

// What feedback speaks of. Values; a field that is not set is sent as null.

struct HVError {
  std::int64_t code = 0;
  std::optional<std::string> domain;
  std::optional<std::string> reason;

  friend bool operator==(const HVError&, const HVError&) = default;

  static constexpr auto fields() {
    using T = HVError;
    return std::tuple{sent(1, "code", &T::code), sent(2, "domain", &T::domain),
                      sent(3, "reason", &T::reason)};
  }
};

// A way out of the search: into an application or to a page.
struct HVPunchout {
  std::optional<std::string> name;
  std::optional<std::string> bundleIdentifier;
  PackedList<std::string> urls;  // best first

  // The first that is absolute; none when none is.
  std::optional<std::string> preferredOpenableURL() const;

  static constexpr auto fields() {
    using T = HVPunchout;
    return std::tuple{stored(1, "name", &T::name),
                      stored(2, "bundle_identifier", &T::bundleIdentifier),
                      stored(3, "urls", &T::urls)};
  }
};

struct HVActionItem {
  std::optional<std::string> label;
  std::optional<HVPunchout> punchout;

  static constexpr auto fields() {
    using T = HVActionItem;
    return std::tuple{stored(1, "label", &T::label), stored(2, "punchout", &T::punchout)};
  }
};

struct HVSearchResult {
  std::optional<std::string> identifier;
  std::optional<double> score;
  Term<vocabulary::kResultTypes> resultType;
  bool publiclyIndexable = false;
  Term<vocabulary::kTopHitTypes> topHit;
  std::optional<std::string> sectionBundleIdentifier;
  std::optional<std::string> bundleIdentifier;
  std::optional<std::string> fbr;
  std::optional<JsonText> localFeatures;
  std::optional<std::string> correctedQuery;
  bool staticCorrection = false;
  bool hasTitle = false;  // a title may be there without a text
  std::optional<std::string> title;
  std::optional<HVPunchout> punchout;
  std::optional<HVActionItem> action;
  std::uint64_t queryId = 0;  // the client query identifier

  static constexpr auto fields() {
    using T = HVSearchResult;
    return std::tuple{sent(1, "id", &T::identifier),
                      sent(2, "score", &T::score),
                      sent(3, "result_type", &T::resultType),
                      sent(4, "publicly_indexable", &T::publiclyIndexable),
                      sent(5, "top_hit", &T::topHit),
                      sent(6, "section_bundle_id", &T::sectionBundleIdentifier),
                      sent(7, "bundle_id", &T::bundleIdentifier),
                      sent(8, "fbr", &T::fbr),
                      sent(9, "local_features", &T::localFeatures),
                      sent(10, "corrected_query", &T::correctedQuery),
                      sent(11, "static_correction", &T::staticCorrection),
                      stored(12, "has_title", &T::hasTitle),
                      stored(13, "title", &T::title),
                      stored(14, "punchout", &T::punchout),
                      stored(15, "action", &T::action),
                      stored(16, "query_id", &T::queryId)};
  }
};

struct HVResultSection {
  std::optional<std::string> identifier;
  std::optional<double> score;
  std::optional<std::string> bundleIdentifier;
  PackedList<HVSearchResult> results;

  static constexpr auto fields() {
    using T = HVResultSection;
    return std::tuple{sent(1, "id", &T::identifier), sent(2, "score", &T::score),
                      sent(3, "bundle_id", &T::bundleIdentifier), sent(4, "results", &T::results)};
  }
};

struct HVSuggestion {
  std::optional<std::string> identifier;
  std::optional<std::string> suggestion;
  std::optional<double> score;
  Term<vocabulary::kSuggestionTypes> suggestionType;
  std::optional<std::string> fbr;  // of the daemon's own suggestions only

  static constexpr auto fields() {
    using T = HVSuggestion;
    return std::tuple{sent(1, "id", &T::identifier), sent(2, "suggestion", &T::suggestion),
                      sent(3, "score", &T::score), sent(4, "suggestion_type", &T::suggestionType),
                      sentIfSet(5, "fbr", &T::fbr)};
  }
};

// Where a ranking put a result, and what stood behind it.
struct HVResultRanking {
  std::int32_t localResultPosition = 0;
  PackedList<HVSearchResult> hiddenResults;
  PackedList<HVSearchResult> duplicateResults;
  Packed<HVSearchResult> result;

  static constexpr auto fields() {
    using T = HVResultRanking;
    return std::tuple{sent(1, "local_result_position", &T::localResultPosition),
                      sent(2, "hidden_results", &T::hiddenResults),
                      sent(3, "duplicate_results", &T::duplicateResults),
                      stored(4, "result", &T::result)};
  }
};

struct HVSectionRanking {
  std::int32_t localSectionPosition = 0;
  PackedList<HVResultRanking> results;
  Packed<HVResultSection> section;

  static constexpr auto fields() {
    using T = HVSectionRanking;
    return std::tuple{sent(1, "local_section_position", &T::localSectionPosition),
                      sent(2, "results", &T::results), stored(3, "section", &T::section)};
  }
};

}  // namespace zelkor
