// SPDX-License-Identifier: Apache-2.0
#include <array>
#include <bit>

#include "filter_cases.h"

namespace qori::test {
namespace {

template <class T>
constexpr int32_t kTypeCode = std::is_same_v<T, uint8_t>    ? 1
                              : std::is_same_v<T, uint16_t> ? 5
                              : std::is_same_v<T, int16_t>  ? 7
                                                            : 13;
constexpr int32_t kIntegers = 7, kFloats = 13;

struct Job {
    QorImageSize kernel, roi;
    int32_t border;

    int left() const { return kernel.width / 2; }
    int top() const { return kernel.height / 2; }
    int right() const { return kernel.width - 1 - left(); }
    int bottom() const { return kernel.height - 1 - top(); }
    bool open(int32_t flag) const {
        return (border & 15) == borderReadAll || (border & 0xF0) == 0xF0 || (border & flag) != 0;
    }
};

std::string describe(const Job& job) {
    return "kernel " + std::to_string(job.kernel.width) + "x" + std::to_string(job.kernel.height) + ", region " +
           std::to_string(job.roi.width) + "x" + std::to_string(job.roi.height) + ", border " +
           std::to_string(job.border);
}

/// A source with memory beyond it on the open sides only, as wide as the kernel reaches.
template <class T, int channels>
struct Source {
    Job job;
    int left, top;
    T constant[channels];
    TestImage image;

    explicit Source(const Job& j)
        : job(j),
          left(j.open(borderReadLeft) ? j.left() : 0),
          top(j.open(borderReadTop) ? j.top() : 0),
          image(kSrc,
                {.width = j.roi.width + left + (j.open(borderReadRight) ? j.right() : 0),
                 .height = j.roi.height + top + (j.open(borderReadBottom) ? j.bottom() : 0),
                 .padding = random().below(3) * random().below(40),
                 .atBegin = random().oneIn(2),
                 .shift = random().below(3)},
                channels * int{sizeof(T)}) {
        image.fill<T>(channels, drawPixel<T>);
        for (T& c : constant) c = drawPixel<T>();
    }
    const T* origin() const {
        return reinterpret_cast<const T*>(image.data<uint8_t>() + ptrdiff_t{image.step()} * top +
                                          ptrdiff_t{int{sizeof(T)} * channels} * left);
    }
    T get(int x, int y, int c) const {
        const int nearX = std::clamp(x, job.open(borderReadLeft) ? x : 0,
                                     job.open(borderReadRight) ? std::max(x, 0) : job.roi.width - 1);
        const int nearY = std::clamp(y, job.open(borderReadTop) ? y : 0,
                                     job.open(borderReadBottom) ? std::max(y, 0) : job.roi.height - 1);
        if ((job.border & 15) == borderConstant && (nearX != x || nearY != y)) return constant[c];
        return image.view<T>(channels).get(left + nearX, top + nearY, c);
    }
};

/// Plan and buffer of exactly the reported sizes.
struct Blocks {
    int32_t planBytes = -1, bufferBytes = -1;
    QorLinearFilterPlan* plan;
    uint8_t* buffer;

