// SPDX-License-Identifier: Apache-2.0
// Reproducible values with a taste for extremes. The seed is printed at start; QORI_SEED sets it.
#pragma once
#include <cstdint>
#include <limits>
#include <random>
#include <type_traits>

namespace qori::test {

class Random {
public:
    explicit Random(uint64_t seed) : engine_(seed) {}

    uint64_t bits() { return engine_(); }
    int below(int n) { return static_cast<int>(bits() % static_cast<uint64_t>(n)); }
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
        } else {
            using Limits = std::numeric_limits<T>;
            constexpr T extremes[] = {Limits::min(), Limits::max(), 0, 1, static_cast<T>(Limits::max() - 1),
                                      static_cast<T>(Limits::max() / 2), static_cast<T>(-1), static_cast<T>(Limits::min() + 1)};
            return oneIn(4) ? extremes[below(8)] : static_cast<T>(bits());
        }
    }

private:
    std::mt19937_64 engine_;
};

/// The generator of the running test: seeded per test, so that one test's draw does not depend on another.
Random& random();

}  // namespace qori::test
