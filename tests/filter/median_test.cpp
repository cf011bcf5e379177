// SPDX-License-Identifier: Apache-2.0
#include <bit>
#include <cmath>

#include "median_cases.h"

namespace qori::test {
namespace {

std::vector<Shape> everyNth(const std::vector<Shape>& shapes, size_t n) {
    std::vector<Shape> some;
    for (size_t i = static_cast<size_t>(random().below(static_cast<int>(n))); i < shapes.size(); i += n)
        some.push_back(shapes[i]);
    return some;
}

// --- rectangles -----------------------------------------------------------------------------------------------------

template <class T, Layout L, class Function>
void checkRectangle(Function function, const Shape& shape, QorImageSize mask, QorPoint2D anchor) {
    SCOPED_TRACE("mask " + std::to_string(mask.width) + "x" + std::to_string(mask.height) + " around " +
                 std::to_string(anchor.x) + ", " + std::to_string(anchor.y));
    const Around around = Around::ofMask(mask, anchor);
    checkWindow<T, T, L, Kind::R>(
        shape, around,
        [=](const T* src, int32_t srcStep, T* dst, int32_t dstStep, QorImageSize roi) {
            return call(function, src, srcStep, dst, dstStep, roi, mask, anchor);
        },
        [=](auto pixel) { return medianAround(around, pixel); }, MedianValues<T>{});
}

/// In the middle half of the time, else anywhere: at every edge of the mask in turn.
QorPoint2D drawAnchor(QorImageSize mask) {
    if (random().oneIn(2)) return {mask.width / 2, mask.height / 2};
    return {random().below(mask.width), random().below(mask.height)};
}

template <class T, Layout L, class Function>
void sweepRectangles(Function function, QorImageSize mask, const std::vector<Shape>& shapes) {
    forShapes(shapes, [=](const Shape& shape) { checkRectangle<T, L>(function, shape, mask, drawAnchor(mask)); });
}

/// Of tiles, squares with code of their own and others, and the first ones beyond.
constexpr QorImageSize kTiledMasks[] = {{7, 7},   {15, 15}, {7, 13},  {9, 9},   {17, 17}, {21, 3},  {11, 11},
                                        {19, 19}, {3, 31},  {13, 13}, {21, 21}, {1, 9},   {23, 23}, {25, 11}};

/// Counts the members.
int nextTurn() {
    static int turn = 0;
    return turn++;
}

template <class T, Layout L, class Function>
void median(const char* name, Function function) {
    const std::vector<Shape> shapes = windowShapes(9);
    for (QorImageSize mask : {QorImageSize{3, 3}, {5, 5}}) sweepRectangles<T, L>(function, mask, everyNth(shapes, 4));
    for (QorImageSize mask : {QorImageSize{1, 1}, {3, 1}, {5, 1}, {1, 3}, {1, 5}, {7, 7}, {5, 3}, {1, 7}, {9, 1}})
        sweepRectangles<T, L>(function, mask, everyNth(shapes, 31));
    // Masks beyond the region, of more rows than a byte counts, of more elements than a word does with a sign or
    // without, of more columns than a byte names.
    for (QorImageSize mask : {QorImageSize{15, 21}, {61, 61}, {3, 257}, {257, 3}, {129, 1}, {183, 181}, {257, 257}}) {
        if (sizeof(T) > 1 && std::min(mask.width, mask.height) > 255) continue;  // words count elements of 8 bits alone
        const int width = 1 + random().below(40), height = 1 + random().below(4);
        sweepRectangles<T, L>(function, mask, {{.width = width, .height = height, .padding = 7}});
    }
    // Several pieces, strips and bins of columns, both ways; the longer rows of 5 x 5.
    sweepRectangles<T, L>(function, {7, 3}, {{.width = 420, .height = 230}, {.width = 900, .height = 3, .padding = 3}});
    sweepRectangles<T, L>(function, {5, 5}, {{.width = 600, .height = 70}});
    // Several vectors of tiles, the last ones in part, in both directions: as many elements with channels as without,
    // and every third mask, so that each is met by members of every size of elements.
    int index = nextTurn();
    for (QorImageSize mask : kTiledMasks)
        if (index++ % 3 == 0)
            sweepRectangles<T, L>(function, mask,
                                  {{.width = (mask.width < 7 ? 70 : 270 / channels(L)) + random().below(30),
                                    .height = 33 + random().below(8),
                                    .padding = 5}});
    markSwept(name);
}

template <class T, class Function>
void medianBufferSize(const char* name, Function function) {
    int32_t bytes = -1;
    const auto expect = [&](QorResult result, int32_t expected, QorImageSize roi, QorImageSize mask, int32_t channels) {
        bytes = -1;
        EXPECT_EQ(result, call(function, roi, mask, channels, &bytes));
        EXPECT_EQ(expected, bytes);
    };
    constexpr int e = sizeof(T);
    for (int32_t channels : {1, 3, 4}) expect(QOR_OK, 7 * 9 * e, {20, 30}, {7, 9}, channels);
    expect(QOR_OK, e, {1, 1}, {1, 1}, 1);
    expect(QOR_ERR_SIZE, -1, {0, 30}, {8, 9}, 2);
    expect(QOR_ERR_SIZE, -1, {20, -1}, {0, 9}, 2);
    for (QorImageSize mask : {QorImageSize{8, 9}, {9, 8}, {0, 9}, {9, -1}, {INT32_MIN, 1}})
        expect(QOR_ERR_MASK_SIZE, -1, {20, 30}, mask, 2);
    for (int32_t channels : {0, 2, 5, -1}) expect(QOR_ERR_CHANNELS_UNSUPPORTED, -1, {20, 30}, {7, 9}, channels);
    expect(QOR_ERR_SIZE, -1, {20, 30}, {INT32_MAX, INT32_MAX}, 1);
    expect(QOR_ERR_SIZE, -1, {20, 30}, {INT32_MAX, 1}, 1);
    EXPECT_EQ(QOR_ERR_NULL_PTR,
              call(function, QorImageSize{0, 0}, QorImageSize{0, 0}, 0, static_cast<int32_t*>(nullptr)));
    markSwept(name);
}

TEST(Median, BufferSizes) {
    medianBufferSize<float>("qoriFilterMedianGetBufferSize_32f", qoriFilterMedianGetBufferSize_32f);
    medianBufferSize<double>("qoriFilterMedianGetBufferSize_64f", qoriFilterMedianGetBufferSize_64f);
}

// --- lines and crosses ----------------------------------------------------------------------------------------------

template <class T, Layout L, class Function, class Sees>
void checkShape(Function function, const Shape& shape, int32_t code, Around around, Sees sees) {
    checkWindow<T, T, L, Kind::R>(
        shape, around,
        [=](const T* src, int32_t srcStep, T* dst, int32_t dstStep, QorImageSize roi) {
            return call(function, src, srcStep, dst, dstStep, roi, code);
        },
        [=](auto pixel) {
            std::vector<T> elements;
            for (int dy = -around.top; dy <= around.bottom; ++dy)
                for (int dx = -around.left; dx <= around.right; ++dx)
                    if (sees(dx, dy)) elements.push_back(pixel(dx, dy));
            return reference::median(elements);
        },
        MedianValues<T>{});
}

/// Codes that are refused, those of the other shapes among them.
template <class T, class Function>
void expectCodesRefused(Function function, std::initializer_list<int32_t> taken) {
    const TestImage src(0, {.width = 9, .height = 9}, 4 * sizeof(T)), dst(1, {.width = 3, .height = 2}, 4 * sizeof(T));
    const T* const from = src.data<T>() + (4 * 9 + 4) * 4;
    for (int32_t code : {0, 1, 3, 5, 11, 13, 15, 30, 31, 32, 33, 35, 51, 53, 55, 77, -33, INT32_MIN, INT32_MAX})
        if (std::find(taken.begin(), taken.end(), code) == taken.end())
            QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst,
                               call(function, from, src.step(), dst.data<T>(), dst.step(), QorImageSize{3, 2}, code));
}

template <class T, Layout L, class Function>
void medianHoriz(const char* name, Function function) {
    for (int reach : {1, 2})
        forShapes(everyNth(windowShapes(), 3), [=](const Shape& shape) {
            checkShape<T, L>(function, shape, 21 + 20 * reach - 10, {reach, 0, reach, 0},
                             [](int, int) { return true; });
        });
    expectCodesRefused<T>(function, {31, 51});
    markSwept(name);
}

template <class T, Layout L, class Function>
void medianVert(const char* name, Function function) {
    for (int reach : {1, 2})
        forShapes(everyNth(windowShapes(), 3), [=](const Shape& shape) {
            checkShape<T, L>(function, shape, 11 + 2 * reach, {0, reach, 0, reach}, [](int, int) { return true; });
        });
    expectCodesRefused<T>(function, {13, 15});
    markSwept(name);
}

template <class T, Layout L, class Function>
void medianCross(const char* name, Function function) {
    for (int reach : {1, 2})
        forShapes(everyNth(windowShapes(), 3), [=](const Shape& shape) {
            checkShape<T, L>(function, shape, 11 + 22 * reach, {reach, reach, reach, reach},
                             [](int dx, int dy) { return dx == 0 || dy == 0; });
        });
    expectCodesRefused<T>(function, {33, 55});
    markSwept(name);
}

// --- colours --------------------------------------------------------------------------------------------------------

template <class T>
using Palette = T (*)();

/// Few colours tie all the time; ends of the range make the largest sums.
template <class T>
T drawTied() {
    return static_cast<T>(random().below(2));
}
template <class T>
T drawEnds() {
    return random().oneIn(2) ? std::numeric_limits<T>::lowest() : std::numeric_limits<T>::max();
}
template <class T, Layout L, class Function>
void checkColour(Function function, const Shape& shape, int reach, Palette<T> draw) {
    constexpr int n = channels(L);
    const TestImage src(0, withAround(shape, {reach, reach, reach, reach}), n * int{sizeof(T)});
    const TestImage dst(1, shape, n * int{sizeof(T)});
    src.fill<T>(n, draw);
    dst.fill<T>(n, AnyValue<T>{});
    Snapshot expected = dst.snapshot();
    const auto from = src.view<T>(n);
    for (int y = 0; y < shape.height; ++y)
        for (int x = 0; x < shape.width; ++x) {
            std::vector<reference::Colour<T>> seen;
            for (int j = 0; j <= 2 * reach; ++j)
                for (int i = 0; i <= 2 * reach; ++i)
                    seen.push_back({{from.get(x + i, y + j, 0), from.get(x + i, y + j, 1), from.get(x + i, y + j, 2)}});
            const auto& best = seen[reference::colourMedian(seen)];
            for (int c = 0; c < 3; ++c) expected.view<T>(n).set(x, y, c, best.channel[c]);
        }
    const auto* const inside =
        reinterpret_cast<const T*>(src.data<uint8_t>() + ptrdiff_t{src.step()} * reach) + reach * n;
    EXPECT_EQ(QOR_OK, call(function, inside, src.step(), dst.data<T>(), dst.step(), shape.roi(), 11 + 22 * reach));
    QORI_EXPECT_UNCHANGED(dst, expected);
}

template <class T, Layout L, class Function>
void medianColor(const char* name, Function function) {
    for (int reach : {1, 2})
        for (Palette<T> draw : {drawTied<T>, drawEnds<T>, drawQuiet<T>})
            forShapes(everyNth(windowShapes(), reach == 1 ? 7 : 29),
                      [=](const Shape& shape) { checkColour<T, L>(function, shape, reach, draw); });
    expectCodesRefused<T>(function, {33, 55});
    markSwept(name);
}

// --- the weighted centre --------------------------------------------------------------------------------------------

template <class Function>
void medianWeightedCenter(const char* name, Function function) {
    for (int32_t weight : {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 1000, INT32_MAX - 1, INT32_MAX}) {
        const int32_t odd = weight % 2 == 0 ? weight - 1 : weight;
        const int reach = odd < 9 ? 1 : 0;  // nothing else is read
        forShapes(everyNth(windowShapes(), 20), [=](const Shape& shape) {
            checkWindow<uint8_t, uint8_t, Layout::C1, Kind::R>(
                shape, {reach, reach, reach, reach},
                [=](const uint8_t* src, int32_t srcStep, uint8_t* dst, int32_t dstStep, QorImageSize roi) {
                    const QorResult result = call(function, src, srcStep, dst, dstStep, roi, weight);
                    EXPECT_EQ(weight % 2 == 0 ? QOR_WARN_EVEN_WEIGHT : QOR_OK, result);
                    return QOR_OK;
                },
                [=](auto pixel) {
                    std::vector<uint8_t> elements(static_cast<size_t>(std::min(odd, 9)), pixel(0, 0));
                    for (int dy = -reach; dy <= reach; ++dy)
                        for (int dx = -reach; dx <= reach; ++dx)
                            if (dx != 0 || dy != 0) elements.push_back(pixel(dx, dy));
                    return reference::median(elements);
                },
                MedianValues<uint8_t>{});
        });
    }
    markSwept(name);
}
TEST(MedianSweep, qoriFilterMedianWeightedCenter3x3_8u_C1R) {
    medianWeightedCenter("qoriFilterMedianWeightedCenter3x3_8u_C1R", qoriFilterMedianWeightedCenter3x3_8u_C1R);
}

// What is swept by its operation; the queries and the weighted centre have tests of their own.
#define QORI_SWEEP_(...)
#define QORI_SWEEP_R(name, operation, S, SL) QORI_SWEEP_##operation(name, operation, S, SL)
#define QORI_SWEEP_median(name, operation, S, SL) \
    TEST(MedianSweep, name) { operation<S, Layout::SL>(#name, &name); }
#define QORI_SWEEP_medianHoriz QORI_SWEEP_median
#define QORI_SWEEP_medianVert QORI_SWEEP_median
#define QORI_SWEEP_medianCross QORI_SWEEP_median
#define QORI_SWEEP_medianColor QORI_SWEEP_median
#define QORI_SWEEP_medianWeightedCenter(...)
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) QORI_SWEEP_##kind(name, operation, S, SL)
#include "members/median.inc"
#undef QORI_MEMBER

// --- networks -------------------------------------------------------------------------------------------------------

/// Windows side by side, so that one call meets them all; a network that is right for zeros and ones is right.
class Patterns {
public:
    Patterns(int side, int rows, int count)
        : side_(side),
          rows_(rows),
          count_(count),
          pixels_(static_cast<size_t>(side) * static_cast<size_t>(count) * static_cast<size_t>(rows + side - 1)),
          result_(static_cast<size_t>(side) * static_cast<size_t>(count) * static_cast<size_t>(rows)) {}

    void set(int pattern, int x, int y, bool one) {
        pixels_.data()[(y * count_ + pattern) * side_ + x] = one ? 255 : 0;
    }
    void run() {
        const int width = side_ * count_, anchor = side_ / 2;
        ASSERT_EQ(QOR_OK, qoriFilterMedian_8u_C1R(pixels_.data() + anchor * width + anchor, width, result_.data(),
                                                  width, {width - side_ + 1, rows_}, {side_, side_}, {anchor, anchor}));
    }
    int result(int pattern, int y) const { return result_.data()[(y * count_ + pattern) * side_]; }

private:
    int side_, rows_, count_;
    std::vector<uint8_t> pixels_, result_;
};

/// Every pattern of 3 x (rows + 2) pixels.
void expectSquares3(int rows) {
    const int bits = 3 * (rows + 2), count = 1 << bits;
    Patterns patterns(3, rows, count);
    for (int p = 0; p < count; ++p)
        for (int i = 0; i < bits; ++i) patterns.set(p, i % 3, i / 3, (p >> i & 1) != 0);
    patterns.run();
    for (int p = 0; p < count; ++p)
        for (int y = 0; y < rows; ++y)
            ASSERT_EQ(std::popcount(static_cast<unsigned>(p >> 3 * y & 511)) > 4 ? 255 : 0, patterns.result(p, y))
                << "pattern " << p << " of " << rows << " rows, in row " << y;
}

TEST(Median, EveryPatternOf3x3) {
    expectSquares3(1);
    expectSquares3(4);
}

/// All 2^25 windows, those that share three columns in one call.
TEST(Median, EveryPatternOf5x5) {
    constexpr int kCount = 1 << 15;
    Patterns patterns(5, 1, kCount);
    for (int p = 0; p < kCount; ++p)
        for (int i = 0; i < 15; ++i) patterns.set(p, i / 5, i % 5, (p >> i & 1) != 0);
    for (unsigned rest = 0; rest < 1024; ++rest) {
        for (int p = 0; p < kCount; ++p)
            for (int i = 0; i < 10; ++i) patterns.set(p, 3 + i / 5, i % 5, (rest >> i & 1) != 0);
        patterns.run();
        for (int p = 0; p < kCount; ++p)
            ASSERT_EQ(std::popcount(static_cast<unsigned>(p)) + std::popcount(rest) > 12 ? 255 : 0,
                      patterns.result(p, 0))
                << "columns " << p << " and " << rest;
    }
}

/// Each row of a window is put in order first, so that the number of its ones is all that the rest sees of it.
TEST(Median, EveryCountOfOnesInTheRowsOf5x5) {
    constexpr int kRows = 6, kCount = 6 * 6 * 6 * 6 * 6 * 6;
    Patterns patterns(5, kRows - 4, kCount);
    std::vector<int> ones(size_t{kRows} * kCount);
    for (int p = 0; p < kCount; ++p)
        for (int y = 0, left = p; y < kRows; ++y, left /= 6) {
            ones.data()[p * kRows + y] = left % 6;
            const int turn = random().below(5);
            for (int x = 0; x < 5; ++x) patterns.set(p, (x + turn) % 5, y, x < left % 6);
        }
    patterns.run();
    for (int p = 0; p < kCount; ++p)
        for (int y = 0; y < kRows - 4; ++y) {
            int sum = 0;
            for (int k = 0; k < 5; ++k) sum += ones.data()[p * kRows + y + k];
            ASSERT_EQ(sum > 12 ? 255 : 0, patterns.result(p, y)) << "pattern " << p << ", row " << y;
        }
}

/// Zeros and ones of which every window has about as many, by counting: noise, and edges of all directions, so that
/// columns and rows of windows have all or none.
template <class T, class Function>
void expectMajorities(Function function, QorImageSize mask, T zero, T one) {
    const int width = 530, height = 45, columns = width + mask.width - 1, rows = height + mask.height - 1;
    std::vector<T> pixels(static_cast<size_t>(columns) * static_cast<size_t>(rows));
    std::vector<T> result(static_cast<size_t>(width) * size_t{height});
    const auto at = [&](int x, int y) { return pixels.data() + ptrdiff_t{y} * columns + x; };
    const int kind = random().below(3), dx = random().below(9) - 4, dy = random().below(9) - 4;
    const int period = std::max(1, (mask.width + mask.height) / 2);
    for (int y = 0; y < rows; ++y)
        for (int x = 0; x < columns; ++x) {
            const int wave = (dx * x + dy * y + 100'000) / period % 2;
            *at(x, y) = (kind == 0 || random().oneIn(9) ? random().oneIn(2) : wave == 0) ? one : zero;
        }
    ASSERT_EQ(QOR_OK, function(pixels.data(), columns * int{sizeof(T)}, result.data(), width * int{sizeof(T)},
                               QorImageSize{width, height}, mask, QorPoint2D{0, 0}));
    for (int x = 0; x < width; ++x)
        for (int y = 0, ones = 0; y < height; ++y) {
            const auto row = [&](int line) {
                return static_cast<int>(std::count(at(x, line), at(x, line) + mask.width, one));
            };
            if (y == 0)
                for (int k = 0; k < mask.height; ++k) ones += row(k);
            else
                ones += row(y + mask.height - 1) - row(y - 1);
            ASSERT_EQ(ones > mask.width * mask.height / 2 ? one : zero, result.data()[y * width + x])
                << mask.width << " x " << mask.height << " at " << x << ", " << y << " of kind " << kind;
        }
}

TEST(Median, MajoritiesInTiles) {
    for (int side = 7; side <= 23; side += 2)
        for (int i = 0; i < 9; ++i) {
            expectMajorities<uint8_t>(qoriFilterMedian_8u_C1R, {side, side}, 3, 255);
            expectMajorities<uint16_t>(qoriFilterMedian_16u_C1R, {side, side}, 0x7FFF, 0x8000);
            expectMajorities<int16_t>(qoriFilterMedian_16s_C1R, {side, side}, -1, 1);
            expectMajorities<float>(qoriFilterMedian_32f_C1R, {side, side}, -2.0f, 1.0f);
        }
    for (int i = 0; i < 40; ++i) {
        const QorImageSize mask{1 + 2 * random().below(12), 1 + 2 * random().below(12)};
        if (mask.width * mask.height > 1) expectMajorities<uint16_t>(qoriFilterMedian_16u_C1R, mask, 0, 0xFFFF);
    }
}

TEST(Median, EveryPatternOfCrosses) {
    for (int reach : {1, 2}) {
        const int n = 4 * reach + 1, side = 2 * reach + 1, count = 1 << n, width = side * count;
        std::vector<uint8_t> pixels(static_cast<size_t>(width) * static_cast<size_t>(side));
        std::vector<uint8_t> result(static_cast<size_t>(width));
        for (int p = 0; p < count; ++p)
            for (int i = 0, bit = 0; i < side * side; ++i)
                if (i / side == reach || i % side == reach)
                    pixels.data()[i / side * width + p * side + i % side] = (p >> bit++ & 1) != 0;
        ASSERT_EQ(QOR_OK, qoriFilterMedianCross_8u_C1R(pixels.data() + reach * width + reach, width, result.data(),
                                                       width, {width - 2 * reach, 1}, 11 + 22 * reach));
        for (int p = 0; p < count; ++p)
            ASSERT_EQ(std::popcount(static_cast<unsigned>(p)) > n / 2, result.data()[p * side] == 1)
                << "pattern " << p << " of " << n;
    }
}

// --- statuses -------------------------------------------------------------------------------------------------------

TEST(Median, ChecksInOrder) {
    const TestImage src(0, {.width = 20, .height = 12}, 1), dst(1, {.width = 10, .height = 4}, 1);
    const uint8_t *s = src.data<uint8_t>() + 4 * 20 + 5, *noSource = nullptr;
    uint8_t *d = dst.data<uint8_t>(), *none = nullptr;
    const QorImageSize ok{10, 4}, empty{0, 4}, even{4, 3}, seven{7, 7};
    const QorPoint2D out{7, 0};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterMedian_8u_C1R(noSource, 0, d, 0, empty, even, out));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterMedian_8u_C1R(s, 0, none, 0, empty, even, out));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriFilterMedian_8u_C1R(s, 0, d, 10, empty, even, out));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriFilterMedian_8u_C1R(s, 20, d, 10, {10, -1}, even, out));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterMedian_8u_C1R(s, -20, d, 10, ok, even, out));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterMedian_8u_C1R(s, 20, d, 0, ok, even, out));
    for (QorImageSize mask : {even, QorImageSize{3, 0}, {3, 2}, {-1, 3}, {INT32_MIN, 3}, {3, INT32_MIN + 1}})
        QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, qoriFilterMedian_8u_C1R(s, 20, d, 10, ok, mask, out));
    for (QorPoint2D anchor : {out, QorPoint2D{0, 7}, {-1, 0}, {0, -1}, {INT32_MAX, INT32_MIN}})
        QORI_EXPECT_STATUS(QOR_ERR_ANCHOR, dst, qoriFilterMedian_8u_C1R(s, 20, d, 10, ok, seven, anchor));
    QORI_EXPECT_STATUS(QOR_ERR_ANCHOR, dst, qoriFilterMedian_8u_C1R(s, 20, d, 10, ok, {1, 1}, {1, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterMedianHoriz_8u_C1R(s, 0, d, 10, ok, 33));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterMedianCross_8u_C1R(s, 20, d, 0, ok, 31));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriFilterMedianVert_8u_C1R(s, 0, d, 10, empty, 33));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterMedianWeightedCenter3x3_8u_C1R(s, 0, d, 10, ok, 0));
    for (int32_t weight : {0, -1, -2, INT32_MIN})
        QORI_EXPECT_STATUS(QOR_ERR_WEIGHT, dst, qoriFilterMedianWeightedCenter3x3_8u_C1R(s, 20, d, 10, ok, weight));
}

