// SPDX-License-Identifier: Apache-2.0
// Norms, sums, means and dot products: a quantity is accumulated per channel over the region, then finished in double
// precision.
#include "frame/checks.h"
#include "frame/float_control.h"
#include "kernels/stats/reduce_measures.h"
#include "kernels/stats/reduce_narrow.h"
#include "kernels/stats/reduce_sequential.h"

namespace qori::stats {
namespace {

enum class Quantity { largest, magnitudes, squares, values, products };

/// Channels in memory and channels asked for.
struct Channels {
    int stored, results;
};

template <Layout layout>
constexpr Channels channelsOf{channels(layout), processedChannels(layout)};

template <class T>
struct Type {
    using type = T;
};

/// The measure of a quantity; `single` where there is one channel.
template <Quantity quantity, class T, bool single>
constexpr auto chooseMeasure() {
    using namespace kernels;
    constexpr bool bytes = single && std::is_same_v<T, uint8_t>;
    if constexpr (quantity == Quantity::largest)
        return Type<Magnitudes<MaxLanes<Magnitude<T>>>>{};
    else if constexpr (bytes && quantity == Quantity::squares)
        return Type<ByteSquares>{};
    else if constexpr (bytes && quantity == Quantity::products)
        return Type<Products<PairProductLanes>>{};
    else if constexpr (bytes)
        return Type<ByteMagnitudes>{};
    else if constexpr (quantity == Quantity::magnitudes)
        return Type<Magnitudes<SumLanes<Magnitude<T>>>>{};
    else if constexpr (quantity == Quantity::squares)
        return Type<Squares<ProductLanes<Magnitude<T>>>>{};
    else if constexpr (quantity == Quantity::values)
        return Type<Values<SumLanes<T>>>{};
    else
        return Type<Products<ProductLanes<T>>>{};
}

template <Quantity quantity>
constexpr auto chooseAccurateMeasure() {
    using Lanes = kernels::DoubleLanes;
    if constexpr (quantity == Quantity::magnitudes)
        return Type<kernels::Magnitudes<Lanes>>{};
    else if constexpr (quantity == Quantity::squares)
        return Type<kernels::Squares<Lanes>>{};
    else if constexpr (quantity == Quantity::values)
        return Type<kernels::Values<Lanes>>{};
    else
        return Type<kernels::Products<Lanes>>{};
}

/// Calls use(measure) with the measure that the type and the hint ask for.
template <Quantity quantity, class T, bool single, class Use>
void withMeasure(int32_t hint, Use use) {
    if constexpr (std::is_same_v<T, float> && quantity != Quantity::largest) {
        if (hint == hintAccurate) return use(chooseAccurateMeasure<quantity>());
    }
    use(chooseMeasure<quantity, T, single>());
}

struct Totals {
    double of[4];
};

template <class Accumulators>
Totals finish(Accumulators& sums, Channels n) {
    sums.finish(n.stored);
    Totals totals{};
    for (int c = 0; c < n.results; ++c) totals.of[c] = kernels::toDouble(sums.total(c));
    return totals;
}

template <Quantity quantity, class T, bool single, class... Sources>
QORI_NOINLINE Totals accumulate(QorImageSize roi, Channels n, int32_t hint, Sources... sources) {
    Totals totals;
    withMeasure<quantity, T, single>(hint, [&]<class Measure>(Type<Measure>) {
        kernels::AccumulatorsOf<Measure> sums;
        kernels::forEachRowToReduce(
            roi, n.stored,
            [&](ptrdiff_t pixels, auto... rows) {
                kernels::reduceRow<Measure>(sums, n.stored, pixels * n.stored, rows...);
            },
            sources...);
        totals = finish(sums, n);
    });
    return totals;
}

template <Quantity quantity, class T, Layout layout, class... Sources>
Totals totalsOf(QorImageSize roi, int32_t hint, Sources... sources) {
    return accumulate<quantity, T, channels(layout) == 1>(roi, channelsOf<layout>, hint, sources...);
}

template <Quantity quantity>
double rooted(double total) {
    return quantity == Quantity::squares ? __builtin_sqrt(total) : total;
}

// --- sums and means -------------------------------------------------------------------------------------------------

template <class T, Layout layout>
QorResult sum(Image<const T> src, QorImageSize roi, double* pSum, int32_t hint = hintFast) {
    if (QorResult r = firstOf(nullCheck(src, pSum), sizeCheck(roi))) return r;
    return underDefaultControl([&] {
        const Totals totals = totalsOf<Quantity::values, T, layout>(roi, hint, src);
        for (int c = 0; c < processedChannels(layout); ++c) pSum[c] = totals.of[c];
        return QOR_OK;
    });
}

template <class T, Layout layout>
QorResult mean(Image<const T> src, QorImageSize roi, double* pMean, int32_t hint = hintFast) {
    if (isNull(pMean)) return QOR_ERR_NULL_PTR;
    double sums[4];
    if (QorResult r = sum<T, layout>(src, roi, sums, hint)) return r;
    return underDefaultControl([&] {
        const auto product = static_cast<int32_t>(static_cast<uint32_t>(roi.width) * static_cast<uint32_t>(roi.height));
        const double pixels = product;
        if constexpr (layout == Layout::C1) {
            *pMean = sums[0] / pixels;
        } else {
            const double reciprocal = 1.0 / pixels;
            for (int c = 0; c < processedChannels(layout); ++c) pMean[c] = sums[c] * reciprocal;
        }
        return QOR_OK;
    });
}

// --- norms ----------------------------------------------------------------------------------------------------------

template <Quantity quantity, class T, Layout layout, class... Sources>
QorResult norm(QorImageSize roi, double* pValue, int32_t hint, Sources... sources) {
    if (QorResult r = firstOf(nullCheck(sources..., pValue), sizeCheck(roi), stepCheck(sources...))) return r;
    return underDefaultControl([&] {
        const Totals totals = totalsOf<quantity, T, layout>(roi, hint, sources...);
        for (int c = 0; c < processedChannels(layout); ++c) pValue[c] = rooted<quantity>(totals.of[c]);
        return QOR_OK;
    });
}

struct Ratio {
    Totals numerators, denominators;
};

/// Both norms of a relative one, piece by piece, so that the second source is still in the cache when it is read again.
template <Quantity quantity, class T, bool single>
QORI_NOINLINE Ratio accumulateRatio(QorImageSize roi, Channels n, int32_t hint, Image<const T> src1,
                                    Image<const T> src2) {
    // A multiple of every round of vectors and of 3 and 4 channels.
    constexpr ptrdiff_t kPiece = 8'192 / static_cast<ptrdiff_t>(sizeof(T)) / 192 * 192;
    Ratio ratio;
    withMeasure<quantity, T, single>(hint, [&]<class Measure>(Type<Measure>) {
        kernels::AccumulatorsOf<Measure> differences, references;
        kernels::forEachRowToReduce(
            roi, n.stored,
            [&](ptrdiff_t pixels, const T* a, const T* b) {
                const ptrdiff_t elements = pixels * n.stored;
                for (ptrdiff_t i = 0; i < elements; i += kPiece) {
                    const ptrdiff_t piece = std::min(kPiece, elements - i);
                    kernels::reduceRow<Measure>(differences, n.stored, piece, a + i, b + i);
                    kernels::reduceRow<Measure>(references, n.stored, piece, b + i);
                }
            },
            src1, src2);
        ratio = {finish(differences, n), finish(references, n)};
    });
    return ratio;
}

template <Quantity quantity, class T, Layout layout>
QorResult relativeNorm(QorImageSize roi, double* pValue, int32_t hint, Image<const T> src1, Image<const T> src2) {
    if (QorResult r = firstOf(nullCheck(src1, src2, pValue), sizeCheck(roi), stepCheck(src1, src2))) return r;
    return underDefaultControl([&] {
        constexpr double kSmallestNormal = 2.2250738585072014e-308;
        const Ratio ratio =
            accumulateRatio<quantity, T, channels(layout) == 1>(roi, channelsOf<layout>, hint, src1, src2);
        QorResult result = QOR_OK;
        for (int c = 0; c < processedChannels(layout); ++c) {
            double value = ratio.numerators.of[c];
            if (ratio.denominators.of[c] < kSmallestNormal)
                result = QOR_WARN_DIV_BY_ZERO;
            else
                value /= ratio.denominators.of[c];
            pValue[c] = rooted<quantity>(value);
        }
        return result;
    });
}

// Named operations, as the registry calls them.
template <class T, Layout layout>
QorResult normInf(Image<const T> src, QorImageSize roi, double* pValue) {
    return norm<Quantity::largest, T, layout>(roi, pValue, hintFast, src);
}
template <class T, Layout layout>
QorResult normL1(Image<const T> src, QorImageSize roi, double* pValue, int32_t hint = hintFast) {
    return norm<Quantity::magnitudes, T, layout>(roi, pValue, hint, src);
}
template <class T, Layout layout>
QorResult normL2(Image<const T> src, QorImageSize roi, double* pValue, int32_t hint = hintFast) {
    return norm<Quantity::squares, T, layout>(roi, pValue, hint, src);
}
template <class T, Layout layout>
QorResult normDiffInf(Image<const T> src1, Image<const T> src2, QorImageSize roi, double* pValue) {
    return norm<Quantity::largest, T, layout>(roi, pValue, hintFast, src1, src2);
}
template <class T, Layout layout>
QorResult normDiffL1(Image<const T> src1, Image<const T> src2, QorImageSize roi, double* pValue,
                     int32_t hint = hintFast) {
    return norm<Quantity::magnitudes, T, layout>(roi, pValue, hint, src1, src2);
}
template <class T, Layout layout>
QorResult normDiffL2(Image<const T> src1, Image<const T> src2, QorImageSize roi, double* pValue,
                     int32_t hint = hintFast) {
    return norm<Quantity::squares, T, layout>(roi, pValue, hint, src1, src2);
}
template <class T, Layout layout>
QorResult normRelInf(Image<const T> src1, Image<const T> src2, QorImageSize roi, double* pValue) {
    return relativeNorm<Quantity::largest, T, layout>(roi, pValue, hintFast, src1, src2);
}
template <class T, Layout layout>
QorResult normRelL1(Image<const T> src1, Image<const T> src2, QorImageSize roi, double* pValue,
                    int32_t hint = hintFast) {
    return relativeNorm<Quantity::magnitudes, T, layout>(roi, pValue, hint, src1, src2);
}
template <class T, Layout layout>
QorResult normRelL2(Image<const T> src1, Image<const T> src2, QorImageSize roi, double* pValue,
                    int32_t hint = hintFast) {
    return relativeNorm<Quantity::squares, T, layout>(roi, pValue, hint, src1, src2);
}

// --- dot products ---------------------------------------------------------------------------------------------------

/// Doubles added from left to right. As long as no partial sum can pass 2^53 all of them are exact, and integers in any
/// order give the same.
template <class T, bool single>
class OrderedDotProduct {
public:
    Totals totals{};

