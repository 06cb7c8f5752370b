#include "zelkord/resources/critbit.h"

#include <cstring>
#include <new>
#include <utility>
#include <vector>

namespace zelkord {
namespace {

constexpr std::align_val_t kNodeAlignment{8};
constexpr std::uintptr_t kInnerTag = 1;

struct InnerNode {
  CritbitNode* child[2];
  std::uint32_t byte;      // index of the critical byte
  std::uint8_t otherbits;  // every bit but the critical one
};
static_assert(sizeof(InnerNode) == 24);

// The key follows, then a zero byte.
struct Leaf {
  void* value;

  char* key() { return reinterpret_cast<char*>(this + 1); }
  const char* key() const { return reinterpret_cast<const char*>(this + 1); }
};

// Such a key cannot be stored, so no tree has it.
bool hasZeroByte(std::string_view key) { return key.find('\0') != std::string_view::npos; }

std::uintptr_t bits(const CritbitNode* node) { return reinterpret_cast<std::uintptr_t>(node); }
bool isInner(const CritbitNode* node) { return (bits(node) & kInnerTag) != 0; }
InnerNode* asInner(CritbitNode* node) {
  return reinterpret_cast<InnerNode*>(bits(node) - kInnerTag);
}
Leaf* asLeaf(CritbitNode* node) { return reinterpret_cast<Leaf*>(node); }
CritbitNode* tagged(InnerNode* inner) {
  return reinterpret_cast<CritbitNode*>(reinterpret_cast<std::uintptr_t>(inner) + kInnerTag);
}
CritbitNode* tagged(Leaf* leaf) { return reinterpret_cast<CritbitNode*>(leaf); }

std::uint8_t byteAt(std::string_view key, std::size_t index) {
  return index < key.size() ? static_cast<std::uint8_t>(key[index]) : 0;
}

int directionOf(const InnerNode& inner, std::uint8_t c) { return (1 + (inner.otherbits | c)) >> 8; }
int directionOf(const InnerNode& inner, std::string_view key) {
  return directionOf(inner, byteAt(key, inner.byte));
}

// The leaf that the key's bits lead to: the best match, not necessarily equal.
Leaf* find_next_external_node(CritbitNode* node, std::string_view key) {
  while (isInner(node)) {
    const auto* inner = asInner(node);
    node = inner->child[directionOf(*inner, key)];
  }
  return asLeaf(node);
}

Leaf* new_external_node(std::string_view key, void* value) {
  void* memory = ::operator new(sizeof(Leaf) + key.size() + 1, kNodeAlignment, std::nothrow);
  if (!memory) return nullptr;
  auto* leaf = new (memory) Leaf{value};
  std::memcpy(leaf->key(), key.data(), key.size());
  leaf->key()[key.size()] = '\0';
  return leaf;
}

void freeNode(void* node) { ::operator delete(node, kNodeAlignment); }

bool hasKey(const Leaf& leaf, std::string_view key) {
  return std::strncmp(leaf.key(), key.data(), key.size()) == 0 && leaf.key()[key.size()] == '\0';
}

void dropLeaf(const CritbitRecord& tree, Leaf* leaf) {
  if (tree.releaseValue) tree.releaseValue(leaf->value);
  freeNode(leaf);
}

// Where a new key parts from the leaf that it leads to.
struct Difference {
  std::size_t byte = 0;
  std::uint8_t bits = 0;  // none: the key is the leaf's
};

Difference differenceFrom(const Leaf& leaf, std::string_view key) {
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

CritbitInsertion replaceValue(const CritbitRecord& tree, Leaf& leaf, void* value, bool replace) {
  if (leaf.value == value) return CritbitInsertion::NothingDone;
  if (!replace) return CritbitInsertion::KeyPresent;
  void* old = std::exchange(leaf.value, value);
  if (tree.releaseValue) tree.releaseValue(old);
  return CritbitInsertion::KeyPresent;
}

// The slot into which a node that parts at (byte, otherbits) goes: positions grow along every path.
CritbitNode** slotFor(CritbitRecord& tree, std::string_view key, const InnerNode& added) {
  auto** slot = &tree.root;
  while (isInner(*slot)) {
    auto* inner = asInner(*slot);
    if (inner->byte > added.byte) break;
    if (inner->byte == added.byte && inner->otherbits > added.otherbits) break;
    slot = &inner->child[directionOf(*inner, key)];
  }
  return slot;
}

CritbitInsertion insertBeside(CritbitRecord& tree, const Leaf& best, std::string_view key,
                              Difference difference, void* value) {
  void* memory = ::operator new(sizeof(InnerNode), kNodeAlignment, std::nothrow);
  if (!memory) return CritbitInsertion::NothingDone;
  auto* inner = new (memory) InnerNode{{nullptr, nullptr},
                                       static_cast<std::uint32_t>(difference.byte),
                                       allButHighest(difference.bits)};
  auto* leaf = new_external_node(key, value);
  if (!leaf) {
    freeNode(inner);
    return CritbitInsertion::NothingDone;
  }
  const int direction = directionOf(*inner, static_cast<std::uint8_t>(best.key()[difference.byte]));
  auto** slot = slotFor(tree, key, *inner);
  inner->child[1 - direction] = tagged(leaf);
  inner->child[direction] = *slot;
  *slot = tagged(inner);
  ++tree.count;
  return CritbitInsertion::Inserted;
}

// Calls the handler on every leaf below the node, child 0 before child 1. A stack of its own: depth
// is as much as the keys are long.
CritbitWalk allprefixed_traverse(CritbitNode* top, CritbitHandler handler, void* argument) {
  std::vector<CritbitNode*> waiting{top};
  while (!waiting.empty()) {
    auto* node = waiting.back();
    waiting.pop_back();
    while (isInner(node)) {
      waiting.push_back(asInner(node)->child[1]);
      node = asInner(node)->child[0];
    }
    const int answer = handler(asLeaf(node)->key(), asLeaf(node)->value, argument);
    if (answer != 1) return answer == 0 ? CritbitWalk::Stopped : CritbitWalk::Failed;
  }
  return CritbitWalk::RanToTheEnd;
}

// Frees the subtree, children before their node, without a stack: an inner node's first child, once
// freed, holds the way back.
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
      freeNode(done);
    }
    if (!parent) return;
    node = std::exchange(asInner(parent)->child[1], nullptr);
  }
}

}  // namespace

