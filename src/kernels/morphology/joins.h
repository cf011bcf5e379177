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

// --- blocks of rows -------------------------------------------------------------------------------------------------

/// What becomes of a row that enters a block, element by element.
template <class T>
struct BlockRows {
    T* entering;        ///< Becomes the joined taps.
    const T* before;    ///< The join of the block's rows so far, or `entering` for the first.
    T* soFar;           ///< Becomes that join with the row; may be `before`.
    const T* lastRows;  ///< The join of the rows of the block before that the window has; `entering` where it has none.
    const T* elsewhere;  ///< What else the window has; `entering` where that is nothing.
    T* to;               ///< Becomes the finished join of all that the window has.
};

namespace detail {

template <class Order, class Finish, bool keepAlpha, int vectors, class T, int fixed>
QORI_INLINE void enterVectors(Taps<T, fixed> taps, const BlockRows<T>& rows, ptrdiff_t at) {
    Vec<T> row[vectors];
    joinVectors<Order, vectors>(taps, at, row);
    // The row is stored before the others are loaded, which may be the same.
    for (int v = 0; v < vectors; ++v) store(rows.entering + at + v * Vec<T>::lanes, row[v]);
    for (int v = 0; v < vectors; ++v) {
        const ptrdiff_t i = at + v * Vec<T>::lanes;
        const Vec<T> soFar = Order::join(row[v], load(rows.before + i));
        store(rows.soFar + i, soFar);
        Vec<T> out = Order::join(soFar, load(rows.lastRows + i));
        if (rows.elsewhere != rows.entering) out = Order::join(out, load(rows.elsewhere + i));
        out = Finish::of(out);
        if constexpr (keepAlpha) out = withAlphaOf(out, load(rows.to + i));
        store(rows.to + i, out);
    }
}

template <class Order, class Finish, bool keepAlpha, class T>
QORI_NOINLINE void enterNarrow(const T* const* tap, int count, const BlockRows<T>& rows, ptrdiff_t elements) {
    joinNarrow<Order, AsIs, false>(tap, count, rows.entering, elements);
    const T* const both[] = {rows.entering, rows.before};
    joinNarrow<Order, AsIs, false>(both, 2, rows.soFar, elements);
    const T* const all[] = {rows.soFar, rows.lastRows, rows.elsewhere};
    joinNarrow<Order, Finish, keepAlpha>(all, 3, rows.to, elements);
}

template <class Order, class Finish, bool keepAlpha, int fixed, class T>
QORI_NOINLINE void enterRow(const T* const* tap, int count, BlockRows<T> rows, ptrdiff_t elements) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    constexpr int vectors = 4;
    const Taps<T, fixed> taps{tap, count};
    if (elements < n) return enterNarrow<Order, Finish, keepAlpha>(tap, taps.size(), rows, elements);
    ptrdiff_t i = 0;
    for (; i <= elements - vectors * n; i += vectors * n)
        enterVectors<Order, Finish, keepAlpha, vectors>(taps, rows, i);
    for (; i <= elements - n; i += n) enterVectors<Order, Finish, keepAlpha, 1>(taps, rows, i);
    if (i < elements) enterVectors<Order, Finish, keepAlpha, 1>(taps, rows, elements - n);
}

}  // namespace detail

/// A row, the join of taps, enters a block. The last vector overlaps the one before, as in join().
template <class Order, class Finish, bool keepAlpha, class T>
void enterBlock(const T* const* tap, int count, const BlockRows<T>& rows, ptrdiff_t elements) {
    using namespace detail;
    switch (count) {
        case 1: return enterRow<Order, Finish, keepAlpha, 1>(tap, count, rows, elements);
        case 2: return enterRow<Order, Finish, keepAlpha, 2>(tap, count, rows, elements);
        case 3: return enterRow<Order, Finish, keepAlpha, 3>(tap, count, rows, elements);
        case 4: return enterRow<Order, Finish, keepAlpha, 4>(tap, count, rows, elements);
        case 5: return enterRow<Order, Finish, keepAlpha, 5>(tap, count, rows, elements);
        case 7: return enterRow<Order, Finish, keepAlpha, 7>(tap, count, rows, elements);
        default: return enterRow<Order, Finish, keepAlpha, 0>(tap, count, rows, elements);
    }
}

namespace detail {

template <class Order, int vectors, class T>
QORI_INLINE void joinUpwards(T* last, ptrdiff_t step, int32_t rows, ptrdiff_t at) {
    T* row = last + at;
    Vec<T> soFar[vectors];
    for (int v = 0; v < vectors; ++v) soFar[v] = load(row + v * Vec<T>::lanes);
    for (int32_t k = 1; k < rows; ++k) {
        row -= step;
        for (int v = 0; v < vectors; ++v) {
            soFar[v] = Order::join(soFar[v], load(row + v * Vec<T>::lanes));
            store(row + v * Vec<T>::lanes, soFar[v]);
        }
    }
}

}  // namespace detail

/// Each row becomes its join with all rows below it. Rows are `step` elements apart and padded to whole vectors.
template <class Order, class T>
QORI_NOINLINE void joinBlockUpwards(T* last, ptrdiff_t step, int32_t rows, ptrdiff_t elements) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    constexpr int vectors = 4;
    ptrdiff_t i = 0;
    for (; i <= elements - vectors * n; i += vectors * n) detail::joinUpwards<Order, vectors>(last, step, rows, i);
    for (; i < elements; i += n) detail::joinUpwards<Order, 1>(last, step, rows, i);
}

}  // namespace qori::kernels
