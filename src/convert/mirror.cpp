// SPDX-License-Identifier: Apache-2.0
// Reflections. Whole pixels move, so that all types of one size share their kernels.
#include "frame/checks.h"
#include "image/driver.h"
#include "kernels/mirror/reverse_rows.h"
#include "kernels/mirror/transpose.h"
#include "move_rows.h"

namespace qori::convert {
namespace {

constexpr bool isDiagonal(int32_t axis) { return axis == flipDiagonal || axis == flipAntiDiagonal; }
constexpr bool reversesRows(int32_t axis) { return axis == flipHorizontalAxis || axis == flipBothAxes; }
constexpr bool reversesColumns(int32_t axis) { return axis == flipVerticalAxis || axis == flipBothAxes; }

QorResult axisCheck(int32_t axis) { return axis < 0 || axis > flipBothAxes ? QOR_ERR_FLIP_AXIS : QOR_OK; }

/// What is reversed has two ends.
QorResult endsCheck(QorImageSize roi, int32_t axis) {
    return (reversesRows(axis) && roi.height < 2) || (reversesColumns(axis) && roi.width < 2) ? QOR_ERR_SIZE : QOR_OK;
}

/// The pixels of one size that a reflection moves.
template <int bytes, bool alphaKept>
struct Moved {
    static constexpr int pixelBytes = bytes;
    static constexpr bool keepAlpha = alphaKept;

    static uint8_t* pixel(uint8_t* row, int64_t x) { return row + static_cast<ptrdiff_t>(x * bytes); }
    static void swap(uint8_t* a, uint8_t* b, ptrdiff_t pixels) { kernels::swapRows<bytes, alphaKept>(a, b, pixels); }
    /// Pixels from `left` on with those before `rightEnd`.
    static void swapReversed(uint8_t* left, uint8_t* rightEnd, ptrdiff_t pixels) {
        kernels::swapReversed<bytes, alphaKept>(left, rightEnd, pixels);
    }
};

template <class T, Layout layout>
using MovedOf = Moved<pixelSize<T, layout>, layout == Layout::AC4>;

/// Images of four channels keep the rule of the widening moves; alpha is read from the destination, which is cached
/// then.
template <class M>
bool streamsOut(QorImageSize roi, int channels) {
    if (M::keepAlpha) return false;
    return streams(channels == 4 ? streamRules::widening : streamRules::copy, traffic(roi, 2 * M::pixelBytes));
}

constexpr int32_t kPage = 4096;

template <class M>
void reflect(Image<const uint8_t> src, Image<uint8_t> dst, QorImageSize roi, int32_t axis, bool streaming) {
    // What streams goes by several rows at a time, if they are of pages.
    const bool keepsRows = streaming && roi.width >= kPage / M::pixelBytes;
    if (axis == flipBothAxes && !keepsRows && isOneRun(roi, walk(src, M::pixelBytes), walk(dst, M::pixelBytes)))
        return reflect<M>(src, dst, {roi.width * roi.height, 1}, flipVerticalAxis, streaming);
    const uint8_t* const first = reversesRows(axis) ? src.row(roi.height - 1) : src.data;
    const ptrdiff_t step = reversesRows(axis) ? -ptrdiff_t{src.step} : src.step;
    if (reversesColumns(axis))
        return kernels::reverseRows<M::pixelBytes, M::keepAlpha>(dst.data, dst.step, first, step, roi.width, roi.height,
                                                                 streaming);
    moveRows<M::pixelBytes, M::keepAlpha>(dst.data, dst.step, first, step, roi, rowWay(roi, M::pixelBytes, streaming));
}

/// Exchanges what belongs together from both ends towards the middle.
template <class M>
void reflectInPlace(Image<uint8_t> image, QorImageSize roi, int32_t axis) {
    const auto reverse = kernels::reverseRowsInPlace<M::pixelBytes, M::keepAlpha>;
    if (axis == flipVerticalAxis) return reverse(image.data, image.step, roi.width, roi.height);
    if (axis == flipBothAxes && isOneRun(roi, walk(image, M::pixelBytes)))
        return reverse(image.data, 0, ptrdiff_t{roi.width} * roi.height, 1);
    for (int32_t top = 0, bottom = roi.height - 1; top < bottom; ++top, --bottom) {
        if (axis == flipHorizontalAxis)
            M::swap(image.row(top), image.row(bottom), roi.width);
        else
            M::swapReversed(image.row(top), M::pixel(image.row(bottom), roi.width), roi.width);
    }
    if (axis == flipBothAxes && roi.height % 2 != 0) reverse(image.row(roi.height / 2), 0, roi.width, 1);
}

/// The other diagonal is the first one with both images upside down.
template <class M>
void transpose(Image<const uint8_t> src, Image<uint8_t> dst, QorImageSize roi, int32_t axis, bool streaming) {
    const bool anti = axis == flipAntiDiagonal;
    const auto turn = kernels::transposeImage<M::pixelBytes, M::keepAlpha>;
    turn(anti ? dst.row(roi.width - 1) : dst.data, anti ? -ptrdiff_t{dst.step} : dst.step,
         anti ? src.row(roi.height - 1) : src.data, anti ? -ptrdiff_t{src.step} : src.step, roi, streaming);
}

/// The addresses from the first to the last byte of an image; its step is positive.
struct Span {
    uint64_t first, last;

