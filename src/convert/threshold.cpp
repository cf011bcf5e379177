// SPDX-License-Identifier: Apache-2.0
// Fixed thresholds: clipping to a threshold, and replacing what lies beyond it.
#include "kernels/threshold/threshold.h"
#include "frame/checks.h"
#include "frame/float_control.h"
#include "frame/streaming.h"

namespace qori::convert {
namespace {

using namespace kernels;

template <class T>
QorResult imageChecks(Image<const T> src, Image<T> dst, QorImageSize roi) {
    return firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst));
}

QorResult comparisonCheck(int32_t cmpOp) {
    return cmpOp == cmpLess || cmpOp == cmpGreater ? QOR_OK : QOR_ERR_UNSUPPORTED_MODE;
}

/// Constants of the processed channels; alpha's may be anything.
template <class T, Layout layout>
Constants<T, channels(layout)> constantsOf(const T* values) {
    T perChannel[channels(layout)];
    for (int c = 0; c < channels(layout); ++c) perChannel[c] = values[c < processedChannels(layout) ? c : 0];
    return Constants<T, channels(layout)>(perChannel);
}

/// Rows of 16 bytes, two to a vector: small tiles are of this width, and the way for partial vectors takes longer than
/// their work. Constants must repeat within 16 bytes.
template <class T, class Rule>
QORI_NOINLINE void mapRowPairs(Rule rule, Image<const T> src, Image<T> dst, int32_t rows) {
    for (int32_t y = 0; y < rows; y += 2) {
        const int32_t other = y + 1 < rows ? y + 1 : y;
        const Bytes two = loadBlocks(asBytes(src.row(y)), asBytes(src.row(other)));
        const Vec<T> out = rule(0, fromInteger<T>(two.v));
        storeBlocks(asBytes(dst.row(y)), asBytes(dst.row(other)), {toInteger(out.v)});
    }
}

/// Runs the rule that make() gives, made and run under the default control register where elements are floats: flushed
/// subnormals would compare as equal.
template <Layout layout, class T, class Make>
QorResult run(Image<const T> src, Image<T> dst, QorImageSize roi, Make make) {
    constexpr StreamRule rule = std::is_same_v<T, uint16_t> ? streamRules::threshold16u : streamRules::copy;
    return underControlOf<T>([&] {
        if constexpr (layout == Layout::C1) {
            if (roi.width * int64_t{elementBytes<T>} == 16 && (src.step != 16 || dst.step != 16)) {
                mapRowPairs(make(), src, dst, roi.height);
                return QOR_OK;
            }
        }
        const bool streaming = src.data != dst.data && streams(rule, traffic(roi, 2 * pixelSize<T, layout>));
        mapImage<layout == Layout::AC4>(roi, channels(layout), Thresholding<decltype(make())>{make()}, streaming, dst,
                                        src);
        return QOR_OK;
    });
}

template <class T, Layout layout>
QorResult clipAbove(Image<const T> src, Image<T> dst, QorImageSize roi, const T* threshold) {
    if (QorResult r = firstOf(imageChecks(src, dst, roi), nullCheck(threshold))) return r;
    return run<layout>(src, dst, roi,
                       [=] { return ClipAbove<T, channels(layout)>{constantsOf<T, layout>(threshold)}; });
}

template <class T, Layout layout>
QorResult clipBelow(Image<const T> src, Image<T> dst, QorImageSize roi, const T* threshold) {
    if (QorResult r = firstOf(imageChecks(src, dst, roi), nullCheck(threshold))) return r;
    return run<layout>(src, dst, roi,
                       [=] { return ClipBelow<T, channels(layout)>{constantsOf<T, layout>(threshold)}; });
}

template <class T, Layout layout>
QorResult clip(Image<const T> src, Image<T> dst, QorImageSize roi, const T* threshold, int32_t cmpOp) {
    if (QorResult r = firstOf(imageChecks(src, dst, roi), nullCheck(threshold), comparisonCheck(cmpOp))) return r;
    return cmpOp == cmpGreater ? clipAbove<T, layout>(src, dst, roi, threshold)
                               : clipBelow<T, layout>(src, dst, roi, threshold);
}

template <class T, Layout layout>
QorResult replaceAbove(Image<const T> src, Image<T> dst, QorImageSize roi, const T* threshold, const T* value) {
    if (QorResult r = firstOf(imageChecks(src, dst, roi), nullCheck(threshold, value))) return r;
    return run<layout>(src, dst, roi, [=] {
        return ReplaceAbove<T, channels(layout)>{constantsOf<T, layout>(threshold), constantsOf<T, layout>(value)};
    });
}

template <class T, Layout layout>
QorResult replaceBelow(Image<const T> src, Image<T> dst, QorImageSize roi, const T* threshold, const T* value) {
    if (QorResult r = firstOf(imageChecks(src, dst, roi), nullCheck(threshold, value))) return r;
    return run<layout>(src, dst, roi, [=] {
        return ReplaceBelow<T, channels(layout)>{constantsOf<T, layout>(threshold), constantsOf<T, layout>(value)};
    });
}

template <class T, Layout layout>
QorResult replace(Image<const T> src, Image<T> dst, QorImageSize roi, const T* threshold, const T* value,
                  int32_t cmpOp) {
    if (QorResult r = comparisonCheck(cmpOp)) return r;
    return cmpOp == cmpGreater ? replaceAbove<T, layout>(src, dst, roi, threshold, value)
                               : replaceBelow<T, layout>(src, dst, roi, threshold, value);
}

template <class T, Layout layout>
bool areOrdered(const T* lower, const T* upper) {
    for (int c = 0; c < processedChannels(layout); ++c)
        if (upper[c] < lower[c]) return false;
    return true;
}

template <class T, Layout layout>
QorResult replaceOutside(Image<const T> src, Image<T> dst, QorImageSize roi, const T* thresholdLT, const T* valueLT,
                         const T* thresholdGT, const T* valueGT) {
    if (QorResult r = firstOf(imageChecks(src, dst, roi), nullCheck(thresholdLT, valueLT, thresholdGT, valueGT)))
        return r;
    return underControlOf<T>([&] {
        if (!areOrdered<T, layout>(thresholdLT, thresholdGT)) return QorResult{QOR_ERR_THRESHOLD};
        const auto constants = [](const T* values) { return constantsOf<T, layout>(values); };
        return run<layout>(src, dst, roi, [=] {
            return ReplaceOutside<T, channels(layout)>{{constants(thresholdLT), constants(valueLT)},
                                                       {constants(thresholdGT), constants(valueGT)}};
        });
    });
}

}  // namespace
}  // namespace qori::convert

#include "entries/threshold.inc"
