// SPDX-License-Identifier: Apache-2.0
#include "box_cases.h"

namespace qori::test {
namespace {

template <class S, Layout L, bool along, class Function>
void checkWindowSum(const Shape& shape, int maskSize, int anchor, Function function) {
    SCOPED_TRACE(testing::Message() << "window " << maskSize << " at " << anchor);
    const int before = anchor, behind = maskSize - 1 - anchor;
    checkWindow<S, float, L, Kind::R>(
        shape, along ? Around{before, 0, behind, 0} : Around{0, before, 0, behind},
        [=](const S* src, int32_t srcStep, float* dst, int32_t dstStep, QorImageSize roi) {
            return call(function, src, srcStep, dst, dstStep, roi, maskSize, anchor);
        },
        [=](auto pixel) {
            int64_t sum = 0;
            for (int k = -before; k <= behind; ++k) sum += along ? pixel(k, 0) : pixel(0, k);
            return reference::toFloat(sum);
        });
}

template <class S, Layout L, bool along, class Function>
void sweepSums(const char* name, Function function) {
    static constexpr int sizes[] = {1, 2, 3, 5, 9, 16, 31, 257, 258, 300};
    size_t turn = 0;
    forShapes(windowShapes(4), [&](const Shape& shape) {
        const int size = sizes[turn++ % std::size(sizes)];
        checkWindowSum<S, L, along>(shape, size, (size - 1) / 2, function);
    });
    for (int size : sizes)
        for (int anchor : {0, size - 1, random().below(size)})
            checkWindowSum<S, L, along>({.width = 37, .height = 3}, size, anchor, function);
    // Rows from the last to the first, in both images.
    for (int size : {1, 7})
        checkWindowSum<S, L, along>({.width = 19, .height = 5, .flipped = true}, size, size / 2, function);

    const TestImage src(0, {.width = 9, .height = 9}, 8), dst(1, {.width = 4, .height = 4}, 16);
    const S *s = src.data<S>(), *noSource = nullptr;
    float *d = dst.data<float>(), *none = nullptr;
    constexpr bool checksSize = along && std::is_same_v<S, uint16_t>;
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, call(function, noSource, 0, d, 0, QorImageSize{0, 0}, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, call(function, s, 0, none, 0, QorImageSize{0, 0}, 0, 0));
    for (const QorImageSize empty :
         {QorImageSize{0, 1}, QorImageSize{1, 0}, QorImageSize{-1, 1}, QorImageSize{1, INT32_MIN}}) {
        QORI_EXPECT_STATUS(checksSize ? QOR_ERR_SIZE : QOR_ERR_MASK_SIZE, dst, call(function, s, 0, d, 0, empty, 0, 0));
        QORI_EXPECT_STATUS(checksSize ? QOR_ERR_SIZE : QOR_ERR_ANCHOR, dst, call(function, s, 0, d, 0, empty, 3, 3));
        QORI_EXPECT_STATUS(checksSize ? QOR_ERR_SIZE : QOR_OK, dst, call(function, s, 0, d, 0, empty, 3, 2));
    }
    QORI_EXPECT_STATUS(QOR_ERR_ANCHOR, dst, call(function, s, 72, d, 64, QorImageSize{1, 1}, 3, -1));
    QORI_EXPECT_STATUS(QOR_ERR_ANCHOR, dst, call(function, s, 72, d, 64, QorImageSize{1, 1}, 3, 3));
    if (!along) {
        const auto expectWithoutMemory = [&](QorResult expected, float* to, int size) {
            qorTestFailAllocation(1);
            EXPECT_EQ(expected, call(function, s, 72, to, 64, QorImageSize{1, 1}, size, 0));
            qorTestFailAllocation(0);
        };
        ASSERT_EQ(0u, reinterpret_cast<uintptr_t>(d) % 16);
        expectWithoutMemory(QOR_ERR_NO_MEMORY, d + 1, 3);
        expectWithoutMemory(sizeof(S) == 1 ? QOR_OK : QOR_ERR_NO_MEMORY, d, 3);
    }
    EXPECT_EQ(0, qorTestLiveBlocks());
    markSwept(name);
}

template <class S, Layout L, class Function>
void sumWindowRow(const char* name, Function function) {
    sweepSums<S, L, true>(name, function);
}
template <class S, Layout L, class Function>
void sumWindowColumn(const char* name, Function function) {
    sweepSums<S, L, false>(name, function);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(WindowSumsSweep, name) { operation<S, Layout::SL>(#name, &name); }
#include "members/window_sums.inc"
#undef QORI_MEMBER

/// Rows of several strips.
TEST(WindowSums, LongRowsOfBytes) {
    for (int padding : {0, 2})
        checkWindowSum<uint8_t, Layout::C3, false>({.width = 1'500, .height = 4, .padding = padding}, 5, 2,
                                                   qoriSumWindowColumn_8u32f_C3R);
}

/// Sums beyond 32 bits, and the rounding of sums beyond 2^24 in one step.
TEST(WindowSums, LongWindows) {
    const auto check = [](auto along, auto down, auto largest) {
        using S = decltype(largest);
        for (int size : {257, 65'537, 65'539, 140'001}) {
            const TestImage row(0, {.width = size + 2}, sizeof(S)),
                column(1, {.width = 1, .height = size + 2}, sizeof(S));
            row.fill<S>(1, [=] { return static_cast<S>(largest - random().below(2)); });
            for (int i = 0; i < size + 2; ++i) column.view<S>(1).set(0, i, 0, row.view<S>(1).get(i, 0));
            float sums[3], sumsDown[3];
            EXPECT_EQ(QOR_OK, call(along, row.data<const S>(), row.step(), +sums, 12, QorImageSize{3, 1}, size, 0));
            EXPECT_EQ(QOR_OK,
                      call(down, column.data<const S>(), column.step(), +sumsDown, 4, QorImageSize{1, 3}, size, 0));
            int64_t sum = 0;
            for (int i = 0; i < size - 1; ++i) sum += row.view<S>(1).get(i, 0);
            for (int x = 0; x < 3; ++x) {
                sum += row.view<S>(1).get(x + size - 1, 0);
                EXPECT_EQ(reference::toFloat(sum), sums[x]) << size;
                EXPECT_EQ(reference::toFloat(sum), sumsDown[x]) << size;
                sum -= row.view<S>(1).get(x, 0);
            }
        }
    };
    check(qoriSumWindowRow_8u32f_C1R, qoriSumWindowColumn_8u32f_C1R, uint8_t{255});
    check(qoriSumWindowRow_16u32f_C1R, qoriSumWindowColumn_16u32f_C1R, uint16_t{65535});
    check(qoriSumWindowRow_16s32f_C1R, qoriSumWindowColumn_16s32f_C1R, int16_t{32767});
    check(qoriSumWindowRow_16s32f_C1R, qoriSumWindowColumn_16s32f_C1R, int16_t{-32767});
}

}  // namespace
}  // namespace qori::test
