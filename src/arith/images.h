// SPDX-License-Identifier: Apache-2.0
// How the arithmetic families run a row operation: over two images, or over one image and constants.
#pragma once
#include "frame/checks.h"
#include "frame/float_control.h"
#include "frame/streaming.h"
#include "kernels/arith/arith.h"

namespace qori::arith {

/// Stores past the cache once the images fill half of it: the destination is then not read before it is written. In
/// place it has been read anyway.
template <Layout layout, class T, class... Sources>
bool streamsTo([[maybe_unused]] Image<T> dst, QorImageSize roi, Sources... sources) {
    constexpr int bytes = static_cast<int>(1 + sizeof...(sources)) * channels(layout) * elementBytes<T>;
    const bool inPlace = ((asBytes(sources.data) == asBytes(dst.data)) || ...);
    return !inPlace && streams(streamRules::copy, traffic(roi, bytes));
}

template <Layout layout>
constexpr bool keepsAlpha = layout == Layout::AC4;

/// dst = operation(first, second), per element.
template <Layout layout, class Operation, class T>
void runBinary(Operation&& operation, Image<const T> first, Image<const T> second, Image<T> dst, QorImageSize roi) {
    const bool streaming = streamsTo<layout>(dst, roi, first, second);
    kernels::mapImage<keepsAlpha<layout>>(roi, channels(layout), operation, streaming, dst, first, second);
}

template <Layout layout, class T>
void fillConstant(Image<T> dst, QorImageSize roi, T value) {
    const T values[1] = {value};
    kernels::Fill<T> fill{kernels::channelVectors(values, 1).v[0]};
    kernels::mapImage<keepsAlpha<layout>>(roi, channels(layout), fill, streamsTo<layout>(dst, roi), dst);
}

}  // namespace qori::arith
