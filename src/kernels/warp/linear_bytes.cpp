// SPDX-License-Identifier: Apache-2.0
#include "linear_bytes.h"

namespace qori::kernels {
namespace {

using namespace warp;

constexpr int32_t kSumOfWeights = 32767;

/// The words (32767 - f, f) of each fraction's upper 15 bits.
QORI_INLINE __m256i pairsOfWeights(__m256i fraction) {
    const __m256i repeat =
        _mm256_broadcastsi128_si256(_mm_setr_epi8(2, 3, 2, 3, 6, 7, 6, 7, 10, 11, 10, 11, 14, 15, 14, 15));
    const __m256i twice = _mm256_shuffle_epi8(_mm256_srli_epi32(fraction, 1), repeat);
    return _mm256_xor_si256(twice, _mm256_set1_epi32(kSumOfWeights));
}

/// 1 + f.
QORI_INLINE __m256 raisedFractions(__m256i fraction) {
    const __m256i mantissa = _mm256_srli_epi32(fraction, 9);
    return _mm256_castsi256_ps(_mm256_or_si256(mantissa, _mm256_castps_si256(_mm256_set1_ps(1))));
}

/// top + (raised - 1) * (bottom - top) in the units of the weights, as a number in the low byte of each lane.
QORI_INLINE __m256i mixRows(__m256i top, __m256i bottom, __m256 raised) {
    const __m256i difference = _mm256_sub_epi32(bottom, top), rest = _mm256_sub_epi32(top, difference);
    const __m256 sum = _mm256_fmadd_ps(raised, _mm256_cvtepi32_ps(difference), _mm256_cvtepi32_ps(rest));
    // Rounded to a whole number where the mantissa ends.
    const __m256 rounded = _mm256_fmadd_ps(sum, _mm256_set1_ps(1.0f / kSumOfWeights), _mm256_set1_ps(0x1p23f));
    return _mm256_castps_si256(rounded);
}

QORI_INLINE __m256i inBothBlocks(__m128i table) { return _mm256_broadcastsi128_si256(table); }

/// One channel: a word holds two neighbours and two bytes that are not used.
template <bool anywhere>
struct Gray {
    static constexpr int kWord = 4;

    QORI_INLINE static __m256i sums(const uint8_t* row, __m256i offsets, __m256i shifts, __m256i weights) {
        __m256i words = _mm256_i32gather_epi32(reinterpret_cast<const int*>(row), offsets, 1);
        if constexpr (anywhere) words = _mm256_srlv_epi32(words, shifts);
        const __m256i widen = inBothBlocks(_mm_setr_epi8(0, -1, 1, -1, 4, -1, 5, -1, 8, -1, 9, -1, 12, -1, 13, -1));
        return _mm256_madd_epi16(_mm256_shuffle_epi8(words, widen), weights);
    }

    QORI_INLINE static void make(const uint8_t* origin, ptrdiff_t step, __m256i offsets, __m256i shifts,
                                 __m256i weights, __m256 raised, int n, uint8_t* dst) {
        const __m256i top = sums(origin, offsets, shifts, weights),
                      bottom = sums(origin + step, offsets, shifts, weights);
        const __m256i first = inBothBlocks(_mm_setr_epi8(0, 4, 8, 12, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1));
        const __m256i packed = _mm256_permutevar8x32_epi32(_mm256_shuffle_epi8(mixRows(top, bottom, raised), first),
                                                           _mm256_setr_epi32(0, 4, 1, 1, 1, 1, 1, 1));
        if (n == 8)
            _mm_storel_epi64(reinterpret_cast<__m128i*>(dst), _mm256_castsi256_si128(packed));
        else
            storePartial(dst, Bytes{packed}, n);
    }
};

/// Three or four channels: eight bytes hold two neighbours; with three, the last two are not used.
template <int channels, bool anywhere>
struct Packed {
    static constexpr int kWord = 8;

    struct Halves {
        __m256i even, odd;  ///< Sums of four channels of pixels 0 and 2, and of pixels 1 and 3.
    };

    QORI_INLINE static Halves sums(const uint8_t* row, __m128i offsets, __m128i shifts, __m256i evenWeights,
                                   __m256i oddWeights) {
        __m256i words = _mm256_i32gather_epi64(reinterpret_cast<const long long*>(row), offsets, 1);
        if constexpr (anywhere && channels == 3) words = _mm256_srlv_epi64(words, _mm256_cvtepu32_epi64(shifts));
        constexpr char c = channels;
        const __m256i even =
            inBothBlocks(_mm_setr_epi8(0, -1, c, -1, 1, -1, c + 1, -1, 2, -1, c + 2, -1, 3, -1, 7, -1));
        const __m256i odd = _mm256_add_epi8(even, inBothBlocks(_mm_set1_epi16(8)));  // -1 stays
        return {_mm256_madd_epi16(_mm256_shuffle_epi8(words, even), evenWeights),
                _mm256_madd_epi16(_mm256_shuffle_epi8(words, odd), oddWeights)};
    }