    Span(const uint8_t* data, int32_t step, int32_t width, int32_t height, int pixelBytes)
        : first(reinterpret_cast<uintptr_t>(data)),
          last(first + static_cast<uint64_t>(int64_t{height - 1} * step + int64_t{width} * pixelBytes - 1)) {}
    bool meets(const Span& other) const { return first <= other.last && other.first <= last; }
};

template <class T>
Image<std::remove_pointer_t<decltype(asBytes(std::declval<T*>()))>> bytesOf(Image<T> image) {
    return {asBytes(image.data), image.step};
}

template <class T, Layout layout>
QorResult mirrorDiagonal(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t axis) {
    using M = MovedOf<T, layout>;
    if (QorResult r = firstOf(nullCheck(src, dst), stepCheck(src, dst), sizeCheck(roi))) return r;
    const Span from(asBytes(src.data), src.step, roi.width, roi.height, M::pixelBytes);
    const Span to(asBytes(dst.data), dst.step, roi.height, roi.width, M::pixelBytes);
    if (from.meets(to)) return QOR_ERR_UNSUPPORTED_MODE;
    const bool streaming = streamsOut<M>(roi, channels(layout));
    transpose<M>(bytesOf(src), bytesOf(dst), roi, axis, streaming);
    if (streaming) streamFence();
    return QOR_OK;
}

template <class T, Layout layout>
QorResult mirrorInPlace(Image<T> image, QorImageSize roi, int32_t axis) {
    if (QorResult r = firstOf(nullCheck(image), sizeCheck(roi), axisCheck(axis), endsCheck(roi, axis))) return r;
    reflectInPlace<MovedOf<T, layout>>(bytesOf(image), roi, axis);
    return QOR_OK;
}

template <class T, Layout layout>
QorResult mirror(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t axis) {
    using M = MovedOf<T, layout>;
    if (isDiagonal(axis)) return mirrorDiagonal<T, layout>(src, dst, roi, axis);
    if (src.data == dst.data && src.step == dst.step) return mirrorInPlace<T, layout>(dst, roi, axis);
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), axisCheck(axis), endsCheck(roi, axis))) return r;
    const bool streaming = streamsOut<M>(roi, channels(layout));
    reflect<M>(bytesOf(src), bytesOf(dst), roi, axis, streaming);
    if (streaming) streamFence();
    return QOR_OK;
}

}  // namespace
}  // namespace qori::convert

#include "entries/mirror.inc"
