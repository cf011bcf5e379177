// SPDX-License-Identifier: Apache-2.0
#include "arith.h"

namespace qori::test {
namespace {

/// Calls a constant form of either kind.
template <class T, Layout layout, Kind kind, class Function, class... Parameters>
QorResult callConstant(Function function, const T* value, const TestImage& src, const TestImage& dst, QorImageSize roi,
                       Parameters... parameters) {
    const auto constants = [&] {
        if constexpr (layout == Layout::C1)
            return *value;
        else
            return value;
    }();
    if constexpr (kind == Kind::IR)
        return call(function, constants, dst.data<T>(), dst.step(), roi, parameters...);
    else
        return call(function, src.data<T>(), src.step(), constants, dst.data<T>(), dst.step(), roi, parameters...);
}

template <class T>
constexpr bool isByte = std::is_same_v<T, uint8_t>;
// The one addition of floats that takes any step.
template <class T, Layout layout, Kind kind>
constexpr bool anyStep_addConstant = isByte<T> || (std::is_same_v<T, float> && layout == Layout::C1 && kind == Kind::R);
template <class T, Layout, Kind>
constexpr bool anyStep_subtractConstant = isByte<T>;
template <class T, Layout, Kind>
constexpr bool anyStep_multiplyConstant = isByte<T>;
template <class, Layout, Kind>
constexpr bool anyStep_divideConstant = false;

/// reference(value, src, scale) gives one element. `nonZero` constants are divisors; else all channels get one small
/// value now and then, which opens the shortcuts.
template <class T>
__attribute__((noinline)) void sweep(
    const char* name, Layout layout, Kind kind, bool anyStep, bool nonZero,
    FunctionRef<QorResult(const T*, const TestImage&, const TestImage&, QorImageSize, int32_t)> invoke,
    FunctionRef<T(T, T, int32_t)> reference) {
    forShapesAndScales(!reference::isFloat<T>, anyStep, [&](const Shape& shape, int32_t scale) {
        T value[4];
        const bool small = random().oneIn(6);
        const int part = random().below(2);
        const T common = reference::byPart(T{}, T{}, [=](auto x, auto) { return static_cast<decltype(x)>(part); });
        for (T& v : value) do
                v = small ? common : NearPowers<T>{}();
            while (nonZero && reference::isZero(v) && !small);
        if (nonZero && reference::isZero(value[0])) return;
        checkUnary<T, T>(
            shape, layout, kind,
            [&](const TestImage& src, const TestImage& dst, QorImageSize roi) {
                EXPECT_EQ(QOR_OK, invoke(value, src, dst, roi, scale));
            },
            [&](T a, int c) { return reference(value[c], a, scale); }, NearPowers<T>{});
    });
    markSwept(name);
}

/// Sweep and statuses of the operation `operation`; `reference_` gets (value, src, scale).
#define QORI_SCALED_SWEEP(operation, divides, reference_)                             \
    template <class T, Layout layout, Kind kind, class Function>                      \
    void operation(const char* name, Function function) {                             \
        constexpr bool anyStep = anyStep_##operation<T, layout, kind>;                \
        sweep<T>(                                                                     \
            name, layout, kind, anyStep, divides,                                     \
            [=](const T* value, const auto&... rest) {                                \
                return callScaled<T, layout, kind>(function, value, rest...);         \
            },                                                                        \
            [](T value, T a, int32_t scale) { return reference_(value, a, scale); }); \
    }

template <class T, Layout layout, Kind kind, class Function>
QorResult callScaled(Function function, const T* value, const TestImage& src, const TestImage& dst, QorImageSize roi,
                     int32_t scale) {
    return withScale<T>(scale,
                        [&](auto... s) { return callConstant<T, layout, kind>(function, value, src, dst, roi, s...); });
}

/// Images are divided by the reciprocal, constants correctly.
template <class T>
T divideByConstant(T value, T a, int32_t scale) {
    if constexpr (std::is_same_v<T, float>)
        return a / value;
    else
        return reference::divide(value, a, scale);
}

QORI_SCALED_SWEEP(addConstant, false, reference::add<T>)
QORI_SCALED_SWEEP(subtractConstant, false, reference::subtract<T>)
QORI_SCALED_SWEEP(multiplyConstant, false, reference::multiply<T>)
QORI_SCALED_SWEEP(divideConstant, true, divideByConstant<T>)

template <class T, Layout layout, Kind kind, class Function>
void multiplyConstantFraction(const char* name, Function function) {
    sweep<T>(
        name, layout, kind, false, false,
        [=](const T* value, const auto& src, const auto& dst, QorImageSize roi, int32_t) {
            return callConstant<T, layout, kind>(function, value, src, dst, roi);
        },
        [](T value, T a, int32_t) { return reference::multiplyFractions(value, a); });
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(ConstantArithmeticSweep, name) { operation<S, Layout::SL, Kind::kind>(#name, &name); }
#include "members/arith_constant.inc"
#undef QORI_MEMBER

TEST(ConstantArithmetic, AllBytesAndConstantsAtEveryScaleFactor) {
    std::vector<uint8_t> src(256), dst(256);
    for (size_t i = 0; i < 256; ++i) src[i] = static_cast<uint8_t>(i);
    const auto check = [&](auto function, auto reference, int first) {
        for (int s = -40; s <= 40; ++s)
            for (int v = first; v < 256; ++v) {
                const auto value = static_cast<uint8_t>(v);
                ASSERT_EQ(QOR_OK, call(function, src.data(), 256, value, dst.data(), 256, QorImageSize{256, 1}, s));
                for (size_t i = 0; i < 256; ++i)
                    ASSERT_EQ(reference(value, src[i], s), dst[i]) << i << " and " << v << ", scale " << s;
            }
    };
    check(qoriAddC_8u_C1RSfs, reference::add<uint8_t>, 0);
    check(qoriSubC_8u_C1RSfs, reference::subtract<uint8_t>, 0);
    check(qoriMulC_8u_C1RSfs, reference::multiply<uint8_t>, 0);
    check(qoriDivC_8u_C1RSfs, divideByConstant<uint8_t>, 1);
}

/// How a call with faults is made: which pointers are null, the constants, the steps and the region.
template <class T>
using FaultyCall = FunctionRef<QorResult(bool noSrc, bool noDst, const T*, int srcStep, int dstStep, QorImageSize)>;

/// Faults and their order. Without `anyStep` a step below 1 is one.
template <class T>
__attribute__((noinline)) void checkStatuses(const TestImage& dst, bool severalChannels, bool readsSource, bool anyStep,
                                             bool divides, FaultyCall<T> statusOf) {
    const T one = reference::byPart(T{}, T{}, [](auto x, auto) { return static_cast<decltype(x)>(1); });
    const T good[4] = {one, one, one, one};
    const T zero[4] = {one, one, T{}, one}, *anyZero = severalChannels ? zero : zero + 2;
    const QorImageSize none{0, 1}, ok{1, 1};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, statusOf(true, true, anyZero, 0, 0, none));
    if (severalChannels) {
        QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, statusOf(false, false, nullptr, 32, 32, ok));
        QORI_EXPECT_STATUS(anyStep ? QOR_ERR_NULL_PTR : QOR_ERR_STEP, dst, statusOf(false, false, nullptr, 0, 0, ok));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, statusOf(false, false, nullptr, 0, 0, none));
    }
    if (readsSource) QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, statusOf(true, false, good, 32, 32, ok));
    for (QorImageSize bad : {none, QorImageSize{4, 0}, QorImageSize{-4, INT32_MIN}})
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, statusOf(false, false, anyZero, 0, 0, bad));
    if (!anyStep) {
        QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, statusOf(false, false, anyZero, 32, 0, ok));
        if (readsSource) QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, statusOf(false, false, anyZero, -1, 32, ok));
    }
    if (divides) QORI_EXPECT_STATUS(QOR_ERR_DIV_BY_ZERO, dst, statusOf(false, false, anyZero, 32, 32, ok));
}

