// SPDX-License-Identifier: Apache-2.0
#include "extreme_cases.h"

namespace qori::test {
namespace {

template <class T, Layout L, Kind kind, bool largest, class Function>
void checkMask(const Shape& shape, const Mask& mask, Function function) {
    const TestImage block(2, {.width = std::max(1, static_cast<int>(mask.bytes.size())), .height = 1}, 1);
    std::copy(mask.bytes.begin(), mask.bytes.end(), block.data<uint8_t>());
    const uint8_t* const bytes = block.data<uint8_t>();
    checkWindow<T, T, L, kind>(
        shape, mask.around(),
        [&](const T* src, int32_t srcStep, T* dst, int32_t dstStep, QorImageSize roi) {
            if constexpr (kind == Kind::IR)
                return call(function, dst, dstStep, roi, bytes, mask.size, mask.anchor);
            else
                return call(function, src, srcStep, dst, dstStep, roi, bytes, mask.size, mask.anchor);
        },
        [&](auto pixel) { return extremeUnder<T, largest>(mask, pixel); }, ExtremeElement<T>{});
    if (testing::Test::HasFailure()) ADD_FAILURE() << describe(mask);
}

/// A single pixel is copied, whatever bits a float has.
template <class T>
bool isExtreme(const Mask& mask) {
    return std::is_integral_v<T> || mask.count() > 1;
}

template <class T, Layout L, Kind kind, bool largest, class Function>
void sweepMasks(const char* name, Function function) {
    const auto check = [=](const Shape& shape, QorImageSize mostMask) {
        const Mask mask = drawMask(mostMask);
        if (isExtreme<T>(mask)) checkMask<T, L, kind, largest>(shape, mask, function);
    };
    forShapes(extremeShapes(), [=](const Shape& shape) {
        check(shape, {6, 6});
        check(shape, {random().oneIn(4) ? 37 : 12, random().oneIn(4) ? 31 : 9});
    });
    if constexpr (kind == Kind::R) {
        const auto inPlace = [=](T* image, int32_t step, QorImageSize roi, auto... structure) {
            return function(image, step, image, step, roi, structure...);
        };
        for (int width : {1, 13, 70})
            if (const Mask mask = drawMask({9, 9}); isExtreme<T>(mask))
                checkMask<T, L, Kind::IR, largest>({.width = width, .height = 11, .padding = 2}, mask, inPlace);
        checkMask<T, L, kind, largest>(kTiled, makeMask({5, 9}, {1, 8}, [](int, int) { return true; }), function);
        checkMask<T, L, kind, largest>(kTiled, makeMask({9, 5}, {8, 0}, [](int x, int y) { return (x ^ y) & 1; }),
                                       function);
    }
    markSwept(name);
}

template <class S, Layout L, class Function>
void erode(const char* name, Function function) {
    sweepMasks<S, L,
               std::is_invocable_v<Function, S*, int32_t, QorImageSize, const uint8_t*, QorImageSize, QorPoint2D>
                   ? Kind::IR
                   : Kind::R,
               false>(name, function);
}
template <class S, Layout L, class Function>
void dilate(const char* name, Function function) {
    sweepMasks<S, L,
               std::is_invocable_v<Function, S*, int32_t, QorImageSize, const uint8_t*, QorImageSize, QorPoint2D>
                   ? Kind::IR
                   : Kind::R,
               true>(name, function);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(MaskSweep, name) { operation<S, Layout::SL>(#name, &name); }
#include "members/morphology_mask.inc"
#undef QORI_MEMBER

TEST(MorphologyMask, EverySmallMask) {
    for (int pattern = 1; pattern < 512; ++pattern) {
        const Mask mask =
            makeMask({3, 3}, {pattern % 3, pattern / 3 % 3}, [=](int x, int y) { return pattern >> (3 * y + x) & 1; });
        const Shape shape{.width = 1 + pattern % 7, .height = 1 + pattern % 4};
        checkMask<uint8_t, Layout::C1, Kind::R, false>(shape, mask, qoriErode_8u_C1R);
        checkMask<uint8_t, Layout::C1, Kind::IR, true>(shape, mask, qoriDilate_8u_C1IR);
        if (mask.count() > 1) checkMask<float, Layout::C1, Kind::R, true>(shape, mask, qoriDilate_32f_C1R);
        if (HasFailure()) return;
    }
}

TEST(MorphologyMask, LargeMasks) {
    for (int i = 0; i < 150; ++i) {
        const Mask mask = drawMask({80, 70});
        const Shape shape{.width = 1 + random().below(90), .height = 1 + random().below(30)};
        checkMask<uint8_t, Layout::C1, Kind::R, true>(shape, mask, qoriDilate_8u_C1R);
        checkMask<uint8_t, Layout::C1, Kind::IR, false>(shape, mask, qoriErode_8u_C1IR);
        if (mask.count() > 1) checkMask<float, Layout::C1, Kind::IR, false>(shape, mask, qoriErode_32f_C1IR);
        if (HasFailure()) return;
    }
}

/// The image ends where the mask's bytes that count do; its margins of zeros lie beyond the guard page.
TEST(MorphologyMask, ReadsNothingUnderMarginsOfZeros) {
    const Mask mask = makeMask({9, 7}, {0, 6}, [](int x, int y) { return x >= 2 && x < 5 && y >= 1 && y < 3; });
    const Shape region{.width = 40, .height = 6};
    for (bool atBegin : {false, true}) {
        const TestImage src(0, {.width = 42, .height = 7, .padding = 6, .atBegin = atBegin}, 1), dst(1, region, 1);
        src.fill<uint8_t>(1, AnyValue<uint8_t>{});
        // The first byte that counts, of the first window, is the image's first.
        const uint8_t* const origin = src.data<uint8_t>() - 2 + 5 * src.step();
        Snapshot expected = dst.snapshot();
        for (int y = 0; y < region.height; ++y)
            for (int x = 0; x < region.width; ++x)
                expected.view<uint8_t>(1).set(x, y, 0, extremeUnder<uint8_t, false>(mask, [&](int dx, int dy) {
                                                  return origin[(y + dy) * src.step() + x + dx];
                                              }));
        EXPECT_EQ(QOR_OK, qoriErode_8u_C1R(origin, src.step(), dst.data<uint8_t>(), dst.step(), region.roi(),
                                           mask.bytes.data(), mask.size, mask.anchor));
        QORI_EXPECT_UNCHANGED(dst, expected);
    }
}

/// Bit by bit, signalling NaNs included.
TEST(MorphologyMask, OnePixelCopies) {
    const auto asBits = [](auto function) {
        return [=](const uint32_t* src, int32_t srcStep, uint32_t* dst, int32_t dstStep, QorImageSize roi,
                   const uint8_t* bytes, QorImageSize size, QorPoint2D anchor) {
            return function(reinterpret_cast<const float*>(src), srcStep, reinterpret_cast<float*>(dst), dstStep, roi,
                            bytes, size, anchor);
        };
    };
    for (int i = 0; i < 40; ++i) {
        const int x0 = random().below(4), y0 = random().below(3);
        const Mask mask = makeMask({4, 3}, drawAnchor({4, 3}), [=](int x, int y) { return x == x0 && y == y0; });
        const Shape shape{.width = 1 + i, .height = 3};
        checkMask<uint32_t, Layout::C3, Kind::R, false>(shape, mask, asBits(qoriErode_32f_C3R));
        checkMask<uint32_t, Layout::AC4, Kind::R, true>(shape, mask, asBits(qoriDilate_32f_AC4R));
    }
}

TEST(MorphologyMask, ChecksInOrder) {
    const TestImage src(0, {.width = 14, .height = 8}, 1), dst(1, {.width = 14, .height = 8}, 1);
    const uint8_t *s = src.data<uint8_t>() + 30, *none = nullptr;
    uint8_t *d = dst.data<uint8_t>(), *nowhere = nullptr;
    const uint8_t ones[15] = {1, 255, 3, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1}, zeros[15] = {};
    const QorImageSize ok{10, 4}, empty{0, 4}, mask{5, 3}, noMask{5, 0};
    const QorPoint2D middle{2, 1}, outside{5, 1};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriErode_8u_C1R(s, 0, d, 0, empty, none, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriErode_8u_C1R(none, 0, d, 0, empty, zeros, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriErode_8u_C1R(none, 0, nowhere, 0, empty, zeros, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriErode_8u_C1R(s, 14, d, 0, empty, zeros, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriErode_8u_C1R(s, -14, d, 10, empty, zeros, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriErode_8u_C1R(s, 1, d, 1, empty, zeros, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, qoriErode_8u_C1R(s, 1, d, 1, ok, zeros, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, qoriErode_8u_C1R(s, 1, d, 1, ok, zeros, {0, 3}, outside));
    QORI_EXPECT_STATUS(QOR_ERR_ZERO_MASK, dst, qoriErode_8u_C1R(s, 1, d, 1, ok, zeros, mask, outside));
    for (QorPoint2D wrong : {QorPoint2D{5, 1}, {-1, 1}, {2, 3}, {2, -1}, {INT32_MIN, INT32_MAX}})
        QORI_EXPECT_STATUS(QOR_ERR_ANCHOR, dst, qoriErode_8u_C1R(s, 1, d, 1, ok, ones, mask, wrong));
    QORI_EXPECT_STATUS(QOR_ERR_STEP_TOO_SMALL, dst, qoriErode_8u_C1R(s, 13, d, 10, ok, ones, mask, middle));
    QORI_EXPECT_STATUS(QOR_ERR_STEP_TOO_SMALL, dst, qoriErode_8u_C1R(s, 14, d, 9, ok, ones, mask, middle));
    QORI_EXPECT_STATUS(QOR_ERR_STEP_TOO_SMALL, dst, qoriErode_8u_C1R(s, 14, d, 10, {INT32_MAX, 1}, ones, mask, middle));
    EXPECT_EQ(QOR_OK, qoriErode_8u_C1R(s, 14, d, 10, ok, ones, mask, middle));
    // In place, however it is named: the step holds the windows.
    QORI_EXPECT_STATUS(QOR_ERR_STEP_TOO_SMALL, dst, qoriErode_8u_C1R(d, 13, d, 13, ok, ones, mask, middle));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriDilate_8u_C1IR(d, 0, empty, none, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriDilate_8u_C1IR(nowhere, 0, empty, zeros, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriDilate_8u_C1IR(d, 0, empty, zeros, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriDilate_8u_C1IR(d, 1, empty, zeros, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, qoriDilate_8u_C1IR(d, 1, ok, zeros, noMask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_ZERO_MASK, dst, qoriDilate_8u_C1IR(d, 1, ok, zeros, mask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_ANCHOR, dst, qoriDilate_8u_C1IR(d, 1, ok, ones, mask, outside));
    QORI_EXPECT_STATUS(QOR_ERR_STEP_TOO_SMALL, dst, qoriDilate_8u_C1IR(d, 13, ok, ones, mask, middle));
}

/// Masks of up to 32 elements need no memory, larger ones do, as everything in place may.
TEST(MorphologyMask, AnswersFailedAllocations) {
    for (int height : {4, 5}) {
        const Mask mask = makeMask({8, height}, {3, 2}, [](int x, int y) { return (x + y) % 3 != 0; });
        const Shape shape{.width = 3000, .height = 5};
        const TestImage image(0, withAround(shape, mask.around()), 4), dst(1, shape, 4);
        image.fill<float>(1, ExtremeElement<float>{});
        const float* const inside = image.data<float>() + 2 * image.step() / 4 + 3;
        const auto run = [&] {
            return qoriErode_32f_C1R(inside, image.step(), dst.data<float>(), dst.step(), shape.roi(),
                                     mask.bytes.data(), mask.size, mask.anchor);
        };
        qorTestFailAllocation(1);
        if (height == 5) {
            QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, dst, run());
            EXPECT_EQ(QOR_OK, run());
            continue;
        }
        EXPECT_EQ(QOR_OK, run());
        const Snapshot narrowTiles = dst.snapshot();
        qorTestFailAllocation(0);
        dst.fill<float>(1, [] { return 0.0F; });
        EXPECT_EQ(QOR_OK, run());
        QORI_EXPECT_UNCHANGED(dst, narrowTiles);
        float* const image3 = const_cast<float*>(inside);
        qorTestFailAllocation(1);
        QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, image,
                           qoriDilate_32f_C1R(image3, image.step(), image3, image.step(), shape.roi(),
                                              mask.bytes.data(), mask.size, mask.anchor));
    }
    qorTestFailAllocation(0);
}

}  // namespace
}  // namespace qori::test
