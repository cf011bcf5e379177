// SPDX-License-Identifier: Apache-2.0
// Medians of large masks: what is counted depends on the medians of the rows above, so images change as they go down.
#include <algorithm>
#include <numeric>

#include "median_cases.h"

namespace qori::test {
namespace {

template <class T>
struct Plane {
    int width, height;
    std::vector<T> pixels = std::vector<T>(static_cast<size_t>(width) * static_cast<size_t>(height));

    T& at(int x, int y) { return pixels.data()[ptrdiff_t{y} * width + x]; }
};

/// Bands of rows, each of another kind: medians that stay where they are, at either end of the range too, that drift,
/// that take all values along a row, or few ones far apart.
Plane<uint8_t> changingBytes(int width, int height, int longest) {
    Plane<uint8_t> image{width, height};
    for (int y = 0; y < height;) {
        const int end = std::min(height, y + 1 + random().below(longest)), kind = random().below(8);
        const int level = random().below(256), other = random().below(256), period = 1 + random().below(60);
        for (; y < end; ++y)
            for (int x = 0; x < width; ++x) {
                const int noise = random().below(256), slope = 1 + period / 8;
                const int values[] = {noise,
                                      level,
                                      noise < 20 ? noise : 255 * (level & 1),
                                      level + noise / 16,
                                      x * slope + noise / 32,
                                      y * slope / 2 + x / 4,
                                      ((x + y) / period) % 2 == 0 ? level : other,
                                      x % 2 == 0 ? level : noise};
                image.at(x, y) = static_cast<uint8_t>(values[kind]);
            }
    }
    return image;
}

/// Columns of values within 2 of levels `apart` from each other, the lowest one of which is `first`, in no order, so
/// that each row's medians take up to all of them, go back and forth and far.
Plane<uint8_t> aroundLevels(int width, int height, int first, int apart) {
    Plane<uint8_t> image{width, height};
    const int levels = (255 - first) / apart + 1;
    int level = 0, left = 0;
    for (int x = 0; x < width; ++x, --left) {
        if (left == 0) {
            level =
                random().oneIn(3) ? random().below(levels) : std::clamp(level + random().below(3) - 1, 0, levels - 1);
            left = 1 + random().below(random().oneIn(2) ? 4 : 40);
        }
        for (int y = 0; y < height; ++y)
            image.at(x, y) = static_cast<uint8_t>(std::clamp(first + level * apart + random().below(5) - 2, 0, 255));
    }
    return image;
}

/// By histograms of whole windows.
Plane<uint8_t> mediansOf(Plane<uint8_t>& src, QorImageSize mask) {
    Plane<uint8_t> result{src.width - mask.width + 1, src.height - mask.height + 1};
    for (int y = 0; y < result.height; ++y) {
        int counts[256] = {};
        const auto column = [&](int x, int change) {
            for (int k = 0; k < mask.height; ++k) counts[src.at(x, y + k)] += change;
        };
        for (int x = 0; x < mask.width - 1; ++x) column(x, 1);
        for (int x = 0; x < result.width; ++x) {
            column(x + mask.width - 1, 1);
            int value = 0;
            for (int below = counts[0]; below <= mask.width * mask.height / 2; below += counts[++value]) {
            }
            result.at(x, y) = static_cast<uint8_t>(value);
            column(x, -1);
        }
    }
    return result;
}

/// Several planes as channels; the last one of four is not written where there are only three.
template <int channels, class Function, class Draw>
void expectMediansOfPlanes(Function function, QorImageSize mask, int width, int height, Draw draw) {
    SCOPED_TRACE("mask " + std::to_string(mask.width) + "x" + std::to_string(mask.height));
    const int columns = width + mask.width - 1, rows = height + mask.height - 1;
    std::vector<Plane<uint8_t>> expected;
    Plane<uint8_t> src{columns * channels, rows}, dst{width * channels, height};
    for (int c = 0; c < channels; ++c) {
        Plane<uint8_t> plane = draw(columns, rows);
        for (int y = 0; y < rows; ++y)
            for (int x = 0; x < columns; ++x) src.at(x * channels + c, y) = plane.at(x, y);
        expected.push_back(mediansOf(plane, mask));
    }
    ASSERT_EQ(QOR_OK, function(src.pixels.data(), src.width, dst.pixels.data(), dst.width, {width, height}, mask,
                               QorPoint2D{0, 0}));
    for (int c = 0; c < channels; ++c)
        for (int y = 0; y < height; ++y)
            for (int x = 0; x < width; ++x)
                ASSERT_EQ(expected[static_cast<size_t>(c)].at(x, y), dst.at(x * channels + c, y))
                    << "channel " << c << " at " << x << ", " << y;
}

template <int channels, class Function>
void expectMedians(Function function, QorImageSize mask, int width, int height) {
    expectMediansOfPlanes<channels>(function, mask, width, height, [=](int columns, int rows) {
        return changingBytes(columns, rows, 2 * mask.height + 200);
    });
}

TEST(MedianLarge, BytesOfChangingImages) {
    for (int i = 0; i < 6; ++i) {
        expectMedians<1>(qoriFilterMedian_8u_C1R, {17, 17}, 150 + random().below(180), 500);
        expectMedians<1>(qoriFilterMedian_8u_C1R, {41, 5}, 150 + random().below(180), 500);
    }
    for (int32_t width : {31, 33, 63, 65, 95, 97, 127, 129})
        expectMedians<1>(qoriFilterMedian_8u_C1R, {width, 3 + 2 * random().below(8)}, 1 + random().below(300), 200);
    for (int i = 0; i < 40; ++i)  // too small for thresholds, and just large enough
        expectMedians<1>(qoriFilterMedian_8u_C1R, {17, 17}, 1 + random().below(30), 1 + random().below(30));
    expectMedians<1>(qoriFilterMedian_8u_C1R, {61, 61}, 260, 300);
    expectMedians<3>(qoriFilterMedian_8u_C3R, {19, 17}, 130, 300);
    expectMedians<4>(qoriFilterMedian_8u_C4R, {7, 31}, 70, 200);
}

/// The most rows whose counts are bytes with a sign or without, the most elements whose counts are words with a sign or
/// without; and one size more.
TEST(MedianLarge, MasksAtTheEndsOfCounters) {
    for (QorImageSize mask : {QorImageSize{3, 127},
                              {257, 127},
                              {259, 127},
                              {3, 129},
                              {127, 257},
                              {3, 255},
                              {3, 257},
                              {257, 255},
                              {259, 255}})
        expectMedians<1>(qoriFilterMedian_8u_C1R, mask, 3 + random().below(140), 20);
}

/// Medians at both sides of every multiple of 16, at both ends of the range, and jumps between them; each
/// height has counts of its own, one or two bytes with or without a sign, and few rows are as good as many.
TEST(MedianLarge, BytesThatJumpBetweenLevels) {
    for (QorImageSize mask : {QorImageSize{17, 17}, {3, 129}, {33, 41}, {65, 127}, {31, 255}, {129, 3}})
        for (int apart : {1, 16, 32, 85, 255})
            expectMediansOfPlanes<1>(qoriFilterMedian_8u_C1R, mask, 300 + random().below(300), 2 + random().below(4),
                                     [=](int columns, int rows) {
                                         return aroundLevels(columns, rows, random().oneIn(2) ? 0 : 15 % apart, apart);
                                     });
}

/// Medians that come to the ends of the range a value at a time, go back, and come again.
TEST(MedianLarge, BytesThatDriftToTheEnds) {
    for (bool down : {false, true})
        for (QorImageSize mask : {QorImageSize{17, 17}, {65, 5}})
            expectMediansOfPlanes<1>(
                qoriFilterMedian_8u_C1R, mask, 1 + random().below(100), 500, [=](int columns, int rows) {
                    Plane<uint8_t> image{columns, rows};
                    for (int y = 0; y < rows; ++y)
                        for (int x = 0; x < columns; ++x) {
                            const int value = 257 - std::abs(y % 238 - 119) / 20 - (x + y) % 2;
                            image.at(x, y) = static_cast<uint8_t>(std::min(value, 255) ^ (down ? 255 : 0));
                        }
                    return image;
                });
}

/// Elements by their order: each kind of bytes, made many values whose order is that of the bytes.
template <class T, class Function>
void expectMediansOf(Function function, QorImageSize mask, int width, int height) {
    SCOPED_TRACE("mask " + std::to_string(mask.width) + "x" + std::to_string(mask.height));
    Plane<uint8_t> bytes = changingBytes(width + mask.width - 1, height + mask.height - 1, 60);
    Plane<T> src{bytes.width, bytes.height}, dst{width, height};
    const int fraction = random().oneIn(2) ? 256 : 2;
    for (int y = 0; y < src.height; ++y)
        for (int x = 0; x < src.width; ++x)
            src.at(x, y) = static_cast<T>((bytes.at(x, y) - 128) * 256 + random().below(fraction));
    ASSERT_EQ(QOR_OK, function(src.pixels.data(), src.width * int{sizeof(T)}, dst.pixels.data(),
                               dst.width * int{sizeof(T)}, {width, height}, mask, QorPoint2D{0, 0}));
    std::vector<T> window(static_cast<size_t>(mask.width) * static_cast<size_t>(mask.height));
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x) {
            for (int k = 0; k < mask.height; ++k)
                std::copy_n(&src.at(x, y + k), mask.width, window.data() + ptrdiff_t{k} * mask.width);
            const auto middle = window.begin() + mask.width * mask.height / 2;
            std::nth_element(window.begin(), middle, window.end());
            ASSERT_EQ(*middle, dst.at(x, y)) << "at " << x << ", " << y;
        }
}

TEST(MedianLarge, WordsAndFloatsOfChangingImages) {
    for (QorImageSize mask : {QorImageSize{17, 17}, {31, 31}, {33, 9}, {61, 45}}) {
        expectMediansOf<int16_t>(qoriFilterMedian_16s_C1R, mask, 140, 100);
        expectMediansOf<float>(qoriFilterMedian_32f_C1R, mask, 100, 100);
        expectMediansOf<double>(qoriFilterMedian_64f_C1R, mask, 60, 60);
    }
}

}  // namespace
}  // namespace qori::test
