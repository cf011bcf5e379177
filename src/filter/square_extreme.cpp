// SPDX-License-Identifier: Apache-2.0
#include "square_extreme.h"

#include "frame/float_control.h"
#include "frame/plan.h"
#include "frame/streaming.h"
#include "square_rows.h"

namespace qori::filter {
namespace {

/// Rows made at a time, six being read for four. Measured beyond the caches, two reach 0.9 of this rate; eight gain a
/// fifth in the second-level cache and nothing beyond it.
constexpr int32_t kExtremeRows = 4;

/// One group of rows; rowOf(y) is a source row, where the region begins. Two or three are made as four, the last of
/// which give way: in place, none may be written before all of the group are made.
template <class Order, bool keepAlpha, class T, class RowOf, class Make>
void makeSquareExtremes(RowOf rowOf, int32_t y, int32_t rows, Image<T> dst, ptrdiff_t elements, int channels,
                        Make make) {
    const T* src[kExtremeRows + 2];
    T* to[kExtremeRows];
    for (int32_t k = 0; k < kExtremeRows + 2; ++k) src[k] = rowOf(y - kSquareReach + std::min(k, rows + 1));
    for (int32_t k = 0; k < kExtremeRows; ++k) to[k] = dst.row(y + std::min(k, rows - 1));
    if (rows == 1)
        kernels::squareRowsInPlace<Order, keepAlpha, 1>(src, to, elements, channels);
    else
        make(src, to, elements, channels);
}

/// Of a row with the neighbours on both sides.
template <class T>
int64_t seenBytes(QorImageSize roi, Layout layout) {
    return (int64_t{roi.width} + 2 * kSquareReach) * channels(layout) * elementBytes<T>;
}

template <class Order, bool keepAlpha, class T>
void runInPlace(Image<T> image, QorImageSize roi, Layout layout, uint8_t* memory) {
    const int n = channels(layout);
    forGroupsInPlace(image, roi.height, kExtremeRows, seenBytes<T>(roi, layout),
                     ptrdiff_t{kSquareReach} * n * elementBytes<T>, memory, [=](auto rowOf, int32_t y, int32_t rows) {
                         makeSquareExtremes<Order, keepAlpha>(
                             rowOf, y, rows, image, ptrdiff_t{roi.width} * n, n,
                             kernels::squareRowsInPlace<Order, keepAlpha, kExtremeRows, T>);
                     });
}

template <class Order, bool keepAlpha, class T>
void runApart(Image<const T> src, Image<T> dst, QorImageSize roi, Layout layout, kernels::Stores stores) {
    const int n = channels(layout);
    const auto rowOf = [=](int32_t row) { return src.row(row); };
    const auto make = [=](const T* const* from, T* const* to, ptrdiff_t elements, ptrdiff_t pixel) {
        kernels::squareRows<Order, keepAlpha, kExtremeRows>(from, to, elements, pixel, stores);
    };
    for (int32_t y = 0; y < roi.height; y += kExtremeRows)
        makeSquareExtremes<Order, keepAlpha>(rowOf, y, std::min(kExtremeRows, roi.height - y), dst,
                                             ptrdiff_t{roi.width} * n, n, make);
}

/// Whether rows of so many bytes may stream where they are.
template <class T>
bool mayStream(Image<T> image, int64_t rowBytes) {
    const auto at = reinterpret_cast<uintptr_t>(image.data) | static_cast<uintptr_t>(image.step);
    return at % 64 == 0 || (at % 32 == 0 && rowBytes % 32 == 0);
}

/// Calls body with whether the fourth channel stays; 64f has one channel.
template <class T, class Body>
void withAlpha(Layout layout, Body body) {
    if constexpr (sizeof(T) <= 4)
        if (layout == Layout::AC4) return body.template operator()<true>();
    body.template operator()<false>();
}

}  // namespace

template <class Order, class T>
QorResult squareExtremeInPlace(Image<T> image, QorImageSize roi, Layout layout) {
    const WorkMemory memory(rowsAboveBytes(seenBytes<T>(roi, layout)));
    if (QorResult r = memory.check()) return r;
    return underControlOf<T>([&] {
        withAlpha<T>(layout, [&]<bool keepAlpha>() {
            runInPlace<Order, keepAlpha>(image, roi, layout, memory.begin<uint8_t>());
        });
        return QOR_OK;
    });
}

template <class Order, class T>
void squareExtreme(Image<const T> src, Image<T> dst, QorImageSize roi, Layout layout) {
    const int64_t pixelBytes = channels(layout) * elementBytes<T>;
    // With alpha the destination is in the cache, having been read.
    const bool isStreaming = layout != Layout::AC4 && mayStream(dst, roi.width * pixelBytes) &&
                             streams(streamRules::copy, traffic(roi, static_cast<int>(2 * pixelBytes)));
    underControlOf<T>([&] {
        withAlpha<T>(layout, [&]<bool keepAlpha>() {
            runApart<Order, keepAlpha>(src, dst, roi, layout,
                                       isStreaming ? kernels::Stores::streaming : kernels::Stores::plain);
        });
        return QOR_OK;
    });
    if (isStreaming) streamFence();
}

#define QORI_SQUARE_EXTREMES(Order, T)                                                 \
    template QorResult squareExtremeInPlace<Order<T>>(Image<T>, QorImageSize, Layout); \
    template void squareExtreme<Order<T>>(Image<const T>, Image<T>, QorImageSize, Layout);
#define QORI_SQUARE_ORDERS(T)                 \
    QORI_SQUARE_EXTREMES(kernels::Erosion, T) \
    QORI_SQUARE_EXTREMES(kernels::Dilation, T)
QORI_SQUARE_ORDERS(uint8_t)
QORI_SQUARE_ORDERS(uint16_t)
QORI_SQUARE_ORDERS(int16_t)
QORI_SQUARE_ORDERS(float)
QORI_SQUARE_ORDERS(double)
#undef QORI_SQUARE_ORDERS
#undef QORI_SQUARE_EXTREMES

}  // namespace qori::filter
