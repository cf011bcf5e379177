// SPDX-License-Identifier: Apache-2.0
// Medians whose neighbours are read from memory: rectangles, rows, columns, crosses, colours, a weighted centre.
#include <array>

#include "frame/checks.h"
#include "frame/float_control.h"
#include "kernels/median/colour.h"
#include "median_run.h"

namespace qori::filter {
namespace {

/// The row `dy` rows and `dx` pixels from row y's first pixel.
template <Layout layout, class T>
const T* neighbour(Image<const T> src, int32_t y, int32_t dx, int32_t dy) {
    return advance(src.data, (ptrdiff_t{y} + dy) * src.step + ptrdiff_t{dx} * pixelSize<T, layout>);
}

template <Layout layout, class T>
QorResult copyPixels(Image<const T> src, Image<T> dst, QorImageSize roi) {
    const ptrdiff_t elements = ptrdiff_t{roi.width} * channels(layout);
    for (int32_t y = 0; y < roi.height; ++y)
        kernels::medianOfRows<1, layout == Layout::AC4>(std::array{src.row(y)}.data(), dst.row(y), elements);
    return QOR_OK;
}

template <Layout layout, class T>
QorResult runNetwork(Image<const T> windows, Image<T> dst, QorImageSize roi, QorImageSize mask) {
    constexpr int n = channels(layout);
    const int32_t most = networkRows(mask);
    T* to[kMostNetworkRows];
    for (int32_t y = 0; y < roi.height;) {
        const int32_t rows = std::min(most, roi.height - y);
        for (int32_t k = 0; k < rows; ++k) to[k] = dst.row(y + k);
        medianByNetwork<layout == Layout::AC4>(
            mask, [=](int32_t k) { return windows.row(y + k); }, to, rows, ptrdiff_t{roi.width} * n, n);
        y += rows;
    }
    return QOR_OK;
}

template <class T, Layout layout>
QorResult median(Image<const T> src, Image<T> dst, QorImageSize roi, QorImageSize mask, QorPoint2D anchor) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst), oddMaskCheck(mask),
                              anchorCheck(anchor, mask)))
        return r;
    if (mask.width == 1 && mask.height == 1) return copyPixels<layout>(src, dst, roi);
    const Image<const T> windows{neighbour<layout>(src, 0, -anchor.x, -anchor.y), src.step};
    if (hasNetwork(mask)) return runNetwork<layout>(windows, dst, roi, mask);
    return medianOfAny(MedianJob<T>{windows, dst, roi, mask, channels(layout), processedChannels(layout)});
}

template <class T>
QorResult medianBufferSize(QorImageSize roi, QorImageSize mask, int32_t numChannels, int32_t* pBufferSize) {
    if (QorResult r = firstOf(nullCheck(pBufferSize), sizeCheck(roi), oddMaskCheck(mask), channelsCheck(numChannels)))
        return r;
    // Up to 2^62: no overflow before the multiplication by the element's bytes.
    const int64_t area = int64_t{mask.width} * mask.height;
    return area > INT32_MAX ? QOR_ERR_SIZE : reportSize(area * elementBytes<T>, pBufferSize);
}

QorResult shapeCheck(int32_t mask, int32_t three, int32_t five) {
    return mask == three || mask == five ? QOR_OK : QOR_ERR_MASK_SIZE;
}

/// The mask of a code: tens are columns, units are rows.
QorImageSize maskOf(int32_t code) { return {code / 10, code % 10}; }

/// In rows and columns, by code.
template <Layout layout, class T>
QorResult runLine(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t three, int32_t five, int32_t code) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst), shapeCheck(code, three, five)))
        return r;
    const QorImageSize mask = maskOf(code);
    return runNetwork<layout>({neighbour<layout>(src, 0, -(mask.width / 2), -(mask.height / 2)), src.step}, dst, roi,
                              mask);
}

template <class T, Layout layout>
QorResult medianHoriz(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t mask) {
    return runLine<layout>(src, dst, roi, mask3x1, mask5x1, mask);
}

