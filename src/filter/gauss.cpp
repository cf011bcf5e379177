// SPDX-License-Identifier: Apache-2.0
// Gauss filters of 3 x 3 and 5 x 5; neighbours are read from memory.
#include "kernels/gauss/gauss.h"
#include "frame/checks.h"
#include "frame/float_control.h"
#include "frame/plan.h"
#include "square_run.h"

namespace qori::filter {
namespace {

using namespace kernels;

/// Words in unsigned sums of 32 bits, floats in their own precision.
template <class T>
using SumOf =
    std::conditional_t<std::is_same_v<T, float>, float, std::conditional_t<sizeof(T) == 1, uint16_t, uint32_t>>;

template <class T>
auto meanOf(int64_t total) {
    if constexpr (std::is_same_v<T, float>)
        return Quotient<float>(total);
    else
        return WordMean<T>(total);
}

template <class T, Layout layout>
BorderedImage imageOf(Image<const T> src, QorImageSize roi) {
    return {asBytes(src.data), src.step, roi, pixelSize<T, layout>, BorderRule::readAll()};
}

template <class T, Layout layout>
QorResult gauss5x5(Image<const T> src, Image<T> dst, QorImageSize roi) {
    constexpr int n = channels(layout), kReach = 2;
    const int64_t seen = (int64_t{roi.width} + 2 * kReach) * n;
    BlockLayout pieces;
    int64_t at[3];
    for (int64_t& offset : at) offset = pieces.add(seen * elementBytes<SumOf<T>>);
    const WorkMemory memory(pieces.bytes() + kBlockAlignment);
    if (QorResult r = memory.check()) return r;
    GaussRows<SumOf<T>> sums;
    for (int c = 0; c < 3; ++c) sums.column[c] = tableOf<SumOf<T>>(memory.template begin<uint8_t>(), at[c]);
    forStrips(imageOf<T, layout>(src, roi), dst, [&](const BorderedImage& strip, Image<T> to) {
        const ptrdiff_t elements = ptrdiff_t{strip.size.width} * n;
        for (int32_t y = 0; y < strip.size.height; ++y) {
            const T* rows[5];
            for (int k = 0; k < 5; ++k) rows[k] = reinterpret_cast<const T*>(strip.pixel(-kReach, y + k - kReach));
            sumGaussRows(rows, sums, elements + 2 * kReach * n);
            if constexpr (sizeof(T) == 1)
                acrossGauss<n, layout == Layout::AC4>(sums, to.row(y), elements, GaussMeanOfBytes{});
            else
                acrossGauss<n, layout == Layout::AC4>(sums, to.row(y), elements, meanOf<T>(kGaussTotal));
        }
    });
    return QOR_OK;
}

template <class T, Layout layout>
QorResult gauss3x3(Image<const T> src, Image<T> dst, QorImageSize roi) {
    constexpr int n = channels(layout);
    if constexpr (sizeof(T) == 1) {
        // No memory is needed, but a call that can have none answers as its kin do.
        const WorkMemory memory(kBlockAlignment);
        if (QorResult r = memory.check()) return r;
        runSquare<Square::binomial, layout>(imageOf<T, layout>(src, roi), dst, false, nullptr);
    } else {
        const int64_t seen = (int64_t{roi.width} + 2) * n;
        const WorkMemory memory(seen * elementBytes<SumOf<T>> + kBlockAlignment);
        if (QorResult r = memory.check()) return r;
        auto* const sums = memory.template begin<SumOf<T>>();
        forStrips(imageOf<T, layout>(src, roi), dst, [&](const BorderedImage& strip, Image<T> to) {
            const ptrdiff_t elements = ptrdiff_t{strip.size.width} * n;
            for (int32_t y = 0; y < strip.size.height; ++y) {
                const auto row = [&](int32_t k) { return reinterpret_cast<const T*>(strip.pixel(-1, y + k)); };
                sumBinomialRows(row(-1), row(0), row(1), sums, elements + 2 * n);
                acrossBinomial<n, layout == Layout::AC4>(sums, to.row(y), elements, meanOf<T>(16));
            }
        });
    }
    return QOR_OK;
}

template <class T, Layout layout>
QorResult filterGauss(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t mask) {
    const QorResult checked = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst));
    if (checked != QOR_OK) return checked;
    if (mask != mask3x3 && mask != mask5x5) return QOR_ERR_MASK_SIZE;
    return underDefaultControl(
        [&] { return mask == mask3x3 ? gauss3x3<T, layout>(src, dst, roi) : gauss5x5<T, layout>(src, dst, roi); });
}

}  // namespace
}  // namespace qori::filter

#include "entries/gauss.inc"
