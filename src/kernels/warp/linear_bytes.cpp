// SPDX-License-Identifier: Apache-2.0
#include "linear_bytes.h"

namespace qori::kernels {
namespace {

using namespace warp;

/// Weights of the two pixels above and of the two below, as pairs of words: left, right. All four sum to 2^15.
struct Weights {
    __m256i top, bottom;
};

constexpr int kWeightBits = 15;

/// Fractions become odd multiples of 2^-15, so that none is 0 or 1 and each weight fits its word.
QORI_INLINE Weights weightsOf(__m256i x, __m256i y) {
    const __m256i repeat =
        _mm256_broadcastsi128_si256(_mm_setr_epi8(2, 3, 2, 3, 6, 7, 6, 7, 10, 11, 10, 11, 14, 15, 14, 15));
    const auto odd = [&](__m256i fraction) __attribute__((always_inline)) {
        return _mm256_or_si256(_mm256_shuffle_epi8(_mm256_srli_epi32(fraction, 1), repeat), _mm256_set1_epi16(1));
    };
    const __m256i across = _mm256_xor_si256(odd(x), _mm256_set1_epi32(0x7FFE));  // 2^15 - f, f
    const __m256i above = _mm256_xor_si256(odd(y), _mm256_set1_epi16(0x7FFE));
    const __m256i top = _mm256_mulhrs_epi16(across, above);
    return {top, _mm256_sub_epi16(across, top)};
}

QORI_INLINE __m256i sumOf(__m256i top, __m256i topWeights, __m256i bottom, __m256i bottomWeights) {
    return _mm256_add_epi32(_mm256_madd_epi16(top, topWeights), _mm256_madd_epi16(bottom, bottomWeights));
}

/// Of two sums, as words: the first in the lower half of each lane. Twice the results, rounded down, and their averages
/// with 0, which are rounded up, are the results rounded to nearest.
QORI_INLINE __m256i joinSums(__m256i first, __m256i second) {
    const __m256i twice = _mm256_blend_epi16(_mm256_srli_epi32(first, kWeightBits - 1),
                                             _mm256_slli_epi32(second, 17 - kWeightBits), 0xAA);
    return _mm256_avg_epu16(twice, _mm256_setzero_si256());
}

QORI_INLINE __m256i inBothBlocks(__m128i table) { return _mm256_broadcastsi128_si256(table); }

/// One channel: a word holds two neighbours and two bytes that are not used.
template <bool anywhere>
struct Gray {
    static constexpr int kWord = 4;

    QORI_INLINE static __m256i pairs(const uint8_t* row, __m256i offsets, __m256i shifts) {
        __m256i words = _mm256_i32gather_epi32(reinterpret_cast<const int*>(row), offsets, 1);
        if constexpr (anywhere) words = _mm256_srlv_epi32(words, shifts);
        const __m256i widen = inBothBlocks(_mm_setr_epi8(0, -1, 1, -1, 4, -1, 5, -1, 8, -1, 9, -1, 12, -1, 13, -1));
        return _mm256_shuffle_epi8(words, widen);
    }

    QORI_INLINE static void make(const uint8_t* origin, ptrdiff_t step, __m256i offsets, __m256i shifts,
                                 Weights weights, ptrdiff_t ahead, int n, uint8_t* dst) {
        const __m256i top = pairs(origin, offsets, shifts), bottom = pairs(origin + step, offsets, shifts);
        prefetchAhead(origin, offsets, ahead);
        const __m256i half = _mm256_set1_epi32(1 << (kWeightBits - 1));
        const __m256i rounded = _mm256_add_epi32(sumOf(top, weights.top, bottom, weights.bottom), half);
        const __m256i sum = _mm256_slli_epi32(rounded, 16 - kWeightBits);
        const __m256i third = inBothBlocks(_mm_setr_epi8(2, 6, 10, 14, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1));
        const __m256i packed =
            _mm256_permutevar8x32_epi32(_mm256_shuffle_epi8(sum, third), _mm256_setr_epi32(0, 4, 1, 1, 1, 1, 1, 1));
        if (n == 8)
            _mm_storel_epi64(reinterpret_cast<__m128i*>(dst), _mm256_castsi256_si128(packed));
        else
            storePartial(dst, Bytes{packed}, n);
    }
};

/// Three or four channels: eight bytes hold two neighbours; with three, the last two are not used. Pixels k and k + 4
/// are made together, one in each block, with their weights where those of all eight are.
template <int channels, bool anywhere>
struct Packed {
    static constexpr int kWord = 8;

    /// The words of pixels k and k + 4 in the low halves of the blocks, or in the high ones.
    struct Words {
        __m256i top, bottom;
    };