    /// Two pixels of each block, chosen by lane: their four channels as numbers in the low bytes of 16-bit words.
    template <int evenLanes, int oddLanes>
    QORI_INLINE static __m256i fourPixels(const uint8_t* origin, ptrdiff_t step, __m128i offsets, __m128i shifts,
                                          __m256i weights, __m256 raised) {
        const __m256i evenWeights = _mm256_shuffle_epi32(weights, evenLanes),
                      oddWeights = _mm256_shuffle_epi32(weights, oddLanes);
        const Halves top = sums(origin, offsets, shifts, evenWeights, oddWeights);
        const Halves bottom = sums(origin + step, offsets, shifts, evenWeights, oddWeights);
        const __m256i even = mixRows(top.even, bottom.even, _mm256_permute_ps(raised, evenLanes));
        const __m256i odd = mixRows(top.odd, bottom.odd, _mm256_permute_ps(raised, oddLanes));
        return _mm256_blend_epi16(even, _mm256_slli_epi32(odd, 16), 0xAA);
    }

    QORI_INLINE static void make(const uint8_t* origin, ptrdiff_t step, __m256i offsets, __m256i shifts,
                                 __m256i weights, __m256 raised, int n, uint8_t* dst) {
        // Pixels 0, 1, 4, 5 and 2, 3, 6, 7, so that each block is made from its own weights.
        const __m256i at = _mm256_permute4x64_epi64(offsets, 0xD8), by = _mm256_permute4x64_epi64(shifts, 0xD8);
        const __m256i low = fourPixels<0x00, 0x55>(origin, step, _mm256_castsi256_si128(at), _mm256_castsi256_si128(by),
                                                   weights, raised);
        const __m256i high = fourPixels<0xAA, 0xFF>(origin, step, _mm256_extracti128_si256(at, 1),
                                                    _mm256_extracti128_si256(by, 1), weights, raised);
        const __m256i bytes =
            _mm256_or_si256(_mm256_and_si256(low, _mm256_set1_epi16(255)), _mm256_slli_epi16(high, 8));
        // In a block now: channel by channel the pixels 0, 2, 1, 3.
        constexpr char x = -1;
        const __m256i order =
            inBothBlocks(channels == 4 ? _mm_setr_epi8(0, 4, 8, 12, 2, 6, 10, 14, 1, 5, 9, 13, 3, 7, 11, 15)
                                       : _mm_setr_epi8(0, 4, 8, 2, 6, 10, 1, 5, 9, 3, 7, 11, x, x, x, x));
        __m256i pixels = _mm256_shuffle_epi8(bytes, order);
        if constexpr (channels == 3)
            pixels = _mm256_permutevar8x32_epi32(pixels, _mm256_setr_epi32(0, 1, 2, 4, 5, 6, 7, 7));
        if (n < 8) return storePartial(dst, Bytes{pixels}, n * channels);
        if constexpr (channels == 4) return store(dst, Bytes{pixels});
        _mm_storeu_si128(reinterpret_cast<__m128i*>(dst), _mm256_castsi256_si128(pixels));
        _mm_storel_epi64(reinterpret_cast<__m128i*>(dst + 16), _mm256_extracti128_si256(pixels, 1));
    }
};

}  // namespace

template <int channels, bool anywhere>
void linearBytes(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
                 uint8_t* dst) {
    using Way = std::conditional_t<channels == 1, Gray<anywhere>, Packed<channels, anywhere>>;
    const auto across = horizontal<anywhere>(line, box);
    const auto down = vertical<anywhere>(line, box);
    const auto step = static_cast<int32_t>(source.step);
    const __m256i lastWord = _mm256_set1_epi32((source.right + 1) * channels - Way::kWord);
    forEights(
        first, count, [&](Columns columns, int n) __attribute__((always_inline)) {
            const Places x = across.at(columns), y = down.at(columns);
            __m256i offsets = offsetsOf<channels>(x.whole, y.whole, step), shifts = _mm256_setzero_si256();
            if constexpr (anywhere && channels != 4) {
                const __m256i begin = offsetsOf<channels>(x.whole, shifts, 0);
                const __m256i surplus = _mm256_max_epi32(_mm256_sub_epi32(begin, lastWord), shifts);
                offsets = _mm256_sub_epi32(offsets, surplus);
                shifts = _mm256_slli_epi32(surplus, 3);
            }
            Way::make(source.origin, source.step, offsets, shifts, pairsOfWeights(x.fraction),
                      raisedFractions(y.fraction), n, dst);
            dst += n * channels;
        });
}

template void linearBytes<1, false>(const WarpSource&, const WarpLine&, const WarpBox&, int32_t, int32_t, uint8_t*);
template void linearBytes<1, true>(const WarpSource&, const WarpLine&, const WarpBox&, int32_t, int32_t, uint8_t*);
template void linearBytes<3, false>(const WarpSource&, const WarpLine&, const WarpBox&, int32_t, int32_t, uint8_t*);
template void linearBytes<3, true>(const WarpSource&, const WarpLine&, const WarpBox&, int32_t, int32_t, uint8_t*);
template void linearBytes<4, false>(const WarpSource&, const WarpLine&, const WarpBox&, int32_t, int32_t, uint8_t*);
template void linearBytes<4, true>(const WarpSource&, const WarpLine&, const WarpBox&, int32_t, int32_t, uint8_t*);

}  // namespace qori::kernels
