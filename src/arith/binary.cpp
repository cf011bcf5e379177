// SPDX-License-Identifier: Apache-2.0
// Sums, differences and products of two images.
#include "images.h"

namespace qori::arith {
namespace {

template <class Op, bool anyStep, Layout layout, class T>
QorResult checkAndCombine(Image<const T> src1, Image<const T> src2, Image<T> dst, QorImageSize roi, int32_t scale) {
    if (QorResult r = firstOf(nullCheck(src1, src2, dst), sizeCheck(roi))) return r;
    if (QorResult r = anyStep ? QOR_OK : stepCheck(src1, src2, dst)) return r;
    return combine<Op, keepsAlpha<layout>>(channels(layout), src1, src2, dst, roi, scale);
}

template <class T>
constexpr bool isByte = std::is_same_v<T, uint8_t>;

template <class T, Layout layout>
QorResult add(Image<const T> src1, Image<const T> src2, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    constexpr bool anyStep = isByte<T> || std::is_same_v<T, int16_t> || std::is_same_v<T, float>;
    return checkAndCombine<kernels::Sum<T>, anyStep, layout>(src1, src2, dst, roi, scale);
}

template <class T, Layout layout>
QorResult subtract(Image<const T> src1, Image<const T> src2, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    return checkAndCombine<kernels::Difference<T>, isByte<T>, layout>(src1, src2, dst, roi, scale);
}

template <class T, Layout layout>
QorResult multiply(Image<const T> src1, Image<const T> src2, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    return checkAndCombine<kernels::Product<T>, isByte<T>, layout>(src1, src2, dst, roi, scale);
}

template <class T, Layout layout>
QorResult multiplyFractions(Image<const T> src1, Image<const T> src2, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src1, src2, dst), stepCheck(src1, src2, dst), sizeCheck(roi))) return r;
    runBinary<keepsAlpha<layout>>(channels(layout), kernels::Binary<T, kernels::FractionProduct>{}, src1, src2, dst,
                                  roi);
    return QOR_OK;
}

}  // namespace
}  // namespace qori::arith

#include "entries/arith_binary.inc"
