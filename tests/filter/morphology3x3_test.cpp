// SPDX-License-Identifier: Apache-2.0
#include "extreme_cases.h"

namespace qori::test {
namespace {

constexpr Around kSquare{1, 1, 1, 1};
constexpr int kStreamsFrom = 1'048'576;  ///< Bytes of traffic up to which no call streams.

template <class T, Layout L, Kind kind, bool largest, class Function>
void checkSquare(const Shape& shape, Function function) {
    checkWindow<T, T, L, kind>(
        shape, kSquare,
        [=](const T* src, int32_t srcStep, T* dst, int32_t dstStep, QorImageSize roi) {
            if constexpr (kind == Kind::IR)
                return call(function, dst, dstStep, roi);
            else
                return call(function, src, srcStep, dst, dstStep, roi);
        },
        [](auto pixel) {
            reference::Extreme<T, largest> extreme;
            for (int dy = -1; dy <= 1; ++dy)
                for (int dx = -1; dx <= 1; ++dx) extreme.meet(pixel(dx, dy));
            return extreme.value();
        },
        ExtremeElement<T>{});
}

/// The smallest steps that pass are those of the sweep's packed images.
template <class T, Layout L, Kind kind, class Function>
void expectStepsChecked(Function function) {
    constexpr int32_t bytes = channels(L) * static_cast<int32_t>(sizeof(T));
    const TestImage src(0, {.width = 5, .height = 4}, bytes), dst(1, {.width = 3, .height = 2}, bytes);
    const T* const from = src.data<T>() + 6 * channels(L);
    T* const to = dst.data<T>();
    const QorImageSize roi{3, 2};
    if constexpr (kind == Kind::IR) {
        QORI_EXPECT_STATUS(QOR_ERR_STEP_TOO_SMALL, dst, call(function, to, 5 * bytes - 1, roi));
        QORI_EXPECT_STATUS(QOR_ERR_STEP_TOO_SMALL, dst, call(function, to, 5 * bytes, QorImageSize{INT32_MAX, 1}));
    } else {
        QORI_EXPECT_STATUS(QOR_ERR_STEP_TOO_SMALL, dst, call(function, from, 5 * bytes - 1, to, 3 * bytes, roi));
        QORI_EXPECT_STATUS(QOR_ERR_STEP_TOO_SMALL, dst, call(function, from, 5 * bytes, to, 3 * bytes - 1, roi));
        QORI_EXPECT_STATUS(QOR_ERR_STEP_TOO_SMALL, dst,
                           call(function, from, 5 * bytes, to, 3 * bytes, QorImageSize{INT32_MAX, 1}));
        // As the in-place form answers, whose step must hold width + 2 pixels.
        QORI_EXPECT_STATUS(QOR_ERR_STEP_TOO_SMALL, dst, call(function, to, 5 * bytes - 1, to, 5 * bytes - 1, roi));
    }
}

template <class T, Layout L, Kind kind, bool largest, class Function>
void sweepSquare(const char* name, Function function) {
    forShapes(windowShapes(), [=](const Shape& shape) { checkSquare<T, L, kind, largest>(shape, function); });
    forShapes({{.width = 40, .height = 23, .padding = 5}, {.width = 9, .height = 14}},
              [=](const Shape& shape) { checkSquare<T, L, kind, largest>(shape, function); });
    expectStepsChecked<T, L, kind>(function);
    if constexpr (kind == Kind::R) {
        // Equal images with equal steps run in place, whether or not there is such a form.
        const auto inPlace = [=](T* image, int32_t step, QorImageSize roi) {
            return function(image, step, image, step, roi);
        };
        for (int width : {1, 13, 70})
            checkSquare<T, L, Kind::IR, largest>({.width = width, .height = 11, .padding = 2}, inPlace);
        constexpr int kPixel = channels(L) * static_cast<int>(sizeof(T)), kBytes = 2 * kPixel, kWide = 503;
        const std::vector<Shape> shapes = largeShapes(kBytes, kStreamsFrom);
        const Shape withTail{.width = kWide,
                             .height = kStreamsFrom / (kWide * kBytes) + 1,
                             .padding = 64 - kWide * kPixel % 64,
                             .atBegin = true};
        qorTestSetCacheSize(1);
        const int queries = qorTestCacheQueries();
        for (const Shape& shape : {shapes[0], shapes[1], withTail}) checkSquare<T, L, kind, largest>(shape, function);
        EXPECT_EQ(L == Layout::AC4 ? 0 : 1, std::min(qorTestCacheQueries() - queries, 1));
        qorTestSetCacheSize(0);
    }
    markSwept(name);
}

// What each operation of the registry is swept with; a new one does not compile until it is here.

template <class S, Layout L, class Function>
void erode3x3(const char* name, Function function) {
    sweepSquare<S, L, Kind::R, false>(name, function);
}
template <class S, Layout L, class Function>
void erode3x3InPlace(const char* name, Function function) {
    sweepSquare<S, L, Kind::IR, false>(name, function);
}
template <class S, Layout L, class Function>
void dilate3x3(const char* name, Function function) {
    sweepSquare<S, L, Kind::R, true>(name, function);
}
template <class S, Layout L, class Function>
void dilate3x3InPlace(const char* name, Function function) {
    sweepSquare<S, L, Kind::IR, true>(name, function);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(MorphologySweep, name) { operation<S, Layout::SL>(#name, &name); }
#include "members/morphology.inc"
#undef QORI_MEMBER

TEST(Morphology3x3, ChecksInOrder) {
    const TestImage src(0, {.width = 12, .height = 6}, 1), dst(1, {.width = 10, .height = 4}, 1);
    const uint8_t *s = src.data<uint8_t>() + 13, *noSource = nullptr;
    uint8_t *d = dst.data<uint8_t>(), *none = nullptr;
    const QorImageSize ok{10, 4}, empty{0, 4}, flat{10, 0};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriErode3x3_8u_C1R(noSource, 0, d, -1, empty));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriErode3x3_8u_C1R(noSource, 0, none, 0, empty));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriErode3x3_8u_C1R(s, 0, none, 0, empty));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriErode3x3_8u_C1R(s, 0, d, 10, empty));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriErode3x3_8u_C1R(s, -12, d, 10, ok));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriErode3x3_8u_C1R(s, 12, d, -10, flat));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriErode3x3_8u_C1R(s, 1, d, 1, empty));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriErode3x3_8u_C1R(s, 1, d, 1, flat));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriErode3x3_8u_C1R(s, 1, d, 1, {INT32_MIN, INT32_MAX}));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriDilate3x3_8u_AC4IR(none, 0, empty));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst, qoriDilate3x3_8u_AC4IR(d, 0, empty));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriDilate3x3_8u_AC4IR(d, 1, flat));
    // Two rows of work memory are more than an allocation takes.
    QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, dst, qoriDilate3x3_8u_AC4IR(d, INT32_MAX, {INT32_MAX / 4 - 2, 1}));
}

