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
};

// Checks that the bytes are a binary property list whose objects, references and sizes lie within
// the file and within the limits. Empty when they are, else a one-line problem.
//
// The decoder trusts such files more than one should: it recurses, and copies a shared object for
// each reference.
std::string checkBinaryPropertyList(std::string_view bytes, const PropertyListLimits& limits = {});

}  // namespace zelkord
