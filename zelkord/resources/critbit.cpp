#include "zelkord/resources/critbit.h"

#include <algorithm>
#include <new>
#include <utility>

namespace zelkord {
namespace {

static_assert(__STDCPP_DEFAULT_NEW_ALIGNMENT__ >= 8, "the low bit of node addresses is a tag");

CritbitNode* tagged(CritbitInner* inner) {
  return reinterpret_cast<CritbitNode*>(reinterpret_cast<std::uintptr_t>(inner) + kCritbitInnerTag);
}
CritbitNode* tagged(CritbitLeaf* leaf) { return reinterpret_cast<CritbitNode*>(leaf); }

// Such a key cannot be stored, so no tree has it.
bool hasZeroByte(std::string_view key) { return key.find('\0') != std::string_view::npos; }

bool hasKey(const CritbitLeaf& leaf, std::string_view key) {
  return startsWith(leaf, key) && leaf.key()[key.size()] == '\0';
}

void dropLeaf(const CritbitRecord& tree, CritbitLeaf* leaf) {
  if (tree.releaseValue) tree.releaseValue(leaf->value);
  ::operator delete(leaf);
}

// Where a new key parts from the leaf that it leads to.
struct Difference {
  std::size_t byte = 0;
  std::uint8_t bits = 0;  // none: the key is the leaf's
};

Difference differenceFrom(const CritbitLeaf& leaf, std::string_view key) {
  for (std::size_t i = 0; i < key.size(); ++i) {
    const auto difference = static_cast<std::uint8_t>(key[i] ^ leaf.key()[i]);
    if (difference) return {i, difference};
  }
  return {key.size(), static_cast<std::uint8_t>(leaf.key()[key.size()])};
}

std::uint8_t allButHighest(std::uint8_t difference) {
  unsigned spread = difference;
  spread |= spread >> 1;
  spread |= spread >> 2;
  spread |= spread >> 4;
  return static_cast<std::uint8_t>((spread & ~(spread >> 1)) ^ 255u);
}

CritbitInsertion replaceValue(const CritbitRecord& tree, CritbitLeaf& leaf, void* value,
                              bool replace) {
  if (leaf.value == value) return CritbitInsertion::NothingDone;
  if (!replace) return CritbitInsertion::KeyPresent;
  void* old = std::exchange(leaf.value, value);
  if (tree.releaseValue) tree.releaseValue(old);
  return CritbitInsertion::KeyPresent;
}

// The slot into which a node that parts at (byte, otherbits) goes: positions grow along every path.
CritbitNode** slotFor(CritbitRecord& tree, std::string_view key, const CritbitInner& added) {
  auto** slot = &tree.root;
  auto* node = tree.root;
  while (isInner(node)) {
    auto& inner = *asInner(node);
    if (inner.byte > added.byte) break;
    if (inner.byte == added.byte && inner.otherbits > added.otherbits) break;
    const auto c = byteAt(inner, key);
    slot = &inner.child[directionOf(inner, c)];
    node = childOf(inner, c);
  }
  return slot;
}

CritbitInsertion insertBeside(CritbitRecord& tree, const CritbitLeaf& best, std::string_view key,
                              Difference difference, void* value) {
  void* memory = ::operator new(sizeof(CritbitInner), std::nothrow);
  if (!memory) return CritbitInsertion::NothingDone;
  auto* inner = new (memory) CritbitInner{{nullptr, nullptr},
                                          static_cast<std::uint32_t>(difference.byte),
                                          allButHighest(difference.bits)};
  auto* leaf = new_external_node(key, value);
  if (!leaf) {
    ::operator delete(inner);
    return CritbitInsertion::NothingDone;
  }
  const auto direction =
      directionOf(*inner, static_cast<std::uint8_t>(best.key()[difference.byte]));
  auto** slot = slotFor(tree, key, *inner);
  inner->child[1 - direction] = tagged(leaf);
  inner->child[direction] = *slot;
  *slot = tagged(inner);
  ++tree.count;
  return CritbitInsertion::Inserted;
}

}  // namespace

CritbitLeaf* new_external_node(std::string_view key, void* value) {
  void* memory = ::operator new(sizeof(CritbitLeaf) + key.size() + 1, std::nothrow);
  if (!memory) return nullptr;
  auto* leaf = new (memory) CritbitLeaf{value};
  *std::copy(key.begin(), key.end(), leaf->key()) = '\0';
  return leaf;
}

// Without a stack: an inner node's first child, once freed, holds the way back.
void traverse(const CritbitRecord& tree, CritbitNode* node) {
  CritbitNode* parent = nullptr;
  for (;;) {
    while (isInner(node)) {
      auto* inner = asInner(node);
      auto* first = std::exchange(inner->child[0], parent);
      parent = node;
      node = first;
    }
    dropLeaf(tree, asLeaf(node));
    while (parent && !asInner(parent)->child[1]) {
      auto* done = asInner(parent);
      parent = done->child[0];
      ::operator delete(done);
    }
    if (!parent) return;
    node = std::exchange(asInner(parent)->child[1], nullptr);
  }
}

CritbitWalk allprefixed_traverse(CritbitNode* node, CritbitHandler handler, void* argument) {
  const int answer =
      critbit_visit(node, [=](const CritbitLeaf& leaf) { return handler(leaf.key(), argument); });
  if (answer == 1) return CritbitWalk::RanToTheEnd;
  return answer == 0 ? CritbitWalk::Stopped : CritbitWalk::Failed;
}

bool critbit_contains(const CritbitRecord& tree, std::string_view key, void** value) {
  if (!tree.root) return false;
  const auto* leaf = find_next_external_node(tree.root, key);
  if (!hasKey(*leaf, key)) return false;
  if (value) *value = leaf->value;
  return true;
}

CritbitInsertion critbit_insert(CritbitRecord& tree, std::string_view key, void* value,
                                bool replace) {
  if (hasZeroByte(key)) return CritbitInsertion::NothingDone;
  if (!tree.root) {
    auto* leaf = new_external_node(key, value);
    if (!leaf) return CritbitInsertion::NothingDone;
    tree.root = tagged(leaf);
    ++tree.count;
    return CritbitInsertion::Inserted;
  }
  auto* best = find_next_external_node(tree.root, key);
  const auto difference = differenceFrom(*best, key);
  if (difference.bits == 0) return replaceValue(tree, *best, value, replace);
  return insertBeside(tree, *best, key, difference, value);
}

bool critbit_delete(CritbitRecord& tree, std::string_view key) {
  if (!tree.root) return false;
  auto** slot = &tree.root;
  auto* node = tree.root;
  CritbitNode** innerSlot = nullptr;
  CritbitInner* inner = nullptr;
  unsigned direction = 0;
  while (isInner(node)) {
    innerSlot = slot;
    inner = asInner(node);
    const auto c = byteAt(*inner, key);
    direction = directionOf(*inner, c);
    slot = &inner->child[direction];
    node = childOf(*inner, c);
  }
  if (!hasKey(*asLeaf(node), key)) return false;
  dropLeaf(tree, asLeaf(node));
  --tree.count;
  if (!inner) {
    tree.root = nullptr;
    return true;
  }
  *innerSlot = inner->child[1 - direction];
  ::operator delete(inner);
  return true;
}

void critbit_clear(CritbitRecord& tree) {
  if (tree.root) traverse(tree, tree.root);
  tree.root = nullptr;
  tree.count = 0;
}

CritbitWalk critbit_allprefixed(const CritbitRecord& tree, std::string_view prefix,
                                CritbitHandler handler, void* argument) {
  auto* top = tree.root && prefix.data() ? critbit_prefixed(tree.root, prefix) : nullptr;
  return top ? allprefixed_traverse(top, handler, argument) : CritbitWalk::RanToTheEnd;
}

}  // namespace zelkord
