// SPDX-License-Identifier: Apache-2.0
// Rows of four channels: pixels of two rows are the lanes of a vector as they lie, and nothing is turned. Two rows and
// their lines fit a first-level cache where eight rows of as many lines for each channel do not.
#include "pixel_rows.h"

namespace qori::kernels {
namespace {

/// The last of an odd number of rows is both.
class TwoRows {
public:
    explicit TwoRows(const LineRows& rows) : first_(rows.row(0)), second_(rows.row(rows.count - 1)) {}

    QORI_INLINE Vec<float> load(ptrdiff_t e) const {
        const __m256 low = _mm256_castps128_ps256(_mm_loadu_ps(first_ + 4 * e));
        return {_mm256_insertf128_ps(low, _mm_loadu_ps(second_ + 4 * e), 1)};
    }
    QORI_INLINE ComplexLine loadPair(ptrdiff_t k) const { return {load(2 * k), load(2 * k + 1)}; }

    /// All of a pixel, or its first three channels.
    template <bool isWhole>
    QORI_INLINE void store(ptrdiff_t e, Vec<float> v) const {
        const __m128 first = _mm256_castps256_ps128(v.v), second = _mm256_extractf128_ps(v.v, 1);
        if constexpr (isWhole) {
            _mm_storeu_ps(first_ + 4 * e, first);
            _mm_storeu_ps(second_ + 4 * e, second);
        } else {
            const __m128i three = _mm_setr_epi32(-1, -1, -1, 0);
            _mm_maskstore_ps(first_ + 4 * e, three, first);
            _mm_maskstore_ps(second_ + 4 * e, three, second);
        }
    }
    template <bool isWhole>
    QORI_INLINE void storePair(ptrdiff_t k, ComplexLine a) const {
        store<isWhole>(2 * k, a.re);
        store<isWhole>(2 * k + 1, a.im);
    }

private:
    float *first_, *second_;
};

template <bool isWhole>
QORI_NOINLINE void storeLines(const float* lines, const int32_t* positions, ptrdiff_t points, Parts parts,
                              TwoRows rows) {
    for (ptrdiff_t k = 0; k < points; ++k) {
        const ComplexLine a = line::loadLine(lines + ptrdiff_t{positions[k]} * kLineFloats);
        rows.storePair<isWhole>(k, parts == Parts::inOrder ? a : ComplexLine{a.im, a.re});
    }
}

template <bool isWhole>
QORI_NOINLINE void splitToPixels(const float* lines, ptrdiff_t points, const int32_t* positions, const float* roots,
                                 TwoRows rows) {
    const auto at = [=](ptrdiff_t k) { return line::loadLine(lines + ptrdiff_t{positions[k]} * kLineFloats); };
    rows.storePair<isWhole>(0, line::sumAndDifference(at(0)));
    for (ptrdiff_t k = 1; k <= points - k; ++k) {
        const line::Halves x = line::splitHalf(at(k), at(points - k), roots + kHalfRootFloats * k);
        rows.storePair<isWhole>(points - k, x.mirror);
        rows.storePair<isWhole>(k, x.at);
    }
}

bool isWhole(const LineRows& rows) { return rows.channels == rows.processed; }

}  // namespace

void pixelsToLines(const LineRows& rows, ptrdiff_t n, float scale, float* lines) {
    const TwoRows in(rows);
    const Vec<float> factor = splat(scale);
    for (ptrdiff_t e = 0; e < n; ++e) store(lines + e * kLineColumns, in.load(e) * factor);
}

void linesToPixels(const float* lines, const int32_t* positions, ptrdiff_t n, Parts parts, const LineRows& rows) {
    if (isWhole(rows)) return storeLines<true>(lines, positions, n / 2, parts, TwoRows(rows));
    storeLines<false>(lines, positions, n / 2, parts, TwoRows(rows));
}

void halvesToPixels(const float* lines, int32_t n, const int32_t* positions, const float* roots, const LineRows& rows) {
    if (isWhole(rows)) return splitToPixels<true>(lines, n / 2, positions, roots, TwoRows(rows));
    splitToPixels<false>(lines, n / 2, positions, roots, TwoRows(rows));
}

void pixelsToHalves(const LineRows& rows, int32_t n, float scale, const float* roots, float* lines) {
    const TwoRows in(rows);
    const Vec<float> factor = splat(scale);
    const auto at = [=](ptrdiff_t k) {
        const ComplexLine a = in.loadPair(k);
        return ComplexLine{a.re * factor, a.im * factor};
    };
    const ptrdiff_t points = n / 2;
    line::storeLine(lines, line::joinEnds(at(0)));
    for (ptrdiff_t k = 1; k <= points - k; ++k) {
        const line::Halves z = line::joinHalf(at(k), at(points - k), roots + kHalfRootFloats * k);
        line::storeLine(lines + (points - k) * kLineFloats, z.mirror);
        line::storeLine(lines + k * kLineFloats, z.at);
    }
}

}  // namespace qori::kernels
