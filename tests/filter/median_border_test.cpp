// SPDX-License-Identifier: Apache-2.0
#include "median_cases.h"

namespace qori::test {
namespace {

enum Slots { kImage, kResult, kBuffer };

template <class T>
constexpr int32_t kTypeCode = std::is_same_v<T, uint8_t>    ? 1
                              : std::is_same_v<T, uint16_t> ? 5
                              : std::is_same_v<T, int16_t>  ? 7
                                                            : 13;

struct Job {
    QorImageSize mask, roi;
    int32_t border;
    bool inPlace;

    bool open(int32_t flag) const {
        return (border & 15) == borderReadAll || (border & 0xF0) == 0xF0 || (border & flag) != 0;
    }
    /// What is read beyond the region: memory exists there, and nowhere else.
    Around beyond() const {
        const int x = mask.width / 2, y = mask.height / 2;
        return {open(borderReadLeft) ? x : 0, open(borderReadTop) ? y : 0, open(borderReadRight) ? x : 0,
                open(borderReadBottom) ? y : 0};
    }
};

std::string describe(const Job& job) {
    return "mask " + std::to_string(job.mask.width) + "x" + std::to_string(job.mask.height) + ", region " +
           std::to_string(job.roi.width) + "x" + std::to_string(job.roi.height) + ", border " +
           std::to_string(job.border) + (job.inPlace ? ", in place" : "");
}

template <class T>
TestImage bufferOf(const Job& job) {
    int32_t bytes = -1;
    EXPECT_EQ(QOR_OK, call(qoriFilterMedianBorderGetBufferSize, job.roi, job.mask, kTypeCode<T>, 1, &bytes));
    return block(kBuffer, bytes, random().below(8));
}

template <class T, class Function>
void checkJob(Function function, const Job& job) {
    SCOPED_TRACE(describe(job));
    const Around beyond = job.beyond();
    const Shape shape{.width = job.roi.width,
                      .height = job.roi.height,
                      .padding = random().below(3) * 4,
                      .flipped = random().oneIn(3),
                      .atBegin = random().oneIn(2),
                      .shift = random().below(3)};
    const TestImage src(kImage, withAround(shape, beyond), sizeof(T));
    const TestImage dst = job.inPlace ? src : TestImage(kResult, shape, sizeof(T));
    dst.fill<T>(1, AnyValue<T>{});
    src.fill<T>(1, MedianValues<T>{});
    const T constant = drawQuiet<T>();
    const ptrdiff_t inside = beyond.top * ptrdiff_t{src.step()} + beyond.left * ptrdiff_t{sizeof(T)};
    Snapshot before = src.snapshot(), expected = dst.snapshot();
    const View<T> from = before.view<T>(1);
    View<T> to = expected.view<T>(1);
    if (job.inPlace) to.origin += inside;
    const auto nearest = [](int at, bool first, bool last, int size) {
        return at < 0 && !first ? 0 : at >= size && !last ? size - 1 : at;
    };
    const auto pixel = [&](int x, int y) {
        const int nearX = nearest(x, job.open(borderReadLeft), job.open(borderReadRight), job.roi.width);
        const int nearY = nearest(y, job.open(borderReadTop), job.open(borderReadBottom), job.roi.height);
        if ((job.border & 15) == borderConstant && (nearX != x || nearY != y)) return constant;
        return from.get(nearX + beyond.left, nearY + beyond.top);
    };
    const Around around = Around::ofMask(job.mask, {job.mask.width / 2, job.mask.height / 2});
    for (int y = 0; y < job.roi.height; ++y)
        for (int x = 0; x < job.roi.width; ++x)
            to.set(x, y, 0, medianAround(around, [&](int dx, int dy) { return pixel(x + dx, y + dy); }));
    const TestImage buffer = bufferOf<T>(job);
    auto* const source = src.data<uint8_t>() + inside;
    auto* const target = job.inPlace ? source : dst.data<uint8_t>();
    ASSERT_EQ(QOR_OK, call(function, reinterpret_cast<const T*>(source), src.step(), reinterpret_cast<T*>(target),
                           dst.step(), job.roi, job.mask, job.border, constant, buffer.data<uint8_t>()));
    QORI_EXPECT_UNCHANGED(dst, expected);
    if (!job.inPlace) {
        QORI_EXPECT_UNCHANGED(src, before);
    }
}

/// Either kind with any sides read from memory, all by either name, and refused kinds' neighbours in value.
int32_t drawBorder() {
    const int32_t border = random().below(2) | random().below(16) << 4;
    return random().oneIn(6) ? borderReadAll : border;
}

template <class T, class Function>
void medianBorder(const char* name, Function function) {
    const auto check = [=](const Job& job) {
        if (!testing::Test::HasFailure()) checkJob<T>(function, job);
    };
    const auto sides = {QorImageSize{3, 3}, {5, 5}, {3, 1}, {5, 1}, {1, 3}, {1, 5}, {3, 5}, {7, 7}, {1, 9}, {1, 1}};
    for (QorImageSize mask : sides) {
        // Every way of sides, at regions around the mask's size in both directions.
        for (int32_t border = 0; border < 32; ++border)
            for (int i = 0; i < 6; ++i)
                check({mask,
                       {1 + random().below(2 * mask.width + 2), 1 + random().below(2 * mask.height + 2)},
                       (border & 1) | border >> 1 << 4,
                       i % 2 == 0});
        for (int width = 1; width <= 70; ++width)
            check({mask, {width, 1 + random().below(24)}, drawBorder(), random().oneIn(2)});
        check({mask, {230, 40}, drawBorder(), true});
    }
    for (QorImageSize mask : {QorImageSize{25, 25}, {31, 3}, {61, 61}, {3, 259}, {131, 1}})
        for (bool inPlace : {false, true})
            check({mask, {1 + random().below(40), 1 + random().below(8)}, drawBorder(), inPlace});
    check({{7, 7}, {300, 210}, drawBorder(), true});
    markSwept(name);
}

/// Without an allocator, the caller's buffer alone serves, in place too.
template <class T, class Function>
void expectNoAllocatorNeeded(Function function) {
    for (int n = 1; n <= 3; ++n) {
        qorTestFailAllocation(1);
        checkJob<T>(function, {{7, 3 + 2 * n}, {70, 8 + n}, drawBorder(), n != 2});
        qorTestFailAllocation(0);
    }
}

TEST(MedianBorder, NeedsNoAllocator) {
    expectNoAllocatorNeeded<uint8_t>(qoriFilterMedianBorder_8u_C1R);
    expectNoAllocatorNeeded<uint16_t>(qoriFilterMedianBorder_16u_C1R);
    expectNoAllocatorNeeded<int16_t>(qoriFilterMedianBorder_16s_C1R);
    expectNoAllocatorNeeded<float>(qoriFilterMedianBorder_32f_C1R);
}

#define QORI_SWEEP_(...)
#define QORI_SWEEP_R(name, operation, S) \
    TEST(MedianBorderSweep, name) { operation<S>(#name, &name); }
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) QORI_SWEEP_##kind(name, operation, S)
#include "members/median_border.inc"
#undef QORI_MEMBER

constexpr int64_t A32(int64_t bytes) { return (bytes + 31) / 32 * 32; }

int64_t sizeOf(QorImageSize roi, QorImageSize mask, int32_t type) {
    int32_t bytes = -1;
    EXPECT_EQ(QOR_OK, call(qoriFilterMedianBorderGetBufferSize, roi, mask, type, 1, &bytes));
    return bytes;
}

/// Worked out by hand from the formula, term by term.
TEST(MedianBorder, BufferSizes) {
    // No mask area: 2 * 3 * 128 + 64 * (ceil(100 / 32) + ceil(50 / 32)) + A32(max(102 * 4, 52 * 4))
    EXPECT_EQ(768 + 64 * (4 + 2) + 416, sizeOf({100, 50}, {3, 3}, 1));
    // 2 * 5 * 224 + 64 * (ceil(400 / 32) + ceil(200 / 32)) + A32(max(104 * 14, 54 * 14))
    EXPECT_EQ(2240 + 64 * (13 + 7) + 1472, sizeOf({100, 50}, {5, 5}, 5));
    // 2 * 1 * 416 + 64 * (0 + ceil(400 / 32)) + A32(max(104 * 1 * 4, 50 * 7 * 4))
    EXPECT_EQ(832 + 64 * 13 + 1408, sizeOf({100, 50}, {5, 1}, 13));
    // A mask area of A32(4 * 2 * 49) = 416, and 2 * 7 * 224 + 64 * (ceil(600 / 32) + ceil(300 / 32)) + A32(106 * 20)
    EXPECT_EQ(416 + 3136 + 64 * (19 + 10) + 2144, sizeOf({100, 50}, {7, 7}, 7));
    // Sides below 6 that differ have an area too: A32(4 * 15)
    EXPECT_EQ(64 + 2 * 5 * 128 + 64 * (7 + 2) + A32(102 * 7), sizeOf({100, 50}, {3, 5}, 1));
    // Floats: lines, areas from 625 on, and others; a mask as wide or as high as the region
    EXPECT_EQ(32 + A32(106 * 1 * 4), sizeOf({100, 1}, {7, 1}, 13));
    EXPECT_EQ(A32(128 * 40 + 12288) + A32(44 * 74 * 4), sizeOf({20, 50}, {25, 25}, 13));
    EXPECT_EQ(A32(12 * 368 + 64 * 4) + A32(26 * 100 * 4), sizeOf({20, 50}, {7, 51}, 13));
    EXPECT_EQ(32, sizeOf({1, 1}, {1, 1}, 1));
}

TEST(MedianBorder, ChecksInOrder) {
    const TestImage src(kImage, {.width = 12, .height = 6}, 4), dst(kResult, {.width = 12, .height = 6}, 4);
    const TestImage buffer = block(kBuffer, 4096);
    uint8_t *b = buffer.data<uint8_t>(), *none = nullptr;
    const auto* s = src.data<uint8_t>();
    auto* d = dst.data<uint8_t>();
    const QorImageSize ok{4, 3}, empty{0, 3}, even{4, 3}, three{3, 3};
    const auto bytes = qoriFilterMedianBorder_8u_C1R;
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, bytes(nullptr, 7, d, 7, empty, even, 2, 0, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, bytes(s, 7, none, 7, empty, even, 2, 0, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, bytes(s, 7, d, 7, empty, even, 2, 0, none));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, bytes(s, 7, d, 7, empty, even, 2, 0, b));
    for (QorImageSize mask : {even, QorImageSize{3, 0}, {3, 4}, {-3, 3}})
        QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, bytes(s, 7, d, 7, ok, mask, 2, 0, b));
    for (int32_t border : {2, 3, 4, 5, 7, 15, 0xF2, 0xF3, 0x12, -1})
        QORI_EXPECT_STATUS(QOR_ERR_BAD_ARG, dst, bytes(s, 7, d, 7, ok, three, border, 0, b));
    QORI_EXPECT_STATUS(QOR_ERR_BAD_ARG, dst, bytes(s, 7, d, 7, ok, {1, 1}, 2, 0, b));

    const auto* words = src.data<int16_t>();
    const auto word = [&](int32_t srcStep, int32_t dstStep, QorImageSize roi) {
        return qoriFilterMedianBorder_16s_C1R(words, srcStep, dst.data<int16_t>(), dstStep, roi, even, 2, 0, b);
    };
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, word(101, 101, empty));
    QORI_EXPECT_STATUS(QOR_ERR_STEP_ALIGN, dst, word(101, 100, ok));
    QORI_EXPECT_STATUS(QOR_ERR_STEP_ALIGN, dst, word(100, -101, ok));
    QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, word(0, -100, ok));
    const auto real = [&](int32_t srcStep, int32_t dstStep) {
        return qoriFilterMedianBorder_32f_C1R(src.data<float>(), srcStep, dst.data<float>(), dstStep, ok, even, 2, 0,
                                              b);
    };
    for (int32_t step : {1, 2, 3, 102, -50}) {
        QORI_EXPECT_STATUS(QOR_ERR_STEP_ALIGN, dst, real(step, 100));
        QORI_EXPECT_STATUS(QOR_ERR_STEP_ALIGN, dst, real(100, step));
    }
    QORI_EXPECT_STATUS(QOR_ERR_MASK_SIZE, dst, real(-100, 0));
}

