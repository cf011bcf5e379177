// SPDX-License-Identifier: Apache-2.0
#include "gather.h"

#include "floats.h"

namespace qori::kernels {
namespace {

constexpr int kLane = Gather::kLane;

struct Span {
    int32_t first, last;
};

Span spanOf(const int32_t* offsets) {
    Span span{offsets[0], offsets[0]};
    for (int i = 1; i < kLane; ++i) {
        span.first = offsets[i] < span.first ? offsets[i] : span.first;
        span.last = offsets[i] > span.last ? offsets[i] : span.last;
    }
    return span;
}

/// Shuffle indices of one lane for the load at `base`: those outside its 16 bytes get their top bit set. Offsets of a
/// lane lie within 64 bytes, so that signed saturation to bytes loses none: 0x70 added to 0..15 leaves the low bits,
/// and saturates the rest to 0x80 and above.
void makeMask(uint8_t* mask, const int32_t* offsets, int32_t base) {
    const __m256i origin = _mm256_set1_epi32(base);
    const auto relative = [&](int i) {
        return _mm256_sub_epi32(_mm256_loadu_si256(reinterpret_cast<const __m256i*>(offsets + i)), origin);
    };
    const __m256i words = _mm256_permute4x64_epi64(_mm256_packs_epi32(relative(0), relative(8)), 0xD8);
    const __m128i bytes = _mm_packs_epi16(_mm256_castsi256_si128(words), _mm256_extracti128_si256(words, 1));
    _mm_storeu_si128(reinterpret_cast<__m128i*>(mask), _mm_adds_epu8(bytes, _mm_set1_epi8(0x70)));
}

template <int windows>
QORI_NOINLINE void gatherRowOf(const Gather& gather, const uint8_t* row, const uint8_t* later, uint8_t* dst,
                               ptrdiff_t bytes) {
    const int32_t* base = gather.bases;
    const uint8_t* mask = gather.masks;
    ptrdiff_t i = 0;
    for (; i + 32 <= bytes; i += 32) {
        if constexpr (windows > 1) prefetch(later + base[0]);
        store(dst + i, gatherGroup<windows>(row, base, mask));
    }
    if (i < bytes) storePartial(dst + i, gatherGroup<windows>(row, base, mask), bytes - i);
}

template <class T>
void moveElements(const int32_t* offsets, const uint8_t* row, uint8_t* dst, ptrdiff_t bytes) {
    for (ptrdiff_t i = 0; i < bytes; i += static_cast<ptrdiff_t>(sizeof(T)))
        __builtin_memcpy(dst + i, row + offsets[i], sizeof(T));
}

void findAlike(Gather& gather) {
    const int32_t* bases = gather.bases;
    if (gather.groups < 6) return;
    gather.stride = bases[8] - bases[4];
    const auto isAlike = [&](ptrdiff_t g) {
        return bases[2 * g] - bases[2 * g - 4] == gather.stride &&
               bases[2 * g + 1] - bases[2 * g - 3] == gather.stride &&
               isSame(gather.masks + 32 * g, gather.masks + 32 * g - 64);
    };
    gather.alikeEnd = 4;
    while (gather.alikeEnd < gather.groups && isAlike(gather.alikeEnd)) ++gather.alikeEnd;
}

}  // namespace

Gather buildGather(uint8_t* memory, ptrdiff_t groups, int32_t rowBytes) {
    const ptrdiff_t lanes = 2 * groups;
    const auto* offsets = reinterpret_cast<const int32_t*>(memory);
    auto* const masks = memory + lanes * kLane * 4;
    auto* const bases = reinterpret_cast<int32_t*>(masks + lanes * kLane * Gather::kMostWindows);
    Gather gather{0, groups, offsets, bases, masks};
    int32_t widest = 1;
    for (ptrdiff_t lane = 0; lane < lanes; ++lane) {
        const Span span = spanOf(offsets + lane * kLane);
        const int32_t bytes = span.last - span.first + 1;
        widest = bytes > widest ? bytes : widest;
        bases[lane] = span.first;
    }
    const int32_t windows = (widest + kLane - 1) / kLane;
    if (windows > Gather::kMostWindows) return gather;
    gather.windows = windows;
    // From the back, as a lane's first byte stands where another's bases will.
    for (ptrdiff_t lane = lanes; lane-- > 0;) {
        const int32_t first = bases[lane];
        const ptrdiff_t at = lane / 2 * windows;
        for (int32_t w = windows; w-- > 0;) {
            const int32_t wanted = first + w * kLane, most = rowBytes - kLane;
            const int32_t base = wanted < most ? wanted : most;
            makeMask(masks + 32 * (at + w) + kLane * (lane & 1), offsets + lane * kLane, base);
            bases[2 * (at + w) + (lane & 1)] = base;
        }
    }
    if (windows == 1) findAlike(gather);
    return gather;
}

void compareWeights(Gather& gather, const int16_t* weights) {
    ptrdiff_t g = 4;
    while (g < gather.alikeEnd && isSame(weights + 16 * g, weights + 16 * g - 32)) ++g;
    if (g < gather.alikeEnd) gather.alikeEnd = g;
}

void gatherRow(const Gather& gather, const uint8_t* row, const uint8_t* later, uint8_t* dst, ptrdiff_t bytes,
               int elementBytes) {
    switch (gather.windows) {
        case 1: return gatherRowOf<1>(gather, row, later, dst, bytes);
        case 2: return gatherRowOf<2>(gather, row, later, dst, bytes);
        case 3: return gatherRowOf<3>(gather, row, later, dst, bytes);
        case 4: return gatherRowOf<4>(gather, row, later, dst, bytes);
        default: break;
    }
    switch (elementBytes) {
        case 1: return moveElements<uint8_t>(gather.offsets, row, dst, bytes);
        case 2: return moveElements<uint16_t>(gather.offsets, row, dst, bytes);
        default: return moveElements<uint32_t>(gather.offsets, row, dst, bytes);
    }
}

}  // namespace qori::kernels
