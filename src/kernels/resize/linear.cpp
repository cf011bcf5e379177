// SPDX-License-Identifier: Apache-2.0
#include "linear.h"

#include "floats.h"

namespace qori::kernels {
namespace {

/// Fine: with a = 64 (p0 - p1), the product a * -2w is 128 w (p1 - p0), below 2^29, and the rounding high multiply
/// gives (w (p1 - p0) + 128) >> 8. -2w reaches -32768, a never does. Coarse: with w = 128 v, the same is half of p0
/// (128 - v) + p1 v, rounded up; that sum is 32640 at most.
template <bool coarse>
QORI_INLINE __m256i interpolatePairs(Bytes pairs, __m256i weights) {
    if constexpr (coarse) return _mm256_avg_epu16(_mm256_maddubs_epi16(pairs.v, weights), _mm256_setzero_si256());
    const __m256i difference = _mm256_maddubs_epi16(pairs.v, _mm256_set1_epi16(static_cast<int16_t>(0xC040)));
    const __m256i first = _mm256_maddubs_epi16(pairs.v, _mm256_set1_epi16(0x0040));
    return _mm256_add_epi16(first, _mm256_mulhrs_epi16(difference, weights));
}

/// An even number of groups; two of them move on by 64 bytes where rows are not much reduced.
template <int windows, bool coarse>
QORI_INLINE void linearGroups(const Gather& gather, LinearRow row, const int16_t* weights, int16_t* out, ptrdiff_t g,
                              ptrdiff_t end) {
    const int32_t* base = gather.bases + 2 * windows * g;
    const uint8_t* mask = gather.masks + 32 * windows * g;
    for (; g < end; g += 2) {
        prefetch(row.later + base[0]);
        const Bytes first = gatherGroup<windows>(row.bytes, base, mask);
        const Bytes second = gatherGroup<windows>(row.bytes, base, mask);
        store(out + 16 * g, Vec<int16_t>{interpolatePairs<coarse>(first, load(weights + 16 * g).v)});
        store(out + 16 * g + 16, Vec<int16_t>{interpolatePairs<coarse>(second, load(weights + 16 * g + 16).v)});
    }
}

template <int windows, bool coarse>
QORI_NOINLINE void linearRowOf(const Gather& gather, LinearRow row, const int16_t* weights, int16_t* out) {
    linearGroups<windows, coarse>(gather, row, weights, out, 0, gather.groups);
}

/// Masks, weights and bases of alike groups stay in registers.
template <bool coarse>
QORI_NOINLINE void linearRowAlike(const Gather& gather, LinearRow row, const int16_t* weights, int16_t* out) {
    constexpr ptrdiff_t kFirst = 2;
    linearGroups<1, coarse>(gather, row, weights, out, 0, kFirst);
    const Bytes masks[2] = {load(gather.masks + 32 * kFirst), load(gather.masks + 32 * kFirst + 32)};
    const __m256i factors[2] = {load(weights + 16 * kFirst).v, load(weights + 16 * kFirst + 16).v};
    const uint8_t* from[4];
    for (int i = 0; i < 4; ++i) from[i] = row.bytes + gather.bases[2 * kFirst + i];
    const ptrdiff_t end = gather.alikeEnd, stride = gather.stride;
    ptrdiff_t g = kFirst;
    const uint8_t* const later = row.later + gather.bases[2 * kFirst];
    for (ptrdiff_t at = 0; g + 2 <= end; g += 2, at += stride) {
        prefetch(later + at);
        for (int i = 0; i < 2; ++i) {
            const Bytes pairs = shuffleInBlocks(loadBlocks(from[2 * i] + at, from[2 * i + 1] + at), masks[i]);
            store(out + 16 * (g + i), Vec<int16_t>{interpolatePairs<coarse>(pairs, factors[i])});
        }
    }
    linearGroups<1, coarse>(gather, row, weights, out, g, gather.groups);
}

QORI_NOINLINE void linearRowByElements(const Gather& gather, const uint8_t* row, const int16_t* weights, bool coarse,
                                       int16_t* out) {
    const Picks& picks = gather.picks;
    const int channels = gather.pixelBytes;
    ptrdiff_t i = 0;
    for (int32_t x = 0; x < picks.count; ++x) {
        const int32_t index = picks.indices[x];
        const uint8_t* const first = row + ptrdiff_t{picks.clamp(index) - picks.first} * channels;
        const uint8_t* const second = row + ptrdiff_t{picks.clamp(index + 1) - picks.first} * channels;
        for (int c = 0; c < channels; ++c, ++i) {
            const ptrdiff_t at = linearOrder(i);
            const int p0 = first[c], p1 = second[c];
            const int w = coarse ? (weights[at] >> 8) * 128 : -weights[at] >> 1;
            out[at] = static_cast<int16_t>((p0 << 6) + (((p1 - p0) * w + 128) >> 8));
        }
    }
}

/// Of which pixel eight elements are, as shuffles of words: eight of three channels begin in three ways.
template <int channels>
struct WeightOrder {
    alignas(16) uint8_t of[3][16];

