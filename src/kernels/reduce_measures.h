// SPDX-License-Identifier: Apache-2.0
// What the norms, sums and dot products accumulate: a magnitude (of a value or of a difference) under one of three
// norms.
#pragma once
#include "reduce.h"
#include "reduce_float.h"
#include "reduce_lanes.h"

namespace qori::kernels {

template <class T>
struct MagnitudeType {
    using type = std::make_unsigned_t<T>;
};
template <>
struct MagnitudeType<float> {
    using type = float;
};
/// Holds |a| and |a - b| of any two elements: |-32768| = 32768 and 32767 - -32768 = 65535 fit 16 unsigned bits.
template <class T>
using Magnitude = typename MagnitudeType<T>::type;

QORI_INLINE Vec<uint8_t> magnitude(Vec<uint8_t> a) { return a; }
QORI_INLINE Vec<uint16_t> magnitude(Vec<uint16_t> a) { return a; }
QORI_INLINE Vec<uint16_t> magnitude(Vec<int16_t> a) { return {_mm256_abs_epi16(a.v)}; }
QORI_INLINE Vec<uint32_t> magnitude(Vec<int32_t> a) { return {_mm256_abs_epi32(a.v)}; }
QORI_INLINE Vec<float> magnitude(Vec<float> a) { return {_mm256_andnot_ps(_mm256_set1_ps(-0.0f), a.v)}; }

QORI_INLINE Vec<uint8_t> magnitude(Vec<uint8_t> a, Vec<uint8_t> b) {
    return {_mm256_sub_epi8(_mm256_max_epu8(a.v, b.v), _mm256_min_epu8(a.v, b.v))};
}
QORI_INLINE Vec<uint16_t> magnitude(Vec<uint16_t> a, Vec<uint16_t> b) {
    return {_mm256_sub_epi16(_mm256_max_epu16(a.v, b.v), _mm256_min_epu16(a.v, b.v))};
}
QORI_INLINE Vec<uint16_t> magnitude(Vec<int16_t> a, Vec<int16_t> b) {
    return {_mm256_sub_epi16(_mm256_max_epi16(a.v, b.v), _mm256_min_epi16(a.v, b.v))};
}
QORI_INLINE Vec<float> magnitude(Vec<float> a, Vec<float> b) { return magnitude(Vec<float>{_mm256_sub_ps(a.v, b.v)}); }

template <class T, class... Other>
QORI_INLINE auto magnitude(TwoVectors<T> a, Other... b) {
    return TwoVectors<Magnitude<T>>{magnitude(a.first, b.first...), magnitude(a.second, b.second...)};
}

/// Largest magnitude.
template <class T>
struct Largest {
    using Lanes = MaxLanes<Magnitude<T>>;
    template <class... V>
    QORI_INLINE static void feed(Lanes& lanes, V... v) {
        lanes.add(magnitude(v...));
    }
};

/// Sum of magnitudes.
template <class T>
struct Magnitudes {
    using Lanes = SumLanes<Magnitude<T>>;
    template <class... V>
    QORI_INLINE static void feed(Lanes& lanes, V... v) {
        lanes.add(magnitude(v...));
    }
};
template <>
struct Magnitudes<float> {
    using Lanes = FloatLanes;
    template <class... V>
    QORI_INLINE static void feed(Lanes& lanes, V... v) {
        lanes.add(magnitude(v...));
    }
};

/// Sum of squared magnitudes.
template <class T>
struct Squares {
    using Lanes = ProductLanes<Magnitude<T>>;
    template <class... V>
    QORI_INLINE static void feed(Lanes& lanes, V... v) {
        const auto m = magnitude(v...);
        lanes.add(m, m);
    }
};
template <>
struct Squares<float> {
    using Lanes = FloatLanes;
    QORI_INLINE static void feed(Lanes& lanes, Vec<float> a) { lanes.add(a, a); }
    QORI_INLINE static void feed(Lanes& lanes, Vec<float> a, Vec<float> b) {
        const Vec<float> d{_mm256_sub_ps(a.v, b.v)};
        lanes.add(d, d);
    }
};

template <class T>
struct Values {
    using Lanes = SumLanes<T>;
    QORI_INLINE static void feed(Lanes& lanes, Vec<T> a) { lanes.add(a); }
};
template <>
struct Values<float> {
    using Lanes = FloatLanes;
    QORI_INLINE static void feed(Lanes& lanes, Vec<float> a) { lanes.add(a); }
};

template <class T>
struct Products {
    using Lanes = ProductLanes<T>;
    template <class V>
    QORI_INLINE static void feed(Lanes& lanes, V a, V b) {
        lanes.add(a, b);
    }
};
template <>
struct Products<float> {
    using Lanes = FloatLanes;
    QORI_INLINE static void feed(Lanes& lanes, Vec<float> a, Vec<float> b) { lanes.add(a, b); }
};

/// In double precision from the element on: the difference too is taken there.
struct Accurate {
    using Lanes = DoubleLanes;
    QORI_INLINE static Doubles loadVector(const float* p) { return loadDoubles(p); }
    QORI_INLINE static Doubles loadRest(const float* p, ptrdiff_t n) { return toDoubles(loadUpTo(p, n)); }
};

struct AccurateMagnitudes : Accurate {
    QORI_INLINE static void feed(Lanes& lanes, Doubles a) { lanes.add(magnitude(a)); }
    QORI_INLINE static void feed(Lanes& lanes, Doubles a, Doubles b) { lanes.add(magnitude(a - b)); }
};

struct AccurateSquares : Accurate {
    QORI_INLINE static void feed(Lanes& lanes, Doubles a) { lanes.add(a, a); }
    QORI_INLINE static void feed(Lanes& lanes, Doubles a, Doubles b) { lanes.add(a - b, a - b); }
};

struct AccurateValues : Accurate {
    QORI_INLINE static void feed(Lanes& lanes, Doubles a) { lanes.add(a); }
};

struct AccurateProducts : Accurate {
    QORI_INLINE static void feed(Lanes& lanes, Doubles a, Doubles b) { lanes.add(a, b); }
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

struct ByteProducts {
    using Lanes = PairProductLanes;
    QORI_INLINE static void feed(Lanes& lanes, Bytes a, Bytes b) { lanes.add(a, b); }
};

}  // namespace qori::kernels
