// SPDX-License-Identifier: Apache-2.0
#include "reference/threshold.h"

#include <cmath>
#include <cstring>

#include "harness/pixelwise.h"

namespace qori::test {
namespace {

/// Constants of the processed channels, and a fourth that must not matter where there are three.
template <class T>
struct Constants {
    T lower[4], below[4], upper[4], above[4];  ///< lower <= upper, or one of them is NaN.
};

template <class T>
T drawConstant() {
    if constexpr (std::is_floating_point_v<T>) {
        // Zeros of both signs, subnormals, infinities and NaN, which the control register and the order of comparisons
        // can get wrong.
        constexpr T special[] = {T(0), T(-0.0), T(1e-40), T(-1e-40), INFINITY, -INFINITY, NAN, T(1)};
        if (random().oneIn(3)) return special[random().below(8)];
    }
    return random().value<T>();
}

template <class T>
Constants<T> drawConstants() {
    Constants<T> k;
    for (int c = 0; c < 4; ++c) {
        k.lower[c] = drawConstant<T>();
        k.upper[c] = random().oneIn(4) ? k.lower[c] : drawConstant<T>();
        if (k.upper[c] < k.lower[c]) std::swap(k.lower[c], k.upper[c]);
        k.below[c] = drawConstant<T>();
        k.above[c] = drawConstant<T>();
    }
    return k;
}

/// Half of the elements equal a constant or lie beside one.
template <class T>
struct NearConstants {
    const Constants<T>& k;

