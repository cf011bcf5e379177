// SPDX-License-Identifier: Apache-2.0
// Copies: elements are moved bit for bit, so all types of one size share their kernels.
#include "checks.h"
#include "image/driver.h"
#include "kernels/copy/channel_rows.h"
#include "kernels/copy/select_rows.h"
#include "kernels/copy/stream_rows.h"
#include "kernels/simd.h"
#include "streaming.h"

namespace qori::frame {
namespace {

/// Four-byte elements follow the rule of the widening moves, smaller ones that of channel splitting.
template <class T>
bool streamsChannels(QorImageSize roi, int channelsRead, int channelsWritten) {
    if constexpr (sizeof(T) == 4)
        return streams(streamRules::widening, traffic(roi, 4 * (channelsRead + channelsWritten)));
    else
        return streams(streamRules::channelSplit, traffic(roi, elementBytes<T> * (channelsRead + channelsWritten)));
}

template <class T, int n>
QorResult copyPixels(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    constexpr int pixel = n * elementBytes<T>;
    if (roi.width <= kernels::kNarrowRow / pixel && !isOneRun(roi, walk(src, n), walk(dst, n))) {
        kernels::copyNarrowRows(asBytes(dst.data), dst.step, asBytes(src.data), src.step, roi.width * pixel,
                                roi.height);
        return QOR_OK;
    }
    if (streams(streamRules::copy, wholeTraffic(roi, 2 * pixel))) {
        kernels::copyRowsStreaming(asBytes(dst.data), dst.step, asBytes(src.data), src.step,
                                   ptrdiff_t{roi.width} * pixel, roi.height);
        streamFence();
        return QOR_OK;
    }
    const auto copy = usesStrings(roi, pixel) ? kernels::copyRowString : kernels::copyRow;
    forEachRow(
        roi, [&](ptrdiff_t pixels, const T* s, T* d) { copy(asBytes(d), asBytes(s), pixels * pixel); }, walk(src, n),
        walk(dst, n));
    return QOR_OK;
}

template <class T>
QorResult copyColour(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    forEachRow(
        roi,
        [](ptrdiff_t pixels, const T* s, T* d) {
            kernels::selectRow<4 * elementBytes<T>, 3 * elementBytes<T>>(asBytes(d), asBytes(s), pixels);
        },
        walk(src, 4), walk(dst, 4));
    return QOR_OK;
}

template <class T, Layout layout>
QorResult copyMasked(Image<const T> src, Image<T> dst, QorImageSize roi, Image<const uint8_t> mask) {
    if (QorResult r = firstOf(nullCheck(src, dst, mask), sizeCheck(roi))) return r;
    constexpr int pixel = pixelSize<T, layout>, selected = processedChannels(layout) * elementBytes<T>;
    forEachRow(
        roi,
        [](ptrdiff_t pixels, const T* s, T* d, const uint8_t* m) {
            kernels::maskedRow<pixel, selected>(asBytes(d), asBytes(s), m, pixels);
        },
        walk(src, channels(layout)), walk(dst, channels(layout)), walk(mask, 1));
    return QOR_OK;
}

template <class T, int n>
QorResult extractChannel(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    const bool streaming = streamsChannels<T>(roi, n, 1);
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, const T* s, T* d) {
            kernels::extractRow<n, elementBytes<T>>(asBytes(d), asBytes(s), pixels, streaming);
        },
        walk(src, n), walk(dst, 1));
    if (streaming) streamFence();
    return QOR_OK;
}

template <class T, int n>
QorResult insertChannel(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    forEachRow(
        roi,
        [](ptrdiff_t pixels, const T* s, T* d) {
            kernels::insertRow<n, elementBytes<T>>(asBytes(d), asBytes(s), pixels);
        },
        walk(src, 1), walk(dst, n));
    return QOR_OK;
}

template <class T, int n>
QorResult copyChannel(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    forEachRow(
        roi,
        [](ptrdiff_t pixels, const T* s, T* d) {
            kernels::selectRow<n * elementBytes<T>, elementBytes<T>>(asBytes(d), asBytes(s), pixels);
        },
        walk(src, n), walk(dst, n));
    return QOR_OK;
}

template <class T>
QorResult dropAlpha(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    const bool streaming = streams(streamRules::copy, wholeTraffic(roi, 7 * elementBytes<T>));
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, const T* s, T* d) {
            kernels::dropAlphaRow<elementBytes<T>>(asBytes(d), asBytes(s), pixels, streaming);
        },
        walk(src, 4), walk(dst, 3));
    if (streaming) streamFence();
    return QOR_OK;
}

template <class T>
QorResult fillColour(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    forEachRow(
        roi,
        [](ptrdiff_t pixels, const T* s, T* d) {
            kernels::fillColourRow<elementBytes<T>>(asBytes(d), asBytes(s), pixels);
        },
        walk(src, 3), walk(dst, 4));
    return QOR_OK;
}

template <class T, int n>
QorResult splitPlanes(Image<const T> src, Planes<T, n> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    const bool streaming = streamsChannels<T>(roi, n, n);
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, const T* s, PlaneRows<T, n> d) {
            kernels::splitRow<n, elementBytes<T>>(asBytes(d).data(), asBytes(s), pixels, streaming);
        },
        walk(src, n), walk(dst));
    if (streaming) streamFence();
    return QOR_OK;
}

template <class T, int n>
QorResult mergePlanes(Planes<const T, n> src, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    const bool streaming = streamsChannels<T>(roi, n, n);
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, PlaneRows<const T, n> s, T* d) {
            kernels::mergeRow<n, elementBytes<T>>(asBytes(d), asBytes(s).data(), pixels, streaming);
        },
        walk(src), walk(dst, n));
    if (streaming) streamFence();
    return QOR_OK;
}

template <class T, int n>
QorResult duplicate(Image<const T> src, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    const bool streaming = streamsChannels<T>(roi, 1, n);
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, const T* s, T* d) {
            kernels::duplicateRow<n, elementBytes<T>>(asBytes(d), asBytes(s), pixels, streaming);
        },
        walk(src, 1), walk(dst, n));
    if (streaming) streamFence();
    return QOR_OK;
}

QorResult copyManaged(Image<const uint8_t> src, Image<uint8_t> dst, QorImageSize roi, int32_t copyFlags) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    const bool streamStores = copyFlags & copyStreamStore;
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, const uint8_t* s, uint8_t* d) {
            if (copyFlags & copyStreamLoad)
                kernels::copyRowStreamLoad(d, s, pixels, streamStores);
            else if (streamStores)
                kernels::copyRowStreaming(d, s, pixels);
            else
                kernels::copyRow(d, s, pixels);
        },
        walk(src, 1), walk(dst, 1));
    if (streamStores) streamFence();
    return QOR_OK;
}

}  // namespace
}  // namespace qori::frame

#include "entries/copy.inc"
