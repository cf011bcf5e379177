// SPDX-License-Identifier: Apache-2.0
// What joins compute. Only the files that make tables of them include this, one for each size of elements.
#pragma once
#include <limits>
#include <type_traits>

#include "joins.h"
#include "kernels/map.h"
#include "kernels/streamed_lines.h"
#include "kernels/vector_math.h"
#include "widen.h"

namespace qori::kernels {

/// Elements of type T, ordered as values of type Value, of which the smallest or the largest wins.
template <class T, class Value, bool largest>
struct Extreme {
    using Element = T;
    static constexpr bool isLargest = largest;
    using Limits = std::numeric_limits<Value>;
    /// What every element replaces.
    static constexpr T start = static_cast<T>(largest ? Limits::min() : Limits::max());
    QORI_INLINE static Vec<T> join(Vec<T> a, Vec<T> b) {
        const Vec<Value> x{a.v}, y{b.v};
        return {largest ? larger(x, y).v : smaller(x, y).v};
    }
};

namespace detail {

/// Positive floats are in the order of their bits, negative ones in reverse. Its own inverse.
QORI_INLINE __m256i inOrder(__m256i bits) {
    return _mm256_xor_si256(bits, _mm256_srli_epi32(_mm256_srai_epi32(bits, 31), 1));
}

/// inOrder() of -infinity and +infinity, as unsigned integers.
inline constexpr FloatKey kLowest = 0x807FFFFF, kInfinity = 0x7F800000;

/// Added to what is in order. -infinity comes to 0 where the smallest wins, and NaNs of either sign above +infinity;
/// where the largest wins, +infinity comes to 2^32 - 1, and NaNs below -infinity.
template <bool largest>
inline constexpr FloatKey kShift = largest ? 0xFFFFFFFF - kInfinity : 0u - kLowest;

template <bool largest>
QORI_INLINE Vec<FloatKey> keysOf(Vec<FloatKey> bits) {
    return Vec<FloatKey>{inOrder(bits.v)} + splat(kShift<largest>);
}
template <bool largest>
QORI_INLINE Vec<FloatKey> bitsOf(Vec<FloatKey> keys) {
    constexpr FloatKey quietNan = 0x7FC00000;
    const Vec<FloatKey> bits{inOrder((keys - splat(kShift<largest>)).v)};
    const Mask<FloatKey> none =
        largest ? isAtMost(keys, splat(kLowest - kInfinity - 2)) : isAtMost(splat(kInfinity - kLowest + 1), keys);
    return select(none, splat(quietNan), bits);
}

template <class Order, int vectors, class T>
QORI_INLINE void finish(Vec<T>* a, const JoinFinish& how, const T* there) {
    if constexpr (std::is_same_v<T, FloatKey>)
        if (how.decodes)
            for (int v = 0; v < vectors; ++v) a[v] = bitsOf<Order::isLargest>(a[v]);
    if (how.keepsAlpha)
        for (int v = 0; v < vectors; ++v) a[v] = withAlphaOf(a[v], load(there + v * Vec<T>::lanes));
}

// --- rows -----------------------------------------------------------------------------------------------------------

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

template <class Order, bool finishes, int vectors, class T, int fixed>
QORI_INLINE void joinBlock(Taps<T, fixed> taps, ptrdiff_t at, T* to, const JoinFinish& how) {
    Vec<T> out[vectors];
    joinVectors<Order, vectors>(taps, at, out);
    if constexpr (finishes) finish<Order, vectors>(out, how, static_cast<const T*>(to) + at);
    for (int v = 0; v < vectors; ++v) store(to + at + v * Vec<T>::lanes, out[v]);
}

/// Rows of less than a vector.
template <class Order, class T>
QORI_NOINLINE void joinNarrow(const T* const* row, int count, T* to, ptrdiff_t elements, const JoinFinish& how) {
    Vec<T> out = loadPartial(row[0], elements);
    for (int k = 1; k < count; ++k) out = Order::join(out, loadPartial(row[k], elements));
    if constexpr (std::is_same_v<T, FloatKey>)
        if (how.decodes) out = bitsOf<Order::isLargest>(out);
    if (how.keepsAlpha) out = withAlphaOf(out, loadPartial(to, elements));
    storePartial(to, out, elements);
}

inline constexpr JoinFinish kNoFinish{false, false};

/// The last vector ends with the row and overlaps the one before: where `to` is one of the rows, it joins what is
/// joined already, which only rows that are not finished allow.
template <class Order, bool finishes, int fixed, class T>
QORI_NOINLINE void joinRows(const T* const* row, int count, T* to, ptrdiff_t elements, const JoinFinish& how) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    constexpr int vectors = 4;
    const Taps<T, fixed> taps{row, count};
    if (elements < n) return joinNarrow<Order>(row, taps.size(), to, elements, how);
    ptrdiff_t i = 0;
    for (; i <= elements - vectors * n; i += vectors * n) joinBlock<Order, finishes, vectors>(taps, i, to, how);
    for (; i <= elements - n; i += n) joinBlock<Order, finishes, 1>(taps, i, to, how);
    if (i < elements) joinBlock<Order, finishes, 1>(taps, elements - n, to, how);
}

template <class Order, class T = typename Order::Element>
void join(const T* const* row, int count, T* to, ptrdiff_t elements) {
    switch (count) {
        case 2: return joinRows<Order, false, 2>(row, count, to, elements, kNoFinish);
        case 3: return joinRows<Order, false, 3>(row, count, to, elements, kNoFinish);
        case 4: return joinRows<Order, false, 4>(row, count, to, elements, kNoFinish);
        case 7: return joinRows<Order, false, 7>(row, count, to, elements, kNoFinish);
        default: return joinRows<Order, false, 0>(row, count, to, elements, kNoFinish);
    }
}

template <class Order, class T = typename Order::Element>
void joinInto(const T* const* row, int count, T* to, ptrdiff_t elements, JoinFinish how) {
    if (how.isNone()) return join<Order>(row, count, to, elements);
    if constexpr (std::is_same_v<T, FloatKey>) {  // which always are finished
        switch (count) {
            case 2: return joinRows<Order, true, 2>(row, count, to, elements, how);
            case 3: return joinRows<Order, true, 3>(row, count, to, elements, how);
            case 4: return joinRows<Order, true, 4>(row, count, to, elements, how);
            default: break;
        }
    }
    joinRows<Order, true, 0>(row, count, to, elements, how);
}

template <class Order, int pixelBytes, int rounds, class T>
void widenRows(const WideningRows<T>& rows) {
    if constexpr (rounds > 1)
        if (rows.rounds < rounds) return widenRows<Order, pixelBytes, rounds - 1>(rows);
    for (int k = 0; k < rows.rows; k += 2) {
        const int other = k + 1 < rows.rows ? k + 1 : k;
        widenTwo<Order, pixelBytes, rounds>(asBytes(rows.row[k]), asBytes(rows.row[other]), asBytes(rows.to[k]),
                                            asBytes(rows.to[other]), rows.seen * ptrdiff_t{sizeof(T)},
                                            rows.ahead * ptrdiff_t{sizeof(T)});
    }
}

template <class Order, int channels, class T>
void widenPixels(const WideningRows<T>& rows) {
    constexpr int pixelBytes = channels * static_cast<int>(sizeof(T));
    widenRows<Order, pixelBytes, mostRounds(pixelBytes)>(rows);
}

template <class Order, class T = typename Order::Element>
void widen(const WideningRows<T>& rows) {
    switch (rows.channels) {
        case 1: return widenPixels<Order, 1>(rows);
        case 3: return widenPixels<Order, 3>(rows);
        default: return widenPixels<Order, 4>(rows);
    }
}

// --- blocks of rows -------------------------------------------------------------------------------------------------

/// What is made of one vector, before it is stored.
template <class T>
struct Held {
    Vec<T> rows[kMostEntering], results[kMostEntering], join;

