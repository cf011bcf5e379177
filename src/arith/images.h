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
template <class T, class... Sources>
bool streamsTo(int channels, [[maybe_unused]] Image<T> dst, QorImageSize roi, Sources... sources) {
    const int bytes = static_cast<int>(1 + sizeof...(sources)) * channels * elementBytes<T>;
    const bool inPlace = ((asBytes(sources.data) == asBytes(dst.data)) || ...);
    return !inPlace && streams(streamRules::copy, traffic(roi, bytes));
}

template <Layout layout>
constexpr bool keepsAlpha = layout == Layout::AC4;

/// dst = operation(first, second), per element.
template <bool keepAlpha, class Operation, class T>
void runBinary(int channels, Operation&& operation, Image<const T> first, Image<const T> second, Image<T> dst,
               QorImageSize roi) {
    const bool streaming = streamsTo(channels, dst, roi, first, second);
    kernels::mapImage<keepAlpha>(roi, channels, operation, streaming, dst, first, second);
}

template <bool keepAlpha, class T>
void fillConstant(int channels, Image<T> dst, QorImageSize roi, T value) {
    const T values[1] = {value};
    kernels::Fill<T> fill{kernels::channelVectors(values, 1).v[0]};
    kernels::mapImage<keepAlpha>(roi, channels, fill, streamsTo(channels, dst, roi), dst);
}

/// dst = first Op second by 2^-scale. Once for all layouts without alpha.
template <class Op, bool keepAlpha, class T>
QORI_NOINLINE QorResult combine(int channels, Image<const T> first, Image<const T> second, Image<T> dst,
                                QorImageSize roi, int32_t scale) {
    return underControlOf<kernels::Component<T>>([&] {
        const auto run = [&](auto operation) { runBinary<keepAlpha>(channels, operation, first, second, dst, roi); };
        if (!kernels::withScaledOperation<Op, T>(scale, run)) fillConstant<keepAlpha>(channels, dst, roi, T{});
        return QOR_OK;
    });
}

}  // namespace qori::arith
