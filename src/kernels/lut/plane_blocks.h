// SPDX-License-Identifier: Apache-2.0
// Operations that look at one channel at a time, over images of any channels: pixels are taken apart into planes of a
// block, changed there and put together again.
#pragma once
#include <algorithm>

#include "image/driver.h"
#include "kernels/copy/channel_rows.h"
#include "kernels/copy_rows.h"

namespace qori::kernels {

/// How pixels of the destination are made of the channels of the source.
struct PixelOrder {
    int plane[4];  ///< Plane of each channel of the destination; kAlphaPlane is alpha's.
    int alphaAt;   ///< Channel of the destination that stays as it is; -1: none.
};
inline constexpr int kAlphaPlane = 3;
inline constexpr PixelOrder kSameOrder{{0, 1, 2, 3}, -1}, kKeptAlpha{{0, 1, 2, 3}, 3};

/// Planes of up to 512 pixels. Their size is a multiple of 64 elements: operations may work on whole vectors.
template <int srcChannels, int dstChannels, class T>
class PlaneBlock {
public:
    static constexpr int kPixels = 512;

    /// alpha: what fills the destination's fourth channel where it is neither kept nor taken from the source.
    explicit PlaneBlock(T alpha = 0) {
        if constexpr (dstChannels > srcChannels)
            for (T& a : plane_[kAlphaPlane]) a = alpha;
    }
    T* plane(int c) { return plane_[c]; }

    void take(const T* src, const T* dst, int at, int pixels, const PixelOrder& order) {
        uint8_t* planes[4];
        for (int c = 0; c < 4; ++c) planes[c] = asBytes(plane_[c] + at);
        if constexpr (srcChannels == 1)
            copyRow(planes[0], asBytes(src), pixels * elementBytes<T>);
        else
            splitRow<srcChannels, elementBytes<T>>(planes, asBytes(src), pixels, false);
        if constexpr (dstChannels == 4)
            if (order.alphaAt >= 0)
                extractRow<4, elementBytes<T>>(planes[kAlphaPlane], asBytes(dst + order.alphaAt), pixels, false);
    }
    void put(T* dst, int at, int pixels, const PixelOrder& order) const {
        const uint8_t* planes[4];
        for (int c = 0; c < dstChannels; ++c) planes[c] = asBytes(plane_[order.plane[c]] + at);
        if constexpr (dstChannels == 1)
            copyRow(asBytes(dst), planes[0], pixels * elementBytes<T>);
        else
            mergeRow<dstChannels, elementBytes<T>>(asBytes(dst), planes, pixels, false);
    }

private:
    alignas(kVectorBytes) T plane_[4][kPixels];
};

/// Calls map(channel, plane, n) for every block of pixels. Rows that lie apart in both images share a block as far as
/// it holds them, narrow ones laid end to end before; else each row is written before the next one is read.
template <int srcChannels, int dstChannels, class T, class Map>
void mapByPlanes(QorImageSize roi, int processed, Image<const T> src, Image<T> dst, const PixelOrder& order, T alpha,
                 Map map) {
    using Block = PlaneBlock<srcChannels, dstChannels, T>;
    Block block(alpha);
    constexpr int srcPixel = srcChannels * elementBytes<T>, dstPixel = dstChannels * elementBytes<T>;
    const bool liesApart = src.step >= int64_t{roi.width} * srcPixel && dst.step >= int64_t{roi.width} * dstPixel;
    const bool isNarrow = liesApart && int64_t{roi.width} * std::max(srcPixel, dstPixel) <= kNarrowRow;
    const int most = liesApart ? std::max(1, Block::kPixels / roi.width) : 1;
    for (int32_t y = 0; y < roi.height; y += most) {
        const int rows = std::min(most, roi.height - y);
        if (isNarrow) {
            T from[Block::kPixels * srcChannels], to[Block::kPixels * dstChannels];
            const int pixels = rows * roi.width, srcRow = roi.width * srcPixel, dstRow = roi.width * dstPixel;
            copyNarrowRows(asBytes(from), srcRow, asBytes(src.row(y)), src.step, srcRow, rows);
            if (order.alphaAt >= 0) copyNarrowRows(asBytes(to), dstRow, asBytes(dst.row(y)), dst.step, dstRow, rows);
            block.take(from, to, 0, pixels, order);
            for (int c = 0; c < processed; ++c) map(c, block.plane(c), pixels);
            block.put(to, 0, pixels, order);
            copyNarrowRows(asBytes(dst.row(y)), dst.step, asBytes(to), dstRow, dstRow, rows);
            continue;
        }
        for (int32_t x = 0, pixels; x < roi.width; x += pixels) {
            pixels = std::min(Block::kPixels, roi.width - x);
            const ptrdiff_t from = ptrdiff_t{x} * srcChannels, to = ptrdiff_t{x} * dstChannels;
            for (int r = 0; r < rows; ++r)
                block.take(src.row(y + r) + from, dst.row(y + r) + to, r * pixels, pixels, order);
            for (int c = 0; c < processed; ++c) map(c, block.plane(c), rows * pixels);
            for (int r = 0; r < rows; ++r) block.put(dst.row(y + r) + to, r * pixels, pixels, order);
        }
    }
}

}  // namespace qori::kernels
