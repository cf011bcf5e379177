// SPDX-License-Identifier: Apache-2.0
// Extremes of windows, as joins of rows: the element at i is the smallest or largest of the elements at i of several
// rows, which may be one row at several offsets. Joins go in any order and may count elements twice.
//
// Floats are joined as keys: unsigned integers in the order of the numbers, -0 below +0, NaNs where a number always
// beats them. So no order of joins shows in the result, and no instruction reads the control register.
#pragma once
#include <limits>

#include "kernels/map.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

/// Extremes as a choice of the kernel; the float forms of the 3 x 3 square have their own (kernels/filter).
template <class T>
struct Minimum {
    using Element = T;
    static constexpr T start = std::numeric_limits<T>::max();  ///< What every element replaces.
    QORI_INLINE static Vec<T> join(Vec<T> a, Vec<T> b) { return smaller(a, b); }
};

template <class T>
struct Maximum {
    using Element = T;
    static constexpr T start = std::numeric_limits<T>::min();
    QORI_INLINE static Vec<T> join(Vec<T> a, Vec<T> b) { return larger(a, b); }
};

// --- keys -----------------------------------------------------------------------------------------------------------

using FloatKey = uint32_t;

namespace detail {

/// Positive floats are in the order of their bits, negative ones in reverse. Its own inverse.
QORI_INLINE __m256i inOrder(__m256i bits) {
    return _mm256_xor_si256(bits, _mm256_srli_epi32(_mm256_srai_epi32(bits, 31), 1));
}

/// inOrder() of -infinity, as an unsigned integer.
inline constexpr FloatKey kLowest = 0x807FFFFF;
inline constexpr FloatKey kInfinity = 0x7F800000;

template <class Order>
inline constexpr bool isSmallest = std::is_same_v<Order, Minimum<FloatKey>>;

/// Added to what is in order. -infinity comes to 0 where the smallest wins, and NaNs of either sign above +infinity;
/// where the largest wins, +infinity comes to 2^32 - 1, and NaNs below -infinity.
template <class Order>
inline constexpr FloatKey kShift = isSmallest<Order> ? 0u - kLowest : 0xFFFFFFFF - kInfinity;

}  // namespace detail

template <class Order>
QORI_INLINE Vec<FloatKey> keysOf(Vec<FloatKey> bits) {
    return Vec<FloatKey>{detail::inOrder(bits.v)} + splat(detail::kShift<Order>);
}

/// The floats' bits; NaN, quiet, where there was no number.
template <class Order>
QORI_INLINE Vec<FloatKey> bitsOf(Vec<FloatKey> keys) {
    constexpr FloatKey quietNan = 0x7FC00000;
    const Vec<FloatKey> bits{detail::inOrder((keys - splat(detail::kShift<Order>)).v)};
    const Mask<FloatKey> none = detail::isSmallest<Order>
                                    ? isAtMost(splat(detail::kInfinity - detail::kLowest + 1), keys)
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
    QORI_INLINE static Vec<FloatKey> of(Vec<FloatKey> a) { return keysOf<Order>(a); }
};

template <class Order>
struct FromKeys {
    QORI_INLINE static Vec<FloatKey> of(Vec<FloatKey> a) { return bitsOf<Order>(a); }
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

/// One of several rows that enter a block of rows, one below the other.
template <class T>
struct EnteringRow {
    T* row;              ///< Becomes the join of its taps.
    const T* lastRows;   ///< The join of the rows of the block before that its window has; null where it has none.
    const T* elsewhere;  ///< What else the window has, or null.
    T* to;               ///< Becomes the finished join of all that the window has; may be `elsewhere`.
};

inline constexpr int kMostEntering = 8;

template <class T>
struct EnteringRows {
    const T* const* taps;  ///< So many of the first row, as many of the next ...
    int tapsEach;
    const EnteringRow<T>* row;
    int rows;
    const T* before;  ///< The join of the block's rows above, or null where these are its first.
    T* soFar;         ///< Becomes that join with these rows; may be `before`.
    ptrdiff_t elements;
};

namespace detail {

/// Stores what is made of the vectors at a place.
template <class T>
struct Stored {
    const EnteringRows<T>& rows;
    ptrdiff_t at;

    QORI_INLINE void row(int k, int v, Vec<T> a) { store(rows.row[k].row + at + v * Vec<T>::lanes, a); }
    QORI_INLINE void result(int k, int v, Vec<T> a) { store(rows.row[k].to + at + v * Vec<T>::lanes, a); }
    QORI_INLINE void soFar(int v, Vec<T> a) { store(rows.soFar + at + v * Vec<T>::lanes, a); }
};

/// Keeps what is made of one vector.
template <class T>
struct Held {
    Vec<T> rows[kMostEntering], results[kMostEntering], join;

