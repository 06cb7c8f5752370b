#pragma once

#include "platform/api/PropertyList.h"

namespace zelkord {

// Binary property lists.
//
// Written: whole numbers as integers (above 2^63 - 1 as reals, which is what the format's readers
// agree on), the rest as it is. Null, not-a-number and infinity are dropped. Read: integers as 64
// bits with sign, dates as seconds since 1970, data as base64 text; what JSON has no value for is
// dropped.
//
// Threading: any thread.
// Errors: EINVAL with a reason: a text with a zero character or that is not UTF-8, nesting beyond
// 512, damaged bytes.
class BinaryPropertyLists final : public PropertyListCoder {
 public:
  std::optional<std::string> encode(const json::object& dictionary, Error* error) const override;
  std::optional<json::value> decode(std::string_view bytes, Error* error) const override;
};

}  // namespace zelkord
