// SPDX-License-Identifier: Apache-2.0
// Quotients of two images.
#include "images.h"
#include "kernels/arith/divide.h"

namespace qori::arith {
namespace {

template <Layout layout, class T, class Divide>
QorResult runDivision(Divide divide, Image<const T> src1, Image<const T> src2, Image<T> dst, QorImageSize roi) {
    kernels::Division<T, Divide> operation{divide, {}};
    runBinary<keepsAlpha<layout>>(channels(layout), operation, src1, src2, dst, roi);
    return operation.zeros.template any<keepsAlpha<layout>, T>() ? QOR_WARN_DIV_BY_ZERO : QOR_OK;
}

template <class T, Layout layout>
QorResult divide(Image<const T> src1, Image<const T> src2, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    if (QorResult r = firstOf(nullCheck(src1, src2, dst), sizeCheck(roi), stepCheck(src1, src2, dst))) return r;
    return underDefaultControl([&] {
        QorResult result = QOR_OK;
        const auto run = [&](auto division) { result = runDivision<layout>(division, src1, src2, dst, roi); };
        kernels::withDivision<T>(scale, run);
        return result;
    });
}

template <class T, Layout layout>
QorResult divideRounded(Image<const T> src1, Image<const T> src2, Image<T> dst, QorImageSize roi, int32_t mode,
                        int32_t scale) {
    if (QorResult r = firstOf(nullCheck(src1, src2, dst), sizeCheck(roi), stepCheck(src1, src2, dst))) return r;
    return underDefaultControl([&] {
        QorResult result = QOR_ERR_ROUND_MODE;
        const auto run = [&](auto division) { result = runDivision<layout>(division, src1, src2, dst, roi); };
        switch (mode) {
            case roundTowardZero: kernels::withRoundedDivision<T, roundTowardZero>(scale, run); break;
            case roundNearestEven: kernels::withRoundedDivision<T, roundNearestEven>(scale, run); break;
            case roundHalfAway: kernels::withRoundedDivision<T, roundHalfAway>(scale, run); break;
        }
        return result;
    });
}

}  // namespace
}  // namespace qori::arith

#include "entries/arith_division.inc"
