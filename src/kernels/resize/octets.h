// SPDX-License-Identifier: Apache-2.0
// Making tables for eight neighbouring elements of a row (octets): eight pixels at once, which are as many octets as
// there are channels.
#pragma once
#include "taps.h"
#include "turn.h"

namespace qori::kernels {

/// Eight neighbouring pixels; behind a row's last they repeat it.
struct EightPixels {
    __m256i first;  ///< Source columns of their first taps.
    const float* weights[8];

    /// Those from `at` on of `width`.
    QORI_INLINE EightPixels(const PixelTaps* pixels, int32_t width, int32_t at, const float* table) {
        PixelTaps copy[8];
        const PixelTaps* from = pixels + at;
        if (at + 8 > width) {
            for (int i = 0; i < 8; ++i) copy[i] = pixels[std::min(at + i, width - 1)];
            from = copy;
        }
        const auto fours = [=](int i) { return load(reinterpret_cast<const float*>(from + i)).v; };
        const __m256 firsts = _mm256_shuffle_ps(fours(0), fours(4), 0x88);  // 0 1 4 5 2 3 6 7
        first = _mm256_permute4x64_epi64(_mm256_castps_si256(firsts), 0xD8);
        for (int i = 0; i < 8; ++i) weights[i] = table + from[i].weights;
    }
};

/// Octets, or pairs of them, after which elements stand at the same channel again: whole octets of pixels.
constexpr int channelCycle(int channels) { return channels == 3 ? 3 : 1; }

/// Of which of eight pixels, and of which channel, the elements of an octet are.
template <int channels>
struct OctetOrder {
    alignas(kVectorBytes) int32_t pixel[channels][8], channel[channels][8];

    constexpr OctetOrder() : pixel{}, channel{} {
        for (int e = 0; e < 8 * channels; ++e) {
            pixel[e / 8][e % 8] = e / channels;
            channel[e / 8][e % 8] = e % channels;
        }
    }
};
template <int channels>
constexpr OctetOrder<channels> kOctetOrder{};

/// What eight pixels have, for each element of octet `j`.
template <int channels>
QORI_INLINE __m256i spreadToOctet(__m256i pixels, int j) {
    if constexpr (channels == 1) return pixels;
    return _mm256_permutevar8x32_epi32(
        pixels, _mm256_load_si256(reinterpret_cast<const __m256i*>(kOctetOrder<channels>.pixel[j])));
}

/// Where the first taps of an octet's elements lie in a line that begins at source column `origin`.
template <int channels>
QORI_INLINE __m256i octetPlaces(__m256i first, int32_t origin, int j) {
    const __m256i pixels = _mm256_sub_epi32(spreadToOctet<channels>(first, j), _mm256_set1_epi32(origin));
    if constexpr (channels == 1) return pixels;
    const __m256i within = _mm256_load_si256(reinterpret_cast<const __m256i*>(kOctetOrder<channels>.channel[j]));
    return _mm256_add_epi32(_mm256_mullo_epi32(pixels, _mm256_set1_epi32(channels)), within);
}

/// The least of each half's four, everywhere in it.
QORI_INLINE __m256i leastOfQuads(__m256i v) {
    v = _mm256_min_epi32(v, _mm256_shuffle_epi32(v, 0x4E));
    return _mm256_min_epi32(v, _mm256_shuffle_epi32(v, 0xB1));
}
QORI_INLINE __m256i leastOfAll(__m256i v) {
    v = leastOfQuads(v);
    return _mm256_min_epi32(v, _mm256_permute4x64_epi64(v, 0x4E));
}

/// The weights of eight pixels tap by tap: calls use(k, weights of tap k). Reads `taps` floats of each.
template <class Use>
QORI_INLINE void forTaps(const float* const weights[8], int32_t taps, Use use) {
    alignas(kVectorBytes) float columns[4][8];
    if (taps == 2) {
        const auto pairs = [&](int i) {
            const __m128 low = _mm_castpd_ps(_mm_load_sd(reinterpret_cast<const double*>(weights[i])));
            return _mm_loadh_pi(low, reinterpret_cast<const __m64*>(weights[i + 1]));
        };
        const __m256 a = _mm256_set_m128(pairs(4), pairs(0)), b = _mm256_set_m128(pairs(6), pairs(2));
        use(0, _mm256_shuffle_ps(a, b, 0x88));
        use(1, _mm256_shuffle_ps(a, b, 0xDD));
    } else if (taps < 4) {
        const __m128i there = _mm_cmpgt_epi32(_mm_set1_epi32(taps), _mm_setr_epi32(0, 1, 2, 3));
        turnFours([&](int i) { return _mm_maskload_ps(weights[i], there); }, columns[0]);
        for (int32_t k = 0; k < taps; ++k) use(k, _mm256_load_ps(columns[k]));
    } else {
        for (int32_t k = 0; k < taps; k += 4) {
            const int32_t from = k + 4 <= taps ? k : taps - 4;  // the last four overlap with those before
            turnFloats(weights, from, columns[0]);
            for (int32_t i = k; i < k + 4 && i < taps; ++i) use(i, _mm256_load_ps(columns[i - from]));
        }
    }
}

}  // namespace qori::kernels
