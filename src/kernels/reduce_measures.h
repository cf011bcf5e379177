// SPDX-License-Identifier: Apache-2.0
// What the norms, sums and dot products accumulate: a magnitude (of a value or of a difference) under one of three norms.
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

/// Largest magnitude.
template <class T>
struct Largest {
    using Lanes = MaxLanes<Magnitude<T>>;
    template <class... V>
    QORI_INLINE static void feed(Lanes& lanes, V... v) { lanes.add(magnitude(v...)); }
};

/// Sum of magnitudes.
template <class T>
struct Magnitudes {
    using Lanes = SumLanes<Magnitude<T>>;
    template <class... V>
    QORI_INLINE static void feed(Lanes& lanes, V... v) { lanes.add(magnitude(v...)); }
};
template <>
struct Magnitudes<float> {
    using Lanes = FloatLanes;
    template <class... V>
    QORI_INLINE static void feed(Lanes& lanes, V... v) { lanes.add(magnitude(v...)); }
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
    QORI_INLINE static void feed(Lanes& lanes, Vec<T> a, Vec<T> b) { lanes.add(a, b); }
};
template <>
struct Products<float> {
    using Lanes = FloatLanes;
    QORI_INLINE static void feed(Lanes& lanes, Vec<float> a, Vec<float> b) { lanes.add(a, b); }
};

/// In double precision from the element on: the difference too is taken there.
struct AccurateMagnitudes {
    using Lanes = DoubleLanes;
    QORI_INLINE static void feed(Lanes& lanes, Vec<float> a) { lanes.add(toDoubles(magnitude(a))); }
    QORI_INLINE static void feed(Lanes& lanes, Vec<float> a, Vec<float> b) { lanes.add(magnitude(toDoubles(a) - toDoubles(b))); }
};

struct AccurateSquares {
    using Lanes = DoubleLanes;
    QORI_INLINE static void feed(Lanes& lanes, Vec<float> a) {
        const Doubles d = toDoubles(a);
        lanes.add(d, d);
    }
    QORI_INLINE static void feed(Lanes& lanes, Vec<float> a, Vec<float> b) {
        const Doubles d = toDoubles(a) - toDoubles(b);
        lanes.add(d, d);
    }
};

struct AccurateValues {
    using Lanes = DoubleLanes;
    QORI_INLINE static void feed(Lanes& lanes, Vec<float> a) { lanes.add(toDoubles(a)); }
};

struct AccurateProducts {
    using Lanes = DoubleLanes;
    QORI_INLINE static void feed(Lanes& lanes, Vec<float> a, Vec<float> b) { lanes.add(toDoubles(a), toDoubles(b)); }
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