    Blocks(const Job& job, int32_t dataType, int32_t kernelType, int32_t channels) {
        EXPECT_EQ(QOR_OK, call(qoriFilterBorderGetSize, job.kernel, job.roi, dataType, kernelType, channels, &planBytes,
                               &bufferBytes));
        plan = block(kPlan, planBytes, random().below(64)).data<QorLinearFilterPlan>();
        buffer = block(kBuffer, bufferBytes, random().below(64)).data<uint8_t>();
    }
};

/// Compares every pixel with expectPixel(pixel(dx, dy), actual).
template <class T, int channels, class Function, class Expect>
void runJob(Function function, const Source<T, channels>& source, const Blocks& blocks, Expect expectPixel) {
    const Job& job = source.job;
    SCOPED_TRACE(describe(job));
    const TestImage dst(
        kDst,
        {.width = job.roi.width, .height = job.roi.height, .padding = random().below(20), .atBegin = random().oneIn(2)},
        channels * int{sizeof(T)});
    const Snapshot sourceBefore = source.image.snapshot();
    Snapshot expected = dst.snapshot();
    ASSERT_EQ(QOR_OK, call(function, source.origin(), source.image.step(), dst.data<T>(), dst.step(), job.roi,
                           job.border, source.constant, blocks.plan, blocks.buffer));
    QORI_EXPECT_UNCHANGED(source.image, sourceBefore);
    const auto result = dst.view<T>(channels);
    for (int y = 0; y < job.roi.height; ++y)
        for (int x = 0; x < job.roi.width; ++x)
            for (int c = 0; c < channels; ++c) {
                const T actual = result.get(x, y, c);
                expectPixel([&](int dx, int dy) { return source.get(x + dx, y + dy, c); }, actual);
                if (testing::Test::HasFailure()) FAIL() << "at pixel (" << x << ", " << y << ") channel " << c;
                expected.view<T>(channels).set(x, y, c, actual);
            }
    QORI_EXPECT_UNCHANGED(dst, expected);
}

/// Any kind with any sides; 0x12 and its like are no refused kinds.
int32_t drawBorder() {
    static constexpr int32_t kinds[] = {0, 1, 0, 1, 6, 5, 7, 0x12, 0x13, 15};
    const int32_t kind = kinds[random().below(10)];
    return random().oneIn(2) ? kind : (kind & 15) | random().below(16) << 4 | (kind & 0x10);
}

Job drawJob(QorImageSize kernel, int width) {
    return {kernel, {width, 1 + random().below(width > 70 ? 6 : 24)}, drawBorder()};
}

template <class T, int channels, class Function>
void checkIntegers(Function function, const Source<T, channels>& source, const Kernel<int16_t>& kernel, int32_t divisor,
                   int32_t mode) {
    const Blocks blocks(source.job, kTypeCode<T>, kIntegers, channels);
    ASSERT_EQ(QOR_OK, call(qoriFilterBorderInit_16s, kernel.values.data(), source.job.kernel, divisor, kTypeCode<T>,
                           channels, mode, blocks.plan));
    runJob(function, source, blocks, [&](auto pixel, T actual) {
        const auto sum = static_cast<int32_t>(
            reference::integerSum(kernel, source.job.right(), source.job.bottom(), pixel));  // modulo 2^32
        const auto expected = reference::clampTo<T>(reference::divideRounded(sum, divisor, mode));
        EXPECT_EQ(expected, actual) << "sum " << sum << ", divisor " << divisor << ", mode " << mode;
    });
}

template <class T, int channels, class Function>
void checkIntegers(Function function, const Kernel<int16_t>& kernel, int32_t divisor, int32_t mode, int width) {
    checkIntegers<T, channels>(function, Source<T, channels>(drawJob({kernel.width, kernel.height}, width)), kernel,
                               divisor, mode);
}

/// `integers` stand for the same kernel where it is made from them.
template <class T, int channels, class Function>
void checkFloats(Function function, const Kernel<float>& kernel, bool eighths, int32_t mode, int width,
                 int32_t divisor = 0) {
    const Source<T, channels> source(drawJob({kernel.width, kernel.height}, width));
    const Blocks blocks(source.job, kTypeCode<T>, divisor == 0 ? kFloats : kIntegers, channels);
    Kernel<float> applied = kernel;
    if (divisor == 0) {
        ASSERT_EQ(QOR_OK, call(qoriFilterBorderInit_32f, kernel.values.data(), source.job.kernel, kTypeCode<T>,
                               channels, mode, blocks.plan));
    } else {
        const std::vector<int16_t> integers(kernel.values.begin(), kernel.values.end());
        ASSERT_EQ(QOR_OK, call(qoriFilterBorderInit_16s, integers.data(), source.job.kernel, divisor, kTypeCode<T>,
                               channels, mode, blocks.plan));
        for (float& k : applied.values) k = static_cast<float>(k * (1.0 / divisor));
    }
    runJob(function, source, blocks, [&](auto pixel, T actual) {
        expectFloatSum<T>(reference::floatSum(applied, source.job.right(), source.job.bottom(), pixel),
                          kernel.width * kernel.height, eighths, 0x1p-24, mode, actual);
    });
}

template <class T, int channels, class Function>
void filterBorder(const char* name, Function function) {
    constexpr int kJobs = 90;
    constexpr bool hasIntegers = std::is_same_v<T, uint8_t> || (std::is_same_v<T, int16_t> && channels == 1);
    for (int i = 0; i < kJobs && !testing::Test::HasFailure(); ++i) {
        const int32_t mode = i % 3;
        const int width = sweptWidth(i);
        const Coefficients size = drawSize();
        const int most = i % 10 == 0 ? 31 : 9;
        if constexpr (hasIntegers)
            checkIntegers<T, channels>(function, drawKernel<int16_t>(size, most), drawDivisor(), mode, width);
        checkFloats<T, channels>(function, drawKernel<float>(size, most),
                                 size == Coefficients::small && !std::is_same_v<T, float>, mode, width);
        if constexpr (!hasIntegers && !std::is_same_v<T, float>) {
            Kernel<float> kernel = drawKernel<float>(Coefficients::small);
            for (float& k : kernel.values) k = static_cast<float>(drawCoefficient<int16_t>(size));
            checkFloats<T, channels>(function, kernel, false, mode, width, drawDivisor());
        }
    }
    markSwept(name);
}

#define QORI_SWEEP_(...)
#define QORI_SWEEP_R(name, operation, S, SL) \
    TEST(FilterBorderSweep, name) { operation<S, channels(Layout::SL)>(#name, &name); }
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) QORI_SWEEP_##kind(name, operation, S, SL)
#include "members/filter_border.inc"
#undef QORI_MEMBER
#undef QORI_SWEEP_
#undef QORI_SWEEP_R

TEST(FilterBorder, OneCoefficientOfOneCopies) {
    const int16_t one = 1;
    const float oneFloat = 1;
    for (int32_t border : {0, 1, 6, 5, 0x30, 0xF1}) {
        const Job job{{1, 1}, {37, 5}, border};
        const Source<uint8_t, 3> bytes(job);
        const Blocks forBytes(job, 1, kIntegers, 3);
        ASSERT_EQ(QOR_OK, call(qoriFilterBorderInit_16s, &one, job.kernel, 1, 1, 3, 0, forBytes.plan));
        runJob(qoriFilterBorder_8u_C3R, bytes, forBytes,
               [](auto pixel, uint8_t actual) { EXPECT_EQ(pixel(0, 0), actual); });
        const Source<float, 1> floats(job);
        floats.image.view<float>(1).set(3, 2, 0, -0.0f);
        const Blocks forFloats(job, 13, kFloats, 1);
        ASSERT_EQ(QOR_OK, call(qoriFilterBorderInit_32f, &oneFloat, job.kernel, 13, 1, 0, forFloats.plan));
        runJob(qoriFilterBorder_32f_C1R, floats, forFloats, [](auto pixel, float actual) {
            const float expected = pixel(0, 0);
            EXPECT_EQ(std::bit_cast<uint32_t>(expected), std::bit_cast<uint32_t>(actual));
        });
    }
}

TEST(FilterBorder, EveryQuotientIsRoundedExactly) {
    // Single coefficients meet all bytes: sums of any size by divisors of any kind.
    std::vector<uint8_t> src(256), dst(256);
    for (size_t i = 0; i < 256; ++i) src[i] = static_cast<uint8_t>(i);
    const Job job{{1, 1}, {256, 1}, borderReplicate};
    const Blocks blocks(job, 1, kIntegers, 1);
    const uint8_t zero = 0;
    for (int n = 0; n < 4000; ++n) {
        auto k = random().value<int16_t>();
        // About the coefficient, so that quotients lie in the range; halves of the divisor give integers and ties.
        const int32_t scale = std::max(1, std::abs(int32_t{k})), mode = n % 3;
        int32_t divisor = random().oneIn(4) ? drawDivisor() : 1 + random().below(2 * scale);
        if (random().oneIn(2)) {
            divisor = 1 + random().below(8000);
            k = static_cast<int16_t>(divisor * (1 + random().below(8)) / 2);
        }
        ASSERT_EQ(QOR_OK, qoriFilterBorderInit_16s(&k, {1, 1}, divisor, 1, 1, mode, blocks.plan));
        ASSERT_EQ(QOR_OK, call(qoriFilterBorder_8u_C1R, src.data(), 256, dst.data(), 256, job.roi, 1, &zero,
                               blocks.plan, blocks.buffer));
        for (int i = 0; i < 256; ++i)
            ASSERT_EQ(reference::clampTo<uint8_t>(reference::divideRounded(k * i, divisor, mode)),
                      dst[static_cast<size_t>(i)])
                << k << " * " << i << " / " << divisor << " by mode " << mode;
    }
}

TEST(FilterBorder, EverySumOfSmallKernelsIsDividedExactly) {
    // 126 a + b takes every value that sums of bytes by coefficients of 8 bits can have, upwards and downwards.
    constexpr int kSums = 127 * 255 + 1;
    std::vector<uint8_t> src(2 * kSums), dst(2 * kSums);
    for (int sum = 0; sum < kSums; ++sum) {
        const int a = std::min(sum / 126, 255);
        src[static_cast<size_t>(2 * sum)] = static_cast<uint8_t>(a);
        src[static_cast<size_t>(2 * sum) + 1] = static_cast<uint8_t>(sum - 126 * a);
    }
    const Job job{{2, 1}, {2 * kSums, 1}, borderReplicate};
    const Blocks blocks(job, 1, kIntegers, 1);
    const uint8_t zero = 0;
    for (int32_t divisor = 1; divisor <= 800; ++divisor)
        for (int32_t mode = 0; mode < 3; ++mode) {
            const int16_t sign = divisor % 50 == 1 ? -1 : 1;
            const int16_t kernel[2] = {sign, static_cast<int16_t>(126 * sign)};  // turned: 126 meets the first pixel
            ASSERT_EQ(QOR_OK, qoriFilterBorderInit_16s(kernel, job.kernel, divisor * sign, 1, 1, mode, blocks.plan));
            ASSERT_EQ(QOR_OK, qoriFilterBorder_8u_C1R(src.data(), 2 * kSums, dst.data(), 2 * kSums, job.roi, 1, &zero,
                                                      blocks.plan, blocks.buffer));
            for (int sum = 0; sum < kSums; ++sum) {
                const auto expected =
                    reference::clampTo<uint8_t>(reference::divideRounded(sum * sign, divisor * sign, mode));
                const uint8_t actual = dst[static_cast<size_t>(2 * sum) + 1];
                if (expected != actual) FAIL() << sum << " / " << divisor << " by mode " << mode << " is " << +actual;
            }
        }
}

/// A kernel of bytes whose magnitudes come to about `most` in its heaviest row, or in all where `inAll`.
Kernel<int16_t> drawByteKernel(int most, bool inAll) {
    Kernel<int16_t> kernel{1 + random().below(18), 1 + random().below(24), {}};
    const auto area = static_cast<size_t>(kernel.width * kernel.height);
    kernel.values.assign(area, 0);
    const int signs = random().below(3);  // all positive, all negative, any
    const size_t heaviest = random().oneIn(2) ? 1 : 127;
    for (int left = most; left > 0;) {
        const auto at = static_cast<size_t>(random().below(inAll ? static_cast<int>(area) : kernel.width));
        const int k = std::min(left, 1 + random().below(static_cast<int>(heaviest)));
        const bool negative =
            kernel.values[at] < 0 || (kernel.values[at] == 0 && (signs == 2 ? random().oneIn(2) : signs == 1));
        const int sum = kernel.values[at] + (negative ? -k : k);
        if (sum >= -128 && sum <= 128) kernel.values[at] = static_cast<int16_t>(sum);
        left -= k;
    }
    if (!inAll)
        for (size_t i = static_cast<size_t>(kernel.width); i < area; ++i)
            kernel.values[i] = kernel.values[i % static_cast<size_t>(kernel.width)];
    return kernel;
}

/// Sums that leave 16 bits are made of parts that do not; pixel (0, 0) meets the largest or the least sum.
template <int channels, class Function>
void checkLargestByteSums(Function function) {
    for (int n = 0; n < 150 && !testing::Test::HasFailure(); ++n) {
        const bool inAll = random().oneIn(2);
        const Kernel<int16_t> kernel = drawByteKernel(inAll ? 250 + random().below(10) : 3 + random().below(90), inAll);
        Job job = drawJob({kernel.width, kernel.height}, sweptWidth(random().below(120)));
        job.border = borderReadAll;
        Source<uint8_t, channels> source(job);
        const bool least = random().oneIn(2);
        for (int j = 0; j < kernel.height; ++j)
            for (int i = 0; i < kernel.width; ++i)
                for (int c = 0; c < channels; ++c) {
                    const bool positive = kernel.values[static_cast<size_t>(j * kernel.width + i)] > 0;
                    source.image.template view<uint8_t>(channels).set(kernel.width - 1 - i, kernel.height - 1 - j, c,
                                                                      positive != least ? 255 : 0);
                }
        const int32_t divisor = (random().oneIn(2) ? 1 : -1) * (1 + random().below(600));
        checkIntegers<uint8_t, channels>(function, source, kernel, divisor, n % 3);
    }
}

TEST(FilterBorder, LargestByteSums) {
    checkLargestByteSums<1>(qoriFilterBorder_8u_C1R);
    checkLargestByteSums<3>(qoriFilterBorder_8u_C3R);
    checkLargestByteSums<4>(qoriFilterBorder_8u_C4R);
}

TEST(FilterBorder, SumsBeyond32BitsWrap) {
    // Each pair of products is 2^31.
    const std::vector<int16_t> kernel(4, INT16_MIN), src(16, INT16_MIN);
    std::vector<int16_t> dst(16, 7);
    const Job job{{2, 2}, {16, 1}, borderReplicate};
    const Blocks blocks(job, 7, kIntegers, 1);
    ASSERT_EQ(QOR_OK, qoriFilterBorderInit_16s(kernel.data(), job.kernel, 3, 7, 1, 1, blocks.plan));
    ASSERT_EQ(QOR_OK, qoriFilterBorder_16s_C1R(src.data(), 32, dst.data(), 32, job.roi, 1, src.data(), blocks.plan,
                                               blocks.buffer));
    EXPECT_EQ(std::vector<int16_t>(16, 0), dst);  // 2^32
}

// --- queries and statuses -------------------------------------------------------------------------------------------

TEST(FilterBorder, SizesFollowTheirFormulas) {
    const auto sizes = [](QorImageSize kernel, QorImageSize roi, int32_t dataType, int32_t kernelType,
                          int32_t channels) {
        std::pair<int32_t, int32_t> result{-1, -1};
        EXPECT_EQ(QOR_OK, call(qoriFilterBorderGetSize, kernel, roi, dataType, kernelType, channels, &result.first,
                               &result.second));
        return result;
    };
    using Pair = std::pair<int32_t, int32_t>;
    const QorImageSize k{5, 3}, roi{100, 50};
    // Plan: 3 * 3 pairs of 32 bytes are 288, up to 320; 15 coefficients are 30 or 60, up to 64; and 191.
    // Border: bands of 4 rows of 104 pixels, strips of 50 rows of 13.
    EXPECT_EQ(Pair(320 + 64 + 191, 63 + 1024 + 3200), sizes(k, roi, 1, 7, 1));  // 32 * 28 = 896, up by 128 to a 64th
    EXPECT_EQ(Pair(320 + 64 + 191, 63 + 1600 + 3200), sizes(k, roi, 1, 7, 3));  // 16 * 90 = 1440; strips of 39 bytes
    EXPECT_EQ(Pair(320 + 64 + 191, 63 + 1984 + 3200), sizes(k, roi, 1, 7, 4));  // 16 * 115 = 1840
    EXPECT_EQ(Pair(320 + 64 + 191, 63 + 0 + 3200), sizes(k, roi, 1, 7, 2));
    EXPECT_EQ(Pair(320 + 64 + 191, 63 + 768 + 3200), sizes(k, roi, 7, 7, 1));  // 16 * 40 = 640
    EXPECT_EQ(Pair(320 + 64 + 191, 63 + 0 + 3200), sizes(k, roi, 13, 7, 1));
    EXPECT_EQ(Pair(320 + 64 + 191, 63 + 0 + 6400), sizes(k, roi, 13, 13, 2));
    for (int32_t kernelType : {7, 13}) {
        EXPECT_EQ(Pair(575, 63 + 576 + 3200), sizes(k, roi, 5, kernelType, 1));   // 16 * 27 = 432
        EXPECT_EQ(Pair(575, 63 + 5248 + 6400), sizes(k, roi, 7, kernelType, 3));  // 32 * 75 + 16 * 167 = 5072
    }
    EXPECT_EQ(Pair(575, 63 + 640 + 3200), sizes(k, roi, 13, 13, 1));   // 32 * 15 = 480
    EXPECT_EQ(Pair(575, 63 + 384 + 12800), sizes(k, roi, 13, 13, 4));  // 16 * 15 = 240; strips of 208 bytes
    for (const char* name : {"GetSize", "Init_16s", "Init_32f"})
        markSwept((std::string("qoriFilterBorder") + name).c_str());
}

TEST(FilterBorder, RefusesSizesBeyond32Bits) {
    int32_t plan = 7, buffer = 7;
    const auto status = [&](QorImageSize kernel, QorImageSize roi) {
        return call(qoriFilterBorderGetSize, kernel, roi, 1, 7, 1, &plan, &buffer);
    };
    EXPECT_EQ(QOR_ERR_SIZE, status({INT32_MAX, INT32_MAX}, {1, 1}));
    EXPECT_EQ(QOR_ERR_SIZE, status({1 << 14, 1 << 13}, {1, 1}));
    EXPECT_EQ(QOR_ERR_SIZE, status({1, 1}, {1, 1 << 25}));  // 64 bytes of strip a row
    EXPECT_EQ(QOR_ERR_SIZE, status({1, 1 << 20}, {INT32_MAX, INT32_MAX}));
    EXPECT_EQ(7, plan);
    EXPECT_EQ(7, buffer);
    EXPECT_EQ(QOR_OK, status({1, 1}, {1, (1 << 25) - 4}));
    EXPECT_EQ(64 * ((1 << 25) - 4) + 63 + 192, buffer);
}

TEST(FilterBorder, QueryAndInitialisersCheckInOrder) {
    const TestImage out = block(kPlan, 1024), source = block(kSrc, 64);
    auto *plan = out.data<QorLinearFilterPlan>(), *noPlan = static_cast<QorLinearFilterPlan*>(nullptr);
    auto *sizes = out.data<int32_t>(), *noSize = static_cast<int32_t*>(nullptr);
    const auto* k = source.data<int16_t>();
    const auto* f = source.data<float>();
    const QorImageSize ok{3, 3}, none{3, 0}, negative{-1, 3};
    const auto query = [&](QorImageSize kernel, QorImageSize roi, int32_t dataType, int32_t kernelType,
                           int32_t channels) {
        return qoriFilterBorderGetSize(kernel, roi, dataType, kernelType, channels, noSize, sizes);
    };
    for (QorImageSize bad : {none, negative}) {
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, query(bad, ok, 2, 2, 0));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, query(ok, bad, 2, 2, 0));
    }
    for (int32_t bad : {0, 2, 6, 8, 19, -1}) {
        QORI_EXPECT_STATUS(QOR_ERR_DATA_TYPE, out, query(ok, ok, bad, 7, 0));
        QORI_EXPECT_STATUS(QOR_ERR_DATA_TYPE, out, query(ok, ok, 1, bad, 0));
    }
    for (int32_t bad : {1, 5}) QORI_EXPECT_STATUS(QOR_ERR_DATA_TYPE, out, query(ok, ok, 1, bad, 0));
    for (int32_t bad : {0, 5, -1}) QORI_EXPECT_STATUS(QOR_ERR_CHANNELS, out, query(ok, ok, 1, 7, bad));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, query(ok, ok, 1, 7, 1));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriFilterBorderGetSize(ok, ok, 1, 7, 1, sizes, noSize));

    const auto init = [&](QorImageSize size, int32_t divisor, int32_t dataType, int32_t channels, int32_t mode) {
        return qoriFilterBorderInit_16s(k, size, divisor, dataType, channels, mode, plan);
    };
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriFilterBorderInit_16s(nullptr, none, 0, 2, 0, 3, plan));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriFilterBorderInit_16s(k, none, 0, 2, 0, 3, noPlan));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, init(none, 0, 2, 0, 3));
    for (int32_t bad : {2, 13, 0}) QORI_EXPECT_STATUS(QOR_ERR_DATA_TYPE, out, init(ok, 0, bad, 0, 3));
    for (int32_t bad : {0, 5}) QORI_EXPECT_STATUS(QOR_ERR_CHANNELS, out, init(ok, 0, 5, bad, 3));
    for (int32_t bad : {3, -1}) QORI_EXPECT_STATUS(QOR_ERR_ROUND_MODE, out, init(ok, 0, 5, 1, bad));
    for (int32_t type : {1, 5, 7}) QORI_EXPECT_STATUS(QOR_ERR_DIVISOR, out, init(ok, 0, type, 1, 1));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriFilterBorderInit_32f(nullptr, none, 2, 0, 3, plan));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, qoriFilterBorderInit_32f(f, none, 2, 0, 3, noPlan));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, qoriFilterBorderInit_32f(f, negative, 2, 0, 3, plan));
    QORI_EXPECT_STATUS(QOR_ERR_DATA_TYPE, out, qoriFilterBorderInit_32f(f, ok, 2, 0, 3, plan));
    QORI_EXPECT_STATUS(QOR_ERR_CHANNELS, out, qoriFilterBorderInit_32f(f, ok, 13, 0, 3, plan));
    QORI_EXPECT_STATUS(QOR_ERR_ROUND_MODE, out, qoriFilterBorderInit_32f(f, ok, 13, 2, 3, plan));
    EXPECT_EQ(QOR_OK, qoriFilterBorderInit_32f(f, {1, 1}, 13, 2, 2, plan));
}

