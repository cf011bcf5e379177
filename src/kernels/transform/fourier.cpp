// SPDX-License-Identifier: Apache-2.0
// Passes over lines. A pass of radix r turns blocks of a length into r blocks each, whose transforms are the
// frequencies of one remainder by r.
#include "fourier.h"

#include <cstring>

#include "passes.h"

namespace qori::kernels {
namespace {

constexpr int kMostRadix = 61;

/// A prime above those that have a kernel of their own.
QORI_NOINLINE void passAnyPrime(float* lines, ptrdiff_t blocks, ptrdiff_t part, int radix, const float* turns,
                                const float* twiddles) {
    const ptrdiff_t apart = part * kLineFloats;
    const int half = radix / 2;
    ComplexLine s[kMostRadix / 2], d[kMostRadix / 2];
    for (ptrdiff_t block = 0; block < blocks; ++block, lines += radix * apart) {
        const float* w = twiddles;
        for (ptrdiff_t j = 0; j < part; ++j, w += 2 * (radix - 1)) {
            float* const x = lines + j * kLineFloats;
            const ComplexLine first = line::loadLine(x);
            ComplexLine total = first;
            for (int q = 0; q < half; ++q) {
                const ComplexLine a = line::loadLine(x + (q + 1) * apart);
                const ComplexLine b = line::loadLine(x + (radix - 1 - q) * apart);
                s[q] = line::operator+(a, b);
                d[q] = line::operator-(a, b);
                total = line::operator+(total, s[q]);
            }
            line::storeLine(x, total);
            for (int m = 1; m <= half; ++m) {
                ComplexLine even = first, odd = {zero<float>(), zero<float>()};
                int turn = 0;
                for (int q = 0; q < half; ++q) {
                    turn += m;
                    if (turn >= radix) turn -= radix;
                    const bool isBack = turn > half;
                    const float* const t = turns + 2 * (isBack ? radix - turn : turn) - 2;
                    even = line::mulAdd(s[q], splat(t[0]), even);
                    odd = line::mulAdd(d[q], splat(isBack ? -t[1] : t[1]), odd);
                }
                ComplexLine low = line::minusI(even, odd), high = line::plusI(even, odd);
                if (twiddles != nullptr) {
                    low = line::times(low, w + 2 * m - 2);
                    high = line::times(high, w + 2 * (radix - m) - 2);
                }
                line::storeLine(x + m * apart, low);
                line::storeLine(x + (radix - m) * apart, high);
            }
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
        default: return passAnyPrime(lines, blocks, part, stage.radix, turns, twiddles);
    }
}

namespace {

/// The n points of a block, n odd, by a convolution with a chirp. work: twice the lines of the inner transform.
void convolveWithChirp(const FourierTable& table, float* block, float* work) {
    const auto* const inner = table.at<FourierTable>(table.inner);
    const auto* const chirp = table.at<float>(table.chirpAt);
    const auto* const spectrum = table.at<float>(table.spectrumAt);
    const ptrdiff_t n = table.chirpPoints, length = inner->points;
    float* const back = work + length * kLineFloats;
    for (ptrdiff_t j = 0; j < n; ++j)
        line::storeLine(work + j * kLineFloats, line::times(line::loadLine(block + j * kLineFloats), chirp + 2 * j));
    std::memset(work + n * kLineFloats, 0, static_cast<size_t>((length - n) * kLineBytes));
    transformLines(inner, work, nullptr);
    const int32_t* const positions = inner->positions();
    for (ptrdiff_t k = 0; k < length; ++k) {
        const ComplexLine product =
            line::times(line::loadLine(work + ptrdiff_t{positions[k]} * kLineFloats), spectrum + 2 * k);
        line::storeLine(back + k * kLineFloats, {product.im, product.re});
    }
    transformLines(inner, back, nullptr);
    for (ptrdiff_t j = 0; j < n; ++j) {
        const ComplexLine sum = line::loadLine(back + ptrdiff_t{positions[j]} * kLineFloats);
        line::storeLine(block + j * kLineFloats, line::times({sum.im, sum.re}, chirp + 2 * j));
    }
}

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
    if (table.chirpPoints > 1)
        for (ptrdiff_t i = 0; i < points; i += table.chirpPoints)
            convolveWithChirp(table, lines + i * kLineFloats, work);
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
