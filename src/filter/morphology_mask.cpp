// SPDX-License-Identifier: Apache-2.0
// Erosion and dilation by a mask of bytes with an anchor; neighbours are read from memory.
#include <algorithm>

#include "extreme.h"
#include "frame/checks.h"

namespace qori::filter {
namespace {

/// Masks of more elements take their table from the allocator, whatever else is needed.
constexpr int64_t kTableOnStack = 32;

QorResult emptyCheck(const Window& mask) {
    const int64_t bytes = int64_t{mask.size.width} * mask.size.height;
    const uint8_t* const end = mask.bytes + static_cast<ptrdiff_t>(bytes);
    return std::any_of(mask.bytes, end, [](uint8_t byte) { return byte != 0; }) ? QOR_OK : QOR_ERR_ZERO_MASK;
}

/// Steps that hold the rows with all that windows reach.
template <Layout layout, class T>
QorResult stepsFit(Image<const T> src, Image<T> dst, QorImageSize roi, QorImageSize mask) {
    constexpr int64_t kPixel = pixelSize<T, layout>;
    return firstOf(rowCheck(src.step, (int64_t{roi.width} + mask.width - 1) * kPixel, QOR_ERR_STEP_TOO_SMALL),
                   rowCheck(dst.step, roi.width * kPixel, QOR_ERR_STEP_TOO_SMALL));
}

template <bool largest, Layout layout, class T>
QorResult maskedExtreme(Image<const T> src, Image<T> dst, QorImageSize roi, const Window& mask) {
    const QorResult checked =
        firstOf(nullCheck(src, dst, mask.bytes), stepCheck(src, dst), sizeCheck(roi), maskSizeCheck(mask.size));
    if (checked != QOR_OK) return checked;
    const QorResult fits =
        firstOf(emptyCheck(mask), anchorCheck(mask.anchor, mask.size), stepsFit<layout>(src, dst, roi, mask.size));
    if (fits != QOR_OK) return fits;
    const bool isSmall = int64_t{mask.size.width} * mask.size.height <= kTableOnStack;
    return extremeOf<T, largest>(src, dst, roi, layout, mask, isSmall ? WorkFrom::stackIfItFits : WorkFrom::allocator);
}

template <class T, Layout layout>
QorResult erode(Image<const T> src, Image<T> dst, QorImageSize roi, const Window& mask) {
    return maskedExtreme<false, layout>(src, dst, roi, mask);
}

template <class T, Layout layout>
QorResult dilate(Image<const T> src, Image<T> dst, QorImageSize roi, const Window& mask) {
    return maskedExtreme<true, layout>(src, dst, roi, mask);
}

}  // namespace
}  // namespace qori::filter

#include "entries/morphology_mask.inc"