TEST(FilterBorder, RecordsBeginWithPathAndSize) {
    const int16_t integers[6] = {1, 2, 3, 4, 5, 6};
    const float floats[6] = {};
    const auto expectRecord = [](const Blocks& blocks, int32_t path) {
        const auto aligned = (reinterpret_cast<uintptr_t>(blocks.plan) + 63) & ~uintptr_t{63};
        const auto* record = reinterpret_cast<const int32_t*>(aligned);
        EXPECT_EQ((std::array{path, 3, 2}), (std::array{record[0], record[1], record[2]}));
    };
    const Job job{{3, 2}, {8, 8}, borderReplicate};
    struct Case {
        int32_t type, channels, path;
    };
    for (const auto& [type, channels, path] : {Case{1, 4, 0}, {7, 1, 1}, {7, 2, 1}, {7, 3, 4}, {5, 1, 5}}) {
        const Blocks blocks(job, type, kIntegers, channels);
        EXPECT_EQ(QOR_OK, qoriFilterBorderInit_16s(integers, job.kernel, 3, type, channels, 1, blocks.plan));
        expectRecord(blocks, path);
    }
    for (const auto& [type, channels, path] : {Case{1, 1, 3}, {7, 1, 4}, {5, 3, 5}, {13, 4, 6}}) {
        const Blocks blocks(job, type, kFloats, channels);
        EXPECT_EQ(QOR_OK, qoriFilterBorderInit_32f(floats, job.kernel, type, channels, 1, blocks.plan));
        expectRecord(blocks, path);
    }
}

