// SPDX-License-Identifier: Apache-2.0
#include <immintrin.h>

#include <cstdlib>

#include "harness/pixelwise.h"
#include "reference/unary.h"

namespace qori::test {
namespace {

/// Steps between floats: 0 for equal values, NaNs and zeros of either sign.
int64_t floatSteps(float a, float b) {
    if (std::isnan(a) || std::isnan(b)) return std::isnan(a) && std::isnan(b) ? 0 : INT64_MAX;
    const auto ordered = [](float x) {
        int32_t bits;
        std::memcpy(&bits, &x, sizeof bits);
        return bits < 0 ? -int64_t{bits & INT32_MAX} : int64_t{bits};
    };
    return std::abs(ordered(a) - ordered(b));
}

/// Every value of the type, or 65,536 floats across the bit patterns.
template <class T>
std::vector<T> domain() {
    std::vector<T> all(sizeof(T) == 1 ? 256 : 65536);
    for (size_t i = 0; i < all.size(); ++i) {
        if constexpr (std::is_same_v<T, float>) {
            const auto bits = static_cast<uint32_t>(i * 65537);
            std::memcpy(&all[i], &bits, sizeof bits);
        } else {
            all[i] = static_cast<T>(i);
        }
    }
    return all;
}

/// Calls an export on one image, in place or not, with or without a scale factor.
template <class T, Kind kind, bool scaled, class Function>
QorResult run(Function function, const TestImage& src, const TestImage& dst, QorImageSize roi, int scale) {
    const auto with = [&](auto... images) {
        if constexpr (scaled)
            return call(function, images..., roi, scale);
        else
            return call(function, images..., roi);
    };
    if constexpr (kind == Kind::IR)
        return with(dst.data<T>(), dst.step());
    else
        return with(static_cast<const T*>(src.data<T>()), src.step(), dst.data<T>(), dst.step());
}

/// Shapes against the reference at one scale, then every value at all scales that matter. `status` follows from the
/// pixels in the order of rows.
template <class T, Layout L, Kind kind, class Function, class Reference, class Status>
void sweep(const char* name, Function function, Reference reference, Status status) {
    constexpr bool scaled = !std::is_same_v<T, float>;
    const int usual = sizeof(T) == 1 ? 1 : 3;
    forShapes(uprightShapes(), [&](const Shape& shape) {
        QorResult expected = QOR_OK;
        checkUnary<T, T, L, kind>(
            shape,
            [&](const TestImage& src, const TestImage& dst, QorImageSize roi) {
                EXPECT_EQ(expected, (run<T, kind, scaled>(function, src, dst, roi, usual)));
            },
            [&](T x, int) {
                if (expected == QOR_OK) expected = status(x);
                return reference(x, usual);
            });
    });
    if constexpr (L == Layout::C1 && kind == Kind::R && scaled) {
        const std::vector<T> in = domain<T>();
        std::vector<T> out(in.size());
        const auto width = static_cast<int32_t>(in.size());
        for (int scale :
             {INT32_MIN, -94'549, -2000, -40, -18, -17, -16, -15, -14, -13, -12,  -11,    -10,    -9,     -8,
              -7,        -6,      -5,    -4,  -3,  -2,  -1,  0,   1,   2,   3,    4,      5,      7,      8,
              9,         15,      16,    17,  31,  32,  33,  34,  40,  350, 1000, 20'000, 47'000, 94'500, INT32_MAX}) {
            function(in.data(), width * static_cast<int>(sizeof(T)), out.data(), width * static_cast<int>(sizeof(T)),
                     {width, 1}, scale);
            for (size_t i = 0; i < in.size(); ++i)
                ASSERT_EQ(reference(in[i], scale), out[i]) << +in[i] << ", scale " << scale;
        }
    }
    markSwept(name);
}

constexpr auto noWarning = [](auto) { return QOR_OK; };

template <class T, Layout L, Kind kind, class Function>
void absolute(const char* name, Function function) {
    const auto reference = [](T x) {
        if constexpr (std::is_same_v<T, float>) {
            uint32_t bits;
            std::memcpy(&bits, &x, sizeof bits);
            bits &= INT32_MAX;
            std::memcpy(&x, &bits, sizeof bits);
            return x;
        } else {
            return x == INT16_MIN ? T{INT16_MAX} : static_cast<T>(x < 0 ? -x : x);
        }
    };
    forShapes(uprightShapes(), [&](const Shape& shape) {
        Shape even = shape;
        if (sizeof(T) == 2) even.padding &= ~1;  // odd steps have a test of their own
        checkUnary<T, T, L, kind>(
            even,
            [&](const TestImage& src, const TestImage& dst, QorImageSize roi) {
                ASSERT_EQ(QOR_OK, (run<T, kind, false>(function, src, dst, roi, 0)));
            },
            [&](T x, int) { return reference(x); });
    });
    markSwept(name);
}

template <class T, Layout L, Kind kind, class Function>
void square(const char* name, Function function) {
    sweep<T, L, kind>(
        name, function,
        [](T x, int scale) -> T {
            if constexpr (std::is_same_v<T, float>) {
                (void)scale;
                return x * x;
            } else {
                return reference::square(x, scale);
            }
        },
        noWarning);
}

template <class T, Layout L, Kind kind, class Function>
void squareRoot(const char* name, Function function) {
    sweep<T, L, kind>(
        name, function,
        [](T x, int scale) -> T {
            if constexpr (std::is_same_v<T, float>) {
                (void)scale;
                return _mm_cvtss_f32(_mm_sqrt_ss(_mm_set_ss(x)));  // as IEEE: correctly rounded, the processor's NaN
            } else {
                return reference::squareRoot(x, scale);
            }
        },
        noWarning);
}

/// Float forms: within a step of `truth` (in double, rounded by the cast) everywhere, body and tail alike.
template <class Truth>
void checkFloats(const std::vector<float>& in, const std::vector<float>& out, Truth truth) {
    for (size_t i = 0; i < in.size(); ++i) {
        const auto expected = static_cast<float>(truth(static_cast<double>(in[i])));
        ASSERT_LE(floatSteps(expected, out[i]), 1)
            << std::hexfloat << in[i] << " gives " << out[i] << ", not " << expected;
    }
}

template <Layout L, Kind kind, class Function, class Truth>
void sweepFloats(const char* name, Function function, Truth truth) {
    // Shapes: the bytes that a long contiguous row gives, and nothing else touched.
    forShapes(uprightShapes(), [&](const Shape& shape) {
        checkUnary<float, float, L, kind>(
            shape,
            [&](const TestImage& src, const TestImage& dst, QorImageSize roi) {
                ASSERT_EQ(QOR_OK, (run<float, kind, false>(function, src, dst, roi, 0)));
            },
            [&](float x, int) {
                float padded[24], results[24];
                for (float& p : padded) p = x;
                if constexpr (kind == Kind::IR) {
                    std::memcpy(results, padded, sizeof results);
                    function(results, 96, {24 / channels(L), 1});
                } else {
                    function(padded, 96, results, 96, {24 / channels(L), 1});
                }
                return results[0];
            });
    });
    if constexpr (L == Layout::C1 && kind == Kind::R) {
        const bool exhaustive = std::getenv("QORI_EXHAUSTIVE") != nullptr;
        const uint64_t stride = exhaustive ? 1 : 4093;
        std::vector<float> in(4096), out(4096);
        for (uint64_t next = 0; next < uint64_t{1} << 32;) {
            for (float& x : in) {
                const auto bits = static_cast<uint32_t>(next);
                std::memcpy(&x, &bits, sizeof x);
                next += stride;
            }
            ASSERT_EQ(QOR_OK, call(function, static_cast<const float*>(in.data()), 16384, out.data(), 16384,
                                   QorImageSize{4096, 1}));
            checkFloats(in, out, truth);
            if (testing::Test::HasFatalFailure()) return;
        }
        in = {0.0f,    -0.0f,     1.0f,      INFINITY, -INFINITY, NAN,    -1.0f, 1e-45f, 1.17549435e-38f,
              3.4e38f, 88.72283f, 88.72284f, -103.97f, -104.0f,   -87.4f, 1e-10f};
        out.resize(in.size());
        ASSERT_EQ(QOR_OK, function(in.data(), 64, out.data(), 64, {16, 1}));
        checkFloats(in, out, truth);
        EXPECT_EQ(static_cast<float>(truth(0.0)), out[0]);
        EXPECT_EQ(static_cast<float>(truth(1.0)), out[2]);
    }
    markSwept(name);
}

template <class T, Layout L, Kind kind, class Function>
void exponential(const char* name, Function function) {
    if constexpr (std::is_same_v<T, float>)
        sweepFloats<L, kind>(name, function, [](double x) { return std::exp(x); });
    else
        sweep<T, L, kind>(
            name, function, [](T x, int scale) { return reference::exponential(x, scale); }, noWarning);
}

template <class T, Layout L, Kind kind, class Function>
void logarithm(const char* name, Function function) {
    if constexpr (std::is_same_v<T, float>) {
        sweepFloats<L, kind>(name, function, [](double x) { return std::log(x); });
    } else {
        sweep<T, L, kind>(
            name, function, [](T x, int scale) { return reference::logarithm(x, scale); },
            [](T x) { return x > 0    ? QOR_OK
                             : x == 0 ? QOR_WARN_LOG_ZERO
                                      : QOR_WARN_LOG_NEGATIVE; });
    }
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(Unary, name) { operation<S, Layout::DL, Kind::kind>(#name, &name); }
#include "members/arith_unary.inc"
#undef QORI_MEMBER

TEST(Ln, TheFirstElementAtOrBelowZeroDecides) {
    const auto warning = [](std::vector<int16_t> in) {
        std::vector<int16_t> out(in.size());
        const auto width = static_cast<int32_t>(in.size()) / 2;
        const QorResult result = qoriLn_16s_C1RSfs(in.data(), width * 2, out.data(), width * 2, {width, 2}, 0);
        for (size_t i = 0; i < in.size(); ++i) EXPECT_EQ(reference::logarithm(in[i], 0), out[i]);
        return result;
    };
    std::vector<int16_t> in(74, 100);
    EXPECT_EQ(QOR_OK, warning(in));
    in[73] = -5;
    EXPECT_EQ(QOR_WARN_LOG_NEGATIVE, warning(in));
    in[36] = 0;
    EXPECT_EQ(QOR_WARN_LOG_ZERO, warning(in));
    in[35] = -1;
    EXPECT_EQ(QOR_WARN_LOG_NEGATIVE, warning(in));
}

TEST(Abs, OddStepsAreTheEvenNumbersBelow) {
    int16_t in[8] = {-1, 2, -3, INT16_MIN, 5, -6, 7, -8}, out[8] = {};
    EXPECT_EQ(QOR_OK, qoriAbs_16s_C1R(in, 9, out, 9, {4, 2}));
    const int16_t expected[8] = {1, 2, 3, INT16_MAX, 5, 6, 7, 8};
    EXPECT_EQ(0, std::memcmp(expected, out, sizeof out));
}

TEST(Unary, ChecksInOrder) {
    const Shape shape{.width = 4, .height = 2};
    TestImage dst(0, shape, 16);
    const uint8_t source[64] = {};
    auto* d = dst.data<uint8_t>();
    auto* f = dst.data<float>();
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriSqr_8u_C1RSfs(nullptr, 0, d, 0, {0, 0}, 0));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriLn_32f_C1IR(nullptr, 0, {0, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriSqrt_8u_AC4RSfs(source, 0, d, 0, {4, 0}, 0));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriExp_8u_C3RSfs(source, 0, d, 16, {4, 2}, 0));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriExp_32f_C1IR(f, -16, {4, 2}));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriAbs_16s_C1R(dst.data<int16_t>(), 8, dst.data<int16_t>(), 0, {4, 2}));
}

}  // namespace
}  // namespace qori::test