TEST(Median, AnswersFailedAllocation) {
    const TestImage src(0, {.width = 30, .height = 12}, 8), dst(1, {.width = 4, .height = 2}, 8);
    const auto run = [&](auto function, auto type, QorImageSize mask) {
        using T = decltype(type);
        const T* const inside = src.data<T>() + (4 * 30 + 4) * (8 / static_cast<int>(sizeof(T)));
        return function(inside, src.step(), dst.data<T>(), dst.step(), QorImageSize{4, 2}, mask, QorPoint2D{3, 0});
    };
    const auto expect = [&](auto function, auto type) {
        qorTestFailAllocation(1);
        QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, dst, run(function, type, {7, 7}));
        EXPECT_EQ(QOR_OK, run(function, type, {7, 7}));
        qorTestFailAllocation(1);
        EXPECT_EQ(QOR_OK, run(function, type, {5, 5})) << "a network needs no memory";
        qorTestFailAllocation(0);
        // More than an allocation takes.
        QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, dst, run(function, type, {INT32_MAX, INT32_MAX}));
    };
    expect(qoriFilterMedian_8u_C1R, uint8_t{});
    expect(qoriFilterMedian_16s_C1R, int16_t{});
    expect(qoriFilterMedian_32f_C1R, float{});
    expect(qoriFilterMedian_64f_C1R, double{});
}

