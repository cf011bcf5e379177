// SPDX-License-Identifier: Apache-2.0
// Which faults each function of the resize reports, in which order, and that it then writes nothing.
#include "resize_jobs.h"

namespace qori::test {
namespace {

TEST(Resize, SizeQueryChecksInOrder) {
    const TestImage out = block(kBuffer, 8);
    int32_t *plan = out.data<int32_t>(), *init = plan + 1;
    const QorImageSize ok{10, 10}, none{0, 10}, negative{10, -1};
    const auto status = [&](QorImageSize src, QorImageSize dst, int32_t interpolation, int32_t antialiasing) {
        return qoriResizeGetSize_16s(src, dst, interpolation, antialiasing, plan, init);
    };
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriResizeGetSize_8u(none, ok, 3, 0, nullptr, init));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriResizeGetSize_8u(none, ok, 3, 0, plan, nullptr));
    QORI_EXPECT_STATUS(QOR_WARN_NOTHING_TO_DO, out, status(negative, none, 3, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, status(ok, negative, 3, 0));
    for (int32_t bad : {-1, 3, 4, 5, 7, 9, 15, 17, INT32_MAX})
        QORI_EXPECT_STATUS(QOR_ERR_INTERPOLATION, out, status(ok, ok, bad, 1));
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, out, status(ok, ok, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, out, status(ok, ok, interpNearest, -1));
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, out, status({1, 1}, ok, interpSuper, 2));  // before the sizes of super
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, status({1, 2}, ok, interpLinear, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, status({9, 3}, ok, interpCubic, 1));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, status({3, 9}, ok, interpLanczos, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, status({10, 9}, ok, interpSuper, 0));
    EXPECT_EQ(QOR_OK, status({1, 1}, ok, interpNearest, 0));
    EXPECT_EQ(QOR_OK, status({2, 2}, ok, interpLinear, 0));
    EXPECT_EQ(QOR_OK, status({4, 4}, ok, interpLanczos, 1));
    EXPECT_EQ(QOR_OK, status(ok, ok, interpSuper, 0));
}

TEST(Resize, InitialisersCheckInOrder) {
    const TestImage out = block(kPlan, 4096), scratch = block(kInit, 4096);
    auto* plan = out.data<QorResizePlan>();
    auto* init = scratch.data<uint8_t>();
    const QorImageSize ok{10, 10}, none{10, 0}, negative{-1, 10};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriResizeNearestInit_8u(none, ok, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriResizeCubicInit_32f(none, ok, 0, 0.5f, plan, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriResizeLanczosInit_16u(none, ok, 4, plan, nullptr));
    QORI_EXPECT_STATUS(QOR_WARN_NOTHING_TO_DO, out, qoriResizeNearestInit_16s(negative, none, plan));
    QORI_EXPECT_STATUS(QOR_WARN_NOTHING_TO_DO, out, qoriResizeLanczosInit_8u(none, ok, 4, plan, init));
    QORI_EXPECT_STATUS(QOR_WARN_NOTHING_TO_DO, out, qoriResizeAntialiasingLinearInit(none, ok, plan, init));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriResizeNearestInit_32f(ok, negative, plan));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriResizeLanczosInit_8u(negative, ok, 4, plan, init));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriResizeLinearInit_64f({1, 10}, ok, plan));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriResizeCubicInit_8u({10, 3}, ok, 0, 0.5f, plan, init));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriResizeAntialiasingCubicInit({3, 10}, ok, 0, 0.5f, plan, init));
    for (uint32_t lobes : {0u, 1u, 4u, 0x80000002u}) {
        QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, out, qoriResizeLanczosInit_16s({3, 3}, ok, lobes, plan, init));
        QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, out,
                           qoriResizeAntialiasingLanczosInit({3, 3}, ok, lobes, plan, init));
    }
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriResizeLanczosInit_32f({3, 10}, ok, 2, plan, init));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriResizeAntialiasingLanczosInit({10, 5}, ok, 3, plan, init));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriResizeSuperInit_8u({10, 9}, ok, plan));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriResizeSuperInit_16u({9, 10}, ok, plan));
}

