// SPDX-License-Identifier: Apache-2.0
// The 8x8 cosine transform of 16-bit integers, in 16-bit lanes. Columns go lane by lane through rotations by tangents,
// in Q15 and rounded; rows go in pairs of products of 16 bits, summed in 32, by tables that also hold the factors that
// the rotations leave to them. Rows v and 8 - v want the same factor, so two of them share a vector.
//
// Sums saturate. What does not fit 16 bits on its way is noticed and left to floats: nothing is stored then.
#pragma once
#include "cosines.h"
#include "image/image.h"
#include "kernels/simd.h"

namespace qori::kernels::dct8 {

// --- tables ---------------------------------------------------------------------------------------------------------

/// A number of |value| < 1 in Q15.
constexpr int16_t q15(double value) {
    const double scaled = value * 32768;
    return static_cast<int16_t>(scaled < 0 ? scaled - 0.5 : scaled + 0.5);
}

/// cos(j pi / 16) cos(k pi / 16) in Q15, k the frequency along a row and j that of the row, with its sign at position
/// x: for j = 4, frequencies 0 to 7 of magnitude 16384 (at 0 the cosine of 4), 22725, 21407, 19266, 16384, 12873, 8867
/// and 4520 at most; for j = 1 22725, 31521, 29692, 26722, 22725, 17855, 12299 and 6270.
constexpr int16_t rowWeight(int j, int k, int x) {
    return q15(kCosine[j] * (k == 0 ? kCosine[4] : cosineOf((2 * x + 1) * k)));
}

/// Operands of the sums of products along a row, both halves alike.
struct RowWeights {
    alignas(kVectorBytes) int16_t pairs[4][16];
};

/// Forward: for sums (even frequencies) and differences (odd ones) at positions 0 and 1, then 2 and 3; each for
/// frequencies 0 to 3, then 4 to 7.
constexpr RowWeights forwardWeights(int j) {
    RowWeights weights{};
    for (int part = 0; part < 4; ++part)
        for (int i = 0; i < 16; ++i)
            weights.pairs[part][i] = rowWeight(j, part % 2 * 4 + i % 8 / 2, part / 2 * 2 + i % 2);
    return weights;
}

/// Inverse: for positions 0 to 3, frequencies 0 and 2, 4 and 6, 1 and 3, 5 and 7.
constexpr RowWeights inverseWeights(int j) {
    RowWeights weights{};
    for (int part = 0; part < 4; ++part)
        for (int i = 0; i < 16; ++i)
            weights.pairs[part][i] = rowWeight(j, part % 2 * 4 + part / 2 + i % 2 * 2, i % 8 / 2);
    return weights;
}

/// By the pairs of rows 0 and 4, 1 and 7, 2 and 6, 3 and 5.
inline constexpr RowWeights kForwardWeights[4] = {forwardWeights(4), forwardWeights(1), forwardWeights(2),
                                                  forwardWeights(3)};
inline constexpr RowWeights kInverseWeights[4] = {inverseWeights(4), inverseWeights(1), inverseWeights(2),
                                                  inverseWeights(3)};
inline constexpr int kFirstOfPair[4] = {0, 1, 2, 3}, kSecondOfPair[4] = {4, 7, 6, 5};

/// Second bytes of the words are those behind the first.
constexpr uint64_t shuffleOfWords(int a, int b, int c, int d) {
    const auto bytes = [](int word) { return static_cast<uint64_t>((2 * word + 1) << 8 | 2 * word); };
    return bytes(a) | bytes(b) << 16 | bytes(c) << 32 | bytes(d) << 48;
}

QORI_INLINE __m256i weightPairs(const RowWeights& weights, int part) {
    return _mm256_load_si256(reinterpret_cast<const __m256i*>(weights.pairs[part]));
}

QORI_INLINE __m256i splatWord(int value) { return _mm256_set1_epi16(static_cast<int16_t>(value)); }

QORI_INLINE __m256i pairOf(__m128i low, __m128i high) {
    return _mm256_inserti128_si256(_mm256_castsi128_si256(low), high, 1);
}

QORI_INLINE __m128i loadRow(const int16_t* row) { return _mm_loadu_si128(reinterpret_cast<const __m128i*>(row)); }
QORI_INLINE __m128i loadRow(const uint8_t* row) {
    return _mm_cvtepu8_epi16(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(row)));
}