    QORI_INLINE void row(int k, int, Vec<T> a) { rows[k] = a; }
    QORI_INLINE void result(int k, int, Vec<T> a) { results[k] = a; }
    QORI_INLINE void soFar(int, Vec<T> a) { join = a; }
    void storeAt(const EnteringRows<T>& entering, ptrdiff_t at) const {
        for (int k = 0; k < entering.rows; ++k) {
            store(entering.row[k].row + at, rows[k]);
            store(entering.row[k].to + at, results[k]);
        }
        store(entering.soFar + at, join);
    }
};

template <class Order, class Finish, bool keepAlpha, int fixed, int vectors, class T, class Made>
QORI_INLINE void enterVectors(const EnteringRows<T>& rows, ptrdiff_t at, Made& made) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    Vec<T> soFar[vectors];
    for (int v = 0; v < vectors; ++v)
        soFar[v] = rows.before == nullptr ? splat(Order::start) : load(rows.before + at + v * n);
    Taps<T, fixed> taps{rows.taps, rows.tapsEach};
    for (int k = 0; k < rows.rows; ++k) {
        const EnteringRow<T> entering = rows.row[k];
        Vec<T> row[vectors];
        joinVectors<Order, vectors>(taps, at, row);
        taps.row += taps.size();
        for (int v = 0; v < vectors; ++v) {
            made.row(k, v, row[v]);
            row[v] = soFar[v] = Order::join(soFar[v], row[v]);
        }
        if (entering.lastRows != nullptr)
            for (int v = 0; v < vectors; ++v) row[v] = Order::join(row[v], load(entering.lastRows + at + v * n));
        if (entering.elsewhere != nullptr)
            for (int v = 0; v < vectors; ++v) row[v] = Order::join(row[v], load(entering.elsewhere + at + v * n));
        for (int v = 0; v < vectors; ++v) {
            row[v] = Finish::of(row[v]);
            if constexpr (keepAlpha) row[v] = withAlphaOf(row[v], load(entering.to + at + v * n));
            made.result(k, v, row[v]);
        }
    }
    for (int v = 0; v < vectors; ++v) made.soFar(v, soFar[v]);
}

/// Rows of less than a vector.
template <class Order, class Finish, bool keepAlpha, class T>
QORI_NOINLINE void enterNarrow(const EnteringRows<T>& rows) {
    const T* before = rows.before;
    for (int k = 0; k < rows.rows; ++k) {
        const EnteringRow<T>& entering = rows.row[k];
        joinNarrow<Order, AsIs, false>(rows.taps + k * rows.tapsEach, rows.tapsEach, entering.row, rows.elements);
        const T* const block[] = {entering.row, before};
        joinNarrow<Order, AsIs, false>(block, before == nullptr ? 1 : 2, rows.soFar, rows.elements);
        before = rows.soFar;
        const T* all[3] = {rows.soFar};
        int count = 1;
        if (entering.lastRows != nullptr) all[count++] = entering.lastRows;
        if (entering.elsewhere != nullptr) all[count++] = entering.elsewhere;
        joinNarrow<Order, Finish, keepAlpha>(all, count, entering.to, rows.elements);
    }
}

/// The last vector ends with the rows and overlaps the one before: it is made first, as rows are read that others
/// become, and stored last.
template <class Order, class Finish, bool keepAlpha, int fixed, class T>
QORI_NOINLINE void enterRows(const EnteringRows<T>& rows) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    constexpr int vectors = 4;
    const ptrdiff_t elements = rows.elements;
    if (elements < n) return enterNarrow<Order, Finish, keepAlpha>(rows);
    const bool overlaps = elements % n != 0;
    Held<T> last;
    if (overlaps) enterVectors<Order, Finish, keepAlpha, fixed, 1>(rows, elements - n, last);
    ptrdiff_t i = 0;
    for (; i <= elements - vectors * n; i += vectors * n) {
        Stored<T> stored{rows, i};
        enterVectors<Order, Finish, keepAlpha, fixed, vectors>(rows, i, stored);
    }
    for (; i <= elements - n; i += n) {
        Stored<T> stored{rows, i};
        enterVectors<Order, Finish, keepAlpha, fixed, 1>(rows, i, stored);
    }
    if (overlaps) last.storeAt(rows, elements - n);
}

}  // namespace detail

template <class Order, class Finish, bool keepAlpha, class T>
void enterBlock(const EnteringRows<T>& rows) {
    using namespace detail;
    switch (rows.tapsEach) {
        case 1: return enterRows<Order, Finish, keepAlpha, 1>(rows);
        case 2: return enterRows<Order, Finish, keepAlpha, 2>(rows);
        case 3: return enterRows<Order, Finish, keepAlpha, 3>(rows);
        case 4: return enterRows<Order, Finish, keepAlpha, 4>(rows);
        case 5: return enterRows<Order, Finish, keepAlpha, 5>(rows);
        case 6: return enterRows<Order, Finish, keepAlpha, 6>(rows);
        case 7: return enterRows<Order, Finish, keepAlpha, 7>(rows);
        default: return enterRows<Order, Finish, keepAlpha, 0>(rows);
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
