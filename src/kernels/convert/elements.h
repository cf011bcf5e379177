// SPDX-License-Identifier: Apache-2.0
// Row operations from one element type to another; `mayStream` where the result is wider than the source.
#pragma once
#include "kernels/pack_convert.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

template <class S, class D>
struct Widen {
    static constexpr bool mayStream = true;

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<S, n> a) const {
        return extend<D>(a);
    }
};

template <class S, class D>
struct ToFloat {
    static constexpr bool mayStream = true;

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<S, n> a) const {
        return toFloat(a);
    }
};

template <class S, class D>
struct ClampNegative {
    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<S, n> a) const {
        for (Vec<S>& v : a.v) v = larger(v, zero<S>());
        return extend<D>(a);
    }
};

template <class S, class D>
struct Narrow {
    static constexpr bool mayStream = true;

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<S, n> a) const {
        if constexpr (std::is_same_v<S, uint16_t>) {
            // Brought below 256 first: the narrowing would take 32768 and more for negative.
            Pack<int16_t, n> limited;
            for (int i = 0; i < Pack<S, n>::vectors; ++i) limited.v[i] = {smaller(a.v[i], splat<S>(255)).v};
            return narrow<D>(limited);
        } else {
            return narrow<D>(a);
        }
    }
};

template <class Mode, class D>
struct RoundFloats {
    static constexpr bool mayStream = true;

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<float, n> a) const {
        return roundTo<Mode, D>(a);
    }
};

/// The product by a power of two in two exact steps: neither factor leaves the normal range, and what the first one
/// makes subnormal is far below a half in the end.
template <class Mode, class D>
struct ScaleFloats {
    float first, second;

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<float, n> a) const {
        for (Vec<float>& v : a.v) v = v * splat(first) * splat(second);
        return roundTo<Mode, D>(a);
    }
};

/// Lanes of all ones, which is the maximum, where a test holds; else 0.
template <class Test>
struct MaximumWhere {
    Test test;

    template <int n>
    QORI_INLINE Pack<uint32_t, n> operator()(int, Pack<float, n> a) const {
        Pack<uint32_t, n> out;
        for (int i = 0; i < Pack<float, n>::vectors; ++i) out.v[i] = {test(a.v[i]).v};
        return out;
    }
};

}  // namespace qori::kernels
