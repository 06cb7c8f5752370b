#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

#include "zelkord/resources/CritbitNodes.h"

namespace zelkord {

// A crit-bit tree: an ordered map from byte strings without zero bytes to pointers. Finding a key,
// or all keys with a prefix, costs one pass over the key plus one node for each bit in which stored
// keys differ on the way.
//
// A key that ends before a node's byte counts as having a zero there, so walks go in ascending byte
// order, a key before those that extend it. A key that holds a zero byte is never found and not
// stored.
//
// Threading: none inside; one queue owns a tree. Ownership: the tree owns its nodes and its copies
// of the keys; values belong to whoever inserts, until the tree drops them through `releaseValue`.
struct CritbitRecord {
  CritbitNode* root = nullptr;
  std::uint64_t count = 0;
  void (*releaseValue)(void* value) = nullptr;  // null: values are not released
};

enum class CritbitInsertion {
  NothingDone = 0,  // out of memory, or the key already has this very value
  KeyPresent = 1,   // replaced when that was asked for
  Inserted = 2,
};

enum class CritbitWalk {
  Failed = -1,  // the handler answered something else than 0 or 1
  Stopped = 0,
  RanToTheEnd = 1,
};

// Gets a leaf's zero-terminated key, answers 1 to go on and 0 to stop. Must not change the tree.
using CritbitHandler = int (*)(const char* key, void* argument);

// `value` may be null.
bool critbit_contains(const CritbitRecord& tree, std::string_view key, void** value);
CritbitInsertion critbit_insert(CritbitRecord& tree, std::string_view key, void* value,
                                bool replace);
bool critbit_delete(CritbitRecord& tree, std::string_view key);
void critbit_clear(CritbitRecord& tree);
// Every key that begins with the prefix, ascending; none for a prefix without data.
CritbitWalk critbit_allprefixed(const CritbitRecord& tree, std::string_view prefix,
                                CritbitHandler handler, void* argument);

// The steps of the above.

// Null when memory is out. Until it is in a tree it belongs to the caller.
CritbitLeaf* new_external_node(std::string_view key, void* value);
// Frees the subtree, releasing the leaves' values.
void traverse(const CritbitRecord& tree, CritbitNode* node);
// Calls the handler on every leaf below the node, child 0 before child 1.
CritbitWalk allprefixed_traverse(CritbitNode* node, CritbitHandler handler, void* argument);

}  // namespace zelkord