    explicit OrderedDotProduct(int channels) : n_(channels) {}

    void addRow(ptrdiff_t pixels, const T* a, const T* b) {
        while (pixels > 0) {
            if (room_ < kPiece) settle();
            const auto now = static_cast<ptrdiff_t>(std::min<int64_t>(pixels, std::max(room_, kPiece)));
            if (room_ < kPiece) {
                kernels::sequentialDotRow(totals.of, n_, now, a, b);
            } else {
                kernels::reduceRow<Measure>(sums_, n_, now * n_, a, b);
                room_ -= now;
                pending_ = true;
            }
            a += now * n_;
            b += now * n_;
            pixels -= now;
        }
    }
    /// Moves what the integers hold into the totals, and looks how many pixels there is room for.
    void settle() {
        if (pending_) {
            const Totals moved = finish(sums_, {n_, n_});
            for (int c = 0; c < n_; ++c) totals.of[c] += moved.of[c];
            sums_ = {};
            pending_ = false;
        }
        double largest = 0;
        for (int c = 0; c < n_; ++c) largest = std::max(largest, __builtin_fabs(totals.of[c]));
        room_ = static_cast<int64_t>(std::max(0x1p53 - largest, 0.0) / kLargestProduct);
    }

private:
    using Measure = typename decltype(chooseMeasure<Quantity::products, T, single>())::type;
    static constexpr double kLargestValue = std::is_signed_v<T> ? 1 << (8 * sizeof(T) - 1) : (1 << 8 * sizeof(T)) - 1;
    static constexpr double kLargestProduct = kLargestValue * kLargestValue;
    static constexpr int64_t kPiece = 4'096;