/// The order is that of the bits: what lies in the middle is one of the window's, NaN or not.
TEST(Median, FloatsInTotalOrder) {
    const float nan = std::nanf(""), infinity = INFINITY;
    const auto medianOf = [](std::vector<float> row) {
        const auto n = static_cast<int32_t>(row.size());
        float result = 0;
        EXPECT_EQ(QOR_OK, qoriFilterMedian_32f_C1R(row.data(), 4 * n, &result, 4, {1, 1}, {n, 1}, {0, 0}));
        return std::bit_cast<uint32_t>(result);
    };
    const auto bits = [](float x) { return std::bit_cast<uint32_t>(x); };
    EXPECT_EQ(bits(1), medianOf({nan, 1, -nan}));
    EXPECT_EQ(bits(infinity), medianOf({nan, infinity, 1}));
    EXPECT_EQ(bits(-infinity), medianOf({-nan, -infinity, -1}));
    EXPECT_EQ(bits(nan), medianOf({nan, 1, nan}));
    EXPECT_EQ(bits(0), medianOf({0.0f, -0.0f, 1, 2, -1}));
    EXPECT_EQ(bits(-0.0f), medianOf({0.0f, -0.0f, 1, -2, -1}));
    EXPECT_EQ(bits(nan), medianOf({nan, 1, nan, 2, nan, 3, nan}));
    EXPECT_EQ(bits(-0.0f), medianOf({-0.0f, -nan, 0.0f, nan, -1e-45f, 1e-45f, -0.0f}));
}

}  // namespace
}  // namespace qori::test
