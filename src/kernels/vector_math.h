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

alignas(32) inline constexpr uint8_t kOnesThenZeros[64] = {255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255,
                                                           255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255,
                                                           255, 255, 255, 255, 255, 255, 255, 255, 255, 255};

}  // namespace detail

/// The first n lanes (0 to all).
template <class T>
QORI_INLINE Mask<T> firstLanes(ptrdiff_t n) {
    return {load(detail::kOnesThenZeros + 32 - n * static_cast<ptrdiff_t>(sizeof(T))).v};
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
    else
        return {std::is_signed_v<T> ? _mm256_min_epi32(a.v, b.v) : _mm256_min_epu32(a.v, b.v)};
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
    else
        return {std::is_signed_v<T> ? _mm256_max_epi32(a.v, b.v) : _mm256_max_epu32(a.v, b.v)};
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
    else
        return {_mm256_cmpeq_epi32(a.v, b.v)};
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

/// |a - b| in the unsigned type of the element's size, which holds it.
template <class T>
QORI_INLINE Vec<std::make_unsigned_t<T>> absoluteDifference(Vec<T> a, Vec<T> b) {
    static_assert(std::is_integral_v<T> && sizeof(T) <= 4);
    return {(larger(a, b) - smaller(a, b)).v};
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