template <class T, Layout layout, Kind kind, bool anyStep, bool divides, class Function, class... Parameters>
void checkStatuses(Function function, Parameters... parameters) {
    const Shape shape{.width = 4, .height = 2};
    TestImage src(1, shape, 32), dst(0, shape, 32);
    const auto statusOf = [&](bool noSrc, bool noDst, const T* value, int srcStep, int dstStep, QorImageSize roi) {
        const auto constants = [&] {
            if constexpr (layout == Layout::C1)
                return *value;
            else
                return value;
        }();
        T* const d = noDst ? nullptr : dst.data<T>();
        if constexpr (kind == Kind::IR)
            return call(function, constants, d, dstStep, roi, parameters...);
        else
            return call(function, noSrc ? nullptr : src.data<T>(), srcStep, constants, d, dstStep, roi, parameters...);
    };
    checkStatuses<T>(dst, layout != Layout::C1, kind == Kind::R, anyStep, divides, statusOf);
}

#define QORI_SCALED_STATUS(operation, divides)                                                      \
    template <class T, Layout layout, Kind kind, class Function>                                    \
    void status_##operation(Function f) {                                                           \
        withScale<T>(0, [&](auto... s) {                                                            \
            checkStatuses<T, layout, kind, anyStep_##operation<T, layout, kind>, divides>(f, s...); \
        });                                                                                         \
    }