QORI_INLINE bool isAllZero(__m256i a) { return _mm256_testz_si256(a, a) != 0; }

// --- forward --------------------------------------------------------------------------------------------------------

/// Rows of pixels of -256 to 255 become rows of frequencies, in eighths: sums of eight pixels are 16384 at most in
/// magnitude, so that a row's sums of two fit 16 bits, and the odd frequencies are 3.09 pixels at most, 12,656.
QORI_INLINE void forwardWordColumns(__m128i (&x)[8]) {
    const __m128i t1 = _mm_set1_epi16(q15(kTangent1)), t2 = _mm_set1_epi16(q15(kTangent2));
    const __m128i t3 = _mm_set1_epi16(q15(kTangent3)), half = _mm_set1_epi16(q15(kCosine[4]));
    __m128i s[4], d[4];
    for (int i = 0; i < 4; ++i) {
        const __m128i a = _mm_slli_epi16(x[i], 3), b = _mm_slli_epi16(x[7 - i], 3);
        s[i] = _mm_adds_epi16(a, b);
        d[i] = _mm_subs_epi16(a, b);
    }
    const __m128i e0 = _mm_adds_epi16(s[0], s[3]), e1 = _mm_adds_epi16(s[1], s[2]);
    const __m128i e2 = _mm_subs_epi16(s[1], s[2]), e3 = _mm_subs_epi16(s[0], s[3]);
    x[0] = _mm_adds_epi16(e0, e1);
    x[4] = _mm_subs_epi16(e0, e1);
    x[2] = _mm_adds_epi16(e3, _mm_mulhrs_epi16(e2, t2));
    x[6] = _mm_subs_epi16(_mm_mulhrs_epi16(e3, t2), e2);
    const __m128i sum = _mm_mulhrs_epi16(_mm_adds_epi16(d[1], d[2]), half);
    const __m128i difference = _mm_mulhrs_epi16(_mm_subs_epi16(d[1], d[2]), half);
    const __m128i a = _mm_adds_epi16(d[0], sum), b = _mm_subs_epi16(d[0], sum);
    const __m128i c = _mm_adds_epi16(d[3], difference), e = _mm_subs_epi16(d[3], difference);
    x[1] = _mm_adds_epi16(a, _mm_mulhrs_epi16(c, t1));
    x[7] = _mm_subs_epi16(_mm_mulhrs_epi16(a, t1), c);
    x[3] = _mm_subs_epi16(b, _mm_mulhrs_epi16(e, t3));
    x[5] = _mm_adds_epi16(e, _mm_mulhrs_epi16(b, t3));
}

/// Two rows of the columns' results to coefficients, rounded to nearest, halves up. Sums are below 2^31: of eight
/// products 2^14 * 2^14 in row 0, which has the largest.
QORI_INLINE __m256i forwardRows(__m256i rows, const RowWeights& weights) {
    constexpr int kShift = 20;
    const __m256i mirrored = _mm256_setr_epi64x(
        static_cast<int64_t>(shuffleOfWords(7, 6, 5, 4)), static_cast<int64_t>(shuffleOfWords(7, 6, 5, 4)),
        static_cast<int64_t>(shuffleOfWords(7, 6, 5, 4)), static_cast<int64_t>(shuffleOfWords(7, 6, 5, 4)));
    const __m256i signs = _mm256_setr_epi64x(0x0001000100010001, -1, 0x0001000100010001, -1);
    // Sums of opposite elements in the low four words, differences in the high four: none is -2^15, which has no
    // negative.
    const __m256i opposite = _mm256_sign_epi16(_mm256_shuffle_epi8(rows, mirrored), signs);
    const __m256i folded = _mm256_adds_epi16(_mm256_unpacklo_epi64(rows, rows), opposite);
    const __m256i outer = _mm256_shuffle_epi32(folded, 0x88), inner = _mm256_shuffle_epi32(folded, 0xDD);
    const __m256i rounding = _mm256_set1_epi32(1 << (kShift - 1));
    const auto sums = [&](int part) {
        const __m256i sum = _mm256_add_epi32(_mm256_madd_epi16(outer, weightPairs(weights, part)),
                                             _mm256_madd_epi16(inner, weightPairs(weights, part + 2)));
        return _mm256_srai_epi32(_mm256_add_epi32(sum, rounding), kShift);
    };
    return _mm256_packs_epi32(sums(0), sums(1));
}