    int n_;
    kernels::AccumulatorsOf<Measure> sums_;
    bool pending_ = false;
    int64_t room_ = static_cast<int64_t>(0x1p53 / kLargestProduct);  ///< Pixels that the integers may still take.
};

template <class T, bool single>
QORI_NOINLINE Totals orderedTotals(QorImageSize roi, int n, Image<const T> src1, Image<const T> src2) {
    if constexpr (sizeof(T) == 4) {
        Totals totals{};
        kernels::forEachRowToReduce(
            roi, n,
            [&](ptrdiff_t pixels, const T* a, const T* b) { kernels::sequentialDotRow(totals.of, n, pixels, a, b); },
            src1, src2);
        return totals;
    } else {
        OrderedDotProduct<T, single> sum(n);
        kernels::forEachRowToReduce(
            roi, n, [&](ptrdiff_t pixels, const T* a, const T* b) { sum.addRow(pixels, a, b); }, src1, src2);
        sum.settle();
        return sum.totals;
    }
}

template <class T, Layout layout>
Totals dotProductTotals(QorImageSize roi, int32_t hint, Image<const T> src1, Image<const T> src2) {
    if constexpr (std::is_same_v<T, float>)
        return totalsOf<Quantity::products, T, layout>(roi, hint, src1, src2);
    else
        return orderedTotals < T, layout == Layout::C1 && sizeof(T)<4>(roi, channels(layout), src1, src2);
}

template <class T, Layout layout>
QorResult dotProduct(Image<const T> src1, Image<const T> src2, QorImageSize roi, double* pDp, int32_t hint = hintFast) {
    constexpr bool refusesZeroSteps = std::is_same_v<T, uint8_t> && layout == Layout::C1;
    if (QorResult r = firstOf(nullCheck(src1, src2, pDp), sizeCheck(roi))) return r;
    if (refusesZeroSteps && (src1.step == 0 || src2.step == 0)) return QOR_ERR_SIZE;
    return underDefaultControl([&] {
        const Totals totals = dotProductTotals<T, layout>(roi, hint, src1, src2);
        for (int c = 0; c < processedChannels(layout); ++c) pDp[c] = totals.of[c];
        return QOR_OK;
    });
}

template <class T>
QorResult sumWeightedRows(const T* const* rows, const T* weights, int32_t count, T* dst, int32_t length) {
    if (QorResult r = nullCheck(rows, weights, dst)) return r;
    if (length < 1 || count < 1) return QOR_ERR_SIZE;
    for (int32_t i = 0; i < count; ++i)
        if (isNull(rows[i])) return QOR_ERR_NULL_PTR;
    return underDefaultControl([&] {
        kernels::weightedRows(dst, length, rows, weights, count);
        return QOR_OK;
    });
}

}  // namespace
}  // namespace qori::stats

#include "entries/norms.inc"
