// SPDX-License-Identifier: Apache-2.0
// Erosion and dilation by the 3 x 3 square, whose neighbours are read from memory.
#include "frame/checks.h"
#include "square_extreme.h"

namespace qori::filter {
namespace {

using kernels::Dilation;
using kernels::Erosion;

/// A row of so many pixels must lie within the step.
template <Layout layout, class T>
QorResult stepFits(int32_t step, int64_t pixels) {
    return rowCheck(step, pixels * pixelSize<T, layout>, QOR_ERR_STEP_TOO_SMALL);
}

template <class Order, Layout layout, class T>
QorResult extreme3x3InPlace(Image<T> image, QorImageSize roi) {
    const QorResult checked = firstOf(nullCheck(image), stepCheck(image), sizeCheck(roi),
                                      stepFits<layout, T>(image.step, int64_t{roi.width} + 2 * kSquareReach));
    return checked != QOR_OK ? checked : squareExtremeInPlace<Order>(image, roi, layout);
}

/// Equal images with equal steps are the in-place form's, and its checks are theirs.
template <class Order, Layout layout, class T>
QorResult extreme3x3(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (src.data == dst.data && src.step == dst.step) return extreme3x3InPlace<Order, layout>(dst, roi);
    const QorResult checked = firstOf(nullCheck(src, dst), stepCheck(src, dst), sizeCheck(roi),
                                      stepFits<layout, T>(src.step, int64_t{roi.width} + 2 * kSquareReach),
                                      stepFits<layout, T>(dst.step, roi.width));
    if (checked != QOR_OK) return checked;
    squareExtreme<Order>(src, dst, roi, layout);
    return QOR_OK;
}

template <class T, Layout layout>
QorResult erode3x3(Image<const T> src, Image<T> dst, QorImageSize roi) {
    return extreme3x3<Erosion<T>, layout>(src, dst, roi);
}

template <class T, Layout layout>
QorResult erode3x3InPlace(Image<T> image, QorImageSize roi) {
    return extreme3x3InPlace<Erosion<T>, layout>(image, roi);
}

template <class T, Layout layout>
QorResult dilate3x3(Image<const T> src, Image<T> dst, QorImageSize roi) {
    return extreme3x3<Dilation<T>, layout>(src, dst, roi);
}

template <class T, Layout layout>
QorResult dilate3x3InPlace(Image<T> image, QorImageSize roi) {
    return extreme3x3InPlace<Dilation<T>, layout>(image, roi);
}

}  // namespace
}  // namespace qori::filter

#include "entries/morphology.inc"