bool critbit_contains(const CritbitRecord& tree, std::string_view key, void** value) {
  if (!tree.root || hasZeroByte(key)) return false;
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
  if (!tree.root || hasZeroByte(key)) return false;
  auto** slot = &tree.root;
  CritbitNode** innerSlot = nullptr;
  int direction = 0;
  while (isInner(*slot)) {
    innerSlot = slot;
    auto* inner = asInner(*slot);
    direction = directionOf(*inner, key);
    slot = &inner->child[direction];
  }
  auto* leaf = asLeaf(*slot);
  if (!hasKey(*leaf, key)) return false;
  dropLeaf(tree, leaf);
  --tree.count;
  if (!innerSlot) {
    tree.root = nullptr;
    return true;
  }
  auto* inner = asInner(*innerSlot);
  *innerSlot = inner->child[1 - direction];
  freeNode(inner);
  return true;
}

void critbit_clear(CritbitRecord& tree) {
  if (tree.root) traverse(tree, tree.root);
  tree.root = nullptr;
  tree.count = 0;
}

CritbitWalk critbit_allprefixed(const CritbitRecord& tree, std::string_view prefix,
                                CritbitHandler handler, void* argument) {
  if (!tree.root || hasZeroByte(prefix)) return CritbitWalk::RanToTheEnd;
  auto* node = tree.root;
  auto* top = node;
  while (isInner(node)) {
    const auto* inner = asInner(node);
    node = inner->child[directionOf(*inner, prefix)];
    if (inner->byte < prefix.size()) top = node;
  }
  if (std::strncmp(asLeaf(node)->key(), prefix.data(), prefix.size()) != 0) {
    return CritbitWalk::RanToTheEnd;
  }
  return allprefixed_traverse(top, handler, argument);
}

}  // namespace zelkord
