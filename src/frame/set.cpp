// SPDX-License-Identifier: Apache-2.0
#include "checks.h"
#include "image/driver.h"
#include "kernels/copy/select_rows.h"
#include "kernels/simd.h"
#include "streaming.h"

namespace qori::frame {
namespace {

template <class T, int n>
QorResult setPixels(const T* value, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(value, dst), sizeCheck(roi))) return r;
    constexpr StreamRule rule = sizeof(T) == 4 ? streamRules::widening : streamRules::constantFill;
    constexpr int pixel = n * elementBytes<T>;
    const bool streaming = streams(rule, traffic(roi, pixel));
    const kernels::Pattern pattern = kernels::patternOf<n>(value);
    const auto fill = streaming                                                   ? kernels::fillRowStreaming
                      : usesStrings(roi, pixel) && kernels::repeatsWords(pattern) ? kernels::fillRowString
                                                                                  : kernels::fillRow;
    forEachRow(
        roi, [&](ptrdiff_t pixels, T* d) { fill(asBytes(d), pattern, pixels * pixel); }, walk(dst, n));
    if (streaming) streamFence();
    return QOR_OK;
}

template <class T>
QorResult setColour(const T* value, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(value, dst), sizeCheck(roi))) return r;
    const T pixel[4] = {value[0], value[1], value[2], T{}};
    const kernels::Pattern pattern = kernels::patternOf<4>(pixel);
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, T* d) {
            kernels::selectFillRow<4 * elementBytes<T>, 3 * elementBytes<T>>(asBytes(d), pattern, pixels);
        },
        walk(dst, 4));
    return QOR_OK;
}

template <class T, Layout layout>
QorResult setMasked(const T* value, Image<T> dst, QorImageSize roi, Image<const uint8_t> mask) {
    if (QorResult r = firstOf(nullCheck(value, dst, mask), sizeCheck(roi))) return r;
    constexpr int pixel = pixelSize<T, layout>, selected = processedChannels(layout) * elementBytes<T>;
    T values[channels(layout)] = {};
    for (int i = 0; i < processedChannels(layout); ++i) values[i] = value[i];
    const kernels::Pattern pattern = kernels::patternOf<channels(layout)>(values);
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, T* d, const uint8_t* m) {
            kernels::maskedFillRow<pixel, selected>(asBytes(d), pattern, m, pixels);
        },
        walk(dst, channels(layout)), walk(mask, 1));
    return QOR_OK;
}

template <class T, int n>
QorResult setChannel(const T* value, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(dst), sizeCheck(roi))) return r;
    T pixel[n] = {*value};
    const kernels::Pattern pattern = kernels::patternOf<n>(pixel);
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, T* d) {
            kernels::selectFillRow<n * elementBytes<T>, elementBytes<T>>(asBytes(d), pattern, pixels);
        },
        walk(dst, n));
    return QOR_OK;
}

}  // namespace
}  // namespace qori::frame

#include "entries/set.inc"
