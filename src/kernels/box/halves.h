// SPDX-License-Identifier: Apache-2.0
// Wide windows of bytes of three channels along a row, two halves of which run side by side. The sum of a window and
// that of the window four pixels on differ by the changes of four pixels; so the sums of four pixels, three vectors, go
// on by additions alone: lanes wait for no other lane.
//
// A 32-bit sum's change is made of two changes of two pixels, which 16 bits hold for at most 64 rows: the multiply-add
// of neighbours widens and adds them at once. Counted for 32 bytes across: 8 instructions make the changes, 16 sums,
// 11 means, 35 on three ports; 17 cycles were measured for rows in the first-level cache, whose unaligned loads
// cross lines. Sums within vectors of neighbours take 56, of which 20 shuffles have one port, and took 24 cycles. One
// and four channels have fewer shuffles to lose: they gained nothing from this.
#pragma once
#include "kernels/box/across.h"

namespace qori::kernels {

/// The most rows of which 16 bits hold the changes of two pixels.
inline constexpr int32_t kRowsInHalves = INT16_MAX / (2 * 255);

/// Beyond the second-level cache, destinations of two places at a time cost more than the shuffles that they save: at
/// 3840 x 2160, 15 x 15 and 61 x 61 ran at 0.87 to 0.9 of the rate of one place.
inline constexpr int64_t kMostBytesInHalves = 2 * 1024 * 1024;

/// Shorter rows are not worth the first sums of two halves.
inline constexpr ptrdiff_t kLeastForHalves = 192;

namespace detail {

inline constexpr int kTriple = 3;

/// A half of a piece is a multiple of whole vectors of bytes and of pixels; halves overlap.
inline constexpr ptrdiff_t kHalfUnit = 48, kMostOfHalf = 16 * kHalfUnit;

/// changes[i] = what the windows of `span` elements from i and from the next pixel on change by to the next pixel; two
/// pixels less than there are elements. The next pixels' changes are shifted in: loads that cross lines bind.
inline void changePairs(const uint16_t* sums, ptrdiff_t span, uint16_t* changes, ptrdiff_t elements) {
    constexpr ptrdiff_t n = Vec<uint16_t>::lanes;
    const ptrdiff_t all = elements - 2 * kTriple;
    const auto change = [=](ptrdiff_t i, auto count) __attribute__((always_inline)) {
        return loadUpTo(sums + span + i, count) - loadUpTo(sums + i, count);
    };
    ptrdiff_t i = 0;
    Vec<uint16_t> here = change(0, kWhole<uint16_t>);
    for (; i + 2 * n <= all; i += n) {
        const Vec<uint16_t> next = change(i + n, kWhole<uint16_t>);
        const __m256i across = _mm256_permute2x128_si256(here.v, next.v, 0x21);
        store(changes + i, here + Vec<uint16_t>{_mm256_alignr_epi8(across, here.v, 2 * kTriple)});
        here = next;
    }
    for (; i < all; i += n) {
        const ptrdiff_t count = all - i < n ? all - i : n;
        storeUpTo(changes + i, change(i, count) + change(i + kTriple, count), count);
    }
}

/// Sums of the first four windows of `span` elements.
inline void firstFour(const uint16_t* sums, ptrdiff_t span, uint32_t* first) {
    constexpr ptrdiff_t turn = 4 * kTriple;  // of 16, so that lanes have the same channel every time
    Vec<uint32_t> even = zero<uint32_t>(), odd = zero<uint32_t>();
    const auto add = [&](Vec<uint16_t> a) __attribute__((always_inline)) {
        even = even + Vec<uint32_t>{_mm256_and_si256(a.v, _mm256_set1_epi32(0xFFFF))};
        odd = odd + Vec<uint32_t>{_mm256_srli_epi32(a.v, 16)};
    };
    ptrdiff_t i = 0;
    for (; i + Vec<uint16_t>::lanes <= span; i += turn) add(load(sums + i));
    for (; i < span; i += turn) add(loadPartial(sums + i, span - i));
    alignas(kVectorBytes) uint32_t ofLanes[2][Vec<uint32_t>::lanes];
    store(ofLanes[0], even);
    store(ofLanes[1], odd);
    for (int c = 0; c < kTriple; ++c) first[c] = 0;
    for (int k = 0; k < turn; ++k) first[k % kTriple] += ofLanes[k % 2][k / 2];
    for (int k = kTriple; k < turn; ++k) first[k] = first[k - kTriple] + sums[k - kTriple + span] - sums[k - kTriple];
}

/// `inUnits`: sums lie on top of the bits of 2^23 as a float.
template <bool inUnits>
QORI_NOINLINE void runHalves(const uint16_t* sums, ptrdiff_t span, uint8_t* dst, ptrdiff_t elements, FloatMean rule) {
    const ptrdiff_t half = ((elements + 1) / 2 + kHalfUnit - 1) / kHalfUnit * kHalfUnit, second = elements - half;
    // What lies behind the changes is read for windows behind the last.
    alignas(kVectorBytes) uint16_t changes[2 * kMostOfHalf + 2 * kTriple + Vec<uint16_t>::lanes];
    changePairs(sums, span, changes, elements);
    for (int k = 0; k < 4 * kTriple; ++k) changes[elements - 2 * kTriple + k] = 0;
    alignas(kBlockBytes) uint32_t first[2][4 * kTriple];
    firstFour(sums, span, first[0]);
    firstFour(sums + second, span, first[1]);
    Vec<uint32_t> next[kTriple];
    for (int c = 0; c < kTriple; ++c) {
        next[c] = {loadBlocks(reinterpret_cast<const uint8_t*>(first[0] + 4 * c),
                              reinterpret_cast<const uint8_t*>(first[1] + 4 * c))
                       .v};
        if constexpr (inUnits) next[c] = next[c] + splat<uint32_t>(uint32_t{kUnitsBits} << 16);
    }
    const auto both = [&](ptrdiff_t at) __attribute__((always_inline)) {
        return loadBlocks(reinterpret_cast<const uint8_t*>(changes + at),
                          reinterpret_cast<const uint8_t*>(changes + second + at))
            .v;
    };
    const __m256i ones = _mm256_set1_epi16(1);
    for (ptrdiff_t i = 0; i < half; i += kBlockBytes) {
        __m256i mean[4];
        for (int k = 0; k < 2; ++k) {
            const __m256i two = both(i + 8 * k), further = both(i + 8 * k + 2 * kTriple);
            const __m256i change[] = {_mm256_madd_epi16(_mm256_unpacklo_epi16(two, further), ones),
                                      _mm256_madd_epi16(_mm256_unpackhi_epi16(two, further), ones)};
            for (int v = 0; v < 2; ++v) {
                mean[2 * k + v] = inUnits ? rule.meanOfUnits(next[0].v) : rule.mean(next[0]);
                const Vec<uint32_t> onwards = next[0] + Vec<uint32_t>{change[v]};
                next[0] = next[1];
                next[1] = next[2];
                next[2] = onwards;
            }
        }
        storeBlocks(dst + i, dst + second + i,
                    {_mm256_packus_epi16(_mm256_packs_epi32(mean[0], mean[1]), _mm256_packs_epi32(mean[2], mean[3]))});
    }
}

}  // namespace detail

/// dst[i] = the mean of the window of `columns` pixels of three channels that begins at sums + i, and has at most
/// kRowsInHalves rows and an area below 2^31 / 255. kLeastForHalves elements at least.
inline void acrossHalves(const uint16_t* sums, ptrdiff_t columns, int64_t area, uint8_t* dst, ptrdiff_t elements) {
    using namespace detail;
    const FloatMean rule(area);
    const ptrdiff_t span = columns * kTriple, pixels = elements / kTriple;
    const ptrdiff_t pieces = (elements + 2 * kMostOfHalf - 1) / (2 * kMostOfHalf);
    for (ptrdiff_t k = 0; k < pieces; ++k) {
        const ptrdiff_t begin = pixels * k / pieces * kTriple, end = pixels * (k + 1) / pieces * kTriple;
        if (area <= kMostInUnits)
            runHalves<true>(sums + begin, span, dst + begin, end - begin, rule);
        else
            runHalves<false>(sums + begin, span, dst + begin, end - begin, rule);
    }
}

}  // namespace qori::kernels