TEST(Morphology3x3, InPlaceAnswersFailedAllocation) {
    const TestImage image(0, {.width = 12, .height = 3}, 8);
    double* const inside = image.data<double>() + 13;
    const auto expectNoMemory = [&](auto run) {
        qorTestFailAllocation(1);
        QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, image, run());
        EXPECT_EQ(QOR_OK, run());
    };
    expectNoMemory([&] { return qoriErode3x3_64f_C1R(inside, 96, inside, 96, {10, 1}); });
    expectNoMemory([&] { return qoriDilate3x3_8u_C1IR(reinterpret_cast<uint8_t*>(inside), 96, {10, 1}); });
}

TEST(Morphology3x3, KeepsWhatIsConstant) {
    const TestImage src(0, {.width = 42, .height = 12}, 1), dst(1, {.width = 40, .height = 10}, 1);
    src.fill<uint8_t>(1, [] { return uint8_t{77}; });
    Snapshot expected = dst.snapshot();
    for (int y = 0; y < 10; ++y)
        for (int x = 0; x < 40; ++x) expected.view<uint8_t>(1).set(x, y, 0, 77);
    EXPECT_EQ(QOR_OK, qoriErode3x3_8u_C1R(src.data<uint8_t>() + 43, 42, dst.data<uint8_t>(), 40, {40, 10}));
    QORI_EXPECT_UNCHANGED(dst, expected);
}

}  // namespace
}  // namespace qori::test