    T operator()() const {
        if (random().oneIn(2)) return drawConstant<T>();
        const T value = (random().oneIn(2) ? k.lower : k.upper)[random().below(3)];
        if constexpr (std::is_floating_point_v<T>)
            return random().oneIn(2) ? value : std::nextafter(value, random().oneIn(2) ? INFINITY : -INFINITY);
        else
            return static_cast<T>(value + random().below(3) - 1);
    }
};

template <class T, Layout layout>
auto argument(const T* values) {
    if constexpr (layout == Layout::C1)
        return *values;
    else
        return values;
}

/// Calls a threshold of either kind; arrays of constants become the scalars of C1.
template <class T, Layout layout, Kind kind, class Function, class... Parameters>
QorResult callThreshold(Function function, const T* src, int32_t srcStep, T* dst, int32_t dstStep, QorImageSize roi,
                        Parameters... parameters) {
    const auto convert = [](auto parameter) {
        if constexpr (std::is_pointer_v<decltype(parameter)>)
            return argument<T, layout>(parameter);
        else
            return parameter;
    };
    if constexpr (kind == Kind::IR)
        return call(function, dst, dstStep, roi, convert(parameters)...);
    else
        return call(function, src, srcStep, dst, dstStep, roi, convert(parameters)...);
}

/// parametersOf(constants, invoke) calls invoke with the export's own parameters; reference(constants, src, channel).
template <class T, Layout layout, Kind kind, class Function, class Parameters, class Reference>
void sweep(const char* name, Function function, Parameters parametersOf, Reference reference) {
    forShapes(smallShapes(), [&](Shape shape) {
        shape.flipped = false;
        const Constants<T> k = drawConstants<T>();
        checkUnary<T, T, layout, kind>(
            shape,
            [&](const TestImage& src, const TestImage& dst, QorImageSize roi) {
                parametersOf(k, [&](auto... parameters) {
                    EXPECT_EQ(QOR_OK, (callThreshold<T, layout, kind>(function, src.data<T>(), src.step(),
                                                                      dst.data<T>(), dst.step(), roi, parameters...)));
                });
            },
            [&](T src, int c) { return reference(k, src, c); }, NearConstants<T>{k});
    });
    markSwept(name);
}

template <class T, Layout layout, Kind kind, class Function>
void clipAbove(const char* name, Function function) {
    sweep<T, layout, kind>(
        name, function, [](const auto& k, auto invoke) { invoke(k.upper); },
        [](const auto& k, T src, int c) { return reference::replaceAbove(src, k.upper[c], k.upper[c]); });
}

template <class T, Layout layout, Kind kind, class Function>
void clipBelow(const char* name, Function function) {
    sweep<T, layout, kind>(
        name, function, [](const auto& k, auto invoke) { invoke(k.lower); },
        [](const auto& k, T src, int c) { return reference::replaceBelow(src, k.lower[c], k.lower[c]); });
}

template <class T, Layout layout, Kind kind, class Function>
void clip(const char* name, Function function) {
    for (QorCompareOp op : {cmpLess, cmpGreater})
        sweep<T, layout, kind>(
            name, function, [=](const auto& k, auto invoke) { invoke(k.lower, int32_t{op}); },
            [=](const auto& k, T src, int c) {
                return op == cmpLess ? reference::replaceBelow(src, k.lower[c], k.lower[c])
                                     : reference::replaceAbove(src, k.lower[c], k.lower[c]);
            });
}

template <class T, Layout layout, Kind kind, class Function>
void replaceAbove(const char* name, Function function) {
    sweep<T, layout, kind>(
        name, function, [](const auto& k, auto invoke) { invoke(k.upper, k.above); },
        [](const auto& k, T src, int c) { return reference::replaceAbove(src, k.upper[c], k.above[c]); });
}

template <class T, Layout layout, Kind kind, class Function>
void replaceBelow(const char* name, Function function) {
    sweep<T, layout, kind>(
        name, function, [](const auto& k, auto invoke) { invoke(k.lower, k.below); },
        [](const auto& k, T src, int c) { return reference::replaceBelow(src, k.lower[c], k.below[c]); });
}

template <class T, Layout layout, Kind kind, class Function>
void replace(const char* name, Function function) {
    for (QorCompareOp op : {cmpLess, cmpGreater})
        sweep<T, layout, kind>(
            name, function, [=](const auto& k, auto invoke) { invoke(k.lower, k.below, int32_t{op}); },
            [=](const auto& k, T src, int c) {
                return op == cmpLess ? reference::replaceBelow(src, k.lower[c], k.below[c])
                                     : reference::replaceAbove(src, k.lower[c], k.below[c]);
            });
}

template <class T, Layout layout, Kind kind, class Function>
void replaceOutside(const char* name, Function function) {
    sweep<T, layout, kind>(
        name, function, [](const auto& k, auto invoke) { invoke(k.lower, k.below, k.upper, k.above); },
        [](const auto& k, T src, int c) {
            return src < k.lower[c] ? k.below[c] : reference::replaceAbove(src, k.upper[c], k.above[c]);
        });
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(ThresholdSweep, name) { operation<S, Layout::SL, Kind::kind>(#name, &name); }
#include "members/threshold.inc"
#undef QORI_MEMBER

TEST(Threshold, StreamsWithTheSameResult) {
    const uint16_t threshold[4] = {30'000, 20'000, 65'534, 0}, value[4] = {1, 2, 3, 4};
    const auto check = [&]<Layout layout>(auto function, const Shape& shape) {
        checkUnary<uint16_t, uint16_t, layout, Kind::R>(
            shape,
            [&](const auto& src, const auto& dst, QorImageSize roi) {
                EXPECT_EQ(QOR_OK, (callThreshold<uint16_t, layout, Kind::R>(function, src.template data<uint16_t>(),
                                                                            src.step(), dst.template data<uint16_t>(),
                                                                            dst.step(), roi, threshold, value)));
            },
            [&](uint16_t src, int c) { return reference::replaceAbove(src, threshold[c], value[c]); });
    };
    forStreamingChoices(12, 1 << 18,
                        [&](const Shape& shape) { check.operator()<Layout::C3>(qoriThreshold_GTVal_16u_C3R, shape); });
    forStreamingChoices(
        16, 1 << 18, [&](const Shape& shape) { check.operator()<Layout::AC4>(qoriThreshold_GTVal_16u_AC4R, shape); });
}

/// 16 bits out of place from 2^18 bytes of traffic on, the others from 2^20 on.
TEST(Threshold, AsksForTheCacheOnlyAboveEachBound) {
    std::vector<uint16_t> src(600'000), dst(600'000);
    const auto queriesOf = [&](auto threshold) {
        const int before = qorTestCacheQueries();
        EXPECT_EQ(QOR_OK, threshold());
        return qorTestCacheQueries() - before;
    };
    const auto words = [&](uint16_t* to, int32_t width) {
        return queriesOf([&] {
            return call(qoriThreshold_GT_16u_C1R, src.data(), 1, to, 1, QorImageSize{width, 1}, uint16_t{7});
        });
    };
    EXPECT_EQ(0, words(dst.data(), 65'536));  // 4 bytes a pixel
    EXPECT_EQ(1, words(dst.data(), 65'537));
    EXPECT_EQ(0, words(src.data(), 65'537));
    const auto bytes = [&](int32_t width) {
        return queriesOf([&] {
            return call(qoriThreshold_GT_8u_C1R, reinterpret_cast<uint8_t*>(src.data()), 1,
                        reinterpret_cast<uint8_t*>(dst.data()), 1, QorImageSize{width, 1}, uint8_t{7});
        });
    };
    EXPECT_EQ(0, bytes(524'288));
    EXPECT_EQ(1, bytes(524'289));
}

/// The order of nulls, sizes and steps among themselves holds for every export (contracts_test); here is what depends
/// on the values of the parameters.
class ThresholdStatus : public testing::Test {
protected:
    static constexpr Shape kShape{.width = 4, .height = 2};
    static constexpr QorImageSize kRoi{4, 2}, kNone{0, 2};
    TestImage src_{1, kShape, 12}, dst_{0, kShape, 12};
    const uint8_t* const from_ = src_.data<uint8_t>();
    uint8_t* const to_ = dst_.data<uint8_t>();
    const uint8_t three_[3] = {1, 2, 3};
};

TEST_F(ThresholdStatus, ComparisonLastWhereItClips) {
    const auto status = [&](const uint8_t* to, QorImageSize roi, int32_t step, const uint8_t* threshold, int32_t op) {
        return call(qoriThreshold_8u_C3R, from_, 12, const_cast<uint8_t*>(to), step, roi, threshold, op);
    };
    for (int32_t op : {1, 2, 3, 5, -1, INT32_MIN}) {
        QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, dst_, status(to_, kRoi, 12, three_, op));
        QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst_, status(to_, kRoi, 12, nullptr, op));
        QORI_EXPECT_STATUS(QOR_ERR_STEP, dst_, status(to_, kRoi, 0, nullptr, op));
    }
}

TEST_F(ThresholdStatus, ComparisonFirstWhereItReplaces) {
    const auto status = [&](uint8_t* to, QorImageSize roi, int32_t step, const uint8_t* threshold, const uint8_t* value,
                            int32_t op) {
        return call(qoriThreshold_Val_8u_C3R, from_, 12, to, step, roi, threshold, value, op);
    };
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, dst_, status(nullptr, kNone, 0, nullptr, nullptr, 2));
    QORI_EXPECT_STATUS(QOR_ERR_UNSUPPORTED_MODE, dst_, status(to_, kRoi, 12, three_, three_, -4));
    for (int32_t op : {cmpLess, cmpGreater}) {
        QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst_, status(nullptr, kNone, 0, nullptr, nullptr, op));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst_, status(to_, kNone, 0, nullptr, nullptr, op));
        QORI_EXPECT_STATUS(QOR_ERR_STEP, dst_, status(to_, kRoi, 0, nullptr, nullptr, op));
        QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst_, status(to_, kRoi, 12, three_, nullptr, op));
    }
}

TEST_F(ThresholdStatus, ThresholdsOutOfOrder) {
    const uint8_t bad[3] = {9, 9, 2}, two[3] = {3, 3, 2};
    const auto status = [&](const uint8_t* lower, const uint8_t* upper, const uint8_t* value) {
        return call(qoriThreshold_LTValGTVal_8u_C3R, from_, 12, to_, 12, kRoi, lower, value, upper, value);
    };
    QORI_EXPECT_STATUS(QOR_ERR_THRESHOLD, dst_, status(three_, bad, three_));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst_, status(three_, bad, nullptr));
    EXPECT_EQ(QOR_OK, status(two, two, three_));
    // Subnormals that the caller's register would flush to zero, and NaN, of which no comparison holds.
    const auto floats = [&](float lower, float upper) {
        QorResult first = QOR_OK;
        for (int i = 0; i < 64; ++i) {
            const QorResult r = call(qoriThreshold_LTValGTVal_32f_C1R, src_.data<float>(), 12, dst_.data<float>(), 12,
                                     QorImageSize{3, 2}, lower, 1.f, upper, 2.f);
            if (i == 0) first = r;
            EXPECT_EQ(first, r);
        }
        return first;
    };
    EXPECT_EQ(QOR_ERR_THRESHOLD, floats(2e-40f, 1e-40f));
    EXPECT_EQ(QOR_OK, floats(1e-40f, 2e-40f));
    EXPECT_EQ(QOR_OK, floats(NAN, 0));
    EXPECT_EQ(QOR_OK, floats(0, NAN));
}

}  // namespace
}  // namespace qori::test