TEST(FilterBorder, OperationsCheckInOrder) {
    const Job job{{3, 3}, {4, 2}, borderReplicate};
    const Blocks blocks(job, 1, kIntegers, 3);
    const int16_t kernel[9] = {};
    ASSERT_EQ(QOR_OK, qoriFilterBorderInit_16s(kernel, job.kernel, 1, 1, 3, 1, blocks.plan));
    const TestImage src(kSrc, {.width = 4, .height = 2}, 3), dst(kDst, {.width = 4, .height = 2}, 3);
    const auto *s = src.data<uint8_t>(), *noPixels = static_cast<const uint8_t*>(nullptr);
    auto *d = dst.data<uint8_t>(), *b = blocks.buffer;
    const QorLinearFilterPlan *p = blocks.plan, *noPlan = nullptr;
    const QorImageSize none{0, 2};
    const auto f = qoriFilterBorder_8u_C3R;
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, f(noPixels, 0, d, 0, none, 2, s, p, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, f(s, 0, nullptr, 0, none, 2, s, p, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, f(s, 12, d, 12, job.roi, borderReplicate, noPixels, p, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, f(s, 0, d, 0, none, 2, s, noPlan, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, f(s, 0, d, 0, none, 2, s, p, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, f(s, 0, d, 0, none, 2, s, p, b));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, f(s, 0, d, 12, job.roi, 2, s, p, b));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, f(s, -12, d, 12, job.roi, 2, s, p, b));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, f(s, 1000, d, 11, job.roi, 2, s, p, b));
    for (int32_t bad : {2, 3, 4}) QORI_EXPECT_STATUS(QOR_ERR_BORDER, dst, f(s, 12, d, 12, job.roi, bad, s, p, b));
    EXPECT_EQ(QOR_OK, f(s, 1, d, 12, {4, 1}, 5, s, p, b));  // the source step is used for several rows only
}

}  // namespace
}  // namespace qori::test