    /// Blocks of 16 bytes, the second half not looked at, cost less than words that are gathered.
    QORI_INLINE static Words readBlocks(const uint8_t* origin, ptrdiff_t step, const int32_t* offsets) {
        const uint8_t *low = origin + offsets[0], *high = origin + offsets[4];
        return {loadBlocks(low, high).v, loadBlocks(low + step, high + step).v};
    }

    QORI_INLINE static Words gather(const uint8_t* origin, ptrdiff_t step, __m128i offsets, __m128i shifts) {
        const auto at = [=](const uint8_t* row) __attribute__((always_inline)) {
            const __m256i words = _mm256_i32gather_epi64(reinterpret_cast<const long long*>(row), offsets, 1);
            return channels == 4 ? words : _mm256_srlv_epi64(words, _mm256_cvtepu32_epi64(shifts));
        };
        return {at(origin), at(origin + step)};
    }

    /// Sums of four channels of either pixel.
    template <int k>
    QORI_INLINE static __m256i mix(Words words, bool isHigh, Weights weights) {
        constexpr char c = channels;
        const __m256i low = inBothBlocks(_mm_setr_epi8(0, -1, c, -1, 1, -1, c + 1, -1, 2, -1, c + 2, -1, 3, -1, 7, -1));
        const __m256i widen = isHigh ? _mm256_add_epi8(low, inBothBlocks(_mm_set1_epi16(8))) : low;
        return sumOf(_mm256_shuffle_epi8(words.top, widen), _mm256_shuffle_epi32(weights.top, 0x55 * k),
                     _mm256_shuffle_epi8(words.bottom, widen), _mm256_shuffle_epi32(weights.bottom, 0x55 * k));
    }

    QORI_INLINE static void make(const uint8_t* origin, ptrdiff_t step, __m256i offsets, __m256i shifts,
                                 Weights weights, ptrdiff_t ahead, int n, uint8_t* dst) {
        __m256i made[4];
        if constexpr (anywhere) {
            // Pixels 0, 1, 4, 5 and 2, 3, 6, 7.
            const __m256i at = _mm256_permute4x64_epi64(offsets, 0xD8), by = _mm256_permute4x64_epi64(shifts, 0xD8);
            const Words first = gather(origin, step, _mm256_castsi256_si128(at), _mm256_castsi256_si128(by));
            const Words last = gather(origin, step, _mm256_extracti128_si256(at, 1), _mm256_extracti128_si256(by, 1));
            made[0] = mix<0>(first, false, weights);
            made[1] = mix<1>(first, true, weights);
            made[2] = mix<2>(last, false, weights);
            made[3] = mix<3>(last, true, weights);
        } else {
            alignas(kVectorBytes) int32_t at[8];
            qori::store(at, Vec<int32_t>{offsets});
            __asm__("" : "+m"(at));  // to be loaded: moves out of the vector would take the shuffles' ports
            prefetchAhead(origin + at[0], ahead);
            prefetchAhead(origin + at[4], ahead);
            made[0] = mix<0>(readBlocks(origin, step, at), false, weights);
            made[1] = mix<1>(readBlocks(origin, step, at + 1), false, weights);
            made[2] = mix<2>(readBlocks(origin, step, at + 2), false, weights);
            made[3] = mix<3>(readBlocks(origin, step, at + 3), false, weights);
        }
        const __m256i low = joinSums(made[0], made[1]);
        const __m256i high = joinSums(made[2], made[3]);
        // In a block now: channel by channel the pixels 0, 2, 1, 3.
        const __m256i bytes = _mm256_or_si256(low, _mm256_slli_epi16(high, 8));
        constexpr char x = -1;
        const __m256i order =
            inBothBlocks(channels == 4 ? _mm_setr_epi8(0, 4, 8, 12, 2, 6, 10, 14, 1, 5, 9, 13, 3, 7, 11, 15)
                                       : _mm_setr_epi8(0, 4, 8, 2, 6, 10, 1, 5, 9, 3, 7, 11, x, x, x, x));
        __m256i pixels = _mm256_shuffle_epi8(bytes, order);
        if constexpr (channels == 3)
            pixels = _mm256_permutevar8x32_epi32(pixels, _mm256_setr_epi32(0, 1, 2, 4, 5, 6, 7, 7));
        if (n < 8) return storePartial(dst, Bytes{pixels}, n * channels);
        if constexpr (channels == 4) return qori::store(dst, Bytes{pixels});
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
    const uint8_t* const origin = source.origin;
    const ptrdiff_t apart = source.step, ahead = source.ahead;
    const auto step = static_cast<int32_t>(apart);
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
            Way::make(origin, apart, offsets, shifts, weightsOf(x.fraction, y.fraction), ahead, n, dst);
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
