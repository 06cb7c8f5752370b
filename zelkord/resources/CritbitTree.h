#pragma once

#include <boost/smart_ptr/intrusive_ptr.hpp>
#include <cstdint>
#include <string_view>

#include "zelkord/resources/critbit.h"

namespace zelkord {

// An ordered map from texts to reference-counted objects, made for finding all keys with a prefix.
// It holds one reference to each value. Keys hold no zero byte: `setObject` refuses one that does.
//
// Threading: none inside; one queue owns a tree.
template <typename Object>
class CritbitTree final {
 public:
  using Pointer = boost::intrusive_ptr<Object>;

  CritbitTree() { tree_.releaseValue = _valueRelease; }
  CritbitTree(const CritbitTree&) = delete;
  CritbitTree& operator=(const CritbitTree&) = delete;
  ~CritbitTree() { critbit_clear(tree_); }

  // False when nothing was done: out of memory, a zero byte in the key, or the key has this very
  // object.
  bool setObject(const Pointer& object, std::string_view key) {
    // The reference that the tree is going to hold exists before the old value's last one may go.
    intrusive_ptr_add_ref(object.get());
    if (critbit_insert(tree_, key, _erased(object.get()), true) != CritbitInsertion::NothingDone)
      return true;
    intrusive_ptr_release(object.get());
    return false;
  }

  // Null when the key is absent. Valid until the tree drops it.
  Object* objectForKey(std::string_view key) const {
    void* value = nullptr;
    return critbit_contains(tree_, key, &value) ? static_cast<Object*>(value) : nullptr;
  }

  void removeObjectForKey(std::string_view key) { critbit_delete(tree_, key); }
  void removeAllObjects() { critbit_clear(tree_); }
  std::uint64_t count() const { return tree_.count; }

  // Calls `visit(std::string_view key, Object& object, bool& stop)` for every key that begins with
  // the prefix, with its object, in ascending byte order; setting the flag ends the walk. The call
  // must not change the tree.
  template <typename Visit>
  void keysMatchingPrefix(std::string_view prefix, const Visit& visit) const {
    auto* top = tree_.root && prefix.data() ? critbit_prefixed(tree_.root, prefix) : nullptr;
    if (!top) return;
    critbit_visit(top, [&visit](const CritbitLeaf& leaf) {
      bool stop = false;
      visit(std::string_view(leaf.key()), *static_cast<Object*>(leaf.value), stop);
      return stop ? 0 : 1;
    });
  }

 private:
  static void* _erased(Object* object) {
    return const_cast<void*>(static_cast<const void*>(object));
  }
  static void _valueRelease(void* value) { intrusive_ptr_release(static_cast<Object*>(value)); }

  CritbitRecord tree_;
};

}  // namespace zelkord
