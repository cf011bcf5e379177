// SPDX-License-Identifier: Apache-2.0
// Passes over lines. A pass of radix r turns blocks of a length into r blocks each, whose transforms are the
// frequencies of one remainder by r.
#include "fourier.h"

#include "passes.h"

namespace qori::kernels {
namespace {

constexpr int kMostRadix = kMostPrimeFactor;

/// Sums and differences of the points of a prime radix around the first one.
struct PrimeSums {
    ComplexLine first, sum[kMostRadix / 2], difference[kMostRadix / 2];
};

/// `count` of the frequencies from m on, and their mirrors, of 2 half + 1 points. turns: for each q from 1 the cosines
/// and sines of 2 pi m q / radix, m from 1.
template <int count, class Put>
QORI_INLINE void primeFrequencies(const PrimeSums& a, int half, int m, const float* turns, Put put) {
    ComplexLine even[count], odd[count];
    for (int i = 0; i < count; ++i) {
        even[i] = a.first;
        odd[i] = {zero<float>(), zero<float>()};
    }
    const float* t = turns + 2 * (m - 1);
    for (int q = 0; q < half; ++q, t += 2 * half)
        for (int i = 0; i < count; ++i) {
            even[i] = line::mulAdd(a.sum[q], splat(t[2 * i]), even[i]);
            odd[i] = line::mulAdd(a.difference[q], splat(t[2 * i + 1]), odd[i]);
        }
    for (int i = 0; i < count; ++i) {
        put(m + i, line::minusI(even[i], odd[i]));
        put(2 * half + 1 - m - i, line::plusI(even[i], odd[i]));
    }
}

/// A prime above those that have a kernel of their own. The way back has its twiddles before the sums.
template <bool isBack>
QORI_NOINLINE void passPrime(float* lines, ptrdiff_t blocks, ptrdiff_t part, int radix, const float* turns,
                             const float* twiddles) {
    const ptrdiff_t apart = part * kLineFloats;
    const int half = radix / 2;
    PrimeSums a;
    for (ptrdiff_t block = 0; block < blocks; ++block, lines += radix * apart) {
        const float* w = twiddles;
        for (ptrdiff_t j = 0; j < part; ++j, w += 2 * (radix - 1)) {
            float* const x = lines + j * kLineFloats;
            const auto at = [=](int p) {
                const ComplexLine y = line::loadLine(x + p * apart);
                return isBack ? line::times(y, w + 2 * p - 2) : y;
            };
            a.first = line::loadLine(x);
            ComplexLine total = a.first;
            for (int q = 0; q < half; ++q) {
                const ComplexLine y = at(q + 1), z = at(radix - 1 - q);
                a.sum[q] = line::operator+(y, z);
                a.difference[q] = line::operator-(y, z);
                total = line::operator+(total, a.sum[q]);
            }
            line::storeLine(x, total);
            const auto put = [=](int p, ComplexLine f) {
                line::storeLine(x + p * apart, isBack || twiddles == nullptr ? f : line::times(f, w + 2 * p - 2));
            };
            int m = 1;
            for (; m + 2 <= half; m += 3) primeFrequencies<3>(a, half, m, turns, put);
            if (m + 1 == half) primeFrequencies<2>(a, half, m, turns, put);
            if (m == half) primeFrequencies<1>(a, half, m, turns, put);
        }
    }
}

template <int radix>
void passOf(float* lines, ptrdiff_t blocks, ptrdiff_t part, const float* turns, const float* twiddles) {
    if (twiddles != nullptr)
        line::passBlocks<radix, true>(lines, blocks, part, turns, twiddles);
    else
        line::passBlocks<radix, false>(lines, blocks, 1, turns, nullptr);
}

}  // namespace

void line::runStage(const FourierTable& table, const FourierTable::Stage& stage, float* lines, ptrdiff_t blocks) {
    const float* const turns = table.at<float>(stage.turns);
    const float* const twiddles = stage.twiddles == 0 ? nullptr : table.at<float>(stage.twiddles);
    const ptrdiff_t part = stage.length / stage.radix;
    switch (stage.radix) {
        case 2: return passOf<2>(lines, blocks, part, turns, twiddles);
        case 3: return passOf<3>(lines, blocks, part, turns, twiddles);
        case 4: return passOf<4>(lines, blocks, part, turns, twiddles);
        case 5: return passOf<5>(lines, blocks, part, turns, twiddles);
        case 7: return passOf<7>(lines, blocks, part, turns, twiddles);
        case 8: return passOf<8>(lines, blocks, part, turns, twiddles);
        default: return passPrime<false>(lines, blocks, part, stage.radix, turns, twiddles);
    }
}

void line::passBackPrime(const FourierTable& table, const FourierTable::Stage& stage, float* lines, ptrdiff_t blocks) {
    passPrime<true>(lines, blocks, stage.length / stage.radix, stage.radix, table.at<float>(stage.turns),
                    table.at<float>(stage.twiddles));
}

namespace {

/// A block from its stage on. Large blocks are divided first; the parts fit a cache then.
void transformBlock(const FourierTable& table, int32_t first, float* lines, ptrdiff_t points, float* work) {
    for (; first < table.stageCount && points > line::kPointsAtOnce; ++first) {
        const FourierTable::Stage& stage = table.stages[first];
        line::runStage(table, stage, lines, 1);
        const ptrdiff_t part = points / stage.radix;
        for (int32_t i = 1; i < stage.radix; ++i)
            transformBlock(table, first + 1, lines + i * part * kLineFloats, part, work);
        points = part;
    }
    for (; first < table.stageCount; ++first)
        line::runStage(table, table.stages[first], lines, points / table.stages[first].length);
    if (table.convolvedPoints > 1)
        for (ptrdiff_t i = 0; i < points; i += table.convolvedPoints)
            line::transformByConvolution(table, lines + i * kLineFloats, work);
}

QORI_INLINE float* lineAt(float* lines, int32_t position) { return lines + ptrdiff_t{position} * kLineFloats; }

}  // namespace

void transformLines(const FourierTable* table, float* lines, float* work) {
    transformBlock(*table, 0, lines, table->points, work);
}

void splitHalves(float* lines, int32_t n, const int32_t* positions, const float* roots) {
    const int32_t points = n / 2;
    float* const first = lineAt(lines, positions[0]);
    line::storeLine(first, line::sumAndDifference(line::loadLine(first)));
    for (int32_t k = 1; k <= points - k; ++k) {
        float *const at = lineAt(lines, positions[k]), *const mirror = lineAt(lines, positions[points - k]);
        const line::Halves x = line::splitHalf(line::loadLine(at), line::loadLine(mirror), roots + 2 * k);
        line::storeLine(mirror, x.mirror);
        line::storeLine(at, x.at);
    }
}

void joinHalves(float* lines, int32_t n, const float* roots) {
    const int32_t points = n / 2;
    const ComplexLine ends = line::sumAndDifference(line::loadLine(lines));
    line::storeLine(lines, {ends.im, ends.re});
    for (int32_t k = 1; k <= points - k; ++k) {
        float *const at = lineAt(lines, k), *const mirror = lineAt(lines, points - k);
        const line::Halves z = line::joinHalf(line::loadLine(at), line::loadLine(mirror), roots + 2 * k);
        line::storeLine(mirror, z.mirror);
        line::storeLine(at, z.at);
    }
}

void splitPairs(float* lines, int32_t n, const int32_t* positions) {
    const Vec<float> half = splat(0.5f);
    for (int32_t k = 1; k < n - k; ++k) {
        float *const at = lineAt(lines, positions[k]), *const mirror = lineAt(lines, positions[n - k]);
        const ComplexLine z = line::loadLine(at), y = line::loadLine(mirror);
        line::storeLine(at, {(z.re + y.re) * half, (z.im - y.im) * half});
        line::storeLine(mirror, {(z.im + y.im) * half, (y.re - z.re) * half});
    }
}

void joinPairs(float* lines, int32_t n) {
    for (int32_t k = 1; k < n - k; ++k) {
        float *const at = lineAt(lines, k), *const mirror = lineAt(lines, n - k);
        const ComplexLine a = line::loadLine(at), b = line::loadLine(mirror);
        line::storeLine(at, {a.im + b.re, a.re - b.im});
        line::storeLine(mirror, {b.re - a.im, a.re + b.im});
    }
    const ComplexLine first = line::loadLine(lines);
    line::storeLine(lines, {first.im, first.re});
    if (n % 2 == 0) {
        float* const middle = lineAt(lines, n / 2);
        const ComplexLine ends = line::loadLine(middle);
        line::storeLine(middle, {ends.im, ends.re});
    }
}

}  // namespace qori::kernels
