// SPDX-License-Identifier: Apache-2.0
// Extremes of windows, as joins of rows: the element at i is the smallest or largest of the elements at i of several
// rows, which may be one row at several offsets. Joins go in any order and may count elements twice.
//
// Floats are joined as keys: unsigned integers in the order of the numbers, -0 below +0, NaNs where a number always
// beats them. So no order of joins shows in the result, and no instruction reads the control register.
#pragma once
#include "kernels/map.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

/// Extremes as a choice of the kernel; the float forms of the 3 x 3 square have their own (kernels/filter).
template <class T>
struct Smallest {
    using Element = T;
    QORI_INLINE static Vec<T> join(Vec<T> a, Vec<T> b) { return smaller(a, b); }
};

template <class T>
struct Largest {
    using Element = T;
    QORI_INLINE static Vec<T> join(Vec<T> a, Vec<T> b) { return larger(a, b); }
};

// --- keys -----------------------------------------------------------------------------------------------------------

using Key = uint32_t;

namespace detail {

/// Positive floats are in the order of their bits, negative ones in reverse. Its own inverse.
QORI_INLINE __m256i inOrder(__m256i bits) {
    return _mm256_xor_si256(bits, _mm256_srli_epi32(_mm256_srai_epi32(bits, 31), 1));
}

/// inOrder() of -infinity, as an unsigned integer.
inline constexpr Key kLowest = 0x807FFFFF;
inline constexpr Key kInfinity = 0x7F800000;

template <class Order>
inline constexpr bool isSmallest = std::is_same_v<Order, Smallest<Key>>;

/// Added to what is in order. -infinity comes to 0 where the smallest wins, and NaNs of either sign above +infinity;
/// where the largest wins, +infinity comes to 2^32 - 1, and NaNs below -infinity.
template <class Order>
inline constexpr Key kShift = isSmallest<Order> ? 0u - kLowest : 0xFFFFFFFF - kInfinity;

}  // namespace detail

template <class Order>
QORI_INLINE Vec<Key> keysOf(Vec<Key> bits) {
    return Vec<Key>{detail::inOrder(bits.v)} + splat(detail::kShift<Order>);
}

/// The floats' bits; NaN, quiet, where there was no number.
template <class Order>
QORI_INLINE Vec<Key> bitsOf(Vec<Key> keys) {
    constexpr Key quietNan = 0x7FC00000;
    const Vec<Key> bits{detail::inOrder((keys - splat(detail::kShift<Order>)).v)};
    const Mask<Key> none = detail::isSmallest<Order> ? isAtMost(splat(detail::kInfinity - detail::kLowest + 1), keys)
                                                     : isAtMost(keys, splat(detail::kLowest - detail::kInfinity - 2));
    return select(none, splat(quietNan), bits);
}

// --- what becomes of joined vectors ---------------------------------------------------------------------------------

struct AsIs {
    template <class T>
    QORI_INLINE static Vec<T> of(Vec<T> a) {
        return a;
    }
};

template <class Order>
struct IntoKeys {
    QORI_INLINE static Vec<Key> of(Vec<Key> a) { return keysOf<Order>(a); }
};

template <class Order>
struct FromKeys {
    QORI_INLINE static Vec<Key> of(Vec<Key> a) { return bitsOf<Order>(a); }
};

// --- rows -----------------------------------------------------------------------------------------------------------

namespace detail {

/// Rows to be joined: `fixed` of them, or `count` where that is 0.
template <class T, int fixed>
struct Taps {
    const T* const* row;
    int count;

    QORI_INLINE int size() const { return fixed > 0 ? fixed : count; }
};

template <class Order, int vectors, class T, int fixed>
QORI_INLINE void joinVectors(Taps<T, fixed> taps, ptrdiff_t at, Vec<T>* out) {
    const T* row = taps.row[0] + at;
    for (int v = 0; v < vectors; ++v) out[v] = load(row + v * Vec<T>::lanes);
    for (int k = 1; k < taps.size(); ++k) {
        row = taps.row[k] + at;
        for (int v = 0; v < vectors; ++v) out[v] = Order::join(out[v], load(row + v * Vec<T>::lanes));
    }
}

template <class Order, class Finish, bool keepAlpha, int vectors, class T, int fixed>
QORI_INLINE void joinBlock(Taps<T, fixed> taps, ptrdiff_t at, T* to) {
    Vec<T> out[vectors];
    joinVectors<Order, vectors>(taps, at, out);
    for (int v = 0; v < vectors; ++v) {
        T* const p = to + at + v * Vec<T>::lanes;
        out[v] = Finish::of(out[v]);
        if constexpr (keepAlpha) out[v] = withAlphaOf(out[v], load(p));
        store(p, out[v]);
    }
}

/// Rows of less than a vector.
template <class Order, class Finish, bool keepAlpha, class T>
QORI_NOINLINE void joinNarrow(const T* const* row, int count, T* to, ptrdiff_t elements) {
    Vec<T> out = loadPartial(row[0], elements);
    for (int k = 1; k < count; ++k) out = Order::join(out, loadPartial(row[k], elements));
    out = Finish::of(out);
    if constexpr (keepAlpha) out = withAlphaOf(out, loadPartial(to, elements));
    storePartial(to, out, elements);
}

template <class Order, class Finish, bool keepAlpha, int fixed, class T>
QORI_NOINLINE void joinRows(const T* const* row, int count, T* to, ptrdiff_t elements) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    constexpr int vectors = 4;
    const Taps<T, fixed> taps{row, count};
    if (elements < n) return joinNarrow<Order, Finish, keepAlpha>(row, taps.size(), to, elements);
    ptrdiff_t i = 0;
    for (; i <= elements - vectors * n; i += vectors * n) joinBlock<Order, Finish, keepAlpha, vectors>(taps, i, to);
    for (; i <= elements - n; i += n) joinBlock<Order, Finish, keepAlpha, 1>(taps, i, to);
    if (i < elements) joinBlock<Order, Finish, keepAlpha, 1>(taps, elements - n, to);
}

}  // namespace detail

/// to[i] = the extreme of row[0][i] ... row[count - 1][i], finished. `to` may be one of the rows: the last vector ends
/// with the row and overlaps the one before, which joins what is joined already; so only where Finish changes nothing.
template <class Order, class Finish = AsIs, bool keepAlpha = false, class T>
void join(const T* const* row, int count, T* to, ptrdiff_t elements) {
    using namespace detail;
    switch (count) {
        case 1: return joinRows<Order, Finish, keepAlpha, 1>(row, count, to, elements);
        case 2: return joinRows<Order, Finish, keepAlpha, 2>(row, count, to, elements);
        case 3: return joinRows<Order, Finish, keepAlpha, 3>(row, count, to, elements);
        case 4: return joinRows<Order, Finish, keepAlpha, 4>(row, count, to, elements);
        case 7: return joinRows<Order, Finish, keepAlpha, 7>(row, count, to, elements);
        default: return joinRows<Order, Finish, keepAlpha, 0>(row, count, to, elements);
    }
}

}  // namespace qori::kernels
