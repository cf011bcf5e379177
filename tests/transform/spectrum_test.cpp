// SPDX-License-Identifier: Apache-2.0
#include <cmath>

#include "harness/pixelwise.h"
#include "reference/fourier.h"

namespace qori::test {
namespace {

using reference::Complex;
using reference::PackedElement;

enum Slot { kDst, kSrc, kSecond };

/// Odd and even sides of every small size, and rows beyond several vectors.
template <class Check>
void forSpectra(Check check) {
    const auto checked = [=](int width, int height) {
        static constexpr int paddings[] = {0, 32, 3};
        const int turn = width + height;
        const Shape shape{.width = width,
                          .height = height,
                          .padding = paddings[turn % 3],
                          .atBegin = turn % 2 == 0,
                          .shift = turn % 4 == 1 ? 1 : 0};
        SCOPED_TRACE(describe(shape));
        if (!testing::Test::HasFailure()) check(shape);
    };
    for (int width = 1; width <= 12; ++width)
        for (int height = 1; height <= 6; ++height) checked(width, height);
    for (int width = 13; width <= 40; ++width) checked(width, 1 + width % 5);
    for (int width : {63, 64, 65, 66, 129, 200}) checked(width, 4);
}

/// The spectrum of channel c.
template <class T>
reference::Field fieldOf(const View<T>& packed, const Shape& shape, int c) {
    return reference::unpacked(shape.width, shape.height,
                               [&](int x, int y) { return static_cast<double>(packed.get(x, y, c)); });
}

/// Exact in 64 bits of precision: products of 32 bits, their sums, and powers of two.
using Exact = long double;

template <class T>
T rounded(Exact value, int32_t scale) {
    const Exact scaled = std::nearbyint(std::ldexp(value, -std::clamp(scale, -200, 200)));
    return static_cast<T>(std::clamp<Exact>(scaled, std::numeric_limits<T>::min(), std::numeric_limits<T>::max()));
}

template <class T>
T product(Complex a, Complex b, const PackedElement& e, bool isReal, int32_t scale) {
    const auto part = [](double v) { return static_cast<T>(v); };
    const T ar = part(a.real()), ai = part(a.imag()), br = part(b.real()), bi = part(b.imag());
    if constexpr (std::is_floating_point_v<T>) {
        if (isReal) return ar * br;
        return e.isImaginary ? std::fma(ar, bi, ai * br) : std::fma(ar, br, -(ai * bi));
    } else {
        if (isReal) return rounded<T>(static_cast<Exact>(ar) * br, scale);
        return rounded<T>(e.isImaginary ? static_cast<Exact>(ar) * bi + static_cast<Exact>(ai) * br
                                        : static_cast<Exact>(ar) * br - static_cast<Exact>(ai) * bi,
                          scale);
    }
}

/// invoke(src1, src2, dst, roi, scale).
template <class T, Layout layout, Kind kind, bool conjugate, class Invoke>
void checkProduct(const Shape& shape, int32_t scale, Invoke invoke) {
    constexpr int n = channels(layout);
    const int pixelBytes = n * static_cast<int>(sizeof(T));
    const TestImage dst(kDst, shape, pixelBytes), src1(kSrc, shape, pixelBytes);
    const TestImage src2 = kind == Kind::IR ? dst : TestImage(kSecond, shape, pixelBytes);
    dst.fill<T>(n, drawPixel<T>);
    src1.fill<T>(n, drawPixel<T>);
    src2.fill<T>(n, drawPixel<T>);
    const Snapshot first = src1.snapshot(), second = src2.snapshot();
    Snapshot expected = dst.snapshot();
    const View<T> to = expected.view<T>(n);
    for (int c = 0; c < processedChannels(layout); ++c) {
        const reference::Field a = fieldOf(src1.view<T>(n), shape, c), b = fieldOf(src2.view<T>(n), shape, c);
        dst.forEach([&](int x, int y) {
            const PackedElement e(x, y, shape.width, shape.height);
            const Complex factor = conjugate ? std::conj(b.at(e.x, e.y)) : b.at(e.x, e.y);
            to.set(x, y, c, product<T>(a.at(e.x, e.y), factor, e, e.isReal(shape.width, shape.height), scale));
        });
    }
    EXPECT_EQ(QOR_OK, invoke(src1, src2, dst, shape.roi(), scale));
    QORI_EXPECT_UNCHANGED(dst, expected);
    QORI_EXPECT_UNCHANGED(src1, first);
    if (kind != Kind::IR) {
        QORI_EXPECT_UNCHANGED(src2, second);
    }
}

int32_t anyScale() {
    static constexpr int32_t scales[] = {0,  1,  2,  7,  15, 16, 30,  31,  32,  33,        61,
                                         62, 63, 64, 65, -1, -5, -31, -32, -40, INT32_MIN, INT32_MAX};
    return scales[random().below(static_cast<int>(std::size(scales)))];
}

template <class T, Layout layout, Kind kind, bool conjugate, class Function>
void sweepProducts(const char* name, Function function) {
    forSpectra([=](const Shape& shape) {
        checkProduct<T, layout, kind, conjugate>(
            shape, std::is_floating_point_v<T> ? 0 : anyScale(),
            [=](const TestImage& a, const TestImage& b, const TestImage& d, QorImageSize roi, int32_t scale) {
                const T *const first = a.data<T>(), *const second = b.data<T>();
                if constexpr (kind == Kind::R && std::is_floating_point_v<T>)
                    return call(function, first, a.step(), second, b.step(), d.data<T>(), d.step(), roi);
                else if constexpr (kind == Kind::R)
                    return call(function, first, a.step(), second, b.step(), d.data<T>(), d.step(), roi, scale);
                else if constexpr (std::is_floating_point_v<T>)
                    return call(function, first, a.step(), d.data<T>(), d.step(), roi);
                else
                    return call(function, first, a.step(), d.data<T>(), d.step(), roi, scale);
            });
    });
    markSwept(name);
}

template <class T, class, Layout layout, Kind kind, class Function>
void multiplyPacked(const char* name, Function function) {
    sweepProducts<T, layout, kind, false>(name, function);
}
template <class T, class, Layout layout, Kind kind, class Function>
void multiplyPackedConjugate(const char* name, Function function) {
    sweepProducts<T, layout, kind, true>(name, function);
}

/// isRight(actual, frequency, scale) for each frequency of the full image.
template <class T, Layout layout, class Function, class IsRight>
void sweepEvaluations(const char* name, Function function, IsRight isRight) {
    constexpr int n = channels(layout), pixelBytes = n * static_cast<int>(sizeof(T));
    forSpectra([=](const Shape& shape) {
        const TestImage dst(kDst, shape, pixelBytes), src(kSrc, shape, pixelBytes);
        const bool isSparse = random().oneIn(4);
        src.fill<T>(n, [=] { return isSparse ? static_cast<T>(random().below(3) - 1) : drawPixel<T>(); });
        const Snapshot before = src.snapshot();
        Snapshot expected = dst.snapshot();
        const T* const from = src.data<T>();
        const int32_t scale = anyScale();
        if constexpr (std::is_floating_point_v<T>)
            EXPECT_EQ(QOR_OK, call(function, from, src.step(), dst.data<T>(), dst.step(), shape.roi()));
        else
            EXPECT_EQ(QOR_OK, call(function, from, src.step(), dst.data<T>(), dst.step(), shape.roi(), scale));
        const View<T> actual = dst.view<T>(n), to = expected.view<T>(n);
        for (int c = 0; c < n; ++c) {
            const reference::Field field = fieldOf(src.view<T>(n), shape, c);
            dst.forEach([&](int x, int y) {
                const T value = actual.get(x, y, c);
                EXPECT_TRUE(isRight(value, field.at(x, y), scale))
                    << value << " of " << field.at(x, y) << " scale " << scale << " at " << x << "," << y;
                to.set(x, y, c, value);
            });
        }
        QORI_EXPECT_UNCHANGED(dst, expected);
        QORI_EXPECT_UNCHANGED(src, before);
    });
    markSwept(name);
}

/// By squares, which are exact: the root of s lies between value - 1/2 and value + 1/2.
template <class T>
bool isMagnitude(T value, Complex f, int32_t scale) {
    if constexpr (std::is_floating_point_v<T>)
        return value == static_cast<float>(std::abs(f)) || std::abs(value - std::abs(f)) <= std::abs(f) * 0x1.0001p-24;
    else {
        const auto re = static_cast<Exact>(f.real()), im = static_cast<Exact>(f.imag());
        const Exact square = re * re + im * im;
        const int32_t bounded = std::clamp(scale, -200, 200);
        const Exact four = std::ldexp(square, 2 - 2 * bounded);  // (2 * magnitude)^2
        const auto above = 2 * static_cast<Exact>(value) + 1, below = 2 * static_cast<Exact>(value) - 1;
        const bool isEven = value % 2 == 0, isLast = value == std::numeric_limits<T>::max();
        const bool isLow = isLast || four < above * above || (four == above * above && isEven);
        return value >= 0 && isLow && (value == 0 || four > below * below || (four == below * below && isEven));
    }
}

template <class T, class, Layout layout, Kind, class Function>
void magnitudePacked(const char* name, Function function) {
    sweepEvaluations<T, layout>(name, function, isMagnitude<T>);
}

template <class T>
bool isPhase(T value, Complex f, int32_t scale) {
    const double phase = std::atan2(f.imag() + 0.0, f.real() + 0.0);  // zeros without a sign
    if constexpr (std::is_floating_point_v<T>)
        return std::abs(value - phase) <= std::abs(phase) * 0x1.0001p-24;
    else {
        const double scaled = std::clamp<double>(std::ldexp(phase, -std::clamp(scale, -200, 200)),
                                                 std::numeric_limits<T>::min(), std::numeric_limits<T>::max());
        return std::abs(value - scaled) <= 0.5 + 1e-5;
    }
}

template <class T, class, Layout layout, Kind, class Function>
void phasePacked(const char* name, Function function) {
    sweepEvaluations<T, layout>(name, function, isPhase<T>);
}

template <class T, class C, Layout, Kind, class Function>
void extendPacked(const char* name, Function function) {
    forSpectra([=](const Shape& shape) {
        const TestImage dst(kDst, shape, sizeof(C)), src(kSrc, shape, sizeof(T));
        src.fill<T>(1, drawPixel<T>);
        const Snapshot before = src.snapshot();
        Snapshot expected = dst.snapshot();
        const View<T> to = expected.view<T>(2);
        const reference::Field field = fieldOf(src.view<T>(1), shape, 0);
        const auto part = [](double v) {
            if constexpr (std::is_integral_v<T>) v = std::min<double>(v, std::numeric_limits<T>::max());
            return static_cast<T>(v);
        };
        dst.forEach([&](int x, int y) {
            to.set(x, y, 0, part(field.at(x, y).real()));
            to.set(x, y, 1, part(field.at(x, y).imag()));
        });
        const T* const from = src.data<T>();
        EXPECT_EQ(QOR_OK, call(function, from, src.step(), dst.data<C>(), dst.step(), shape.roi()));
        QORI_EXPECT_UNCHANGED(dst, expected);
        QORI_EXPECT_UNCHANGED(src, before);
    });
    markSwept(name);
}

template <class C, class T, Layout layout, Kind, class Function>
void packExtended(const char* name, Function function) {
    constexpr int n = channels(layout);
    forSpectra([=](const Shape& shape) {
        const TestImage dst(kDst, shape, n * static_cast<int>(sizeof(T))),
            src(kSrc, shape, n * static_cast<int>(sizeof(C)));
        src.fill<T>(2 * n, drawPixel<T>);
        const Snapshot before = src.snapshot();
        Snapshot expected = dst.snapshot();
        const View<T> to = expected.view<T>(n), parts = src.view<T>(2 * n);
        dst.forEach([&](int x, int y) {
            const PackedElement e(x, y, shape.width, shape.height);
            for (int c = 0; c < n; ++c) to.set(x, y, c, parts.get(e.x, e.y, 2 * c + e.isImaginary));
        });
        const C* const from = src.data<C>();
        EXPECT_EQ(QOR_OK, call(function, from, src.step(), dst.data<T>(), dst.step(), shape.roi()));
        QORI_EXPECT_UNCHANGED(dst, expected);
        QORI_EXPECT_UNCHANGED(src, before);
    });
    markSwept(name);
}

TEST(Spectrum, AllMembers) {
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) operation<S, D, Layout::SL, Kind::kind>(#name, &name);
#include "members/spectrum.inc"
#undef QORI_MEMBER
}

TEST(Spectrum, DestinationMayBeASource) {
    const Shape shape{.width = 21, .height = 6};
    for (bool isFirst : {true, false}) {
        const TestImage a(kSrc, shape, 4), b(kSecond, shape, 4), dst(kDst, shape, 4);
        a.fill<float>(1, drawPixel<float>);
        b.fill<float>(1, drawPixel<float>);
        const auto run = [&](const TestImage& to) {
            return qoriMulPackConj_32f_C1R(a.data<float>(), a.step(), b.data<float>(), b.step(), to.data<float>(),
                                           to.step(), shape.roi());
        };
        EXPECT_EQ(QOR_OK, run(dst));
        const Snapshot expected = dst.snapshot();
        const TestImage& source = isFirst ? a : b;
        EXPECT_EQ(QOR_OK, run(source));
        const View<float> actual = source.view<float>(1);
        Snapshot made = expected;
        source.forEach([&](int x, int y) { made.view<float>(1).set(x, y, 0, actual.get(x, y)); });
        EXPECT_EQ(expected.bytes, made.bytes);
    }
}

/// The largest factors: the one sum that 64 bits do not hold; a root as close to a half as any.
TEST(Spectrum, ExtremesOfIntegers) {
    const int32_t low = INT32_MIN, a[3] = {7, low, low};
    int32_t made[3] = {};
    for (const auto& [scale, re, im] : {std::tuple{0, 0, INT32_MAX},
                                        {32, 0, INT32_MAX},
                                        {33, 0, 1 << 30},
                                        {63, 0, 1},
                                        {64, 0, 0},
                                        {-3, 0, INT32_MAX}}) {
        EXPECT_EQ(QOR_OK, qoriMulPack_32s_C1RSfs(a, 12, a, 12, made, 12, {3, 1}, scale));
        EXPECT_EQ(re, made[1]);
        EXPECT_EQ(im, made[2]);
    }
    // The root of 32767^2 + 181^2 is 32767.4999; that of 90^2 + 120^2 is 150, or 37.5 times 4.
    const int16_t near[3] = {0, 32767, 181}, tie[3] = {0, 90, 120};
    int16_t size[3] = {};
    EXPECT_EQ(QOR_OK, qoriMagnitudePack_16s_C1RSfs(near, 6, size, 6, {3, 1}, 0));
    EXPECT_EQ(32767, size[1]);
    EXPECT_EQ(QOR_OK, qoriMagnitudePack_16s_C1RSfs(tie, 6, size, 6, {3, 1}, 2));
    EXPECT_EQ(38, size[1]);
    EXPECT_EQ(38, size[2]);
    // 2^60 + 2^30 = n (n + 1): its root is below n + 1/2 by 2^-33.
    const int32_t halves[3] = {0, 1 << 30, 1 << 15};
    int32_t roots[3] = {};
    EXPECT_EQ(QOR_OK, qoriMagnitudePack_32s_C1RSfs(halves, 12, roots, 12, {3, 1}, 0));
    EXPECT_EQ(1 << 30, roots[1]);
}

/// Zeros have no sign, whatever the parts are.
TEST(Spectrum, PhasesOfRealFrequencies) {
    constexpr float kPi = 3.14159265358979f;
    const float spectrum[2][5] = {{-0.0f, -1, -0.0f, 0, -0.0f}, {-2, -1, 0, 1, -0.0f}};
    float phases[2][5];
    EXPECT_EQ(QOR_OK, qoriPhasePack_32f_C1R(spectrum[0], 20, phases[0], 20, {5, 2}));
    for (const auto& [x, y, expected] : {std::tuple{0, 0, 0.0f},
                                         {1, 0, kPi},
                                         {4, 0, kPi},
                                         {2, 0, 0.0f},
                                         {3, 0, 0.0f},
                                         {0, 1, kPi},
                                         {1, 1, kPi},
                                         {4, 1, kPi},
                                         {2, 1, 0.0f},
                                         {3, 1, 0.0f}})
        EXPECT_EQ(expected, phases[y][x]) << x << "," << y;
}

TEST(Spectrum, MagnitudesDoNotOverflowBefore) {
    const float spectrum[3] = {-3e38f, 1.8e38f, 2.4e38f};
    float sizes[3];
    EXPECT_EQ(QOR_OK, qoriMagnitudePack_32f_C1R(spectrum, 12, sizes, 12, {3, 1}));
    EXPECT_EQ(3e38f, sizes[0]);
    EXPECT_NEAR(3e38, sizes[1], 1e32);
    EXPECT_EQ(sizes[1], sizes[2]);
}

}  // namespace
}  // namespace qori::test
