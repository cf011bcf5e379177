// SPDX-License-Identifier: Apache-2.0
#include "box_cases.h"

namespace qori::test {
namespace {

constexpr int kWeights3[3][3] = {{1, 2, 1}, {2, 4, 2}, {1, 2, 1}};
constexpr int kWeights5[5][5] = {
    {2, 7, 12, 7, 2}, {7, 31, 52, 31, 7}, {12, 52, 127, 52, 12}, {7, 31, 52, 31, 7}, {2, 7, 12, 7, 2}};

/// Integers: the exact quotient to nearest, ties to even. Floats: integers, whose sums are exact.
template <class T, class Fetch>
T gaussMean(int32_t mask, Fetch pixel) {
    const int reach = mask == mask3x3 ? 1 : 2;
    reference::WindowSum<T> sum;
    int total = 0;
    for (int j = -reach; j <= reach; ++j)
        for (int i = -reach; i <= reach; ++i) {
            const int weight = reach == 1 ? kWeights3[j + 1][i + 1] : kWeights5[j + 2][i + 2];
            sum.add(pixel(i, j), weight);
            total += weight;
        }
    if constexpr (std::is_floating_point_v<T>)
        return static_cast<T>(sum.value) / static_cast<T>(total);
    else if constexpr (sizeof(T) == 1)
        return static_cast<T>(reference::meanOf<uint16_t>(sum.value, total));
    else
        return reference::meanOf<T>(sum.value, total);
}

template <class T, Layout L, class Function>
void filterGauss(const char* name, Function function) {
    for (int32_t mask : {mask3x3, mask5x5}) {
        const int reach = mask == mask3x3 ? 1 : 2;
        const auto check = [&](const Shape& shape) {
            checkWindow<T, T, L, Kind::R>(
                shape, {reach, reach, reach, reach},
                [=](const T* src, int32_t srcStep, T* dst, int32_t dstStep, QorImageSize roi) {
                    return call(function, src, srcStep, dst, dstStep, roi, mask);
                },
                [=](auto pixel) { return gaussMean<T>(mask, pixel); }, drawExact<T>);
        };
        forShapes(windowShapes(), check);
        forShapes({{.width = 1030, .height = 6}, {.width = 700, .height = 9, .padding = 7}}, check);
    }
    const TestImage src(0, {.width = 7, .height = 7}, 16), dst(1, {.width = 3, .height = 3}, 16);
    const T* const s = src.data<T>() + 2 * src.step() / static_cast<int>(sizeof(T));
    for (int32_t mask : {mask3x3, mask5x5}) {
        qorTestFailAllocation(1);
        QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, dst,
                           call(function, s, src.step(), dst.data<T>(), dst.step(), QorImageSize{1, 2}, mask));
    }
    EXPECT_EQ(0, qorTestLiveBlocks());
    markSwept(name);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(GaussSweep, name) { operation<S, Layout::SL>(#name, &name); }
#include "members/gauss.inc"
#undef QORI_MEMBER

/// Every sum of bytes by 3 x 3: 16 * 255 + 1 of them. By 5 x 5 the smallest weights are 2 and 7, so that a few of the
/// 571 * 255 + 1 cannot be made.
TEST(Gauss, BytesRoundEverySum) {
    for (int32_t mask : {mask3x3, mask5x5}) {
        const int side = mask == mask3x3 ? 3 : 5, total = side == 3 ? 16 : 571, sums = total * 255 + 1;
        constexpr int kAtOnce = 1000;
        const TestImage src(0, {.width = kAtOnce * side, .height = side}, 1), dst(1, {.width = kAtOnce * side}, 1);
        int wrong = 0, missed = 0;
        for (int begin = 0; begin < sums; begin += kAtOnce) {
            for (int k = 0; k < kAtOnce; ++k) {
                // Greedily: large weights first, then what the small ones make up.
                int left = std::min(begin + k, sums - 1);
                static constexpr int order3[] = {4, 1, 3, 5, 7, 0, 2, 6, 8};
                static constexpr int order5[] = {12, 7, 11, 13, 17, 6,  8,  16, 18, 2, 10, 14, 22,
                                                 1,  3, 5,  9,  15, 19, 21, 23, 0,  4, 20, 24};
                int value[25] = {};
                const auto weightOf = [=](int at) {
                    return side == 3 ? kWeights3[at / 3][at % 3] : kWeights5[at / 5][at % 5];
                };
                for (int i = 0; i < side * side; ++i) {
                    const int at = side == 3 ? order3[i] : order5[i];
                    value[at] = std::min(left / weightOf(at), 255);
                    left -= value[at] * weightOf(at);
                }
                // Twos cannot make up what is odd: a seven gives way.
                for (int i = side * side; i-- > 0 && left % 2 != 0;) {
                    const int at = side == 3 ? order3[i] : order5[i];
                    if (weightOf(at) % 2 == 0 || value[at] == 0) continue;
                    --value[at];
                    left += weightOf(at);
                    for (int corner : {0, 4, 20, 24}) {
                        const int more = std::min(left / 2, 255 - value[corner]);
                        value[corner] += more;
                        left -= 2 * more;
                    }
                    break;
                }
                for (int at = 0; at < side * side; ++at)
                    src.view<uint8_t>(1).set(k * side + at % side, at / side, 0, static_cast<uint8_t>(value[at]));
                missed += left > 0;
            }
            const QorImageSize roi{(kAtOnce - 1) * side + 1, 1};
            const ptrdiff_t middle = side / 2 * (src.step() + 1);
            EXPECT_EQ(QOR_OK, qoriFilterGauss_8u_C1R(src.data<uint8_t>() + middle, src.step(), dst.data<uint8_t>(),
                                                     dst.step(), roi, mask));
            for (int k = 0; k < kAtOnce; ++k) {
                int sum = 0;
                for (int i = 0; i < side * side; ++i)
                    sum += src.view<uint8_t>(1).get(k * side + i % side, i / side) *
                           (side == 3 ? kWeights3[i / 3][i % 3] : kWeights5[i / 5][i % 5]);
                const int formula = side == 3 ? ((sum + 8) >> 4) - (sum % 32 == 8)
                                              : static_cast<int>((sum + 286) * int64_t{29382} >> 24);
                wrong += dst.view<uint8_t>(1).get(k * side, 0) != formula;
            }
        }
        EXPECT_EQ(0, wrong) << mask;
        EXPECT_LE(missed, side == 3 ? 0 : 27);
    }
}

TEST(Gauss, FloatsOfAnyValue) {
    constexpr int kWidth = 150, kHeight = 9;
    const TestImage src(0, {.width = kWidth + 4, .height = kHeight + 4}, 4),
        dst(1, {.width = kWidth, .height = kHeight}, 4);
    src.fill<float>(1, drawPixel<float>);
    const float* const s = src.data<float>() + 2 * (kWidth + 4) + 2;
    for (int32_t mask : {mask3x3, mask5x5}) {
        EXPECT_EQ(QOR_OK, call(qoriFilterGauss_32f_C1R, s, src.step(), dst.data<float>(), dst.step(),
                               QorImageSize{kWidth, kHeight}, mask));
        int wrong = 0;
        for (int y = 0; y < kHeight; ++y)
            for (int x = 0; x < kWidth; ++x) {
                const auto pixel = [&](int i, int j) { return src.view<float>(1).get(x + 2 + i, y + 2 + j); };
                long double sum = 0, magnitudes = 0;
                const int reach = mask == mask3x3 ? 1 : 2;
                for (int j = -reach; j <= reach; ++j)
                    for (int i = -reach; i <= reach; ++i) {
                        const int weight = reach == 1 ? kWeights3[j + 1][i + 1] : kWeights5[j + 2][i + 2];
                        sum += static_cast<long double>(pixel(i, j)) * weight;
                        magnitudes += std::abs(static_cast<long double>(pixel(i, j))) * weight;
                    }
                const long double total = reach == 1 ? 16 : 571;
                wrong +=
                    !(std::abs(dst.view<float>(1).get(x, y) - sum / total) <= 10 * kUnit<float> * magnitudes / total);
            }
        EXPECT_EQ(0, wrong) << mask;
    }
}

TEST(Gauss, ChecksInOrder) {
    const TestImage src(0, {.width = 12, .height = 6}, 1), dst(1, {.width = 10, .height = 4}, 1);
    const uint8_t *s = src.data<uint8_t>() + 13, *noSource = nullptr;
    uint8_t *d = dst.data<uint8_t>(), *none = nullptr;
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterGauss_8u_C1R(noSource, 0, d, 0, {0, 0}, 0));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriFilterGauss_8u_C1R(s, 0, none, 0, {0, 0}, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriFilterGauss_8u_C1R(s, 0, d, 0, {10, 0}, 0));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterGauss_8u_C1R(s, 12, d, 0, {10, 4}, 0));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriFilterGauss_8u_C1R(s, -12, d, 10, {10, 4}, mask3x3));
    for (int32_t mask : {35, 53, 0, -33, 13, 31, 77})
        QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, qoriFilterGauss_8u_C1R(s, 12, d, 10, {10, 4}, mask));
}

TEST(Gauss, SpreadsAPoint) {
    const TestImage src(0, {.width = 7, .height = 7}, 1), dst(1, {.width = 3, .height = 3}, 1);
    src.fill<uint8_t>(1, [] { return uint8_t{0}; });
    src.view<uint8_t>(1).set(3, 3, 0, 16);
    EXPECT_EQ(QOR_OK, qoriFilterGauss_8u_C1R(src.data<uint8_t>() + 16, 7, dst.data<uint8_t>(), 3, {3, 3}, mask3x3));
    for (int y = 0; y < 3; ++y)
        for (int x = 0; x < 3; ++x) EXPECT_EQ(kWeights3[y][x], dst.view<uint8_t>(1).get(x, y));
}

}  // namespace
}  // namespace qori::test
