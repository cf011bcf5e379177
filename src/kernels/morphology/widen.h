// SPDX-License-Identifier: Apache-2.0
// Rows joined with themselves one pixel on, the result with itself two pixels on, then four ...: windows of 2, 4, 8 ...
// pixels. Two rows run side by side, one in either half of the vectors, so that what is some pixels on is shifted in
// within the halves, by one instruction, and all rounds are made in registers: of taps in memory, half lie across
// lines.
#pragma once
#include "joins.h"
#include "kernels/simd.h"

namespace qori::kernels::detail {

/// One round: what it keeps of its input are the vectors that the next one is joined with.
template <class Order, int shift>
struct Doubling {
    using T = typename Order::Element;
    static constexpr int depth = (shift + kBlockBytes - 1) / kBlockBytes, rest = shift % kBlockBytes;

    Vec<T> before[depth];

    /// Takes the next vector; returns the result `depth` vectors before it.
    QORI_INLINE Vec<T> push(Vec<T> next) {
        __m256i further = next.v;
        if constexpr (rest != 0) further = _mm256_alignr_epi8(next.v, before[depth - 1].v, rest);
        const Vec<T> made = Order::join(before[0], Vec<T>{further});
        for (int k = 0; k + 1 < depth; ++k) before[k] = before[k + 1];
        before[depth - 1] = next;
        return made;
    }
};

/// Rounds from one that shifts by so many bytes on.
template <class Order, int shift, int rounds>
struct Doublings {
    using T = typename Order::Element;
    static constexpr int depth = Doubling<Order, shift>::depth + Doublings<Order, 2 * shift, rounds - 1>::depth;

    Doubling<Order, shift> first;
    Doublings<Order, 2 * shift, rounds - 1> others;

    QORI_INLINE Vec<T> push(Vec<T> next) { return others.push(first.push(next)); }
};
template <class Order, int shift>
struct Doublings<Order, shift, 0> {
    using T = typename Order::Element;
    static constexpr int depth = 0;

    QORI_INLINE Vec<T> push(Vec<T> next) { return next; }
};

/// Less than 16 bytes of either row; zeros behind the first `count`.
template <class T>
QORI_NOINLINE Vec<T> loadEnds(const uint8_t* a, const uint8_t* b, ptrdiff_t count) {
    if (count <= 0) return zero<T>();
    return {_mm256_permute2x128_si256(loadPartial(a, count).v, loadPartial(b, count).v, 0x20)};
}

/// Two rows; `seen` bytes are read of either, which those of `to` and all shifts come to. The processor is told of rows
/// `ahead` of them: what it sees ahead by itself ends with the row, and rounds leave it no time at the next one's
/// start.
template <class Order, int pixelBytes, int rounds, class T = typename Order::Element>
QORI_NOINLINE void widenTwo(const uint8_t* a, const uint8_t* b, uint8_t* toA, uint8_t* toB, ptrdiff_t seen,
                            ptrdiff_t ahead) {
    constexpr ptrdiff_t n = kBlockBytes, spread = ptrdiff_t{(1 << rounds) - 1} * pixelBytes;
    using Rounds = Doublings<Order, pixelBytes, rounds>;
    constexpr ptrdiff_t behind = Rounds::depth * n;
    constexpr int kUnrolled = 4;  // what rounds keep moves from register to register once for so many blocks
    Rounds made{};
    ptrdiff_t i = 0;
    const auto push = [&]() __attribute__((always_inline)) {
        return made.push(i + n <= seen ? Vec<T>{loadBlocks(a + i, b + i).v} : loadEnds<T>(a + i, b + i, seen - i));
    };
    const auto put = [&](ptrdiff_t at, Vec<T> v) __attribute__((always_inline)) {
        storeBlocks(toA + (at - behind), toB + (at - behind), {v.v});
    };
    for (; i < behind; i += n) push();
    for (; i + kUnrolled * n <= seen; i += kUnrolled * n) {
        __builtin_prefetch(a + i + ahead), __builtin_prefetch(b + i + ahead);
        for (ptrdiff_t at = i; at < i + kUnrolled * n; at += n)
            put(at, made.push(Vec<T>{loadBlocks(a + at, b + at).v}));
    }
    for (; i - behind < seen - spread; i += n) put(i, push());
}

}  // namespace qori::kernels::detail
