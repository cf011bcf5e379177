// SPDX-License-Identifier: Apache-2.0
// Grey-level erosion and dilation: smallest and largest elements of windows.
//
// Floats: a NaN is no number and takes no part; a window of nothing else gives the quiet NaN. Extremes join in row
// order, and of equal ones the later stays, so that zeros of either sign come out the same however rows are grouped.
// They read the control register: run them under the default one.
#pragma once
#include <limits>

#include "kernels/map.h"
#include "kernels/simd.h"

namespace qori::kernels {

template <class T>
struct Erosion {
    using Element = T;
    /// What every element replaces.
    static constexpr T start =
        std::is_floating_point_v<T> ? std::numeric_limits<T>::infinity() : std::numeric_limits<T>::max();

    /// `later` where the two are equal, or where `first` is NaN.
    QORI_INLINE static Vec<T> join(Vec<T> first, Vec<T> later) {
        if constexpr (std::is_same_v<T, double>)
            return {_mm256_min_pd(first.v, later.v)};
        else if constexpr (std::is_same_v<T, float>)
            return {_mm256_min_ps(first.v, later.v)};
        else if constexpr (sizeof(T) == 1)
            return {_mm256_min_epu8(first.v, later.v)};
        else
            return {_mm256_min_epu16(first.v, later.v)};
    }
};

template <class T>
struct Dilation {
    using Element = T;
    static constexpr T start =
        std::is_floating_point_v<T> ? -std::numeric_limits<T>::infinity() : std::numeric_limits<T>::min();

