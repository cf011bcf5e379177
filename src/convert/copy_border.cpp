// SPDX-License-Identifier: Apache-2.0
// An image inside a larger one, with a frame around it.
#include <algorithm>

#include "frame/checks.h"
#include "move_rows.h"

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

    static void copy(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels, RowWay way) {
        if constexpr (keepAlpha)
            kernels::selectRow<bytes, colourBytes>(dst, src, pixels);
        else
            (way == RowWay::strings ? kernels::copyRowString : kernels::copyRow)(dst, src, pixels * bytes);
    }
    static void move(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, QorImageSize size,
                     RowWay way) {
        if (size.height == 1) return copy(dst, src, size.width, way);
        moveRows<bytes, keepAlpha>(dst, dstStep, src, srcStep, size, way);
    }
    static void fill(uint8_t* dst, const kernels::Pattern& pattern, ptrdiff_t pixels, bool streaming) {
        if (pixels == 0) return;
        if constexpr (keepAlpha)
            kernels::selectFillRow<bytes, colourBytes>(dst, pattern, pixels);
        else
            (streaming ? kernels::fillRowStreaming : kernels::fillRow)(dst, pattern, pixels * bytes);
    }
    static RowWay wayOf(const Frame& frame) {
        const bool streaming = !keepAlpha && streams(streamRules::copy, traffic(frame.dst, 2 * bytes));
        return rowWay(frame.dst, bytes, streaming);
    }
};

template <class T, Layout layout>
using RowsOf = Rows<pixelSize<T, layout>, layout == Layout::AC4>;

/// Calls body(first row, rows) for the rows of the source, one by one or as many at a time as stream together: what
/// lies beside them is written while the ends of the rows are in the cache.
template <class Body>
QORI_INLINE void forGroups(const Frame& frame, RowWay way, int32_t dstStep, Body body) {
    if (way != RowWay::streams) {
        for (int32_t y = 0; y < frame.src.height; ++y) body(y, 1);
        return;
    }
    const int32_t most = kernels::kStreamedTogether * kernels::streamedApart(dstStep);
    for (int64_t y = 0; y < frame.src.height; y += most)
        body(static_cast<int32_t>(y), static_cast<int32_t>(std::min(int64_t{most}, frame.src.height - y)));
}

template <class R>
void frameByConstant(const uint8_t* src, int32_t srcStep, uint8_t* dst, int32_t dstStep, const Frame& frame,
                     const kernels::Pattern& pattern) {
    const RowWay way = R::wayOf(frame);
    const bool streaming = way == RowWay::streams;
    const ptrdiff_t leftBytes = ptrdiff_t{frame.left} * R::pixelBytes,
                    srcBytes = ptrdiff_t{frame.src.width} * R::pixelBytes;
    const auto fillRows = [&](int32_t from, int32_t to) {
        for (int32_t y = from; y < to; ++y) R::fill(dst + ptrdiff_t{y} * dstStep, pattern, frame.dst.width, streaming);
    };
    fillRows(0, frame.top);
    forGroups(
        frame, way, dstStep, [&](int32_t y, int32_t rows) __attribute__((always_inline)) {
            uint8_t* const inside = dst + ptrdiff_t{frame.top + y} * dstStep + leftBytes;
            R::move(inside, dstStep, src + ptrdiff_t{y} * srcStep, srcStep, {frame.src.width, rows}, way);
            for (int32_t k = 0; k < rows; ++k) {
                R::fill(inside + k * ptrdiff_t{dstStep} - leftBytes, pattern, frame.left, streaming);
                R::fill(inside + k * ptrdiff_t{dstStep} + srcBytes, pattern, frame.right(), streaming);
            }
        });
    fillRows(frame.top + frame.src.height, frame.dst.height);
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
void replicateEnds(uint8_t* first, ptrdiff_t step, const Frame& frame, RowWay way) {
    uint8_t* const last = first + (frame.src.height - 1) * step;
    R::move(first - step, -step, first, 0, {frame.dst.width, frame.top}, way);
    R::move(last + step, step, last, 0, {frame.dst.width, frame.bottom()}, way);
}

template <class R>
void frameByNearest(const uint8_t* src, int32_t srcStep, uint8_t* dst, int32_t dstStep, const Frame& frame) {
    const RowWay way = R::wayOf(frame);
    uint8_t* const first = dst + ptrdiff_t{frame.top} * dstStep;
    forGroups(
        frame, way, dstStep, [&](int32_t y, int32_t rows) __attribute__((always_inline)) {
            uint8_t* const inside = first + ptrdiff_t{y} * dstStep + ptrdiff_t{frame.left} * R::pixelBytes;
            const uint8_t* const from = src + ptrdiff_t{y} * srcStep;
            R::move(inside, dstStep, from, srcStep, {frame.src.width, rows}, way);
            for (int32_t k = 0; k < rows; ++k)
                replicateSides<R>(inside + k * ptrdiff_t{dstStep}, from + k * ptrdiff_t{srcStep}, frame);
        });
    replicateEnds<R>(first, dstStep, frame, way);
    if (way == RowWay::streams) streamFence();
}

template <class R>
void frameInPlace(uint8_t* image, int32_t step, const Frame& frame) {
    for (int32_t y = 0; y < frame.src.height; ++y) {
        uint8_t* const row = image + ptrdiff_t{y} * step;
        replicateSides<R>(row, row, frame);
    }
    replicateEnds<R>(image - ptrdiff_t{frame.left} * R::pixelBytes, step, frame, RowWay::vectors);
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
