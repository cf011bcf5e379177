// SPDX-License-Identifier: Apache-2.0
#include "frame/checks.h"
#include "frame/float_control.h"
#include "frame/streaming.h"
#include "kernels/convert/scale_bytes.h"

namespace qori::convert {
namespace {

using namespace kernels;

/// These families stream by the number of pixels alone, without a look at the cache.
bool streamsFrom(int64_t bound, QorImageSize roi) { return int64_t{roi.width} * roi.height >= bound; }
constexpr int64_t kTo16Bits = 1'398'101, kTo32Bits = 838'860;

template <Layout layout, class Op, class S, class D>
QorResult mapLayout(Image<const S> src, Image<D> dst, QorImageSize roi, Op op, bool streaming) {
    mapImage<layout == Layout::AC4>(roi, channels(layout), op, streaming, dst, src);
    return QOR_OK;
}

template <class D, Layout layout>
QorResult scaleUp(Image<const uint8_t> src, Image<D> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst))) return r;
    return mapLayout<layout>(src, dst, roi, RepeatByte<D>{}, streamsFrom(sizeof(D) == 2 ? kTo16Bits : kTo32Bits, roi));
}

QorResult rangeCheck(float vMin, float vMax) { return vMax - vMin <= 0 ? QOR_ERR_SCALE_RANGE : QOR_OK; }

template <Layout layout>
QorResult scaleToFloat(Image<const uint8_t> src, Image<float> dst, QorImageSize roi, float vMin, float vMax) {
    return underDefaultControl([&] {
        if (QorResult r = firstOf(rangeCheck(vMin, vMax), nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst)))
            return r;
        return mapLayout<layout>(src, dst, roi, ToRange{vMin, (vMax - vMin) / 255}, streamsFrom(kTo32Bits, roi));
    });
}

template <Layout layout>
QorResult scaleFromFloat(Image<const float> src, Image<uint8_t> dst, QorImageSize roi, float vMin, float vMax) {
    return underDefaultControl([&] {
        if (QorResult r = firstOf(rangeCheck(vMin, vMax), nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst)))
            return r;
        const float factor = 255 / (vMax - vMin);
        return mapLayout<layout>(src, dst, roi, FromRange{factor, vMin * factor},
                                 streams(streamRules::copy, traffic(roi, channels(layout) * 5)));
    });
}

template <class S, Layout layout>
QorResult scaleDown(Image<const S> src, Image<uint8_t> dst, QorImageSize roi, int32_t hint) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst))) return r;
    const bool streaming = streamsFrom(kTo16Bits, roi);
    if (hint != hintAccurate) return mapLayout<layout>(src, dst, roi, TakeTopByte<S>{}, sizeof(S) == 2 && streaming);
    return underDefaultControl([&] { return mapLayout<layout>(src, dst, roi, ScaleExactly<S>{}, streaming); });
}

}  // namespace
}  // namespace qori::convert

#include "entries/scale.inc"
