// SPDX-License-Identifier: Apache-2.0
#pragma once
#include <memory>
#include <type_traits>
#include <utility>

namespace qori::test {

/// Something to be called while a function runs. A function that takes one is compiled once for all that it is given,
/// which for the sweeps are some thousand lambdas.
template <class Signature>
class FunctionRef;

template <class Result, class... Arguments>
class FunctionRef<Result(Arguments...)> {
public:
    template <class F>
    requires(!std::is_same_v<std::remove_cvref_t<F>, FunctionRef> && std::is_object_v<std::remove_reference_t<F>>)
        FunctionRef(F&& callable)
        : object_(const_cast<void*>(static_cast<const void*>(std::addressof(callable)))),
          invoke_([](void* object, Arguments... arguments) -> Result {
              return (*static_cast<std::remove_reference_t<F>*>(object))(std::forward<Arguments>(arguments)...);
          }) {}

    FunctionRef(Result (&function)(Arguments...))
        : object_(reinterpret_cast<void*>(&function)), invoke_([](void* object, Arguments... arguments) -> Result {
              return reinterpret_cast<Result (*)(Arguments...)>(object)(std::forward<Arguments>(arguments)...);
          }) {}

    Result operator()(Arguments... arguments) const { return invoke_(object_, std::forward<Arguments>(arguments)...); }

private:
    void* object_;
    Result (*invoke_)(void*, Arguments...);
};

}  // namespace qori::test
