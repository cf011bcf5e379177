// SPDX-License-Identifier: Apache-2.0
#include "square_extreme.h"

#include "frame/float_control.h"
#include "frame/plan.h"
#include "frame/row_window.h"
#include "frame/streaming.h"

namespace qori::filter {
namespace {

/// Rows made at a time, six being read for four. Measured beyond the caches, two reach 0.9 of this rate; eight gain a
/// fifth in the second-level cache and nothing beyond it.
constexpr int32_t kExtremeRows = 4;

template <Layout layout, class T>
BorderedImage withNeighbours(Image<T> src, QorImageSize roi) {
    return {asBytes(src.data), src.step, roi, pixelSize<T, layout>, BorderRule::readAll()};
}

/// One group of rows. Two or three are made as four, the last of which give way: in place, none may be written before
/// all of the group are made.
template <class Order, kernels::Stores stores, Layout layout, class T>
void makeSquareExtremes(const WindowPart& part, int32_t y, int32_t rows, Image<T> dst) {
    constexpr int n = channels(layout);
    constexpr bool keepAlpha = layout == Layout::AC4;
    const ptrdiff_t elements = ptrdiff_t{part.width} * n;
    const T* src[kExtremeRows + 2];
    T* to[kExtremeRows];
    for (int32_t k = 0; k < kExtremeRows + 2; ++k)
        src[k] = advance(part.row<T>(y - kSquareReach + std::min(k, rows + 1)), n * kSquareReach * elementBytes<T>);
    for (int32_t k = 0; k < kExtremeRows; ++k) to[k] = dst.row(y + std::min(k, rows - 1));
    if (rows == 1)
        kernels::squareRows<Order, n, kernels::Stores::delayed, keepAlpha, 1>(src, to, elements);
    else
        kernels::squareRows<Order, n, stores, keepAlpha, kExtremeRows>(src, to, elements);
}

constexpr WindowNeeds squareExtremeNeeds(Place place) {
    return {
        .reach = {kSquareReach, kSquareReach, kSquareReach, kSquareReach}, .rowsAtOnce = kExtremeRows, .place = place};
}

template <class Order, kernels::Stores stores, Layout layout, class T>
void runSquareExtremes(const BorderedImage& src, Image<T> dst, uint8_t* memory) {
    RowWindow window(src, squareExtremeNeeds(stores == kernels::Stores::delayed ? Place::inOrder : Place::apart),
                     memory);
    window.forEach([&](const WindowPart& part, int32_t y, int32_t rows) {
        makeSquareExtremes<Order, stores, layout>(part, y, rows, dst);
    });
}

/// Whether rows of so many bytes may stream where they are.
template <class T>
bool mayStream(Image<T> image, int64_t rowBytes) {
    const auto at = reinterpret_cast<uintptr_t>(image.data) | static_cast<uintptr_t>(image.step);
    return at % 64 == 0 || (at % 32 == 0 && rowBytes % 32 == 0);
}

}  // namespace

template <class Order, Layout layout, class T>
QorResult squareExtremeInPlace(Image<T> image, QorImageSize roi) {
    const BorderedImage src = withNeighbours<layout>(image, roi);
    const WorkMemory memory(RowWindow::bytes(src, squareExtremeNeeds(Place::inOrder)));
    if (QorResult r = memory.check()) return r;
    return underControlOf<T>([&] {
        runSquareExtremes<Order, kernels::Stores::delayed, layout>(src, image, memory.begin<uint8_t>());
        return QOR_OK;
    });
}

template <class Order, Layout layout, class T>
void squareExtreme(Image<const T> src, Image<T> dst, QorImageSize roi) {
    underControlOf<T>([&] {
        const BorderedImage image = withNeighbours<layout>(src, roi);
        constexpr int kBytesPerPixel = 2 * pixelSize<T, layout>;
        if constexpr (layout != Layout::AC4)  // which has the destination in the cache, having read it
            if (mayStream(dst, int64_t{roi.width} * pixelSize<T, layout>) &&
                streams(streamRules::copy, traffic(roi, kBytesPerPixel))) {
                runSquareExtremes<Order, kernels::Stores::streaming, layout>(image, dst, nullptr);
                streamFence();
                return QOR_OK;
            }
        runSquareExtremes<Order, kernels::Stores::plain, layout>(image, dst, nullptr);
        return QOR_OK;
    });
}

#define QORI_SQUARE_EXTREMES(Order, layout, T)                                                 \
    template QorResult squareExtremeInPlace<Order<T>, Layout::layout>(Image<T>, QorImageSize); \
    template void squareExtreme<Order<T>, Layout::layout>(Image<const T>, Image<T>, QorImageSize);
#define QORI_SQUARE_ORDERS(layout, T)                 \
    QORI_SQUARE_EXTREMES(kernels::Erosion, layout, T) \
    QORI_SQUARE_EXTREMES(kernels::Dilation, layout, T)
#define QORI_SQUARE_LAYOUTS(T) \
    QORI_SQUARE_ORDERS(C1, T) QORI_SQUARE_ORDERS(C3, T) QORI_SQUARE_ORDERS(C4, T) QORI_SQUARE_ORDERS(AC4, T)
QORI_SQUARE_LAYOUTS(uint8_t)
QORI_SQUARE_LAYOUTS(uint16_t)
QORI_SQUARE_LAYOUTS(int16_t)
QORI_SQUARE_LAYOUTS(float)
QORI_SQUARE_ORDERS(C1, double)
#undef QORI_SQUARE_LAYOUTS
#undef QORI_SQUARE_ORDERS
#undef QORI_SQUARE_EXTREMES

}  // namespace qori::filter
