// SPDX-License-Identifier: Apache-2.0
// Erosion and dilation by the 3 x 3 square, whose neighbours are read from memory.
#include "frame/checks.h"
#include "frame/float_control.h"
#include "frame/plan.h"
#include "frame/row_window.h"
#include "frame/streaming.h"
#include "kernels/filter/morphology.h"

namespace qori::filter {
namespace {

using kernels::Dilation;
using kernels::Erosion;
using kernels::Stores;

/// Rows made at a time, six being read for four. Measured beyond the caches, two reach 0.9 of this rate; eight gain a
/// fifth in the second-level cache and nothing beyond it.
constexpr int32_t kRows = 4;
constexpr int kReach = 1;

/// A row of so many pixels must lie within the step.
template <Layout layout, class T>
QorResult stepFits(int32_t step, int64_t pixels) {
    return rowCheck(step, pixels * pixelSize<T, layout>, QOR_ERR_STEP_TOO_SMALL);
}

template <Layout layout, class T>
BorderedImage around(Image<T> src, QorImageSize roi) {
    return {asBytes(src.data), src.step, roi, pixelSize<T, layout>, BorderRule::readAll()};
}

/// One group of rows. Two or three are made as four, the last of which give way: in place, none may be written before
/// all of the group are made.
template <class Order, Stores stores, Layout layout, class T>
void makeRows(const WindowPart& part, int32_t y, int32_t rows, Image<T> dst) {
    constexpr int n = channels(layout);
    constexpr bool keepAlpha = layout == Layout::AC4;
    const ptrdiff_t elements = ptrdiff_t{part.width} * n;
    const T* src[kRows + 2];
    T* to[kRows];
    for (int32_t k = 0; k < kRows + 2; ++k)
        src[k] = advance(part.row<T>(y - kReach + std::min(k, rows + 1)), n * kReach * elementBytes<T>);
    for (int32_t k = 0; k < kRows; ++k) to[k] = dst.row(y + std::min(k, rows - 1));
    if (rows == 1)
        kernels::squareRows<Order, n, Stores::delayed, keepAlpha, 1>(src, to, elements);
    else
        kernels::squareRows<Order, n, stores, keepAlpha, kRows>(src, to, elements);
}

constexpr WindowNeeds needs(Place place) {
    return {.reach = {kReach, kReach, kReach, kReach}, .rowsAtOnce = kRows, .place = place};
}

template <class Order, Stores stores, Layout layout, class T>
void run(const BorderedImage& src, Image<T> dst, uint8_t* memory) {
    RowWindow window(src, needs(stores == Stores::delayed ? Place::inOrder : Place::apart), memory);
    window.forEach(
        [&](const WindowPart& part, int32_t y, int32_t rows) { makeRows<Order, stores, layout>(part, y, rows, dst); });
}

template <class T>
bool isAligned(Image<T> image) {
    return (reinterpret_cast<uintptr_t>(image.data) | static_cast<uintptr_t>(image.step)) % 32 == 0;
}

template <class Order, Layout layout, class T>
QorResult extreme3x3InPlace(Image<T> image, QorImageSize roi) {
    const QorResult checked = firstOf(nullCheck(image), stepCheck(image), sizeCheck(roi),
                                      stepFits<layout, T>(image.step, int64_t{roi.width} + 2 * kReach));
    if (checked != QOR_OK) return checked;
    const BorderedImage src = around<layout>(image, roi);
    const WorkMemory memory(RowWindow::bytes(src, needs(Place::inOrder)));
    if (QorResult r = memory.check()) return r;
    return underControlOf<T>([&] {
        run<Order, Stores::delayed, layout>(src, image, memory.begin<uint8_t>());
        return QOR_OK;
    });
}

/// Equal images with equal steps are the in-place form's, and its checks are theirs.
template <class Order, Layout layout, class T>
QorResult extreme3x3(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (src.data == dst.data && src.step == dst.step) return extreme3x3InPlace<Order, layout>(dst, roi);
    const QorResult checked = firstOf(nullCheck(src, dst), stepCheck(src, dst), sizeCheck(roi),
                                      stepFits<layout, T>(src.step, int64_t{roi.width} + 2 * kReach),
                                      stepFits<layout, T>(dst.step, roi.width));
    if (checked != QOR_OK) return checked;
    return underControlOf<T>([&] {
        const BorderedImage image = around<layout>(src, roi);
        constexpr int kBytesPerPixel = 2 * pixelSize<T, layout>;
        if constexpr (layout != Layout::AC4)  // which has the destination in the cache, having read it
            if (isAligned(dst) && streams(streamRules::copy, traffic(roi, kBytesPerPixel))) {
                run<Order, Stores::streaming, layout>(image, dst, nullptr);
                streamFence();
                return QOR_OK;
            }
        run<Order, Stores::plain, layout>(image, dst, nullptr);
        return QOR_OK;
    });
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
