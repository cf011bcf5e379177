// SPDX-License-Identifier: Apache-2.0
// Transforms of images of any size.
#include "fourier_forms.h"

namespace qori::transform {
namespace {

constexpr Family kFamily = Family::dft;

template <Elements elements>
QorResult getSize(QorImageSize size, int32_t flag, int32_t, int32_t* planSize, int32_t* initSize, int32_t* bufferSize) {
    const QorResult checked = firstOf(sizeCheck(size), nullCheck(planSize, initSize, bufferSize), flagCheck(flag));
    return checked != QOR_OK ? checked : reportFourierSizes<elements>(size, planSize, initSize, bufferSize);
}

template <Elements elements>
QorResult init(QorImageSize size, int32_t flag, int32_t hint, QorFft2DPlan* plan, uint8_t* initBuffer) {
    const QorResult checked = firstOf(sizeCheck(size), nullCheck(plan), flagCheck(flag));
    return checked != QOR_OK ? checked : initFourierPlan<kFamily, elements>(size, flag, hint, plan, initBuffer);
}

template <Elements elements>
QorResult initAlloc(QorFft2DPlan** plan, QorImageSize size, int32_t flag, int32_t hint) {
    const QorResult checked = firstOf(nullCheck(plan), sizeCheck(size), flagCheck(flag));
    return checked != QOR_OK ? checked : allocateFourierPlan<kFamily, elements>(plan, size, flag, hint);
}

}  // namespace
}  // namespace qori::transform

#include "entries/dft.inc"
