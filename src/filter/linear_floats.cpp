// SPDX-License-Identifier: Apache-2.0
// Linear filters whose sums are floats.
#include "linear_sums.h"

namespace qori::filter {

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

template void filterSingle(const float*, QorImageSize, int32_t, Target<uint8_t, uint8_t>&);
template void filterSingle(const float*, QorImageSize, int32_t, Target<uint16_t, uint16_t>&);
template void filterSingle(const float*, QorImageSize, int32_t, Target<int16_t, int16_t>&);
template void filterSingle(const float*, QorImageSize, int32_t, Target<int8_t, int8_t>&);
template void filterSingle(const float*, QorImageSize, int32_t, Target<int8_t, int16_t>&);
template void filterSingle(const float*, QorImageSize, int32_t, Target<uint8_t, int16_t>&);
template void filterSingle(const float*, QorImageSize, int32_t, Target<float, float>&);
template void filterDouble(const double*, QorImageSize, Division, Target<uint8_t, uint8_t>&);
template void filterDouble(const double*, QorImageSize, Division, Target<uint16_t, uint16_t>&);
template void filterDouble(const double*, QorImageSize, Division, Target<int16_t, int16_t>&);
template void filterDouble(const double*, QorImageSize, Division, Target<int32_t, int32_t>&);
template void filterDouble(const double*, QorImageSize, Division, Target<double, double>&);

}  // namespace qori::filter
