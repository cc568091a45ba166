#pragma once

#include <concepts>
#include <memory>
#include <type_traits>
#include <utility>

namespace corvane {

template <class Signature>
class FunctionRef;

/// A callable of the caller's, for the length of a call: nothing is copied or allocated, and code behind it is made
/// once, not for each kind of callable. Internal.
template <class Result, class... Arguments>
class FunctionRef<Result(Arguments...)> {
  public:
    template <class Function>
    requires(!std::same_as<std::remove_cvref_t<Function>, FunctionRef>) FunctionRef(Function&& function)
    noexcept  // NOLINT(google-explicit-constructor): it stands for the function
        : object_(const_cast<void*>(static_cast<const void*>(std::addressof(function)))),
          call_([](void* object, Arguments... arguments) -> Result {
              return (*static_cast<std::remove_reference_t<Function>*>(object))(std::forward<Arguments>(arguments)...);
          }) {}

    Result operator()(Arguments... arguments) const { return call_(object_, std::forward<Arguments>(arguments)...); }

  private:
    void* object_;
    Result (*call_)(void*, Arguments...);
};

}  // namespace corvane