    void storeAt(const EnteringRows<T>& entering, ptrdiff_t at) const {
        for (int k = 0; k < entering.rows; ++k) {
            store(entering.row[k].row + at, rows[k]);
            store(entering.row[k].to + at, results[k]);
        }
        store(entering.soFar + at, join);
    }
};

/// Rows of so few taps come from the cache, and what is slow are the destination's; more are read from the image, where
/// what prefetches them is in the way of loads.
inline constexpr int kFewTaps = 4;

/// Stores what is made, or holds it.
template <class Order, int fixed, int vectors, class T>
QORI_INLINE void enterVectors(const EnteringRows<T>& rows, ptrdiff_t at, Held<T>* held) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    Vec<T> soFar[vectors];
    for (int v = 0; v < vectors; ++v)
        soFar[v] = rows.before == nullptr ? splat(Order::start) : load(rows.before + at + v * n);
    Taps<T, fixed> taps{rows.taps, rows.tapsEach};
    for (int k = 0; k < rows.rows; ++k) {
        const EnteringRow<T> entering = rows.row[k];
        T* const rowTo = held == nullptr ? entering.row + at : reinterpret_cast<T*>(held->rows + k);
        T* const to = held == nullptr ? entering.to + at : reinterpret_cast<T*>(held->results + k);
        Vec<T> row[vectors];
        joinVectors<Order, vectors>(taps, at, row);
        taps.row += taps.size();
        for (int v = 0; v < vectors; ++v) {
            store(rowTo + v * n, row[v]);
            row[v] = soFar[v] = Order::join(soFar[v], row[v]);
        }
        if (entering.lastRows != nullptr)
            for (int v = 0; v < vectors; ++v) row[v] = Order::join(row[v], load(entering.lastRows + at + v * n));
        if (entering.elsewhere != nullptr)
            for (int v = 0; v < vectors; ++v) row[v] = Order::join(row[v], load(entering.elsewhere + at + v * n));
        if constexpr (vectors > 1 && fixed > 0 && fixed <= kFewTaps)
            for (int bytes = 0; bytes < vectors * kVectorBytes; bytes += kCacheLine)
                __builtin_prefetch(asBytes(entering.to + at) + 2 * vectors * kVectorBytes + bytes);
        finish<Order, vectors>(row, rows.finish, static_cast<const T*>(entering.to) + at);
        for (int v = 0; v < vectors; ++v) store(to + v * n, row[v]);
    }
    T* const soFarTo = held == nullptr ? rows.soFar + at : reinterpret_cast<T*>(&held->join);
    for (int v = 0; v < vectors; ++v) store(soFarTo + v * n, soFar[v]);
}

