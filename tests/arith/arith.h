// SPDX-License-Identifier: Apache-2.0
// What the sweeps of the arithmetic families share.
#pragma once
#include <cmath>
#include <vector>

#include "harness/pixelwise.h"
#include "reference/arith.h"

namespace qori::test {

/// Scale factors at every change of kernel, for all types, and the ends of the range.
inline const std::vector<int32_t>& scaleFactors() {
    static const std::vector<int32_t> all = {0,  1,  2,   3,   5,   8,   9,   10,  15,        16,   17,       18, 29,
                                             30, 31, 32,  33,  34,  62,  63,  64,  INT32_MAX, -1,   -3,       -6, -7,
                                             -8, -9, -15, -16, -17, -31, -32, -33, -63,       -100, INT32_MIN};
    return all;
}

/// Powers of two and their neighbours half of the time: halves, and what lies just beside them. Floats are no NaNs,
/// because which of two NaNs survives is open.
template <class T>
struct NearPowers {
    T operator()() const {
        if constexpr (reference::isComplex<T>) {
            using Part = decltype(T::re);
            return {NearPowers<Part>{}(), NearPowers<Part>{}()};
        } else if constexpr (std::is_same_v<T, float>) {
            const float value = random().oneIn(16) ? (random().oneIn(2) ? 0.f : -0.f) : random().value<float>();
            return std::isnan(value) ? 1.f : value;
        } else {
            if (random().oneIn(2)) return random().value<T>();
            const int exponent = random().below(std::numeric_limits<T>::digits);
            const auto power = static_cast<T>(T{1} << exponent);
            const auto beside = static_cast<T>(power + static_cast<T>(random().below(3)) - 1);
            return std::is_signed_v<T> && random().oneIn(2) ? static_cast<T>(-beside) : beside;
        }
    }
};

/// Calls a two-image export of either kind; `parameters` follow the size.
template <class T, Kind kind, class Function, class... Parameters>
QorResult callBinary(Function function, const TestImage& a, const TestImage& b, const TestImage& d, QorImageSize roi,
                     Parameters... parameters) {
    if constexpr (kind == Kind::IR)
        return call(function, a.data<T>(), a.step(), d.data<T>(), d.step(), roi, parameters...);
    else
        return call(function, a.data<T>(), a.step(), b.data<T>(), b.step(), d.data<T>(), d.step(), roi, parameters...);
}

/// Every shape, with the scale factors in turn where the export has one. Exports that check their steps see no negative
/// ones.
inline void forShapesAndScales(bool scaled, bool anyStep, FunctionRef<void(const Shape&, int32_t)> check) {
    size_t turn = 0;
    forShapes(smallShapes(), [&](Shape shape) {
        shape.flipped = shape.flipped && anyStep;
        const int32_t scale = scaled ? scaleFactors()[turn++ % scaleFactors().size()] : 0;
        SCOPED_TRACE("scale factor " + std::to_string(scale));
        check(shape, scale);
    });
}

template <class T, bool anyStep>
void forShapesAndScales(FunctionRef<void(const Shape&, int32_t)> check) {
    forShapesAndScales(!reference::isFloat<T>, anyStep, check);
}

/// Calls f with the scale factor where the element type has one.
template <class T, class F>
auto withScale(int32_t scale, F f) {
    if constexpr (reference::isFloat<T>)
        return f();
    else
        return f(scale);
}

/// Which faults a two-image export reports, and which of two it reports first. statusOf(null, step, roi, which) calls
/// it with image `which` faulty.
inline void checkStatuses(const TestImage& d, Kind kind, bool checksSteps, bool stepsFirst,
                          FunctionRef<QorResult(bool, int, QorImageSize, int)> statusOf) {
    for (int which : kind == Kind::IR ? std::vector<int>{0, 2} : std::vector<int>{0, 1, 2}) {
        QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, d, statusOf(true, 0, {0, 0}, which));
        for (QorImageSize bad : {QorImageSize{0, 2}, QorImageSize{4, 0}, QorImageSize{INT32_MIN, -1}})
            QORI_EXPECT_STATUS(stepsFirst ? QOR_ERR_STEP : QOR_ERR_SIZE, d, statusOf(false, 0, bad, which));
        if (!checksSteps) continue;
        for (int bad : {0, -32, INT32_MIN}) QORI_EXPECT_STATUS(QOR_ERR_STEP, d, statusOf(false, bad, {1, 1}, which));
    }
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, d, statusOf(false, 0, {0, 1}, 3));
}

template <class T, Kind kind, bool checksSteps, bool stepsFirst, class Function, class... Parameters>
void checkStatuses(Function function, Parameters... parameters) {
    const Shape shape{.width = 4, .height = 2};
    TestImage a(1, shape, 32), b(2, shape, 32), d(0, shape, 32);
    const auto statusOf = [&](bool null, int step, QorImageSize roi, int which) {
        const auto pointer = [&](const TestImage& i, int n) { return null && which == n ? nullptr : i.data<T>(); };
        const auto stepOf = [&](const TestImage& i, int n) { return which == n ? step : i.step(); };
        if constexpr (kind == Kind::IR)
            return call(function, pointer(a, 0), stepOf(a, 0), pointer(d, 2), stepOf(d, 2), roi, parameters...);
        else
            return call(function, pointer(a, 0), stepOf(a, 0), pointer(b, 1), stepOf(b, 1), pointer(d, 2), stepOf(d, 2),
                        roi, parameters...);
    };
    checkStatuses(d, kind, checksSteps, stepsFirst, statusOf);
}

}  // namespace qori::test
