// SPDX-License-Identifier: Apache-2.0
// Packed kernels and rounding rules meet images: the run of every general linear filter.
#pragma once
#include "frame/border.h"
#include "frame/checks.h"
#include "frame/float_control.h"
#include "kernels/filter/rules.h"
#include "kernels/filter/sums.h"
#include "kernels/vector_math.h"
#include "packing.h"

namespace qori::filter {

using kernels::ByteTaps;
using kernels::DoubleTaps;
using kernels::FloatTaps;
using kernels::NeighbourByteTaps;
using kernels::NeighbourTaps;
using kernels::PackedKernel;
using kernels::PairTaps;

/// Where results go, and how a region is cut so that its windows exist.
template <class S, class D>
struct Target {
    BorderParts parts;
    Image<D> dst;
    int channels;
    bool keepAlpha;
};

/// Elements of a block in pixels that begin and end with it.
constexpr PartHints partHints(int channels, int elementBytes) {
    constexpr int kOverread = 8;
    const int block = elementBytes == 1 ? ByteTaps::block : FloatTaps<float>::block;
    return {channels == 4 ? block / 4 : block, kOverread * elementBytes};
}

template <class S, class D>
Target<S, D> makeTarget(Image<const S> src, Image<D> dst, QorImageSize roi, Layout layout, Reach reach,
                        const BorderRule& rule, uint8_t* buffer) {
    const int n = channels(layout);
    const BorderedImage image{asBytes(src.data), src.step, roi, n * elementBytes<S>, rule};
    return {BorderParts(image, reach, partHints(n, elementBytes<S>), buffer), dst, n, layout == Layout::AC4};
}

template <class Taps, class Rule, class S, class D>
void filterBy(const PackedKernel<Taps>& kernel, const Rule& rule, Target<S, D>& target) {
    using Sum = typename Taps::Total;
    const kernels::Finish<Sum> finish{
        target.keepAlpha ? kernels::finishRow<Rule, true, Sum> : kernels::finishRow<Rule, false, Sum>, &rule,
        Rule::isCopy && !target.keepAlpha};
    const int n = target.channels;
    target.parts.forEach([&](const BorderPart& part) {
        const auto [x, y, width, height] = part.area;
        kernels::filterRows(kernel, reinterpret_cast<const S*>(part.window), part.step, n, ptrdiff_t{width} * n, height,
                            part.slackBytes / elementBytes<S>, finish, asBytes(target.dst.row(y) + ptrdiff_t{x} * n),
                            target.dst.step, elementBytes<D>);
    });
}

/// How integer sums become elements.
struct Division {
    int32_t divisor, mode;
    int64_t sumLimit;  ///< No sum's magnitude is larger. From 2^31 on sums are taken modulo 2^32.
};

/// Calls use with the cheapest rule that is exact for all sums of 32 bits.
template <class D, class Use>
void withDivision(Division division, Use use) {
    using Single = kernels::QuotientInSingle<D>;
    const auto [divisor, mode, sumLimit] = division;
    const Single single(divisor, mode);
    if (divisor == 1) return use(kernels::Saturated<D>{});
    if (sumLimit < Single::kSumLimit && single.isExact()) return use(single);
    if (divisor > 1 && single.isPowerOfTwo())
        return use(kernels::Shifted<D>{std::countr_zero(single.magnitude()), mode});
    use(kernels::QuotientInDouble<D>{divisor, mode});
}

template <class Taps, class S, class D>
void divideSums(const PackedKernel<Taps>& kernel, Division division, Target<S, D>& target) {
    withDivision<D>(division, [&](const auto& rule) { filterBy(kernel, rule, target); });
}

template <class S, class D>
void filterPairs(const int32_t* packed, QorImageSize size, int32_t start, Division division, Target<S, D>& target) {
    if constexpr (sizeof(S) == 2)
        if (target.channels == 1)
            return divideSums(PackedKernel<NeighbourTaps<S>>{packed, size, splat(start)}, division, target);
    divideSums(PackedKernel<PairTaps<S>>{packed, size, splat(start)}, division, target);
}

template <class Taps>
void divideWords(const int32_t* packed, QorImageSize size, Division division, Target<uint8_t, uint8_t>& target) {
    const PackedKernel<Taps> kernel{packed, size, zero<int16_t>()};
    const kernels::QuotientInWords words{division.divisor, division.mode};
    if (words.isExact()) return filterBy(kernel, words, target);
    withDivision<uint8_t>(division, [&]<class Rule>(const Rule& rule) {
        filterBy(kernel, kernels::Widened<Rule, typename Taps::Total>{rule}, target);
    });
}

template <class Taps>
void divideGroups(const int32_t* packed, QorImageSize size, ByteGroups groups, Division division,
                  Target<uint8_t, uint8_t>& target) {
    using Grouped = kernels::InGroups<Taps>;
    const PackedKernel<Grouped> kernel{packed, size, splat(static_cast<int16_t>(groups.start)), groups.count};
    withDivision<uint8_t>(division, [&]<class Rule>(const Rule& rule) {
        filterBy(kernel, kernels::Widened<Rule, kernels::WideSum>{rule}, target);
    });
}

/// In groups where there are any, else at once.
inline void filterBytes(const int32_t* packed, QorImageSize size, ByteGroups groups, Division division,
                        Target<uint8_t, uint8_t>& target) {
    const auto by = [&]<class Taps>(const Taps*) {
        if (groups.count > 0)
            divideGroups<Taps>(packed, size, groups, division, target);
        else
            divideWords<Taps>(packed, size, division, target);
    };
    if (target.channels == 1)
        by(static_cast<const NeighbourByteTaps*>(nullptr));
    else
        by(static_cast<const ByteTaps*>(nullptr));
}

/// -0 begins a sum that may be a single product: +0 would turn a product of -0.
template <class S, class D>
void filterSingle(const float* packed, QorImageSize size, int32_t mode, Target<S, D>& target) {
    const PackedKernel<FloatTaps<S>> kernel{packed, size, splat(-0.0f)};
    if constexpr (std::is_same_v<D, float>)
        filterBy(kernel, kernels::Kept<float>{}, target);
    else
        filterBy(kernel, kernels::Rounded<D>{mode}, target);
}

template <class S, class D>
void filterDouble(const double* packed, QorImageSize size, Division division, Target<S, D>& target) {
    const PackedKernel<DoubleTaps<S>> kernel{packed, size, splat(-0.0)};
    if constexpr (std::is_same_v<D, double>)
        filterBy(kernel, kernels::Kept<double>{}, target);
    else
        filterBy(kernel, kernels::Divided<D>{division.divisor, division.mode}, target);
}

}  // namespace qori::filter
