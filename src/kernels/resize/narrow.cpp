// SPDX-License-Identifier: Apache-2.0
#include "narrow.h"

namespace qori::kernels {
namespace {

/// What makes a row of 16 pairs of neighbours of a source row.
struct NarrowColumns {
    __m256i mask, weights;

    /// For the eight pixels from `low` on and the eight from `high` on; those that the row does not have are of the
    /// first source pixel.
    NarrowColumns(const Picks& columns, const int32_t* pairs, int32_t low, int32_t high) {
        const __m256i least = _mm256_set1_epi32(columns.first), most = _mm256_set1_epi32(columns.last);
        const auto place = [=](__m256i index) {
            return _mm256_sub_epi32(_mm256_min_epi32(_mm256_max_epi32(index, least), most), least);
        };
        const auto shuffles = [&](int32_t at) {
            const __m256i index = loadUpTo(columns.indices + at, columns.count - at).v;
            const __m256i next = place(_mm256_add_epi32(index, _mm256_set1_epi32(1)));
            return _mm256_or_si256(place(index), _mm256_slli_epi32(next, 8));
        };
        const auto factors = [&](int32_t at) {
            return _mm256_srai_epi32(loadUpTo(pairs + at, columns.count - at).v, 16);
        };
        const __m256i words = _mm256_packs_epi32(shuffles(low), shuffles(high));
        mask = _mm256_permute4x64_epi64(words, 0xD8);
        const __m256i w = _mm256_permute4x64_epi64(_mm256_packs_epi32(factors(low), factors(high)), 0xD8);
        weights = _mm256_sub_epi16(_mm256_setzero_si256(), _mm256_slli_epi16(w, 1));
    }

    /// As interpolatePairs() of fine weights.
    QORI_INLINE __m256i filter(__m256i row) const {
        const __m256i pairs = _mm256_shuffle_epi8(row, mask);
        const __m256i difference = _mm256_maddubs_epi16(pairs, _mm256_set1_epi16(static_cast<int16_t>(0xC040)));
        const __m256i first = _mm256_maddubs_epi16(pairs, _mm256_set1_epi16(0x0040));
        return _mm256_add_epi16(first, _mm256_mulhrs_epi16(difference, weights));
    }
};

/// As LinearMix and mixWords(), with a mask for what there is a branch.
QORI_INLINE __m256i mixNarrow(__m256i h0, __m256i h1, int32_t w) {
    const __m256i factor = _mm256_set1_epi16(static_cast<int16_t>(4 * w));
    const __m256i isFar = _mm256_set1_epi32(w < 8192 ? 0 : -1);
    const __m256i origin = _mm256_blendv_epi8(h0, h1, isFar);
    const __m256i sum = _mm256_add_epi16(origin, _mm256_mulhi_epi16(_mm256_sub_epi16(h1, h0), factor));
    return _mm256_mulhrs_epi16(sum, _mm256_set1_epi16(1 << 9));
}

/// Destination rows of 16 pixels, or of 32: then vectors hold the first and third eight, and the second and fourth, so
/// that packing puts them in order.
template <int vectors>
QORI_NOINLINE void resizeNarrowOf(const Picks& columns, const int32_t* pairs, const NarrowRows& rows,
                                  Image<const uint8_t> src, Image<uint8_t> dst) {
    constexpr int32_t kHigh = vectors == 1 ? 8 : 16;
    const NarrowColumns even(columns, pairs, 0, kHigh);
    const NarrowColumns odd = vectors == 1 ? even : NarrowColumns(columns, pairs, 8, 8 + kHigh);
    const int32_t bytes = columns.last - columns.first + 1;
    struct Filtered {
        __m256i even, odd;
    };
    const auto filter = [&](int32_t row) {
        const __m256i pixels = loadPartial(src.row(row), bytes).v;  // 16 at most
        const __m256i both = _mm256_permute4x64_epi64(pixels, 0x44);
        return Filtered{even.filter(both), vectors == 1 ? both : odd.filter(both)};
    };
    int32_t upper = INT32_MIN, lower = INT32_MIN;  // the rows that are there
    Filtered h0{}, h1{};
    for (int32_t y = 0; y < rows.count; ++y) {
        const int32_t index = rows.indices[y], w = rows.weights[y];
        const int32_t first = rows.clamp(index), second = rows.clamp(index + (w != 0));
        if (upper != first) {
            h0 = lower == first ? h1 : filter(first);
            upper = first;
        }
        if (lower != second) {
            h1 = second == first ? h0 : filter(second);
            lower = second;
        }
        const __m256i mixed = mixNarrow(h0.even, h1.even, w);
        const __m256i other = vectors == 1 ? _mm256_permute4x64_epi64(mixed, 0xEE) : mixNarrow(h0.odd, h1.odd, w);
        storeUpTo(dst.row(y), Bytes{_mm256_packus_epi16(mixed, other)}, columns.count);
    }
}

}  // namespace

void resizeNarrow8u(const Picks& columns, const int32_t* pairs, const NarrowRows& rows, Image<const uint8_t> src,
                    Image<uint8_t> dst) {
    (columns.count <= 16 ? resizeNarrowOf<1> : resizeNarrowOf<2>)(columns, pairs, rows, src, dst);
}

}  // namespace qori::kernels
