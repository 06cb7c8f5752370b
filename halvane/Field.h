#pragma once

#include <cstdint>
#include <string_view>
#include <type_traits>

#include "base/Namespace.h"

namespace zelkor {

// Whether a field is part of what is sent, and how.
enum class FieldUse {
  Sent,        // always: null when it has no value
  SentIfSet,   // only when it has a value
  StoredOnly,  // in messages and files, never sent as it is
};

// One field of a record: its number in messages, its key in what is sent, and where it is. A record
// describes itself once, as `static constexpr auto fields()`, a tuple of these in the order of the
// keys; the stored form, the checks and the sent form all follow from that.
template <typename Record, typename Value>
struct Field {
  using ValueType = Value;

  std::uint32_t number;
  std::string_view key;
  Value Record::*member;
  FieldUse use;
};

template <typename Record, typename Value>
constexpr Field<Record, Value> sent(std::uint32_t number, std::string_view key,
                                    Value Record::*member) {
  return {number, key, member, FieldUse::Sent};
}

template <typename Record, typename Value>
constexpr Field<Record, Value> sentIfSet(std::uint32_t number, std::string_view key,
                                         Value Record::*member) {
  return {number, key, member, FieldUse::SentIfSet};
}

template <typename Record, typename Value>
constexpr Field<Record, Value> stored(std::uint32_t number, std::string_view key,
                                      Value Record::*member) {
  return {number, key, member, FieldUse::StoredOnly};
}

// Of a field's type.
template <typename OneField>
using ValueOf = typename std::remove_cvref_t<OneField>::ValueType;

// A record's fields, made once: a message may hold many short records.
template <typename Record>
inline constexpr auto kFieldsOf = Record::fields();

}  // namespace zelkor
