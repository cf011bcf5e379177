// SPDX-License-Identifier: Apache-2.0
#include <bit>

#include "frame/checks.h"
#include "frame/float_control.h"
#include "frame/streaming.h"
#include "kernels/convert/bits.h"
#include "kernels/convert/elements.h"
#include "kernels/convert/scale_integers.h"

namespace qori::convert {
namespace {

using namespace kernels;

template <Layout layout, class Op, class S, class D>
QorResult mapLayout(Image<const S> src, Image<D> dst, QorImageSize roi, Op op) {
    constexpr int n = channels(layout);
    constexpr StreamRule rule = sizeof(D) > sizeof(S) ? streamRules::widening : streamRules::copy;
    constexpr bool mayStream = requires { Op::mayStream; };
    const bool streaming = mayStream && streams(rule, traffic(roi, n * static_cast<int>(sizeof(S) + sizeof(D))));
    mapImage<layout == Layout::AC4>(roi, n, op, streaming, dst, src);
    return QOR_OK;
}

/// Only rounding to float reads the control register: integers below 2^24 are exact, and all else is integers.
template <template <class, class> class Op, class S, class D, Layout layout>
QorResult convert(Image<const S> src, Image<D> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    const auto body = [&] { return mapLayout<layout>(src, dst, roi, Op<S, D>{}); };
    if constexpr (std::is_same_v<D, float> && sizeof(S) == 4)
        return underDefaultControl(body);
    else
        return body();
}

template <template <class, class> class Op, class S, class D, Layout layout>
QorResult convertChecked(Image<const S> src, Image<D> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst))) return r;
    return convert<Op, S, D, layout>(src, dst, roi);
}

/// run(mode) with the mode's type; every value but the first two means half away from zero.
template <class Run>
QorResult withRounding(int32_t roundMode, Run run) {
    if (roundMode == roundTowardZero) return run(TowardZero{});
    if (roundMode == roundNearestEven) return run(NearestEven{});
    return run(HalfAway{});
}

template <class S, class D>
QorResult scaleIntegers(Image<const S> src, Image<D> dst, QorImageSize roi, int32_t roundMode, int32_t scaleFactor) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    if (scaleFactor <= 0) return mapLayout<Layout::C1>(src, dst, roi, ScaleUp<S, D>(scaleFactor));
    return withRounding(roundMode, [&](auto mode) {
        return mapLayout<Layout::C1>(src, dst, roi, ScaleDown<decltype(mode), S, D>(scaleFactor));
    });
}

template <class D, Layout layout>
QorResult roundFloats(Image<const float> src, Image<D> dst, QorImageSize roi, int32_t roundMode) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst))) return r;
    return underDefaultControl([&] {
        return withRounding(
            roundMode, [&](auto mode) { return mapLayout<layout>(src, dst, roi, RoundFloats<decltype(mode), D>{}); });
    });
}

template <class D>
QorResult runScaled(Image<const float> src, Image<D> dst, QorImageSize roi, int32_t roundMode, int32_t scaleFactor) {
    if constexpr (std::is_same_v<D, uint32_t>) {
        // Every positive value saturates, or every value but NaN vanishes.
        const auto maximumWhere = [&](auto test) {
            return mapLayout<Layout::C1>(src, dst, roi, MaximumWhere<decltype(test)>{test});
        };
        if (scaleFactor < -159) return maximumWhere([](Vec<float> v) { return isLess(zero<float>(), v); });
        if (scaleFactor > 128) return maximumWhere([](Vec<float> v) { return isNan(v); });
    }
    // Beyond 2^252 either way every result is 0 or saturated.
    const int exponent = scaleFactor < -252 ? 252 : scaleFactor > 252 ? -252 : -scaleFactor;
    const auto power = [](int e) { return std::bit_cast<float>(static_cast<uint32_t>(e + 127) << 23); };
    return withRounding(roundMode, [&](auto mode) {
        const ScaleFloats<decltype(mode), D> op{power(exponent / 2), power(exponent - exponent / 2)};
        return mapLayout<Layout::C1>(src, dst, roi, op);
    });
}

template <class D>
QorResult scaleFloats(Image<const float> src, Image<D> dst, QorImageSize roi, int32_t roundMode, int32_t scaleFactor) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    return underDefaultControl([&] { return runScaled(src, dst, roi, roundMode, scaleFactor); });
}

QorResult unpackBits(Image<const uint8_t> src, int32_t srcBitOffset, Image<uint8_t> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst))) return r;
    if (srcBitOffset < 0) return QOR_ERR_SIZE;
    for (int32_t y = 0; y < roi.height; ++y)
        unpackBitsRow(dst.row(y), src.row(y) + srcBitOffset / 8, srcBitOffset % 8, roi.width);
    return QOR_OK;
}

}  // namespace
}  // namespace qori::convert

#include "entries/convert.inc"
#include "entries/convert_bits.inc"
