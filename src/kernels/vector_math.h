// SPDX-License-Identifier: Apache-2.0
// What kernels compute with vectors, per element type, and masks. Together with simd.h, which loads and stores, this is
// all that says what a vector and a mask are: kernels written in it name no instruction and no width.
//
// Float operations read the control register: they want the default one. Comparisons are ordered: NaN compares false.
#pragma once
#include "simd.h"

namespace qori {

// --- masks ----------------------------------------------------------------------------------------------------------

/// One truth per lane.
template <class T>
struct Mask {
    __m256i v;  ///< All bits of the lanes that it selects, none of the others.
};

template <class T>
QORI_INLINE Mask<T> operator&(Mask<T> a, Mask<T> b) {
    return {_mm256_and_si256(a.v, b.v)};
}
template <class T>
QORI_INLINE Mask<T> operator|(Mask<T> a, Mask<T> b) {
    return {_mm256_or_si256(a.v, b.v)};
}
template <class T>
QORI_INLINE Mask<T> operator~(Mask<T> a) {
    return {_mm256_xor_si256(a.v, _mm256_set1_epi8(-1))};
}

template <class T>
QORI_INLINE bool any(Mask<T> a) {
    return _mm256_testz_si256(a.v, a.v) == 0;
}
template <class T>
QORI_INLINE bool all(Mask<T> a) {
    return _mm256_movemask_epi8(a.v) == -1;
}

/// The first selected lane; there is one.
template <class T>
QORI_INLINE int firstSelected(Mask<T> a) {
    return __builtin_ctz(static_cast<unsigned>(_mm256_movemask_epi8(a.v))) / static_cast<int>(sizeof(T));
}

namespace detail {

alignas(kVectorBytes) inline constexpr uint8_t kOnesThenZeros[64] = {
    255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255,
    255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255};

}  // namespace detail

/// The first n lanes (0 to all).
template <class T>
QORI_INLINE Mask<T> firstLanes(ptrdiff_t n) {
    return {load(detail::kOnesThenZeros + kVectorBytes - n * static_cast<ptrdiff_t>(sizeof(T))).v};
}

// --- making and choosing --------------------------------------------------------------------------------------------

/// The value in every lane.
template <class T>
QORI_INLINE Vec<T> splat(T value) {
    if constexpr (std::is_same_v<T, float>)
        return {_mm256_set1_ps(value)};
    else if constexpr (std::is_same_v<T, double>)
        return {_mm256_set1_pd(value)};
    else if constexpr (sizeof(T) == 1)
        return {_mm256_set1_epi8(static_cast<char>(value))};
    else if constexpr (sizeof(T) == 2)
        return {_mm256_set1_epi16(static_cast<int16_t>(value))};
    else if constexpr (sizeof(T) == 4)
        return {_mm256_set1_epi32(static_cast<int32_t>(value))};
    else
        return {_mm256_set1_epi64x(static_cast<int64_t>(value))};
}

/// a where the mask selects, else b.
template <class T>
QORI_INLINE Vec<T> select(Mask<T> mask, Vec<T> a, Vec<T> b) {
    return fromInteger<T>(_mm256_blendv_epi8(toInteger(b.v), toInteger(a.v), mask.v));
}

/// a where the mask selects, else zeros.
template <class T>
QORI_INLINE Vec<T> selectOrZero(Mask<T> mask, Vec<T> a) {
    return fromInteger<T>(_mm256_and_si256(toInteger(a.v), mask.v));
}

// --- comparing ------------------------------------------------------------------------------------------------------

namespace detail {

/// 64-bit elements have no smallest and largest of their own, and compare as signed ones only.
template <class T>
QORI_INLINE __m256i isGreater64(Vec<T> a, Vec<T> b) {
    static_assert(std::is_signed_v<T> && sizeof(T) == 8);
    return _mm256_cmpgt_epi64(a.v, b.v);
}

}  // namespace detail

/// The smaller of two elements. Floats: b where they are equal or one of them is NaN.
template <class T>
QORI_INLINE Vec<T> smaller(Vec<T> a, Vec<T> b) {
    if constexpr (std::is_same_v<T, float>)
        return {_mm256_min_ps(a.v, b.v)};
    else if constexpr (std::is_same_v<T, double>)
        return {_mm256_min_pd(a.v, b.v)};
    else if constexpr (sizeof(T) == 1)
        return {std::is_signed_v<T> ? _mm256_min_epi8(a.v, b.v) : _mm256_min_epu8(a.v, b.v)};
    else if constexpr (sizeof(T) == 2)
        return {std::is_signed_v<T> ? _mm256_min_epi16(a.v, b.v) : _mm256_min_epu16(a.v, b.v)};
    else if constexpr (sizeof(T) == 4)
        return {std::is_signed_v<T> ? _mm256_min_epi32(a.v, b.v) : _mm256_min_epu32(a.v, b.v)};
    else
        return {_mm256_blendv_epi8(a.v, b.v, detail::isGreater64(a, b))};
}

/// The larger of two elements. Floats: b where they are equal or one of them is NaN.
template <class T>
QORI_INLINE Vec<T> larger(Vec<T> a, Vec<T> b) {
    if constexpr (std::is_same_v<T, float>)
        return {_mm256_max_ps(a.v, b.v)};
    else if constexpr (std::is_same_v<T, double>)
        return {_mm256_max_pd(a.v, b.v)};
    else if constexpr (sizeof(T) == 1)
        return {std::is_signed_v<T> ? _mm256_max_epi8(a.v, b.v) : _mm256_max_epu8(a.v, b.v)};
    else if constexpr (sizeof(T) == 2)
        return {std::is_signed_v<T> ? _mm256_max_epi16(a.v, b.v) : _mm256_max_epu16(a.v, b.v)};
    else if constexpr (sizeof(T) == 4)
        return {std::is_signed_v<T> ? _mm256_max_epi32(a.v, b.v) : _mm256_max_epu32(a.v, b.v)};
    else
        return {_mm256_blendv_epi8(b.v, a.v, detail::isGreater64(a, b))};
}

template <class T>
QORI_INLINE Mask<T> isEqual(Vec<T> a, Vec<T> b) {
    if constexpr (std::is_same_v<T, float>)
        return {toInteger(_mm256_cmp_ps(a.v, b.v, _CMP_EQ_OQ))};
    else if constexpr (std::is_same_v<T, double>)
        return {toInteger(_mm256_cmp_pd(a.v, b.v, _CMP_EQ_OQ))};
    else if constexpr (sizeof(T) == 1)
        return {_mm256_cmpeq_epi8(a.v, b.v)};
    else if constexpr (sizeof(T) == 2)
        return {_mm256_cmpeq_epi16(a.v, b.v)};
    else if constexpr (sizeof(T) == 4)
        return {_mm256_cmpeq_epi32(a.v, b.v)};
    else
        return {_mm256_cmpeq_epi64(a.v, b.v)};
}

/// a <= b. Unsigned elements have no instruction of their own; the smaller one tells.
template <class T>
QORI_INLINE Mask<T> isAtMost(Vec<T> a, Vec<T> b) {
    if constexpr (std::is_same_v<T, float>)
        return {toInteger(_mm256_cmp_ps(a.v, b.v, _CMP_LE_OQ))};
    else if constexpr (std::is_same_v<T, double>)
        return {toInteger(_mm256_cmp_pd(a.v, b.v, _CMP_LE_OQ))};
    else
        return isEqual(smaller(a, b), a);
}

/// a < b.
template <class T>
QORI_INLINE Mask<T> isLess(Vec<T> a, Vec<T> b) {
    if constexpr (std::is_same_v<T, float>)
        return {toInteger(_mm256_cmp_ps(a.v, b.v, _CMP_LT_OQ))};
    else if constexpr (std::is_same_v<T, double>)
        return {toInteger(_mm256_cmp_pd(a.v, b.v, _CMP_LT_OQ))};
    else if constexpr (std::is_signed_v<T> && sizeof(T) == 1)
        return {_mm256_cmpgt_epi8(b.v, a.v)};
    else if constexpr (std::is_signed_v<T> && sizeof(T) == 2)
        return {_mm256_cmpgt_epi16(b.v, a.v)};
    else if constexpr (std::is_signed_v<T>)
        return {_mm256_cmpgt_epi32(b.v, a.v)};
    else
        return ~isAtMost(b, a);
}

template <class T>
QORI_INLINE Mask<T> isNan(Vec<T> a) {
    static_assert(std::is_floating_point_v<T>);
    if constexpr (std::is_same_v<T, float>)
        return {toInteger(_mm256_cmp_ps(a.v, a.v, _CMP_UNORD_Q))};
    else
        return {toInteger(_mm256_cmp_pd(a.v, a.v, _CMP_UNORD_Q))};
}

// --- arithmetic -----------------------------------------------------------------------------------------------------

/// Bytes and words saturate to the element type's range.
template <class T>
QORI_INLINE Vec<T> addSaturated(Vec<T> a, Vec<T> b) {
    static_assert(std::is_integral_v<T> && sizeof(T) <= 2);
    if constexpr (sizeof(T) == 1)
        return {std::is_signed_v<T> ? _mm256_adds_epi8(a.v, b.v) : _mm256_adds_epu8(a.v, b.v)};
    else
        return {std::is_signed_v<T> ? _mm256_adds_epi16(a.v, b.v) : _mm256_adds_epu16(a.v, b.v)};
}

/// a - b; bytes and words saturate to the element type's range.
template <class T>
QORI_INLINE Vec<T> subtractSaturated(Vec<T> a, Vec<T> b) {
    static_assert(std::is_integral_v<T> && sizeof(T) <= 2);
    if constexpr (sizeof(T) == 1)
        return {std::is_signed_v<T> ? _mm256_subs_epi8(a.v, b.v) : _mm256_subs_epu8(a.v, b.v)};
    else
        return {std::is_signed_v<T> ? _mm256_subs_epi16(a.v, b.v) : _mm256_subs_epu16(a.v, b.v)};
}

/// a + b; integers wrap.
template <class T>
QORI_INLINE Vec<T> operator+(Vec<T> a, Vec<T> b) {
    if constexpr (std::is_same_v<T, float>)
        return {_mm256_add_ps(a.v, b.v)};
    else if constexpr (std::is_same_v<T, double>)
        return {_mm256_add_pd(a.v, b.v)};
    else if constexpr (sizeof(T) == 1)
        return {_mm256_add_epi8(a.v, b.v)};
    else if constexpr (sizeof(T) == 2)
        return {_mm256_add_epi16(a.v, b.v)};
    else if constexpr (sizeof(T) == 4)
        return {_mm256_add_epi32(a.v, b.v)};
    else
        return {_mm256_add_epi64(a.v, b.v)};
}

/// a - b; integers wrap.
template <class T>
QORI_INLINE Vec<T> operator-(Vec<T> a, Vec<T> b) {
    if constexpr (std::is_same_v<T, float>)
        return {_mm256_sub_ps(a.v, b.v)};
    else if constexpr (std::is_same_v<T, double>)
        return {_mm256_sub_pd(a.v, b.v)};
    else if constexpr (sizeof(T) == 1)
        return {_mm256_sub_epi8(a.v, b.v)};
    else if constexpr (sizeof(T) == 2)
        return {_mm256_sub_epi16(a.v, b.v)};
    else if constexpr (sizeof(T) == 4)
        return {_mm256_sub_epi32(a.v, b.v)};
    else
        return {_mm256_sub_epi64(a.v, b.v)};
}

template <class T>
QORI_INLINE Vec<T> operator*(Vec<T> a, Vec<T> b) {
    static_assert(std::is_floating_point_v<T>);
    if constexpr (std::is_same_v<T, float>)
        return {_mm256_mul_ps(a.v, b.v)};
    else
        return {_mm256_mul_pd(a.v, b.v)};
}

template <class T>
QORI_INLINE Vec<T> operator/(Vec<T> a, Vec<T> b) {
    static_assert(std::is_floating_point_v<T>);
    if constexpr (std::is_same_v<T, float>)
        return {_mm256_div_ps(a.v, b.v)};
    else
        return {_mm256_div_pd(a.v, b.v)};
}

template <class T>
QORI_INLINE Vec<T> squareRoot(Vec<T> a) {
    static_assert(std::is_floating_point_v<T>);
    if constexpr (std::is_same_v<T, float>)
        return {_mm256_sqrt_ps(a.v)};
    else
        return {_mm256_sqrt_pd(a.v)};
}

namespace detail {

template <class T>
struct MagnitudeOf {
    using type = std::make_unsigned_t<T>;
};
template <>
struct MagnitudeOf<float> {
    using type = float;
};
template <>
struct MagnitudeOf<double> {
    using type = double;
};

}  // namespace detail

/// Holds |a| and |a - b| of any two elements: the unsigned type of an integer's size.
template <class T>
using Magnitude = typename detail::MagnitudeOf<T>::type;

/// |a|. Of floats it clears the sign, whatever they are.
template <class T>
QORI_INLINE Vec<Magnitude<T>> magnitude(Vec<T> a) {
    if constexpr (std::is_same_v<T, float>)
        return {_mm256_andnot_ps(_mm256_set1_ps(-0.0f), a.v)};
    else if constexpr (std::is_same_v<T, double>)
        return {_mm256_andnot_pd(_mm256_set1_pd(-0.0), a.v)};
    else if constexpr (std::is_unsigned_v<T>)
        return a;
    else if constexpr (sizeof(T) == 1)
        return {_mm256_abs_epi8(a.v)};
    else if constexpr (sizeof(T) == 2)
        return {_mm256_abs_epi16(a.v)};
    else
        return {_mm256_abs_epi32(a.v)};
}

/// |a - b|.
template <class T>
QORI_INLINE Vec<Magnitude<T>> absoluteDifference(Vec<T> a, Vec<T> b) {
    if constexpr (std::is_floating_point_v<T>)
        return magnitude(a - b);
    else
        return {(larger(a, b) - smaller(a, b)).v};
}

/// How far a shift goes, the same in all lanes: 0 to the lane's bits and beyond.
struct ShiftCount {
    __m128i v;

