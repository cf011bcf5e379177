// SPDX-License-Identifier: Apache-2.0
// Transforms of blocks whose length has no small factors, as cyclic convolutions.
//
// A prime p: with a generator g of the numbers modulo p, frequency g^-m is the first point and the sum over k of
// x(g^k) e^(-2 pi i g^(k - m) / p), a convolution of p - 1 points (Rader: Discrete Fourier transforms when the number
// of data samples is prime, 1968).
//
// Any n: with jk = (j^2 + k^2 - (k - j)^2) / 2, the sum over j of x(j) e^(-2 pi i jk / n) is a chirp times the
// convolution of x times the chirp with the chirp's conjugate (Bluestein: A linear filtering approach to the
// computation of the discrete Fourier transform, 1970). That is linear, and cyclic of any length from 2 n - 1 on; of a
// shorter one but for the largest lags, which only the ends of a block have. Their sums are a triangle of products,
// which costs less than points up to the next length that does without.
//
// Convolutions are transformed, multiplied by the spectrum of what does not change, transformed back through the same
// stages from the last to the first, so that nothing is ever put in order. Between the exchanged parts of the way back
// the stages are forward ones, with their twiddles before the butterfly.
#include "passes.h"

namespace qori::kernels {
namespace {

QORI_INLINE ComplexLine exchanged(ComplexLine a) { return {a.im, a.re}; }

/// The last stage, the product with the spectrum, which is in the order of the lines, and the first stage back. With
/// `first` the lines begin with frequency 0, the sum of the points: it is added to the first point, which was not among
/// them, and that to all sums.
template <int radix>
QORI_NOINLINE void turnBack(float* lines, ptrdiff_t blocks, const float* spectrum, float* first) {
    for (ptrdiff_t block = 0; block < blocks; ++block, lines += radix * kLineFloats, spectrum += 2 * radix) {
        ComplexLine a[radix];
        for (int q = 0; q < radix; ++q) a[q] = line::loadLine(lines + q * kLineFloats);
        line::butterfly(a);
        const ComplexLine sum = a[0];
        for (int q = 0; q < radix; ++q) a[q] = line::times(a[q], spectrum + 2 * q);
        if (first != nullptr) {
            const ComplexLine x = line::loadLine(first);
            line::storeLine(first, line::operator+(x, sum));
            a[0] = line::operator+(a[0], x);
            first = nullptr;
        }
        for (int q = 0; q < radix; ++q) a[q] = exchanged(a[q]);
        line::butterfly(a);
        for (int q = 0; q < radix; ++q) line::storeLine(lines + q * kLineFloats, a[q]);
    }
}

/// A block and what it is convolved with.
struct Convolution {
    const FourierTable& inner;
    const float* spectrum;
    float* block;
};

/// Points times a chirp, 0 behind them; frequencies in order. Without a chirp they are part of another convolution,
/// which goes on between exchanged parts.
template <bool hasChirp>
struct PaddedOrder {
    const float* chirp;
    ptrdiff_t points;

    /// How many of the parts of an outer stage are read and written.
    static constexpr int filled(int radix) { return line::filledParts(radix); }
    QORI_INLINE ComplexLine load(const float* block, ptrdiff_t i) const {
        if (i >= points) return {zero<float>(), zero<float>()};
        const ComplexLine a = line::loadLine(block + i * kLineFloats);
        return hasChirp ? line::times(a, chirp + 2 * i) : a;
    }
    QORI_INLINE void store(float* block, ptrdiff_t i, ComplexLine a) const {
        if (i >= points) return;
        line::storeLine(block + i * kLineFloats, hasChirp ? line::times(a, chirp + 2 * i) : exchanged(a));
    }
    QORI_INLINE void add(float* block, ptrdiff_t i, ComplexLine a) const {
        float* const at = block + i * kLineFloats;
        const ComplexLine b = hasChirp ? line::times(a, chirp + 2 * i) : exchanged(a);
        line::storeLine(at, line::operator+(line::loadLine(at), b));
    }
};

/// All points but the first in the order of a generator's powers, frequencies in that of their inverses.
struct RotatedOrder {
    const int32_t *powers, *inverses;