QORI_SCALED_STATUS(addConstant, false)
QORI_SCALED_STATUS(subtractConstant, false)
QORI_SCALED_STATUS(multiplyConstant, false)
QORI_SCALED_STATUS(divideConstant, true)
template <class T, Layout layout, Kind kind, class Function>
void status_multiplyConstantFraction(Function f) {
    checkStatuses<T, layout, kind, false, false>(f);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(ConstantArithmeticStatus, name) { status_##operation<S, Layout::SL, Kind::kind>(&name); }
#include "members/arith_constant.inc"
#undef QORI_MEMBER

TEST(ConstantArithmetic, Streaming) {
    forStreamingChoices(6, 1 << 20, [](const Shape& shape) {
        const uint8_t value[4] = {3, 0, 250};
        checkUnary<uint8_t, uint8_t, Layout::C3, Kind::R>(
            shape,
            [&](const auto&... images) {
                EXPECT_EQ(QOR_OK,
                          (callConstant<uint8_t, Layout::C3, Kind::R>(qoriAddC_8u_C3RSfs, value, images..., 1)));
            },
            [&](uint8_t a, int c) { return reference::add(value[c], a, 1); });
    });
}

/// A control register that flushes subnormals makes no zero of them.
TEST(ConstantArithmetic, SubnormalDivisors) {
    const float src[4] = {1e-40f, -4e-40f, 1e-20f, INFINITY}, divisor = 2e-40f;
    const QorComplex32f complexSource = {1e-40f, 0}, complexDivisor = {0, 2e-40f};
    for (int circumstance = 0; circumstance < 8; ++circumstance) {
        float dst[4];
        QorComplex32f complexDst;
        ASSERT_EQ(QOR_OK, call(qoriDivC_32f_C1R, src, 16, divisor, dst, 16, QorImageSize{4, 1}));
        for (size_t i = 0; i < 4; ++i) EXPECT_EQ(src[i] / divisor, dst[i]);
        ASSERT_EQ(QOR_OK,
                  call(qoriDivC_32fc_C1R, &complexSource, 8, complexDivisor, &complexDst, 8, QorImageSize{1, 1}));
        EXPECT_EQ(0, complexDst.re);
        EXPECT_NEAR(-0.5, complexDst.im, 1e-4);
    }
}

/// Results known beforehand come without a look at the source, which may then be smaller than the region.
TEST(ConstantArithmetic, DoesNotReadTheSourceWithoutNeed) {
    const Shape shape{.width = 1, .height = 1};
    TestImage src(1, shape, 1);
    std::vector<uint8_t> dst(64);
    const auto filled = [&](auto function, uint8_t value, int scale) {
        std::fill(dst.begin(), dst.end(), 77);
        EXPECT_EQ(QOR_OK, call(function, src.data<uint8_t>(), 0, value, dst.data(), 64, QorImageSize{64, 1}, scale));
        EXPECT_EQ(std::vector<uint8_t>(64, dst[0]), dst);
        return int{dst[0]};
    };
    EXPECT_EQ(0, filled(qoriAddC_8u_C1RSfs, 255, 10));
    EXPECT_EQ(255, filled(qoriAddC_8u_C1RSfs, 1, -8));
    EXPECT_EQ(0, filled(qoriSubC_8u_C1RSfs, 0, 9));
    EXPECT_EQ(0, filled(qoriMulC_8u_C1RSfs, 0, -3));
    EXPECT_EQ(0, filled(qoriMulC_8u_C1RSfs, 255, 17));
}

}  // namespace
}  // namespace qori::test