    constexpr WeightOrder() : of{} {
        for (int k = 0; k < 3; ++k)
            for (int i = 0; i < 16; ++i) {
                const int pixel = (8 * k % channels + i / 2) / channels;
                of[k][i] = static_cast<uint8_t>(2 * pixel + i % 2);
            }
    }
};
template <int channels>
constexpr WeightOrder<channels> kWeightOrder{};

/// Lists blocks of 32 weights.
template <int channels>
QORI_NOINLINE void listWeightsOf(const int32_t* pairs, int32_t count, int16_t* weights, ptrdiff_t begin,
                                 ptrdiff_t end) {
    constexpr int kPhases = channels == 3 ? 3 : 1;
    int32_t copy[8], pixel = static_cast<int32_t>(begin * 32 / channels);  // 0, or of whole pixels
    int phase = 0;
    for (ptrdiff_t lane = 4 * begin; lane < 4 * end; ++lane) {
        const int32_t* const from = readable(pairs, count, pixel + 8 * phase / channels, 8, copy);
        const __m256i w = _mm256_srai_epi32(_mm256_loadu_si256(reinterpret_cast<const __m256i*>(from)), 16);
        const __m256i packed = _mm256_permute4x64_epi64(_mm256_packs_epi32(w, w), 0xD8);
        __m128i words = _mm_slli_epi16(_mm_sub_epi16(_mm_setzero_si128(), _mm256_castsi256_si128(packed)), 1);
        if constexpr (channels > 1) {
            const auto* order = reinterpret_cast<const __m128i*>(kWeightOrder<channels>.of[phase]);
            words = _mm_shuffle_epi8(words, _mm_load_si128(order));
        }
        _mm_storeu_si128(reinterpret_cast<__m128i*>(weights + linearOrder(8 * lane)), words);
        if (++phase == kPhases) phase = 0, pixel += 8 * kPhases / channels;
    }
}

void listWeights(const Gather& gather, const int32_t* pairs, int16_t* weights, ptrdiff_t begin, ptrdiff_t end) {
    const int32_t count = gather.picks.count;
    switch (gather.pixelBytes) {
        case 1: return listWeightsOf<1>(pairs, count, weights, begin, end);
        case 3: return listWeightsOf<3>(pairs, count, weights, begin, end);
        default: return listWeightsOf<4>(pairs, count, weights, begin, end);
    }
}

bool isCoarse(const int16_t* weights, ptrdiff_t begin, ptrdiff_t end) {
    const __m256i zero = _mm256_setzero_si256(), fine = _mm256_set1_epi16(255);
    __m256i refused = zero;
    for (ptrdiff_t i = 32 * begin; i < 32 * end; i += 16) {
        const __m256i w = load(weights + i).v;
        refused = _mm256_or_si256(refused, _mm256_or_si256(_mm256_and_si256(w, fine), _mm256_cmpeq_epi16(w, zero)));
    }
    return _mm256_testz_si256(refused, refused);
}

/// -256 v becomes 128 - v in the low byte and v in the high one.
void makeCoarse(int16_t* weights, ptrdiff_t begin, ptrdiff_t end) {
    for (ptrdiff_t i = 32 * begin; i < 32 * end; i += 16) {
        const __m256i high = _mm256_sub_epi16(_mm256_setzero_si256(), load(weights + i).v);
        const __m256i low = _mm256_sub_epi16(_mm256_set1_epi16(128), _mm256_srli_epi16(high, 8));
        store(weights + i, Vec<int16_t>{_mm256_or_si256(high, low)});
    }
}

void compareWeights(Gather& gather, const int16_t* weights) {
    ptrdiff_t g = 4;
    while (g < gather.alikeEnd && isSame(weights + 16 * g, weights + 16 * g - 32)) ++g;
    if (g < gather.alikeEnd) gather.alikeEnd = g;
}

template <bool coarse>
void linearRow(const Gather& gather, LinearRow row, const int16_t* weights, int16_t* out) {
    if (gather.alikeEnd > 4) return linearRowAlike<coarse>(gather, row, weights, out);
    switch (gather.windows) {
        case 1: return linearRowOf<1, coarse>(gather, row, weights, out);
        case 2: return linearRowOf<2, coarse>(gather, row, weights, out);
        case 3: return linearRowOf<3, coarse>(gather, row, weights, out);
        case 4: return linearRowOf<4, coarse>(gather, row, weights, out);
        default: return linearRowByElements(gather, row.bytes, weights, coarse, out);
    }
}

/// (h0 * 2^14 + (h1 - h0) w + 2^19) >> 20 is (h0 + ((h1 - h0) 4w >> 16) + 32) >> 6: the parts dropped early are below
/// the last bit that counts. 4w must be a signed factor, so from 2^15 on the sum starts at h1 with 4w - 2^16.
struct LinearMix {
    bool nearFirst;
    __m256i factor;

