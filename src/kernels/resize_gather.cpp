// SPDX-License-Identifier: Apache-2.0
#include "resize_gather.h"

#include "resize_floats.h"

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

/// With a = 64 (p0 - p1), the product a * -2w is 128 w (p1 - p0), below 2^29, and the rounding high multiply gives
/// (w (p1 - p0) + 128) >> 8. -2w reaches -32768, a never does.
QORI_INLINE __m256i interpolatePairs(Bytes pairs, __m256i weights) {
    const __m256i difference = _mm256_maddubs_epi16(pairs.v, _mm256_set1_epi16(static_cast<int16_t>(0xC040)));
    const __m256i first = _mm256_maddubs_epi16(pairs.v, _mm256_set1_epi16(0x0040));
    return _mm256_add_epi16(first, _mm256_mulhrs_epi16(difference, weights));
}

template <int windows>
QORI_INLINE void linearGroups(const Gather& gather, const uint8_t* row, const int16_t* weights, int16_t* out,
                              ptrdiff_t g, ptrdiff_t end) {
    const int32_t* base = gather.bases + 2 * windows * g;
    const uint8_t* mask = gather.masks + 32 * windows * g;
    for (; g < end; ++g)
        store(out + 16 * g,
              Vec<int16_t>{interpolatePairs(gatherGroup<windows>(row, base, mask), load(weights + 16 * g).v)});
}

template <int windows>
QORI_NOINLINE void linearRowOf(const Gather& gather, const uint8_t* row, const int16_t* weights, int16_t* out) {
    linearGroups<windows>(gather, row, weights, out, 0, gather.groups);
}

/// Masks and weights of alike groups stay in registers.
QORI_NOINLINE void linearRowAlike(const Gather& gather, const uint8_t* row, const int16_t* weights, int16_t* out) {
    constexpr ptrdiff_t kFirst = 2;
    linearGroups<1>(gather, row, weights, out, 0, kFirst);
    const Bytes masks[2] = {load(gather.masks + 32 * kFirst), load(gather.masks + 32 * kFirst + 32)};
    const __m256i factors[2] = {load(weights + 16 * kFirst).v, load(weights + 16 * kFirst + 16).v};
    const int32_t* base = gather.bases + 2 * kFirst;
    ptrdiff_t g = kFirst;
    for (; g + 2 <= gather.alikeEnd; g += 2, row += gather.stride)
        for (int i = 0; i < 2; ++i) {
            const Bytes pairs = shuffleHalves(loadHalves(row + base[2 * i], row + base[2 * i + 1]), masks[i]);
            store(out + 16 * (g + i), Vec<int16_t>{interpolatePairs(pairs, factors[i])});
        }
    linearGroups<1>(gather, row - (g - kFirst) / 2 * gather.stride, weights, out, g, gather.groups);
}

QORI_NOINLINE void linearRowByElements(const Gather& gather, const uint8_t* row, const int16_t* weights, int16_t* out) {
    for (ptrdiff_t i = 0; i < 16 * gather.groups; ++i) {
        const int p0 = row[gather.offsets[2 * i]], p1 = row[gather.offsets[2 * i + 1]], w = -weights[i] >> 1;
        out[i] = static_cast<int16_t>((p0 << 6) + (((p1 - p0) * w + 128) >> 8));
    }
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

void linearRow8u(const Gather& gather, const uint8_t* row, const int16_t* weights, int16_t* out) {
    if (gather.alikeEnd > 4) return linearRowAlike(gather, row, weights, out);
    switch (gather.windows) {
        case 1: return linearRowOf<1>(gather, row, weights, out);
        case 2: return linearRowOf<2>(gather, row, weights, out);
        case 3: return linearRowOf<3>(gather, row, weights, out);
        case 4: return linearRowOf<4>(gather, row, weights, out);
        default: return linearRowByElements(gather, row, weights, out);
    }
}

void linearColumn8u(const int16_t* h0, const int16_t* h1, int32_t w, uint8_t* dst, ptrdiff_t elements) {
    // (h0 * 2^14 + (h1 - h0) w + 2^19) >> 20 is (h0 + ((h1 - h0) 4w >> 16) + 32) >> 6: the parts dropped early are
    // below the last bit that counts. 4w must be a signed factor, so from 2^15 on the sum starts at h1 with 4w - 2^16.
    const bool nearFirst = w < 8192;
    const int16_t* origin = nearFirst ? h0 : h1;
    const __m256i factor = _mm256_set1_epi16(static_cast<int16_t>(nearFirst ? 4 * w : 4 * w - 65536));
    const auto half = [&](ptrdiff_t i) {
        const __m256i difference = _mm256_sub_epi16(load(h1 + i).v, load(h0 + i).v);
        const __m256i sum = _mm256_add_epi16(load(origin + i).v, _mm256_mulhi_epi16(difference, factor));
        return _mm256_srai_epi16(_mm256_add_epi16(sum, _mm256_set1_epi16(32)), 6);
    };
    for (ptrdiff_t i = 0; i < elements; i += 32)
        storeUpTo(dst + i, Bytes{_mm256_packus_epi16(half(i), half(i + 16))}, elements - i);
}

}  // namespace qori::kernels
