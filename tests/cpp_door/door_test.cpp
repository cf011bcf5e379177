// SPDX-License-Identifier: Apache-2.0
// What the C++ header adds to the functions of qori.h: views, order of operands, sizes, work memory.
#include "qori.hpp"

#include <gtest/gtest.h>

#include <array>
#include <span>
#include <utility>
#include <vector>

#include "harness/companion/qorcore_instrumented.h"

namespace {

using namespace qori;

template <class T>
std::vector<T> counted(int count) {
    std::vector<T> values(static_cast<std::size_t>(count));
    for (int i = 0; i < count; ++i) values[static_cast<std::size_t>(i)] = static_cast<T>(i);
    return values;
}

/// A matrix as cv::Mat shows itself: rows, columns, a step that converts, depth and channels of the run.
struct Matrix {
    struct Step {
        std::size_t bytes;
        operator std::size_t() const { return bytes; }
    };
    int rows, cols;
    unsigned char* data;
    Step step;
    int depthCode, channelCount;
    int depth() const { return depthCode; }
    int channels() const { return channelCount; }
};

/// An mdspan with strides.
template <class T, std::size_t Rank>
struct Strided {
    T* origin;
    std::array<int, Rank> extents, strides;
    static constexpr std::size_t rank() { return Rank; }
    constexpr T* data_handle() const { return origin; }
    constexpr int extent(std::size_t i) const { return extents[i]; }
    constexpr int stride(std::size_t i) const { return strides[i]; }
};

TEST(Views, PartsPointAtTheirPixels) {
    auto pixels = counted<uint16_t>(6 * 20);
    View<uint16_t, C3> image(pixels.data(), 40, {6, 6});
    const auto part = image.crop({2, 1, 3, 4});
    EXPECT_EQ(pixels.data() + 20 + 6, part.data());
    EXPECT_EQ(3, part.width());
    EXPECT_EQ(4, part.height());
    const auto turned = part.flip();
    EXPECT_EQ(pixels.data() + 4 * 20 + 6, turned.data());
    EXPECT_EQ(-40, turned.step());
    EXPECT_EQ(part.data(), turned.flip().data());
    EXPECT_EQ(part.data() + 2, part.channel(2).data());
    EXPECT_EQ(image.at(-1, 2), image.data() + 40 - 3);
    const View<const uint16_t, C3> fixed = image;
    EXPECT_EQ(image.data(), fixed.data());
    static_assert(!std::is_convertible_v<View<const uint16_t, C3>, View<uint16_t, C3>>);
    static_assert(!std::is_constructible_v<View<uint16_t, C4>, View<uint16_t, C3>>);
}

TEST(Views, WhatIsNotInsideIsNothing) {
    auto pixels = counted<uint8_t>(64);
    View<uint8_t> image(pixels.data(), 8, {8, 8});
    for (const QorImageRect r : {QorImageRect{-1, 0, 2, 2},
                                 {7, 0, 2, 2},
                                 {0, 0, 8, 9},
                                 {0, 0, -1, 2},
                                 {INT32_MAX, 0, 2, 2},
                                 {2, 2, INT32_MAX, 1}})
        EXPECT_FALSE(image.crop(r)) << r.x << ' ' << r.width;
    EXPECT_TRUE(image.crop({8, 8, 0, 0}));
    EXPECT_FALSE((View<uint8_t, C3>(pixels.data(), 24, {2, 2}).channel(3)));
    EXPECT_FALSE((View<uint8_t, C3>(pixels.data(), 24, {2, 2}).channel(-1)));
    EXPECT_FALSE(View<uint8_t>(pixels.data(), INT32_MIN, {2, 2}).flip());
    EXPECT_FALSE(View<uint8_t>(pixels.data(), 8, {2, 0}).flip());
    EXPECT_FALSE(View<uint8_t>().crop({0, 0, 0, 0}));
    EXPECT_EQ(QOR_ERR_NULL_PTR, fill(1, image.crop({0, 0, 9, 9})));
}

TEST(Views, SpansHoldTheirPixels) {
    auto pixels = counted<uint8_t>(36);
    EXPECT_TRUE((View<uint8_t, C3>(pixels, {4, 3})));
    EXPECT_EQ(12, (View<uint8_t, C3>(pixels, {4, 3}).step()));
    EXPECT_FALSE((View<uint8_t, C3>(pixels, {4, 4})));
    EXPECT_FALSE((View<uint8_t, C3>(pixels, {INT32_MAX, INT32_MAX})));
    EXPECT_FALSE((View<uint8_t, C3>(pixels, {-4, 3})));
    EXPECT_TRUE((View<uint8_t, C3>(std::span(pixels).subspan(3), {3, 3})));
    EXPECT_FALSE((View<uint8_t, C3>(std::span(pixels).subspan(1), {4, 3})));
    const std::array<float, 6> fixed{};
    EXPECT_TRUE((View<const float>(fixed, {2, 3})));
    static_assert(!std::is_constructible_v<View<float>, const std::array<float, 6>&, QorImageSize>);
    static_assert(!std::is_constructible_v<View<uint8_t>, std::array<float, 6>&, QorImageSize>);
}

TEST(Views, MdspansHaveTheirStrides) {
    auto pixels = counted<float>(120);
    const View<float> rows(Strided<float, 2>{pixels.data() + 3, {5, 7}, {12, 1}});
    EXPECT_EQ(pixels.data() + 3, rows.data());
    EXPECT_EQ(48, rows.step());
    EXPECT_EQ(7, rows.width());
    EXPECT_EQ(5, rows.height());
    EXPECT_TRUE((View<float, C3>(Strided<float, 3>{pixels.data(), {5, 4, 3}, {24, 3, 1}})));
    EXPECT_FALSE((View<float, C3>(Strided<float, 3>{pixels.data(), {5, 4, 4}, {24, 4, 1}})));
    EXPECT_FALSE((View<float, C3>(Strided<float, 3>{pixels.data(), {5, 4, 3}, {1, 3, 40}})));
    EXPECT_FALSE(View<float>(Strided<float, 2>{pixels.data(), {5, 7}, {1, 12}})) << "columns side by side";
    EXPECT_TRUE(View<float>(Strided<float, 2>{pixels.data(), {5, 1}, {12, 12}})) << "one column has no stride";
}

TEST(Views, MatricesAreOfTheirElements) {
    auto bytes = counted<unsigned char>(600);
    const Matrix colours{4, 5, bytes.data(), {30}, 0, 3};
    const View<uint8_t, C3> view(colours);
    EXPECT_EQ(bytes.data(), view.data());
    EXPECT_EQ(30, view.step());
    EXPECT_EQ(5, view.width());
    EXPECT_EQ(QOR_OK, fill({1, 2, 3}, view));
    EXPECT_EQ(3, bytes[30 + 2]);
    EXPECT_EQ(15, bytes[15]) << "behind a row";
    EXPECT_FALSE((View<uint8_t, C4>(colours)));
    EXPECT_FALSE((View<int8_t, C3>(colours)));
    EXPECT_FALSE((View<float, C3>(colours)));
    EXPECT_TRUE((View<float>(Matrix{4, 5, bytes.data(), {32}, 5, 1})));
    EXPECT_TRUE((View<double>(Matrix{4, 5, bytes.data(), {48}, 6, 1})));
    EXPECT_FALSE((View<uint8_t>(Matrix{-1, -1, bytes.data(), {0}, 0, 1}))) << "more dimensions than two";
}

TEST(Views, PlanesMoveTogether) {
    auto pixels = counted<uint8_t>(300);
    uint8_t* const planes[3] = {pixels.data(), pixels.data() + 100, pixels.data() + 200};
    const View<uint8_t, P3> image(planes, 10, {10, 10});
    const auto part = image.crop({1, 2, 3, 4}).flip();
    for (int i = 0; i < 3; ++i) EXPECT_EQ(planes[i] + 50 + 1, part.data()[i]);
    EXPECT_EQ(-10, part.step());
    EXPECT_FALSE(image.crop({0, 0, 11, 1}));
    EXPECT_FALSE((View<uint8_t, P3>({image.plane(0), image.plane(1), image.plane(2).crop({0, 0, 2, 2})})));
    Image<uint8_t, C3> packed({10, 10});
    Image<uint8_t> third({10, 10});
    ASSERT_EQ(QOR_OK, copy(View<const uint8_t, P3>(image), packed));
    ASSERT_EQ(QOR_OK, copy(packed.view().channel(2), third));
    for (int y = 0; y < 10; ++y)
        for (int x = 0; x < 10; ++x) ASSERT_EQ(pixels[static_cast<std::size_t>(200 + 10 * y + x)], *third.at(x, y));
}

TEST(Operations, OperandsStandAsTheyRead) {
    Image<int16_t> a({9, 3}), b({9, 3}), out({9, 3});
    ASSERT_EQ(QOR_OK, fill(100, a));
    ASSERT_EQ(QOR_OK, fill(7, b));
    EXPECT_EQ(QOR_OK, subtract(a, b, out));
    EXPECT_EQ(93, *out.at(8, 2));
    EXPECT_EQ(QOR_OK, divide(a, b, out));
    EXPECT_EQ(14, *out.at(8, 2));
    EXPECT_EQ(QOR_OK, divide(a, b, out, roundTowardZero, -2));
    EXPECT_EQ(57, *out.at(8, 2));
    EXPECT_EQ(QOR_OK, subtract(in_place(a), b));
    EXPECT_EQ(93, *a.at(0, 0));
    EXPECT_EQ(QOR_OK, subtract(a, 3, out));
    EXPECT_EQ(90, *out.at(8, 2));
    EXPECT_EQ(QOR_OK, divide(in_place(a), b));
    EXPECT_EQ(13, *a.at(0, 0));
    EXPECT_EQ(QOR_OK, add(in_place(a), b, 1));
    EXPECT_EQ(10, *a.at(0, 0));
}

TEST(Operations, AlphaIsKept) {
    Image<uint8_t, C4> a({5, 5}), b({5, 5});
    ASSERT_EQ(QOR_OK, fill({10, 20, 30, 40}, a));
    ASSERT_EQ(QOR_OK, fill({1, 2, 3, 4}, b));
    EXPECT_EQ(QOR_OK, add(a, a, keep_alpha(b)));
    EXPECT_EQ(60, b.at(4, 4)[2]);
    EXPECT_EQ(4, b.at(4, 4)[3]);
    double sums[3];
    EXPECT_EQ(QOR_OK, sum(keep_alpha(a), sums));
    EXPECT_EQ(750, sums[2]);
    Image<uint8_t, C3> c({5, 5});
    EXPECT_EQ(QOR_OK, copy(keep_alpha(a), c));
    EXPECT_EQ(30, c.at(4, 4)[2]);
}

TEST(Operations, SizesAgree) {
    Image<uint8_t> a({9, 3}), small({8, 3}), turned({3, 9}), mask({9, 2});
    ASSERT_EQ(QOR_OK, fill(1, a));
    ASSERT_EQ(QOR_OK, fill(1, small));
    EXPECT_EQ(QOR_ERR_SIZE, add(a, a, small));
    EXPECT_EQ(QOR_ERR_SIZE, add(a, small, a));
    EXPECT_EQ(QOR_ERR_SIZE, add(in_place(a), small));
    EXPECT_EQ(QOR_ERR_SIZE, copy(a, a, mask));
    EXPECT_EQ(QOR_ERR_SIZE, mirror(a, turned, flipVerticalAxis));
    EXPECT_EQ(QOR_OK, mirror(a, turned, flipDiagonal));
    EXPECT_EQ(QOR_ERR_SIZE, mirror(a, Image<uint8_t>({9, 3}), flipAntiDiagonal));
    EXPECT_EQ(QOR_OK, pad_replicate(a, Image<uint8_t>({12, 8}), 2, 1));
    EXPECT_EQ(QOR_ERR_SIZE, pad_replicate(a, Image<uint8_t>({9, 3}), 2, 1));
    EXPECT_EQ(QOR_ERR_SIZE, add(View<uint8_t>(), a, a)) << "before missing pixels are";
}

TEST(Operations, ExtentsAreTheirOperations) {
    Image<uint8_t> src({20, 15}), pattern({4, 3});
    ASSERT_EQ(QOR_OK, fill(3, src));
    ASSERT_EQ(QOR_OK, fill(2, pattern));
    Image<float> full({23, 17}), valid({17, 13}), same({20, 15});
    EXPECT_EQ(QOR_OK, cross_corr_full_norm(src, pattern, full));
    EXPECT_EQ(QOR_ERR_SIZE, cross_corr_full_norm(src, pattern, same));
    EXPECT_EQ(QOR_OK, cross_corr_valid(src, pattern, valid));
    EXPECT_EQ(72, *valid.at(16, 12));
    EXPECT_EQ(QOR_OK, cross_corr_same_norm(src, pattern, same));
    EXPECT_EQ(QOR_OK, cross_corr_norm(src, pattern, valid, corrPlain | corrValid));
    EXPECT_EQ(QOR_OK, cross_corr_norm(src, pattern, same, corrNorm | corrSame));
    EXPECT_EQ(QOR_ERR_SIZE, cross_corr_norm(src, pattern, valid, corrPlain | corrFull));
    Image<uint8_t> least({3, 2}), most({3, 2});
    uint8_t low, high;
    EXPECT_EQ(QOR_OK, block_min_max(src, least, most, {8, 8}, low, high));
    EXPECT_EQ(QOR_ERR_SIZE, block_min_max(src, least, most, {8, 7}, low, high));
    auto bits = counted<uint8_t>(3);
    Image<uint8_t> grey({20, 1});
    EXPECT_EQ(QOR_OK, unpack_bits(View<uint8_t>(bits, {3, 1}), grey, 4));
    EXPECT_EQ(255, *grey.at(11, 0)) << "the last bit of the second byte";
    EXPECT_EQ(QOR_ERR_SIZE, unpack_bits(View<uint8_t>(bits, {3, 1}), grey, 5));
    Image<int16_t> block({8, 8});
    int16_t coefficients[64];
    ASSERT_EQ(QOR_OK, fill(8, block));
    EXPECT_EQ(QOR_OK, dct_8x8_forward(block, coefficients));
    EXPECT_EQ(64, coefficients[0]);
    EXPECT_EQ(QOR_ERR_SIZE, dct_8x8_forward(block.view().crop({0, 0, 8, 7}), coefficients));
}

TEST(Operations, WorkMemoryIsTheCallsOrTheCallers) {
    Image<uint8_t, C3> src({33, 21}), own({33, 21}), given({33, 21});
    ASSERT_EQ(QOR_OK, fill({9, 8, 7}, src));
    ASSERT_EQ(QOR_OK, fill({90, 80, 70}, src.view().crop({10, 5, 4, 4})));
    Buffer buffer;
    EXPECT_EQ(QOR_OK, filter_box_border(src, own, {5, 3}, {borderConstant, {1, 2, 3}}));
    EXPECT_EQ(QOR_OK, filter_box_border(src, given, {5, 3}, {borderConstant, {1, 2, 3}}, buffer));
    double difference[3];
    EXPECT_EQ(QOR_OK, norm_diff_inf(own, given, difference));
    EXPECT_EQ(0, difference[0] + difference[1] + difference[2]);
    EXPECT_GT(buffer.bytes(), 0);
    const uint8_t* const memory = buffer.data();
    EXPECT_EQ(QOR_OK, filter_box_border(src, given, {5, 3}, borderReplicate, buffer));
    EXPECT_EQ(memory, buffer.data()) << "allocated again";
    qorTestFailAllocation(1);
    EXPECT_EQ(QOR_ERR_NO_MEMORY, filter_box_border(src, own, {5, 3}));
    qorTestFailAllocation(0);
    EXPECT_EQ(QOR_ERR_MASK_SIZE, filter_box_border(src, own, {0, 3}));
}

TEST(Operations, KernelsChooseTheirMembers) {
    Image<uint8_t> padded({12, 12}), out({10, 10}), rounded({10, 10});
    for (int y = 0; y < 12; ++y)
        for (int x = 0; x < 12; ++x) *padded.at(x, y) = static_cast<uint8_t>(x * x / 3 + 2 * (x > 5) + y);
    const auto src = padded.view().crop({1, 1, 10, 10});
    const int32_t integers[3][3] = {{1, 2, 1}, {2, 4, 2}, {1, 2, 1}};
    const int16_t shorts[3][3] = {{1, 2, 1}, {2, 4, 2}, {1, 2, 1}};
    const float floats[3][3] = {
        {1 / 16.f, 2 / 16.f, 1 / 16.f}, {2 / 16.f, 4 / 16.f, 2 / 16.f}, {1 / 16.f, 2 / 16.f, 1 / 16.f}};
    EXPECT_EQ(QOR_OK, filter_linear(src, out, Kernel(integers), 16));
    EXPECT_EQ(QOR_OK, filter_linear(src, rounded, Kernel(shorts), 16, roundTowardZero));
    const QorPoint2D middle = Kernel(floats).anchor();
    EXPECT_EQ(1, middle.x);
    EXPECT_EQ(1, middle.y);
    EXPECT_EQ(QOR_OK, filter_linear(src, out, Kernel(floats)));
    // Rows of 5 8 14 and columns of 4 5 6 around (5, 5): (35 * 4 + 20 * 4) / 16 = 13.75.
    EXPECT_EQ(13, *rounded.at(4, 4));
    EXPECT_EQ(14, *out.at(4, 4));
    const uint8_t cross[3][3] = {{0, 1, 0}, {1, 1, 1}, {0, 1, 0}};
    EXPECT_EQ(QOR_OK, erode(src, out, cross));
    EXPECT_EQ(*padded.at(4, 5), *out.at(4, 4));
}

/// Lists in arrays, vectors, spans and braces are what pointers and counts are.
TEST(Operations, ListsBringTheirCounts) {
    const auto pixels = counted<uint8_t>(12);
    const View<const uint8_t, C1> grey(pixels, {4, 3});
    const std::vector<int32_t> levels{0, 4, 10};
    int32_t expected[2], bins[2] = {};
    check(histogram_range(grey, expected, levels.data(), 3));
    check(histogram_range(grey, bins, levels));
    EXPECT_EQ(4, bins[0]);
    EXPECT_EQ(6, bins[1]);
    EXPECT_TRUE(std::equal(bins, bins + 2, expected));
    std::array<int32_t, 3> even{};
    std::array<int32_t, 2> halves{};
    check(histogram_even(grey, halves, even, 0, 12));
    EXPECT_EQ((std::array<int32_t, 2>{6, 6}), halves);
    EXPECT_EQ((std::array<int32_t, 3>{0, 6, 12}), even);
    EXPECT_EQ(QOR_ERR_SIZE, histogram_range(grey, even, levels)) << "bins are one less than levels";

    Image<uint8_t, C1> mapped({4, 3});
    check(lut(grey, mapped, {5, 7, 9}, std::span(levels)));
    EXPECT_EQ(5, mapped.at(3, 0)[0]);
    EXPECT_EQ(7, mapped.at(0, 1)[0]);
    EXPECT_EQ(QOR_ERR_SIZE, lut(grey, mapped, {5, 7}, levels));
    check(lut(in_place(mapped), {1, 2, 3}, {0, 6, 8}));
    EXPECT_EQ(1, mapped.at(0, 0)[0]);
    EXPECT_EQ(2, mapped.at(0, 1)[0]);

    const View<const uint8_t, C3> colours(pixels, {2, 2});
    std::array<int32_t, 1> red{};
    int32_t green[2] = {}, blue[1] = {};
    check(histogram_range(colours, {red, green, blue}, {{0, 256}, levels, {2, 6}}));
    EXPECT_EQ(4, red[0]);
    EXPECT_EQ(1, green[0]);  // of 1, 4, 7, 10
    EXPECT_EQ(2, green[1]);
    EXPECT_EQ(2, blue[0]);  // of 2, 5, 8, 11
    EXPECT_EQ(QOR_ERR_SIZE, histogram_range(colours, {red, green, blue}, {{0, 256}, {0, 256}, {2, 6}}));
}

TEST(Memory, OwnersMove) {
    Image<float, C3> a({5, 4});
    float* const pixels = a.at(0, 0);
    Image<float, C3> b(std::move(a));
    EXPECT_FALSE(a);  // NOLINT(bugprone-use-after-move): what is left behind
    EXPECT_EQ(pixels, b.at(0, 0));
    a = std::move(b);
    EXPECT_EQ(pixels, a.at(0, 0));
    Buffer first(100), second(std::move(first));
    EXPECT_FALSE(first);
    EXPECT_EQ(100, second.bytes());
    first = std::move(second);
    EXPECT_TRUE(first.fits(50));
    EXPECT_EQ(100, first.bytes());
    qorTestFailAllocation(1);
    EXPECT_FALSE(first.fits(200));
    EXPECT_EQ(100, first.bytes()) << "the old bytes stay";
    qorTestFailAllocation(1);
    EXPECT_FALSE(Image<float>({5, 4}));
    qorTestFailAllocation(0);
    EXPECT_FALSE(Image<float>({-5, 4}));
}

}  // namespace
