// SPDX-License-Identifier: Apache-2.0
// Means of 3 x 3 bytes, plain or with the weights (1, 2, 1) by (1, 2, 1), a few rows at a time: each row's sum of three
// neighbours is made once for the windows that share it. Sums in 16 bits: at most 16 * 255.
#pragma once
#include "kernels/box/across.h"

namespace qori::kernels {

/// Weights of the rows above, at and below a pixel, and of its columns likewise.
enum class Square { ones, binomial };  ///< (1, 1, 1) or (1, 2, 1).

/// A sixteenth of the sums, to nearest, ties to even. Instructions round ties up: one less where the quotient is even,
/// which changes nothing else, and those go down. 16 * 255 < 2^15.
struct SixteenthOfBytes {
    QORI_INLINE static Vec<uint16_t> mean(Vec<uint16_t> s) {
        const __m256i even = _mm256_andnot_si256(_mm256_srli_epi16(s.v, 4), _mm256_set1_epi16(1));
        return {_mm256_mulhrs_epi16(_mm256_sub_epi16(s.v, even), _mm256_set1_epi16(2048))};
    }
};

namespace detail {

template <Square weights>
using SquareMean = std::conditional_t<weights == Square::ones, ExactMean<9>, SixteenthOfBytes>;

/// Sums of 32 bytes in two vectors of words: of one channel the even and the odd bytes, else by unpacking, whose
/// inverse packs them.
struct WordPair {
    Vec<uint16_t> v[2];
};
QORI_INLINE WordPair operator+(WordPair a, WordPair b) { return {{a.v[0] + b.v[0], a.v[1] + b.v[1]}}; }

template <int first, int second>
QORI_INLINE __m256i weighed(__m256i bytes) {
    return _mm256_maddubs_epi16(bytes, _mm256_set1_epi16(second << 8 | first));
}

/// Sums of three neighbours of a row, `count` of them.
template <Square weights, int channels>
QORI_INLINE WordPair squareRow(const uint8_t* p, ptrdiff_t count) {
    if constexpr (channels == 1 && weights == Square::binomial) {
        // (1, 2, 1) is twice (1, 1): pairs that begin with a byte, one before it and one after.
        const auto pairs = [=](const uint8_t* first) __attribute__((always_inline)) {
            return Vec<uint16_t>{weighed<1, 1>(loadUpTo(first, count + 1).v)};
        };
        const Vec<uint16_t> middle = pairs(p);
        return {{pairs(p - 1) + middle, middle + Vec<uint16_t>{weighed<1, 1>(loadUpTo(p + 1, count).v)}}};
    }
    constexpr int middle = weights == Square::ones ? 1 : 2;
    const __m256i left = loadUpTo(p - channels, count).v, right = loadUpTo(p + channels, count).v;
    const __m256i at = loadUpTo(p, count + (channels == 1)).v;  // an even last byte's neighbour lies in its word
    if constexpr (channels == 1) {
        // Even bytes have their right neighbour in their own word, odd bytes their left one.
        const Vec<uint16_t> even{weighed<middle, 1>(at)}, odd{weighed<1, middle>(at)};
        return {{even + Vec<uint16_t>{_mm256_and_si256(left, _mm256_set1_epi16(0xFF))},
                 odd + Vec<uint16_t>{_mm256_srli_epi16(right, 8)}}};
    } else {
        // The middle and its left neighbour in one product; the right one is added.
        const __m256i zero = _mm256_setzero_si256();
        const auto sum = [](__m256i pairs, __m256i others) __attribute__((always_inline)) {
            return Vec<uint16_t>{weighed<middle, 1>(pairs)} + Vec<uint16_t>{others};
        };
        return {{sum(_mm256_unpacklo_epi8(at, left), _mm256_unpacklo_epi8(right, zero)),
                 sum(_mm256_unpackhi_epi8(at, left), _mm256_unpackhi_epi8(right, zero))}};
    }
}

template <Square weights, int channels>
QORI_INLINE Bytes squareMean(WordPair sum) {
    const Vec<uint16_t> first = SquareMean<weights>::mean(sum.v[0]), second = SquareMean<weights>::mean(sum.v[1]);
    if constexpr (channels == 1) return {_mm256_or_si256(first.v, _mm256_slli_epi16(second.v, 8))};
    return {_mm256_packus_epi16(first.v, second.v)};
}

/// Source rows in order, from the one above the first destination row to the one below the last.
template <int rows>
struct SquareImage {
    const uint8_t* src[rows + 2];
    uint8_t* dst[rows];
};

/// By value: whose address is known may be changed by any store.
template <Square weights, int channels, int rows, class Count>
QORI_INLINE void squareMeans(SquareImage<rows> image, ptrdiff_t at, Count count, Bytes* out) {
    WordPair first = squareRow<weights, channels>(image.src[0] + at, count);
    WordPair second = squareRow<weights, channels>(image.src[1] + at, count);
    WordPair above = first + second;
    for (int k = 0; k < rows; ++k) {
        const WordPair third = squareRow<weights, channels>(image.src[k + 2] + at, count), below = second + third;
        out[k] = squareMean<weights, channels>(weights == Square::ones ? above + third : above + below);
        above = below;
        second = third;
    }
}

template <bool keepAlpha, int rows, class Count>
QORI_INLINE void storeSquares(SquareImage<rows> image, ptrdiff_t at, const Bytes* out, Count count) {
    for (int k = rows; k-- > 0;) storeMeans<keepAlpha>(image.dst[k] + at, out[k], count);
}

}  // namespace detail

/// Means of 3 x 3 pixels for `rows` destination rows at once; elements to the left and right of the rows, one pixel of
/// them, are read too. src: rows + 2 of them. Where the same destination row is given several times, the first counts.
/// The last vector ends with the rows, and may overlap the one before. `delayed`: results are stored behind everything
/// that the next vector reads, so that the destination may be the source.
template <Square weights, int channels, bool delayed, bool keepAlpha, int rows>
QORI_NOINLINE void squareRows(const uint8_t* const* src, uint8_t* const* dst, ptrdiff_t elements) {
    using namespace detail;
    constexpr ptrdiff_t n = Bytes::lanes;
    SquareImage<rows> image;
    for (int k = 0; k < rows + 2; ++k) image.src[k] = src[k];
    for (int k = 0; k < rows; ++k) image.dst[k] = dst[k];
    Bytes out[rows], next[rows];
    if (elements < n) {
        squareMeans<weights, channels>(image, 0, elements, out);
        return storeSquares<keepAlpha>(image, 0, out, elements);
    }
    const ptrdiff_t last = elements - n;
    const bool overlaps = last % n != 0;
    ptrdiff_t i = 0;
    if constexpr (delayed) {
        Bytes end[rows];
        if (overlaps) squareMeans<weights, channels>(image, last, kWhole<uint8_t>, end);
        for (; i <= last; i += n) {
            squareMeans<weights, channels>(image, i, kWhole<uint8_t>, next);
            if (i > 0) storeSquares<keepAlpha>(image, i - n, out, kWhole<uint8_t>);
            for (int k = 0; k < rows; ++k) out[k] = next[k];
        }
        storeSquares<keepAlpha>(image, i - n, out, kWhole<uint8_t>);
        if (overlaps) storeSquares<keepAlpha>(image, last, end, kWhole<uint8_t>);
    } else {
        for (; i <= last; i += n) {
            squareMeans<weights, channels>(image, i, kWhole<uint8_t>, out);
            storeSquares<keepAlpha>(image, i, out, kWhole<uint8_t>);
        }
        if (!overlaps) return;
        squareMeans<weights, channels>(image, last, kWhole<uint8_t>, out);
        storeSquares<keepAlpha>(image, last, out, kWhole<uint8_t>);
    }
}

}  // namespace qori::kernels
