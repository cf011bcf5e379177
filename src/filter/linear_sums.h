// SPDX-License-Identifier: Apache-2.0
// What the runs of linear filters are made of: the sums of one kernel by one rule over all parts of a region.
#pragma once
#include "kernels/filter/rules.h"
#include "kernels/filter/sums.h"
#include "kernels/vector_math.h"
#include "linear_run.h"

namespace qori::filter {

using kernels::PackedKernel;

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

}  // namespace qori::filter
