// SPDX-License-Identifier: Apache-2.0
#include "filter_cases.h"

namespace qori::test {
namespace {

/// A call with its source: exactly the pixels that all windows together hold, at any anchor.
template <class S, class D, Layout L, class K>
struct Case {
    static constexpr int n = channels(L);
    Kernel<K> kernel;
    QorPoint2D anchor;
    QorImageSize roi;
    TestImage src, dst;

    Case(const Kernel<K>& k, int width)
        : kernel(k),
          anchor{random().below(k.width + 2) - 1, random().below(k.height + 2) - 1},
          roi{width, 1 + random().below(9)},
          src(kSrc, shape(k.width - 1, k.height - 1), n * int{sizeof(S)}),
          dst(kDst, shape(0, 0), n * int{sizeof(D)}) {
        src.template fill<S>(n, drawPixel<S>);
    }
    Shape shape(int wider, int higher) const {
        return {.width = roi.width + wider,
                .height = roi.height + higher,
                .padding = random().below(3) * random().below(30),
                .atBegin = random().oneIn(2),
                .shift = random().below(3)};
    }
    const S* origin() const {
        const ptrdiff_t x = kernel.width - 1 - anchor.x, y = kernel.height - 1 - anchor.y;
        return reinterpret_cast<const S*>(src.data<uint8_t>() + y * src.step() + x * n * int{sizeof(S)});
    }
    QorImageSize size() const { return {kernel.width, kernel.height}; }