/// Rows of -256 to 255 to coefficients.
QORI_INLINE void forwardWords(__m128i (&x)[8], int16_t* dst) {
    forwardWordColumns(x);
    for (int p = 0; p < 4; ++p) {
        const int first = kFirstOfPair[p], second = kSecondOfPair[p];
        const __m256i rows = forwardRows(pairOf(x[first], x[second]), kForwardWeights[p]);
        storeBlocks(asBytes(dst + 8 * first), asBytes(dst + 8 * second), {rows});
    }
}

/// Whether pixels fit the 16-bit lanes.
QORI_INLINE bool areNarrow(const __m128i (&x)[8]) {
    __m256i beyond = _mm256_setzero_si256();
    for (int i = 0; i < 4; ++i) {
        const __m256i raised = _mm256_add_epi16(pairOf(x[i], x[7 - i]), splatWord(256));
        beyond = _mm256_or_si256(beyond, raised);
    }
    return _mm256_testz_si256(beyond, splatWord(~511)) != 0;
}

/// False, with nothing stored, where a pixel is outside -256 to 255.
QORI_INLINE bool forwardWordBlock(Image<const int16_t> src, int16_t* dst) {
    __m128i x[8];
    for (int i = 0; i < 8; ++i) x[i] = loadRow(src.row(i));
    if (!areNarrow(x)) [[unlikely]]
        return false;
    forwardWords(x, dst);
    return true;
}

/// The pixels with a value added, modulo 2^16.
QORI_INLINE void loadRaised(Image<const uint8_t> src, int16_t addVal, __m128i (&x)[8]) {
    for (int i = 0; i < 8; ++i) x[i] = _mm_add_epi16(loadRow(src.row(i)), _mm_set1_epi16(addVal));
}

/// Pixels and addVal from -256 to 255 together.
QORI_INLINE void forwardByteBlock(Image<const uint8_t> src, int16_t addVal, int16_t* dst) {
    __m128i x[8];
    loadRaised(src, addVal, x);
    forwardWords(x, dst);
}

inline void storeRaised(Image<const uint8_t> src, int16_t addVal, int16_t* dst) {
    __m128i x[8];
    loadRaised(src, addVal, x);
    for (int i = 0; i < 8; ++i) _mm_storeu_si128(reinterpret_cast<__m128i*>(dst + 8 * i), x[i]);
}

// --- inverse --------------------------------------------------------------------------------------------------------

/// Pixels, in the order in which they are made: rows 0 and 1, 7 and 6, 3 and 2, 4 and 5.
struct PixelRows {
    __m256i pair[4];
};
inline constexpr int kPixelRows[4][2] = {{0, 1}, {7, 6}, {3, 2}, {4, 5}};

