// SPDX-License-Identifier: Apache-2.0
// An image inside a larger one, with a frame around it.
#include "frame/checks.h"
#include "frame/streaming.h"
#include "kernels/copy/select_rows.h"

namespace qori::convert {
namespace {

/// Where the source lies in the destination.
struct Frame {
    QorImageSize src, dst;
    int32_t top, left;

    int32_t right() const { return dst.width - left - src.width; }
    int32_t bottom() const { return dst.height - top - src.height; }
};

QorResult frameCheck(const Frame& frame) {
    if (QorResult r = firstOf(sizeCheck(frame.src), sizeCheck(frame.dst))) return r;
    const bool fits = frame.top >= 0 && frame.left >= 0 && frame.dst.width >= int64_t{frame.src.width} + frame.left &&
                      frame.dst.height >= int64_t{frame.src.height} + frame.top;
    return fits ? QOR_OK : QOR_ERR_SIZE;
}

/// Rows of pixels of one size, copied and filled.
template <int bytes, bool keepAlpha>
struct Rows {
    static constexpr int pixelBytes = bytes, colourBytes = bytes / 4 * 3;

    static void copy(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels, bool streaming) {
        if constexpr (keepAlpha)
            kernels::selectRow<bytes, colourBytes>(dst, src, pixels);
        else
            (streaming ? kernels::copyRowStreaming : kernels::copyRow)(dst, src, pixels * bytes);
    }
    static void fill(uint8_t* dst, const kernels::Pattern& pattern, ptrdiff_t pixels, bool streaming) {
        if (pixels == 0) return;
        if constexpr (keepAlpha)
            kernels::selectFillRow<bytes, colourBytes>(dst, pattern, pixels);
        else
            (streaming ? kernels::fillRowStreaming : kernels::fillRow)(dst, pattern, pixels * bytes);
    }
    static bool streams(const Frame& frame) {
        return !keepAlpha && qori::streams(streamRules::copy, traffic(frame.dst, 2 * bytes));
    }
};

template <class T, Layout layout>
using RowsOf = Rows<pixelSize<T, layout>, layout == Layout::AC4>;

template <class R>
void frameByConstant(const uint8_t* src, int32_t srcStep, uint8_t* dst, int32_t dstStep, const Frame& frame,
                     const kernels::Pattern& pattern) {
    const bool streaming = R::streams(frame);
    const ptrdiff_t leftBytes = ptrdiff_t{frame.left} * R::pixelBytes,
                    srcBytes = ptrdiff_t{frame.src.width} * R::pixelBytes;
    for (int32_t y = 0; y < frame.dst.height; ++y) {
        uint8_t* const row = dst + ptrdiff_t{y} * dstStep;
        if (y < frame.top || y >= frame.top + frame.src.height) {
            R::fill(row, pattern, frame.dst.width, streaming);
            continue;
        }
        R::fill(row, pattern, frame.left, streaming);
        R::copy(row + leftBytes, src + ptrdiff_t{y - frame.top} * srcStep, frame.src.width, streaming);
        R::fill(row + leftBytes + srcBytes, pattern, frame.right(), streaming);
    }
    if (streaming) streamFence();
}

/// The frame to the left and right of a row of the source, which begins at `inside`; `src` has its pixels.
template <class R>
void replicateSides(uint8_t* inside, const uint8_t* src, const Frame& frame) {
    const ptrdiff_t leftBytes = ptrdiff_t{frame.left} * R::pixelBytes,
                    srcBytes = ptrdiff_t{frame.src.width} * R::pixelBytes;
    if (frame.left > 0) R::fill(inside - leftBytes, kernels::repeatPixel<R::pixelBytes>(src), frame.left, false);
    if (frame.right() > 0)
        R::fill(inside + srcBytes, kernels::repeatPixel<R::pixelBytes>(src + srcBytes - R::pixelBytes), frame.right(),
                false);
}

/// The frame above and below, once the rows of the source have their sides; `first` is the first of them.
template <class R>
void replicateEnds(uint8_t* first, int32_t step, const Frame& frame, bool streaming) {
    const uint8_t* const last = first + ptrdiff_t{frame.src.height - 1} * step;
    for (int32_t y = 1; y <= frame.top; ++y) R::copy(first - ptrdiff_t{y} * step, first, frame.dst.width, streaming);
    for (int32_t y = 1; y <= frame.bottom(); ++y)
        R::copy(first + ptrdiff_t{frame.src.height - 1 + y} * step, last, frame.dst.width, streaming);
}

template <class R>
void frameByNearest(const uint8_t* src, int32_t srcStep, uint8_t* dst, int32_t dstStep, const Frame& frame) {
    const bool streaming = R::streams(frame);
    uint8_t* const first = dst + ptrdiff_t{frame.top} * dstStep;
    for (int32_t y = 0; y < frame.src.height; ++y) {
        uint8_t* const inside = first + ptrdiff_t{y} * dstStep + ptrdiff_t{frame.left} * R::pixelBytes;
        const uint8_t* const from = src + ptrdiff_t{y} * srcStep;
        R::copy(inside, from, frame.src.width, streaming);
        replicateSides<R>(inside, from, frame);
    }
    replicateEnds<R>(first, dstStep, frame, streaming);
    if (streaming) streamFence();
}

template <class R>
void frameInPlace(uint8_t* image, int32_t step, const Frame& frame) {
    for (int32_t y = 0; y < frame.src.height; ++y) {
        uint8_t* const row = image + ptrdiff_t{y} * step;
        replicateSides<R>(row, row, frame);
    }
    replicateEnds<R>(image - ptrdiff_t{frame.left} * R::pixelBytes, step, frame, false);
}

template <class T, Layout layout>
QorResult copyConstBorder(Image<const T> src, Image<T> dst, Frame frame, const T* value) {
    if (QorResult r = firstOf(nullCheck(src, dst), stepCheck(src, dst), frameCheck(frame), nullCheck(value))) return r;
    constexpr int n = channels(layout);
    T pixel[n] = {};
    for (int c = 0; c < processedChannels(layout); ++c) pixel[c] = value[c];
    frameByConstant<RowsOf<T, layout>>(asBytes(src.data), src.step, asBytes(dst.data), dst.step, frame,
                                       kernels::patternOf<n>(pixel));
    return QOR_OK;
}

template <class T, Layout layout>
QorResult replicateBorderInPlace(Image<T> image, Frame frame) {
    if (QorResult r = firstOf(nullCheck(image), stepCheck(image), frameCheck(frame))) return r;
    frameInPlace<RowsOf<T, layout>>(asBytes(image.data), image.step, frame);
    return QOR_OK;
}

/// One pointer for both images names the source's first pixel, whatever dstStep says.
template <class T, Layout layout>
QorResult copyReplicateBorder(Image<const T> src, Image<T> dst, Frame frame) {
    if (src.data == dst.data) return replicateBorderInPlace<T, layout>(Image<T>{dst.data, src.step}, frame);
    if (QorResult r = firstOf(nullCheck(src, dst), stepCheck(src, dst), frameCheck(frame))) return r;
    frameByNearest<RowsOf<T, layout>>(asBytes(src.data), src.step, asBytes(dst.data), dst.step, frame);
    return QOR_OK;
}

}  // namespace
}  // namespace qori::convert

#include "entries/border.inc"
