// SPDX-License-Identifier: Apache-2.0
#include "extreme_cases.h"

namespace qori::test {
namespace {

Mask rectangle(QorImageSize size, QorPoint2D anchor) {
    return makeMask(size, anchor, [](int, int) { return true; });
}

Mask drawRectangle(QorImageSize largest) {
    const QorImageSize size{1 + random().below(largest.width), 1 + random().below(largest.height)};
    return rectangle(size, drawAnchor(size));
}

template <class T, Layout L, Kind kind, bool largest, class Function>
void checkRectangle(const Shape& shape, const Mask& mask, Function function) {
    SCOPED_TRACE(describe(mask));
    checkWindow<T, T, L, kind>(
        shape, mask.around(),
        [&](const T* src, int32_t srcStep, T* dst, int32_t dstStep, QorImageSize roi) {
            if constexpr (kind == Kind::IR)
                return call(function, dst, dstStep, dst, dstStep, roi, mask.size, mask.anchor);
            else
                return call(function, src, srcStep, dst, dstStep, roi, mask.size, mask.anchor);
        },
        [&](auto pixel) { return extremeUnder<T, largest>(mask, pixel); }, ExtremeElement<T>{});
}

template <class T, Layout L, bool largest, class Function>
void sweepRectangles(const char* name, Function function) {
    const auto check = [=](const Shape& shape, QorImageSize mostMask) {
        const Mask mask = drawRectangle(mostMask);
        if (std::is_floating_point_v<T> && mask.count() == 1) return;
        checkRectangle<T, L, Kind::R, largest>(shape, mask, function);
        if (shape.height == 2) checkRectangle<T, L, Kind::IR, largest>(shape, mask, function);
    };
    forShapes(extremeShapes(), [=](const Shape& shape) {
        check(shape, {8, 8});
        check(shape, {random().oneIn(4) ? 67 : 12, random().oneIn(4) ? 37 : 9});
        const Mask square = rectangle({3, 3}, random().oneIn(2) ? QorPoint2D{1, 1} : drawAnchor({3, 3}));
        checkRectangle<T, L, Kind::R, largest>(shape, square, function);
        checkRectangle<T, L, Kind::IR, largest>(shape, square, function);
    });
    checkRectangle<T, L, Kind::R, largest>(kTiled, rectangle({5, 9}, {1, 8}), function);
    checkRectangle<T, L, Kind::R, largest>(kTiled, rectangle({30, 3}, {0, 0}), function);
    checkRectangle<T, L, Kind::R, largest>(kWholePages, rectangle({9, 4}, {8, 0}), function);
    markSwept(name);
}

template <class S, Layout L, class Function>
void filterMin(const char* name, Function function) {
    sweepRectangles<S, L, false>(name, function);
}
template <class S, Layout L, class Function>
void filterMax(const char* name, Function function) {
    sweepRectangles<S, L, true>(name, function);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(RectangleSweep, name) { operation<S, Layout::SL>(#name, &name); }
#include "members/filter_extreme.inc"
#undef QORI_MEMBER

TEST(FilterExtreme, EverySizeAndAnchorRow) {
    for (int width = 1; width <= 70; ++width) {
        const QorImageSize size{width, 1 + width * 7 % 23};
        const Mask mask = rectangle(size, {width * 3 % width, size.height - 1});
        checkRectangle<uint8_t, Layout::C1, Kind::R, true>({.width = 50, .height = 30}, mask, qoriFilterMax_8u_C1R);
        const Mask turned = rectangle({size.height, size.width}, {size.height - 1, width / 2});
        checkRectangle<int16_t, Layout::C3, Kind::R, false>({.width = 11, .height = 30}, turned, qoriFilterMin_16s_C3R);
        if (HasFailure()) return;
    }
}

/// Pixels of every number of bytes, by windows wider than what is joined tap by tap, and regions narrower than a
/// vector.
TEST(FilterExtreme, WideWindowsOfAllPixels) {
    for (int width : {17, 32, 33, 65, 17 + random().below(50)})
        for (const Shape& shape : {Shape{.width = 1 + random().below(40), .height = 2},
                                   Shape{.width = 41 + random().below(40), .height = 3, .shift = 1}}) {
            const Mask mask = rectangle({width, 1 + random().below(3)}, {random().below(width), 0});
            checkRectangle<uint8_t, Layout::C3, Kind::R, false>(shape, mask, qoriFilterMin_8u_C3R);
            checkRectangle<uint8_t, Layout::AC4, Kind::R, true>(shape, mask, qoriFilterMax_8u_AC4R);
            checkRectangle<uint16_t, Layout::C1, Kind::R, false>(shape, mask, qoriFilterMin_16u_C1R);
            checkRectangle<int16_t, Layout::C4, Kind::R, true>(shape, mask, qoriFilterMax_16s_C4R);
            checkRectangle<float, Layout::C1, Kind::R, true>(shape, mask, qoriFilterMax_32f_C1R);
            checkRectangle<float, Layout::C3, Kind::R, false>(shape, mask, qoriFilterMin_32f_C3R);
            checkRectangle<float, Layout::C4, Kind::R, true>(shape, mask, qoriFilterMax_32f_C4R);
            if (HasFailure()) return;
        }
}

/// Bit by bit, signalling NaNs included.
TEST(FilterExtreme, OnePixelCopies) {
    const auto asBits = [](const uint32_t* src, int32_t srcStep, uint32_t* dst, int32_t dstStep, QorImageSize roi,
                           QorImageSize size, QorPoint2D anchor) {
        return qoriFilterMax_32f_AC4R(reinterpret_cast<const float*>(src), srcStep, reinterpret_cast<float*>(dst),
                                      dstStep, roi, size, anchor);
    };
    for (int width : {1, 2, 7, 40})
        checkRectangle<uint32_t, Layout::AC4, Kind::R, true>({.width = width, .height = 3}, rectangle({1, 1}, {0, 0}),
                                                             asBits);
}

TEST(FilterExtreme, ChecksInOrder) {
    const TestImage src(0, {.width = 14, .height = 8}, 1), dst(1, {.width = 14, .height = 8}, 1);
    const uint8_t *s = src.data<uint8_t>() + 30, *none = nullptr;
    uint8_t *d = dst.data<uint8_t>(), *nowhere = nullptr;
    const QorImageSize ok{10, 4}, empty{0, 4}, mask{5, 3}, noMask{0, 3};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterMin_8u_C1R(none, 0, d, 0, empty, noMask, {5, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterMin_8u_C1R(s, 0, nowhere, 0, empty, noMask, {5, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriFilterMin_8u_C1R(s, 0, d, 0, empty, noMask, {5, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterMin_8u_C1R(s, 0, d, 10, ok, noMask, {5, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterMin_8u_C1R(s, 14, d, -1, ok, noMask, {5, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, qoriFilterMin_8u_C1R(s, 14, d, 10, ok, noMask, {5, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, qoriFilterMin_8u_C1R(s, 14, d, 10, ok, {5, -3}, {5, 0}));
    for (QorPoint2D wrong : {QorPoint2D{5, 1}, {-1, 1}, {2, 3}, {2, -1}})
        QORI_EXPECT_STATUS(QOR_ERR_ANCHOR, dst, qoriFilterMin_8u_C1R(s, 14, d, 10, ok, mask, wrong));
    // Steps are not held against the width: rows may overlap.
    EXPECT_EQ(QOR_OK, qoriFilterMin_8u_C1R(s, 1, d, 1, {4, 1}, mask, {2, 1}));
}

TEST(FilterExtreme, WorksOnWithoutMemory) {
    const Mask mask = rectangle({31, 61}, {30, 0});
    const Shape shape{.width = 2000, .height = 5};
    qorTestFailAllocation(1);
    checkRectangle<uint8_t, Layout::C1, Kind::R, true>(shape, mask, qoriFilterMax_8u_C1R);
    qorTestFailAllocation(0);
    qorTestFailAllocation(1);
    checkRectangle<uint8_t, Layout::C1, Kind::IR, true>({.width = 90, .height = 5}, rectangle({3, 3}, {1, 1}),
                                                        qoriFilterMax_8u_C1R);
    qorTestFailAllocation(0);
    const TestImage image(0, {.width = 2000, .height = 1200}, 1), dst(1, {.width = 100, .height = 1}, 1);
    image.fill<uint8_t>(1, AnyValue<uint8_t>{});
    const auto tall = [&] {
        return qoriFilterMax_8u_C1R(image.data<uint8_t>(), 2000, dst.data<uint8_t>(), 100, {100, 1}, {1, 1200}, {0, 0});
    };
    qorTestFailAllocation(1);
    QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, dst, tall());
    EXPECT_EQ(QOR_OK, tall());
    qorTestFailAllocation(1);
    QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, image,
                       qoriFilterMax_8u_C1R(image.data<uint8_t>() + 2000 * 61, 2000, image.data<uint8_t>() + 2000 * 61,
                                            2000, {1900, 2}, mask.size, {0, 60}));
    qorTestFailAllocation(0);
}

}  // namespace
}  // namespace qori::test
