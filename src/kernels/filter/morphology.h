// SPDX-License-Identifier: Apache-2.0
// Grey-level erosion and dilation: smallest and largest elements of windows.
//
// Floats: a NaN is no number and takes no part; a window of nothing else gives the quiet NaN. -0 is below +0, which the
// instructions do not know: they join as it comes, and the few vectors where that may be wrong are made again. They
// read the control register: run them under the default one.
#pragma once
#include <limits>

#include "kernels/map.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

template <class T>
struct Erosion {
    using Element = T;
    /// What every element replaces.
    static constexpr T start =
        std::is_floating_point_v<T> ? std::numeric_limits<T>::infinity() : std::numeric_limits<T>::max();

    /// `later` where `first` is NaN.
    QORI_INLINE static Vec<T> join(Vec<T> first, Vec<T> later) { return smaller(first, later); }
    /// Sign bits that some element has.
    QORI_INLINE static __m256i joinSigns(__m256i a, __m256i b) { return _mm256_or_si256(a, b); }
    /// Where one of these should have been the result's.
    QORI_INLINE static __m256i missed(__m256i result, __m256i signs) { return _mm256_andnot_si256(result, signs); }
};

template <class T>
struct Dilation {
    using Element = T;
    static constexpr T start =
        std::is_floating_point_v<T> ? -std::numeric_limits<T>::infinity() : std::numeric_limits<T>::min();

    QORI_INLINE static Vec<T> join(Vec<T> first, Vec<T> later) { return larger(first, later); }
    /// Sign bits that all elements have.
    QORI_INLINE static __m256i joinSigns(__m256i a, __m256i b) { return _mm256_and_si256(a, b); }
    QORI_INLINE static __m256i missed(__m256i result, __m256i signs) { return _mm256_andnot_si256(signs, result); }
};

/// How results reach the destination.
enum class Stores {
    plain,
    streaming  ///< Past the cache: every destination row on a 32-byte boundary.
};

namespace detail {

/// Source rows in order, from the one above the first destination row to the one below the last.
template <class T, int rows>
struct SquareRows {
    const T* src[rows + 2];
    T* dst[rows];

    SquareRows(const T* const* from, T* const* to) {
        for (int k = 0; k < rows + 2; ++k) src[k] = from[k];
        for (int k = 0; k < rows; ++k) dst[k] = to[k];
    }
};

template <class T>
QORI_INLINE Vec<T> loadElements(const T* p, ptrdiff_t count) {
    return count == Vec<T>::lanes ? load(p) : loadPartial(p, count);
}

/// The extremes of windows with NaNs or with zeros of either sign, element by element. Not for what is common.
template <class Order, class T, int rows>
QORI_NOINLINE void exactExtremes(SquareRows<T, rows> image, ptrdiff_t at, ptrdiff_t channels, ptrdiff_t count,
                                 Vec<T>* out) {
    const Vec<T> start = splat(Order::start), nan = splat(std::numeric_limits<T>::quiet_NaN());
    for (int k = 0; k < rows; ++k) {
        Vec<T> best = start;
        Mask<T> nans = isNan(nan);
        for (int j = k; j < k + 3; ++j)
            for (ptrdiff_t i = -1; i <= 1; ++i) {
                const Vec<T> read = loadElements(image.src[j] + at + i * channels, count);
                const Vec<T> number = select(isNan(read), start, read);
                nans = nans & isNan(read);
                // Of zeros, either order gives one of the two.
                best = fromInteger<T>(
                    Order::joinSigns(toInteger(Order::join(best, number).v), toInteger(Order::join(number, best).v)));
            }
        out[k] = select(nans, nan, best);
    }
}

/// The extreme of some elements, and for floats their signs, joined as they are.
template <class Order>
struct Joined {
    using T = typename Order::Element;
    static constexpr bool isFloat = std::is_floating_point_v<T>;

    Vec<T> best;
    __m256i signs;