template <class T, Layout layout>
QorResult medianVert(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t mask) {
    return runLine<layout>(src, dst, roi, mask1x3, mask1x5, mask);
}

template <int reach, Layout layout, class T>
void crossRow(Image<const T> src, T* dst, int32_t y, int32_t width) {
    constexpr int n = 4 * reach + 1;
    const T* rows[n];
    int k = 0;
    rows[k++] = src.row(y);
    for (int i = -reach; i <= reach; ++i)
        if (i != 0) rows[k++] = neighbour<layout>(src, y, i, 0), rows[k++] = neighbour<layout>(src, y, 0, i);
    kernels::medianOfRows<n, layout == Layout::AC4>(rows, dst, ptrdiff_t{width} * channels(layout));
}

template <class T, Layout layout>
QorResult medianCross(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t mask) {
    if (QorResult r =
            firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst), shapeCheck(mask, mask3x3, mask5x5)))
        return r;
    for (int32_t y = 0; y < roi.height; ++y)
        mask == mask3x3 ? crossRow<1, layout>(src, dst.row(y), y, roi.width)
                        : crossRow<2, layout>(src, dst.row(y), y, roi.width);
    return QOR_OK;
}

/// Columns of pixels, from top to bottom: each row is taken apart once.
template <int side, Layout layout, class T>
void runColour(Image<const T> src, Image<T> dst, QorImageSize roi) {
    using Row = kernels::ColourRow<T>;
    constexpr int n = channels(layout), reach = side / 2;
    Row ring[side] = {}, result;
    const Row* rows[side];
    for (int32_t x = 0; x < roi.width; x += Row::pixels) {
        const int32_t count = std::min(Row::pixels, roi.width - x);
        const auto enter = [&](int32_t y) {  // the row `reach` above destination row y
            ring[y % side].read(neighbour<layout>(src, y, x - reach, -reach), count + 2 * reach, n);
        };
        for (int32_t y = 0; y < side - 1; ++y) enter(y);
        for (int32_t y = 0; y < roi.height; ++y) {
            enter(y + side - 1);
            for (int k = 0; k < side; ++k) rows[k] = &ring[(y + k) % side];
            kernels::medianColour<side>(rows, count, result);
            T* const to = dst.row(y) + ptrdiff_t{x} * n;
            for (int32_t i = 0; i < count; ++i)
                for (int c = 0; c < 3; ++c) kernels::put(to + i * n + c, static_cast<T>(result.plane[c][i]));
        }
    }
}

template <class T, Layout layout>
QorResult medianColor(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t mask) {
    if (QorResult r =
            firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst), shapeCheck(mask, mask3x3, mask5x5)))
        return r;
    return underControlOf<T>([=] {
        mask == mask3x3 ? runColour<3, layout>(src, dst, roi) : runColour<5, layout>(src, dst, roi);
        return QOR_OK;
    });
}

QorResult medianWeightedCenter(Image<const uint8_t> src, Image<uint8_t> dst, QorImageSize roi, int32_t weight) {
    constexpr int32_t kAllAround = 8;
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst))) return r;
    if (weight < 1) return QOR_ERR_WEIGHT;
    const int32_t odd = weight - (weight % 2 == 0);
    if (odd > kAllAround) {
        copyPixels<Layout::C1>(src, dst, roi);
    } else {
        for (int32_t y = 0; y < roi.height; ++y) {
            const uint8_t* rows[kAllAround];
            int k = 0;
            for (int dy = -1; dy <= 1; ++dy)
                for (int dx = -1; dx <= 1; ++dx)
                    if (dx != 0 || dy != 0) rows[k++] = neighbour<Layout::C1>(src, y, dx, dy);
            kernels::medianAroundCentre(rows, src.row(y), odd, dst.row(y), roi.width);
        }
    }
    return odd == weight ? QOR_OK : QOR_WARN_EVEN_WEIGHT;
}

}  // namespace
}  // namespace qori::filter

#include "entries/median.inc"
