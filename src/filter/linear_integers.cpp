// SPDX-License-Identifier: Apache-2.0
// Linear filters whose sums are integers.
#include "linear_sums.h"

namespace qori::filter {

using kernels::NeighbourByteTaps;
using kernels::NeighbourTaps;

namespace {

template <class Taps, class S, class D>
void divideSums(const PackedKernel<Taps>& kernel, Division division, Target<S, D>& target) {
    withDivision<D>(division, [&](const auto& rule) { filterBy(kernel, rule, target); });
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

}  // namespace

template <class T>
void filterPairs(const int32_t* packed, QorImageSize size, int32_t start, Division division, Target<T, T>& target) {
    if constexpr (sizeof(T) == 2)
        if (target.channels == 1)
            return divideSums(PackedKernel<NeighbourTaps<T>>{packed, size, splat(start)}, division, target);
    divideSums(PackedKernel<PairTaps<T>>{packed, size, splat(start)}, division, target);
}

template void filterPairs(const int32_t*, QorImageSize, int32_t, Division, Target<uint8_t, uint8_t>&);
template void filterPairs(const int32_t*, QorImageSize, int32_t, Division, Target<uint16_t, uint16_t>&);
template void filterPairs(const int32_t*, QorImageSize, int32_t, Division, Target<int16_t, int16_t>&);

void filterBytes(const int32_t* packed, QorImageSize size, ByteGroups groups, Division division,
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

}  // namespace qori::filter
