// SPDX-License-Identifier: Apache-2.0
// Transforms of lengths with large prime factors: with jk = (j^2 + k^2 - (k - j)^2) / 2, the sum over j of
// x(j) e^(-2 pi i jk / n) is a chirp times the convolution of x times the chirp with the chirp's conjugate (Bluestein:
// A linear filtering approach to the computation of the discrete Fourier transform, 1970).
//
// The convolution is cyclic, of a length of small factors: transformed, multiplied by the spectrum of the conjugate,
// transformed back through the same stages from the last to the first, so that nothing is ever put in order. Between
// the exchanged parts of the way back the stages are forward ones, with their twiddles before the butterfly.
#include "passes.h"

namespace qori::kernels {
namespace {

QORI_INLINE ComplexLine exchanged(ComplexLine a) { return {a.im, a.re}; }

/// A stage back: blocks of radix * part points.
template <int radix>
QORI_NOINLINE void passBack(float* lines, ptrdiff_t blocks, ptrdiff_t part, const float* turns, const float* twiddles) {
    const ptrdiff_t apart = part * kLineFloats;
    for (ptrdiff_t block = 0; block < blocks; ++block, lines += radix * apart) {
        const float* w = twiddles;
        for (ptrdiff_t j = 0; j < part; ++j, w += 2 * (radix - 1)) {
            float* const x = lines + j * kLineFloats;
            ComplexLine a[radix];
            a[0] = line::loadLine(x);
            for (int p = 1; p < radix; ++p) a[p] = line::times(line::loadLine(x + p * apart), w + 2 * p - 2);
            line::butterflyOf<radix>(a, turns);
            for (int q = 0; q < radix; ++q) line::storeLine(x + q * apart, a[q]);
        }
    }
}

void stageBack(const FourierTable& table, const FourierTable::Stage& stage, float* lines, ptrdiff_t blocks) {
    const float* const turns = table.at<float>(stage.turns);
    const float* const twiddles = table.at<float>(stage.twiddles);
    const ptrdiff_t part = stage.length / stage.radix;
    switch (stage.radix) {
        case 3: return passBack<3>(lines, blocks, part, turns, twiddles);
        case 4: return passBack<4>(lines, blocks, part, turns, twiddles);
        case 5: return passBack<5>(lines, blocks, part, turns, twiddles);
        default: return passBack<8>(lines, blocks, part, turns, twiddles);
    }
}

/// The last stage, the product with the spectrum, which is in the order of the lines, and the first stage back.
QORI_NOINLINE void turnBack(float* lines, ptrdiff_t blocks, const float* spectrum) {
    constexpr int radix = 8;
    for (ptrdiff_t block = 0; block < blocks; ++block, lines += radix * kLineFloats, spectrum += 2 * radix) {
        ComplexLine a[radix];
        for (int q = 0; q < radix; ++q) a[q] = line::loadLine(lines + q * kLineFloats);
        line::butterfly(a);
        for (int q = 0; q < radix; ++q) a[q] = exchanged(line::times(a[q], spectrum + 2 * q));
        line::butterfly(a);
        for (int q = 0; q < radix; ++q) line::storeLine(lines + q * kLineFloats, a[q]);
    }
}

/// A convolution and what of it is not points of the block: these are less than half of its lines.
struct Convolution {
    const FourierTable& inner;
    const float *chirp, *spectrum;
    ptrdiff_t points;
};

/// The convolution's stage that is the first forth and the last back. The block's points fill `filled` of its parts.
template <int radix>
struct OuterStage {
    static constexpr int filled = (radix + 1) / 2;
    ptrdiff_t part;
    const float *turns, *twiddles;

