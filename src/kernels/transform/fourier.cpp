// SPDX-License-Identifier: Apache-2.0
// Transforms of lines, stage by stage, and what makes spectra of real sequences of them.
#include "fourier.h"

#include "passes.h"

namespace qori::kernels {
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
        const line::Halves x = line::splitHalf(line::loadLine(at), line::loadLine(mirror), roots + kHalfRootFloats * k);
        line::storeLine(mirror, x.mirror);
        line::storeLine(at, x.at);
    }
}

void joinHalves(float* lines, int32_t n, const float* roots) {
    const int32_t points = n / 2;
    line::storeLine(lines, line::joinEnds(line::loadLine(lines)));
    for (int32_t k = 1; k <= points - k; ++k) {
        float *const at = lineAt(lines, k), *const mirror = lineAt(lines, points - k);
        const line::Halves z = line::joinHalf(line::loadLine(at), line::loadLine(mirror), roots + kHalfRootFloats * k);
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
