// SPDX-License-Identifier: Apache-2.0
#include "harness/sweep.h"
#include "narrow_shapes.h"
#include "reference/stats.h"

namespace qori::test {
namespace {

constexpr int resultsOf(Layout layout) { return layout == Layout::AC4 ? 3 : channels(layout); }

/// What images are filled with: anything, few values (ties), or one value but for a pixel.
enum class Fill { any, few, flat };
constexpr Fill kFills[] = {Fill::any, Fill::few, Fill::flat};

template <class T>
void fill(const TestImage& image, int n, Fill style) {
    const T base = random().value<T>();
    const int few = 1 + random().below(3);
    image.fill<T>(n, [&]() -> T {
        if (style == Fill::any) return random().value<T>();
        if (style == Fill::few) return static_cast<T>(random().below(few));
        return random().oneIn(60) ? random().value<T>() : base;
    });
}

template <class T>
bool isNan(T v) {
    if constexpr (std::is_floating_point_v<T>) return std::isnan(v);
    return false;
}

template <class T>
struct Extremum {
    T value;
    int x, y;
};

/// The first best pixel that is a number; NaN at (0, 0) where there is none.
template <class T>
Extremum<T> firstBest(View<T> image, QorImageSize roi, int c, bool largest) {
    Extremum<T> best{};
    bool found = false;
    if constexpr (std::is_floating_point_v<T>) best.value = std::nanf("");
    for (int y = 0; y < roi.height; ++y)
        for (int x = 0; x < roi.width; ++x) {
            const T v = image.get(x, y, c);
            if (isNan(v)) continue;
            if (!found || (largest ? v > best.value : v < best.value)) best = {v, x, y};
            found = true;
        }
    return best;
}

template <class T>
void expectSame(T expected, T actual) {
    if (isNan(expected))
        EXPECT_TRUE(isNan(actual)) << "not NaN: " << +actual;
    else
        EXPECT_EQ(expected, actual);
}

/// Hands filled images of every shape to check(image, shape) and sees that they are only read.
template <class T, Layout layout, class Check>
void sweepImages(const char* name, Check check) {
    for (Fill style : kFills)
        for (const auto& shapes : {smallShapes(), narrowShapes()})
            forShapes(shapes, [&](const Shape& shape) {
                TestImage src(0, shape, channels(layout) * static_cast<int>(sizeof(T)));
                fill<T>(src, channels(layout), style);
                const Snapshot before = src.snapshot();
                check(src, shape);
                QORI_EXPECT_UNCHANGED(src, before);
            });
    markSwept(name);
}

template <class T, Layout layout, class Function>
void sweepExtremum(const char* name, Function function, bool largest) {
    sweepImages<T, layout>(name, [&](const TestImage& src, const Shape& shape) {
        T results[5] = {7, 7, 7, 7, 7};
        int32_t xs[5] = {-7, -7, -7, -7, -7}, ys[5] = {-7, -7, -7, -7, -7};
        constexpr bool indexed = std::is_invocable_v<Function, const T*, int32_t, QorImageSize, T*, int32_t*, int32_t*>;
        if constexpr (indexed)
            ASSERT_EQ(QOR_OK, call(function, src.data<T>(), src.step(), shape.roi(), results, xs, ys));
        else
            ASSERT_EQ(QOR_OK, call(function, src.data<T>(), src.step(), shape.roi(), results));
        for (int c = 0; c < 5; ++c) {
            SCOPED_TRACE(c);
            const auto best = c < resultsOf(layout) ? firstBest(src.view<T>(channels(layout)), shape.roi(), c, largest)
                                                    : Extremum<T>{7, -7, -7};
            expectSame(best.value, results[c]);
            EXPECT_EQ(indexed ? best.x : -7, xs[c]);
            EXPECT_EQ(indexed ? best.y : -7, ys[c]);
        }
    });
}

#define QORI_SWEEP(operation, ...)                        \
    template <class T, Layout layout, class Function>     \
    void operation(const char* name, Function function) { \
        __VA_ARGS__;                                      \
    }
QORI_SWEEP(minimum, sweepExtremum<T, layout>(name, function, false))
QORI_SWEEP(maximum, sweepExtremum<T, layout>(name, function, true))
QORI_SWEEP(minimumIndex, sweepExtremum<T, layout>(name, function, false))
QORI_SWEEP(maximumIndex, sweepExtremum<T, layout>(name, function, true))

template <class T, Layout layout, class Function>
void minMax(const char* name, Function function) {
    sweepImages<T, layout>(name, [&](const TestImage& src, const Shape& shape) {
        T low[5] = {7, 7, 7, 7, 7}, high[5] = {7, 7, 7, 7, 7};
        ASSERT_EQ(QOR_OK, call(function, src.data<T>(), src.step(), shape.roi(), low, high));
        const auto view = src.view<T>(channels(layout));
        for (int c = 0; c < 5; ++c) {
            const bool asked = c < resultsOf(layout);
            expectSame(asked ? firstBest(view, shape.roi(), c, false).value : T{7}, low[c]);
            expectSame(asked ? firstBest(view, shape.roi(), c, true).value : T{7}, high[c]);
        }
    });
}

/// One call on blocks of a size, with outputs as the mask says: 1 minima, 2 maxima, 4 global extrema.
template <class T, class Function>
void checkBlocks(Function function, const TestImage& src, const Shape& shape, QorImageSize block, int outputs) {
    const int columns = (shape.width - 1) / block.width + 1, rows = (shape.height - 1) / block.height + 1;
    const Shape grid{.width = columns, .height = rows, .padding = shape.padding, .atBegin = !shape.atBegin};
    TestImage mins(1, grid, static_cast<int>(sizeof(T))), maxs(2, grid, static_cast<int>(sizeof(T)));
    Snapshot expectedMins = mins.snapshot(), expectedMaxs = maxs.snapshot();
    for (int y = 0; y < rows; ++y)
        for (int x = 0; x < columns; ++x) {
            View<T> part = src.view<T>(1);
            part.origin += y * block.height * part.step + x * block.width * static_cast<ptrdiff_t>(sizeof(T));
            const QorImageSize size{std::min(block.width, shape.width - x * block.width),
                                    std::min(block.height, shape.height - y * block.height)};
            if (outputs & 1) expectedMins.view<T>(1).set(x, y, 0, firstBest(part, size, 0, false).value);
            if (outputs & 2) expectedMaxs.view<T>(1).set(x, y, 0, firstBest(part, size, 0, true).value);
        }
    T low = 7, high = 7;
    ASSERT_EQ(QOR_OK, call(function, src.data<T>(), src.step(), shape.roi(), outputs & 1 ? mins.data<T>() : nullptr,
                           mins.step(), outputs & 2 ? maxs.data<T>() : nullptr, maxs.step(), block,
                           outputs & 4 ? &low : nullptr, outputs & 4 ? &high : nullptr));
    QORI_EXPECT_UNCHANGED(mins, expectedMins);
    QORI_EXPECT_UNCHANGED(maxs, expectedMaxs);
    if (!(outputs & 4)) return;
    expectSame(firstBest(src.view<T>(1), shape.roi(), 0, false).value, low);
    expectSame(firstBest(src.view<T>(1), shape.roi(), 0, true).value, high);
}

template <class T, Layout layout, class Function>
void blockMinMax(const char* name, Function function) {
    sweepImages<T, layout>(name, [&](const TestImage& src, const Shape& shape) {
        if (shape.flipped) return;
        for (QorImageSize block : {QorImageSize{1, 1}, QorImageSize{4, 4}, QorImageSize{16, 16}, QorImageSize{37, 2},
                                   QorImageSize{INT32_MAX, INT32_MAX}})
            checkBlocks<T>(function, src, shape, block, 5 + shape.width % 3);
    });
    // Wider than a strip of columns, with blocks that end inside it, on it, and beyond.
    const Shape wide{.width = 5'000, .height = 3};
    TestImage src(0, wide, static_cast<int>(sizeof(T)));
    fill<T>(src, 1, Fill::any);
    for (int width : {1, 7, 512, 1'023, 2'047, 2'048, 2'049, 4'999}) checkBlocks<T>(function, src, wide, {width, 2}, 7);
}

template <class T, Layout layout, class Function>
void countInRange(const char* name, Function function) {
    sweepImages<T, layout>(name, [&](const TestImage& src, const Shape& shape) {
        if (shape.flipped) return;
        T lower[3], upper[3];
        for (int c = 0; c < 3; ++c) {
            do {
                lower[c] = src.view<T>(channels(layout)).get(random().below(shape.width), 0, c % channels(layout));
                upper[c] = random().oneIn(3) ? lower[c] : random().value<T>();
            } while (upper[c] < lower[c]);
        }
        int32_t counts[4] = {-7, -7, -7, -7};
        if constexpr (layout == Layout::C1)
            ASSERT_EQ(QOR_OK, call(function, src.data<T>(), src.step(), shape.roi(), counts, lower[0], upper[0]));
        else
            ASSERT_EQ(QOR_OK, call(function, src.data<T>(), src.step(), shape.roi(), counts,
                                   static_cast<const T*>(lower), static_cast<const T*>(upper)));
        for (int c = 0; c < resultsOf(layout); ++c) {
            const auto elements = reference::channel(src.view<T>(channels(layout)), shape.roi(), c);
            EXPECT_EQ(
                std::count_if(elements.begin(), elements.end(), [&](T v) { return lower[c] <= v && v <= upper[c]; }),
                counts[c]);
        }
        EXPECT_EQ(-7, counts[resultsOf(layout)]);
    });
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(ExtremaSweep, name) { operation<S, Layout::SL>(#name, &name); }
#include "members/extrema.inc"
#undef QORI_MEMBER

TEST(Extrema, FirstOfEqualPixelsAcrossRowsAndPiecesOfRows) {
    constexpr int kWidth = 30'000;  // three pieces a row
    std::vector<uint16_t> image(kWidth * 3, 9);
    const auto put = [&](int x, int y) { image[static_cast<size_t>(y) * kWidth + static_cast<size_t>(x)] = 500; };
    const auto at = [&](int expectedX, int expectedY) {
        uint16_t value = 0;
        int32_t x = -1, y = -1;
        EXPECT_EQ(QOR_OK, qoriMaxIndx_16u_C1R(image.data(), kWidth * 2, {kWidth, 3}, &value, &x, &y));
        EXPECT_EQ(500, value);
        EXPECT_EQ(expectedX, x);
        EXPECT_EQ(expectedY, y);
    };
    put(3, 2);
    at(3, 2);
    put(29'999, 1);
    put(1, 2);
    at(29'999, 1);
    put(12'288, 1);
    at(12'288, 1);
    put(12'287, 1);
    at(12'287, 1);
}

TEST(Extrema, EachChannelKeepsItsFirstPieceWhenAnotherImproves) {
    constexpr int kWidth = 30'000;
    const auto check = [](auto function, int n) {
        std::vector<uint8_t> image(size_t{kWidth} * 2 * static_cast<size_t>(n), 9);
        const auto put = [&](int x, int y, int c, uint8_t value) { image.data()[(y * kWidth + x) * n + c] = value; };
        put(5, 0, 0, 200);
        put(12'000, 0, 2, 50);
        for (int c = 0; c < n; ++c) put(29'999, 1, c, c == 0 ? 200 : c == 1 ? 100 : c == 2 ? 50 : 255);
        uint8_t values[4];
        int32_t x[4], y[4];
        EXPECT_EQ(QOR_OK, function(image.data(), kWidth * n, {kWidth, 2}, values, x, y));
        EXPECT_EQ((std::vector<int>{200, 100, 50}), std::vector<int>(values, values + 3));
        EXPECT_EQ((std::vector{5, 29'999, 12'000}), std::vector(x, x + 3));
        EXPECT_EQ((std::vector{0, 1, 0}), std::vector(y, y + 3));
    };
    check(qoriMaxIndx_8u_C3R, 3);
    check(qoriMaxIndx_8u_C4R, 4);
    check(qoriMaxIndx_8u_AC4R, 4);
}

TEST(Extrema, LowestValuesEverywhereAreFoundAtTheirFirstPixel) {
    const uint16_t zeros[6] = {};
    uint16_t value = 7;
    int32_t x = -1, y = -1;
    EXPECT_EQ(QOR_OK, qoriMaxIndx_16u_C1R(zeros, 6, {3, 2}, &value, &x, &y));
    EXPECT_EQ(0, value + x + y);
    const float infinity = std::numeric_limits<float>::infinity(), nan = std::nanf("");
    const float row[4] = {nan, nan, -infinity, -infinity};
    float best = 7;
    EXPECT_EQ(QOR_OK, qoriMaxIndx_32f_C1R(row, 8, {2, 2}, &best, &x, &y));
    EXPECT_EQ(-infinity, best);
    EXPECT_EQ(0, x);
    EXPECT_EQ(1, y);
    EXPECT_EQ(QOR_OK, qoriMax_32f_C1R(row, 16, {4, 1}, &best));
    EXPECT_EQ(-infinity, best);
    EXPECT_EQ(QOR_OK, qoriMin_32f_C1R(row, 8, {2, 1}, &best));
    EXPECT_TRUE(std::isnan(best));
}

/// Calls check() often enough for call() to come by every control register.
template <class Check>
void underEveryControl(Check check) {
    for (int i = 0; i < 8; ++i) check();
}

TEST(Extrema, NeitherTrapNorFlushWhatTheCallerMayHaveAskedFor) {
    const float nan = std::nanf(""), signalling = std::numeric_limits<float>::signaling_NaN();
    const float withNan[3] = {1, nan, 2}, tiny[3] = {1e-40f, -1e-40f, 0};
    const float mixed[8] = {0, 1e-40f, 2e-40f, 0.5f, signalling, 1, std::numeric_limits<float>::infinity(), -1};
    const QorImageSize three{3, 1}, eight{8, 1};
    underEveryControl([&] {
        float low = 7, high = 7;
        EXPECT_EQ(QOR_OK, call(qoriMinMax_32f_C1R, withNan, 12, three, &low, &high));
        EXPECT_EQ(1, low);
        EXPECT_EQ(2, high);
        EXPECT_EQ(QOR_OK, call(qoriMinMax_32f_C1R, tiny, 12, three, &low, &high));
        EXPECT_EQ(-1e-40f, low);
        EXPECT_EQ(1e-40f, high);
        int32_t x = -7, y = -7;
        EXPECT_EQ(QOR_OK, call(qoriMinIndx_32f_C1R, tiny, 12, three, &low, &x, &y));
        EXPECT_EQ(1, x);
        EXPECT_EQ(QOR_OK, call(qoriMaxIndx_32f_C1R, tiny, 12, three, &high, &x, &y));
        EXPECT_EQ(0, x);
        float lows[4] = {}, highs[4] = {};
        EXPECT_EQ(QOR_OK, call(qoriBlockMinMax_32f_C1R, mixed, 32, eight, lows, 16, highs, 16, QorImageSize{2, 1}, &low,
                               &high));
        EXPECT_EQ((std::vector{0.0f, 2e-40f, 1.0f, -1.0f}), std::vector(lows, lows + 4));
        EXPECT_EQ((std::vector{1e-40f, 0.5f, 1.0f, mixed[6]}), std::vector(highs, highs + 4));
        int32_t count = -7;
        EXPECT_EQ(QOR_OK, call(qoriCountInRange_32f_C1R, mixed, 32, eight, &count, 1e-40f, 1.5e-40f));
        EXPECT_EQ(1, count);
        EXPECT_EQ(QOR_ERR_BAD_RANGE, call(qoriCountInRange_32f_C1R, mixed, 32, eight, &count, 2e-40f, 1e-40f));
        EXPECT_EQ(QOR_OK, call(qoriCountInRange_32f_C1R, mixed, 32, eight, &count, nan, 1.0f));
        EXPECT_EQ(0, count);
    });
}

TEST(CountInRange, CountsPastEveryLane) {
    const std::vector<uint8_t> row(100'000, 10);  // rows overlap: 3 * 320,000,000 elements, then 2^31
    int32_t counts[3] = {};
    const uint8_t lower[3] = {10, 11, 0}, upper[3] = {10, 255, 255};
    EXPECT_EQ(QOR_OK, qoriCountInRange_8u_C3R(row.data(), 1, {8'000, 40'000}, counts, lower, upper));
    EXPECT_EQ(320'000'000, counts[0]);
    EXPECT_EQ(0, counts[1]);
    EXPECT_EQ(320'000'000, counts[2]);
    EXPECT_EQ(QOR_OK, qoriCountInRange_8u_C1R(row.data(), 1, {50'000, 42'949}, counts, 10, 10));
    EXPECT_EQ(2'147'450'000, counts[0]);
    EXPECT_EQ(QOR_OK, qoriCountInRange_8u_C1R(row.data(), 1, {50'000, 42'950}, counts, 10, 10));
    EXPECT_EQ(INT32_MAX, counts[0]);
}

TEST(Extrema, ChecksPointersThenSizes) {
    uint8_t pixel[4] = {1, 2, 3, 4}, low[4] = {7, 7, 7, 7}, high[4] = {7, 7, 7, 7};
    int32_t x[4] = {-7}, y[4] = {-7};
    uint8_t* none = nullptr;
    const QorImageSize empty{0, 0};
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriMin_8u_C1R(none, 0, empty, low));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriMax_8u_C4R(pixel, 0, empty, none));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriMinMax_8u_C1R(pixel, 0, empty, low, none));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriMinIndx_8u_C1R(pixel, 0, empty, low, nullptr, y));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriMaxIndx_8u_AC4R(pixel, 0, empty, low, x, nullptr));
    for (QorImageSize bad : {QorImageSize{0, 1}, QorImageSize{1, 0}, QorImageSize{INT32_MIN, 1}}) {
        EXPECT_EQ(QOR_ERR_SIZE, qoriMin_8u_C4R(pixel, 0, bad, low));
        EXPECT_EQ(QOR_ERR_SIZE, qoriMinMax_8u_C3R(pixel, 0, bad, low, high));
        EXPECT_EQ(QOR_ERR_SIZE, qoriMaxIndx_8u_C1R(pixel, 0, bad, low, x, y));
    }
    EXPECT_EQ(7, low[0]);
    EXPECT_EQ(7, high[0]);
    EXPECT_EQ(-14, x[0] + y[0]);
}

TEST(BlockMinMax, ChecksPointersSizesThenSteps) {
    uint8_t pixels[16] = {}, low[4] = {7}, high[4] = {7}, all[2] = {7, 7};
    uint8_t* none = nullptr;
    const QorImageSize empty{0, 0}, roi{4, 2}, block{2, 2};
    const auto run = [&](const uint8_t* src, int32_t step, QorImageSize size, uint8_t* mins, int32_t minStep,
                         uint8_t* maxs, int32_t maxStep, QorImageSize blocks) {
        return qoriBlockMinMax_8u_C1R(src, step, size, mins, minStep, maxs, maxStep, blocks, all, all + 1);
    };
    EXPECT_EQ(QOR_ERR_NULL_PTR, run(none, 0, empty, low, 0, high, 0, empty));
    EXPECT_EQ(QOR_ERR_NULL_PTR, run(pixels, 0, empty, none, 0, none, 0, empty));
    EXPECT_EQ(QOR_ERR_SIZE, run(pixels, 0, empty, low, 0, high, 0, block));
    EXPECT_EQ(QOR_ERR_SIZE, run(pixels, 0, roi, low, 0, high, 0, {2, 0}));
    EXPECT_EQ(QOR_ERR_SIZE, run(pixels, 0, roi, low, 0, none, 0, {-1, 2}));
    EXPECT_EQ(QOR_ERR_STEP, run(pixels, 3, roi, low, 2, high, 2, block));
    EXPECT_EQ(QOR_ERR_STEP, run(pixels, 4, roi, low, 1, high, 2, block));
    EXPECT_EQ(QOR_ERR_STEP, run(pixels, 4, roi, low, 2, high, 1, block));
    EXPECT_EQ(QOR_ERR_STEP, run(pixels, 4, roi, none, 0, high, 0, {3, 1}));
    EXPECT_EQ(28, low[0] + high[0] + all[0] + all[1]);
    EXPECT_EQ(QOR_OK, run(pixels, 4, roi, none, 0, high, 2, block));
}

TEST(CountInRange, ChecksPointersStepsSizesThenBounds) {
    const uint8_t pixel[4] = {10, 2, 3, 4}, lower[3] = {1, 2, 3}, upper[3] = {1, 2, 2};
    const uint8_t* none = nullptr;
    int32_t counts[3] = {-7, -7, -7};
    const QorImageSize empty{0, 0}, one{1, 1};
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriCountInRange_8u_C1R(none, 0, empty, counts, 11, 10));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriCountInRange_8u_C3R(pixel, 0, empty, nullptr, lower, upper));
    EXPECT_EQ(QOR_ERR_NULL_PTR, qoriCountInRange_8u_C3R(pixel, 0, empty, counts, none, upper));
    EXPECT_EQ(QOR_ERR_STEP, qoriCountInRange_8u_C1R(pixel, 0, empty, counts, 11, 10));
    EXPECT_EQ(QOR_ERR_STEP, qoriCountInRange_8u_AC4R(pixel, -4, one, counts, lower, upper));
    EXPECT_EQ(QOR_ERR_SIZE, qoriCountInRange_8u_C1R(pixel, 1, empty, counts, 11, 10));
    EXPECT_EQ(QOR_ERR_BAD_RANGE, qoriCountInRange_8u_C1R(pixel, 1, one, counts, 11, 10));
    EXPECT_EQ(QOR_ERR_BAD_RANGE, qoriCountInRange_8u_C3R(pixel, 3, one, counts, lower, upper));
    EXPECT_EQ(-7, counts[0]);
    EXPECT_EQ(QOR_OK, qoriCountInRange_8u_C1R(pixel, 1, one, counts, 10, 10));
    EXPECT_EQ(1, counts[0]);
}

}  // namespace
}  // namespace qori::test