    QORI_INLINE static Joined of(const T* row, ptrdiff_t channels, auto count) {
        const Vec<T> left = loadElements(row - channels, count), middle = loadElements(row, count);
        Vec<T> right = loadElements(row + channels, count);
        Joined joined;
        if constexpr (isFloat) {
            joined.signs =
                Order::joinSigns(Order::joinSigns(toInteger(left.v), toInteger(middle.v)), toInteger(right.v));
            right = Order::join(right, splat(Order::start));
        }
        joined.best = Order::join(left, Order::join(middle, right));
        return joined;
    }
    QORI_INLINE Joined with(Joined later) const {
        Joined joined;
        joined.best = Order::join(best, later.best);
        if constexpr (isFloat) joined.signs = Order::joinSigns(signs, later.signs);
        return joined;
    }
};

/// Whether some lane may be wrong: its window has a sign that it should have, or nothing but NaNs. NaNs have signs too.
template <class Order, int rows>
QORI_INLINE bool isDoubtful(const Joined<Order>* made) {
    using T = typename Order::Element;
    Vec<T> most = made[0].best;
    __m256i missed = Order::missed(toInteger(most.v), made[0].signs);
    for (int k = 1; k < rows; ++k) {
        most = Order::start > 0 ? larger(most, made[k].best) : smaller(most, made[k].best);
        missed = _mm256_or_si256(missed, Order::missed(toInteger(made[k].best.v), made[k].signs));
    }
    const __m256i unmade = isEqual(most, splat(Order::start)).v;
    const auto doubts = fromInteger<T>(_mm256_or_si256(missed, unmade));
    if constexpr (std::is_same_v<T, float>)
        return _mm256_movemask_ps(doubts.v) != 0;
    else
        return _mm256_movemask_pd(doubts.v) != 0;
}

/// The extremes of the windows around `count` elements of each destination row. Each row's extreme of three neighbours
/// is formed once, and the extreme of the two rows that neighbouring windows share, once. The rows come by value: whose
/// address is known may be changed by any store.
template <class Order, class T, int rows, class Count>
QORI_INLINE void squareExtremes(SquareRows<T, rows> image, ptrdiff_t at, ptrdiff_t channels, Count count, Vec<T>* out) {
    const auto across = [=](int row) __attribute__((always_inline)) {
        return Joined<Order>::of(image.src[row] + at, channels, count);
    };
    Joined<Order> made[rows];
    Joined<Order> first = across(0), second = across(1);
    for (int k = 0; k < rows; k += 2) {
        const Joined<Order> third = across(k + 2), shared = second.with(third);
        made[k] = first.with(shared);
        if (k + 1 == rows) break;
        second = across(k + 3);
        made[k + 1] = shared.with(second);
        first = third;
    }
    for (int k = 0; k < rows; ++k) out[k] = made[k].best;
    if constexpr (std::is_floating_point_v<T>) {
        if (!isDoubtful<Order, rows>(made)) return;
        Vec<T> exact[rows];  // so that `out` stays in registers
        exactExtremes<Order>(image, at, channels, count, exact);
        for (int k = 0; k < rows; ++k) out[k] = exact[k];
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
/// counts. The last vector ends with the rows, and may overlap the one before. Rows that stream begin with a cache
/// line, or on a vector where they are whole vectors: of a line no part goes past the cache and another through it.
template <class Order, bool keepAlpha, int rows, class T>
QORI_NOINLINE void squareRows(const T* const* src, T* const* dst, ptrdiff_t elements, ptrdiff_t channels,
                              Stores stores) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    const std::integral_constant<ptrdiff_t, n> whole;
    const detail::SquareRows<T, rows> image(src, dst);
    if (elements < n) return detail::narrowRows<Order, keepAlpha>(image, elements, channels);
    const ptrdiff_t last = elements - n;
    Vec<T> out[rows];
    ptrdiff_t i = 0;
    if constexpr (!keepAlpha)
        if (stores == Stores::streaming) {
            const ptrdiff_t passing = elements % n == 0 ? elements : last / (2 * n) * (2 * n);
            for (; i < passing; i += n) {
                detail::squareExtremes<Order>(image, i, channels, whole, out);
                detail::storeExtremes<true, false>(image, i, out);
            }
        }
    // From the last whole vector on to the one that ends with the rows.
    for (bool isLast = i == elements; !isLast; i += n) {
        isLast = i >= last;
        const ptrdiff_t at = isLast ? last : i;
        detail::squareExtremes<Order>(image, at, channels, whole, out);
        detail::storeExtremes<false, keepAlpha>(image, at, out);
    }
}

/// The same, stored behind everything that the next vector reads, so that the destination may be the source.
template <class Order, bool keepAlpha, int rows, class T>
QORI_NOINLINE void squareRowsInPlace(const T* const* src, T* const* dst, ptrdiff_t elements, ptrdiff_t channels) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    const std::integral_constant<ptrdiff_t, n> whole;
    const detail::SquareRows<T, rows> image(src, dst);
    if (elements < n) return detail::narrowRows<Order, keepAlpha>(image, elements, channels);
    const ptrdiff_t last = elements - n;
    Vec<T> out[rows], end[rows];
    const bool overlaps = last % n != 0;
    if (overlaps) detail::squareExtremes<Order>(image, last, channels, whole, end);
    ptrdiff_t i = 0;
    for (; i <= last; i += n) {
        Vec<T> next[rows];
        detail::squareExtremes<Order>(image, i, channels, whole, next);
        if (i > 0) detail::storeExtremes<false, keepAlpha>(image, i - n, out);
        for (int k = 0; k < rows; ++k) out[k] = next[k];
    }
    detail::storeExtremes<false, keepAlpha>(image, i - n, out);
    if (overlaps) detail::storeExtremes<false, keepAlpha>(image, last, end);
}

}  // namespace qori::kernels
