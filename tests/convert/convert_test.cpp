// SPDX-License-Identifier: Apache-2.0
#include "reference/convert.h"

#include <cstdlib>

#include "harness/pixelwise.h"

namespace qori::test {
namespace {

constexpr int kModes[] = {0, 1, 2, 7, -1};

/// Values where rounding and range ends are decided, among any others.
struct TellingFloat {
    float operator()() const {
        static constexpr float special[] = {
            0.0f,          -0.0f,       0.5f,          -0.5f,          1.5f,           2.5f,           3.5f,
            -1.5f,         -2.5f,       0.49999997f,   -0.49999997f,   254.5f,         255.5f,         256.0f,
            127.5f,        -128.5f,     -129.0f,       32767.5f,       -32768.5f,      65534.5f,       65535.5f,
            8388607.5f,    16777216.0f, 2147483520.0f, 2147483648.0f,  -2147483648.0f, -2147483904.0f, 4294967040.0f,
            4294967296.0f, 1e30f,       -1e30f,        1e-40f,         -1e-45f,        INFINITY,       -INFINITY,
            NAN,           -NAN,        3.4028235e38f, -3.4028235e38f, 1.1754942e-38f};
        const int choice = random().below(4);
        if (choice == 0) return special[random().below(static_cast<int>(std::size(special)))];
        if (choice == 1) return static_cast<float>(random().below(140'000) - 70'000) * 0.5f;
        return random().value<float>();
    }
};

template <class S>
using Draw = std::conditional_t<std::is_same_v<S, float>, TellingFloat, AnyValue<S>>;

template <class S, class D, Layout L, class Function, class Reference, class... Extra>
void sweepWith(const std::vector<Shape>& shapes, Function function, Reference reference, Extra... extra) {
    forShapes(shapes, [&](const Shape& shape) {
        checkUnary<S, D, L, Kind::R>(
            shape,
            [&](const TestImage& src, const TestImage& dst, QorImageSize roi) {
                ASSERT_EQ(QOR_OK, call(function, src.data<S>(), src.step(), dst.data<D>(), dst.step(), roi, extra...));
            },
            [&](S x, int) { return reference(x); }, Draw<S>{});
    });
}

const std::vector<Shape>& fewShapes() {
    static const std::vector<Shape> shapes = {
        {.width = 67, .height = 3, .padding = 5}, {.width = 512, .height = 2}, {.width = 7, .atBegin = true}};
    return shapes;
}

template <class S, class D, Layout L, class Function>
void plain(const char* name, Function function) {
    const auto reference = [](S x) { return reference::convertInteger<S, D>(x); };
    sweepWith<S, D, L>(uprightShapes(), function, reference);
    forStreamingChoices(channels(L) * static_cast<int>(sizeof(S) + sizeof(D)), (1 << 20) + (1 << 16),
                        [&](const Shape& shape) { sweepWith<S, D, L>({shape}, function, reference); });
    markSwept(name);
}

template <class S, class D, Layout L, class Function>
void convertChecked(const char* name, Function function) {
    plain<S, D, L>(name, function);
}

/// The members that check no step take negative ones.
template <class S, class D, Layout L, class Function>
void convert(const char* name, Function function) {
    plain<S, D, L>(name, function);
    sweepWith<S, D, L>(smallShapes(), function, [](S x) { return reference::convertInteger<S, D>(x); });
}

template <class S, class D, Layout L, class Function>
void scaleIntegers(const char* name, Function function) {
    const auto reference = [](int mode, int factor) {
        return [=](S x) { return reference::scaleInteger<S, D>(x, mode, factor); };
    };
    for (int factor : {0, 1, -1}) sweepWith<S, D, L>(smallShapes(), function, reference(1, factor), 1, factor);
    for (int mode : kModes)
        for (int factor : {INT32_MIN, -170, -40, -33, -32, -31, -17, -16, -9, -8, -7, -6, -3, -2,  2,
                           3,         7,    8,   9,   15,  16,  17,  18,  30, 31, 32, 33, 34, 140, INT32_MAX})
            sweepWith<S, D, L>(fewShapes(), function, reference(mode, factor), mode, factor);
    markSwept(name);
}

template <class S, class D, Layout L, class Function>
void roundFloats(const char* name, Function function) {
    for (int mode : kModes) {
        const auto reference = [=](float x) { return reference::convertFloat<D>(x, mode, 0); };
        sweepWith<S, D, L>(mode < 3 && mode >= 0 ? uprightShapes() : fewShapes(), function, reference, mode);
    }
    markSwept(name);
}

template <class S, class D, Layout L, Kind kind, class Function>
void scaleFloats(const char* name, Function function) {
    const auto sweep = [&](const std::vector<Shape>& shapes, int mode, int factor) {
        const auto reference = [=](float x, int) { return reference::convertFloat<D>(x, mode, factor); };
        forShapes(shapes, [&](const Shape& shape) {
            if constexpr (kind == Kind::IR) {
                checkUnary<float, D, L, kind>(
                    shape,
                    [&](const TestImage&, const TestImage& dst, QorImageSize roi) {
                        ASSERT_EQ(QOR_OK, call(function, dst.data<D>(), dst.step(), roi, mode, factor));
                    },
                    reference, TellingFloat{});
            } else {
                checkUnary<float, D, L, kind>(
                    shape,
                    [&](const TestImage& src, const TestImage& dst, QorImageSize roi) {
                        ASSERT_EQ(QOR_OK, call(function, src.data<float>(), src.step(), dst.data<D>(), dst.step(), roi,
                                               mode, factor));
                    },
                    reference, TellingFloat{});
            }
        });
    };
    for (int mode : {0, 1, 2}) sweep(smallShapes(), mode, 1 - mode);
    for (int mode : {0, 1, 2, 9})
        for (int factor = -175; factor <= 145; ++factor) sweep(fewShapes(), mode, factor);
    for (int mode : {0, 1, 2})
        for (int factor : {INT32_MIN,  INT32_MIN + 1, INT32_MIN + 127,
                           -1'000'000, -379,          -378,
                           -278,       -277,          -276,
                           -255,       -254,          -253,
                           -252,       252,           253,
                           254,        255,           276,
                           277,        278,           378,
                           379,        1'000'000,     INT32_MAX - 127,
                           INT32_MAX})
            sweep(fewShapes(), mode, factor);
    markSwept(name);
}

template <class S, class D, Layout L, class Function>
void unpackBits(const char* name, Function function) {
    for (int offset = 0; offset < 27; ++offset)
        forShapes(uprightShapes(), [&](const Shape& pixels) {
            if ((pixels.width + offset) % 3 != 0) return;
            Shape bits = pixels;
            bits.width = (offset + pixels.width + 7) / 8;
            TestImage src(1, bits, 1), dst(0, pixels, 1);
            src.fill<uint8_t>(1, AnyValue<uint8_t>{});
            const Snapshot srcBefore = src.snapshot();
            Snapshot expected = dst.snapshot();
            for (int y = 0; y < pixels.height; ++y)
                for (int x = 0; x < pixels.width; ++x) {
                    const int bit = offset + x;
                    const bool set = src.view<uint8_t>(1).get(bit / 8, y) >> (7 - bit % 8) & 1;
                    expected.view<uint8_t>(1).set(x, y, 0, set ? 255 : 0);
                }
            ASSERT_EQ(QOR_OK, call(function, src.data<uint8_t>(), src.step(), offset, dst.data<uint8_t>(), dst.step(),
                                   pixels.roi()));
            QORI_EXPECT_UNCHANGED(dst, expected);
            QORI_EXPECT_UNCHANGED(src, srcBefore);
        });
    markSwept(name);
}

// Scaling.

template <class S, class D, Layout L, class Function>
void scaleUp(const char* name, Function function) {
    const auto reference = [](uint8_t x) {
        const int64_t repeated = sizeof(D) == 2 ? x * 257 : x * int64_t{16843009};
        return static_cast<D>(repeated + std::numeric_limits<D>::min());
    };
    sweepWith<S, D, L>(uprightShapes(), function, reference);
    if (L == Layout::C1) sweepWith<S, D, L>({{.width = 1280, .height = 1100}}, function, reference);  // streams
    markSwept(name);
}

constexpr float kRanges[][2] = {{0.0f, 1.0f}, {-3.5f, 9.25f}, {100.0f, 100.001f}, {-1e30f, 1e30f}};

template <class S, class D, Layout L, class Function>
void scaleToFloat(const char* name, Function function) {
    for (const auto& [low, high] : kRanges) {
        const volatile float lower = low, factor = (high - low) / 255;
        const auto reference = [&](uint8_t x) {
            const volatile float product = static_cast<float>(x) * factor;
            return lower + product;
        };
        sweepWith<S, D, L>(low == 0 ? uprightShapes() : fewShapes(), function, reference, low, high);
    }
    markSwept(name);
}

template <class S, class D, Layout L, class Function>
void scaleFromFloat(const char* name, Function function) {
    for (const auto& [low, high] : kRanges) {
        const float factor = 255 / (high - low), offset = low * factor;
        const auto reference = [&](float x) -> uint8_t {
            const float value = std::fma(x, factor, -offset);
            return !(value > -1.0f) ? 0 : value > 256.0f ? 255 : reference::nearestByte(value);
        };
        sweepWith<S, D, L>(low == 0 ? uprightShapes() : fewShapes(), function, reference, low, high);
    }
    markSwept(name);
}

template <class S, class D, Layout L, class Function>
void scaleDown(const char* name, Function function) {
    const auto fast = [](S x) {
        const int64_t s = int64_t{x} - (std::is_signed_v<S> ? 0 : 32768);
        return static_cast<uint8_t>(((s - (s >> 8)) >> (sizeof(S) == 2 ? 8 : 24)) + 128);
    };
    const auto accurate = [](S x) {
        if constexpr (sizeof(S) == 4) {
            const volatile double product = static_cast<double>(x) * (255.0 / 4294967295.0);
            return reference::nearestByte(product + 2147483648.0 * 255.0 / 4294967295.0);
        } else {
            const auto distance = static_cast<float>(int{x} - int{std::numeric_limits<S>::min()});
            return reference::nearestByte(distance * 0.0038910505827516317f);
        }
    };
    for (int hint : {0, 1, 3}) sweepWith<S, D, L>(hint == 1 ? uprightShapes() : fewShapes(), function, fast, hint);
    sweepWith<S, D, L>(uprightShapes(), function, accurate, 2);
    if (L == Layout::C1) sweepWith<S, D, L>({{.width = 1280, .height = 1100}}, function, fast, 1);
    markSwept(name);
}

#define QORI_OPERATION(operation, name, S, D, L, kind) \
    TEST(Sweep, name) { operation<S, D, Layout::L>(#name, &name); }
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) QORI_##operation(name, S, D, DL, kind)
#define QORI_convert(name, S, D, L, kind) QORI_OPERATION(convert, name, S, D, L, kind)
#define QORI_convertChecked(name, S, D, L, kind) QORI_OPERATION(convertChecked, name, S, D, L, kind)
#define QORI_scaleIntegers(name, S, D, L, kind) QORI_OPERATION(scaleIntegers, name, S, D, L, kind)
#define QORI_roundFloats(name, S, D, L, kind) QORI_OPERATION(roundFloats, name, S, D, L, kind)
#define QORI_unpackBits(name, S, D, L, kind) QORI_OPERATION(unpackBits, name, S, D, L, kind)
#define QORI_scaleUp(name, S, D, L, kind) QORI_OPERATION(scaleUp, name, S, D, L, kind)
#define QORI_scaleToFloat(name, S, D, L, kind) QORI_OPERATION(scaleToFloat, name, S, D, L, kind)
#define QORI_scaleFromFloat(name, S, D, L, kind) QORI_OPERATION(scaleFromFloat, name, S, D, L, kind)
#define QORI_scaleDown(name, S, D, L, kind) QORI_OPERATION(scaleDown, name, S, D, L, kind)
#define QORI_scaleFloats(name, S, D, L, kind) \
    TEST(Sweep, name) { scaleFloats<S, D, Layout::L, Kind::kind>(#name, &name); }
#include "members/convert.inc"
#include "members/convert_bits.inc"
#include "members/scale.inc"
#undef QORI_MEMBER

/// Every value of a 16-bit type in one row.
template <class S>
std::vector<S> everyValue() {
    std::vector<S> values(65536);
    for (int i = 0; i < 65536; ++i) values[static_cast<size_t>(i)] = static_cast<S>(i);
    return values;
}

TEST(Scale, EveryValueOf16Bits) {
    std::vector<uint8_t> out(65536);
    const QorImageSize roi{65536, 1};
    const auto u = everyValue<uint16_t>();
    ASSERT_EQ(QOR_OK, qoriScale_16u8u_C1R(u.data(), 131072, out.data(), 65536, roi, hintAccurate));
    for (size_t i = 0; i < 65536; ++i) ASSERT_EQ(reference::nearestByte(u[i] * 0.0038910505827516317f), out[i]) << u[i];
    ASSERT_EQ(QOR_OK, qoriConvert_16u8u_C1R(u.data(), 131072, out.data(), 65536, roi));
    for (size_t i = 0; i < 65536; ++i) ASSERT_EQ(reference::saturate<uint8_t>(u[i]), out[i]) << u[i];
}

/// Floats to integers over bit patterns `stride` apart: a sample in the usual run, all 2^32 with QORI_EXHAUSTIVE set.
template <class D, class Convert>
void checkFloats(Convert convertRow) {
    const uint32_t stride =
        std::getenv("QORI_EXHAUSTIVE") != nullptr ? 1 : 4093;  // prime: no pattern of bits is left out
    constexpr int kRow = 4096;
    std::vector<float> in(kRow);
    std::vector<D> out(kRow);
    for (int mode = 0; mode < 3; ++mode) {
        uint64_t next = 0;
        while (next < uint64_t{1} << 32) {
            for (float& x : in) {
                const auto bits = static_cast<uint32_t>(next);
                std::memcpy(&x, &bits, sizeof x);
                next += stride;
            }
            ASSERT_EQ(QOR_OK, convertRow(in.data(), out.data(), QorImageSize{kRow, 1}, mode));
            for (size_t i = 0; i < kRow; ++i)
                ASSERT_EQ(reference::convertFloat<D>(in[i], mode, 0), out[i])
                    << std::hexfloat << in[i] << ", mode " << mode;
        }
    }
}

TEST(Convert, FloatsAcrossAllBitPatterns) {
    checkFloats<uint8_t>([](auto... a) {
        return [](const float* s, uint8_t* d, QorImageSize roi, int mode) {
            return qoriConvert_32f8u_C1R(s, 16384, d, 4096, roi, mode);
        }(a...);
    });
    checkFloats<int16_t>([](auto... a) {
        return [](const float* s, int16_t* d, QorImageSize roi, int mode) {
            return qoriConvert_32f16s_C1R(s, 16384, d, 8192, roi, mode);
        }(a...);
    });
    checkFloats<int32_t>([](auto... a) {
        return [](const float* s, int32_t* d, QorImageSize roi, int mode) {
            return qoriConvert_32f32s_C1RSfs(s, 16384, d, 16384, roi, mode, 0);
        }(a...);
    });
    checkFloats<uint32_t>([](auto... a) {
        return [](const float* s, uint32_t* d, QorImageSize roi, int mode) {
            return qoriConvert_32f32u_C1RSfs(s, 16384, d, 16384, roi, mode, 0);
        }(a...);
    });
}

TEST(Convert, ExactlyTheSameImageInPlaceOfBoth) {
    std::vector<int16_t> image(100), expected(100);
    for (size_t i = 0; i < 100; ++i) {
        image[i] = random().value<int16_t>();
        expected[i] = image[i] < 0 ? int16_t{0} : image[i];
    }
    auto* target = reinterpret_cast<uint16_t*>(image.data());
    ASSERT_EQ(QOR_OK, qoriConvert_16s16u_C1Rs(image.data(), 200, target, 200, {100, 1}));
    EXPECT_EQ(expected, image);
}

TEST(Convert, ChecksInOrder) {
    const Shape shape{.width = 4, .height = 2};
    TestImage dst(0, shape, 16);
    alignas(16) uint8_t memory[128] = {};
    const auto *f = reinterpret_cast<const float*>(memory), *noFloats = static_cast<const float*>(nullptr);
    const QorImageSize none{0, 0}, ok = shape.roi();
    auto* d = dst.data<uint8_t>();
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriConvert_8u16u_C1R(nullptr, 0, dst.data<uint16_t>(), 0, none));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriConvert_32f8u_C1R(f, 0, nullptr, 0, none, 9));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriConvert_32f8u_AC4R(f, 0, d, 0, {4, 0}, 9));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriConvert_32f8u_AC4R(f, 0, d, 16, ok, 9));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriConvert_32f8u_AC4R(f, 16, d, -1, ok, 9));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriConvert_32f32u_C1IRSfs(nullptr, 0, none, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst,
                       qoriConvert_16s8s_C1RSfs(dst.data<int16_t>(), 0, dst.data<int8_t>(), 0, none, 0, 0));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriConvert_1u8u_C1R(memory, 0, -1, d, 4, ok));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriConvert_1u8u_C1R(memory, 1, -1, d, 4, ok));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriConvert_16u32s_C3R(dst.data<uint16_t>(), 8, dst.data<int32_t>(), 0, ok));
    QORI_EXPECT_STATUS(QOR_ERR_SCALE_RANGE, dst, qoriScale_8u32f_C1R(nullptr, 0, nullptr, 0, none, 1.0f, 1.0f));
    QORI_EXPECT_STATUS(QOR_ERR_SCALE_RANGE, dst, qoriScale_32f8u_C3R(noFloats, 0, d, 0, none, 2.0f, 1.0f));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriScale_32f8u_C3R(noFloats, 0, d, 0, none, 0.0f, 1.0f));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriScale_32f8u_C3R(f, 0, d, 0, none, 0.0f, 1.0f));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriScale_16s8u_C4R(dst.data<int16_t>(), 1, d, 0, ok, 2));
}

TEST(Convert, AsksForTheCacheOnlyAboveItsBound) {
    std::vector<uint8_t> in(210'000);
    std::vector<float> out(210'000);
    const auto queries = [&](int32_t width) {
        const int before = qorTestCacheQueries();
        EXPECT_EQ(QOR_OK, qoriConvert_8u32f_C1R(in.data(), width, out.data(), width * 4, {width, 1}));
        return qorTestCacheQueries() - before;
    };
    EXPECT_EQ(0, queries(209'715));  // 5 bytes a pixel: 1,048,575
    EXPECT_EQ(1, queries(209'716));
}

}  // namespace
}  // namespace qori::test
