// SPDX-License-Identifier: Apache-2.0
#pragma once
#include <bit>
#include <cstdint>
#include <memory>
#include <type_traits>
#include <utility>

namespace qori::test {

/// Floats are returned as their bits: where callers find them in the x87 unit, which 32-bit conventions want,
/// signalling NaNs have become quiet ones.
template <class T>
using ReturnedAs =
    std::conditional_t<std::is_same_v<T, float>, uint32_t, std::conditional_t<std::is_same_v<T, double>, uint64_t, T>>;

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
          invoke_([](void* object, Arguments... arguments) -> Returned {
              F& called = *static_cast<std::remove_reference_t<F>*>(object);
              if constexpr (isSame)
                  return called(std::forward<Arguments>(arguments)...);
              else
                  return std::bit_cast<Returned>(static_cast<Result>(called(std::forward<Arguments>(arguments)...)));
          }) {}

    FunctionRef(Result (&function)(Arguments...))
        : object_(reinterpret_cast<void*>(&function)), invoke_([](void* object, Arguments... arguments) -> Returned {
              const auto called = reinterpret_cast<Result (*)(Arguments...)>(object);
              if constexpr (isSame)
                  return called(std::forward<Arguments>(arguments)...);
              else
                  return std::bit_cast<Returned>(called(std::forward<Arguments>(arguments)...));
          }) {}

    __attribute__((always_inline)) Result operator()(Arguments... arguments) const {
        if constexpr (isSame)
            return invoke_(object_, std::forward<Arguments>(arguments)...);
        else
            return std::bit_cast<Result>(invoke_(object_, std::forward<Arguments>(arguments)...));
    }

private:
    using Returned = ReturnedAs<Result>;
    static constexpr bool isSame = std::is_same_v<Returned, Result>;

    void* object_;
    Returned (*invoke_)(void*, Arguments...);
};

}  // namespace qori::test
