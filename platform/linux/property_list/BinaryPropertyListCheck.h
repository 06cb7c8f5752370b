#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// Limits for a property list that comes from outside.
struct PropertyListLimits {
  std::size_t depth = 512;
  // Values of the tree that it stands for: objects may share children, so a small file can mean a
  // huge tree.
  std::size_t values = 1'000'000;
  // Of the texts and data in that tree.
  std::size_t bytes = 64u << 20;
};

// Checks that the bytes are a binary property list whose objects, references and sizes lie within
// the file and within the limits, and whose texts are whole ASCII or UTF-16 texts without zero
// characters. Empty when they are, else a one-line problem.
//
// The decoder trusts such files more than one should: it recurses, copies a shared object for each
// reference, and ends the process at a text with a zero character.
std::string checkBinaryPropertyList(std::string_view bytes, const PropertyListLimits& limits = {});

}  // namespace zelkord