/// A plan of 20 x 20 to 12 x 15, and the arguments of a call with it that fits.
struct Fixture {
    const QorResizePlan* plan;
    TestImage src, dst, memory;

    explicit Fixture(const Method& m)
        : plan(makePlan<uint8_t>(m, {20, 20}, {12, 15})),
          src(kSrc, {.width = 20, .height = 20}, 1),
          dst(kDst, {.width = 64, .height = 40}, 1),
          memory(block(kBuffer, 1 << 17)) {
        src.fill<uint8_t>(1, [] { return random().value<uint8_t>(); });
    }
    template <class Function>
    QorResult run(Function function, QorPoint2D offset, QorImageSize size, int32_t border = borderReplicate) const {
        return operate<uint8_t>(function, src.data<uint8_t>(), src.step(), dst.data<uint8_t>(), dst.step(), offset,
                                size, border, plan, memory.data<uint8_t>());
    }
};

TEST(Resize, OperationsCheckInOrder) {
    const Fixture f({.interpolation = interpLinear});
    const auto linear = qoriResizeLinear_8u_C1R;
    const auto* s = f.src.data<uint8_t>();
    auto *d = f.dst.data<uint8_t>(), *b = f.memory.data<uint8_t>();
    const QorImageSize ok{12, 15}, none{0, -1};
    const QorPoint2D zero{0, 0}, outside{12, 0};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, linear(nullptr, 20, d, 64, outside, none, 2, nullptr, f.plan, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, linear(s, 20, nullptr, 64, outside, none, 2, nullptr, f.plan, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, linear(s, 20, d, 64, outside, none, 2, nullptr, nullptr, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, linear(s, 20, d, 64, outside, none, 2, nullptr, f.plan, nullptr));
    QORI_EXPECT_STATUS(QOR_WARN_NOTHING_TO_DO, f.dst, f.run(linear, outside, none, 2));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, f.dst, f.run(linear, outside, {4, -1}, 2));
    const QorPoint2D badOffsets[] = {{-1, 0}, {0, -1}, outside, {0, 15}, {INT32_MIN, 0}};
    for (QorPoint2D bad : badOffsets) QORI_EXPECT_STATUS(QOR_ERR_OUT_OF_RANGE, f.dst, f.run(linear, bad, ok, 2));
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, f.dst, f.run(qoriResizeCubic_8u_C1R, zero, ok, 0x100));
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, f.dst, f.run(qoriResizeNearest_8u_C1R, zero, ok));
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, f.dst, f.run(qoriResizeAntialiasing_8u_C1R, zero, ok));
    for (int32_t bad : {8, 9, 0x101, -1, 1 << 30})
        QORI_EXPECT_STATUS(QOR_ERR_BORDER, f.dst, f.run(linear, zero, ok, bad));
    for (int32_t bad : {0, 2, 3, 4, 5, 7, 0xF0, 0x10})
        QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, f.dst, f.run(linear, zero, ok, bad));
    const Fixture widened({.interpolation = interpLinear, .antialiasing = true});
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, widened.dst, widened.run(linear, zero, ok));
    // Another tag: nothing takes the block for a plan, and the tag is looked at before the size.
    const TestImage other = block(kPlanCopy, 1024);
    auto* fake = other.data<QorResizePlan>();
    QORI_EXPECT_STATUS(QOR_WARN_NOTHING_TO_DO, f.dst, linear(s, 20, d, 64, zero, {3, 0}, 1, nullptr, fake, b));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, f.dst, linear(s, 20, d, 64, outside, {3, -1}, 1, nullptr, fake, b));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, f.dst, qoriResizeSuper_8u_C1R(s, 20, d, 64, outside, {3, -1}, fake, b));
}

