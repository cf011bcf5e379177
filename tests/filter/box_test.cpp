// SPDX-License-Identifier: Apache-2.0
#include "box_cases.h"

namespace qori::test {
namespace {

template <class T, Layout L, Kind kind, class Function>
void checkBox(const Shape& shape, QorImageSize mask, QorPoint2D anchor, Function function) {
    SCOPED_TRACE(testing::Message() << "mask " << mask.width << "x" << mask.height << " at " << anchor.x << ","
                                    << anchor.y);
    checkWindow<T, T, L, kind>(
        shape, Around::ofMask(mask, anchor),
        [=](const T* src, int32_t srcStep, T* dst, int32_t dstStep, QorImageSize roi) {
            if constexpr (kind == Kind::IR)
                return call(function, dst, dstStep, roi, mask, anchor);
            else
                return call(function, src, srcStep, dst, dstStep, roi, mask, anchor);
        },
        [=](auto pixel) { return boxMean<T>(mask, [=](int i, int j) { return pixel(i - anchor.x, j - anchor.y); }); },
        drawExact<T>);
}

QorPoint2D drawAnchor(QorImageSize mask) { return {random().below(mask.width), random().below(mask.height)}; }

template <class T, Layout L, Kind kind, class Function>
void sweepBox(const char* name, Function function) {
    const std::vector<QorImageSize>& masks = boxMasks();
    size_t turn = 0;
    forShapes(windowShapes(), [&](const Shape& shape) {
        const QorImageSize mask = masks[turn++ % masks.size()];
        checkBox<T, L, kind>(shape, mask, {(mask.width - 1) / 2, (mask.height - 1) / 2}, function);
    });
    // Every mask at widths around the vectors, anchors anywhere: at the edges of the mask too.
    for (const QorImageSize mask : masks)
        for (int width : {1, 15, 33, 70}) {
            const Shape shape{.width = width, .height = 1 + random().below(12), .padding = 3, .atBegin = width == 33};
            for (const QorPoint2D anchor :
                 {QorPoint2D{0, 0}, QorPoint2D{mask.width - 1, mask.height - 1}, drawAnchor(mask)})
                checkBox<T, L, kind>(shape, mask, anchor, function);
        }
    // Several blocks of columns, and more rows than a block of the window's height.
    checkBox<T, L, kind>({.width = 1030, .height = 6}, {3, 3}, {1, 1}, function);
    checkBox<T, L, kind>({.width = 2049, .height = 3, .padding = 5}, {3, 3}, {1, 1}, function);
    checkBox<T, L, kind>({.width = 37, .height = 45}, {11, 12}, {5, 5}, function);
    if constexpr (kind == Kind::R) {
        const auto inPlace = [=](T* image, int32_t step, QorImageSize roi, QorImageSize mask, QorPoint2D anchor) {
            return function(image, step, image, step, roi, mask, anchor);
        };
        for (const QorImageSize mask : {QorImageSize{3, 3}, QorImageSize{9, 12}, QorImageSize{40, 2}})
            checkBox<T, L, Kind::IR>({.width = 35, .height = 17}, mask, drawAnchor(mask), inPlace);
    }
    markSwept(name);
}

template <class S, Layout L, class Function>
void filterBox(const char* name, Function function) {
    sweepBox<S, L, Kind::R>(name, function);
}
template <class S, Layout L, class Function>
void filterBoxInPlace(const char* name, Function function) {
    sweepBox<S, L, Kind::IR>(name, function);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(BoxSweep, name) { operation<S, Layout::SL>(#name, &name); }
#include "members/box.inc"
#undef QORI_MEMBER

/// One row of windows whose sums are all there are, in a box of bytes.
void checkEverySum(QorImageSize mask, int64_t multiplier, int shift) {
    const int area = mask.width * mask.height, sums = 255 * area + 1;
    // Windows beside each other that share no column.
    const TestImage src(0, {.width = sums * mask.width, .height = mask.height}, 1),
        dst(1, {.width = sums * mask.width}, 1);
    const View<uint8_t> pixels = src.view<uint8_t>(1);
    for (int sum = 0; sum < sums; ++sum) {
        int left = sum;
        for (int i = 0; i < area; ++i) {
            const int value = std::min(left, 255);
            pixels.set(sum * mask.width + i % mask.width, i / mask.width, 0, static_cast<uint8_t>(value));
            left -= value;
        }
    }
    const QorImageSize roi{(sums - 1) * mask.width + 1, 1};
    ASSERT_EQ(QOR_OK, call(qoriFilterBox_8u_C1R, src.data<const uint8_t>(), src.step(), dst.data<uint8_t>(), dst.step(),
                           roi, mask, QorPoint2D{0, 0}));
    int wrong = 0, wrongByFormula = 0;
    for (int sum = 0; sum < sums; ++sum) {
        const int mean = dst.view<uint8_t>(1).get(sum * mask.width, 0);
        wrong += mean != reference::meanOf<uint8_t>(sum, area);
        if (area % 2 == 1) wrong += mean != (2 * sum + area) / (2 * area);
        if (multiplier != 0)
            wrongByFormula += mean != static_cast<int>((sum * multiplier + (int64_t{1} << (shift - 1))) >> shift);
    }
    EXPECT_EQ(0, wrong) << mask.width << "x" << mask.height;
    EXPECT_EQ(0, wrongByFormula) << mask.width << "x" << mask.height;
}

TEST(Box, BytesRoundEverySum) {
    checkEverySum({3, 3}, 29128, 18);
    checkEverySum({5, 5}, 671088, 24);
    checkEverySum({7, 7}, 342392, 24);
    for (const QorImageSize mask : {QorImageSize{1, 1}, QorImageSize{2, 1}, QorImageSize{2, 2}, QorImageSize{4, 3},
                                    QorImageSize{7, 6}, QorImageSize{16, 16}, QorImageSize{15, 15}})
        checkEverySum(mask, 0, 0);
}

/// The middle of 3 x 3, which has a kernel of its own.
TEST(Box, BytesRoundEverySumOfTheSquare) {
    constexpr int kSums = 255 * 9 + 1;
    const TestImage src(0, {.width = kSums * 3, .height = 3}, 1), dst(1, {.width = kSums * 3 - 2}, 1);
    for (int sum = 0; sum < kSums; ++sum)
        for (int i = 0, left = sum; i < 9; ++i) {
            src.view<uint8_t>(1).set(3 * sum + i % 3, i / 3, 0, static_cast<uint8_t>(std::min(left, 255)));
            left -= std::min(left, 255);
        }
    EXPECT_EQ(QOR_OK,
              call(qoriFilterBox_8u_C1R, src.data<const uint8_t>() + src.step() + 1, src.step(), dst.data<uint8_t>(),
                   dst.step(), QorImageSize{kSums * 3 - 2, 1}, QorImageSize{3, 3}, QorPoint2D{1, 1}));
    int wrong = 0;
    for (int sum = 0; sum < kSums; ++sum)
        wrong += dst.view<uint8_t>(1).get(3 * sum, 0) != (sum * 29128 + (1 << 17)) >> 18;
    EXPECT_EQ(0, wrong);
}

/// Columns of zeros and of 255, as many as a window has: sums change by all that they can, and reach all of 255.
template <int channels, class Function>
void checkSteepest(Function function, QorImageSize mask) {
    SCOPED_TRACE(testing::Message() << channels << " channels, mask " << mask.width << "x" << mask.height);
    const auto valueAt = [=](int x) { return x / mask.width % 2 == 0 ? 0 : 255; };
    const int width = 2 * mask.width + 210;
    const TestImage src(0, {.width = width + mask.width - 1, .height = mask.height + 1}, channels),
        dst(1, {.width = width, .height = 2}, channels);
    for (int y = 0; y <= mask.height; ++y)
        for (int x = 0; x < width + mask.width - 1; ++x)
            for (int c = 0; c < channels; ++c)
                src.view<uint8_t>(channels).set(x, y, c, static_cast<uint8_t>(valueAt(x + c)));
    ASSERT_EQ(QOR_OK, call(function, src.data<const uint8_t>(), src.step(), dst.data<uint8_t>(), dst.step(),
                           QorImageSize{width, 2}, mask, QorPoint2D{0, 0}));
    int wrong = 0;
    for (int x = 0; x < width; ++x)
        for (int c = 0; c < channels; ++c) {
            int64_t sum = 0;
            for (int i = 0; i < mask.width; ++i) sum += int64_t{valueAt(x + c + i)} * mask.height;
            const int mean = reference::meanOf<uint8_t>(sum, int64_t{mask.width} * mask.height);
            for (int y = 0; y < 2; ++y) wrong += dst.view<uint8_t>(channels).get(x, y, c) != mean;
        }
    EXPECT_EQ(0, wrong);
}

TEST(Box, BytesChangeByAllThatTheyCan) {
    for (const QorImageSize mask : {QorImageSize{9, 64}, QorImageSize{9, 65}, QorImageSize{20, 128},
                                    QorImageSize{700, 46}, QorImageSize{700, 48}, QorImageSize{700, 66}}) {
        checkSteepest<1>(qoriFilterBox_8u_C1R, mask);
        checkSteepest<3>(qoriFilterBox_8u_C3R, mask);
        checkSteepest<4>(qoriFilterBox_8u_C4R, mask);
    }
}

/// Rows of three channels run in pieces of two halves, from some width on.
TEST(Box, ThreeChannelsOfAnyWidth) {
    for (const int width : {63, 64, 65, 79, 80, 100, 511, 512, 513, 600, 1030})
        for (const QorImageSize mask : {QorImageSize{9, 9}, QorImageSize{8, 40}, QorImageSize{67, 3}}) {
            const Shape shape{.width = width, .height = 3, .padding = width % 7};
            checkBox<uint8_t, Layout::C3, Kind::R>(shape, mask, drawAnchor(mask), qoriFilterBox_8u_C3R);
            checkBox<uint8_t, Layout::C3, Kind::IR>(shape, mask, drawAnchor(mask), qoriFilterBox_8u_C3IR);
        }
}

/// Sums beyond 2^24, 2^31 and 2^32: single windows of a constant with one other element.
template <class T, class Function>
void checkLarge(Function function, QorImageSize mask, T value) {
    const TestImage src(0, {.width = mask.width + 1, .height = mask.height}, sizeof(T)),
        dst(1, {.width = 2}, sizeof(T));
    src.fill<T>(1, [=] { return value; });
    src.view<T>(1).set(0, 0, 0, static_cast<T>(value - 1));
    EXPECT_EQ(QOR_OK, call(function, src.data<const T>(), src.step(), dst.data<T>(), dst.step(), QorImageSize{2, 1},
                           mask, QorPoint2D{0, 0}));
    const int64_t area = int64_t{mask.width} * mask.height;
    EXPECT_EQ(reference::meanOf<T>(value * area - 1, area), dst.view<T>(1).get(0, 0)) << area;
    EXPECT_EQ(reference::meanOf<T>(value * area, area), dst.view<T>(1).get(1, 0)) << area;
}

TEST(Box, SumsHaveNoEnd) {
    for (const QorImageSize mask : {QorImageSize{257, 255}, QorImageSize{513, 128}, QorImageSize{300, 300},
                                    QorImageSize{2902, 2902}, QorImageSize{70'000, 128}, QorImageSize{1, 66'000}}) {
        checkLarge<uint8_t>(qoriFilterBox_8u_C1R, mask, 255);
        checkLarge<uint8_t>(qoriFilterBox_8u_C1R, mask, 1);
    }
    for (const QorImageSize mask : {QorImageSize{255, 257}, QorImageSize{65'537, 1}, QorImageSize{65'538, 1},
                                    QorImageSize{2, 1}, QorImageSize{600, 400}, QorImageSize{1, 70'000}}) {
        checkLarge<uint16_t>(qoriFilterBox_16u_C1R, mask, 65535);
        checkLarge<int16_t>(qoriFilterBox_16s_C1R, mask, 32767);
        checkLarge<int16_t>(qoriFilterBox_16s_C1R, mask, -32767);
    }
}

TEST(Box, WordsRoundTiesToEven) {
    int wrong = 0;
    const auto check = [&](auto function, auto first, int area) {
        using T = decltype(first);
        const TestImage src(0, {.width = 4000 + area - 1}, sizeof(T)), dst(1, {.width = 4000}, sizeof(T));
        src.fill<T>(1, [=, value = int{first}]() mutable { return static_cast<T>(value += random().below(3) - 1); });
        EXPECT_EQ(QOR_OK, call(function, src.data<const T>(), src.step(), dst.data<T>(), dst.step(),
                               QorImageSize{4000, 1}, QorImageSize{area, 1}, QorPoint2D{0, 0}));
        for (int x = 0; x < 4000; ++x) {
            const T mean = boxMean<T>({area, 1}, [&](int i, int) { return src.view<T>(1).get(x + i, 0); });
            wrong += mean != dst.view<T>(1).get(x, 0);
        }
    };
    for (int area : {2, 4, 6, 14, 64, 100, 250}) {
        check(qoriFilterBox_16u_C1R, uint16_t{65000}, area);
        check(qoriFilterBox_16s_C1R, int16_t{0}, area);
    }
    EXPECT_EQ(0, wrong);
}

/// Every window of alternating neighbours of any even width is a tie, many of which a product with the reciprocal of
/// the area misses by its rounding.
TEST(Box, WordsRoundEveryTieToEven) {
    int wrong = 0;
    for (int width = 2; width <= 260; width += 2)
        for (int value = 1; value < 65535; value += 1361) {
            const TestImage src(0, {.width = 16 + width, .height = 3}, 2), dst(1, {.width = 17}, 2);
            src.fill<uint16_t>(1, [x = 0, value]() mutable { return static_cast<uint16_t>(value + x++ % 2); });
            EXPECT_EQ(QOR_OK, call(qoriFilterBox_16u_C1R, src.data<const uint16_t>(), src.step(), dst.data<uint16_t>(),
                                   dst.step(), QorImageSize{17, 1}, QorImageSize{width, 3}, QorPoint2D{0, 0}));
            for (int x = 0; x < 17; ++x) wrong += dst.view<uint16_t>(1).get(x, 0) != (value + 1) / 2 * 2;
        }
    EXPECT_EQ(0, wrong);
}

/// Every result within the stated bound of its own window's magnitudes, although others are 10^30 times as large.
template <class T, class Function>
void checkDrift(Function function, QorImageSize mask, int width, int height) {
    const int columns = width + mask.width - 1, rows = height + mask.height - 1;
    const TestImage src(0, {.width = columns, .height = rows}, sizeof(T)),
        dst(1, {.width = width, .height = height}, sizeof(T));
    src.fill<T>(1, [] {
        const T value = drawPixel<T>();
        return random().oneIn(400) ? value * T(1e30) : value;
    });
    ASSERT_EQ(QOR_OK, call(function, src.data<const T>(), src.step(), dst.data<T>(), dst.step(),
                           QorImageSize{width, height}, mask, QorPoint2D{0, 0}));
    const long double area = static_cast<long double>(mask.width) * mask.height;
    int wrong = 0;
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x) {
            reference::WindowSum<T> sum;
            for (int j = 0; j < mask.height; ++j)
                for (int i = 0; i < mask.width; ++i) sum.add(src.view<T>(1).get(x + i, y + j));
            const long double bound = (mask.width + mask.height) * kUnit<T> * sum.magnitudes / area;
            wrong += !(std::abs(dst.view<T>(1).get(x, y) - sum.value / area) <= bound);
        }
    EXPECT_EQ(0, wrong) << mask.width << "x" << mask.height;
}

TEST(Box, FloatsStayWithinTheirWindowsBound) {
    for (const QorImageSize mask : {QorImageSize{3, 3}, QorImageSize{8, 9}, QorImageSize{15, 15}, QorImageSize{61, 7},
                                    QorImageSize{7, 61}, QorImageSize{100, 2}}) {
        checkDrift<float>(qoriFilterBox_32f_C1R, mask, 400, 70);
        checkDrift<double>(qoriFilterBox_64f_C1R, mask, 90, 70);
    }
}

/// What is no number, or infinite, does not outlive its windows.
TEST(Box, FloatsForgetWhatHasLeft) {
    const TestImage src(0, {.width = 120, .height = 60}, 4), dst(1, {.width = 110, .height = 50}, 4);
    src.fill<float>(1, [] { return 3.0f; });
    src.view<float>(1).set(40, 30, 0, std::numeric_limits<float>::quiet_NaN());
    src.view<float>(1).set(80, 20, 0, std::numeric_limits<float>::infinity());
    for (const QorImageSize mask : {QorImageSize{11, 11}, QorImageSize{3, 3}}) {
        EXPECT_EQ(QOR_OK, call(qoriFilterBox_32f_C1R, src.data<const float>(), src.step(), dst.data<float>(),
                               dst.step(), QorImageSize{110, 50}, mask, QorPoint2D{0, 0}));
        const auto sees = [&](int x, int y, int px, int py) {
            return x <= px && px < x + mask.width && y <= py && py < y + mask.height;
        };
        int wrong = 0;
        for (int y = 0; y < 50; ++y)
            for (int x = 0; x < 110; ++x) {
                const float mean = dst.view<float>(1).get(x, y);
                wrong += sees(x, y, 40, 30) ? !std::isnan(mean) : sees(x, y, 80, 20) ? !std::isinf(mean) : mean != 3;
            }
        EXPECT_EQ(0, wrong);
    }
}

TEST(Box, ChecksInOrder) {
    const TestImage src(0, {.width = 12, .height = 6}, 1), dst(1, {.width = 10, .height = 6}, 1);
    const uint8_t *s = src.data<uint8_t>() + 13, *noSource = nullptr;
    uint8_t *d = dst.data<uint8_t>(), *none = nullptr;
    const QorImageSize ok{10, 4}, empty{0, 4}, mask{3, 3}, flat{3, 0}, thin{0, 3};
    const QorPoint2D mid{1, 1};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterBox_8u_C1R(noSource, 0, d, 0, empty, flat, mid));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterBox_8u_C1R(s, 0, none, 0, empty, flat, mid));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterBox_8u_C1R(s, 0, d, 10, empty, flat, mid));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterBox_8u_C1R(s, 12, d, -10, empty, flat, mid));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriFilterBox_8u_C1R(s, 12, d, 10, empty, flat, mid));
    QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, qoriFilterBox_8u_C1R(s, 12, d, 10, ok, flat, {0, -1}));
    QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, qoriFilterBox_8u_C1R(s, 12, d, 10, ok, thin, {-1, 0}));
    for (const QorPoint2D anchor : {QorPoint2D{3, 0}, QorPoint2D{0, 3}, QorPoint2D{-1, 0}, QorPoint2D{0, -1}}) {
        QORI_EXPECT_STATUS(QOR_ERR_ANCHOR, dst, qoriFilterBox_8u_C1R(s, 12, d, 10, ok, mask, anchor));
        QORI_EXPECT_STATUS(QOR_ERR_ANCHOR, dst, qoriFilterBox_8u_C1IR(d, 10, ok, mask, anchor));
    }
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterBox_8u_C1IR(d, 0, empty, mask, mid));
    for (const QorImageSize size : {QorImageSize{3, 3}, QorImageSize{3, 5}, QorImageSize{3, 2}}) {
        qorTestFailAllocation(1);
        QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, dst, qoriFilterBox_8u_C1R(s, 12, d, 10, {10, 1}, size, mid));
        qorTestFailAllocation(1);
        QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, dst, qoriFilterBox_8u_C1IR(d + 11, 10, {3, 1}, size, mid));
        EXPECT_EQ(QOR_OK, qoriFilterBox_8u_C1IR(d + 11, 10, {3, 1}, size, mid));
    }
    EXPECT_EQ(0, qorTestLiveBlocks());
}

}  // namespace
}  // namespace qori::test