/// Parts of a column's pixel, in 64ths. The whole of it is added to row 0.
constexpr int kPixelBits = 6, kRowShift = 11, kHalfPixel = 1 << (kPixelBits - 1);
/// From here on a pixel, in 64ths, may come of a sum that was saturated. Each saturated sum enters two others, as the
/// sum and as the difference with what it meets, one of which is saturated too, down to the pixels; sums that are
/// multiplied by cos(pi / 4) on the way leave 23,169. A saturated element of a row leaves no less than 32,767 * 0.72 in
/// some pixel, as the columns' transform keeps the sum of squares.
constexpr int kMostPixel = 23'100;
/// Coefficients have to stay below: tables of one row sum up to 169,809, and sums to 2^31.
constexpr int kMostCoefficient = 1 << 13;

/// Half a unit, for rows to be rounded to nearest. Row 0 is rounded down instead, with half a pixel for the last shift:
/// pixels in 64ths that are cut there, halves up, would be half a 64th high on average.
QORI_INLINE __m256i inverseRounding(bool hasRow0) {
    constexpr int kHalf = 1 << (kRowShift - 1);
    return pairOf(_mm_set1_epi32(hasRow0 ? kHalfPixel << kRowShift : kHalf), _mm_set1_epi32(kHalf));
}

/// Two rows of coefficients to the columns' operands.
QORI_INLINE __m256i inverseRows(__m256i rows, const RowWeights& weights, __m256i rounding) {
    const auto products = [&](int word, int part) {
        const auto both = static_cast<int64_t>(shuffleOfWords(word, word + 2, word, word + 2));
        const __m256i repeated = _mm256_shuffle_epi8(rows, _mm256_set1_epi64x(both));
        return _mm256_madd_epi16(repeated, weightPairs(weights, part));
    };
    const __m256i even = _mm256_add_epi32(_mm256_add_epi32(products(0, 0), rounding), products(4, 1));
    const __m256i odd = _mm256_add_epi32(products(1, 2), products(5, 3));
    const __m256i low = _mm256_srai_epi32(_mm256_add_epi32(even, odd), kRowShift);
    const __m256i high = _mm256_srai_epi32(_mm256_sub_epi32(even, odd), kRowShift);
    return _mm256_shufflehi_epi16(_mm256_packs_epi32(low, high), 0x1B);
}

QORI_INLINE __m256i swapRows(__m256i a) { return _mm256_permute4x64_epi64(a, 0x4E); }

/// a + b in the low row, a - b in the high one.
QORI_INLINE __m256i addSubtract(__m256i a, __m256i b) {
    return _mm256_blend_epi32(_mm256_adds_epi16(a, b), _mm256_subs_epi16(a, b), 0xF0);
}

/// Of rows p and q: p + t q in the low one, t p - q in the high one.
QORI_INLINE __m256i rotateRows(__m256i rows, double tangent) {
    return addSubtract(_mm256_mulhrs_epi16(swapRows(rows), splatWord(q15(tangent))), rows);
}

/// The columns' transform of the pairs of rows; pixels in 64ths.
QORI_INLINE PixelRows inverseWordColumns(const __m256i (&rows)[4]) {
    const __m256i e = addSubtract(swapRows(rows[0]), rows[0]), f = rotateRows(rows[2], kTangent2);
    const __m256i outerEven = _mm256_adds_epi16(e, f), innerEven = _mm256_subs_epi16(e, f);  // 0 and 1, 3 and 2
    const __m256i a = rotateRows(rows[1], kTangent1), b = rotateRows(rows[3], kTangent3);
    const __m256i sum = _mm256_adds_epi16(a, b), difference = _mm256_subs_epi16(a, b);
    const __m256i outerOdd = _mm256_blend_epi32(sum, difference, 0xF0);  // 0 and 3
    const __m256i mixed = _mm256_blend_epi32(difference, sum, 0xF0);
    const __m256i innerOdd =  // 1 and 2
        _mm256_mulhrs_epi16(addSubtract(swapRows(mixed), mixed), splatWord(q15(kCosine[4])));
    const __m256i odd01 = _mm256_permute2x128_si256(outerOdd, innerOdd, 0x20);
    const __m256i odd32 = _mm256_permute2x128_si256(outerOdd, innerOdd, 0x31);
    return {{_mm256_adds_epi16(outerEven, odd01), _mm256_subs_epi16(outerEven, odd01),
             _mm256_adds_epi16(innerEven, odd32), _mm256_subs_epi16(innerEven, odd32)}};
}

