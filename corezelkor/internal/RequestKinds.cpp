#include "corezelkor/internal/RequestKinds.h"

#include <algorithm>

namespace zelkor {
namespace {

constexpr RequestField kCommonFields[] = {
    {"queryId", &ZLKRequest::queryId},
    {"clientQueryId", &ZLKRequest::clientQueryId},
    {"queryString", &ZLKRequest::queryString},
    {"triggerEvent", &ZLKRequest::triggerEvent},
    {"keyboardInputMode", &ZLKRequest::keyboardInputMode},
    {"scale", &ZLKRequest::scale},
    {"topics", &ZLKRequest::topics},
    {"uuid", &ZLKRequest::uuid},
    {"verboseReply", &ZLKRequest::verboseReply},
    {"queryItems", &ZLKRequest::queryItems},
};

// A field of that class alone.
template <typename Request, typename T>
constexpr RequestField own(std::string_view key, T Request::*place) {
  return {key, static_cast<T ZLKRequest::*>(place)};
}

constexpr RequestField kMoreResultsFields[] = {
    own("moreResultsURL", &ZLKMoreResultsRequest::moreResultsURL)};
constexpr RequestField kCardFields[] = {own("cardURL", &ZLKCardRequest::cardURL)};
constexpr RequestField kLookupFields[] = {
    own("appBundleId", &ZLKLookupRequest::appBundleId),
    own("domain", &ZLKLookupRequest::domain),
    own("lookupSelectionType", &ZLKLookupRequest::lookupSelectionType),
    own("queryContext", &ZLKLookupRequest::queryContext),
};

template <typename Request>
std::shared_ptr<ZLKRequest> make() {
  return std::make_shared<Request>();
}

template <typename Request>
constexpr RequestKind kind(std::string_view name, std::span<const RequestField> fields = {}) {
  return {name, &typeid(Request), make<Request>, fields};
}

}  // namespace

constexpr RequestKind kinds::search = kind<ZLKSearchRequest>("search");
constexpr RequestKind kinds::moreResults =
    kind<ZLKMoreResultsRequest>("moreResults", kMoreResultsFields);
constexpr RequestKind kinds::card = kind<ZLKCardRequest>("card", kCardFields);
constexpr RequestKind kinds::zeroKeyword = kind<ZLKZeroKeywordRequest>("zeroKeyword");
constexpr RequestKind kinds::lookup = kind<ZLKLookupRequest>("lookup", kLookupFields);
constexpr RequestKind kinds::flightLookup = kind<ZLKFlightLookupRequest>("flightLookup");
constexpr RequestKind kinds::flightSearch = kind<ZLKFlightSearchRequest>("flightSearch");

namespace {

constexpr const RequestKind* kAllKinds[] = {
    &kinds::search, &kinds::moreResults,  &kinds::card,        &kinds::zeroKeyword,
    &kinds::lookup, &kinds::flightLookup, &kinds::flightSearch};

template <typename Predicate>
const RequestKind* kindThat(Predicate fits) {
  const auto* found =
      std::ranges::find_if(kAllKinds, [&](const auto* kind) { return fits(*kind); });
  return found == std::end(kAllKinds) ? nullptr : *found;
}

}  // namespace

std::span<const RequestField> commonRequestFields() { return kCommonFields; }

const RequestKind* requestKindNamed(std::string_view name) {
  return kindThat([&](const RequestKind& kind) { return kind.name == name; });
}

const RequestKind* requestKindOf(const ZLKRequest& request) {
  return kindThat([&](const RequestKind& kind) { return *kind.type == typeid(request); });
}

}  // namespace zelkor
