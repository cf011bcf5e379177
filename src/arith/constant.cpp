// SPDX-License-Identifier: Apache-2.0
// An image and constants, one per processed channel.
#include "images.h"
#include "kernels/arith/divide.h"
#include "kernels/copy/stream_rows.h"
#include "kernels/copy_rows.h"

namespace qori::arith {
namespace {

enum class Kind { R, IR };

template <bool anyStep, class T>
QorResult check(Image<const T> src, const T* value, Image<T> dst, QorImageSize roi) {
    return firstOf(nullCheck(src, dst), sizeCheck(roi), anyStep ? QOR_OK : stepCheck(src, dst), nullCheck(value));
}

template <Layout layout, class T, class Predicate>
bool allValues(const T* value, Predicate predicate) {
    for (int c = 0; c < processedChannels(layout); ++c)
        if (!predicate(value[c])) return false;
    return true;
}

template <class T>
bool isZeroValue(T value) {
    if constexpr (kernels::isComplex<T>)
        return value.re == 0 && value.im == 0;
    else
        return value == 0;
}

template <Layout layout, class T>
kernels::ChannelVectors<T> constantsOf(const T* value) {
    T perChannel[channels(layout)];
    for (int c = 0; c < channels(layout); ++c) perChannel[c] = value[c < processedChannels(layout) ? c : 0];
    return kernels::channelVectors(perChannel, channels(layout));
}

/// dst = operation(src), per element, where the operation has the constants.
template <Layout layout, class T, class Operation>
void runUnary(Operation operation, Image<const T> src, Image<T> dst, QorImageSize roi) {
    const bool streaming = streamsTo(channels(layout), dst, roi, src);
    kernels::mapImage<keepsAlpha<layout>>(roi, channels(layout), operation, streaming, dst, src);
}

/// dst = operation(value, src), per element.
template <Layout layout, class T, class Operation>
void runConstant(Operation operation, const T* value, Image<const T> src, Image<T> dst, QorImageSize roi) {
    runUnary<layout>(kernels::WithConstant<T, Operation>{operation, constantsOf<layout>(value)}, src, dst, roi);
}

template <Layout layout, class T>
void copyImage(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (src.data == dst.data && src.step == dst.step) return;
    if constexpr (keepsAlpha<layout>) {
        runUnary<layout>([](int, auto block) { return block; }, src, dst, roi);
    } else {
        constexpr int pixel = pixelSize<T, layout>;
        if (streams(streamRules::copy, traffic(roi, 2 * pixel))) {
            kernels::copyRowsStreaming(asBytes(dst.data), dst.step, asBytes(src.data), src.step,
                                       ptrdiff_t{roi.width} * pixel, roi.height);
            return streamFence();
        }
        forEachRow(
            roi, [&](ptrdiff_t pixels, const T* s, T* d) { kernels::copyRow(asBytes(d), asBytes(s), pixels * pixel); },
            walk(src, channels(layout)), walk(dst, channels(layout)));
    }
}

template <class Op, Layout layout, class T>
QorResult combineWith(const T* value, Image<const T> src, Image<T> dst, QorImageSize roi, int32_t scale) {
    return underControlOf<kernels::Component<T>>([&] {
        const auto run = [&](auto operation) { runConstant<layout>(operation, value, src, dst, roi); };
        if (!kernels::withScaledOperation<Op, T>(scale, run))
            fillConstant<keepsAlpha<layout>>(channels(layout), dst, roi, T{});
        return QOR_OK;
    });
}

template <class T, Layout layout, bool anyStep>
QorResult addChecked(Image<const T> src, const T* value, Image<T> dst, QorImageSize roi, int32_t scale) {
    if (QorResult r = check<anyStep>(src, value, dst, roi)) return r;
    if constexpr (!kernels::isFloat<T>) {
        if (scale == 0 && allValues<layout>(value, isZeroValue<T>)) {
            copyImage<layout>(src, dst, roi);
            return QOR_OK;
        }
    }
    if constexpr (std::is_unsigned_v<T>) {
        constexpr int bits = 8 * elementBytes<T>;
        if (scale <= -bits && allValues<layout>(value, [](T v) { return v != 0; })) {  // no sum is 0
            fillConstant<keepsAlpha<layout>>(channels(layout), dst, roi, std::numeric_limits<T>::max());
            return QOR_OK;
        }
    }
    return combineWith<kernels::Sum<T>, layout>(value, src, dst, roi, scale);
}

/// The forms of one image and of two differ in what they check, and where they do not, they are one function.
template <class T, Layout layout, Kind kind>
QorResult addConstant(Image<const T> src, const T* value, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    constexpr bool anyStep =
        std::is_same_v<T, uint8_t> || (std::is_same_v<T, float> && layout == Layout::C1 && kind == Kind::R);
    return addChecked<T, layout, anyStep>(src, value, dst, roi, scale);
}

template <class T, Layout layout>
QorResult subtractConstant(Image<const T> src, const T* value, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    if (QorResult r = check<std::is_same_v<T, uint8_t>>(src, value, dst, roi)) return r;
    if constexpr (!kernels::isFloat<T>) {
        if (scale == 0 && allValues<layout>(value, isZeroValue<T>)) {
            copyImage<layout>(src, dst, roi);
            return QOR_OK;
        }
    }
    return combineWith<kernels::Difference<T>, layout>(value, src, dst, roi, scale);
}

template <class T, Layout layout>
QorResult multiplyConstant(Image<const T> src, const T* value, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    if (QorResult r = check<std::is_same_v<T, uint8_t>>(src, value, dst, roi)) return r;
    if constexpr (!kernels::isFloat<T>) {
        if (allValues<layout>(value, isZeroValue<T>)) {
            fillConstant<keepsAlpha<layout>>(channels(layout), dst, roi, T{});
            return QOR_OK;
        }
    }
    if constexpr (std::is_integral_v<T>) {
        if (scale == 0 && allValues<layout>(value, [](T v) { return v == 1; })) {
            copyImage<layout>(src, dst, roi);
            return QOR_OK;
        }
    }
    return combineWith<kernels::Product<T>, layout>(value, src, dst, roi, scale);
}

template <Layout layout, class T>
QorResult runDivision(Image<const T> src, const T* value, Image<T> dst, QorImageSize roi, int32_t scale) {
    if (!allValues<layout>(value, [](T v) { return !isZeroValue(v); })) return QOR_ERR_DIV_BY_ZERO;
    if constexpr (std::is_integral_v<T>) {
        // Up to 2^(scale-1): at most a half, which goes to 0.
        if (scale > static_cast<int>(std::bit_width(kernels::largestMagnitude<T> - 1))) {
            fillConstant<keepsAlpha<layout>>(channels(layout), dst, roi, T{});
            return QOR_OK;
        }
    }
    const auto run = [&]<class Divide>(Divide division) {
        if constexpr (requires { typename Divide::Prepared; })
            runUnary<layout>(kernels::DivisionByConstants<T, Divide>{division, constantsOf<layout>(value)}, src, dst,
                             roi);
        else
            runConstant<layout>(kernels::Binary<T, Divide>{division}, value, src, dst, roi);
    };
    if constexpr (std::is_same_v<T, float>) {
        run([](auto d, auto n) __attribute__((always_inline)) { return n / d; });
    } else {
        kernels::withDivision<T>(scale, run);
    }
    return QOR_OK;
}

template <class T, Layout layout>
QorResult divideConstant(Image<const T> src, const T* value, Image<T> dst, QorImageSize roi, int32_t scale = 0) {
    if (QorResult r = check<false>(src, value, dst, roi)) return r;
    return underDefaultControl([&] { return runDivision<layout>(src, value, dst, roi, scale); });
}

template <class T, Layout layout>
QorResult multiplyConstantFraction(Image<const T> src, const T* value, Image<T> dst, QorImageSize roi) {
    if (QorResult r = check<false>(src, value, dst, roi)) return r;
    runConstant<layout>(kernels::Binary<T, kernels::FractionProduct>{}, value, src, dst, roi);
    return QOR_OK;
}

}  // namespace
}  // namespace qori::arith

#include "entries/arith_constant.inc"