    explicit LinearMix(int32_t w)
        : nearFirst(w < 8192), factor(_mm256_set1_epi16(static_cast<int16_t>(nearFirst ? 4 * w : 4 * w - 65536))) {}
};

/// The rounding high multiply by 2^9 rounds 6 bits off.
QORI_INLINE __m256i mixWords(__m256i origin, __m256i difference, __m256i factor) {
    const __m256i sum = _mm256_add_epi16(origin, _mm256_mulhi_epi16(difference, factor));
    return _mm256_mulhrs_epi16(sum, _mm256_set1_epi16(1 << 9));
}

template <bool isPair, bool nearFirst, bool otherNearFirst>
QORI_NOINLINE void mixRows(const int16_t* h0, const int16_t* h1, __m256i factor, __m256i otherFactor, uint8_t* dst,
                           uint8_t* other, ptrdiff_t elements) {
    for (ptrdiff_t i = 0; i < elements; i += 32) {
        prefetchAhead(dst + i);
        if constexpr (isPair) prefetchAhead(other + i);
        const __m256i low = load(h0 + i).v, high = load(h0 + i + 16).v;
        const __m256i low1 = load(h1 + i).v, high1 = load(h1 + i + 16).v;
        const __m256i lowRise = _mm256_sub_epi16(low1, low), highRise = _mm256_sub_epi16(high1, high);
        const auto mix = [&](bool isNear, __m256i f) {
            return Bytes{_mm256_packus_epi16(mixWords(isNear ? low : low1, lowRise, f),
                                             mixWords(isNear ? high : high1, highRise, f))};
        };
        storeUpTo(dst + i, mix(nearFirst, factor), elements - i);
        if constexpr (isPair) storeUpTo(other + i, mix(otherNearFirst, otherFactor), elements - i);
    }
}

}  // namespace

bool listLinearWeights(Gather& gather, const int32_t* pairs, int16_t* weights) {
    // Blocks of 32 are listed in two stretches, of which the first is all but for periodic groups.
    const ptrdiff_t all = gather.groups / 2;
    const ptrdiff_t firstEnd = gather.isPeriodic ? Gather::kListed / 2 : all;
    const ptrdiff_t secondBegin = gather.isPeriodic ? gather.alikeEnd / 2 : all;
    listWeights(gather, pairs, weights, 0, firstEnd);
    listWeights(gather, pairs, weights, secondBegin, all);
    if (!gather.isPeriodic) compareWeights(gather, weights);
    const bool coarse = isCoarse(weights, 0, firstEnd) && isCoarse(weights, secondBegin, all);
    if (coarse) {
        makeCoarse(weights, 0, firstEnd);
        makeCoarse(weights, secondBegin, all);
    }
    return coarse;
}

void linearRow8u(const Gather& gather, LinearRow row, const int16_t* weights, bool coarse, int16_t* out) {
    (coarse ? linearRow<true> : linearRow<false>)(gather, row, weights, out);
}

void linearColumn8u(const int16_t* h0, const int16_t* h1, int32_t w, uint8_t* dst, ptrdiff_t elements) {
    const LinearMix mix(w);
    (mix.nearFirst ? mixRows<false, true, true> : mixRows<false, false, true>)(h0, h1, mix.factor, mix.factor, dst, dst,
                                                                               elements);
}

void linearColumns8u(const int16_t* h0, const int16_t* h1, const int32_t w[2], uint8_t* dst, uint8_t* second,
                     ptrdiff_t elements) {
    const LinearMix mix(w[0]), other(w[1]);
    const auto run = mix.nearFirst     ? other.nearFirst ? mixRows<true, true, true> : mixRows<true, true, false>
                         : other.nearFirst ? mixRows<true, false, true>
                                       : mixRows<true, false, false>;
    run(h0, h1, mix.factor, other.factor, dst, second, elements);
}

}  // namespace qori::kernels