/// Rows of less than a vector.
template <class Order, class T>
QORI_NOINLINE void enterNarrow(const EnteringRows<T>& rows) {
    const T* before = rows.before;
    for (int k = 0; k < rows.rows; ++k) {
        const EnteringRow<T>& entering = rows.row[k];
        joinNarrow<Order>(rows.taps + k * rows.tapsEach, rows.tapsEach, entering.row, rows.elements, kNoFinish);
        const T* const block[] = {entering.row, before};
        joinNarrow<Order>(block, before == nullptr ? 1 : 2, rows.soFar, rows.elements, kNoFinish);
        before = rows.soFar;
        const T* all[3] = {rows.soFar};
        int count = 1;
        if (entering.lastRows != nullptr) all[count++] = entering.lastRows;
        if (entering.elsewhere != nullptr) all[count++] = entering.elsewhere;
        joinNarrow<Order>(all, count, entering.to, rows.elements, rows.finish);
    }
}

template <class Order, int fixed, class T>
QORI_NOINLINE void enterVector(const EnteringRows<T>& rows, ptrdiff_t at, Held<T>* held) {
    enterVectors<Order, fixed, 1>(rows, at, held);
}

/// The last vector ends with the rows and overlaps the one before: it is made first, as rows are read that others
/// become, and stored last.
template <class Order, int fixed, class T>
QORI_NOINLINE void enterRows(const EnteringRows<T>& rows) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    constexpr int vectors = 4;
    const ptrdiff_t elements = rows.elements;
    if (elements < n) return enterNarrow<Order>(rows);
    const bool overlaps = elements % n != 0;
    Held<T> last;
    if (overlaps) enterVector<Order, fixed>(rows, elements - n, &last);
    ptrdiff_t i = 0;
    for (; i <= elements - vectors * n; i += vectors * n)
        enterVectors<Order, fixed, vectors>(rows, i, static_cast<Held<T>*>(nullptr));
    for (; i <= elements - n; i += n) enterVector<Order, fixed>(rows, i, static_cast<Held<T>*>(nullptr));
    if (overlaps) last.storeAt(rows, elements - n);
}

template <class Order, class T = typename Order::Element>
void enterBlock(const EnteringRows<T>& rows) {
    switch (rows.tapsEach) {
        case 1: return enterRows<Order, 1>(rows);
        case 2: return enterRows<Order, 2>(rows);
        case 3: return enterRows<Order, 3>(rows);
        case 4: return enterRows<Order, 4>(rows);
        case 5: return enterRows<Order, 5>(rows);
        case 6: return enterRows<Order, 6>(rows);
        case 7: return enterRows<Order, 7>(rows);
        default: return enterRows<Order, 0>(rows);
    }
}

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

template <class Order, class T = typename Order::Element>
void joinBlockUpwards(T* last, ptrdiff_t step, int32_t rows, ptrdiff_t elements) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    constexpr int vectors = 4;
    ptrdiff_t i = 0;
    for (; i <= elements - vectors * n; i += vectors * n) joinUpwards<Order, vectors>(last, step, rows, i);
    for (; i < elements; i += n) joinUpwards<Order, 1>(last, step, rows, i);
}

template <class Order>
constexpr Joins<typename Order::Element> joinsOf() {
    return {join<Order>, joinInto<Order>, widen<Order>, enterBlock<Order>, joinBlockUpwards<Order>};
}

}  // namespace detail
}  // namespace qori::kernels