    QORI_INLINE explicit ShiftCount(int bits) : v(_mm_cvtsi32_si128(bits)) {}
};

template <class T>
QORI_INLINE Vec<T> shiftLeft(Vec<T> a, ShiftCount count) {
    static_assert(std::is_integral_v<T> && sizeof(T) >= 2);
    if constexpr (sizeof(T) == 2)
        return {_mm256_sll_epi16(a.v, count.v)};
    else if constexpr (sizeof(T) == 4)
        return {_mm256_sll_epi32(a.v, count.v)};
    else
        return {_mm256_sll_epi64(a.v, count.v)};
}

/// The floor of a / 2^count, of signed elements too.
template <class T>
QORI_INLINE Vec<T> shiftRight(Vec<T> a, ShiftCount count) {
    static_assert(std::is_integral_v<T> && sizeof(T) >= 2);
    constexpr bool isSigned = std::is_signed_v<T>;
    if constexpr (sizeof(T) == 2)
        return {isSigned ? _mm256_sra_epi16(a.v, count.v) : _mm256_srl_epi16(a.v, count.v)};
    else if constexpr (sizeof(T) == 4)
        return {isSigned ? _mm256_sra_epi32(a.v, count.v) : _mm256_srl_epi32(a.v, count.v)};
    else if constexpr (!isSigned)
        return {_mm256_srl_epi64(a.v, count.v)};
    else {  // AVX2 shifts 64 bits only logically: as unsigned from the minimum up
        const __m256i minimum = _mm256_set1_epi64x(INT64_MIN);
        const __m256i raised = _mm256_srl_epi64(_mm256_xor_si256(a.v, minimum), count.v);
        return {_mm256_sub_epi64(raised, _mm256_srl_epi64(minimum, count.v))};
    }
}

// --- widths ---------------------------------------------------------------------------------------------------------

namespace detail {

template <class T>
struct WiderOf;
template <>
struct WiderOf<uint8_t> {
    using type = uint16_t;
};
template <>
struct WiderOf<int8_t> {
    using type = int16_t;
};
template <>
struct WiderOf<uint16_t> {
    using type = uint32_t;
};
template <>
struct WiderOf<int16_t> {
    using type = int32_t;
};

}  // namespace detail

template <class T>
using Wider = typename detail::WiderOf<T>::type;

/// As many elements as half a vector has, in twice their width.
template <class T>
QORI_INLINE Vec<Wider<T>> loadWidened(const T* p) {
    const __m128i half = _mm_loadu_si128(reinterpret_cast<const __m128i*>(p));
    if constexpr (std::is_same_v<T, uint8_t>)
        return {_mm256_cvtepu8_epi16(half)};
    else if constexpr (std::is_same_v<T, int8_t>)
        return {_mm256_cvtepi8_epi16(half)};
    else if constexpr (std::is_same_v<T, uint16_t>)
        return {_mm256_cvtepu16_epi32(half)};
    else
        return {_mm256_cvtepi16_epi32(half)};
}

/// The elements of two vectors in half their width, saturated to D, in order.
template <class D, class T>
QORI_INLINE Vec<D> narrowSaturated(Vec<T> low, Vec<T> high) {
    static_assert(std::is_signed_v<T> && sizeof(D) * 2 == sizeof(T));
    __m256i packed;
    if constexpr (sizeof(T) == 2)
        packed = std::is_signed_v<D> ? _mm256_packs_epi16(low.v, high.v) : _mm256_packus_epi16(low.v, high.v);
    else
        packed = std::is_signed_v<D> ? _mm256_packs_epi32(low.v, high.v) : _mm256_packus_epi32(low.v, high.v);
    return {_mm256_permute4x64_epi64(packed, 0xD8)};
}

}  // namespace qori
