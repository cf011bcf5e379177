// SPDX-License-Identifier: Apache-2.0
// What the norms, sums and dot products accumulate: a magnitude (of a value or of a difference) under one of three
// norms.
#pragma once
#include "reduce.h"
#include "reduce_float.h"
#include "reduce_lanes.h"

namespace qori::kernels {

/// |a - b| of two vectors in memory, each loaded once.
template <class T>
QORI_INLINE Vec<Magnitude<T>> magnitude(Vec<T> a, Vec<T> b) {
    if constexpr (std::is_integral_v<T>) {
        loadOnce(a.v);
        loadOnce(b.v);
    }
    return absoluteDifference(a, b);
}
QORI_INLINE Doubles magnitude(Doubles a, Doubles b) { return magnitude(a - b); }

template <class T, class... Other>
QORI_INLINE auto magnitude(VectorPair<T> a, Other... b) {
    return VectorPair<Magnitude<T>>{magnitude(a.first, b.first...), magnitude(a.second, b.second...)};
}

/// What is squared: integers by their magnitude, which has no sign to care for, floats as they are.
template <class... V>
QORI_INLINE auto difference(V... v) {
    return magnitude(v...);
}
QORI_INLINE Vec<float> difference(Vec<float> a) { return a; }
QORI_INLINE Vec<float> difference(Vec<float> a, Vec<float> b) { return {_mm256_sub_ps(a.v, b.v)}; }
QORI_INLINE Doubles difference(Doubles a) { return a; }
QORI_INLINE Doubles difference(Doubles a, Doubles b) { return a - b; }

template <class L>
struct Values {
    using Lanes = L;
    template <class V>
    QORI_INLINE static void feed(Lanes& lanes, V a) {
        lanes.add(a);
    }
};

/// Their sum or their maximum, as the lanes have it.
template <class L>
struct Magnitudes {
    using Lanes = L;
    template <class... V>
    QORI_INLINE static void feed(Lanes& lanes, V... v) {
        lanes.add(magnitude(v...));
    }
};

template <class L>
struct Squares {
    using Lanes = L;
    template <class... V>
    QORI_INLINE static void feed(Lanes& lanes, V... v) {
        const auto d = difference(v...);
        lanes.add(d, d);
    }
};

template <class L>
struct Products {
    using Lanes = L;
    template <class V>
    QORI_INLINE static void feed(Lanes& lanes, V a, V b) {
        lanes.add(a, b);
    }
};

/// For one channel of bytes, neighbours may be added: these need fewer operations than their general forms.
struct ByteMagnitudes {
    using Lanes = SadLanes;
    QORI_INLINE static void feed(Lanes& lanes, Bytes a) { lanes.add(a, zero<uint8_t>()); }
    QORI_INLINE static void feed(Lanes& lanes, Bytes a, Bytes b) { lanes.add(a, b); }
};

struct ByteSquares {
    using Lanes = PairProductLanes;
    QORI_INLINE static void feed(Lanes& lanes, Bytes a) { lanes.add(a, a); }
    QORI_INLINE static void feed(Lanes& lanes, Bytes a, Bytes b) { lanes.addSquaredDifference(a, b); }
};

}  // namespace qori::kernels
