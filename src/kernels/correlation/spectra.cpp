// SPDX-License-Identifier: Apache-2.0
#include "kernels/correlation/spectra.h"

#include <bit>

#include "kernels/transform/passes.h"

namespace qori::kernels::correlation {

namespace {

using Line = ComplexLineOf<double>;

// --- passes ---------------------------------------------------------------------------------------------------------

/// The transpose of a stage: blocks of radix * part points are multiplied by the twiddles before the butterfly.
template <int radix>
QORI_NOINLINE void passBlocksBack(double* lines, ptrdiff_t blocks, ptrdiff_t part, const double* turns,
                                  const double* twiddles) {
    const ptrdiff_t apart = part * kLineDoubles;
    for (; blocks > 0; --blocks, lines += radix * apart) {
        const double* w = twiddles;
        for (ptrdiff_t j = 0; j < part; ++j, w += 2 * (radix - 1)) {
            double* const x = lines + j * kLineDoubles;
            Line a[radix] = {line::loadLine(x)};
            for (int p = 1; p < radix; ++p) a[p] = line::times(line::loadLine(x + p * apart), w + 2 * p - 2);
            line::butterflyOf<radix>(a, turns);
            for (int p = 0; p < radix; ++p) line::storeLine(x + p * apart, a[p]);
        }
    }
}

template <int radix, bool isBack>
void passOf(double* lines, ptrdiff_t length, ptrdiff_t part, const double* turns, const double* twiddles) {
    const ptrdiff_t blocks = length / (radix * part);
    if (part == 1)  // all twiddles are 1
        line::passBlocks<radix, false>(lines, blocks, 1, turns, twiddles);
    else if constexpr (isBack)
        passBlocksBack<radix>(lines, blocks, part, turns, twiddles);
    else
        line::passBlocks<radix, true>(lines, blocks, part, turns, twiddles);
}

template <bool isBack, class Stage>
void pass(double* lines, ptrdiff_t length, const Stage& stage) {
    switch (stage.radix) {
        case 2: return passOf<2, isBack>(lines, length, stage.part, stage.turns, stage.twiddles);
        case 3: return passOf<3, isBack>(lines, length, stage.part, stage.turns, stage.twiddles);
        case 4: return passOf<4, isBack>(lines, length, stage.part, stage.turns, stage.twiddles);
        case 5: return passOf<5, isBack>(lines, length, stage.part, stage.turns, stage.twiddles);
        default: return passOf<8, isBack>(lines, length, stage.part, stage.turns, stage.twiddles);
    }
}

/// Odd radices first, whose twiddles then cost the least of all orders, then a 2 or 4s, then 8s.
int nextRadix(int64_t length) {
    if (length % 5 == 0) return 5;
    if (length % 3 == 0) return 3;
    const int twos = std::countr_zero(static_cast<uint64_t>(length));
    return twos == 1 ? 2 : twos % 3 == 0 ? 8 : 4;
}

}  // namespace

int64_t LineTransform::lengthFrom(int64_t n) {
    int64_t best = INT64_MAX;
    for (int64_t fives = 4; fives < 4 * 625; fives *= 5)
        for (int64_t odd = fives; odd < fives * 81; odd *= 3) {
            int64_t length = odd;
            while (length < n) length *= 2;
            best = std::min(best, length);
        }
    return best;
}

/// Two roots for a radix of 5, and less than two twiddles per point over all stages: (r - 1) / r of each block's, and
/// blocks become shorter by r.
int64_t LineTransform::tableDoubles(int64_t length) {
    return 4 * length + 4 * kMostStages + Roots::bytes(length) / static_cast<int64_t>(sizeof(double));
}

void LineTransform::makeTables(double* tables) {
    const Roots roots(length_, tables);
    tables += Roots::bytes(length_) / static_cast<int64_t>(sizeof(double));
    int64_t left = length_;
    for (stageCount_ = 0; left > 1; ++stageCount_) {
        Stage& stage = stages_[stageCount_];
        stage.radix = nextRadix(left);
        stage.part = static_cast<int32_t>(left / stage.radix);
        stage.turns = tables;
        for (int64_t k = 1; k <= stage.radix / 2 && stage.radix % 2 == 1; ++k) {
            const Root root = rootOfUnity(k, stage.radix);
            *tables++ = root.re;
            *tables++ = -root.im;
        }
        stage.twiddles = tables;
        const int64_t ratio = length_ / left;
        for (int64_t j = 0; j < stage.part && stage.part > 1; ++j)
            for (int64_t p = 1; p < stage.radix; ++p) {
                const Root root = roots(j * p * ratio);
                *tables++ = root.re;
                *tables++ = root.im;
            }
        left = stage.part;
    }
}

void LineTransform::forth(double* lines) const {
    for (int i = 0; i < stageCount_; ++i) pass<false>(lines, length_, stages_[i]);
}

void LineTransform::back(double* lines) const {
    for (int i = stageCount_; i > 0; --i) pass<true>(lines, length_, stages_[i - 1]);
}

// --- turning --------------------------------------------------------------------------------------------------------

namespace {

struct Square {
    Vec<double> row[kQuad];
};

QORI_INLINE Square turned(Square a) {
    const __m256d low01 = _mm256_unpacklo_pd(a.row[0].v, a.row[1].v),
                  high01 = _mm256_unpackhi_pd(a.row[0].v, a.row[1].v);
    const __m256d low23 = _mm256_unpacklo_pd(a.row[2].v, a.row[3].v),
                  high23 = _mm256_unpackhi_pd(a.row[2].v, a.row[3].v);
    return {{{_mm256_permute2f128_pd(low01, low23, 0x20)},
             {_mm256_permute2f128_pd(high01, high23, 0x20)},
             {_mm256_permute2f128_pd(low01, low23, 0x31)},
             {_mm256_permute2f128_pd(high01, high23, 0x31)}}};
}

/// Four vectors so many doubles apart become those of their lanes.
QORI_INLINE void turn(const double* from, ptrdiff_t fromPitch, double* to, ptrdiff_t toPitch) {
    Square square;
    for (int k = 0; k < kQuad; ++k) square.row[k] = load(from + k * fromPitch);
    square = turned(square);
    for (int k = 0; k < kQuad; ++k) store(to + k * toPitch, square.row[k]);
}

/// Four lines of four rows become four lines of four columns, or the other way round.
QORI_INLINE void turnBlock(const double* from, double* to) {
    turn(from, kLineDoubles, to, kLineDoubles);
    turn(from + kQuad, kLineDoubles, to + kQuad, kLineDoubles);
}

void takeColumns(Quads plane, ptrdiff_t x, double* lines, ptrdiff_t length) {
    for (ptrdiff_t q = 0; q < plane.count; ++q)
        turnBlock(plane.first + q * plane.pitch + x * kLineDoubles, lines + q * kQuad * kLineDoubles);
    const ptrdiff_t done = plane.count * kQuad * kLineDoubles;
    std::fill(lines + done, lines + length * kLineDoubles, 0.0);
}

}  // namespace

void rowsToLines(const double* re, const double* im, ptrdiff_t pitch, ptrdiff_t n, double* lines) {
    for (ptrdiff_t x = 0; x < n; x += kQuad) {
        turn(re + x, pitch, lines + x * kLineDoubles, kLineDoubles);
        turn(im + x, pitch, lines + x * kLineDoubles + kQuad, kLineDoubles);
    }
}

void linesToRows(const double* lines, ptrdiff_t n, bool isInteger, double* re, double* im, ptrdiff_t pitch) {
    const auto put = [=](const double* from, double* to) {
        Square square;
        for (int k = 0; k < kQuad; ++k) square.row[k] = load(from + k * kLineDoubles);
        square = turned(square);
        for (int k = 0; k < kQuad; ++k) {
            const __m256d v = square.row[k].v;
            constexpr int kNearest = _MM_FROUND_TO_NEAREST_INT | _MM_FROUND_NO_EXC;
            store(to + k * pitch, Vec<double>{isInteger ? _mm256_round_pd(v, kNearest) : v});
        }
    };
    for (ptrdiff_t x = 0; x < n; x += kQuad) {
        put(lines + x * kLineDoubles + kQuad, re + x);
        put(lines + x * kLineDoubles, im + x);
    }
}

void makeSpectrum(const LineTransform& columns, Quads plane, ptrdiff_t width, double scale, double* spectrum) {
    const ptrdiff_t length = columns.length();
    const Vec<double> re = splat(scale), im = splat(-scale);
    for (ptrdiff_t x = 0; x < width; x += kQuad, spectrum += length * kLineDoubles) {
        takeColumns(plane, x, spectrum, length);
        columns.forth(spectrum);
        for (ptrdiff_t k = 0; k < length; ++k) {
            const Line a = line::loadLine(spectrum + k * kLineDoubles);
            line::storeLine(spectrum + k * kLineDoubles, Line{a.re * re, a.im * im});
        }
    }
}

void correlateColumns(const LineTransform& columns, Quads plane, ptrdiff_t width, const double* spectrum, double* lines,
                      ptrdiff_t wanted) {
    const ptrdiff_t length = columns.length();
    for (ptrdiff_t x = 0; x < width; x += kQuad, spectrum += length * kLineDoubles) {
        takeColumns(plane, x, lines, length);
        columns.forth(lines);
        for (ptrdiff_t k = 0; k < length; ++k) {
            double* const at = lines + k * kLineDoubles;
            const Line factor = line::loadLine(spectrum + k * kLineDoubles);
            const Line product = line::times(line::loadLine(at), factor.re, factor.im);
            line::storeLine(at, Line{product.im, product.re});
        }
        columns.back(lines);
        for (ptrdiff_t q = 0; q < wanted; ++q)
            turnBlock(lines + q * kQuad * kLineDoubles, plane.first + q * plane.pitch + x * kLineDoubles);
    }
}

double sumOfSquares(const double* cells, ptrdiff_t n) {
    double sums[4] = {};
    ptrdiff_t x = 0;
    for (; x + 4 <= n; x += 4)
        for (int k = 0; k < 4; ++k) sums[k] += cells[x + k] * cells[x + k];
    for (; x < n; ++x) sums[0] += cells[x] * cells[x];
    return (sums[0] + sums[1]) + (sums[2] + sums[3]);
}

}  // namespace qori::kernels::correlation