    /// run(pSrc ... anchor) and then expectPixel(pixel(dx, dy), actual) for all of the result.
    template <class Run, class Expect>
    void check(Run run, Expect expectPixel) {
        const Snapshot sourceBefore = src.snapshot();
        Snapshot expected = dst.snapshot();
        ASSERT_EQ(QOR_OK, run(origin(), src.step(), dst.template data<D>(), dst.step(), roi, kernel.values.data(),
                              size(), anchor));
        QORI_EXPECT_UNCHANGED(src, sourceBefore);
        constexpr int processed = L == Layout::AC4 ? 3 : n;
        for (int y = 0; y < roi.height; ++y)
            for (int x = 0; x < roi.width; ++x)
                for (int c = 0; c < processed; ++c) {
                    const D actual = dst.template view<D>(n).get(x, y, c);
                    const auto pixel = [&](int dx, int dy) {
                        return src.template view<S>(n).get(x + dx + kernel.width - 1 - anchor.x,
                                                           y + dy + kernel.height - 1 - anchor.y, c);
                    };
                    expectPixel(pixel, actual);
                    if (testing::Test::HasFailure())
                        FAIL() << "at (" << x << ", " << y << ") channel " << c << " of " << roi.width << "x"
                               << roi.height << ", kernel " << kernel.width << "x" << kernel.height;
                    expected.view<D>(n).set(x, y, c, actual);
                }
        QORI_EXPECT_UNCHANGED(dst, expected);
    }
};

/// Calls with the extra arguments behind those that all forms share.
template <class Function, class... Extra>
auto withExtra(Function function, Extra... extra) {
    return [=](auto... shared) { return call(function, shared..., extra...); };
}

constexpr int kCases = 90;

template <class S, Layout L, class K, class MakeCall>
void checkIntegers(MakeCall makeCall, int32_t mode, int width) {
    Case<S, S, L, K> test(drawKernel<K>(drawSize(), 7), width);
    const int32_t divisor = drawDivisor();
    test.check(makeCall(test, divisor), [&](auto pixel, S actual) {
        const int64_t sum = reference::integerSum(test.kernel, test.anchor.x, test.anchor.y, pixel);
        const auto expected = reference::clampTo<S>(reference::divideRounded(sum, divisor, mode));
        EXPECT_EQ(expected, actual) << "sum " << sum << ", divisor " << divisor << ", mode " << mode;
    });
}

template <class S, class D, Layout L, class K, class MakeCall>
void checkFloats(MakeCall makeCall, int32_t mode, int width) {
    const Coefficients size = drawSize();
    constexpr bool wide = sizeof(S) == 8 || std::is_same_v<S, int32_t>;
    Case<S, D, L, K> test(drawKernel<K>(size), width);
    const bool eighths = size == Coefficients::small && std::is_integral_v<S>;
    test.check(makeCall(test), [&](auto pixel, D actual) {
        expectFloatSum<D>(reference::floatSum(test.kernel, test.anchor.x, test.anchor.y, pixel),
                          test.kernel.width * test.kernel.height, eighths, wide ? 0x1p-53 : 0x1p-24, mode, actual);
    });
}

template <class Check>
void forCases(const char* name, Check check) {
    const int blocks = qorTestLiveBlocks(), damaged = qorTestDamagedBlocks();
    for (int i = 0; i < kCases && !testing::Test::HasFailure(); ++i) check(i % 3, sweptWidth(i));
    EXPECT_EQ(blocks, qorTestLiveBlocks());
    EXPECT_EQ(damaged, qorTestDamagedBlocks());
    markSwept(name);
}

// What each operation of the registry is swept with; a new one does not compile until it is here.

template <class S, class D, Layout L, class Function>
void filterIntegers(const char* name, Function function) {
    forCases(name, [=](int32_t, int width) {
        checkIntegers<S, L, int32_t>([=](auto&, int32_t divisor) { return withExtra(function, divisor); },
                                     roundNearestEven, width);
    });
}

template <class S, class D, Layout L, class Function>
void filterFloats(const char* name, Function function) {
    forCases(name, [=](int32_t, int width) {
        checkFloats<S, S, L, S>([=](auto&) { return withExtra(function); }, roundNearestEven, width);
    });
}

template <class S, class D, Layout L, class Function>
void filter32f(const char* name, Function function) {
    forCases(name, [=](int32_t, int width) {
        checkFloats<S, D, L, float>([=](auto&) { return withExtra(function); }, roundNearestEven, width);
    });
}

/// Bytes that the rounding forms' queries report: 16 per coefficient, and so many per pixel of a row, and a constant.
template <class S, class K>
int expectedBytes(int channels, int area, int width) {
    if constexpr (std::is_same_v<K, float>) return 16 * area + 8 * channels * width + (channels == 4 ? 15 : 43);
    if constexpr (std::is_same_v<S, uint8_t>) return 16 * area + 4 * channels * width + 15;
    if constexpr (std::is_same_v<S, int16_t>) return 16 * area + 4 * channels * width + 31;
    return 16 * area + 8 * channels * width + 43;
}

template <class S, class K, Layout L>
constexpr auto bufferQuery = nullptr;
#define QORI_QUERIES(S, K, name)                                                          \
    template <>                                                                           \
    constexpr auto bufferQuery<S, K, Layout::C1> = qoriFilterRoundGetBufSize##name##_C1R; \
    template <>                                                                           \
    constexpr auto bufferQuery<S, K, Layout::C3> = qoriFilterRoundGetBufSize##name##_C3R; \
    template <>                                                                           \
    constexpr auto bufferQuery<S, K, Layout::C4> = qoriFilterRoundGetBufSize##name##_C4R; \
    template <>                                                                           \
    constexpr auto bufferQuery<S, K, Layout::AC4> = qoriFilterRoundGetBufSize##name##_AC4R;
QORI_QUERIES(uint8_t, int16_t, 16s_8u)
QORI_QUERIES(int16_t, int32_t, 32s_16s)
QORI_QUERIES(uint16_t, int32_t, 32s_16u)
QORI_QUERIES(uint8_t, float, 32f_8u)
QORI_QUERIES(int16_t, float, 32f_16s)
QORI_QUERIES(uint16_t, float, 32f_16u)
#undef QORI_QUERIES

/// A buffer of exactly the reported size.
template <class S, class K, Layout L>
uint8_t* makeBuffer(QorImageSize kernel, int32_t width) {
    int32_t bytes = -1;
    EXPECT_EQ(QOR_OK, call(bufferQuery<S, K, L>, kernel, width, &bytes));
    EXPECT_EQ((expectedBytes<S, K>(channels(L), kernel.width * kernel.height, width)), bytes);
    return block(kBuffer, bytes, random().below(16)).template data<uint8_t>();
}

template <class S, class D, Layout L, class Function>
void filterRound(const char* name, Function function) {
    using K = std::conditional_t<std::is_same_v<S, uint8_t>, int16_t, int32_t>;
    forCases(name, [=](int32_t mode, int width) {
        checkIntegers<S, L, K>(
            [=](auto& test, int32_t divisor) {
                return withExtra(function, divisor, mode, makeBuffer<S, K, L>(test.size(), test.roi.width));
            },
            mode, width);
    });
}

template <class S, class D, Layout L, class Function>
void filterRoundFloats(const char* name, Function function) {
    forCases(name, [=](int32_t mode, int width) {
        checkFloats<S, S, L, float>(
            [=](auto& test) { return withExtra(function, mode, makeBuffer<S, float, L>(test.size(), test.roi.width)); },
            mode, width);
    });
}

/// The sizes that the queries report are checked where they are used; here what they refuse.
template <class S, class D, Layout L, class Function>
void rowBufferSize(const char* name, Function function) {
    const TestImage out = block(kOther, 4);
    auto *size = out.data<int32_t>(), *none = static_cast<int32_t*>(nullptr);
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, out, call(function, QorImageSize{0, 0}, 0, none));
    for (QorImageSize bad : {QorImageSize{0, 1}, QorImageSize{1, -1}, QorImageSize{INT32_MIN, 1}})
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, call(function, bad, 9, size));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, call(function, QorImageSize{1, 1}, 0, size));
    if (std::is_same_v<S, double>) {
        EXPECT_EQ(QOR_OK, call(function, QorImageSize{100, 100}, INT32_MAX, size));
        EXPECT_EQ(0, *size);
    } else {
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, call(function, QorImageSize{1 << 14, 1 << 13}, 1, size));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, call(function, QorImageSize{INT32_MAX, INT32_MAX}, 1, size));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, out, call(function, QorImageSize{1, 1}, 1 << 29, size));
    }
    markSwept(name);
}

