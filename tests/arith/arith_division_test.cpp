// SPDX-License-Identifier: Apache-2.0
#include "arith.h"

namespace qori::test {
namespace {

/// No zeros but in fourth channels, where they must not be noticed when alpha is kept.
template <class T>
struct ZeroInAlphaOnly {
    Layout layout;
    mutable int drawn = 0;

    T operator()() const {
        if (layout == Layout::AC4 && drawn++ % 4 == 3) return T{};
        for (;;)
            if (const T value = NearPowers<T>{}(); !reference::isZero(value)) return value;
    }
};

template <class T>
void checkDivision(const Shape& shape, Layout layout, Kind kind, int32_t scale, int mode, FunctionRef<T()> draw,
                   FunctionRef<QorResult(const TestImage&, const TestImage&, const TestImage&, QorImageSize)> invoke) {
    bool zeroMet = false;
    checkBinary<T, T>(
        shape, layout, kind,
        [&](const auto&... images) { EXPECT_EQ(zeroMet ? QOR_WARN_DIV_BY_ZERO : QOR_OK, invoke(images...)); },
        [&](T a, T b, int) {
            zeroMet = zeroMet || reference::isZero(a);
            return reference::divide(a, b, scale, mode);
        },
        draw);
}

/// In the modes of rounding in turn, or to the nearest always; invoke(a, b, d, roi, scale, mode) calls the export.
template <class T>
__attribute__((noinline)) void sweep(
    const char* name, Layout layout, Kind kind, bool anyMode,
    FunctionRef<QorResult(const TestImage&, const TestImage&, const TestImage&, QorImageSize, int32_t, int)> invoke) {
    int turn = 0;
    forShapesAndScales(!reference::isFloat<T>, false, [&](const Shape& shape, int32_t scale) {
        const int mode = anyMode ? turn / 2 % 3 : int{roundNearestEven};
        const auto invokeScaled = [&](const auto&... arguments) { return invoke(arguments..., scale, mode); };
        if (turn++ % 2 == 0)
            checkDivision<T>(shape, layout, kind, scale, mode, NearPowers<T>{}, invokeScaled);
        else
            checkDivision<T>(shape, layout, kind, scale, mode, ZeroInAlphaOnly<T>{layout}, invokeScaled);
    });
    markSwept(name);
}

template <class T, Layout layout, Kind kind, class Function>
void divide(const char* name, Function function) {
    sweep<T>(name, layout, kind, false,
             [=](const auto& a, const auto& b, const auto& d, QorImageSize roi, int32_t scale, int) {
                 return withScale<T>(scale,
                                     [&](auto... s) { return callBinary<T, kind>(function, a, b, d, roi, s...); });
             });
}

template <class T, Layout layout, Kind kind, class Function>
void divideRounded(const char* name, Function function) {
    sweep<T>(name, layout, kind, true,
             [=](const auto& a, const auto& b, const auto& d, QorImageSize roi, int32_t scale, int mode) {
                 return callBinary<T, kind>(function, a, b, d, roi, mode, scale);
             });
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(DivisionSweep, name) { operation<S, Layout::SL, Kind::kind>(#name, &name); }
#include "members/arith_division.inc"
#undef QORI_MEMBER

template <class T, Kind kind, class Function>
void status_divide(Function function) {
    withScale<T>(0, [&](auto... s) { checkStatuses<T, kind, true, false>(function, s...); });
}
template <class T, Kind kind, class Function>
void status_divideRounded(Function function) {
    checkStatuses<T, kind, true, false>(function, 7, 0);  // the faulty mode is found last
    const Shape shape{.width = 4, .height = 2};
    TestImage a(1, shape, 8), b(2, shape, 8), d(0, shape, 8);
    for (int mode : {-1, 3, INT32_MAX})
        QORI_EXPECT_STATUS(QOR_ERR_ROUND_MODE, d, (callBinary<T, kind>(function, a, b, d, shape.roi(), mode, 0)));
}
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(DivisionStatus, name) { status_##operation<S, Kind::kind>(&name); }
#include "members/arith_division.inc"
#undef QORI_MEMBER

/// Every numerator of a type over some divisors, at every scale factor that matters and in every mode.
template <class T, class Function, class RoundedFunction>
void checkAllNumerators(const std::vector<T>& divisors, Function function, RoundedFunction roundedFunction) {
    constexpr int count = 1 << 8 * sizeof(T), bytes = count * static_cast<int>(sizeof(T));
    std::vector<T> a(count), b(count), d(count);
    for (size_t i = 0; i < count; ++i) b[i] = static_cast<T>(i);
    for (T divisor : divisors) {
        std::fill(a.begin(), a.end(), divisor);
        for (int s = sizeof(T) == 1 ? -40 : -18; s <= (sizeof(T) == 1 ? 40 : 18); ++s)
            for (int mode = 0; mode < 4; ++mode) {
                const QorImageSize roi{count, 1};
                const auto result =
                    mode == 3 ? call(function, a.data(), bytes, b.data(), bytes, d.data(), bytes, roi, s)
                              : call(roundedFunction, a.data(), bytes, b.data(), bytes, d.data(), bytes, roi, mode, s);
                ASSERT_EQ(divisor == 0 ? QOR_WARN_DIV_BY_ZERO : QOR_OK, result);
                for (size_t i = 0; i < count; ++i)
                    ASSERT_EQ(reference::divide(divisor, b[i], s, mode == 3 ? roundNearestEven : mode), d[i])
                        << +b[i] << " / " << +divisor << " scale " << s << " mode " << mode;
            }
    }
}

TEST(Division, AllBytePairsAtEveryScaleFactor) {
    std::vector<uint8_t> all;
    for (int d = 0; d < 256; ++d) all.push_back(static_cast<uint8_t>(d));
    checkAllNumerators(all, qoriDiv_8u_C1RSfs, qoriDiv_Round_8u_C1RSfs);
}

TEST(Division, AllNumeratorsOf16Bits) {
    checkAllNumerators<uint16_t>({1, 3, 255, 32767, 65535}, qoriDiv_16u_C1RSfs, qoriDiv_Round_16u_C1RSfs);
    checkAllNumerators<int16_t>({1, -1, 7, -181, 32767, INT16_MIN}, qoriDiv_16s_C1RSfs, qoriDiv_Round_16s_C1RSfs);
}

TEST(Division, Streaming) {
    forStreamingChoices(12, 1 << 20, [](const Shape& shape) {
        checkDivision<float>(shape, Layout::C1, Kind::R, 0, 0, NearPowers<float>{}, [](const auto&... arguments) {
            return callBinary<float, Kind::R>(qoriDiv_32f_C1R, arguments...);
        });
    });
}

TEST(Division, WidestComplexNumbers) {
    const int32_t extremes[] = {INT32_MIN, INT32_MIN + 1, -1, 0, 1, INT32_MAX};
    for (int code = 0; code < 6 * 6 * 6 * 6; ++code) {
        const QorComplex32s a{extremes[code % 6], extremes[code / 6 % 6]};
        const QorComplex32s b{extremes[code / 36 % 6], extremes[code / 216]};
        const auto upper = [](int32_t v) { return static_cast<int16_t>(v >> 16); };
        const auto narrow = [&](QorComplex32s v) { return QorComplex16s{upper(v.re), upper(v.im)}; };
        const QorComplex16s p = narrow(a), q = narrow(b);
        const int scale = scaleFactors()[static_cast<size_t>(code) % scaleFactors().size()];
        QorComplex32s d;
        QorComplex16s e;
        call(qoriDiv_32sc_C1RSfs, &a, 8, &b, 8, &d, 8, QorImageSize{1, 1}, scale);
        call(qoriDiv_16sc_C1RSfs, &p, 4, &q, 4, &e, 4, QorImageSize{1, 1}, scale);
        const QorComplex32s wanted = reference::divide(a, b, scale);
        const QorComplex16s wanted16 = reference::divide(p, q, scale);
        ASSERT_TRUE(wanted.re == d.re && wanted.im == d.im) << "case " << code << " scale " << scale;
        ASSERT_TRUE(wanted16.re == e.re && wanted16.im == e.im) << "case " << code << " scale " << scale;
    }
}

/// Quotients that are halves, or as near to them as can be, from small sums to those of 63 bits.
TEST(Division, HalvesOfComplexNumbers) {
    constexpr int count = 5;
    const QorImageSize roi{count, 1};
    for (int n = 0; n < 30'000; ++n) {
        const int bits = random().below(31), other = std::max(30 - bits, 1);
        const int scale = random().oneIn(3) ? random().below(67) - 33 : 0;
        const auto drawn = [](int b) { return random().below(1 << b) - (1 << b) / 2; };
        QorComplex32s a[count], b[count], d[count];
        for (int i = 0; i < count; ++i) {
            a[i] = {drawn(bits), drawn(bits)};
            // a (p + qi) / 2 for odd p and q; with a scale factor that is somewhere on the grid.
            const int64_t p = 2 * (drawn(other) / 4) + (random().oneIn(2) ? 1 : -1), q = 2 * (drawn(other) / 4) + 1;
            const int nudge = random().below(3) - 1;
            b[i] = {static_cast<int32_t>((a[i].re * p - a[i].im * q) / 2 + nudge),
                    static_cast<int32_t>((a[i].re * q + a[i].im * p) / 2)};
            if (random().oneIn(8)) a[i] = {};
        }
        call(qoriDiv_32sc_C1RSfs, a, 8 * count, b, 8 * count, d, 8 * count, roi, scale);
        for (int i = 0; i < count; ++i) {
            const QorComplex32s wanted = reference::divide(a[i], b[i], scale);
            ASSERT_TRUE(wanted.re == d[i].re && wanted.im == d[i].im)
                << "(" << b[i].re << " + " << b[i].im << "i) / (" << a[i].re << " + " << a[i].im << "i), scale "
                << scale;
        }
    }
}

TEST(Division, FloatsOverZero) {
    const float inf = std::numeric_limits<float>::infinity(), nan = std::numeric_limits<float>::quiet_NaN();
    const float divisors[] = {0.f, 0.f, 0.f, 0.f, -0.f, -0.f, 0.f, 2.f, 0.f};
    const float numerators[] = {2, -2, 0, nan, 2, -2, -inf, 3, -nan};
    const uint32_t expected[] = {0x7F800000, 0xFF800000, 0x7FBFFFFF, 0x7FBFFFFF, 0xFF800000,
                                 0x7F800000, 0xFF800000, 0x3FC00000, 0x7FBFFFFF};
    uint32_t results[9];
    const QorImageSize roi{9, 1};
    auto* const dst = reinterpret_cast<float*>(results);
    EXPECT_EQ(QOR_WARN_DIV_BY_ZERO, call(qoriDiv_32f_C1R, divisors, 36, numerators, 36, dst, 36, roi));
    EXPECT_EQ(0, std::memcmp(expected, results, sizeof results));
}

TEST(Division, WarnsOfAZeroInTheFirstRowOnly) {
    uint8_t a[4] = {0, 1, 1, 1}, b[4] = {5, 6, 7, 8}, d[4];
    EXPECT_EQ(QOR_WARN_DIV_BY_ZERO, call(qoriDiv_8u_C1RSfs, a, 2, b, 2, d, 2, QorImageSize{2, 2}, 0));
    EXPECT_EQ(QOR_WARN_DIV_BY_ZERO, call(qoriDiv_8u_C1RSfs, a, 2, b, 2, d, 2, QorImageSize{1, 2}, 0));
    EXPECT_EQ(QOR_OK, call(qoriDiv_8u_C1RSfs, a + 1, 2, b, 2, d, 2, QorImageSize{1, 2}, 0));
}

}  // namespace
}  // namespace qori::test
