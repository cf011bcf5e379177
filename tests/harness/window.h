// SPDX-License-Identifier: Apache-2.0
// Sweeps of window operations that read their neighbours from memory: the source is just the region and what its
// windows see, flush against guard pages, and exact bytes are expected. In place, the region is written there.
#pragma once
#include <algorithm>

#include "pixelwise.h"

namespace qori::test {

/// How far windows reach beyond their pixel.
struct Around {
    int left, top, right, bottom;

    static Around ofMask(QorImageSize mask, QorPoint2D anchor) {
        return {anchor.x, anchor.y, mask.width - 1 - anchor.x, mask.height - 1 - anchor.y};
    }
};

/// Every width to beyond two vectors of bytes and those around larger ones, each at heights 1 to `tallest`, flush
/// against the page before and the page behind; packed, padded and oddly padded in turn.
inline std::vector<Shape> windowShapes(int tallest = 5) {
    static constexpr int further[] = {95, 96, 97, 127, 128, 129, 191, 200, 257};
    std::vector<Shape> shapes;
    const auto add = [&](int width) {
        for (int height = 1; height <= tallest; ++height)
            for (bool atBegin : {false, true}) {
                static constexpr int paddings[] = {0, 32, 3};
                const int turn = width + height + atBegin;
                shapes.push_back({.width = width,
                                  .height = height,
                                  .padding = paddings[turn % 3],
                                  .atBegin = atBegin,
                                  .shift = turn % 4 == 0 ? 1 : 0});
            }
    };
    for (int width = 1; width <= 67; ++width) add(width);
    for (int width : further) add(width);
    return shapes;
}

/// The region of a shape with all that its windows see.
inline Shape withAround(Shape shape, Around around) {
    shape.width += around.left + around.right;
    shape.height += around.top + around.bottom;
    return shape;
}

/// What a window sees around its pixel, of the pixel's own channel.
template <class S>
struct Neighbours {
    const View<S>& pixels;
    int x, y, channel;

    S operator()(int dx, int dy) const { return pixels.get(x + dx, y + dy, channel); }
};

template <class S, class D>
using WindowCall = FunctionRef<QorResult(const S*, int32_t, D*, int32_t, QorImageSize)>;
template <class S, class D>
using WindowReference = FunctionRef<D(const Neighbours<S>&)>;

/// invoke(source, sourceStep, destination, destinationStep, roi) calls the export with pointers to the region's first
/// pixel; reference(pixel) makes an element of pixel(dx, dy), of its own channel. draw() makes source elements.
template <class S, class D>
__attribute__((noinline)) void checkWindow(const Shape& shape, Layout layout, Kind kind, Around around,
                                           WindowCall<S, D> invoke, WindowReference<S, D> reference,
                                           FunctionRef<S()> draw) {
    const int n = channels(layout);
    const int pixelBytes = n * static_cast<int>(sizeof(S));
    const Shape seen = withAround(shape, around);
    const TestImage src(0, seen, pixelBytes);
    const TestImage dst = kind == Kind::IR ? src : TestImage(1, shape, n * static_cast<int>(sizeof(D)));
    dst.fill<D>(n, AnyValue<D>{});
    src.fill<S>(n, draw);
    const ptrdiff_t inside = around.top * ptrdiff_t{src.step()} + ptrdiff_t{around.left} * pixelBytes;
    Snapshot before = src.snapshot(), expected = dst.snapshot();
    const View<S> from = before.view<S>(n);
    View<D> to = expected.view<D>(n);
    if (kind == Kind::IR) to.origin += inside;
    for (int y = 0; y < shape.height; ++y)
        for (int x = 0; x < shape.width; ++x)
            for (int c = 0; c < processedChannels(layout); ++c)
                to.set(x, y, c, reference(Neighbours<S>{from, x + around.left, y + around.top, c}));
    auto* const source = src.data<uint8_t>() + inside;
    auto* const target = kind == Kind::IR ? source : dst.data<uint8_t>();
    EXPECT_EQ(QOR_OK, invoke(reinterpret_cast<const S*>(source), src.step(), reinterpret_cast<D*>(target), dst.step(),
                             shape.roi()));
    QORI_EXPECT_UNCHANGED(dst, expected);
    if (kind != Kind::IR) {
        QORI_EXPECT_UNCHANGED(src, before);
    }
}

template <class S, class D, Layout layout, Kind kind>
void checkWindow(const Shape& shape, Around around, WindowCall<S, D> invoke, WindowReference<S, D> reference,
                 FunctionRef<S()> draw = AnyValue<S>{}) {
    static_assert(kind == Kind::R || sizeof(S) == sizeof(D));
    checkWindow<S, D>(shape, layout, kind, around, invoke, reference, draw);
}

}  // namespace qori::test