TEST(MedianBorder, QueryChecksInOrder) {
    int32_t bytes = -1;
    const auto query = qoriFilterMedianBorderGetBufferSize;
    EXPECT_EQ(QOR_ERR_NULL_PTR, query({0, 1}, {2, 2}, 2, 2, nullptr));
    EXPECT_EQ(QOR_ERR_SIZE, query({0, 1}, {2, 2}, 2, 2, &bytes));
    EXPECT_EQ(QOR_ERR_SIZE, query({1, -1}, {2, 2}, 2, 2, &bytes));
    for (QorImageSize mask : {QorImageSize{2, 3}, {3, 2}, {0, 3}, {3, -1}})
        EXPECT_EQ(QOR_ERR_MASK_SIZE, query({1, 1}, mask, 2, 2, &bytes));
    for (int32_t type : {0, 2, 19, -1}) EXPECT_EQ(QOR_ERR_DATA_TYPE, query({1, 1}, {3, 3}, type, 2, &bytes));
    for (int32_t channels : {0, 2, 3, 4})
        EXPECT_EQ(QOR_ERR_CHANNELS_UNSUPPORTED, query({1, 1}, {3, 3}, 1, channels, &bytes));
    for (QorImageSize roi : {QorImageSize{1, 1}, {INT32_MAX, INT32_MAX}})
        EXPECT_EQ(QOR_ERR_SIZE, query(roi, {INT32_MAX, INT32_MAX}, 13, 1, &bytes));
    EXPECT_EQ(QOR_ERR_SIZE, query({INT32_MAX, INT32_MAX}, {3, 3}, 1, 1, &bytes));
    EXPECT_EQ(-1, bytes);
    markSwept("qoriFilterMedianBorderGetBufferSize");
}

}  // namespace
}  // namespace qori::test
