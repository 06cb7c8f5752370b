#pragma once

#include <memory>
#include <type_traits>
#include <utility>

#include "base/Namespace.h"

namespace zelkor {

template <typename Signature>
class FunctionRef;

// A borrowed callable, valid for the call it is passed to: no allocation, no copy.
template <typename Result, typename... Arguments>
class FunctionRef<Result(Arguments...)> {
 public:
  template <typename Callable>
  requires(!std::is_same_v<std::remove_cvref_t<Callable>, FunctionRef>)
      FunctionRef(Callable&& callable)  // NOLINT(google-explicit-constructor)
      : object_(const_cast<void*>(static_cast<const void*>(std::addressof(callable)))),
        invoke_([](void* object, Arguments... arguments) -> Result {
          return (*static_cast<std::remove_reference_t<Callable>*>(object))(
              std::forward<Arguments>(arguments)...);
        }) {}

  Result operator()(Arguments... arguments) const {
    return invoke_(object_, std::forward<Arguments>(arguments)...);
  }

 private:
  void* object_;
  Result (*invoke_)(void*, Arguments...);
};

}  // namespace zelkor
