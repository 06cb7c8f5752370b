#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

namespace zelkord {

// The nodes of a crit-bit tree, and the two steps that looking things up consists of. They are here
// so that the loops of whoever walks a tree are compiled as one with what they do for each key.
//
// A node pointer's low bit tells its kind (nodes are 8-byte aligned):
//   0  leaf: the value pointer, the key's bytes, a zero byte
//   1  inner node at the address minus one
struct CritbitNode;  // tagged, never dereferenced as such

struct CritbitInner {
  CritbitNode* child[2];
  std::uint32_t byte;      // index of the byte in which the subtrees first differ
  std::uint8_t otherbits;  // every bit but the highest one in which they differ
};
static_assert(sizeof(CritbitInner) == 24);

// The key follows, then a zero byte.
struct CritbitLeaf {
  void* value;

  char* key() { return reinterpret_cast<char*>(this + 1); }
  const char* key() const { return reinterpret_cast<const char*>(this + 1); }
};

inline constexpr std::uintptr_t kCritbitInnerTag = 1;

inline bool isInner(const CritbitNode* node) {
  return (reinterpret_cast<std::uintptr_t>(node) & kCritbitInnerTag) != 0;
}
inline CritbitInner* asInner(CritbitNode* node) {
  return reinterpret_cast<CritbitInner*>(reinterpret_cast<std::uintptr_t>(node) - kCritbitInnerTag);
}
inline CritbitLeaf* asLeaf(CritbitNode* node) { return reinterpret_cast<CritbitLeaf*>(node); }

// Compares once, up to the first difference. A zero byte in the prefix differs from everything.
inline bool startsWith(const CritbitLeaf& leaf, std::string_view prefix) {
  const char* stored = leaf.key();
  for (const char c : prefix) {
    if (c != *stored++ || c == '\0') return false;
  }
  return true;
}

// What decides the direction at a node. A key that ends before the node's byte counts as having a
// zero there.
inline std::uint8_t byteAt(const CritbitInner& inner, std::string_view key) {
  return inner.byte < key.size() ? static_cast<std::uint8_t>(key[inner.byte]) : 0;
}
// 1 exactly when `c` has the critical bit.
inline unsigned directionOf(const CritbitInner& inner, std::uint8_t c) {
  return (1u + (inner.otherbits | c)) >> 8;
}

// The child in the direction of `c`. Both are on their way to the cache before `c` is known.
inline CritbitNode* childOf(const CritbitInner& inner, std::uint8_t c) {
  auto* zero = inner.child[0];
  auto* one = inner.child[1];
  __builtin_prefetch(zero);
  __builtin_prefetch(one);
  return directionOf(inner, c) != 0 ? one : zero;
}

// The leaf that the key's bits lead to: the best match, not necessarily equal.
inline CritbitLeaf* find_next_external_node(CritbitNode* root, std::string_view key) {
  auto* node = root;
  while (isInner(node)) {
    const auto& inner = *asInner(node);
    node = childOf(inner, byteAt(inner, key));
  }
  return asLeaf(node);
}

// The top of the subtree of all keys with the prefix; null when there are none.
inline CritbitNode* critbit_prefixed(CritbitNode* root, std::string_view prefix) {
  auto* node = root;
  auto* top = root;
  while (isInner(node)) {
    const auto& inner = *asInner(node);
    node = childOf(inner, byteAt(inner, prefix));
    if (inner.byte < prefix.size()) top = node;
  }
  return startsWith(*asLeaf(node), prefix) ? top : nullptr;
}

// Nodes that a walk still has to visit. Few fit without memory of their own; paths are as long as
// keys that share their beginnings make them.
class CritbitPath {
 public:
  bool empty() const { return size_ == 0; }
  void push(CritbitNode* node) {
    if (size_ < kInPlace) {
      inPlace_[size_] = node;
    } else {
      more_.push_back(node);
    }
    ++size_;
  }
  CritbitNode* pop() {
    if (--size_ < kInPlace) return inPlace_[size_];
    auto* node = more_.back();
    more_.pop_back();
    return node;
  }

 private:
  static constexpr std::size_t kInPlace = 64;

  std::size_t size_ = 0;
  std::array<CritbitNode*, kInPlace> inPlace_;  // as far as it is filled
  std::vector<CritbitNode*> more_;
};

// Calls `visit(leaf)` for every leaf below the node, child 0 before child 1, until it answers
// something else than 1; that is the result then, else 1. The call must not change the tree.
template <typename Visit>
int critbit_visit(CritbitNode* node, const Visit& visit) {
  CritbitPath path;
  for (;;) {
    while (isInner(node)) {
      auto* inner = asInner(node);
      __builtin_prefetch(inner->child[1]);
      path.push(inner->child[1]);
      node = inner->child[0];
    }
    if (const int answer = visit(*asLeaf(node)); answer != 1) return answer;
    if (path.empty()) return 1;
    node = path.pop();
  }
}

}  // namespace zelkord
