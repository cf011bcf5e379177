// SPDX-License-Identifier: Apache-2.0
// Smallest and largest elements, and where they are. Lanes are arranged as in reduce.h: a round of three vectors holds
// whole pixels of 1, 3 and 4 channels. So does the way back from a row's end, which makes its last vector the third of
// a round; extrema do not mind that it overlaps the one before.
//
// Float extrema ignore NaN: an element that is not a number never replaces the best so far.
#pragma once
#include <limits>

#include "kernels/map.h"
#include "kernels/simd.h"

namespace qori::kernels {

template <class T>
QORI_INLINE Vec<T> filled(T value) {
    if constexpr (std::is_same_v<T, float>)
        return {_mm256_set1_ps(value)};
    else if constexpr (sizeof(T) == 1)
        return {_mm256_set1_epi8(static_cast<char>(value))};
    else
        return {_mm256_set1_epi16(static_cast<int16_t>(value))};
}

template <class T>
struct Smallest {
    using Element = T;
    /// What every element may replace.
    static constexpr T start =
        std::is_floating_point_v<T> ? std::numeric_limits<T>::infinity() : std::numeric_limits<T>::max();
    /// What no element can replace.
    static constexpr T limit =
        std::is_floating_point_v<T> ? -std::numeric_limits<T>::infinity() : std::numeric_limits<T>::lowest();

    static bool better(T a, T b) { return a < b; }
    QORI_INLINE static Vec<T> join(Vec<T> a, Vec<T> best) {
        if constexpr (std::is_same_v<T, float>)
            return {_mm256_min_ps(a.v, best.v)};
        else if constexpr (std::is_same_v<T, uint8_t>)
            return {_mm256_min_epu8(a.v, best.v)};
        else if constexpr (std::is_same_v<T, uint16_t>)
            return {_mm256_min_epu16(a.v, best.v)};
        else
            return {_mm256_min_epi16(a.v, best.v)};
    }
};

template <class T>
struct Biggest {
    using Element = T;
    static constexpr T start = Smallest<T>::limit, limit = Smallest<T>::start;

    static bool better(T a, T b) { return a > b; }
    QORI_INLINE static Vec<T> join(Vec<T> a, Vec<T> best) {
        if constexpr (std::is_same_v<T, float>)
            return {_mm256_max_ps(a.v, best.v)};
        else if constexpr (std::is_same_v<T, uint8_t>)
            return {_mm256_max_epu8(a.v, best.v)};
        else if constexpr (std::is_same_v<T, uint16_t>)
            return {_mm256_max_epu16(a.v, best.v)};
        else
            return {_mm256_max_epi16(a.v, best.v)};
    }
};

namespace detail {

/// Behind the operation that joined `other` to an accumulator of a loop: else compilers may put the new value into a
/// register of its own, or of the other's that is free now, and copy it back in every round.
template <class V>
QORI_INLINE void updateInPlace(V& accumulator, const V& other) {
    __asm__("" : "+x"(accumulator) : "x"(other));
}

alignas(32) inline constexpr uint8_t kOnesThenZeros[64] = {255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255,
                                                           255, 255, 255, 255, 255, 255, 255, 255, 255, 255, 255,
                                                           255, 255, 255, 255, 255, 255, 255, 255, 255, 255};

/// All bits of the first `count` lanes (0 to all).
template <class T>
QORI_INLINE __m256i firstLanes(ptrdiff_t count) {
    return _mm256_loadu_si256(
        reinterpret_cast<const __m256i*>(kOnesThenZeros + 32 - count * static_cast<ptrdiff_t>(sizeof(T))));
}

/// The lanes of a that mask selects, `other` elsewhere.
template <class T>
QORI_INLINE Vec<T> select(Vec<T> a, T other, __m256i mask) {
    return fromInteger<T>(_mm256_blendv_epi8(toInteger(filled(other).v), toInteger(a.v), mask));
}

/// All bits of the equal lanes.
template <class T>
QORI_INLINE __m256i equal(Vec<T> a, Vec<T> b) {
    if constexpr (std::is_same_v<T, float>)
        return toInteger(_mm256_cmp_ps(a.v, b.v, _CMP_EQ_OQ));
    else if constexpr (sizeof(T) == 1)
        return _mm256_cmpeq_epi8(a.v, b.v);
    else
        return _mm256_cmpeq_epi16(a.v, b.v);
}

/// The best of the elements that lie a multiple of `count` (1 or 4) apart, in the first ones.
template <class Order, class T>
QORI_INLINE Vec<T> folded(Vec<T> best, int count) {
    const auto fold = [&](__m256i moved) { best = Order::join(fromInteger<T>(moved), best); };
    const int bytes = count * static_cast<int>(sizeof(T));
    fold(_mm256_permute2x128_si256(toInteger(best.v), toInteger(best.v), 1));
    if (bytes <= 8) fold(_mm256_srli_si256(toInteger(best.v), 8));
    if (bytes <= 4) fold(_mm256_srli_si256(toInteger(best.v), 4));
    if (sizeof(T) <= 2 && bytes <= 2) fold(_mm256_srli_si256(toInteger(best.v), 2));
    if (sizeof(T) == 1 && bytes <= 1) fold(_mm256_srli_si256(toInteger(best.v), 1));
    return best;
}

}  // namespace detail

/// The best so far of each position in a round.
template <class Order>
struct ExtremumLanes {
    using T = typename Order::Element;
    static constexpr int vectors = 3;

