// SPDX-License-Identifier: Apache-2.0
// Transforms of images whose sides are powers of two, by their orders.
#include "fourier_forms.h"

namespace qori::transform {
namespace {

constexpr Family kFamily = Family::fft;

QorImageSize sizeOfOrders(int32_t orderX, int32_t orderY) { return {1 << orderX, 1 << orderY}; }

QorResult orderCheck(int32_t orderX, int32_t orderY) {
    return orderX < 0 || orderX > 30 || orderY < 0 || orderY > 30 ? QOR_ERR_ORDER : QOR_OK;
}

/// A complex transform has at most 2^28 points, a real one 2^29; columns are complex in both kinds of plan.
template <Elements elements>
QorResult largestOrderCheck(int32_t orderX, int32_t orderY) {
    constexpr int32_t most = elements == Elements::complex ? 28 : 29;
    return orderX > most || orderY > 28 ? QOR_ERR_ORDER : QOR_OK;
}

template <Elements elements>
QorResult getSize(int32_t orderX, int32_t orderY, int32_t flag, int32_t, int32_t* planSize, int32_t* initSize,
                  int32_t* bufferSize) {
    const QorResult checked = firstOf(orderCheck(orderX, orderY), nullCheck(planSize, initSize, bufferSize),
                                      flagCheck(flag), largestOrderCheck<elements>(orderX, orderY));
    if (checked != QOR_OK) return checked;
    return reportFourierSizes<elements>(sizeOfOrders(orderX, orderY), planSize, initSize, bufferSize);
}

template <Elements elements>
QorResult init(int32_t orderX, int32_t orderY, int32_t flag, int32_t hint, QorFft2DPlan* plan, uint8_t* initBuffer) {
    const QorResult checked = firstOf(orderCheck(orderX, orderY), nullCheck(plan), flagCheck(flag),
                                      largestOrderCheck<elements>(orderX, orderY));
    if (checked != QOR_OK) return checked;
    if (initBuffer == nullptr && (orderX > 10 || orderY > 10)) return QOR_ERR_NULL_PTR;
    return initFourierPlan<kFamily, elements>(sizeOfOrders(orderX, orderY), flag, hint, plan, initBuffer);
}

template <Elements elements>
QorResult initAlloc(QorFft2DPlan** plan, int32_t orderX, int32_t orderY, int32_t flag, int32_t hint) {
    const QorResult checked = firstOf(nullCheck(plan), orderCheck(orderX, orderY), flagCheck(flag),
                                      largestOrderCheck<elements>(orderX, orderY));
    if (checked != QOR_OK) return checked;
    return allocateFourierPlan<kFamily, elements>(plan, sizeOfOrders(orderX, orderY), flag, hint);
}

}  // namespace
}  // namespace qori::transform

#include "entries/fft.inc"