template <class S, class D, Layout L, class Function>
void noBuffer(const char* name, Function function) {
    rowBufferSize<S, D, L>(name, function);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(FilterSweep, name) { operation<S, D, Layout::SL>(#name, &name); }
#include "members/filter.inc"
#undef QORI_MEMBER

/// Arguments of a call around (1, 1) by a 3 x 3 kernel that fits 5 x 4 pixels of up to 8 bytes and 4 channels.
struct Fixture {
    TestImage src{kSrc, {.width = 7, .height = 6}, 8}, dst{kDst, {.width = 5, .height = 4}, 8},
        memory{block(kBuffer, 4096)};
    int32_t kernel[9] = {};
    const QorImageSize ok{5, 4}, three{3, 3}, none{0, 4};
    const QorPoint2D centre{1, 1};
};

TEST(Filter, RoundingFormsCheckInOrder) {
    const Fixture f;
    const auto *s = f.src.data<uint8_t>(), *k = reinterpret_cast<const uint8_t*>(f.kernel);
    auto *d = f.dst.data<uint8_t>(), *b = f.memory.data<uint8_t>();
    const auto run = [&](const uint8_t* src, int32_t srcStep, uint8_t* dst, int32_t dstStep, QorImageSize roi,
                         const uint8_t* kernel, QorImageSize size, int32_t divisor, int32_t mode, uint8_t* buffer) {
        return qoriFilter_Round16s_8u_C1R(src, srcStep, dst, dstStep, roi, reinterpret_cast<const int16_t*>(kernel),
                                          size, f.centre, divisor, mode, buffer);
    };
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, run(nullptr, 0, d, 0, f.none, k, f.three, 0, 3, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, run(s, 0, nullptr, 0, f.none, k, f.three, 0, 3, b));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, run(s, 0, d, 0, f.none, nullptr, f.three, 0, 3, b));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, f.dst, run(s, 0, d, 0, f.none, k, f.three, 0, 3, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, f.dst, run(s, 0, d, 0, f.ok, k, {3, 0}, 0, 3, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_DIVISOR, f.dst, run(s, 0, d, 0, f.ok, k, f.three, 0, 3, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, f.dst, run(s, 6, d, 5, f.ok, k, f.three, 1, 3, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, f.dst, run(s, 7, d, 4, f.ok, k, f.three, 1, 3, nullptr));
    for (int32_t bad : {3, -1})
        QORI_EXPECT_STATUS(QOR_ERR_ROUND_MODE, f.dst, run(s, 7, d, 5, f.ok, k, f.three, 1, bad, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst, run(s, 7, d, 5, f.ok, k, f.three, 1, 2, nullptr));
    const auto* floats = reinterpret_cast<const float*>(f.kernel);
    const auto* words = f.src.data<uint16_t>();
    QORI_EXPECT_STATUS(QOR_ERR_STEP, f.dst,
                       qoriFilter_Round32f_16u_C3R(words, 41, f.dst.data<uint16_t>(), 30, f.ok, floats, f.three,
                                                   f.centre, 3, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_ROUND_MODE, f.dst,
                       qoriFilter_Round32f_16u_C3R(words, 42, f.dst.data<uint16_t>(), 30, f.ok, floats, f.three,
                                                   f.centre, 3, nullptr));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, f.dst,
                       qoriFilter_Round32f_16u_C3R(words, 42, f.dst.data<uint16_t>(), 30, f.ok, floats, f.three,
                                                   f.centre, 0, nullptr));
}

TEST(Filter, FormsThatAllocateCheckInOrder) {
    const Fixture f;
    const auto* floats = reinterpret_cast<const float*>(f.kernel);
    const auto* bytes = f.src.data<uint8_t>();
    auto* d = f.dst.data<uint8_t>();
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, f.dst, qoriFilter_8u_AC4R(bytes, 0, d, 0, f.ok, f.kernel, {0, 3}, f.centre, 0));
    QORI_EXPECT_STATUS(QOR_ERR_DIVISOR, f.dst,
                       qoriFilter_8u_AC4R(bytes, 0, d, 0, f.ok, f.kernel, f.three, f.centre, 0));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, f.dst, qoriFilter_8u_AC4R(bytes, 27, d, 20, f.ok, f.kernel, f.three, f.centre, 1));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, f.dst, qoriFilter_8u_AC4R(bytes, 28, d, 19, f.ok, f.kernel, f.three, f.centre, 1));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, f.dst,
                       qoriFilter32f_8u16s_C1R(bytes, 7, f.dst.data<int16_t>(), 9, f.ok, floats, f.three, f.centre));
    QORI_EXPECT_STATUS(
        QOR_ERR_NULL_PTR, f.dst,
        qoriFilter_64f_C1R(nullptr, 0, f.dst.data<double>(), 0, f.none, f.src.data<double>(), f.three, f.centre));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, f.dst,
                       qoriFilter_64f_C1R(f.src.data<double>(), 55, f.dst.data<double>(), 40, f.ok,
                                          f.src.data<double>(), f.three, f.centre));
    const auto expectNoMemory = [&](auto run) {
        qorTestFailAllocation(1);
        QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, f.dst, run());
        EXPECT_EQ(QOR_OK, run());
    };
    expectNoMemory([&] { return qoriFilter_8u_AC4R(bytes, 28, d, 20, f.ok, f.kernel, f.three, f.centre, 1); });
    expectNoMemory([&] { return qoriFilter32f_8u_C1R(bytes, 7, d, 5, f.ok, floats, f.three, f.centre); });
    expectNoMemory([&] {
        return qoriFilter_64f_C1R(f.src.data<double>(), 56, f.dst.data<double>(), 40, f.ok, f.src.data<double>(),
                                  f.three, f.centre);
    });
}

}  // namespace
}  // namespace qori::test
