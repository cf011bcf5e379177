// SPDX-License-Identifier: Apache-2.0
// Reproducible values with a taste for extremes. The seed is printed at start; QORI_SEED sets it.
#pragma once
#include <cstdint>
#include <limits>
#include <type_traits>

#include "qori.h"

namespace qori::test {

class Random {
public:
    explicit Random(uint64_t seed) : state_(seed) {}

    /// The splitmix64 generator (Steele, Lea, Flood: Fast splittable pseudorandom number generators, 2014).
    uint64_t bits() {
        uint64_t z = state_ += 0x9E3779B97F4A7C15u;
        z = (z ^ z >> 30) * 0xBF58476D1CE4E5B9u;
        z = (z ^ z >> 27) * 0x94D049BB133111EBu;
        return z ^ z >> 31;
    }
    int below(int n) { return static_cast<int>((bits() >> 32) * static_cast<uint32_t>(n) >> 32); }
    bool oneIn(int n) { return below(n) == 0; }

    /// Integers: an extreme one time in four. Floats: any bit pattern one time in eight, else moderate values.
    template <class T>
    T value() {
        if constexpr (std::is_floating_point_v<T>) {
            if (oneIn(8)) {
                using Word = std::conditional_t<sizeof(T) == 4, uint32_t, uint64_t>;
                const auto word = static_cast<Word>(bits());
                T any;
                __builtin_memcpy(&any, &word, sizeof any);
                return any;
            }
            return static_cast<T>(static_cast<int32_t>(bits())) / static_cast<T>(1 << 20);
        } else if constexpr (requires(T t) { t.re; }) {
            using Part = decltype(T::re);
            return {value<Part>(), value<Part>()};
        } else {
            using Limits = std::numeric_limits<T>;
            constexpr T extremes[] = {Limits::min(),
                                      Limits::max(),
                                      0,
                                      1,
                                      static_cast<T>(Limits::max() - 1),
                                      static_cast<T>(Limits::max() / 2),
                                      static_cast<T>(-1),
                                      static_cast<T>(Limits::min() + 1)};
            return oneIn(4) ? extremes[below(8)] : static_cast<T>(bits());
        }
    }

private:
    uint64_t state_;
};

/// The generator of the running test: seeded per test, so that one test's draw does not depend on another.
Random& random();

/// Any integer, or a float of moderate size, which a sum of any length does not carry to infinity.
template <class T>
T drawPixel() {
    if constexpr (std::is_floating_point_v<T>)
        return static_cast<T>(static_cast<int32_t>(random().bits())) / T(1 << 20);
    else
        return random().value<T>();
}

}  // namespace qori::test
