#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <typeinfo>
#include <variant>
#include <vector>

#include "corezelkor/Messages.h"

namespace zelkor {

// A field of requests: its key in messages, and where it is. The type of the place is the type in
// the message.
struct RequestField {
  std::string_view key;
  std::variant<bool ZLKRequest::*, std::uint32_t ZLKRequest::*, std::int64_t ZLKRequest::*,
               std::uint64_t ZLKRequest::*, double ZLKRequest::*, std::string ZLKRequest::*,
               std::vector<QueryItem> ZLKRequest::*>
      place;
};

// A kind of request as clients and the daemon exchange it.
struct RequestKind {
  std::string_view name;
  const std::type_info* type;  // of its class
  std::shared_ptr<ZLKRequest> (*make)();
  std::span<const RequestField> fields;  // besides those that every kind has
};

// The kinds, by the names of the operations that answer them.
namespace kinds {
extern const RequestKind search, moreResults, card, zeroKeyword, lookup, flightLookup, flightSearch;
}  // namespace kinds

// What every kind has.
std::span<const RequestField> commonRequestFields();

// Null for a name, or a class, that no kind has.
const RequestKind* requestKindNamed(std::string_view name);
const RequestKind* requestKindOf(const ZLKRequest& request);

// Calls `visit` with the key and the value of each of these fields.
template <typename Request, typename Visitor>
void visitFields(Request& request, std::span<const RequestField> fields, Visitor&& visit) {
  for (const auto& field : fields) {
    std::visit([&](auto place) { visit(field.key, request.*place); }, field.place);
  }
}

}  // namespace zelkor