    static constexpr int filled(int radix) { return radix; }
    QORI_INLINE ComplexLine load(const float* block, ptrdiff_t i) const {
        return line::loadLine(block + ptrdiff_t{powers[i]} * kLineFloats);
    }
    QORI_INLINE void store(float* block, ptrdiff_t i, ComplexLine a) const {
        line::storeLine(block + ptrdiff_t{inverses[i]} * kLineFloats, a);
    }
};

/// The convolution's stage that is the first forth and the last back.
template <int radix>
struct OuterStage {
    ptrdiff_t part;
    const float *turns, *twiddles;
    line::Rotation<radix> rotation;  ///< In points.

    explicit OuterStage(const FourierTable& inner)
        : part(inner.stages[0].part()),
          turns(inner.at<float>(inner.stages[0].turns)),
          twiddles(inner.at<float>(inner.stages[0].twiddles)),
          rotation(inner.stages[0].rotation, part) {}
};

/// Reads the block's points through the first stage.
template <int radix, bool isRotated, class Order>
QORI_NOINLINE void enter(const Convolution& c, Order order, float* lines) {
    auto [part, turns, twiddles, rotation] = OuterStage<radix>(c.inner);
    const float* w = twiddles;
    for (ptrdiff_t j = 0; j < part; ++j, w += 2 * (radix - 1)) {
        ComplexLine a[radix];
        if constexpr (isRotated) {
            ptrdiff_t around[radix];
            rotation.offsets(around);
            rotation.advance();
            for (int q = 0; q < radix; ++q) a[q] = order.load(c.block, j + around[q]);
        } else {
            for (int q = 0; q < radix; ++q)
                a[q] = q < Order::filled(radix) ? order.load(c.block, j + q * part)
                                                : ComplexLine{zero<float>(), zero<float>()};
        }
        line::butterflyOf<radix>(a, turns);
        line::storeLine(lines + j * kLineFloats, a[0]);
        for (int p = 1; p < radix; ++p)
            line::storeLine(lines + (j + p * part) * kLineFloats, isRotated ? a[p] : line::times(a[p], w + 2 * p - 2));
    }
}

/// The last stage back, of as many points as the block has.
template <int radix, bool isRotated, class Order>
QORI_NOINLINE void leave(const Convolution& c, Order order, const float* lines) {
    auto [part, turns, twiddles, rotation] = OuterStage<radix>(c.inner);
    const float* w = twiddles;
    for (ptrdiff_t j = 0; j < part; ++j, w += 2 * (radix - 1)) {
        ComplexLine a[radix];
        a[0] = line::loadLine(lines + j * kLineFloats);
        for (int p = 1; p < radix; ++p) {
            const ComplexLine x = line::loadLine(lines + (j + p * part) * kLineFloats);
            a[p] = isRotated ? x : line::times(x, w + 2 * p - 2);
        }
        line::butterflyOf<radix>(a, turns);
        if constexpr (isRotated) {
            ptrdiff_t around[radix];
            rotation.offsets(around);
            rotation.advance();
            for (int q = 0; q < radix; ++q) order.store(c.block, j + around[q], exchanged(a[q]));
        } else {
            for (int q = 0; q < Order::filled(radix); ++q) order.store(c.block, j + q * part, exchanged(a[q]));
        }
    }
}

/// The last stage forth and the first one back, by its radix.
void turnBackBy(int32_t radix, float* lines, ptrdiff_t points, const float* spectrum, float* first) {
    switch (radix) {
        case 2: return turnBack<2>(lines, points / 2, spectrum, first);
        case 4: return turnBack<4>(lines, points / 4, spectrum, first);
        default: return turnBack<8>(lines, points / 8, spectrum, first);
    }
}

void convolvePart(const Convolution& c, float* work, ptrdiff_t at, float* first);

/// Forth and back from a stage on, of points from `at` on. Large blocks are divided first.
void convolveBlock(const Convolution& c, int32_t stage, float* work, ptrdiff_t at, ptrdiff_t points, float* first) {
    const FourierTable& inner = c.inner;
    const ptrdiff_t part = inner.convolvedPoints;
    const int32_t end = part > 1 ? inner.stageCount : inner.stageCount - 1;
    float* const lines = work + at * kLineFloats;
    if (stage < end && points > line::kPointsAtOnce) {
        const FourierTable::Stage& divided = inner.stages[stage];
        line::runStage(inner, divided, lines, 1);
        const ptrdiff_t apart = points / divided.radix;
        for (ptrdiff_t i = 0; i < divided.radix; ++i)
            convolveBlock(c, stage + 1, work, at + i * apart, apart, i == 0 ? first : nullptr);
        return line::runStageBack(inner, divided, lines, 1);
    }
    for (int32_t i = stage; i < end; ++i)
        line::runStage(inner, inner.stages[i], lines, points / inner.stages[i].length);
    if (part == 1)
        turnBackBy(inner.stages[end].radix, lines, points, c.spectrum + 2 * at, first);
    else
        for (ptrdiff_t i = 0; i < points; i += part) convolvePart(c, work, at + i, i == 0 ? first : nullptr);
    for (int32_t i = end - 1; i >= stage; --i)
        line::runStageBack(inner, inner.stages[i], lines, points / inner.stages[i].length);
}

/// first: the block's first point, where it is not among the convolution's.
template <int radix, bool isRotated, class Order>
void convolveFrom(const Convolution& c, Order order, float* work, float* first) {
    enter<radix, isRotated>(c, order, work);
    const ptrdiff_t part = c.inner.points / radix;
    for (ptrdiff_t i = 0; i < radix; ++i) convolveBlock(c, 1, work, i * part, part, i == 0 ? first : nullptr);
    leave<radix, isRotated>(c, order, work);
}

template <int radix>
void convolveFrom(const Convolution& c, const RotatedOrder& order, float* work, float* first) {
    if (c.inner.stages[0].rotation != 0)
        convolveFrom<radix, true>(c, order, work, first);
    else
        convolveFrom<radix, false>(c, order, work, first);
}

/// Where the first radix has no kernel of its own, points are put in order before and behind all stages.
void convolveInOrder(const Convolution& c, const RotatedOrder& order, float* work, float* first) {
    for (ptrdiff_t i = 0; i < c.inner.points; ++i) line::storeLine(work + i * kLineFloats, order.load(c.block, i));
    convolveBlock(c, 0, work, 0, c.inner.points, first);
    for (ptrdiff_t i = 0; i < c.inner.points; ++i)
        order.store(c.block, i, exchanged(line::loadLine(work + i * kLineFloats)));
}

void convolve(const Convolution& c, const RotatedOrder& order, float* work, float* first) {
    switch (c.inner.stages[0].radix) {
        case 2: return convolveFrom<2, true>(c, order, work, first);  // the only even factor
        case 3: return convolveFrom<3>(c, order, work, first);
        case 4: return convolveFrom<4>(c, order, work, first);
        case 5: return convolveFrom<5>(c, order, work, first);
        case 7: return convolveFrom<7>(c, order, work, first);
        case 8: return convolveFrom<8>(c, order, work, first);
        default: return convolveInOrder(c, order, work, first);
    }
}

/// What a convolution lacks: points of either end of a block go to those of the other one.
template <class Order>
class MissingLags {
public:
    /// The ends are kept behind the convolution's points, as the block is written over.
    MissingLags(const Convolution& c, const Order& order, float* work)
        : order_(order),
          block_(c.block),
          count_(static_cast<ptrdiff_t>(line::missingLags(order.points, c.inner.points))),
          factors_(c.spectrum + 2 * ptrdiff_t{c.inner.points}),
          ends_(work + c.inner.points * ptrdiff_t{kLineFloats}) {
        for (ptrdiff_t i = 0; i < count_; ++i) {
            line::storeLine(ends_ + i * kLineFloats, order.load(c.block, order.points - 1 - i));
            line::storeLine(ends_ + (count_ + i) * kLineFloats, order.load(c.block, i));
        }
    }