    Vec<T> best[vectors] = {filled(Order::start), filled(Order::start), filled(Order::start)};

    /// The best of each channel, in the first of four elements.
    QORI_INLINE void ofChannels(int channels, T* out) const {
        constexpr int n = Vec<T>::lanes;
        T values[vectors * n];
        if (channels != 3) {  // Whole pixels of 1 and of 4 channels fill a vector, so that the three are alike.
            store(values, detail::folded<Order>(Order::join(Order::join(best[0], best[1]), best[2]), channels));
        } else {
            for (int v = 0; v < vectors; ++v) store(values + v * n, best[v]);
            for (int half = vectors * n / 2; half >= 3; half /= 2)
                for (int i = 0; i < half; ++i)
                    values[i] = Order::better(values[half + i], values[i]) ? values[half + i] : values[i];
        }
        __builtin_memcpy(out, values, 4 * sizeof(T));
    }
};

/// Joins one row into each of the orders' lanes. Layouts share it.
template <class T, class... Orders>
QORI_NOINLINE void extremaRow(ptrdiff_t elements, const T* src, ExtremumLanes<Orders>&... lanes) {
    constexpr int n = Vec<T>::lanes;
    const auto join = [](auto& lane, Vec<T> a, auto order) { lane = decltype(order)::join(a, lane); };
    if (elements < n) {
        const __m256i own = detail::firstLanes<T>(elements);
        const Vec<T> a = loadPartial(src, elements);
        (join(lanes.best[0], detail::select(a, Orders::start, own), Orders{}), ...);
        return;
    }
    ptrdiff_t i = 0;
    const auto rounds = [&](ExtremumLanes<Orders>... own) {  // copies: lanes in registers
        for (; i <= elements - 3 * n; i += 3 * n)
            for (int v = 0; v < 3; ++v) {
                Vec<T> a = load(src + i + v * n);
                if constexpr (sizeof...(Orders) > 1) loadOnce(a.v);
                (join(own.best[v], a, Orders{}), ...);
                if constexpr (sizeof...(Orders) > 1 && std::is_integral_v<T>)
                    (detail::updateInPlace(own.best[v].v, a.v), ...);
            }
        ((lanes = own), ...);
    };
    if (elements >= 3 * n) rounds(lanes...);
    for (int v = 0; i <= elements - n; i += n, ++v) {
        const Vec<T> a = load(src + i);
        (join(lanes.best[v], a, Orders{}), ...);
    }
    if (i < elements) {
        const Vec<T> a = load(src + elements - n);
        (join(lanes.best[2], a, Orders{}), ...);
    }
}

/// Whether any lane has become better than its channel's best.
template <class Order, class T>
QORI_INLINE bool anyBetter(const ExtremumLanes<Order>& lanes, const ChannelVectors<T>& best) {
    __m256i same = _mm256_set1_epi8(-1);
    for (int v = 0; v < 3; ++v)
        same = _mm256_and_si256(same, detail::equal(Order::join(lanes.best[v], best.v[v]), best.v[v]));
    return _mm256_movemask_epi8(same) != -1;
}

/// All bits of one channel's elements.
template <class T>
ChannelVectors<T> channelMasks(int channels, int channel) {
    T masks[4] = {};
    __builtin_memset(masks + channel, 0xFF, sizeof(T));
    return channelVectors(masks, channels);
}

/// The index of a row's first element of a channel that equals value, or -1.
template <class T>
QORI_NOINLINE ptrdiff_t findInRow(const T* src, ptrdiff_t elements, const ChannelVectors<T>& masks, T value) {
    constexpr int n = Vec<T>::lanes;
    const Vec<T> wanted = filled(value);
    const auto found = [&](Vec<T> a, int phase) {
        return _mm256_and_si256(detail::equal(a, wanted), toInteger(masks.v[phase].v));
    };
    ptrdiff_t i = 0;
    for (; i <= elements - 3 * n; i += 3 * n) {
        const __m256i first = found(load(src + i), 0), second = found(load(src + i + n), 1);
        const __m256i any = _mm256_or_si256(_mm256_or_si256(first, second), found(load(src + i + 2 * n), 2));
        if (!_mm256_testz_si256(any, any)) break;
    }
    for (int phase = 0; i < elements; i += n, phase = phase < 2 ? phase + 1 : 0) {
        const int bits = _mm256_movemask_epi8(found(loadUpTo(src + i, elements - i), phase));
        if (bits == 0) continue;
        const ptrdiff_t at = i + __builtin_ctz(static_cast<unsigned>(bits)) / static_cast<int>(sizeof(T));
        return at < elements ? at : -1;  // zeros behind the row may equal the value
    }
    return -1;
}

/// Extrema of each column over `rows` rows, into buffers.
template <class T>
QORI_NOINLINE void columnExtrema(const T* src, ptrdiff_t step, int32_t rows, ptrdiff_t columns, T* smallest,
                                 T* biggest) {
    constexpr int n = Vec<T>::lanes;
    const auto advanced = [step](const T* p) {
        return reinterpret_cast<const T*>(reinterpret_cast<const uint8_t*>(p) + step);
    };
    ptrdiff_t i = 0;
    for (; i <= columns - 2 * n; i += 2 * n) {
        const T* p = src + i;
        Vec<T> low[2] = {filled(Smallest<T>::start), filled(Smallest<T>::start)};
        Vec<T> high[2] = {filled(Biggest<T>::start), filled(Biggest<T>::start)};
        for (int32_t y = 0; y < rows; ++y, p = advanced(p))
            for (int v = 0; v < 2; ++v) {
                Vec<T> a = load(p + v * n);
                loadOnce(a.v);
                low[v] = Smallest<T>::join(a, low[v]);
                high[v] = Biggest<T>::join(a, high[v]);
            }
        for (int v = 0; v < 2; ++v) {
            store(smallest + i + v * n, low[v]);
            store(biggest + i + v * n, high[v]);
        }
    }
    for (; i < columns; i += n) {
        const T* p = src + i;
        Vec<T> low = filled(Smallest<T>::start), high = filled(Biggest<T>::start);
        for (int32_t y = 0; y < rows; ++y, p = advanced(p)) {
            const Vec<T> a = loadUpTo(p, columns - i);
            low = Smallest<T>::join(a, low);
            high = Biggest<T>::join(a, high);
        }
        store(smallest + i, low);  // the buffers end on whole vectors
        store(biggest + i, high);
    }
}

/// Best of `count` elements of a buffer that reaches to the next whole vector and one beyond.
template <class Order, class T>
QORI_INLINE T bestOf(const T* buffer, ptrdiff_t count) {
    constexpr int n = Vec<T>::lanes;
    Vec<T> best = filled(Order::start);
    for (; count >= n; count -= n, buffer += n) best = Order::join(load(buffer), best);
    if (count > 0) best = Order::join(detail::select(load(buffer), Order::start, detail::firstLanes<T>(count)), best);
    best = detail::folded<Order>(best, 1);
    T lanes[n];
    store(lanes, best);
    return lanes[0];
}

}  // namespace qori::kernels
