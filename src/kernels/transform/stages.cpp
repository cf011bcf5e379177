// SPDX-License-Identifier: Apache-2.0
// Passes over lines. A pass of radix r turns blocks of a length into r blocks each, whose transforms are the
// frequencies of one remainder by r; on the way back, in a convolution, it makes one block of them.
#include "passes.h"

namespace qori::kernels {
namespace {

using line::Way;

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
#pragma GCC unroll 3
        for (int i = 0; i < count; ++i) {
            even[i] = line::mulAdd(a.sum[q], splat(t[2 * i]), even[i]);
            odd[i] = line::mulAdd(a.difference[q], splat(t[2 * i + 1]), odd[i]);
        }
    for (int i = 0; i < count; ++i) {
        put(m + i, line::minusI(even[i], odd[i]));
        put(2 * half + 1 - m - i, line::plusI(even[i], odd[i]));
    }
}

/// What a pass needs to know of its stage.
struct Pass {
    ptrdiff_t part, rotation;
    const float *turns, *twiddles;  ///< twiddles: null where there are none.

    Pass(const FourierTable& table, const FourierTable::Stage& stage)
        : part(stage.length / stage.radix),
          rotation(stage.rotation),
          turns(table.at<float>(stage.turns)),
          twiddles(stage.twiddles == 0 ? nullptr : table.at<float>(stage.twiddles)) {}
};

/// A prime above those that have a kernel of their own.
template <Way way, bool isRotated>
QORI_NOINLINE void passPrime(float* lines, ptrdiff_t blocks, int radix, const Pass& pass) {
    const ptrdiff_t apart = pass.part * kLineFloats;
    const int half = radix / 2, rotation = static_cast<int>(pass.rotation);
    const float *const turns = pass.turns, *const twiddles = pass.twiddles;
    PrimeSums a;
    for (ptrdiff_t block = 0; block < blocks; ++block, lines += radix * apart) {
        const float* w = twiddles;
        int start = 0;
        for (ptrdiff_t j = 0; j < pass.part; ++j, w += 2 * (radix - 1)) {
            float* const x = lines + j * kLineFloats;
            // Where point q is before the way forth and after the way back.
            const auto around = [=](int q) {
                if constexpr (isRotated) q = q + start < radix ? q + start : q + start - radix;
                return x + q * apart;
            };
            const auto at = [=](int q) {
                if constexpr (way == Way::forth) return line::loadLine(around(q));
                const ComplexLine y = line::loadLine(x + q * apart);
                return isRotated || q == 0 ? y : line::times(y, w + 2 * q - 2);
            };
            const auto put = [=](int p, ComplexLine f) {
                if constexpr (way == Way::back) return line::storeLine(around(p), f);
                line::storeLine(x + p * apart,
                                isRotated || twiddles == nullptr || p == 0 ? f : line::times(f, w + 2 * p - 2));
            };
            a.first = at(0);
            ComplexLine total = a.first;
            for (int q = 0; q < half; ++q) {
                const ComplexLine y = at(q + 1), z = at(radix - 1 - q);
                a.sum[q] = line::operator+(y, z);
                a.difference[q] = line::operator-(y, z);
                total = line::operator+(total, a.sum[q]);
            }
            put(0, total);
            int m = 1;
            for (; m + 2 <= half; m += 3) primeFrequencies<3>(a, half, m, turns, put);
            if (m + 1 == half) primeFrequencies<2>(a, half, m, turns, put);
            if (m == half) primeFrequencies<1>(a, half, m, turns, put);
            if constexpr (isRotated) start -= start < rotation ? rotation - radix : rotation;
        }
    }
}

/// Blocks whose radix and part have no common factor: a butterfly begins at a line of its own and goes around.
template <int radix, Way way>
QORI_NOINLINE void passRotated(float* lines, ptrdiff_t blocks, const Pass& pass) {
    const ptrdiff_t apart = pass.part * kLineFloats;
    for (; blocks > 0; --blocks, lines += radix * apart) {
        line::Rotation<radix> rotation(pass.rotation, apart);
        for (ptrdiff_t j = 0; j < pass.part; ++j, rotation.advance()) {
            float* const x = lines + j * kLineFloats;
            ptrdiff_t around[radix];
            rotation.offsets(around);
            ComplexLine a[radix];
            for (int q = 0; q < radix; ++q) a[q] = line::loadLine(x + (way == Way::forth ? around[q] : q * apart));
            line::butterflyOf<radix>(a, pass.turns);
            for (int q = 0; q < radix; ++q) line::storeLine(x + (way == Way::back ? around[q] : q * apart), a[q]);
        }
    }
}

/// The way back has its twiddles before the butterfly.
template <int radix>
QORI_NOINLINE void passBack(float* lines, ptrdiff_t blocks, const Pass& pass) {
    const ptrdiff_t apart = pass.part * kLineFloats;
    for (; blocks > 0; --blocks, lines += radix * apart) {
        const float* w = pass.twiddles;
        for (ptrdiff_t j = 0; j < pass.part; ++j, w += 2 * (radix - 1)) {
            float* const x = lines + j * kLineFloats;
            ComplexLine a[radix];
            a[0] = line::loadLine(x);
            for (int p = 1; p < radix; ++p) a[p] = line::times(line::loadLine(x + p * apart), w + 2 * p - 2);
            line::butterflyOf<radix>(a, pass.turns);
            for (int q = 0; q < radix; ++q) line::storeLine(x + q * apart, a[q]);
        }
    }
}

template <int radix, Way way>
void passOf(float* lines, ptrdiff_t blocks, const Pass& pass) {
    if constexpr (line::isOdd<radix>)
        if (pass.rotation != 0) return passRotated<radix, way>(lines, blocks, pass);
    if constexpr (way == Way::back)
        passBack<radix>(lines, blocks, pass);
    else if (pass.twiddles != nullptr)
        line::passBlocks<radix, true>(lines, blocks, pass.part, pass.turns, pass.twiddles);
    else
        line::passBlocks<radix, false>(lines, blocks, 1, pass.turns, nullptr);
}

template <Way way>
void passBy(const FourierTable& table, const FourierTable::Stage& stage, float* lines, ptrdiff_t blocks) {
    const Pass pass(table, stage);
    switch (stage.radix) {
        case 2:
            if constexpr (way == Way::forth) return passOf<2, way>(lines, blocks, pass);
            break;  // always the last stage, of which convolutions have one of their own
        case 3: return passOf<3, way>(lines, blocks, pass);
        case 4: return passOf<4, way>(lines, blocks, pass);
        case 5: return passOf<5, way>(lines, blocks, pass);
        case 7: return passOf<7, way>(lines, blocks, pass);
        case 8: return passOf<8, way>(lines, blocks, pass);
        default:
            if (pass.rotation != 0) return passPrime<way, true>(lines, blocks, stage.radix, pass);
            return passPrime<way, false>(lines, blocks, stage.radix, pass);
    }
}

}  // namespace

void line::runStage(const FourierTable& table, const FourierTable::Stage& stage, float* lines, ptrdiff_t blocks) {
    passBy<Way::forth>(table, stage, lines, blocks);
}

void line::runStageBack(const FourierTable& table, const FourierTable::Stage& stage, float* lines, ptrdiff_t blocks) {
    passBy<Way::back>(table, stage, lines, blocks);
}

}  // namespace qori::kernels