    void add() const {
        const ptrdiff_t last = order_.points - 1;
        addTo([=](ptrdiff_t i) { return i; }, factors_, ends_);
        addTo([=](ptrdiff_t i) { return last - i; }, factors_ + 2 * count_, ends_ + count_ * kLineFloats);
    }

private:
    /// A sum of products with factors, those with their parts apart.
    struct Sum {
        ComplexLine ofReal{zero<float>(), zero<float>()}, ofImaginary = ofReal;

        QORI_INLINE void add(ComplexLine x, const float* factor) {
            ofReal = line::mulAdd(x, splat(factor[0]), ofReal);
            ofImaginary = line::mulAdd(x, splat(factor[1]), ofImaginary);
        }
        QORI_INLINE ComplexLine total() const { return line::plusI(ofReal, ofImaginary); }
    };

    /// To point m the sum over i from m of factor i times end i - m, two points at a time, without the last factor.
    template <class Index>
    QORI_NOINLINE void addTo(Index index, const float* factors, const float* ends) const {
        for (ptrdiff_t m = 0; m < count_; m += 2, factors += 4) {
            Sum first, second;
            for (ptrdiff_t i = 0; i < count_ - m - 1; ++i) {
                const ComplexLine x = line::loadLine(ends + i * kLineFloats);
                first.add(x, factors + 2 * i);
                second.add(x, factors + 2 * i + 2);
            }
            order_.add(block_, index(m), first.total());
            order_.add(block_, index(m + 1), second.total());
        }
    }