TEST(Resize, QueriesOfAPlanCheckInOrder) {
    const Fixture f({.interpolation = interpCubic});
    const TestImage other = block(kPlanCopy, 1024), out = block(kInit, 64);
    auto* fake = other.data<QorResizePlan>();
    auto* bytes = out.data<int32_t>();
    const auto size = [&](const QorResizePlan* plan, QorImageSize tile, int32_t channels) {
        return qoriResizeGetBufferSize_16u(plan, tile, channels, bytes);
    };
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, size(nullptr, {0, 1}, 3));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriResizeGetBufferSize_8u(fake, {0, 1}, 3, nullptr));
    QORI_EXPECT_STATUS(QOR_WARN_NOTHING_TO_DO, out, size(fake, {0, 1}, 2));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, out, size(fake, {-1, 1}, 2));
    for (int32_t channels : {0, 2, 5, -1})
        QORI_EXPECT_STATUS(QOR_ERR_CHANNELS_UNSUPPORTED, out, size(f.plan, {-1, 1}, channels));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, size(f.plan, {1, -1}, 3));
    EXPECT_EQ(QOR_OK, size(f.plan, {12, 15}, 3));
    EXPECT_EQ(QOR_WARN_ADJUSTED, size(f.plan, {13, 15}, 3));
    EXPECT_EQ(QOR_WARN_ADJUSTED, size(f.plan, {12, 16}, 3));
    auto* border = out.data<QorBorderExtent>();
    auto* point = out.data<QorPoint2D>();
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriResizeGetBorderSize_8u(nullptr, border));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, out, qoriResizeGetBorderSize_8u(fake, border));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriResizeGetSrcOffset_32f(fake, {0, 0}, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, out, qoriResizeGetSrcOffset_32f(fake, {-1, 0}, point));
    const QorPoint2D badOffsets[] = {{-1, 0}, {0, -1}, {12, 0}, {0, 15}};
    for (QorPoint2D bad : badOffsets)
        QORI_EXPECT_STATUS(QOR_ERR_OUT_OF_RANGE, out, qoriResizeGetSrcOffset_32f(f.plan, bad, point));
    auto* rects = out.data<QorImageRect>();
    const auto roi = [&](const QorResizePlan* plan, QorImageRect rect) {
        return qoriResizeGetSrcRoi_16s(plan, rect, rects, rects + 1);
    };
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, roi(nullptr, {0, 0, 0, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, roi(fake, {-1, 0, 0, 1}));
    QORI_EXPECT_STATUS(QOR_ERR_CONTEXT, out, roi(fake, {-1, 0, 1, 1}));
    QORI_EXPECT_STATUS(QOR_ERR_OUT_OF_RANGE, out, roi(f.plan, {-1, 0, 1, 1}));
    QORI_EXPECT_STATUS(QOR_ERR_OUT_OF_RANGE, out, roi(f.plan, {0, 15, 1, 1}));
    ASSERT_EQ(QOR_OK, roi(f.plan, {10, 3, 500, INT32_MAX}));
    EXPECT_EQ(2, rects[1].width);
    EXPECT_EQ(12, rects[1].height);
}

TEST(Resize, TilesBeyondTheDestinationAreTrimmed) {
    const Fixture f({.interpolation = interpNearest});
    const Snapshot untouched = f.dst.snapshot();
    EXPECT_EQ(QOR_WARN_ADJUSTED, f.run(qoriResizeNearest_8u_C1R, {0, 0}, {13, 15}));
    EXPECT_EQ(QOR_WARN_ADJUSTED, f.run(qoriResizeNearest_8u_C1R, {0, 0}, {12, 40}));
    EXPECT_EQ(QOR_OK, f.run(qoriResizeNearest_8u_C1R, {5, 0}, {12, 15}));
    Snapshot expected = f.dst.snapshot();  // only the plan's 12 x 15 pixels may differ
    const auto now = expected.view<uint8_t>(1), before = const_cast<Snapshot&>(untouched).view<uint8_t>(1);
    for (int y = 0; y < 15; ++y)
        for (int x = 0; x < 12; ++x) now.set(x, y, 0, before.get(x, y));
    EXPECT_EQ(untouched.bytes, expected.bytes);
}
}  // namespace
}  // namespace qori::test
