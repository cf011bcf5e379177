// SPDX-License-Identifier: Apache-2.0
// Rectangular minimum and maximum filters; neighbours are read from memory.
#include "extreme.h"
#include "frame/checks.h"

namespace qori::filter {
namespace {

template <bool largest, Layout layout, class T>
QorResult rectangleExtreme(Image<const T> src, Image<T> dst, QorImageSize roi, QorImageSize mask, QorPoint2D anchor) {
    const QorResult checked = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst), maskSizeCheck(mask),
                                      anchorCheck(anchor, mask));
    if (checked != QOR_OK) return checked;
    return extremeOf<T, largest>(src, dst, roi, layout, {nullptr, mask, anchor}, WorkFrom::stackIfItFits);
}

template <class T, Layout layout>
QorResult filterMin(Image<const T> src, Image<T> dst, QorImageSize roi, QorImageSize mask, QorPoint2D anchor) {
    return rectangleExtreme<false, layout>(src, dst, roi, mask, anchor);
}

template <class T, Layout layout>
QorResult filterMax(Image<const T> src, Image<T> dst, QorImageSize roi, QorImageSize mask, QorPoint2D anchor) {
    return rectangleExtreme<true, layout>(src, dst, roi, mask, anchor);
}

}  // namespace
}  // namespace qori::filter

#include "entries/filter_extreme.inc"