    const Order& order_;
    float* block_;
    ptrdiff_t count_;
    const float* factors_;
    float* ends_;
};

template <bool hasChirp>
void convolve(const Convolution& c, const PaddedOrder<hasChirp>& order, float* work, float* first) {
    const MissingLags missing(c, order, work);
    if (c.inner.stages[0].radix == 8)
        convolveFrom<8, false>(c, order, work, first);
    else
        convolveFrom<4, false>(c, order, work, first);
    missing.add();
}

/// The work of a part is behind that of the whole.
void convolvePart(const Convolution& c, float* work, ptrdiff_t at, float* first) {
    const FourierTable& padded = *c.inner.at<FourierTable>(c.inner.inner);
    const ptrdiff_t points = c.inner.convolvedPoints;
    const ptrdiff_t apart = static_cast<ptrdiff_t>(padded.points + 2 * line::missingLags(points, padded.points));
    const float* const spectrum = c.inner.at<float>(c.inner.spectrumAt) + 2 * (at / points * apart);
    convolve(Convolution{padded, spectrum, work + at * kLineFloats}, PaddedOrder<false>{nullptr, points},
             work + c.inner.points * ptrdiff_t{kLineFloats}, first);
}

}  // namespace

void line::transformByConvolution(const FourierTable& table, float* block, float* work) {
    const Convolution c{*table.at<FourierTable>(table.inner), table.at<float>(table.spectrumAt), block};
    if (table.isRotated) {
        const auto* const powers = table.at<int32_t>(table.factorsAt);
        return convolve(c, RotatedOrder{powers, powers + c.inner.points}, work, block);
    }
    convolve(c, PaddedOrder<true>{table.at<float>(table.factorsAt), table.convolvedPoints}, work, nullptr);
}

}  // namespace qori::kernels
