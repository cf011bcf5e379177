// SPDX-License-Identifier: Apache-2.0
// Sweeps of element-wise operations: every shape, exact bytes, sources and surroundings unchanged. In place, the last
// source is the destination image.
#pragma once
#include "sweep.h"

namespace qori::test {

constexpr int processedChannels(Layout layout) {
    return layout == Layout::AC4 ? 3 : isChannelOfInterest(layout) ? 1 : channels(layout);
}

/// Draws any value of the type, extremes more often.
template <class T>
struct AnyValue {
    T operator()() const { return random().value<T>(); }
};

/// invoke(src, dst, roi) calls the export; reference(a, channel) gives one element.
using UnaryCall = FunctionRef<void(const TestImage&, const TestImage&, QorImageSize)>;

template <class S, class D>
__attribute__((noinline)) void checkUnary(const Shape& shape, Layout layout, Kind kind, UnaryCall invoke,
                                          FunctionRef<D(S, int)> reference, FunctionRef<S()> draw) {
    const int n = channels(layout);
    TestImage dst(0, shape, n * static_cast<int>(sizeof(D)));
    TestImage src = kind == Kind::IR ? dst : TestImage(1, shape, n * static_cast<int>(sizeof(S)));
    dst.fill<D>(n, AnyValue<D>{});
    src.fill<S>(n, draw);
    const Snapshot srcBefore = src.snapshot();
    Snapshot expected = dst.snapshot();
    const auto from = src.view<S>(n);
    const auto to = expected.view<D>(n);
    for (int y = 0; y < shape.height; ++y)
        for (int x = 0; x < shape.width; ++x)
            for (int c = 0; c < processedChannels(layout); ++c) to.set(x, y, c, reference(from.get(x, y, c), c));
    invoke(src, dst, shape.roi());
    QORI_EXPECT_UNCHANGED(dst, expected);
    if (kind != Kind::IR) {
        QORI_EXPECT_UNCHANGED(src, srcBefore);
    }
}

template <class S, class D, Layout layout, Kind kind>
void checkUnary(const Shape& shape, UnaryCall invoke, FunctionRef<D(S, int)> reference,
                FunctionRef<S()> draw = AnyValue<S>{}) {
    checkUnary<S, D>(shape, layout, kind, invoke, reference, draw);
}

/// invoke(src1, src2, dst, roi); reference(a, b, channel) with a of src1 and b of src2 (in place: of the destination).
using BinaryCall = FunctionRef<void(const TestImage&, const TestImage&, const TestImage&, QorImageSize)>;

template <class S, class D>
__attribute__((noinline)) void checkBinary(const Shape& shape, Layout layout, Kind kind, BinaryCall invoke,
                                           FunctionRef<D(S, S, int)> reference, FunctionRef<S()> draw) {
    const int n = channels(layout);
    TestImage dst(0, shape, n * static_cast<int>(sizeof(D))), src1(1, shape, n * static_cast<int>(sizeof(S)));
    TestImage src2 = kind == Kind::IR ? dst : TestImage(2, shape, n * static_cast<int>(sizeof(S)));
    dst.fill<D>(n, AnyValue<D>{});
    src1.fill<S>(n, draw);
    src2.fill<S>(n, draw);
    const Snapshot src1Before = src1.snapshot(), src2Before = src2.snapshot();
    Snapshot expected = dst.snapshot();
    const auto first = src1.view<S>(n), second = src2.view<S>(n);
    const auto to = expected.view<D>(n);
    for (int y = 0; y < shape.height; ++y)
        for (int x = 0; x < shape.width; ++x)
            for (int c = 0; c < processedChannels(layout); ++c)
                to.set(x, y, c, reference(first.get(x, y, c), second.get(x, y, c), c));
    invoke(src1, src2, dst, shape.roi());
    QORI_EXPECT_UNCHANGED(dst, expected);
    QORI_EXPECT_UNCHANGED(src1, src1Before);
    if (kind != Kind::IR) {
        QORI_EXPECT_UNCHANGED(src2, src2Before);
    }
}

template <class S, class D, Layout layout, Kind kind>
void checkBinary(const Shape& shape, BinaryCall invoke, FunctionRef<D(S, S, int)> reference,
                 FunctionRef<S()> draw = AnyValue<S>{}) {
    checkBinary<S, D>(shape, layout, kind, invoke, reference, draw);
}

}  // namespace qori::test