    explicit OuterStage(const FourierTable& inner)
        : part(inner.stages[0].length / radix),
          turns(inner.at<float>(inner.stages[0].turns)),
          twiddles(inner.at<float>(inner.stages[0].twiddles)) {}
};

/// Reads the block's points, times the chirp, through the first stage; what is beyond them is 0.
template <int radix>
QORI_NOINLINE void enter(const Convolution& c, const float* block, float* lines) {
    const auto [part, turns, twiddles] = OuterStage<radix>(c.inner);
    constexpr int filled = OuterStage<radix>::filled;
    const float* w = twiddles;
    for (ptrdiff_t j = 0; j < part; ++j, w += 2 * (radix - 1)) {
        ComplexLine a[radix];
        for (int q = 0; q < radix; ++q) {
            const ptrdiff_t i = j + q * part;
            a[q] = {zero<float>(), zero<float>()};
            if (q < filled && i < c.points)
                a[q] = line::times(line::loadLine(block + i * kLineFloats), c.chirp + 2 * i);
        }
        line::butterflyOf<radix>(a, turns);
        line::storeLine(lines + j * kLineFloats, a[0]);
        for (int p = 1; p < radix; ++p)
            line::storeLine(lines + (j + p * part) * kLineFloats, line::times(a[p], w + 2 * p - 2));
    }
}

/// The last stage back, and the chirp, of as many points as the block has.
template <int radix>
QORI_NOINLINE void leave(const Convolution& c, const float* lines, float* block) {
    const auto [part, turns, twiddles] = OuterStage<radix>(c.inner);
    constexpr int filled = OuterStage<radix>::filled;
    const float* w = twiddles;
    for (ptrdiff_t j = 0; j < part; ++j, w += 2 * (radix - 1)) {
        ComplexLine a[radix];
        a[0] = line::loadLine(lines + j * kLineFloats);
        for (int p = 1; p < radix; ++p)
            a[p] = line::times(line::loadLine(lines + (j + p * part) * kLineFloats), w + 2 * p - 2);
        line::butterflyOf<radix>(a, turns);
        for (int q = 0; q < filled; ++q) {
            const ptrdiff_t i = j + q * part;
            if (i < c.points) line::storeLine(block + i * kLineFloats, line::times(exchanged(a[q]), c.chirp + 2 * i));
        }
    }
}

/// Forth and back from a stage on. Large blocks are divided first.
void convolveBlock(const Convolution& c, int32_t first, float* lines, ptrdiff_t points, const float* spectrum) {
    const FourierTable& inner = c.inner;
    const int32_t last = inner.stageCount - 1;
    if (first < last && points > line::kPointsAtOnce) {
        const FourierTable::Stage& stage = inner.stages[first];
        line::runStage(inner, stage, lines, 1);
        const ptrdiff_t part = points / stage.radix;
        for (ptrdiff_t i = 0; i < stage.radix; ++i)
            convolveBlock(c, first + 1, lines + i * part * kLineFloats, part, spectrum + 2 * i * part);
        return stageBack(inner, stage, lines, 1);
    }
    for (int32_t i = first; i < last; ++i)
        line::runStage(inner, inner.stages[i], lines, points / inner.stages[i].length);
    turnBack(lines, points / inner.stages[last].length, spectrum);
    for (int32_t i = last - 1; i >= first; --i)
        stageBack(inner, inner.stages[i], lines, points / inner.stages[i].length);
}

template <int radix>
void convolveFrom(const Convolution& c, float* block, float* work) {
    enter<radix>(c, block, work);
    const ptrdiff_t part = c.inner.points / radix;
    for (ptrdiff_t i = 0; i < radix; ++i)
        convolveBlock(c, 1, work + i * part * kLineFloats, part, c.spectrum + 2 * i * part);
    leave<radix>(c, work, block);
}

}  // namespace

void line::convolveWithChirp(const FourierTable& table, float* block, float* work) {
    const Convolution c{*table.at<FourierTable>(table.inner), table.at<float>(table.chirpAt),
                        table.at<float>(table.spectrumAt), table.chirpPoints};
    switch (c.inner.stages[0].radix) {
        case 3: return convolveFrom<3>(c, block, work);
        case 4: return convolveFrom<4>(c, block, work);
        case 5: return convolveFrom<5>(c, block, work);
        default: return convolveFrom<8>(c, block, work);
    }
}

}  // namespace qori::kernels