/// Whether coefficients and the pixels made of them, in 64ths, stayed within the lanes; then takes the parts off.
QORI_INLINE bool finishPixels(__m256i coefficientBits, PixelRows& pixels) {
    __m256i most = _mm256_setzero_si256();
    for (__m256i& pair : pixels.pair) {
        most = _mm256_max_epu16(most, _mm256_abs_epi16(pair));
        pair = _mm256_srai_epi16(pair, kPixelBits);
    }
    const __m256i tooLarge = _mm256_subs_epu16(most, splatWord(kMostPixel - 1));
    return isAllZero(_mm256_or_si256(tooLarge, _mm256_and_si256(coefficientBits, splatWord(-kMostCoefficient))));
}

/// False where the block wants more than 16-bit lanes.
QORI_INLINE bool inverseWords(const int16_t* src, PixelRows& pixels) {
    __m256i rows[4], coefficientBits = _mm256_setzero_si256();
    for (int p = 0; p < 4; ++p) {
        const __m256i pair = pairOf(loadRow(src + 8 * kFirstOfPair[p]), loadRow(src + 8 * kSecondOfPair[p]));
        coefficientBits = _mm256_or_si256(coefficientBits, _mm256_abs_epi16(pair));
        rows[p] = inverseRows(pair, kInverseWeights[p], inverseRounding(p == 0));
    }
    pixels = inverseWordColumns(rows);
    return finishPixels(coefficientBits, pixels);
}

// --- pixels ---------------------------------------------------------------------------------------------------------

/// Rows of a block of words in the order of PixelRows.
QORI_INLINE PixelRows pixelsOf(const int16_t* block) {
    PixelRows pixels;
    for (int p = 0; p < 4; ++p)
        pixels.pair[p] = pairOf(loadRow(block + 8 * kPixelRows[p][0]), loadRow(block + 8 * kPixelRows[p][1]));
    return pixels;
}

QORI_INLINE void storePixels(const PixelRows& pixels, Image<int16_t> dst) {
    for (int p = 0; p < 4; ++p)
        storeBlocks(asBytes(dst.row(kPixelRows[p][0])), asBytes(dst.row(kPixelRows[p][1])), {pixels.pair[p]});
}

/// What happens to pixels that become bytes: a value is added modulo 2^16, then they are kept from `least` to `most`,
/// the latter where the two are in conflict.
struct ByteRange {
    int16_t addVal = 0;
    uint8_t least = 0, most = 255;
};

QORI_INLINE void storePixels(const PixelRows& pixels, Image<uint8_t> dst, ByteRange range) {
    const __m256i least = _mm256_set1_epi8(static_cast<char>(range.least));
    const __m256i most = _mm256_set1_epi8(static_cast<char>(range.most));
    for (int p = 0; p < 4; p += 2) {
        const __m256i a = _mm256_add_epi16(pixels.pair[p], splatWord(range.addVal));
        const __m256i b = _mm256_add_epi16(pixels.pair[p + 1], splatWord(range.addVal));
        const __m256i bytes = _mm256_min_epu8(_mm256_max_epu8(_mm256_packus_epi16(a, b), least), most);
        for (int half = 0; half < 2; ++half) {
            const __m128i two = half == 0 ? _mm256_castsi256_si128(bytes) : _mm256_extracti128_si256(bytes, 1);
            _mm_storel_epi64(reinterpret_cast<__m128i*>(dst.row(kPixelRows[p][half])), two);
            _mm_storeh_pd(reinterpret_cast<double*>(dst.row(kPixelRows[p + 1][half])), _mm_castsi128_pd(two));
        }
    }
}

}  // namespace qori::kernels::dct8
