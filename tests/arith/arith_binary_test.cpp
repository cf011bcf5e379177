// SPDX-License-Identifier: Apache-2.0
#include "arith.h"

namespace qori::test {
namespace {

// Additions of 8u, 16s and 32f, subtractions and multiplications of 8u take any step; fractions check theirs first.
template <class T>
constexpr bool anyStep_subtract = std::is_same_v<T, uint8_t>;
template <class T>
constexpr bool anyStep_multiply = std::is_same_v<T, uint8_t>;
template <class T>
constexpr bool anyStep_add = std::is_same_v<T, uint8_t> || std::is_same_v<T, int16_t> || std::is_same_v<T, float>;

/// reference(a, b, scale) gives one element.
template <class T>
__attribute__((noinline)) void sweep(
    const char* name, Layout layout, Kind kind, bool anyStep,
    FunctionRef<QorResult(const TestImage&, const TestImage&, const TestImage&, QorImageSize, int32_t)> invoke,
    FunctionRef<T(T, T, int32_t)> reference) {
    forShapesAndScales(!reference::isFloat<T>, anyStep, [&](const Shape& shape, int32_t scale) {
        checkBinary<T, T>(
            shape, layout, kind, [&](const auto&... images) { EXPECT_EQ(QOR_OK, invoke(images..., scale)); },
            [&](T a, T b, int) { return reference(a, b, scale); }, NearPowers<T>{});
    });
    markSwept(name);
}

template <class T, Layout layout, Kind kind, bool anyStep, class Function, class Reference>
void sweep(const char* name, Function function, Reference reference) {
    const auto invoke = [=](const TestImage& a, const TestImage& b, const TestImage& d, QorImageSize roi,
                            int32_t scale) {
        return withScale<T>(scale, [&](auto... s) { return callBinary<T, kind>(function, a, b, d, roi, s...); });
    };
    sweep<T>(name, layout, kind, anyStep, invoke, reference);
}

#define QORI_SCALED_SWEEP(operation)                                                             \
    template <class T, Layout layout, Kind kind, class Function>                                 \
    void operation(const char* name, Function function) {                                        \
        sweep<T, layout, kind, anyStep_##operation<T>>(name, function, reference::operation<T>); \
    }
QORI_SCALED_SWEEP(add)
QORI_SCALED_SWEEP(subtract)
QORI_SCALED_SWEEP(multiply)

template <class T, Layout layout, Kind kind, class Function>
void multiplyFractions(const char* name, Function function) {
    forShapesAndScales<T, false>([&](const Shape& shape, int32_t) {
        checkBinary<T, T, layout, kind>(
            shape, [&](const auto&... images) { EXPECT_EQ(QOR_OK, (callBinary<T, kind>(function, images...))); },
            [](T a, T b, int) { return reference::multiplyFractions(a, b); });
    });
    markSwept(name);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(BinaryArithmeticSweep, name) { operation<S, Layout::SL, Kind::kind>(#name, &name); }
#include "members/arith_binary.inc"
#undef QORI_MEMBER

/// All pairs of bytes: row a, column b.
template <class Call, class Reference>
void checkAllBytePairs(Call callPairs, Reference reference) {
    std::vector<uint8_t> a(65536), b(65536), d(65536);
    for (size_t i = 0; i < 65536; ++i) {
        a[i] = static_cast<uint8_t>(i >> 8);
        b[i] = static_cast<uint8_t>(i);
    }
    ASSERT_EQ(QOR_OK, callPairs(a.data(), b.data(), d.data()));
    for (size_t i = 0; i < 65536; ++i) ASSERT_EQ(reference(a[i], b[i]), d[i]) << int{a[i]} << ", " << int{b[i]};
}

TEST(BinaryArithmetic, AllBytePairsAtEveryScaleFactor) {
    const QorImageSize all{256, 256};
    for (int s = -40; s <= 40; ++s) {
        SCOPED_TRACE("scale factor " + std::to_string(s));
        const auto check = [&](auto function, auto reference) {
            checkAllBytePairs([&](auto* a, auto* b, auto* d) { return call(function, a, 256, b, 256, d, 256, all, s); },
                              [&](uint8_t a, uint8_t b) { return reference(a, b, s); });
        };
        check(qoriAdd_8u_C1RSfs, reference::add<uint8_t>);
        check(qoriSub_8u_C1RSfs, reference::subtract<uint8_t>);
        check(qoriMul_8u_C1RSfs, reference::multiply<uint8_t>);
        if (HasFatalFailure()) return;
    }
    checkAllBytePairs([&](auto* a, auto* b, auto* d) { return call(qoriMulScale_8u_C1R, a, 256, b, 256, d, 256, all); },
                      reference::multiplyFractions<uint8_t>);
}

/// Large results go past the cache where they are out of place and aligned; each operation has its own compiled form.
template <class T, Layout layout, class Function, class Reference>
void checkStreaming(Function function, Reference reference, int32_t scale) {
    forStreamingChoices(3 * channels(layout) * static_cast<int>(sizeof(T)), 1 << 20, [&](const Shape& shape) {
        checkBinary<T, T, layout, Kind::R>(
            shape,
            [&](const auto&... images) {
                EXPECT_EQ(QOR_OK, withScale<T>(scale, [&](auto... s) {
                              return callBinary<T, Kind::R>(function, images..., s...);
                          }));
            },
            [&](T a, T b, int) { return reference(a, b, scale); }, NearPowers<T>{});
    });
}

TEST(BinaryArithmetic, Streaming) {
    checkStreaming<uint8_t, Layout::C1>(qoriAdd_8u_C1RSfs, reference::add<uint8_t>, 0);
    checkStreaming<uint8_t, Layout::AC4>(qoriSub_8u_AC4RSfs, reference::subtract<uint8_t>, -2);
    checkStreaming<uint16_t, Layout::C3>(qoriMul_16u_C3RSfs, reference::multiply<uint16_t>, 18);
    checkStreaming<float, Layout::AC4>(qoriAdd_32f_AC4R, reference::add<float>, 0);
    checkStreaming<QorComplex32s, Layout::C1>(qoriMul_32sc_C1RSfs, reference::multiply<QorComplex32s>, 31);
    checkStreaming<uint8_t, Layout::C3>(qoriAdd_8u_C3RSfs, reference::add<uint8_t>, 12);  // zeros without a look
}

TEST(BinaryArithmetic, ComplexProductsBeyondTheirLanes) {
    const int16_t m = INT16_MIN;
    const int32_t n = INT32_MIN;
    for (int s : scaleFactors()) {
        const QorComplex16s a{m, m};
        QorComplex16s d{};
        ASSERT_EQ(QOR_OK, call(qoriMul_16sc_C1RSfs, &a, 4, &a, 4, &d, 4, QorImageSize{1, 1}, s));
        EXPECT_EQ(reference::multiply(a, a, s).im, d.im) << s;
        const QorComplex32s b{n, n};
        QorComplex32s e{};
        ASSERT_EQ(QOR_OK, call(qoriMul_32sc_C1RSfs, &b, 8, &b, 8, &e, 8, QorImageSize{1, 1}, s));
        EXPECT_EQ(reference::multiply(b, b, s).im, e.im) << s;
    }
}

TEST(BinaryArithmetic, DestinationMayBeEitherSource) {
    const uint8_t a[5] = {1, 3, 3, 200, 255}, b[5] = {2, 0, 10, 100, 255};
    uint8_t first[5], second[5];
    std::memcpy(first, a, 5);
    std::memcpy(second, b, 5);
    EXPECT_EQ(QOR_OK, qoriSub_8u_C1RSfs(first, 5, b, 5, first, 5, {5, 1}, 0));
    EXPECT_EQ(QOR_OK, qoriSub_8u_C1RSfs(a, 5, second, 5, second, 5, {5, 1}, 0));
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(reference::subtract(a[i], b[i], 0), first[i]);
        EXPECT_EQ(first[i], second[i]);
    }
}

TEST(BinaryArithmetic, StepsOfAnyValueWhereNoneIsChecked) {
    const uint8_t row[3] = {1, 2, 250};
    uint8_t d[3];
    EXPECT_EQ(QOR_OK, qoriAdd_8u_C3RSfs(row, 0, row, -3, d, 0, {1, 1}, 0));
    EXPECT_EQ(255, d[2]);
    const float f[2] = {1.5f, -2};
    float g[2];
    EXPECT_EQ(QOR_OK, qoriAdd_32f_C1R(f, 0, f, 0, g, 0, {2, 3}));
    EXPECT_EQ(-4, g[1]);
}

template <class T, Kind kind, bool stepsFirst, bool anyStep, class Function>
void checkScaledStatuses(Function f) {
    withScale<T>(0, [&](auto... s) { checkStatuses<T, kind, !anyStep, stepsFirst>(f, s...); });
}
template <class T, Kind kind, class Function>
void status_add(Function f) {
    checkScaledStatuses<T, kind, false, anyStep_add<T>>(f);
}
template <class T, Kind kind, class Function>
void status_subtract(Function f) {
    checkScaledStatuses<T, kind, false, anyStep_subtract<T>>(f);
}
template <class T, Kind kind, class Function>
void status_multiply(Function f) {
    checkScaledStatuses<T, kind, false, anyStep_multiply<T>>(f);
}
template <class T, Kind kind, class Function>
void status_multiplyFractions(Function f) {
    checkStatuses<T, kind, true, true>(f);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(BinaryArithmeticStatus, name) { status_##operation<S, Kind::kind>(&name); }
#include "members/arith_binary.inc"
#undef QORI_MEMBER

}  // namespace
}  // namespace qori::test