    QORI_INLINE static Vec<T> join(Vec<T> first, Vec<T> later) {
        if constexpr (std::is_same_v<T, double>)
            return {_mm256_max_pd(first.v, later.v)};
        else if constexpr (std::is_same_v<T, float>)
            return {_mm256_max_ps(first.v, later.v)};
        else if constexpr (sizeof(T) == 1)
            return {_mm256_max_epu8(first.v, later.v)};
        else
            return {_mm256_max_epu16(first.v, later.v)};
    }
};

/// How results reach the destination.
enum class Stores {
    plain,
    streaming,  ///< Past the cache: every destination row on a 32-byte boundary.
    delayed     ///< Behind everything that the next vector reads, so that the destination may be the source.
};

namespace detail {

/// Source rows in order, from the one above the first destination row to the one below the last.
template <class T, int rows>
struct SquareRows {
    const T* src[rows + 2];
    T* dst[rows];
};

template <class T>
QORI_INLINE auto splat(T value) {
    if constexpr (std::is_same_v<T, float>)
        return Vec<T>{_mm256_set1_ps(value)};
    else
        return Vec<T>{_mm256_set1_pd(value)};
}

template <class T>
QORI_INLINE auto isNan(Vec<T> a) {
    if constexpr (std::is_same_v<T, float>)
        return _mm256_cmp_ps(a.v, a.v, _CMP_UNORD_Q);
    else
        return _mm256_cmp_pd(a.v, a.v, _CMP_UNORD_Q);
}

/// One bit per lane that equals b.
template <class T>
QORI_INLINE int equalLanes(Vec<T> a, Vec<T> b) {
    if constexpr (std::is_same_v<T, float>)
        return _mm256_movemask_ps(_mm256_cmp_ps(a.v, b.v, _CMP_EQ_OQ));
    else
        return _mm256_movemask_pd(_mm256_cmp_pd(a.v, b.v, _CMP_EQ_OQ));
}

template <class T>
QORI_INLINE Vec<T> loadElements(const T* p, ptrdiff_t count) {
    return count == Vec<T>::lanes ? load(p) : loadPartial(p, count);
}

/// Puts NaN where the nine elements of a window are. Rare: only an extreme that equals Order::start leads here.
template <class T, int rows>
QORI_NOINLINE void markNans(SquareRows<T, rows> image, ptrdiff_t at, ptrdiff_t channels, ptrdiff_t count, Vec<T>* out) {
    const Vec<T> nan = splat(std::numeric_limits<T>::quiet_NaN());
    for (int k = 0; k < rows; ++k) {
        auto nans = isNan(nan);
        for (int j = k; j < k + 3; ++j)
            for (ptrdiff_t i = -1; i <= 1; ++i) {
                const auto own = isNan(loadElements(image.src[j] + at + i * channels, count));
                nans = fromInteger<T>(_mm256_and_si256(toInteger(nans), toInteger(own))).v;
            }
        out[k] = fromInteger<T>(_mm256_blendv_epi8(toInteger(out[k].v), toInteger(nan.v), toInteger(nans)));
    }
}

/// The extremes of the windows around `count` elements of each destination row. Each row's extreme of three neighbours
/// is formed once, and the extreme of the two rows that neighbouring windows share, once. The rows come by value: whose
/// address is known may be changed by any store.
template <class Order, class T, int rows, class Channels, class Count>
QORI_INLINE void squareExtremes(SquareRows<T, rows> image, ptrdiff_t at, Channels channels, Count count, Vec<T>* out) {
    constexpr bool isFloat = std::is_floating_point_v<T>;
    const auto across = [=](int row) __attribute__((always_inline)) {
        const T* const p = image.src[row] + at;
        Vec<T> last = loadElements(p + channels, count);
        if constexpr (isFloat) last = Order::join(last, splat(Order::start));
        return Order::join(loadElements(p - channels, count), Order::join(loadElements(p, count), last));
    };
    Vec<T> first = across(0), second = across(1);
    for (int k = 0; k < rows; k += 2) {
        const Vec<T> third = across(k + 2), shared = Order::join(second, third);
        out[k] = Order::join(first, shared);
        if (k + 1 == rows) break;
        second = across(k + 3);
        out[k + 1] = Order::join(shared, second);
        first = third;
    }
    if constexpr (isFloat) {
        Vec<T> most = out[0];
        for (int k = 1; k < rows; ++k)
            most = Order::start > 0 ? Dilation<T>::join(most, out[k]) : Erosion<T>::join(most, out[k]);
        if (equalLanes(most, splat(Order::start)) != 0) {
            Vec<T> marked[rows];  // so that `out` stays in registers
            for (int k = 0; k < rows; ++k) marked[k] = out[k];
            markNans(image, at, channels, count, marked);
            for (int k = 0; k < rows; ++k) out[k] = marked[k];
        }
    }
}

template <bool streaming, bool keepAlpha, class T, int rows>
QORI_INLINE void storeExtremes(SquareRows<T, rows> image, ptrdiff_t at, Vec<T>* out) {
    for (int k = rows; k-- > 0;) {
        T* const to = image.dst[k] + at;
        if constexpr (keepAlpha) out[k] = withAlphaOf(out[k], load(to));
        storeAs<streaming>(to, out[k]);
    }
}

/// Rows of less than a vector.
template <class Order, bool keepAlpha, int rows, class T>
QORI_NOINLINE void narrowRows(SquareRows<T, rows> image, ptrdiff_t elements, ptrdiff_t channels) {
    Vec<T> out[rows];
    squareExtremes<Order>(image, 0, channels, elements, out);
    for (int k = rows; k-- > 0;) {
        if constexpr (keepAlpha) out[k] = withAlphaOf(out[k], loadPartial(image.dst[k], elements));
        storePartial(image.dst[k], out[k], elements);
    }
}

}  // namespace detail

/// Extremes of 3 x 3 pixels for `rows` destination rows at once; elements to the left and right of the rows, one pixel
/// of them, are read too. src: rows + 2 of them. Where the same destination row is given several times, the first
/// counts. The last vector ends with the rows, and may overlap the one before.
template <class Order, int channels, Stores stores, bool keepAlpha, int rows, class T>
QORI_NOINLINE void squareRows(const T* const* src, T* const* dst, ptrdiff_t elements) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    const std::integral_constant<ptrdiff_t, n> whole;
    const std::integral_constant<ptrdiff_t, channels> pixel;
    detail::SquareRows<T, rows> image;
    for (int k = 0; k < rows + 2; ++k) image.src[k] = src[k];
    for (int k = 0; k < rows; ++k) image.dst[k] = dst[k];
    if (elements < n) return detail::narrowRows<Order, keepAlpha>(image, elements, channels);
    const ptrdiff_t last = elements - n;
    Vec<T> out[rows];
    if constexpr (stores == Stores::delayed) {
        Vec<T> end[rows];
        const bool overlaps = last % n != 0;
        if (overlaps) detail::squareExtremes<Order>(image, last, pixel, whole, end);
        ptrdiff_t i = 0;
        for (; i <= last; i += n) {
            Vec<T> next[rows];
            detail::squareExtremes<Order>(image, i, pixel, whole, next);
            if (i > 0) detail::storeExtremes<false, keepAlpha>(image, i - n, out);
            for (int k = 0; k < rows; ++k) out[k] = next[k];
        }
        detail::storeExtremes<false, keepAlpha>(image, i - n, out);
        if (overlaps) detail::storeExtremes<false, keepAlpha>(image, last, end);
    } else {
        ptrdiff_t i = 0;
        for (; i <= last; i += n) {
            detail::squareExtremes<Order>(image, i, pixel, whole, out);
            detail::storeExtremes<stores == Stores::streaming, keepAlpha>(image, i, out);
        }
        if (i == last + n) return;
        detail::squareExtremes<Order>(image, last, pixel, whole, out);
        detail::storeExtremes<false, keepAlpha>(image, last, out);
    }
}

}  // namespace qori::kernels
